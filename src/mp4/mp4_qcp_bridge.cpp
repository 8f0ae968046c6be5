#include "mp4/mp4_qcp_bridge.h"

namespace metainfo {

// No QCP reader is linked in yet: every chunk fails.
bool ParseQcpFormat(const uint8_t* /*chunk*/, size_t /*size*/, uint32_t* /*avgBitrate*/,
                    uint32_t* /*sampleRate*/, uint32_t* /*bitsPerSample*/) {
    return false;
}

}  // namespace metainfo
