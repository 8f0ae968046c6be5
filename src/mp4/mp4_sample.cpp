// Sample descriptions ("stsd" and its entries, "esds", the MPEG-4 audio
// configuration) and sample sizes ("stsz").
#include <cstring>

#include "aac/aac_bits.h"
#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/thread_state.h"
#include "mp4/mp4_internal.h"
#include "core/codes.h"
#include "mp4/mp4_qcp_bridge.h"
#include "mp4/mp4_truth.h"

namespace metainfo {
namespace {

constexpr int kAudio = 1;
constexpr int kVideo = 16;

const uint32_t kSamplingFrequencies[12] = {96000, 88200, 64000, 48000, 44100, 32000,
                                           24000, 22050, 16000, 12000, 11025, 8000};

// A sample entry: its bytes up to the end of the "stsd" buffer.
struct Entry {
    const uint8_t* data;
    size_t avail;
    // Offsets are 64-bit, as the sizes they are summed from: on a 32-bit host a
    // narrower offset would wrap back into the buffer. Readers come after Has().
    bool Has(uint64_t offset, uint64_t n) const { return offset <= avail && n <= avail - offset; }
    uint8_t U8(uint64_t offset) const { return data[static_cast<size_t>(offset)]; }
    uint16_t U16(uint64_t offset) const { return ReadBE16(data + static_cast<size_t>(offset)); }
    uint32_t U32(uint64_t offset) const { return ReadBE32(data + static_cast<size_t>(offset)); }
};

int32_t AnaMp4aSampleEntry(const Entry& e, _ME_ClipInfoEx* info, MP4TrackNode* node) {
    if (!e.Has(0, 36)) return MM_E_FAIL;
    info->clip.nSampleRate = e.U16(32);
    info->clip.nChannels = e.U16(24);
    info->clip.nBitsPerSample = e.U16(26);
    node->sampleRateOrWidth = info->clip.nSampleRate;
    node->channelsOrHeight = info->clip.nChannels;
    node->bitsOrFrameRate = info->clip.nBitsPerSample;
    return AnaESDBox(e.data + 36, e.avail - 36, kAudio, info);
}

int32_t AnaAmrSampleEntry(const Entry& e, uint32_t codec, _ME_ClipInfoEx* info, MP4TrackNode* node) {
    if (!e.Has(0, 53)) return MM_E_FAIL;
    info->clip.nSampleRate = e.U16(32);
    info->clip.nChannels = 1;
    info->clip.nBitsPerSample = e.data[52];  // frames_per_sample of "damr"
    node->sampleRateOrWidth = info->clip.nSampleRate;
    node->bitsOrFrameRate = info->clip.nBitsPerSample;
    node->codec = codec;
    return MM_OK;
}

int32_t AnaAmrWPSampleEntry(const Entry& e, _ME_ClipInfoEx* info, MP4TrackNode* node) {
    if (!e.Has(0, 34)) return MM_E_FAIL;
    info->clip.nSampleRate = e.U16(32);
    info->clip.nChannels = 1;
    node->sampleRateOrWidth = info->clip.nSampleRate;
    node->codec = CODEC_MP4AUDIO_SAWP;
    return MM_OK;
}

// EVRC ("sevc", "secb", "secw" alike) and QCELP entries: fixed narrow-band values.
int32_t AnaSpeechSampleEntry(uint32_t codec, _ME_ClipInfoEx* info, MP4TrackNode* node) {
    info->clip.nSampleRate = 8000;
    info->clip.nChannels = 1;
    info->clip.nBitsPerSample = 16;
    node->sampleRateOrWidth = 8000;
    node->bitsOrFrameRate = 16;
    node->codec = codec;
    return MM_OK;
}

bool VideoSize(const Entry& e, _ME_ClipInfoEx* info) {
    if (!e.Has(0, 36)) return false;
    info->clip.nWidth = e.U16(32);
    info->clip.nHeight = e.U16(34);
    return true;
}

int32_t AnaMp4vSampleEntry(const Entry& e, _ME_ClipInfoEx* info, MP4TrackNode* node) {
    if (!VideoSize(e, info)) return MM_E_FAIL;
    node->sampleRateOrWidth = info->clip.nWidth;
    node->channelsOrHeight = info->clip.nHeight;
    node->codec = CODEC_MP4VIDEO_MP4V;
    if (!e.Has(86, 0)) return MM_E_FAIL;
    return AnaESDBox(e.data + 86, e.avail - 86, kVideo, info);
}

int32_t AnaS263SampleEntry(const Entry& e, _ME_ClipInfoEx* info, MP4TrackNode* node) {
    if (!VideoSize(e, info)) return MM_E_FAIL;
    node->sampleRateOrWidth = info->clip.nWidth;
    node->channelsOrHeight = info->clip.nHeight;
    node->codec = CODEC_MP4VIDEO_S263;
    // A "d263" of 31 bytes carries a "bitr" box with the average bit rate.
    if (e.Has(86, 4) && e.U32(86) == 31 && e.Has(109, 4)) {
        info->clip.nVideoBitrate = e.U32(109);
        node->bitrate = info->clip.nVideoBitrate;
    }
    return MM_OK;
}

int32_t AnaAvc1SampleEntry(const Entry& e, _ME_ClipInfoEx* info, MP4TrackNode* node) {
    if (!VideoSize(e, info)) return MM_E_FAIL;
    const uint64_t entrySize = e.U32(0);
    uint64_t at = 86;
    for (;;) {
        if (at >= entrySize || !e.Has(at, 8)) return MM_E_FAIL;
        if (e.U32(at + 4) == FourCC("avcC")) break;
        const uint32_t childSize = e.U32(at);
        if (childSize == 0) return MM_E_FAIL;  // would never move on
        at += childSize;
    }
    // Steps over the parameter sets; bytes the buffer lacks end the walk at the entry's end.
    uint64_t pos = at + 14;
    auto skipSets = [&](uint32_t count) {
        for (uint32_t i = 0; i < count; ++i) {
            if (!e.Has(pos, 2)) {
                pos = entrySize;
                return;
            }
            pos += 2 + uint64_t(e.U16(pos));
        }
    };
    if (e.Has(at + 13, 1)) {
        skipSets(e.U8(at + 13) & 0x1Fu);
        if (e.Has(pos, 1)) {
            const uint32_t ppsCount = e.U8(pos);
            pos += 1;
            skipSets(ppsCount);
        } else {
            pos = entrySize;
        }
    } else {
        pos = entrySize;
    }
    uint32_t bitrate = 0;
    // A "btrt" box is taken to follow "avcC"; its type is not checked.
    if (pos < entrySize && entrySize - pos > 19 && e.Has(pos + 16, 4)) bitrate = e.U32(pos + 16);
    if (info->clip.nVideoBitrate == 0) info->clip.nVideoBitrate = bitrate;
    node->bitrate = bitrate;
    node->sampleRateOrWidth = info->clip.nWidth;
    node->channelsOrHeight = info->clip.nHeight;
    node->codec = CODEC_MP4VIDEO_S264;
    return MM_OK;
}

int32_t AnaQLCM(const uint8_t* payload, size_t avail, _ME_ClipInfoEx* info, MP4TrackNode* node) {
    node->codec = CODEC_QCELP;
    if (avail < 3) return MM_E_FAIL;
    uint32_t bitrate = 0, rate = 0, bits = 0;
    if (!ParseQcpFormat(payload + 3, avail - 3, &bitrate, &rate, &bits)) return MM_E_FAIL;
    info->clip.nAudioBitrate = bitrate;
    info->clip.nSampleRate = rate;
    info->clip.nBitsPerSample = bits;
    node->bitrate = bitrate;
    node->sampleRateOrWidth = rate;
    node->bitsOrFrameRate = bits;
    return MM_OK;
}

// The bit reader state of the configuration syntax.
struct BitCursor {
    const uint8_t* buf;
    int count = 8;
    int pos = 0;
    uint32_t Get(int n) { return GetBits(buf, n, &count, &pos); }
    uint32_t GetWide(int n) {
        uint32_t v = 0;
        while (n > 0) {
            const int step = n > 8 ? 8 : n;
            v = v << step | Get(step);
            n -= step;
        }
        return v;
    }
};

void program_config_element(BitCursor* b) {
    b->Get(4);  // element_instance_tag
    b->Get(2);  // object_type
    b->Get(4);  // sampling_frequency_index
    const uint32_t front = b->Get(4), side = b->Get(4), back = b->Get(4);
    const uint32_t lfe = b->Get(2), assoc = b->Get(3), cc = b->Get(4);
    for (int i = 0; i < 2; ++i) {
        if (b->Get(1)) b->Get(4);  // mono / stereo mixdown
    }
    if (b->Get(1)) b->Get(3);  // matrix mixdown
    for (uint32_t i = 0; i < front + side + back; ++i) b->Get(5);  // is_cpe, tag
    for (uint32_t i = 0; i < lfe + assoc; ++i) b->Get(4);
    for (uint32_t i = 0; i < cc; ++i) b->Get(5);
    if (b->count != 8) {
        b->count = 8;
        b->pos += 1;
    }
    const uint32_t comment = b->Get(8);
    b->pos += static_cast<int>(comment);
}

int32_t GASpecificConfig(BitCursor* b, mp4AudioSpecificConfig* asc) {
    asc->frameLengthFlag = static_cast<uint8_t>(b->Get(1));
    asc->dependsOnCoreCoder = static_cast<uint8_t>(b->Get(1));
    if (asc->dependsOnCoreCoder) asc->coreCoderDelay = static_cast<uint16_t>(b->GetWide(14));
    asc->extensionFlag = static_cast<uint8_t>(b->Get(1));
    if (asc->channelConfiguration == 0) program_config_element(b);
    return MM_OK;
}

uint32_t ExtensionFrequency(BitCursor* b, uint8_t* index) {
    *index = static_cast<uint8_t>(b->Get(4));
    if (*index == 15) return b->GetWide(24);
    return *index < 12 ? kSamplingFrequencies[*index] : 0;
}

}  // namespace

size_t AnaBaseDescriptor(const uint8_t* descriptor, size_t avail) {
    size_t length = 1;
    while (length < avail && (descriptor[length] & 0x80) != 0) ++length;
    return length + 1;
}

int32_t AudioSpecificConfig(const uint8_t* bits, mp4AudioSpecificConfig* asc, const Quirks& quirks) {
    if (bits == nullptr) return -7;
    if (asc == nullptr) return -8;
    std::memset(asc, 0, sizeof *asc);
    BitCursor b{bits};
    asc->audioObjectType = static_cast<uint8_t>(b.Get(5));
    asc->samplingFrequencyIndex = static_cast<uint8_t>(b.Get(4));
    asc->channelConfiguration = static_cast<uint8_t>(b.Get(4));
    if (asc->samplingFrequencyIndex > 11 || kSamplingFrequencies[asc->samplingFrequencyIndex] == 0) {
        asc->samplingFrequency = 0;
        return -2;
    }
    asc->samplingFrequency = kSamplingFrequencies[asc->samplingFrequencyIndex];
    if (asc->channelConfiguration >= 8) return -3;
    asc->sbrPresentFlag = -1;
    if (asc->audioObjectType == 29 && !quirks.aacPsConfigUnread) asc->psPresentFlag = 1;
    if (asc->audioObjectType == 5 || asc->psPresentFlag == 1) {
        asc->sbrPresentFlag = 1;
        asc->samplingFrequency = ExtensionFrequency(&b, &asc->samplingFrequencyIndex);
        asc->audioObjectType = static_cast<uint8_t>(b.Get(5));
    }
    switch (asc->audioObjectType) {
        case 1:
        case 2:
        case 3:
        case 4:
        case 6:
        case 7:
            if (GASpecificConfig(&b, asc) != MM_OK) return -3;
            break;
        default: return -4;
    }
    if (asc->audioObjectType != 5 && b.GetWide(11) == 0x2B7) {
        asc->audioObjectType = static_cast<uint8_t>(b.Get(5));
        if (asc->audioObjectType == 5) {
            asc->sbrPresentFlag = static_cast<int8_t>(b.Get(1));
            if (asc->sbrPresentFlag == 0) return MM_OK;
            uint8_t index = 0;
            asc->samplingFrequency = ExtensionFrequency(&b, &index);
            if (b.GetWide(11) == 0x548) asc->psPresentFlag = static_cast<uint8_t>(b.Get(1));
        }
    }
    if (asc->sbrPresentFlag == -1 && asc->samplingFrequency <= 24000) {
        // Implicit SBR doubles the decoded rate only; the codec stays plain AAC.
        asc->implicitSbr = 1;
        asc->samplingFrequency *= 2;
    }
    return MM_OK;
}

int32_t ReadEsds(const uint8_t* esds, size_t avail, EsdsFields* fields) {
    _MP4BOX box;
    const int header = AnaBox(esds, avail, &box);
    if (header == 0 || box.type != FourCC("esds")) return kMp4BadEntry;
    ByteReader r(esds, avail);
    if (!r.Seek(12)) return MM_E_FAIL;
    // ES descriptor: ES_ID, flags, and the depended-on ES_ID when flagged.
    if (!r.Skip(AnaBaseDescriptor(esds + r.position(), r.remaining()) + 2)) return MM_E_FAIL;
    uint8_t flags = 0;
    if (!r.U8(&flags)) return MM_E_FAIL;
    if ((flags & 0x80) != 0 && !r.Skip(2)) return MM_E_FAIL;
    // Decoder configuration descriptor.
    if (!r.Skip(AnaBaseDescriptor(esds + r.position(), r.remaining()))) return MM_E_FAIL;
    const size_t oti = r.position();
    if (!r.U8(&fields->objectType) || !r.Skip(4) || !r.BE32(&fields->maxBitrate) || !r.BE32(&fields->avgBitrate))
        return MM_E_FAIL;
    // Decoder-specific information, 13 bytes after the object type.
    if (r.Seek(oti + 13) && !r.empty() && r.Skip(AnaBaseDescriptor(esds + r.position(), r.remaining()))) {
        fields->dsi = esds + r.position();
        fields->dsiAvail = r.remaining();
    }
    return MM_OK;
}

int32_t AnaESDBox(const uint8_t* esds, size_t avail, int kind, _ME_ClipInfoEx* info) {
    MP4TrackNode* node = CurrentTrack(info);
    if (node == nullptr) return MM_E_FAIL;
    EsdsFields fields;
    const int32_t read = ReadEsds(esds, avail, &fields);
    if (read != MM_OK) return read;
    const uint8_t objectType = fields.objectType;
    const uint32_t avgBitrate = fields.avgBitrate;
    if (kind == kVideo) {
        info->clip.nVideoBitrate = avgBitrate;
        node->bitrate = avgBitrate;
        return MM_OK;
    }
    info->clip.nAudioBitrate = avgBitrate;
    node->bitrate = avgBitrate;
    if (fields.dsi == nullptr) return MM_E_FAIL;
    ByteReader r(fields.dsi, fields.dsiAvail);
    const uint8_t* payload = fields.dsi;
    if (objectType == 0xE1) return AnaQLCM(payload, r.remaining(), info, node);
    // The bit syntax reads without bounds of its own: a zero-padded copy
    // holds more than the longest configuration can reach.
    uint8_t bits[kAscBufferSize] = {0};
    std::memcpy(bits, payload, r.remaining() < sizeof bits ? r.remaining() : sizeof bits);
    mp4AudioSpecificConfig asc;
    AudioSpecificConfig(bits, &asc, kContract);
    node->codec = asc.sbrPresentFlag == 1 ? CODEC_MP4AUDIO_MP4A_AAC_PLUS_V1 : CODEC_MP4AUDIO_MP4A_AAC;
    switch (asc.audioObjectType) {
        case 1: node->codecDetail = PROFILE_AAC_MAIN; break;
        case 2:
        case 5: node->codecDetail = PROFILE_AAC_LC; break;
        case 3: node->codecDetail = PROFILE_AAC_SSR; break;
        default: node->codecDetail = CODEC_NODEFINE; break;
    }
    return MM_OK;
}

int32_t AnaStsd(int h, uint32_t /*handlerType*/, _ME_ClipInfoEx* info) {
    BoxBuffer buf;
    uint32_t size = 0;
    const int32_t result = ReadWholeBox(h, FourCC("stsd"), kMp4BadContainer, MM_E_OUTOFMEMORY, &buf, &size);
    if (result != MM_OK) return result;
    MP4TrackNode* node = CurrentTrack(info);
    if (node == nullptr) return MM_E_FAIL;
    _MP4FULLBOX full;
    const size_t at = static_cast<size_t>(AnaFullBox(buf.data, buf.size, &full));
    if (at == 0 || buf.size < static_cast<size_t>(at) + 4) return MM_E_FAIL;
    // Only the first sample entry is interpreted: the cursor has always
    // advanced by the whole box after it.
    if (ReadBE32(buf.data + at) == 0) return MM_OK;
    const Entry e{buf.data + at + 4, buf.size - at - 4};
    _MP4BOX entry;
    if (AnaBox(e.data, e.avail, &entry) == 0) return MM_E_FAIL;
    if (info->truth != nullptr && info->truth->Track() != nullptr)
        SampleEntryFacts(e.data, e.avail, info->truth->Track());
    _MMClipInfo& clip = info->clip;
    switch (entry.type) {
        case FourCC("mp4a"): ++clip.bHasAudio; return AnaMp4aSampleEntry(e, info, node);
        case FourCC("samr"): ++clip.bHasAudio; return AnaAmrSampleEntry(e, CODEC_MP4AUDIO_SAMR, info, node);
        case FourCC("sawb"): ++clip.bHasAudio; return AnaAmrSampleEntry(e, CODEC_MP4AUDIO_SAWB, info, node);
        case FourCC("sawp"): ++clip.bHasAudio; return AnaAmrWPSampleEntry(e, info, node);
        // EVRC-B and EVRC wideband report plain EVRC.
        case FourCC("sevc"):
        case FourCC("secb"):
        case FourCC("secw"): ++clip.bHasAudio; return AnaSpeechSampleEntry(CODEC_EVRC, info, node);
        case FourCC("sqcp"): ++clip.bHasAudio; return AnaSpeechSampleEntry(CODEC_QCELP, info, node);
        case FourCC("mp4v"): ++clip.bHasVideo; return AnaMp4vSampleEntry(e, info, node);
        case FourCC("s263"): ++clip.bHasVideo; return AnaS263SampleEntry(e, info, node);
        case FourCC("avc1"): ++clip.bHasVideo; return AnaAvc1SampleEntry(e, info, node);
        default: return MM_OK;
    }
}

namespace {

// Sum of n big-endian 32-bit sample sizes from the current position, read in
// blocks.
uint64_t SumSampleSizes(int h, uint64_t n) {
    constexpr size_t kBlock = 16384;
    uint8_t block[kBlock * 4];
    uint64_t total = 0;
    while (n > 0) {
        const size_t want = n < kBlock ? static_cast<size_t>(n) : kBlock;
        // Counted in bytes: a protected file's reads answer bytes, not items.
        const int got = MEx_fread(block, 1, static_cast<unsigned>(want * 4), h);
        const size_t entries = got > 0 ? static_cast<size_t>(got) / 4 : 0;
        for (size_t i = 0; i < entries; ++i) total += ReadBE32(block + 4 * i);
        n -= entries;
        if (entries < want) break;
    }
    return total;
}

// The bytes of all samples: the one size times the count, or the table summed.
uint64_t StreamBytes(int h, uint64_t held, uint32_t sampleSize, uint32_t sampleCount) {
    if (sampleSize != 0) return uint64_t(sampleSize) * sampleCount;
    const uint64_t entries = (held - 20) / 4;
    return SumSampleSizes(h, sampleCount < entries ? sampleCount : entries);
}

}  // namespace

int32_t AnaStsz(int h, uint32_t handlerType, _ME_ClipInfoEx* info) {
    const int64_t start = Tell(h);
    _BOXHEADER header{};
    getBoxHeader(h, &header);
    // Error codes the other way round from the other readers, as callers know them.
    if (header.type != FourCC("stsz") || BadBoxSize(header.size)) return kMp4BadEntry;
    const uint64_t held = BytesHeld(start, header.size);
    if (held < 20) return MM_E_FAIL;
    uint8_t fields[12] = {};
    SeekTo(h, start + 8);
    if (MEx_fread(fields, 1, sizeof fields, h) != static_cast<int>(sizeof fields)) return MM_E_FAIL;
    const uint32_t sampleSize = ReadBE32(fields + 4);
    const uint32_t sampleCount = ReadBE32(fields + 8);
    Mp4TrackTruth* truth = info->truth != nullptr ? info->truth->Track() : nullptr;
    if (truth != nullptr) {
        truth->sampleBytes = StreamBytes(h, held, sampleSize, sampleCount);
        truth->bytesKnown = true;
    }
    const int32_t duration = static_cast<int32_t>(info->clip.nDuration);
    if (duration <= 0) return MM_OK;
    MP4TrackNode* node = CurrentTrack(info);
    const bool video = handlerType == FourCC("vide");
    const bool audio = handlerType == FourCC("soun");
    if (video) {
        const int32_t frameRate = static_cast<int32_t>(sampleCount) / duration;
        info->clip.nFrameRate = static_cast<uint32_t>(frameRate);
        if (node != nullptr) node->bitsOrFrameRate = static_cast<uint32_t>(frameRate);
    }
    // The sum only feeds a bit rate the sample entry left unknown.
    uint32_t* field = video ? &info->clip.nVideoBitrate : audio ? &info->clip.nAudioBitrate : nullptr;
    if (field == nullptr || *field != 0 || info->codecOnly) return MM_OK;
    // 32-bit arithmetic, wrapping as it always has.
    const auto total =
        static_cast<uint32_t>(truth != nullptr ? truth->sampleBytes : StreamBytes(h, held, sampleSize, sampleCount));
    const int32_t bits = static_cast<int32_t>(total * 8u);
    *field = static_cast<uint32_t>(bits / duration);
    if (node != nullptr) node->bitrate = *field;
    return MM_OK;
}

}  // namespace metainfo
