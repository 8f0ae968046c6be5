#include "aac/aac_clip.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <new>

#include "aac/aac_bits.h"
#include "aac/aac_frame.h"
#include "aac/aac_walker.h"
#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/file_memo.h"

namespace metainfo {

const uint32_t g_uSamplingFrequencyTable[16] = {
    96000, 88200, 64000, 48000, 44100, 32000, 24000, 22050, 16000, 12000, 11025, 8000, 0, 0, 0, 0,
};

const uint32_t channelMapTab[8] = {0xFFFFFFFFu, 1, 2, 3, 4, 5, 6, 8};

namespace {

constexpr int kReadSize = 8192;
constexpr int kAdtsHeaderSize = 7;
constexpr int kMaxFrameSizes = 30;
// Frames are counted while they start this far before the end of the data.
constexpr int kScanMargin = 100;
// A frame is walked only when a whole maximal frame fits after it.
constexpr int kWalkMargin = 4096;
constexpr int kAdifHeaderBytes = 21;
constexpr int kAdifCopyrightBytes = 9;
constexpr uint32_t kTrailingTagSize = 128;

// The format name is stored as one 32-bit value "aac\0".
constexpr uint32_t kFormatAac = 0x00636161;

// The size of the ADTS frame at offset, as AACGetFrameSize gives it (so values
// not above zero mean "no frame"). A header that does not lie whole inside
// the data read is no frame.
int32_t FrameSizeAt(const uint8_t* buf, int bytesRead, int64_t offset, uint32_t* kind) {
    if (offset < 0 || offset + kAdtsHeaderSize > bytesRead) return MM_E_FAIL;
    return static_cast<int32_t>(AACGetFrameSize(buf + offset, kind));
}

// (data bytes) x 8 / bitrate in whole seconds, as signed 32-bit values. The
// byte count wraps at 32 bits, as the duration always has; a bit rate of 0
// gives 0 instead of a division fault.
uint32_t DurationSeconds(uint32_t fileSize, uint32_t skipped, uint32_t offset, int32_t bitrate) {
    if (bitrate == 0) return 0;
    const int32_t bits = static_cast<int32_t>((fileSize - skipped - offset) * 8u);
    return static_cast<uint32_t>(static_cast<int32_t>(static_cast<int64_t>(bits) / bitrate));
}

void SetBitrate(_MMClipInfo* clip, int32_t bitrate) {
    clip->nBitrate = static_cast<uint32_t>(bitrate);
    clip->nAudioBitrate = static_cast<uint32_t>(bitrate);
}

uint32_t AdtsCode(uint32_t walkerState) {
    switch (walkerState) {
        case 1: return CODEC_AAC_ADTS;
        case 2: return CODEC_AAC_PLUS_V1_ADTS;
        case 3: return CODEC_AAC_PLUS_V2_ADTS;
        default: return CODEC_NODEFINE;
    }
}

uint32_t AdifCode(uint32_t walkerState) {
    switch (walkerState) {
        case 1: return CODEC_AAC_ADIF;
        case 2: return CODEC_AAC_PLUS_V1_ADIF;
        case 3: return CODEC_AAC_PLUS_V2_ADIF;
        default: return CODEC_NODEFINE;
    }
}

// Opens the path and positions it on the data after a leading ID3v2 tag.
// clip->nFileSize gets the file size; *skipped the tag bytes the duration
// leaves out (the ID3v2 size without its header and footer, plus a trailing
// 128-byte "TAG" block). On failure the file is closed.
int32_t OpenPastTags(const char* path, _MMClipInfo* clip, int* handle, uint32_t* skipped) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return 1;
    MEx_fseek(h, 0, SEEK_END);
    clip->nFileSize = PositionToU32(MEx_ftell(h));

    uint8_t tail[3] = {};
    if (MEx_fseek(h, -static_cast<int64_t>(kTrailingTagSize), SEEK_END) == 0) MEx_fread(tail, 1, sizeof tail, h);
    const uint32_t trailing = BytesEqual(tail, "TAG", 3) ? kTrailingTagSize : 0;

