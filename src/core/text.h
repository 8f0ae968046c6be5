// Text of every encoding files use, to UTF-8. Each decoder stops at the first
// NUL (code unit 0) and turns invalid sequences into U+FFFD.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace metainfo {

std::string Latin1ToUtf8(const uint8_t* p, size_t n);
// A byte-order mark, when present, overrides bigEndian.
std::string Utf16ToUtf8(const uint8_t* p, size_t n, bool bigEndian);
// Valid UTF-8 kept, a leading byte-order mark dropped.
std::string Utf8ToUtf8(const uint8_t* p, size_t n);

// Text of no stated encoding (RIFF INFO, QuickTime): UTF-8 when it is valid
// UTF-8, else Latin-1.
std::string Utf8OrLatin1(const uint8_t* p, size_t n);

// Text without padding: control bytes dropped, blanks trimmed at both ends.
std::string TrimText(const std::string& s);

}  // namespace metainfo
