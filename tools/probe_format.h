// Presentation helpers of the metainfo tool: names and texts.
#pragma once

#include <cstdint>
#include <string>

#include "metainfo/metainfo.h"

namespace probe {

// Short name of a media type code ("mp3", "mp4", ... "unknown").
const char* MediaTypeName(int type);

// Name of a metadata item kind for display and JSON keys.
const char* MetaItemName(int kind);

// An item's payload as UTF-8 text, decoded from its encoding; binary
// integers as decimal. Invalid sequences become U+FFFD; a NUL ends the text.
std::string DecodeItemText(const _MMMetaItem& item);

// A result code as the library writes it: "0x80004005".
std::string ResultText(int32_t result);

}  // namespace probe
