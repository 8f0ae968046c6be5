#include "support/ffprobe.h"

#include <cstdio>

namespace testing_support {

std::string RunShell(const std::string& command) {
    std::string out;
    FILE* p = popen(command.c_str(), "r");
    if (p == nullptr) return out;
    char buf[256];
    while (fgets(buf, sizeof buf, p) != nullptr) out += buf;
    return pclose(p) == 0 ? out : std::string();
}

bool FfmpegWrite(const std::string& args, const std::string& path) {
    return RunShell("/usr/bin/ffmpeg -nostdin -v error -y " + args + " '" + path + "' 2>&1 && echo ok").find("ok") !=
           std::string::npos;
}

std::string Probe(const std::string& path, const std::string& entries, const std::string& select) {
    std::string out = RunShell("/usr/bin/ffprobe -v error " + select + " -show_entries " + entries +
                               " -of default=nw=1:nk=1 '" + path + "'");
    while (!out.empty() && (out.back() == '\n' || out.back() == '\r')) out.pop_back();
    return out;
}

}  // namespace testing_support
