#include "flac/flac_facts.h"

#include <new>
#include <string>
#include <vector>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/text.h"
#include "flac/vorbis_comment.h"
#include "metainfo/metainfo.h"
#include "mp3/id3_facts.h"

namespace metainfo {
namespace {

constexpr int kMaxId3Tags = 16;
constexpr int kMaxBlocks = 1024;
constexpr uint8_t kStreamInfo = 0, kVorbisComment = 4, kPicture = 6;
constexpr uint64_t kPictureHeadRead = 4096;

// Where the stream starts: after the ID3v2 tags some writers put first.
uint64_t SkipId3Tags(int h, uint64_t fileSize) {
    uint64_t at = 0;
    std::vector<uint8_t> b;
    for (int i = 0; i < kMaxId3Tags && at + 10 <= fileSize && ReadExactAt(h, at, 10, &b); ++i) {
        if (!BytesEqual(b.data(), "ID3", 3)) break;
        at += 10 + uint64_t{ReadSyncsafe32(b.data() + 6) & 0x0FFFFFFFu} + ((b[5] & 0x10) != 0 ? 10 : 0);
    }
    return at;
}

struct Flac {
    uint32_t rate = 0, channels = 0, bits = 0;
    uint64_t samples = 0;
    bool haveInfo = false;
    uint64_t audioStart = 0;
};

void ReadStreamInfo(const std::vector<uint8_t>& b, Flac* f) {
    if (b.size() < 18) return;
    // After the block and frame size bounds: 20 bits rate, 3 channels-1,
    // 5 bits-1, 36 total samples.
    const uint64_t packed = ReadBE64(b.data() + 10);
    f->rate = static_cast<uint32_t>(packed >> 44);
    f->channels = static_cast<uint32_t>((packed >> 41) & 7) + 1;
    f->bits = static_cast<uint32_t>((packed >> 36) & 31) + 1;
    f->samples = packed & 0xFFFFFFFFFULL;
    f->haveInfo = true;
}

// A PICTURE block's header; its image bytes stay in the file. Headers are
// small: the block is read whole only when its description runs past 4 KiB.
bool ReadPicture(int h, uint64_t body, uint64_t size, std::vector<PictureFacts>* pictures) {
    std::vector<uint8_t> b;
    PictureFacts p;
    size_t dataAt = 0;
    const size_t head = static_cast<size_t>(size < kPictureHeadRead ? size : kPictureHeadRead);
    if (!ReadExactAt(h, body, head, &b)) return true;
    if (!ReadPictureHead(b.data(), b.size(), &p, &dataAt)) {
        if (head == size || !ReadExactAt(h, body, static_cast<size_t>(size), &b)) return true;
        if (!ReadPictureHead(b.data(), b.size(), &p, &dataAt)) return true;
    }
    if (p.size > size - dataAt) return true;
    p.offset = body + dataAt;
    try {
        pictures->push_back(p);
    } catch (const std::bad_alloc&) {
        return false;
    }
    return true;
}

// Walks the metadata blocks up to the one marked last; false when the stream
// has no STREAMINFO or memory runs out.
bool WalkBlocks(int h, uint64_t at, uint64_t fileSize, Flac* f, MediaFacts* facts, bool* oom) {
    std::vector<uint8_t> b;
    for (int i = 0; i < kMaxBlocks && at + 4 <= fileSize && ReadExactAt(h, at, 4, &b); ++i) {
        const bool last = (b[0] & 0x80) != 0;
        const uint8_t type = b[0] & 0x7F;
        const uint64_t size = ReadBE32(b.data()) & 0xFFFFFFu;
        const uint64_t body = at + 4;
        if (size > fileSize - body) return false;
        if (type == kStreamInfo && ReadExactAt(h, body, size < 34 ? static_cast<size_t>(size) : 34, &b)) {
            ReadStreamInfo(b, f);
        } else if (type == kVorbisComment && ReadExactAt(h, body, static_cast<size_t>(size), &b)) {
            ReadVorbisComments(b.data(), b.size(), &facts->tags);
        } else if (type == kPicture && !ReadPicture(h, body, size, &facts->pictures)) {
            *oom = true;
            return false;
        }
        at = body + size;
        if (last) break;
    }
    f->audioStart = at;
    return f->haveInfo;
}

// The file's size, and where "fLaC" starts; false when it is not there.
bool FindStream(int h, const char* path, uint64_t* size, uint64_t* start) {
    std::vector<uint8_t> b;
    if (!OpenedFileSize(h, path, size)) return false;
    *start = SkipId3Tags(h, *size);
    return *start + 4 <= *size && ReadExactAt(h, *start, 4, &b) && BytesEqual(b.data(), "fLaC", 4);
}

}  // namespace

bool LooksLikeFlac(const char* path, const uint8_t* head, size_t n) {
    if (n >= 4 && BytesEqual(head, "fLaC", 4)) return true;
    if (path == nullptr || n < 3 || !BytesEqual(head, "ID3", 3)) return false;
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return false;
    FileCloser closer(h);
    uint64_t size = 0, start = 0;
    return FindStream(h, path, &size, &start);
}

int32_t FlacFacts(const char* path, int /*type*/, MediaFacts* facts) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return MM_E_FAIL;
    FileCloser closer(h);
    uint64_t size = 0, start = 0;
    if (!FindStream(h, path, &size, &start)) return MM_E_FAIL;
    Flac f;
    bool oom = false;
    try {
        if (!WalkBlocks(h, start + 4, size, &f, facts, &oom)) return oom ? MM_E_OUTOFMEMORY : MM_E_FAIL;
        // An ID3v2 tag ahead of the stream fills what the Vorbis comment lacks;
        // its pictures count when the stream has none of its own.
        TagFacts id3;
        std::vector<PictureFacts> id3Pictures;
        if (start > 0 && !ReadId3FactsAt(path, 0, &id3, &id3Pictures)) return MM_E_OUTOFMEMORY;
        facts->tags.FillFrom(id3);
        if (facts->pictures.empty()) facts->pictures = std::move(id3Pictures);
    } catch (const std::bad_alloc&) {
        return MM_E_OUTOFMEMORY;
    }
    facts->format = "flac";
    facts->mime = "audio/flac";
    StreamFacts s;
    s.codec = "flac";
    s.sampleRate = f.rate;
    s.channels = f.channels;
    s.bitsPerSample = f.bits;
    if (f.samples != 0 && f.rate != 0) {
        facts->durationUs = static_cast<int64_t>(f.samples * 1000000 / f.rate);
        facts->durationExact = true;
        // The frames' bytes over the play time: the stream's own average rate.
        s.bitRate = static_cast<uint64_t>(static_cast<long double>(size - f.audioStart) * 8 * f.rate / f.samples);
    }
    facts->streams.push_back(s);
    return MM_OK;
}

}  // namespace metainfo
