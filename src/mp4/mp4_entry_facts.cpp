// A track's first sample entry as the accurate reader tells it: the codec in
// ffprobe's words, its profile and level, and the stream's shape, from the
// entry and the codec boxes inside it.
#include <cmath>
#include <cstring>

#include "core/byte_reader.h"
#include "mp4/codec_records.h"
#include "mp4/mp4_internal.h"
#include "mp4/mp4_truth.h"

namespace metainfo {
namespace {

// Bytes of one box: every read checked against what is held.
struct View {
    const uint8_t* data;
    size_t size;
    bool Has(uint64_t at, uint64_t n) const { return at <= size && n <= size - at; }
    uint8_t U8(uint64_t at) const { return Has(at, 1) ? data[at] : 0; }
    uint16_t U16(uint64_t at) const { return Has(at, 2) ? ReadBE16(data + at) : 0; }
    uint32_t U32(uint64_t at) const { return Has(at, 4) ? ReadBE32(data + at) : 0; }
    View From(uint64_t at) const { return Has(at, 0) ? View{data + at, size - at} : View{data, 0}; }
};

// The child box of the given type among the boxes from offset on; its
// content (after the 8-byte header) in *found.
bool FindChild(const View& v, uint64_t offset, uint32_t type, View* found) {
    for (uint64_t at = offset; v.Has(at, 8);) {
        const uint32_t size = v.U32(at);
        if (size < 8 || !v.Has(at, size)) return false;
        if (v.U32(at + 4) == type) {
            *found = View{v.data + at + 8, size - 8};
            return true;
        }
        at += size;
    }
    return false;
}

struct Named {
    uint32_t code;
    const char* name;
};

const char* Lookup(const Named* table, size_t n, uint32_t code) {
    for (size_t i = 0; i < n; ++i) {
        if (table[i].code == code) return table[i].name;
    }
    return nullptr;
}

// Sample entry types whose codec needs no codec box.
constexpr Named kEntryCodecs[] = {
    {FourCC("samr"), "amr_nb"},    {FourCC("sawb"), "amr_wb"},    {FourCC("Opus"), "opus"},
    {FourCC("fLaC"), "flac"},      {FourCC("alac"), "alac"},      {FourCC("ac-3"), "ac3"},
    {FourCC("ec-3"), "eac3"},      {FourCC(".mp3"), "mp3"},       {FourCC("sowt"), "pcm_s16le"},
    {FourCC("twos"), "pcm_s16be"}, {FourCC("in24"), "pcm_s24be"}, {FourCC("in32"), "pcm_s32be"},
    {FourCC("fl32"), "pcm_f32be"}, {FourCC("fl64"), "pcm_f64be"}, {FourCC("raw "), "pcm_u8"},
    {FourCC("ulaw"), "pcm_mulaw"}, {FourCC("alaw"), "pcm_alaw"},  {FourCC("sqcp"), "qcelp"},
    {FourCC("sevc"), "evrc"},      {FourCC("avc1"), "h264"},      {FourCC("avc3"), "h264"},
    {FourCC("hvc1"), "hevc"},      {FourCC("hev1"), "hevc"},      {FourCC("dvh1"), "hevc"},
    {FourCC("dvhe"), "hevc"},      {FourCC("av01"), "av1"},       {FourCC("vp09"), "vp9"},
    {FourCC("vp08"), "vp8"},       {FourCC("s263"), "h263"},      {FourCC("h263"), "h263"},
    {FourCC("jpeg"), "mjpeg"},     {FourCC("mjpa"), "mjpeg"},     {FourCC("png "), "png"},
    {FourCC("apch"), "prores"},    {FourCC("apcn"), "prores"},    {FourCC("apcs"), "prores"},
    {FourCC("apco"), "prores"},    {FourCC("ap4h"), "prores"},    {FourCC("mp4v"), "mpeg4"},
    {FourCC("mp4a"), "aac"},
};

// MPEG-4 object types of "esds" in ffprobe's words.
constexpr Named kObjectTypes[] = {
    {0x20, "mpeg4"},      {0x21, "h264"},       {0x23, "hevc"},       {0x40, "aac"},        {0x60, "mpeg2video"},
    {0x61, "mpeg2video"}, {0x62, "mpeg2video"}, {0x63, "mpeg2video"}, {0x64, "mpeg2video"}, {0x65, "mpeg2video"},
    {0x66, "aac"},        {0x67, "aac"},        {0x68, "aac"},        {0x69, "mp3"},        {0x6A, "mpeg1video"},
    {0x6B, "mp3"},        {0x6C, "mjpeg"},      {0xA5, "ac3"},        {0xA6, "eac3"},       {0xA9, "dts"},
    {0xAD, "opus"},       {0xDD, "vorbis"},     {0xE1, "qcelp"},
};

const uint32_t kAacChannels[8] = {0, 1, 2, 3, 4, 5, 6, 8};

void AacFacts(const EsdsFields& esds, StreamFacts* s) {
    if (esds.dsi == nullptr) return;
    uint8_t bits[kAscBufferSize] = {0};
    std::memcpy(bits, esds.dsi, esds.dsiAvail < sizeof bits ? esds.dsiAvail : sizeof bits);
    mp4AudioSpecificConfig asc;
    if (AudioSpecificConfig(bits, &asc, kAccurate) != MM_OK && asc.samplingFrequency == 0) return;
    // A rate of 24 kHz or less may hide SBR that only the stream tells; the
    // configuration's own rate is what it states.
    s->sampleRate = asc.implicitSbr != 0 ? asc.samplingFrequency / 2 : asc.samplingFrequency;
    if (asc.channelConfiguration != 0) s->channels = kAacChannels[asc.channelConfiguration];
    if (asc.psPresentFlag == 1) s->channels = 2;  // parametric stereo decodes to two channels
    const char* profile = AacProfileName(asc);
    if (profile != nullptr) s->profile = profile;
}

void EsdsFacts(const View& esdsBox, StreamFacts* s, uint64_t* declared) {
    EsdsFields esds;
    if (ReadEsds(esdsBox.data - 8, esdsBox.size + 8, &esds) != MM_OK) return;
    const char* codec = Lookup(kObjectTypes, sizeof kObjectTypes / sizeof *kObjectTypes, esds.objectType);
    if (codec != nullptr) s->codec = codec;
    *declared = esds.avgBitrate;
    if (s->codec == "aac") AacFacts(esds, s);
    if (s->codec == "mpeg4" && esds.dsi != nullptr) Mpeg4VisualFacts(esds.dsi, esds.dsiAvail, s);
}

void VideoCodecBox(const View& v, uint64_t children, StreamFacts* s, uint64_t* declared) {
    View box{nullptr, 0};
    if (FindChild(v, children, FourCC("avcC"), &box)) {
        AvcRecordFacts(box.data, box.size, s);
    } else if (FindChild(v, children, FourCC("hvcC"), &box)) {
        HevcRecordFacts(box.data, box.size, s);
    } else if (FindChild(v, children, FourCC("av1C"), &box)) {
        Av1RecordFacts(box.data, box.size, s);
    } else if (FindChild(v, children, FourCC("vpcC"), &box) && box.Has(0, 6)) {
        s->profile = std::string("Profile ") + char('0' + (box.U8(4) & 7));
    } else if (FindChild(v, children, FourCC("esds"), &box)) {
        EsdsFacts(box, s, declared);
    }
    // A codec box's own rate wins over the generic one.
    if (*declared == 0 && FindChild(v, children, FourCC("btrt"), &box) && box.Has(0, 12)) *declared = box.U32(8);
}

// Codec boxes of audio entries that state rate, channels and depth.
void AudioCodecBox(const View& v, uint64_t children, StreamFacts* s, uint64_t* declared) {
    static const uint32_t kAc3Rates[3] = {48000, 44100, 32000};
    static const uint32_t kAc3Channels[8] = {2, 1, 2, 3, 3, 4, 4, 5};
    static const uint16_t kAc3Kbps[19] = {32,  40,  48,  56,  64,  80,  96,  112, 128, 160,
                                          192, 224, 256, 320, 384, 448, 512, 576, 640};
    View box{nullptr, 0};
    View wave{nullptr, 0};
    // QuickTime keeps the codec boxes of a sound entry inside "wave".
    const bool inWave = FindChild(v, children, FourCC("wave"), &wave) && FindChild(wave, 0, FourCC("esds"), &box);
    if (inWave || FindChild(v, children, FourCC("esds"), &box)) {
        EsdsFacts(box, s, declared);
    } else if (FindChild(v, children, FourCC("dfLa"), &box) && box.Has(0, 26)) {
        // Full-box word, block header, then STREAMINFO: rate 20 bits, channels 3, depth 5.
        const uint32_t word = box.U32(18);
        s->sampleRate = word >> 12;
        s->channels = ((word >> 9) & 7) + 1;
        s->bitsPerSample = ((word >> 4) & 0x1F) + 1;
    } else if (FindChild(v, children, FourCC("alac"), &box) && box.Has(0, 28)) {
        s->bitsPerSample = box.U8(9);
        s->channels = box.U8(13);
        s->sampleRate = box.U32(24);
    } else if (FindChild(v, children, FourCC("dOps"), &box) && box.Has(0, 2)) {
        s->channels = box.U8(1);
        s->sampleRate = 48000;  // Opus always decodes at 48 kHz
    } else if (FindChild(v, children, FourCC("dac3"), &box) && box.Has(0, 3)) {
        const uint32_t bits = uint32_t(box.U8(0)) << 16 | uint32_t(box.U8(1)) << 8 | box.U8(2);
        if ((bits >> 22) < 3) s->sampleRate = kAc3Rates[bits >> 22];
        s->channels = kAc3Channels[(bits >> 11) & 7] + ((bits >> 10) & 1);
        if (((bits >> 5) & 0x1F) < 19) *declared = uint64_t{kAc3Kbps[(bits >> 5) & 0x1F]} * 1000;
    } else if (FindChild(v, children, FourCC("dec3"), &box) && box.Has(0, 5)) {
        *declared = (uint64_t{box.U16(0)} >> 3) * 1000;
        // The first independent substream.
        const uint32_t sub = uint32_t(box.U8(2)) << 16 | uint32_t(box.U8(3)) << 8 | box.U8(4);
        if ((sub >> 22) < 3) s->sampleRate = kAc3Rates[sub >> 22];
        s->channels = kAc3Channels[(sub >> 9) & 7] + ((sub >> 8) & 1);
    }
    // A codec box's own rate wins over the generic one.
    if (*declared == 0 && FindChild(v, children, FourCC("btrt"), &box) && box.Has(0, 12)) *declared = box.U32(8);
}

// PCM names by sign, depth and byte order.
std::string PcmName(bool isFloat, bool bigEndian, bool isSigned, uint32_t bits) {
    if (bits == 0 || bits > 64) return std::string();
    std::string name = std::string("pcm_") + (isFloat ? "f" : isSigned ? "s" : "u") + std::to_string(bits);
    if (bits > 8) name += bigEndian ? "be" : "le";
    return name;
}

void AudioEntryFacts(const View& v, uint32_t type, StreamFacts* s, uint64_t* declared) {
    // Versions 1 and 2 (QuickTime) add 16 and 36 bytes before the children.
    const uint16_t version = v.U16(16);
    s->channels = v.U16(24);
    s->bitsPerSample = v.U16(26);
    s->sampleRate = v.U32(32) >> 16;
    uint64_t children = version == 1 ? 52 : version == 2 ? 72 : 36;
    uint32_t flags = 0;
    if (version == 2 && v.Has(0, 72)) {
        double rate = 0;
        const uint64_t raw = uint64_t(v.U32(40)) << 32 | v.U32(44);
        std::memcpy(&rate, &raw, sizeof rate);
        s->sampleRate = rate > 0 && rate < 1e7 ? static_cast<uint32_t>(std::lround(rate)) : 0;
        s->channels = v.U32(48);
        s->bitsPerSample = v.U32(56);
        flags = v.U32(60);
    }
    if (type == FourCC("lpcm")) {
        s->codec = PcmName((flags & 1) != 0, (flags & 2) != 0, (flags & 4) != 0, s->bitsPerSample);
    } else if (type == FourCC("twos") && s->bitsPerSample == 8) {
        s->codec = "pcm_s8";
    } else if (type == FourCC("raw ") || type == FourCC("ulaw") || type == FourCC("alaw")) {
        s->bitsPerSample = 8;
    } else if (type == FourCC("samr") || type == FourCC("sawb")) {
        s->sampleRate = type == FourCC("samr") ? 8000 : 16000;
        s->channels = 1;
    }
    View enda{nullptr, 0};
    View wave{nullptr, 0};
    if (type == FourCC("in24") || type == FourCC("in32") || type == FourCC("fl32") || type == FourCC("fl64")) {
        // A little-endian flag in "wave/enda" turns the big-endian default round.
        const bool little = FindChild(v, children, FourCC("wave"), &wave) &&
                            FindChild(wave, 0, FourCC("enda"), &enda) && enda.U16(0) != 0;
        if (little) s->codec.replace(s->codec.size() - 2, 2, "le");
        s->bitsPerSample = type == FourCC("in24") ? 24 : type == FourCC("fl64") ? 64 : 32;
    }
    AudioCodecBox(v, children, s, declared);
    // Depth means something for PCM and the lossless codecs only.
    const bool lossless = s->codec == "alac" || s->codec == "flac" || s->codec.compare(0, 4, "pcm_") == 0;
    if (!lossless) s->bitsPerSample = 0;
}

}  // namespace

void SampleEntryFacts(const uint8_t* entry, size_t avail, Mp4TrackTruth* track) {
    const View whole{entry, avail};
    const uint32_t size = whole.U32(0);
    if (size < 16 || !whole.Has(0, 16)) return;
    // The entry's own bytes: at most what it declares.
    const View v{entry, size < avail ? size : avail};
    const uint32_t type = v.U32(4);
    StreamFacts& s = track->stream;
    track->hasEntry = true;
    const char* codec = Lookup(kEntryCodecs, sizeof kEntryCodecs / sizeof *kEntryCodecs, type);
    s.codec = codec != nullptr ? codec : "";
    if (track->handler == FourCC("vide")) {
        s.kind = StreamFacts::kVideo;
        s.width = v.U16(32);
        s.height = v.U16(34);
        VideoCodecBox(v, 86, &s, &track->declaredBitrate);
    } else {
        s.kind = StreamFacts::kAudio;
        AudioEntryFacts(v, type, &s, &track->declaredBitrate);
    }
}

}  // namespace metainfo
