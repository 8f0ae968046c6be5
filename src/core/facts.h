// What a file says about itself, unrounded: each format's reader fills one
// of these, and the accurate interface hands it out as it stands. Texts are
// UTF-8.
#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace metainfo {

struct StreamFacts {
    enum Kind : uint8_t { kAudio = 1, kVideo = 2 };
    Kind kind = kAudio;
    std::string codec;  // ffprobe codec_name; empty when unknown
    std::string profile;  // ffprobe profile name; empty when unknown
    int32_t level = -1;
    uint32_t sampleRate = 0;
    uint32_t channels = 0;
    uint32_t bitsPerSample = 0;
    uint32_t width = 0;
    uint32_t height = 0;
    uint32_t frameRateNum = 0;
    uint32_t frameRateDen = 0;
    uint64_t bitRate = 0;
};

struct PictureFacts {
    std::string mime;
    int32_t type = -1;  // ID3 picture type; -1 unknown
    std::string description;
    uint64_t size = 0;
    uint64_t offset = 0;
    bool unsynchronised = false;  // stored with ID3 unsynchronisation: storedSize bytes at offset
    uint64_t storedSize = 0;
    bool viaContract = false;  // no offset known: its bytes come through the MM_ meta query
    // Inside Ogg header packets (base64 in a comment, or split over pages): no
    // single offset holds the bytes, so the copy reads the headers again for
    // the picture at this place among the file's pictures.
    bool inOggHeaders = false;
    uint32_t ordinal = 0;
};

struct TagFacts {
    std::string title, artist, album, albumArtist, genre, date, comment, composer;
    int32_t year = 0;
    uint32_t track = 0, trackTotal = 0, disc = 0, discTotal = 0;
    std::vector<std::pair<std::string, std::string>> extra;  // key as the file names it, value

    // Takes from other what this lacks (a second tag of the same file).
    void FillFrom(const TagFacts& other) {
        for (std::string TagFacts::*text :
             {&TagFacts::title, &TagFacts::artist, &TagFacts::album, &TagFacts::albumArtist, &TagFacts::genre,
              &TagFacts::date, &TagFacts::comment, &TagFacts::composer}) {
            if ((this->*text).empty()) this->*text = other.*text;
        }
        if (year == 0) year = other.year;
        if (track == 0) {
            track = other.track;
            trackTotal = other.trackTotal;
        }
        if (disc == 0) {
            disc = other.disc;
            discTotal = other.discTotal;
        }
        extra.insert(extra.end(), other.extra.begin(), other.extra.end());
    }
};

struct MediaFacts {
    std::string format;
    std::string mime;
    int64_t durationUs = -1;  // -1 unknown
    bool durationExact = false;
    uint64_t bitRate = 0;
    std::vector<StreamFacts> streams;
    TagFacts tags;
    std::vector<PictureFacts> pictures;

    StreamFacts* FirstStream(StreamFacts::Kind kind) {
        for (StreamFacts& s : streams) {
            if (s.kind == kind) return &s;
        }
        return nullptr;
    }
};

}  // namespace metainfo
