#include "speech/wave_facts.h"

#include <cstring>
#include <vector>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/text.h"
#include "mp3/id3_facts.h"
#include "metainfo/records.h"
#include "probe/contract_facts.h"

namespace metainfo {
namespace {

constexpr size_t kMaxChunkBody = 64;  // of "fmt ", "ds64" and "fact": what is read of them
constexpr uint64_t kMaxInfoList = uint64_t{64} << 10;
constexpr int kMaxChunks = 4096;
constexpr uint16_t kExtensible = 0xFFFE;

struct WaveChunks {
    bool haveFormat = false;
    uint16_t tag = 0, channels = 0, blockAlign = 0, bits = 0, samplesPerBlock = 0;
    uint32_t rate = 0, byteRate = 0;
    std::vector<uint8_t> format;  // the "fmt " body as stored (its first kMaxChunkBody bytes)
    bool haveData = false;
    uint64_t dataOffset = 0;
    uint64_t dataSize = 0;
    uint64_t factSamples = 0;
    bool haveFact = false;
    uint64_t ds64Data = 0, ds64Samples = 0;
    uint64_t id3Offset = 0;  // of an "id3 " chunk's tag; 0 when none
};

void ReadFormat(const uint8_t* b, size_t n, WaveChunks* w) {
    if (n < 16) return;
    w->haveFormat = true;
    w->format.assign(b, b + n);
    w->tag = ReadLE16(b);
    w->channels = ReadLE16(b + 2);
    w->rate = ReadLE32(b + 4);
    w->byteRate = ReadLE32(b + 8);
    w->blockAlign = ReadLE16(b + 12);
    w->bits = ReadLE16(b + 14);
    const uint16_t extra = n >= 18 ? ReadLE16(b + 16) : 0;
    // The extension holds samples per block (ADPCM) or valid bits and the
    // sub-format GUID, whose first two bytes are the real format tag.
    if (extra >= 2 && n >= 20) w->samplesPerBlock = ReadLE16(b + 18);
    if (w->tag == kExtensible && extra >= 22 && n >= 26) w->tag = ReadLE16(b + 24);
}

// The INFO list's texts: Latin-1 by tradition, UTF-8 from newer writers.
void ReadInfoList(const uint8_t* b, size_t n, TagFacts* t) {
    static const struct {
        const char* id;
        std::string TagFacts::*field;
    } kNamed[] = {{"INAM", &TagFacts::title},   {"IART", &TagFacts::artist}, {"IPRD", &TagFacts::album},
                  {"ICMT", &TagFacts::comment}, {"IGNR", &TagFacts::genre},  {"ICRD", &TagFacts::date},
                  {"IMUS", &TagFacts::composer}};
    size_t at = 4;  // after "INFO"
    while (at + 8 <= n) {
        const uint32_t size = ReadLE32(b + at + 4);
        if (size > n - at - 8) break;
        const std::string id(reinterpret_cast<const char*>(b + at), 4);
        const std::string value = TrimText(Utf8OrLatin1(b + at + 8, size));
        bool named = false;
        for (const auto& k : kNamed) {
            if (id == k.id) {
                t->*k.field = value;
                named = true;
            }
        }
        if (id == "ITRK" || id == "IPRT") {
            SplitNumberPair(value, &t->track, &t->trackTotal);
        } else if (!named && !value.empty()) {
            t->extra.emplace_back(id, value);
        }
        at += 8 + static_cast<size_t>(size) + (size & 1);
    }
    if (t->date.size() >= 4) {
        const std::string year = t->date.substr(0, 4);
        if (year.find_first_not_of("0123456789") == std::string::npos) t->year = std::stoi(year);
    }
}

bool ReadBody(int h, uint64_t at, uint64_t want, uint8_t* out, size_t* got) {
    if (!SeekToOffset(h, at)) return false;
    const int n = MEx_fread(out, 1, static_cast<unsigned>(want), h);
    *got = n > 0 ? static_cast<size_t>(n) : 0;
    return true;
}

void ReadChunk(int h, const char* id, uint64_t body, uint64_t size, uint64_t fileSize, WaveChunks* w, TagFacts* t) {
    uint8_t small[kMaxChunkBody];
    size_t got = 0;
    const uint64_t want = size < kMaxChunkBody ? size : kMaxChunkBody;
    if (std::memcmp(id, "fmt ", 4) == 0 && ReadBody(h, body, want, small, &got)) {
        ReadFormat(small, got, w);
    } else if (std::memcmp(id, "ds64", 4) == 0 && ReadBody(h, body, want, small, &got) && got >= 24) {
        w->ds64Data = ReadLE64(small + 8);
        w->ds64Samples = ReadLE64(small + 16);
    } else if (std::memcmp(id, "fact", 4) == 0 && ReadBody(h, body, want, small, &got) && got >= 4) {
        w->haveFact = true;
        w->factSamples = ReadLE32(small);
    } else if ((std::memcmp(id, "id3 ", 4) == 0 || std::memcmp(id, "ID3 ", 4) == 0) && w->id3Offset == 0) {
        w->id3Offset = body;
    } else if (std::memcmp(id, "LIST", 4) == 0 && size >= 4 && size <= kMaxInfoList && body + size <= fileSize) {
        std::string list(static_cast<size_t>(size), '\0');
        auto* bytes = reinterpret_cast<uint8_t*>(&list[0]);
        if (ReadBody(h, body, size, bytes, &got) && got == size && BytesEqual(bytes, "INFO", 4))
            ReadInfoList(bytes, got, t);
    }
}

// Walks every chunk after the RIFF header; the data chunk's size, when it
// states more than the file holds, is cut to what is there.
void WalkChunks(int h, uint64_t fileSize, bool rf64, WaveChunks* w, TagFacts* t) {
    uint64_t at = 12;
    for (int i = 0; i < kMaxChunks && at + 8 <= fileSize; ++i) {
        uint8_t header[8];
        size_t got = 0;
        if (!ReadBody(h, at, 8, header, &got) || got != 8) break;
        const char* id = reinterpret_cast<const char*>(header);
        uint64_t size = ReadLE32(header + 4);
        const uint64_t body = at + 8;
        if (std::memcmp(id, "data", 4) == 0) {
            if (rf64 && size == 0xFFFFFFFFu) size = w->ds64Data;
            if (size > fileSize - body) size = fileSize - body;
            w->haveData = true;
            w->dataOffset = body;
            w->dataSize = size;
        } else {
            ReadChunk(h, id, body, size, fileSize, w, t);
        }
        if (size > fileSize - body) break;
        at = body + size + (size & 1);
    }
}

struct Codec {
    uint16_t tag;
    const char* name;
};

const char* CodecName(const WaveChunks& w) {
    static const Codec kCodecs[] = {{2, "adpcm_ms"},         {6, "pcm_alaw"},  {7, "pcm_mulaw"},
                                    {0x11, "adpcm_ima_wav"}, {0x31, "gsm_ms"}, {0x50, "mp2"},
                                    {0x55, "mp3"},           {0x161, "wmav2"}, {0x2000, "ac3"}};
    if (w.tag == 1) {
        switch (w.bits) {
            case 8: return "pcm_u8";
            case 16: return "pcm_s16le";
            case 24: return "pcm_s24le";
            case 32: return "pcm_s32le";
            default: return "";
        }
    }
    if (w.tag == 3) return w.bits == 64 ? "pcm_f64le" : "pcm_f32le";
    for (const Codec& c : kCodecs) {
        if (c.tag == w.tag) return c.name;
    }
    return "";
}

bool CompressedTag(uint16_t tag) { return tag == 0x50 || tag == 0x55 || tag == 0x161 || tag == 0x2000; }

// Samples of the data: PCM-like formats by block, ADPCM by its fact chunk or
// by whole blocks of samplesPerBlock, else from the byte rate.
int64_t DurationUs(const WaveChunks& w, bool* exact) {
    *exact = true;
    uint64_t samples = 0;
    if (w.ds64Samples != 0) {
        samples = w.ds64Samples;
    } else if (w.haveFact && w.tag != 1 && w.tag != 3 && w.factSamples != 0) {
        samples = w.factSamples;
    } else if ((w.tag == 1 || w.tag == 3 || w.tag == 6 || w.tag == 7) && w.blockAlign != 0) {
        samples = w.dataSize / w.blockAlign;
    } else if (w.samplesPerBlock != 0 && w.blockAlign != 0) {
        samples = w.dataSize / w.blockAlign * w.samplesPerBlock;
    } else if (w.byteRate != 0) {
        *exact = false;
        return static_cast<int64_t>(w.dataSize * 1000000 / w.byteRate);
    } else {
        return -1;
    }
    if (w.rate == 0) return -1;
    return static_cast<int64_t>(samples * 1000000 / w.rate);
}

// Opens a RIFF or RF64 WAVE file and walks its chunks; false without a format
// and a data chunk.
bool WalkWave(const char* path, WaveChunks* w, TagFacts* t) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return false;
    FileCloser closer(h);
    uint64_t size = 0;
    uint8_t head[12];
    if (!OpenedFileSize(h, path, &size) || MEx_fread(head, 1, sizeof head, h) != static_cast<int>(sizeof head))
        return false;
    const bool rf64 = IsRf64Wave(head, sizeof head);
    if (!rf64 && !(BytesEqual(head, "RIFF", 4) && BytesEqual(head + 8, "WAVE", 4))) return false;
    WalkChunks(h, size, rf64, w, t);
    return w->haveFormat && w->haveData;
}

}  // namespace

