// The text of a metadata item of the MM_ interface.
#pragma once

#include <string>

#include "metainfo/records.h"

namespace metainfo {

// An item's payload as UTF-8 text, decoded from its encoding; binary
// integers as decimal. Invalid sequences become U+FFFD; a NUL ends the text.
std::string DecodeItemText(const _MMMetaItem& item);

}  // namespace metainfo
