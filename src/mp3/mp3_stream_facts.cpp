#include "mp3/mp3_stream_facts.h"

#include <cstring>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "metainfo/records.h"
#include "mp3/mp3_frame.h"
#include "mp3/mp3_frames.h"
#include "mp3/mp3_info.h"

namespace metainfo {
namespace {

constexpr size_t kFrameWindow = 4096;
constexpr size_t kVbriOffset = 36;
constexpr uint64_t kV1TagSize = 128;
constexpr uint64_t kApeFooterSize = 32;
constexpr uint64_t kCountedBytes = uint64_t{1} << 20;  // streams this short have their frames counted

// What the first frame's VBR header says; zeros where it says nothing.
struct VbrHeader {
    bool found = false;
    uint64_t frames = 0;
    uint64_t bytes = 0;
    uint64_t delay = 0;  // encoder delay and padding, in samples (LAME tag)
    uint64_t padding = 0;
};

// The LAME tag after a Xing/Info header; ffmpeg writes the same layout
// under "Lavf"/"Lavc".
void ReadLameTag(const uint8_t* tag, size_t available, VbrHeader* vbr) {
    constexpr size_t kDelayAt = 21;
    if (available < kDelayAt + 3) return;
    if (!BytesEqual(tag, "LAME", 4) && !BytesEqual(tag, "Lavf", 4) && !BytesEqual(tag, "Lavc", 4)) return;
    const uint8_t* d = tag + kDelayAt;
    vbr->delay = static_cast<uint64_t>(d[0]) << 4 | d[1] >> 4;
    vbr->padding = static_cast<uint64_t>(d[1] & 0x0F) << 8 | d[2];
}

VbrHeader ReadXing(const uint8_t* tag, size_t available) {
    VbrHeader vbr;
    if (available < 8) return vbr;
    const uint32_t flags = ReadBE32(tag + 4);
    size_t at = 8;
    auto field = [&](uint32_t bit) -> uint64_t {
        if ((flags & bit) == 0 || at + 4 > available) return 0;
        at += 4;
        return ReadBE32(tag + at - 4);
    };
    vbr.frames = field(1);
    vbr.bytes = field(2);
    if (flags & 4) at += 100;
    if (flags & 8) at += 4;
    vbr.found = vbr.frames != 0;
    if (at < available) ReadLameTag(tag + at, available - at, &vbr);
    return vbr;
}

VbrHeader ReadVbri(const uint8_t* tag, size_t available) {
    VbrHeader vbr;
    if (available < 18) return vbr;
    vbr.bytes = ReadBE32(tag + 10);
    vbr.frames = ReadBE32(tag + 14);
    vbr.found = vbr.frames != 0;
    return vbr;
}

VbrHeader FindVbrHeader(const uint8_t* frame, size_t read, const _FrameHeader_Info& header) {
    const size_t distance = XingDistance(header);
    if (header.layerIndex != 2) return VbrHeader();
    if (distance + 4 <= read && (BytesEqual(frame + distance, "Xing", 4) || BytesEqual(frame + distance, "Info", 4)))
        return ReadXing(frame + distance, read - distance);
    if (kVbriOffset + 4 <= read && BytesEqual(frame + kVbriOffset, "VBRI", 4))
        return ReadVbri(frame + kVbriOffset, read - kVbriOffset);
    return VbrHeader();
}

// Bytes of the ID3v1 and APEv2 tags that end the file.
uint64_t TrailingTags(int h, uint64_t size) {
    uint64_t tags = 0;
    uint8_t buf[kV1TagSize];
    if (size >= kV1TagSize && SeekToOffset(h, size - kV1TagSize) &&
        MEx_fread(buf, 1, kV1TagSize, h) == static_cast<int>(kV1TagSize) && BytesEqual(buf, "TAG", 3))
        tags = kV1TagSize;
    if (size - tags < kApeFooterSize || !SeekToOffset(h, size - tags - kApeFooterSize)) return tags;
    if (MEx_fread(buf, 1, kApeFooterSize, h) != static_cast<int>(kApeFooterSize) || !BytesEqual(buf, "APETAGEX", 8))
        return tags;
    const uint64_t body = ReadLE32(buf + 12);
    const bool hasHeader = (ReadLE32(buf + 20) & 0x80000000u) != 0;
    const uint64_t ape = body + (hasHeader ? kApeFooterSize : 0);
    return ape <= size - tags ? tags + ape : tags;
}

const char* CodecOfLayer(uint8_t layerIndex) {
    static const char* const kNames[3] = {"mp1", "mp2", "mp3"};
    return layerIndex < 3 ? kNames[layerIndex] : "";
}

void FillTiming(const _FrameHeader_Info& header, const VbrHeader& vbr, uint64_t audioBytes, MediaFacts* f,
                StreamFacts* s) {
    const uint64_t rate = header.sampleRate;
    if (rate == 0) return;
    if (vbr.found) {
        const uint64_t samples = vbr.frames * header.samplesPerFrame;
        // The VBR header's byte count includes the header's own frame, its
        // frame count does not.
        if (vbr.bytes > header.frameSize && samples != 0)
            s->bitRate = ((vbr.bytes - header.frameSize) * 8 * rate + samples / 2) / samples;
        const uint64_t cut = vbr.delay + vbr.padding;
        const uint64_t played = samples > cut ? samples - cut : 0;
        f->durationUs = static_cast<int64_t>(played * 1000000 / rate);
        f->durationExact = true;
    } else if (header.bitRate != 0) {
        s->bitRate = header.bitRate;
        f->durationUs = static_cast<int64_t>(audioBytes * 8 * 1000000 / header.bitRate);
        f->durationExact = false;
    }
}

// A short stream without a VBR header: its frames counted, so that tag and
// padding bytes at its end do not count as play time.
void CountFrames(const char* path, MediaFacts* f) {
    uint32_t rate = 0;
    uint64_t samples = 0;
    WalkMp3Frames(path, &rate, [&](const AudioFrame& frame) {
        samples += frame.samples;
        return true;
    });
    if (samples == 0 || rate == 0) return;
    f->durationUs = static_cast<int64_t>(samples * 1000000 / rate);
    f->durationExact = true;
}

}  // namespace

int32_t Mp3StreamFacts(const char* path, MediaFacts* f) {
    const OpenedFile file(path);
    if (!file.ok()) return MM_E_FAIL;
    const int h = file.handle();
    const uint64_t size = file.size();
    _FrameHeader_Info header;
    std::memset(&header, 0, sizeof header);
    uint8_t probe[128];
    if (MEx_fread(probe, 1, sizeof probe, h) < 16 || VerifyMP3(h, probe, &header) != MM_OK) return MM_E_FAIL;
    uint8_t frame[kFrameWindow];
    if (!SeekToOffset(h, header.firstFrameOffset)) return MM_E_FAIL;
    const int got = MEx_fread(frame, 1, kFrameWindow, h);
    const VbrHeader vbr = FindVbrHeader(frame, got > 0 ? static_cast<size_t>(got) : 0, header);
    const uint64_t tail = TrailingTags(h, size);
    const uint64_t audioBytes = size > header.firstFrameOffset + tail ? size - header.firstFrameOffset - tail : 0;

    f->format = "mp3";
    f->mime = "audio/mpeg";
    StreamFacts s;
    s.codec = CodecOfLayer(header.layerIndex);
    s.sampleRate = header.sampleRate;
    s.channels = header.channelMode == 3 ? 1 : 2;
    FillTiming(header, vbr, audioBytes, f, &s);
    if (!vbr.found && audioBytes <= kCountedBytes) CountFrames(path, f);
    f->bitRate = s.bitRate;
    f->streams.push_back(s);
    return MM_OK;
}

}  // namespace metainfo