    uint8_t probe[128] = {};
    if (MEx_fseek(h, 0, SEEK_SET) != 0 || MEx_fread(probe, 1, sizeof probe, h) < 16) {
        MEx_fclose(h);
        return MM_E_FAIL;
    }
    const uint32_t tagSize = BytesEqual(probe, "ID3", 3) ? ReadSyncsafe32(probe + 6) : 0;
    MEx_fseek(h, static_cast<int64_t>(AACLeadingTagSkip(probe)), SEEK_SET);
    *skipped = tagSize + trailing;
    *handle = h;
    return MM_OK;
}

// The walk of the file this thread asked about last: clip information and
// codec both need it, and the second query takes it from here.
thread_local FileMemo<AacWalk> t_lastWalk;

}  // namespace

int AdtsFrame(const uint8_t* frame, int available, uint32_t* walkerState, uint32_t* profile) {
    if (*walkerState != kWalkPlain || available < kAdtsHeaderSize) return 0;
    *profile = frame[2] >> 6;
    const int samplingIndex = (frame[2] >> 2) & 0x0F;
    const int rawBlocks = frame[6] & 3;
    const bool protectionAbsent = (frame[1] & 1) != 0;

    AacBitReader r = MakeAacBitReader(frame, available, kAdtsHeaderSize);
    if (rawBlocks == 0) {
        if (!protectionAbsent) SetBytePosition(&r, 9);  // crc_check
        RawDataStream(&r, walkerState, samplingIndex);
    } else if (protectionAbsent) {
        // r blocks, one fewer than the header announces: kept as the walk has
        // always been.
        for (int i = 0; i < rawBlocks && !r.exhausted; ++i) RawDataStream(&r, walkerState, samplingIndex);
    } else {
        SetBytePosition(&r, 9 + 2 * rawBlocks);  // raw_data_block_position[] and crc_check
        for (int i = 0; i < rawBlocks && !r.exhausted; ++i) {
            RawDataStream(&r, walkerState, samplingIndex);
            SkipBytes(&r, 2);  // the block's crc_check
        }
    }
    return 0;
}

int32_t UnpackADTSHeader(const uint8_t* buf, int bytesRead, int offset, _MMClipInfo* clip, uint32_t skippedTagBytes,
                         AacWalk* walk) {
    const uint8_t* first = buf + offset;
    const uint32_t sampleRate = g_uSamplingFrequencyTable[(first[2] >> 2) & 0x0F];
    clip->nSampleRate = sampleRate;
    clip->nChannels = channelMapTab[(first[2] & 1) * 4 + (first[3] >> 6)];

    uint32_t firstKind = 0;
    const int32_t firstSize = FrameSizeAt(buf, bytesRead, offset, &firstKind);
    if (firstSize != MM_E_FAIL && walk->walk) AdtsFrame(first, bytesRead - offset, &walk->state, &walk->profile);
    if (firstSize <= 0) return MM_E_UNSUPPORTED;

    uint32_t secondKind = 0;
    const int64_t secondOffset = static_cast<int64_t>(offset) + firstSize;
    const int32_t secondSize = FrameSizeAt(buf, bytesRead, secondOffset, &secondKind);
    if (secondSize != MM_E_FAIL && walk->walk) {
        AdtsFrame(buf + secondOffset, bytesRead - static_cast<int>(secondOffset), &walk->state, &walk->profile);
    }
    if (secondSize <= 0 || secondKind != firstKind) return MM_E_UNSUPPORTED;

    uint32_t sizes[kMaxFrameSizes] = {static_cast<uint32_t>(firstSize), static_cast<uint32_t>(secondSize)};
    int count = 2;
    uint32_t sum = sizes[0] + sizes[1];
    int64_t next = static_cast<int64_t>(firstSize) + secondSize;  // from the first frame
    int64_t running = static_cast<int64_t>(sum) + offset + kScanMargin;
    const int64_t scanEnd = static_cast<int64_t>(bytesRead) - offset - 4;
    while (running < bytesRead && count < kMaxFrameSizes && next < scanEnd) {
        int64_t at = next;
        while (at < scanEnd && !IsADTSSync(first + at)) ++at;
        if (at >= scanEnd) break;
        uint32_t kind = 0;
        const int32_t size = FrameSizeAt(buf, bytesRead, offset + at, &kind);
        sizes[count] = static_cast<uint32_t>(size);
        if (at < static_cast<int64_t>(bytesRead) - kWalkMargin && size != MM_E_FAIL && walk->walk) {
            AdtsFrame(first + at, bytesRead - static_cast<int>(offset + at), &walk->state, &walk->profile);
        }
        if (size == -1 || size == MM_E_FAIL) break;
        running += size;
        sum += static_cast<uint32_t>(size);
        ++count;
        next = at + size;
    }

    std::sort(sizes, sizes + count);
    // The first frame (often the encoder's header frame) and the two largest
    // take no part in the average once there are enough frames. Unsigned,
    // as the average has always been computed.
    const uint32_t average = count > 3
                                 ? (sum - static_cast<uint32_t>(firstSize) - sizes[count - 1] - sizes[count - 2]) /
                                       static_cast<uint32_t>(count - 3)
                                 : sum / static_cast<uint32_t>(count);
    // 1024 samples a frame, 8 bits a byte. The product wraps at 32 bits and is
    // divided as a signed value, as callers have always seen it.
    const int32_t bitrate = static_cast<int32_t>(sampleRate * average) / 128;
    SetBitrate(clip, bitrate);
    clip->nDuration = DurationSeconds(clip->nFileSize, skippedTagBytes, static_cast<uint32_t>(offset), bitrate);
    return MM_OK;
}

