#include "time_arg.h"

namespace probe {
namespace {

constexpr int64_t kMaxSeconds = int64_t{1} << 40;

// Leading decimal digits of s from `at` (at least one), as a number.
bool Digits(const std::string& s, size_t* at, int64_t* value, size_t* count) {
    const size_t start = *at;
    int64_t v = 0;
    while (*at < s.size() && s[*at] >= '0' && s[*at] <= '9') {
        if (v > kMaxSeconds) return false;
        v = v * 10 + (s[*at] - '0');
        ++*at;
    }
    *count = *at - start;
    *value = v;
    return *count > 0;
}

}  // namespace

bool ParseTime(const std::string& text, int64_t* ms) {
    size_t at = 0;
    size_t count = 0;
    int64_t first = 0;
    if (!Digits(text, &at, &first, &count)) return false;
    int64_t seconds = first;
    if (at < text.size() && text[at] == ':') {
        ++at;
        int64_t within = 0;
        if (!Digits(text, &at, &within, &count) || count > 2 || within >= 60) return false;
        seconds = first * 60 + within;
    }
    int64_t millis = 0;
    if (at < text.size() && text[at] == '.') {
        ++at;
        int64_t fraction = 0;
        if (!Digits(text, &at, &fraction, &count) || count > 3) return false;
        for (size_t i = count; i < 3; ++i) fraction *= 10;
        millis = fraction;
    }
    if (at != text.size() || seconds > kMaxSeconds) return false;
    *ms = seconds * 1000 + millis;
    return true;
}

}  // namespace probe
