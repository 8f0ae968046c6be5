// Matroska elements byte by byte: IDs as written, sizes as EBML integers.
#pragma once

#include <cstdint>
#include <string>

#include "support/bytes.h"

namespace testing_support {

// An element with a minimal size field (or 8 bytes of all ones: unknown).
Bytes Ebml(uint32_t id, const Bytes& body, bool unknownSize = false);
Bytes EbmlUint(uint32_t id, uint64_t v);
Bytes EbmlFloat(uint32_t id, double v, bool single = false);
Bytes EbmlText(uint32_t id, const std::string& s);
// The EBML header naming docType.
Bytes EbmlDocHeader(const std::string& docType);

}  // namespace testing_support
