#include "aiff/aiff_facts.h"

#include <cmath>
#include <cstring>
#include <new>
#include <string>
#include <vector>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/text.h"
#include "metainfo/metainfo.h"
#include "mp3/id3_facts.h"

namespace metainfo {
namespace {

constexpr int kMaxChunks = 4096;
constexpr uint64_t kMaxText = uint64_t{64} << 10;
constexpr size_t kCommBytes = 22;  // channels, frames, bits, rate, compression type

struct Aiff {
    bool aifc = false, haveComm = false, haveData = false;
    uint16_t channels = 0, bits = 0;
    uint32_t frames = 0;
    double rate = 0;
    char compression[5] = "NONE";
    uint64_t id3Offset = 0;  // of an "ID3 " chunk's tag; 0 when none
};

// The 80-bit extended float of the sample rate: sign and 15-bit exponent,
// then a 64-bit mantissa with its integer bit stated.
double Extended(const uint8_t* p) {
    const int exponent = ((p[0] & 0x7F) << 8 | p[1]) - 16383 - 63;
    const double value = std::ldexp(static_cast<double>(ReadBE64(p + 2)), exponent);
    return (p[0] & 0x80) != 0 ? -value : value;
}

void ReadComm(const std::vector<uint8_t>& b, Aiff* a) {
    if (b.size() < 18) return;
    a->haveComm = true;
    a->channels = ReadBE16(b.data());
    a->frames = ReadBE32(b.data() + 2);
    a->bits = ReadBE16(b.data() + 6);
    a->rate = Extended(b.data() + 8);
    if (a->aifc && b.size() >= kCommBytes) std::memcpy(a->compression, b.data() + 18, 4);
}

void ReadText(const char* id, const std::vector<uint8_t>& b, TagFacts* t) {
    const std::string value = TrimText(Utf8OrLatin1(b.data(), b.size()));
    if (value.empty()) return;
    if (std::memcmp(id, "NAME", 4) == 0) t->title = value;
    if (std::memcmp(id, "AUTH", 4) == 0) t->artist = value;
    if (std::memcmp(id, "ANNO", 4) == 0) t->comment = t->comment.empty() ? value : t->comment + ";" + value;
    if (std::memcmp(id, "(c) ", 4) == 0) t->extra.emplace_back("COPYRIGHT", value);
}

bool IsText(const char* id) {
    return std::memcmp(id, "NAME", 4) == 0 || std::memcmp(id, "AUTH", 4) == 0 || std::memcmp(id, "ANNO", 4) == 0 ||
           std::memcmp(id, "(c) ", 4) == 0;
}

void WalkChunks(int h, uint64_t end, Aiff* a, TagFacts* t) {
    uint64_t at = 12;
    std::vector<uint8_t> b;
    for (int i = 0; i < kMaxChunks && at + 8 <= end && ReadExactAt(h, at, 8, &b); ++i) {
        char id[4];
        std::memcpy(id, b.data(), 4);
        const uint64_t size = ReadBE32(b.data() + 4);
        const uint64_t body = at + 8;
        const uint64_t inFile = size < end - body ? size : end - body;
        if (std::memcmp(id, "COMM", 4) == 0 && !a->haveComm) {
            if (ReadExactAt(h, body, inFile < kCommBytes ? static_cast<size_t>(inFile) : kCommBytes, &b))
                ReadComm(b, a);
        } else if (std::memcmp(id, "SSND", 4) == 0) {
            a->haveData = true;
        } else if ((std::memcmp(id, "ID3 ", 4) == 0 || std::memcmp(id, "id3 ", 4) == 0) && a->id3Offset == 0) {
            a->id3Offset = body;
        } else if (IsText(id) && size <= kMaxText && size == inFile &&
                   ReadExactAt(h, body, static_cast<size_t>(size), &b)) {
            ReadText(id, b, t);
        }
        if (size > end - body) break;
        at = body + size + (size & 1);
    }
}

struct Codec {
    const char* type;
    const char* name;
    uint32_t bits;  // per sample as ffprobe counts them; 0: the COMM's
};

const Codec kCodecs[] = {{"sowt", "pcm_s16le", 16},  {"fl32", "pcm_f32be", 32}, {"FL32", "pcm_f32be", 32},
                         {"fl64", "pcm_f64be", 64},  {"FL64", "pcm_f64be", 64}, {"ulaw", "pcm_mulaw", 8},
                         {"ULAW", "pcm_mulaw", 8},   {"alaw", "pcm_alaw", 8},   {"ALAW", "pcm_alaw", 8},
                         {"ima4", "adpcm_ima_qt", 4}};

const char* PcmName(uint16_t bits) {
    if (bits <= 8) return "pcm_s8";
    if (bits <= 16) return "pcm_s16be";
    if (bits <= 24) return "pcm_s24be";
    return bits <= 32 ? "pcm_s32be" : "";
}

void FillStream(const Aiff& a, MediaFacts* f) {
    StreamFacts s;
    s.channels = a.channels;
    s.sampleRate = a.rate > 0 && a.rate < 4294967295.0 ? static_cast<uint32_t>(std::lround(a.rate)) : 0;
    s.bitsPerSample = a.bits;
    if (std::memcmp(a.compression, "NONE", 4) == 0 || std::memcmp(a.compression, "twos", 4) == 0) {
        s.codec = PcmName(a.bits);
        s.bitsPerSample = (a.bits + 7u) / 8u * 8u;
    }
    for (const Codec& c : kCodecs) {
        if (std::memcmp(a.compression, c.type, 4) == 0) {
            s.codec = c.name;
            s.bitsPerSample = c.bits;
        }
    }
    // IMA4 counts packets of 64 samples (34 bytes a channel) in its frames.
    const bool ima4 = std::memcmp(a.compression, "ima4", 4) == 0;
    s.bitRate = ima4 ? uint64_t{34} * 8 * s.channels * s.sampleRate / 64
                     : uint64_t{s.bitsPerSample} * s.channels * s.sampleRate;
    if (s.sampleRate != 0) {  // a rate below 1 Hz would put the length past what a count holds
        const double samples = static_cast<double>(a.frames) * (ima4 ? 64 : 1);
        f->durationUs = static_cast<int64_t>(std::floor(samples * 1e6 / a.rate));
        f->durationExact = true;
    }
    f->bitRate = s.bitRate;
    f->streams.push_back(s);
}

}  // namespace

bool LooksLikeAiff(const char* /*path*/, const uint8_t* head, size_t n) {
    return n >= 12 && BytesEqual(head, "FORM", 4) &&
           (BytesEqual(head + 8, "AIFF", 4) || BytesEqual(head + 8, "AIFC", 4));
}

int32_t AiffFacts(const char* path, int /*type*/, MediaFacts* f) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return MM_E_FAIL;
    Aiff a;
    {
        FileCloser closer(h);
        uint64_t size = 0;
        std::vector<uint8_t> b;
        if (!OpenedFileSize(h, path, &size) || !ReadExactAt(h, 0, 12, &b) || !LooksLikeAiff(path, b.data(), b.size()))
            return MM_E_FAIL;
        a.aifc = BytesEqual(b.data() + 8, "AIFC", 4);
        // The FORM size bounds the walk; a short file ends it sooner.
        const uint64_t form = uint64_t{ReadBE32(b.data() + 4)} + 8;
        try {
            WalkChunks(h, form < size ? form : size, &a, &f->tags);
        } catch (const std::bad_alloc&) {
            return MM_E_OUTOFMEMORY;
        }
    }
    if (!a.haveComm) return MM_E_FAIL;
    // An ID3 tag says more than the text chunks, and wins.
    if (a.id3Offset != 0) {
        TagFacts id3;
        if (!ReadId3FactsAt(path, a.id3Offset, &id3, &f->pictures)) return MM_E_OUTOFMEMORY;
        id3.FillFrom(f->tags);
        f->tags = id3;
    }
    f->format = "aiff";
    f->mime = "audio/aiff";
    FillStream(a, f);
    return MM_OK;
}

}  // namespace metainfo
