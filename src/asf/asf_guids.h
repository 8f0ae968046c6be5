// ASF object and stream-type identifiers, as their 16 bytes stand in a file.
#pragma once

#include <cstdint>

namespace metainfo {

extern const uint8_t ASF_Header_Object[16];

}  // namespace metainfo
