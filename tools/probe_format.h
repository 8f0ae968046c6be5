// Presentation helpers of the metainfo tool: names and texts.
#pragma once

#include <cstdint>
#include <string>

#include "metainfo/metainfo.h"
#include "probe/item_text.h"

namespace probe {

using metainfo::DecodeItemText;

// Name of a metadata item kind for display and JSON keys.
const char* MetaItemName(int kind);

// A result code as the library writes it: "0x80004005".
std::string ResultText(int32_t result);

}  // namespace probe