bool ReadWaveLayout(const char* path, WaveLayout* layout) {
    WaveChunks w;
    TagFacts unused;
    if (!WalkWave(path, &w, &unused) || w.blockAlign == 0 || w.rate == 0) return false;
    layout->format = w.format;
    layout->dataOffset = w.dataOffset;
    layout->dataSize = w.dataSize - w.dataSize % w.blockAlign;
    layout->blockAlign = w.blockAlign;
    layout->rate = w.rate;
    const bool adpcm = w.tag == 2 || w.tag == 0x11;
    layout->samplesPerBlock = adpcm ? w.samplesPerBlock : 1;
    layout->pcm = w.tag == 1 || w.tag == 3 || w.tag == 6 || w.tag == 7;
    return layout->samplesPerBlock != 0;
}

bool IsRf64Wave(const uint8_t* head, size_t n) {
    return n >= 12 && (BytesEqual(head, "RF64", 4) || BytesEqual(head, "BW64", 4)) && BytesEqual(head + 8, "WAVE", 4);
}

int32_t WaveFacts(const char* path, MediaFacts* f) {
    WaveChunks w;
    if (!WalkWave(path, &w, &f->tags)) return MM_E_FAIL;

    // An ID3 tag in its own chunk says more than the INFO list, and wins.
    if (w.id3Offset != 0) {
        TagFacts id3;
        if (!ReadId3FactsAt(path, w.id3Offset, &id3, &f->pictures)) return MM_E_OUTOFMEMORY;
        id3.FillFrom(f->tags);
        f->tags = id3;
    }
    f->format = "wav";
    f->mime = "audio/wav";
    StreamFacts s;
    s.codec = CodecName(w);
    s.sampleRate = w.rate;
    s.channels = w.channels;
    s.bitsPerSample = CompressedTag(w.tag) ? 0 : w.bits;
    // ADPCM writers state byte rates loosely; its blocks tell the real one.
    s.bitRate = w.samplesPerBlock != 0 && (w.tag == 2 || w.tag == 0x11)
                    ? static_cast<uint64_t>(w.blockAlign) * 8 * w.rate / w.samplesPerBlock
                    : static_cast<uint64_t>(w.byteRate) * 8;
    f->durationUs = DurationUs(w, &f->durationExact);
    f->bitRate = s.bitRate;
    f->streams.push_back(s);
    return MM_OK;
}

}  // namespace metainfo
