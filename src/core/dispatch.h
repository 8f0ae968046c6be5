// Library-side access to the per-format tables.
#pragma once

#include "metainfo/metainfo.h"

namespace metainfo {

// The maker-box reader of MP4 files, or null while the library has none.
using MakerInfoFn = int32_t (*)(const char* path, _MAKERINFO* maker);
extern const MakerInfoFn kMakerInfoReader;

}  // namespace metainfo