int32_t UnpackADIFHeader(const uint8_t* buf, int bytesRead, int offset, _MMClipInfo* clip, uint32_t skippedTagBytes,
                         AacWalk* walk) {
    // The fixed header fields, with bytes beyond the data read taken as zero.
    uint8_t h[kAdifHeaderBytes] = {};
    const int available = bytesRead - offset;
    std::memcpy(h, buf + offset, static_cast<size_t>(std::max(0, std::min(available, kAdifHeaderBytes))));

    const int shift = (h[4] & 0x80) ? kAdifCopyrightBytes : 0;  // copyright_id_present
    const uint8_t* f = h + shift;
    const bool variableRate = (f[4] & 0x10) != 0;  // bitstream_type
    const uint32_t bitrate = (f[4] & 0x0Fu) << 19 | uint32_t(f[5]) << 11 | uint32_t(f[6]) << 3 | f[7] >> 5;
    const uint32_t num_program_config_elements = (f[7] & 0x1Eu) >> 1;
    const int samplingIndex = variableRate ? (f[8] & 7) * 2 + (f[9] >> 7) : (f[11] & 0x78) >> 3;

    SetBitrate(clip, static_cast<int32_t>(bitrate));
    clip->nSampleRate = g_uSamplingFrequencyTable[samplingIndex];
    clip->nDuration =
        DurationSeconds(clip->nFileSize, skippedTagBytes, static_cast<uint32_t>(offset), static_cast<int32_t>(bitrate));

    AacBitReader r = MakeAacBitReader(buf + offset, std::max(0, available), 7 + shift, 1);
    if (!variableRate) {
        ReadBits(&r, 8);  // adif_buffer_fullness, 20 bits
        ReadBits(&r, 8);
        ReadBits(&r, 4);
    }
    uint32_t channels = 0;
    uint32_t objectType = 0;
    for (uint32_t i = 0; i <= num_program_config_elements; ++i) program_config_element(&r, &channels, &objectType);
    clip->nChannels = channels;
    walk->profile = objectType;
    AlignToByte(&r);
    if (walk->walk) RawDataStream(&r, &walk->state, samplingIndex);
    return MM_OK;
}

