#include "mp3/mp3_frames.h"

#include <cstring>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "metainfo/records.h"
#include "mp3/mp3_frame.h"
#include "mp3/mp3_info.h"

namespace metainfo {
namespace {

constexpr size_t kVbriOffset = 36;

// Whether the frame at `at` holds a VBR header rather than audio.
bool IsVbrFrame(int h, uint64_t at, const _FrameHeader_Info& header) {
    uint8_t head[kVbriOffset + 4];
    if (!SeekToOffset(h, at) || MEx_fread(head, 1, sizeof head, h) != static_cast<int>(sizeof head)) return false;
    const size_t xing = XingDistance(header);
    return BytesEqual(head + xing, "Xing", 4) || BytesEqual(head + xing, "Info", 4) ||
           BytesEqual(head + kVbriOffset, "VBRI", 4);
}

}  // namespace

bool WalkMp3Frames(const char* path, uint32_t* rate, const FrameVisitor& visit) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return false;
    FileCloser closer(h);
    uint64_t size = 0;
    _FrameHeader_Info first;
    std::memset(&first, 0, sizeof first);
    uint8_t probe[128];
    if (!OpenedFileSize(h, path, &size) || MEx_fread(probe, 1, sizeof probe, h) < 16 ||
        VerifyMP3(h, probe, &first) != MM_OK)
        return false;
    *rate = first.sampleRate;
    uint32_t stream = 0;
    uint8_t head[4];
    uint64_t at = first.firstFrameOffset;
    bool leading = true;
    while (at + sizeof head <= size) {
        if (!SeekToOffset(h, at) || MEx_fread(head, 1, sizeof head, h) != static_cast<int>(sizeof head)) break;
        _FrameHeader_Info frame;
        uint32_t signature = 0;
        const int32_t length = MP3GetFrameSize(head, &signature, &frame);
        if (length <= 0 || at + static_cast<uint64_t>(length) > size) break;
        if (leading) stream = signature;
        if (signature != stream) break;
        const bool vbr = leading && IsVbrFrame(h, at, frame);
        leading = false;
        if (!vbr && !visit(AudioFrame{at, static_cast<uint32_t>(length), frame.samplesPerFrame})) break;
        at += static_cast<uint64_t>(length);
    }
    return true;
}

}  // namespace metainfo
