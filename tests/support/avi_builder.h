// Byte builders for RIFF AVI files: chunks, lists, headers, "movi" and "idx1".
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "metainfo/avi_parser.h"
#include "support/bytes.h"

namespace testing_support {

// id, little-endian size, body, and a pad byte when the body is odd.
Bytes RiffChunk(const std::string& id, const Bytes& body);
// "LIST" (or another identifier such as "RIFF"), size, type, children.
Bytes RiffList(const std::string& type, const std::vector<Bytes>& children, const std::string& id = "LIST");

struct AviMainFields {
    uint32_t microSecPerFrame = 40000;
    uint32_t totalFrames = 0;
    uint32_t streams = 1;
    uint32_t width = 0;
    uint32_t height = 0;
    uint32_t flags = 0x10;  // has index
};

struct AviStreamFields {
    std::string type = "vids";
    std::string handler = "FMP4";
    uint32_t scale = 1;
    uint32_t rate = 25;
    uint32_t length = 0;
    uint32_t sampleSize = 0;
};
AviStreamFields AviVideoStream(uint32_t scale, uint32_t rate, uint32_t length);
// PCM audio whose rate is its average bytes per second.
AviStreamFields AviAudioStream(uint32_t avgBytesPerSec, uint32_t length);
Bytes AviVideoFormat(uint32_t width, uint32_t height, const std::string& compression, const Bytes& extra = Bytes());
Bytes AviAudioFormat(uint16_t formatTag, uint16_t channels, uint32_t sampleRate, uint32_t avgBytesPerSec,
                     uint16_t blockAlign, uint16_t bits);
Bytes AviStrl(const AviStreamFields& shape, const Bytes& strf);
Bytes AviHdrl(const AviMainFields& main, const std::vector<Bytes>& lists);

// One chunk of "movi": stream number, two-letter type ("dc", "wb"), data, and
// the flags its "idx1" entry carries (0x10 = key frame).
struct AviFrame {
    uint32_t stream;
    std::string type;
    Bytes data;
    uint32_t flags;
};

// "RIFF AVI " with hdrl, the "movi" list of the frames and, when asked, an
// "idx1" whose offsets are relative to the "movi" type word.
std::vector<uint8_t> AviFile(const Bytes& hdrl, const std::vector<AviFrame>& frames, bool withIndex = true);

// A one-stream video file of n frames, a key frame every keyEvery frames.
std::vector<uint8_t> AviVideoOnly(uint32_t n, uint32_t keyEvery, uint32_t scale = 1, uint32_t rate = 25);

// Owns a parser object for one test.
class AviParserHandle {
public:
    AviParserHandle();
    ~AviParserHandle();
    AviParserHandle(const AviParserHandle&) = delete;
    AviParserHandle& operator=(const AviParserHandle&) = delete;
    CAVIParser* operator->() const { return p_; }
    // init, then "movi" and "idx1" read where a caller locates them.
    int32_t OpenIndexed(const std::string& path);

private:
    CAVIParser* p_ = nullptr;
};

}  // namespace testing_support
