#include "mp4/mp4_qcp_bridge.h"

#include "speech/qcp_format.h"

namespace metainfo {

bool ParseQcpFormat(const uint8_t* chunk, size_t size, uint32_t* avgBitrate, uint32_t* sampleRate,
                    uint32_t* bitsPerSample) {
    _QCPFMT fmt;
    if (parseFMTInfo(chunk, size, &fmt) != 0) return false;
    *avgBitrate = fmt.nAvgBitrate;
    *sampleRate = fmt.nSamplingRate;
    *bitsPerSample = fmt.nSampleSize;
    return true;
}

}  // namespace metainfo