int32_t ParseClipInfo(int h, _MMClipInfo* clip, uint32_t skippedTagBytes, uint32_t* codec, uint32_t* profile) {
    // Zeroed, so no byte of the buffer is ever undefined.
    uint8_t* buf = new (std::nothrow) uint8_t[kReadSize + 1]();
    if (buf == nullptr) return MM_E_FAIL;
    const FileMemoKey key = FileMemoKey::Of(h);
    const int bytesRead = MEx_fread(buf, 1, kReadSize, h);
    int32_t result = MM_E_UNSUPPORTED;
    if (bytesRead < 4) {
        result = MM_E_FAIL;
    } else {
        int start = -1;
        bool adts = false;
        for (int i = 0; i < bytesRead - 4; ++i) {
            if (IsADTSSync(buf + i)) {
                adts = true;
                start = i;
                break;
            }
            // ADIF counts only at the very start of the data.
            if (BytesEqual(buf, "ADIF", 4)) {
                start = i;
                break;
            }
        }
        if (start >= 0) {
            const uint32_t format = kFormatAac;
            std::memcpy(clip->szFormat, &format, sizeof format);
            AacWalk walk;
            walk.state = *codec;
            walk.profile = *profile;
            const bool recalled = t_lastWalk.Recall(key, &walk);
            if (recalled) walk.walk = false;
            if (adts) {
                result = UnpackADTSHeader(buf, bytesRead, start, clip, skippedTagBytes, &walk);
            } else {
                result = UnpackADIFHeader(buf, bytesRead, start, clip, skippedTagBytes, &walk);
            }
            if (!recalled) t_lastWalk.Remember(key, walk);
            *profile = walk.profile;
            *codec = adts ? AdtsCode(walk.state) : AdifCode(walk.state);
        }
    }
    delete[] buf;
    return result;
}

int32_t AAC_GetTrackType(const char* /*path*/, int* mask) {
    if (mask != nullptr) *mask = TRACK_AUDIO;
    return MM_OK;
}

int32_t AAC_GetClipInfo(const char* path, _MMClipInfo* clip) {
    if (clip == nullptr) return MM_E_INVALIDARG;
    clip->bHasAudio = 1;
    clip->nReserved2 = 0;
    clip->bHasVideo = 0;
    clip->nSamplesPerFrame = 0;
    clip->nBitsPerSample = 16;
    int h = 0;
    uint32_t skipped = 0;
    const int32_t opened = OpenPastTags(path, clip, &h, &skipped);
    if (opened != MM_OK) return opened;
    FileCloser closer(h);
    uint32_t codec = kWalkPlain;
    uint32_t profile = 0;
    const int32_t result = ParseClipInfo(h, clip, skipped, &codec, &profile);
    // The header's rate is the AAC core's; SBR doubles it.
    if (codec != CODEC_AAC_ADTS && codec != CODEC_AAC_ADIF) clip->nSampleRate *= 2;
    return result;
}

int32_t AAC_GetCodecType(const char* path, _MM_CODECTYPE* codecType) {
    if (codecType == nullptr) return MM_E_INVALIDARG;
    _MMClipInfo clip;
    std::memset(&clip, 0, sizeof clip);
    int h = 0;
    uint32_t skipped = 0;
    const int32_t opened = OpenPastTags(path, &clip, &h, &skipped);
    if (opened != MM_OK) return opened;
    FileCloser closer(h);
    uint32_t codec = kWalkPlain;
    uint32_t profile = 0;
    const int32_t result = ParseClipInfo(h, &clip, skipped, &codec, &profile);
    codecType->nAudioCodec = codec;
    // The profile goes into the subtype field; other values leave it as it is.
    if (profile <= 2) codecType->nAudioSubType = PROFILE_AAC_MAIN + profile;
    return result;
}

int32_t Check_AAC_CodecType(const char* /*path*/, void* /*unused1*/, const uint8_t* /*buf*/, void* /*unused2*/,
                            void* /*unused3*/) {
    return MM_OK;
}

}  // namespace metainfo
