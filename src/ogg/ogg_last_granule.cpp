#include "ogg/ogg_last_granule.h"

#include <cstring>
#include <vector>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "ogg/ogg_page.h"

namespace metainfo {
namespace {

// The last page usually lies in the last few KiB: blocks start small and
// grow to the largest a page can be.
constexpr uint64_t kFirstBlock = uint64_t{8} * 1024;
constexpr uint64_t kLastBlock = uint64_t{64} * 1024;
// How far back the search goes: far enough for a stream interleaved with
// others, never the whole of a large file.
constexpr int kMaxBlocks = 16;

// Whether the bytes at i are a page: one that ends where the file ends or
// where another page starts is framed by its neighbours; any other must carry
// its checksum, as "OggS" may stand inside packet data.
bool IsPage(const std::vector<uint8_t>& buf, size_t i, size_t whole, bool bufEndsFile, uint32_t crc) {
    const size_t next = i + whole;
    if (next == buf.size() && bufEndsFile) return true;
    if (buf.size() - next >= 4 && BytesEqual(buf.data() + next, "OggS", 4)) return true;
    return OggCrcMatches(buf.data() + i, whole, crc);
}

// The last page of the stream whose capture starts in [0, starts) of buf.
bool LastPageIn(const std::vector<uint8_t>& buf, size_t starts, bool bufEndsFile, uint32_t serial, uint64_t* granule) {
    for (size_t i = starts; i-- > 0;) {
        // Straight to the previous capture's first letter.
        const void* o = memrchr(buf.data(), 'O', i + 1);
        if (o == nullptr) break;
        i = static_cast<size_t>(static_cast<const uint8_t*>(o) - buf.data());
        OggPage page;
        if (!ParseOggPage(buf.data() + i, buf.size() - i, &page)) continue;
        const size_t whole = page.headerSize + page.bodySize;
        if (page.serial != serial || page.granule == kOggNoGranule || whole > buf.size() - i) continue;
        if (!IsPage(buf, i, whole, bufEndsFile, page.crc)) continue;
        *granule = page.granule;
        return true;
    }
    return false;
}

}  // namespace

bool FindLastGranule(int h, uint64_t fileSize, uint32_t serial, uint64_t* granule) {
    std::vector<uint8_t> buf;
    uint64_t end = fileSize;
    uint64_t size = kFirstBlock;
    for (int block = 0; block < kMaxBlocks && end > 0; ++block, size = size < kLastBlock ? size * 2 : size) {
        const uint64_t start = end > size ? end - size : 0;
        // Past the block: the rest of a page that starts inside it.
        const uint64_t stop = fileSize - end > kOggMaxPage ? end + kOggMaxPage : fileSize;
        buf.resize(static_cast<size_t>(stop - start));
        buf.resize(ReadSomeAt(h, start, buf.data(), buf.size()));
        const size_t starts = static_cast<size_t>(end - start);
        const bool endsFile = start + buf.size() == fileSize;
        if (buf.size() >= starts && LastPageIn(buf, starts, endsFile, serial, granule)) return true;
        end = start;
    }
    return false;
}

}  // namespace metainfo
