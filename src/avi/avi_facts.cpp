// The accurate facts of an AVI file, from the headers its parser reads.
#include <cstdlib>
#include <cstring>
#include <numeric>

#include "avi/avi_queries.h"
#include "core/facts.h"
#include "core/file_access.h"
#include "metainfo/avi_parser.h"
#include "metainfo/metainfo.h"

namespace metainfo {
namespace {

struct Name {
    const char* key;
    const char* name;
};

// Bitmap compression codes (their four characters, upper-cased) in ffprobe's names.
const char* VideoCodec(uint32_t compression) {
    static const Name kNames[] = {
        {"XVID", "mpeg4"}, {"DIVX", "mpeg4"},     {"DX50", "mpeg4"},     {"FMP4", "mpeg4"},     {"MP4V", "mpeg4"},
        {"M4S2", "mpeg4"}, {"DIV3", "msmpeg4v3"}, {"MP43", "msmpeg4v3"}, {"MP42", "msmpeg4v2"}, {"H264", "h264"},
        {"X264", "h264"},  {"AVC1", "h264"},      {"HEVC", "hevc"},      {"H265", "hevc"},      {"MJPG", "mjpeg"},
        {"WMV1", "wmv1"},  {"WMV2", "wmv2"},      {"WMV3", "wmv3"},      {"VP80", "vp8"},       {"VP90", "vp9"},
        {"AV01", "av1"},   {"H263", "h263"},      {"FFV1", "ffv1"},      {"HFYU", "huffyuv"},
    };
    if (compression == 0) return "rawvideo";
    char key[5] = {};
    for (int i = 0; i < 4; ++i) {
        const char c = static_cast<char>((compression >> (8 * i)) & 0xFF);
        key[i] = c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
    }
    for (const Name& n : kNames) {
        if (std::strcmp(n.key, key) == 0) return n.name;
    }
    return "";
}

const char* AudioCodec(const _AVIAudioFormat& a) {
    switch (a.wFormatTag) {
        case 1:
            switch (a.wBitsPerSample) {
                case 8: return "pcm_u8";
                case 16: return "pcm_s16le";
                case 24: return "pcm_s24le";
                case 32: return "pcm_s32le";
                default: return "";
            }
        case 2: return "adpcm_ms";
        case 3: return a.wBitsPerSample == 64 ? "pcm_f64le" : "pcm_f32le";
        case 6: return "pcm_alaw";
        case 7: return "pcm_mulaw";
        case 0x11: return "adpcm_ima_wav";
        case 0x50: return "mp2";
        case 0x55: return "mp3";
        case 0xFF:
        case 0x1610: return "aac";
        case 0x161: return "wmav2";
        case 0x2000: return "ac3";
        default: return "";
    }
}

bool IsPcmLike(uint16_t tag) { return tag == 1 || tag == 3 || tag == 6 || tag == 7 || tag == 2 || tag == 0x11; }

// Microseconds of a stream: its length in units of scale/rate seconds.
int64_t StreamUs(const _AVIStreamHeader& h) {
    if (h.dwRate == 0) return -1;
    return static_cast<int64_t>(static_cast<uint64_t>(h.dwLength) * h.dwScale * 1000000 / h.dwRate);
}

void AddVideo(const _AVIStreamHeader& h, const _AVIVideoFormat* v, MediaFacts* f) {
    StreamFacts s;
    s.kind = StreamFacts::kVideo;
    if (v != nullptr) {
        s.codec = VideoCodec(v->biCompression);
        s.width = v->biWidth;
        // A negative height marks a top-down bitmap.
        s.height = static_cast<uint32_t>(std::abs(static_cast<int32_t>(v->biHeight)));
    }
    if (h.dwRate != 0 && h.dwScale != 0) {
        const uint32_t g = std::gcd(h.dwRate, h.dwScale);
        s.frameRateNum = h.dwRate / g;
        s.frameRateDen = h.dwScale / g;
    }
    f->streams.push_back(s);
}

void AddAudio(const _AVIAudioFormat* a, MediaFacts* f) {
    StreamFacts s;
    if (a != nullptr) {
        s.codec = AudioCodec(*a);
        s.sampleRate = a->nSamplesPerSec;
        s.channels = a->nChannels;
        s.bitsPerSample = IsPcmLike(a->wFormatTag) ? a->wBitsPerSample : 0;
        s.bitRate = static_cast<uint64_t>(a->nAvgBytesPerSec) * 8;
    }
    f->streams.push_back(s);
}

}  // namespace

int32_t AviFacts(const char* path, MediaFacts* f) {
    CAVIParser* parser = nullptr;
    if (CreateAVIParserObject(&parser) != MM_OK) return MM_E_OUTOFMEMORY;
    _MMClipInfo clip{};
    const int32_t result = parser->init(path, &clip);
    if (result == MM_OK) {
        f->format = "avi";
        f->mime = "video/x-msvideo";
        for (uint32_t i = 0; i < AVI_STREAM_SLOTS; ++i) {
            const _AVIStreamHeader* h = parser->getStreamHeader(i);
            if (h == nullptr) break;
            const bool video = h->fccType == 0x76696473u;  // "vids"
            if (video) AddVideo(*h, parser->getVideoFormat(), f);
            if (h->fccType == 0x61756473u) AddAudio(parser->getAudioFormat(), f);  // "auds"
            if (StreamUs(*h) > f->durationUs) f->durationUs = StreamUs(*h);
        }
        f->durationExact = f->durationUs >= 0;
        uint64_t size = 0;
        if (f->durationUs > 0 && MEx_fsize(path, &size))
            f->bitRate = size * 8 * 1000000 / static_cast<uint64_t>(f->durationUs);
    }
    FreeAVIParserObject(parser);
    return result;
}

}  // namespace metainfo
