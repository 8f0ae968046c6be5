#include "realmedia/rm_id3_bridge.h"

namespace metainfo {

// The ID3 reader is not part of this build yet: no tag is ever found.
int32_t RmParseID3V1(int /*h*/, _MMMetaInfo* /*meta*/) { return MM_E_FAIL; }

}  // namespace metainfo
