// ID3 text fields to UTF-8, for the accurate interface.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace metainfo {

// One string at p (n bytes) in an ID3 text encoding (0 ISO-8859-1, 1 UTF-16
// with a byte-order mark, 2 UTF-16BE, 3 UTF-8) into *out, untrimmed. Returns
// the bytes it takes, its terminator included.
size_t TakeId3Text(uint8_t encoding, const uint8_t* p, size_t n, std::string* out);

// The NUL-separated strings of a text frame after its encoding byte, trimmed.
std::vector<std::string> Id3TextValues(uint8_t encoding, const uint8_t* p, size_t n);

// The first genre a TCON value names: "(13)", "13" and "(13)Pop" are "Pop",
// "RX" "Remix", "CR" "Cover"; other text as it stands.
std::string Id3GenreName(const std::string& value);

// Whether a date starts with a four-digit year.
bool StartsWithYear(const std::string& date);

}  // namespace metainfo
