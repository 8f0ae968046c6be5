#include "mp4/mp4_id3_bridge.h"

#include <cstdio>

#include "core/file_access.h"
#include "mp3/id3.h"

namespace metainfo {

int32_t ParseEmbeddedID3(int h, uint32_t tagBytes, _MMMetaInfo* meta) {
    // The box may claim more than the file holds from here; the ID3 reader
    // sizes its buffers by this bound, so it must be one the file can back.
    const int64_t start = MEx_ftell(h);
    if (start < 0 || MEx_fseek(h, 0, SEEK_END) != 0) return 1;
    const int64_t end = MEx_ftell(h);
    if (end < start || MEx_fseek(h, start, SEEK_SET) != 0) return 1;
    const uint64_t left = static_cast<uint64_t>(end - start);
    ID3_MetaInfo ctx{};
    ctx.meta = meta;
    ctx.sizeBound = left < tagBytes ? static_cast<uint32_t>(left) : tagBytes;
    ctx.pictureLimit = 1;  // what every metadata query of the library asks for
    return ParseID3V2(h, &ctx);
}

}  // namespace metainfo
