#include "mp3/id3.h"

#include <sys/stat.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/unsync.h"
#include "mp3/id3_frames.h"

namespace metainfo {
namespace {

constexpr uint32_t kTagHeaderSize = 10;
constexpr uint32_t kFrameHeaderSize = 10;
constexpr uint32_t kV22FrameHeaderSize = 6;
constexpr uint32_t kPictureCeiling = 0x80000;
constexpr uint32_t kV1TagSize = 128;
constexpr uint32_t kV1FieldSize = 30;

bool AllZero(const uint8_t* p, size_t n) {
    for (size_t i = 0; i < n; ++i) {
        if (p[i] != 0) return false;
    }
    return true;
}

}  // namespace

uint32_t UnsyncRawSpan(const uint8_t* raw, uint32_t rawLength, uint32_t want) {
    uint32_t r = 0;
    uint32_t w = 0;
    while (r < rawLength && w < want) {
        const uint8_t c = raw[r++];
        ++w;
        if (c != 0xFF || r >= rawLength) continue;
        if (raw[r++] != 0) ++w;
    }
    return r;
}

namespace {

// v2.3 extended header behind an unsynchronised tag: its size field and body
// are read through the unsynchronisation; the file is left after them.
int32_t SkipUnsyncExtendedHeader(int h, uint32_t tagSize, uint32_t* extendedSize) {
    const int64_t start = MEx_ftell(h);
    uint8_t raw[8];
    const int got = MEx_fread(raw, 1, sizeof raw, h);
    if (got < 4) return MM_E_FAIL;
    uint8_t plain[8];
    std::memcpy(plain, raw, sizeof raw);
    Sync(plain, got);
    const uint32_t size = ReadBE32(plain);
    if (size == 0 || size > tagSize) return MM_E_FAIL;
    const int64_t bodyStart = start + static_cast<int64_t>(UnsyncRawSpan(raw, static_cast<uint32_t>(got), 4));
    if (MEx_fseek(h, bodyStart, SEEK_SET) != 0) return MM_E_FAIL;
    // Up to twice the size in raw bytes, never more than the tag holds.
    const uint32_t want = static_cast<uint32_t>(std::min<uint64_t>(uint64_t(size) * 2, tagSize));
    uint8_t* scratch = new (std::nothrow) uint8_t[want];
    if (scratch == nullptr) return MM_E_NOEXTENSION;  // the code this step has always given for memory
    const int read = MEx_fread(scratch, 1, want, h);
    const uint32_t span = read > 0 ? UnsyncRawSpan(scratch, static_cast<uint32_t>(read), size) : 0;
    delete[] scratch;
    if (MEx_fseek(h, bodyStart + static_cast<int64_t>(span), SEEK_SET) != 0) return MM_E_FAIL;
    *extendedSize = size;
    return MM_OK;
}

// Encoding code of a v2.4 text item from its frame's encoding byte.
void SetV24Encoding(_MMMetaItem* item, uint8_t encodingByte) {
    if (encodingByte == 2)
        item->nEncoding = ENCODING_UTF16BE;
    else if (encodingByte == 3)
        item->nEncoding = ENCODING_UTF8;
    else if (encodingByte > 3)
        item->nEncoding = ENCODING_LATIN1;
}

// Passes over a frame body that fills nothing. Where a short body fails the
// tag (v2.4) the bytes are read through a small block, else the file seeks.
bool PassOver(int h, uint32_t size, bool mustBePresent) {
    if (!mustBePresent) return MEx_fseek(h, static_cast<int64_t>(size), SEEK_CUR) == 0;
    uint8_t block[4096];
    while (size > 0) {
        const uint32_t want = std::min<uint32_t>(size, sizeof block);
        if (MEx_fread(block, 1, want, h) != static_cast<int>(want)) return false;
        size -= want;
    }
    return true;
}

// Reads a frame body of `size` bytes; a short read leaves zeros, or is
// reported through *complete.
uint8_t* ReadBody(int h, uint32_t size, bool* complete) {
    uint8_t* body = new (std::nothrow) uint8_t[size]();
    if (body == nullptr) return nullptr;
    const int got = MEx_fread(body, 1, size, h);
    *complete = got >= 0 && static_cast<uint32_t>(got) == size;
    return body;
}

// A picture frame held in buf: encoding, format or MIME type, picture type and
// description, then the picture. Fills the format item; returns the offset of
// the picture bytes, or -1 when the frame ends first.
long ParsePictureHead(const uint8_t* buf, uint32_t length, uint8_t version, bool mimeCountsZero, _MMMetaItem* format) {
    ByteReader r(buf, length);
    uint8_t encoding = 0;
    if (!r.U8(&encoding)) return -1;
    format->nEncoding = ENCODING_LATIN1;
    if (version == 2) {
        const uint8_t* image = r.Peek(3);
        if (image == nullptr) return -1;
        std::memcpy(format->szData, image, 3);
        format->nLength = 3;
        r.Skip(3);
    } else {
        const uint8_t* mime = buf + r.position();
        const void* zero = std::memchr(mime, 0, r.remaining());
        const uint32_t kept = static_cast<uint32_t>(std::min<size_t>(
            zero != nullptr ? static_cast<size_t>(static_cast<const uint8_t*>(zero) - mime) : r.remaining(),
            MM_META_DATA_SIZE));
        if (mimeCountsZero) {
            const uint32_t withZero = std::min<uint32_t>(kept + (zero != nullptr ? 1 : 0), MM_META_DATA_SIZE);
            std::memcpy(format->szData, mime, withZero);
            format->nLength = withZero;
        } else {
            std::memcpy(format->szData, mime, kept);
            format->nLength = kept;
        }
        if (zero == nullptr) return -1;
        r.Skip(static_cast<size_t>(static_cast<const uint8_t*>(zero) - mime) + 1);
    }
    if (!r.Skip(1)) return -1;  // picture type
    if (encoding == 1) {
        for (;;) {
            const uint8_t* pair = r.Peek(2);
            if (pair == nullptr) return -1;
            r.Skip(2);
            if (pair[0] == 0 && pair[1] == 0) break;
        }
    } else {
        const void* zero = std::memchr(buf + r.position(), 0, r.remaining());
        if (zero == nullptr) return -1;
        r.Seek(static_cast<size_t>(static_cast<const uint8_t*>(zero) - buf) + 1);
    }
    return static_cast<long>(r.position());
}

// The picture bytes are moved to the front of the frame's buffer, which the
// record then owns.
void KeepPicture(uint8_t* buf, uint32_t length, long offset, _MMMetaInfo* meta) {
    const uint32_t pictureSize = length - static_cast<uint32_t>(offset);
    if (pictureSize == 0) {
        delete[] buf;
        return;
    }
    std::memmove(buf, buf + offset, pictureSize);
    meta->pPicture = buf;
    meta->nPictureSize = pictureSize;
}

int32_t GetSyncPicData(int h, uint32_t frameSize, ID3_MetaInfo* ctx) {
    bool complete = false;
    uint8_t* buf = ReadBody(h, frameSize, &complete);
    if (buf == nullptr) return MM_E_OUTOFMEMORY;
    const long offset = ParsePictureHead(buf, frameSize, ctx->version, false, &ctx->meta->aItems[META_PICTURE_FORMAT]);
    if (offset < 0 || !complete) {
        delete[] buf;
        return MM_E_FAIL;
    }
    KeepPicture(buf, frameSize, offset, ctx->meta);
    return MM_OK;
}

int32_t GetUnsyncPicData(int h, uint32_t frameSize, ID3_MetaInfo* ctx) {
    bool complete = false;
    uint8_t* buf = ReadBody(h, frameSize, &complete);
    if (buf == nullptr) return MM_E_OUTOFMEMORY;
    if (!complete) {
        delete[] buf;
        return MM_E_FAIL;
    }
    const uint32_t length = static_cast<uint32_t>(Sync(buf, static_cast<int>(frameSize)));
    if (length > kPictureCeiling && length > ctx->pictureLimit) {
        delete[] buf;
        return MM_OK;
    }
    const long offset = ParsePictureHead(buf, length, ctx->version, true, &ctx->meta->aItems[META_PICTURE_FORMAT]);
    if (offset < 0) {
        delete[] buf;
        return MM_E_FAIL;
    }
    KeepPicture(buf, length, offset, ctx->meta);
    return MM_OK;
}

// The contract's reading of each frame: table frames into their items, the
// first picture into the record.
class ContractSink final : public ID3_FrameSink {
public:
    explicit ContractSink(const Quirks& quirks) : quirks_(quirks) {}
    int32_t Frame(int h, const ID3_Frame& frame, ID3_MetaInfo* ctx) override {
        return ctx->version == 2 ? FrameV22(h, frame, ctx) : FrameV23(h, frame, ctx);
    }

private:
    const Quirks& quirks_;

    static int32_t Picture(int h, const ID3_Frame& frame, ID3_MetaInfo* ctx) {
        const int64_t bodyStart = MEx_ftell(h);
        if (GetPicData(h, frame.size, ctx, frame.unsync) == MM_E_OUTOFMEMORY) return MM_E_FAIL;
        return MEx_fseek(h, bodyStart + static_cast<int64_t>(frame.size), SEEK_SET) == 0 ? MM_OK : MM_E_FAIL;
    }

    int32_t FrameV23(int h, const ID3_Frame& frame, ID3_MetaInfo* ctx) {
        const bool v24 = ctx->version == 4;
        const uint32_t id = frame.id;
        if (id == FrameId("APIC")) return Picture(h, frame, ctx);
        if (!IsTableFrame(id)) return PassOver(h, frame.size, v24) ? MM_OK : MM_E_FAIL;
        bool complete = false;
        uint8_t* body = ReadBody(h, frame.size, &complete);
        if (body == nullptr) return MM_E_FAIL;
        if (v24 && !complete) {
            delete[] body;
            return MM_E_FAIL;
        }
        uint32_t length = frame.size;
        if (frame.unsync) length = static_cast<uint32_t>(Sync(body, static_cast<int>(length)));
        if (v24 && (frame.flags & 0x01) != 0 && length > 3) length = RemoveDataLengthIndicator(body, length);
        const uint8_t encodingByte = length > 0 ? body[0] : 0;
        GetMetaData(id, body, length, ctx->meta, quirks_);
        if (v24 && length > 0) {
            if (_MMMetaItem* item = V24TextItem(id, ctx->meta)) SetV24Encoding(item, encodingByte);
        }
        delete[] body;
        return MM_OK;
    }

    int32_t FrameV22(int h, const ID3_Frame& frame, ID3_MetaInfo* ctx) {
        if (frame.id == FrameId("PIC")) return Picture(h, frame, ctx);
        if (!IsTableFrame(frame.id)) return PassOver(h, frame.size, false) ? MM_OK : MM_E_FAIL;
        bool complete = false;
        uint8_t* body = ReadBody(h, frame.size, &complete);
        if (body == nullptr) return MM_E_FAIL;
        uint32_t length = frame.size;
        if (frame.unsync) length = static_cast<uint32_t>(Sync(body, static_cast<int>(length)));
        GetMetaData(frame.id, body, length, ctx->meta, quirks_);
        delete[] body;
        return MM_OK;
    }
};

// Reads through unsynchronisation: up to `want` plain bytes into out (when
// not null) from at most `limit` stored bytes. The file is left after the
// stored bytes taken (an FF's stuffing zero included); returns the plain count.
uint32_t ReadThroughUnsync(int h, uint8_t* out, uint32_t want, uint32_t limit, uint32_t* stored) {
    const int64_t start = MEx_ftell(h);
    uint8_t block[4096];
    uint32_t raw = 0;
    uint32_t plain = 0;
    bool afterFF = false;
    bool done = false;
    while (!done && raw < limit && (plain < want || afterFF)) {
        const uint32_t n = std::min<uint32_t>(sizeof block, limit - raw);
        const int got = MEx_fread(block, 1, n, h);
        if (got <= 0) break;
        for (int i = 0; i < got && !done; ++i) {
            const uint8_t c = block[i];
            if (afterFF) {
                afterFF = false;
                if (c == 0) {
                    ++raw;
                    continue;
                }
            }
            if (plain >= want) {
                done = true;
                break;
            }
            if (out != nullptr) out[plain] = c;
            ++raw;
            ++plain;
            afterFF = c == 0xFF;
        }
        if (static_cast<uint32_t>(got) < n) break;
    }
    MEx_fseek(h, start + static_cast<int64_t>(raw), SEEK_SET);
    *stored = raw;
    return plain;
}

bool IsFrameIdChar(uint8_t c) { return (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9'); }

// Whether a frame body of `size` bytes (at most room) from here ends where
// the tag does, or where another frame or the padding begins.
bool EndsAtFrame(int h, uint32_t size, uint32_t room) {
    if (room - size < kFrameHeaderSize) return true;
    const int64_t here = MEx_ftell(h);
    uint8_t next[4] = {};
    const bool read = MEx_fseek(h, here + static_cast<int64_t>(size), SEEK_SET) == 0 && MEx_fread(next, 1, 4, h) == 4;
    MEx_fseek(h, here, SEEK_SET);
    if (!read) return false;
    return AllZero(next, 4) ||
           (IsFrameIdChar(next[0]) && IsFrameIdChar(next[1]) && IsFrameIdChar(next[2]) && IsFrameIdChar(next[3]));
}

// A v2.3/2.4 frame size as its writer meant it, at most room; UINT32_MAX when
// no reading fits. iTunes wrote syncsafe sizes into v2.3 tags and plain ones
// into v2.4: v2.3 takes the syncsafe reading when the plain one runs past the
// tag, v2.4 the plain one when only that ends at the next frame.
uint32_t FrameSizeOf(int h, const uint8_t* field, uint8_t version, uint32_t room) {
    const uint32_t plain = ReadBE32(field);
    const bool syncsafeForm = ((field[0] | field[1] | field[2] | field[3]) & 0x80) == 0;
    const uint32_t syncsafe = syncsafeForm ? ReadSyncsafe32(field) : UINT32_MAX;
    if (version == 3) return plain <= room ? plain : (syncsafe <= room ? syncsafe : UINT32_MAX);
    if (syncsafe <= room && (syncsafe == plain || EndsAtFrame(h, syncsafe, room))) return syncsafe;
    if (plain <= room && EndsAtFrame(h, plain, room)) return plain;
    return syncsafe <= room ? syncsafe : UINT32_MAX;
}

int32_t ParseFrames(int h, ID3_MetaInfo* ctx) {
    ContractSink sink(kContract);
    return WalkID3Frames(h, ctx, kContract, &sink);
}

int32_t GetMetaInfoOnHandle(int h, const char* path, _MMMetaInfo* meta, int pictureLimit) {
    ID3_MetaInfo ctx;
    ID3_InitMetaData(path, meta, &ctx, pictureLimit, h);
    if (MEx_fseek(h, 0, SEEK_SET) == 0 && ParseID3V2(h, &ctx) == MM_OK) return MM_OK;
    return ParseID3V1(h, meta) == MM_OK ? MM_OK : 1;
}

}  // namespace

int32_t WalkID3Frames(int h, ID3_MetaInfo* ctx, const Quirks& quirks, ID3_FrameSink* sink) {
    const bool v22 = ctx->version == 2;
    const uint32_t headerSize = v22 ? kV22FrameHeaderSize : kFrameHeaderSize;
    // v2.2/2.3 unsynchronise the whole tag: headers and bodies are read through it.
    const bool throughUnsync = ctx->unsync != 0 && ctx->version < 4 && !quirks.id3UnsyncSizeIsStored;
    while (ctx->remaining >= headerSize) {
        uint8_t header[kFrameHeaderSize];
        uint32_t headerStored = headerSize;
        if (throughUnsync) {
            if (ReadThroughUnsync(h, header, headerSize, ctx->remaining, &headerStored) != headerSize) return MM_OK;
        } else if (MEx_fread(header, 1, headerSize, h) != static_cast<int>(headerSize)) {
            // A tag cut short by the end of the file ends where the file does.
            return MM_OK;
        }
        if (AllZero(header, v22 ? 3 : 4)) return MM_OK;  // padding
        ID3_Frame frame{};
        const uint32_t room = ctx->remaining - headerStored;
        if (v22) {
            frame.id = uint32_t(header[0]) << 16 | uint32_t(header[1]) << 8 | header[2];
            frame.size = uint32_t(header[3]) << 16 | uint32_t(header[4]) << 8 | header[5];
        } else {
            frame.id = ReadBE32(header);
            frame.flags = header[9];
            if (!quirks.id3FrameSizeAsStated) {
                frame.size = FrameSizeOf(h, header + 4, ctx->version, room);
            } else if (ctx->version == 4) {
                frame.size = ReadSyncsafe32(header + 4);
            } else {
                frame.size = ReadBE32(header + 4);
                if (static_cast<int32_t>(frame.size) < 0) return MM_E_FAIL;
            }
        }
        frame.stored = frame.size;
        if (throughUnsync && frame.size <= room) {
            uint32_t stored = 0;
            const int64_t bodyStart = MEx_ftell(h);
            const uint32_t plain = ReadThroughUnsync(h, nullptr, frame.size, room, &stored);
            if (MEx_fseek(h, bodyStart, SEEK_SET) != 0) return MM_E_FAIL;
            frame.stored = plain == frame.size ? stored : UINT32_MAX;
        }
        if (frame.stored > room) {
            if (quirks.id3FrameSizeAsStated) return MM_E_FAIL;
            // As much of the frame as the tag holds, and no more frames.
            frame.size = frame.stored = room;
        }
        ctx->remaining = room - frame.stored;
        if (frame.size == 0) continue;
        frame.unsync = ctx->unsync != 0 || (ctx->version == 4 && (frame.flags & 0x02) != 0);
        const int32_t result = sink->Frame(h, frame, ctx);
        if (result != MM_OK) return result;
    }
    return MM_OK;
}

int32_t ParseV2Header(int h, ID3_MetaInfo* ctx) { return ParseV2Header(h, ctx, kContract); }

int32_t ParseV2Header(int h, ID3_MetaInfo* ctx, const Quirks& quirks) {
    const int64_t start = MEx_ftell(h);
    uint8_t header[kTagHeaderSize];
    if (MEx_fread(header, 1, kTagHeaderSize, h) != static_cast<int>(kTagHeaderSize)) return kID3ShortHeader;
    if (!BytesEqual(header, "ID3", 3)) return MM_E_FAIL;
    if (header[3] < 2 || header[3] > 4) return MM_E_FAIL;
    ctx->version = header[3];
    const uint32_t tagSize = ReadSyncsafe32(header + 6);
    if (tagSize == 0 || tagSize > ctx->sizeBound) return MM_E_FAIL;
    const uint8_t flags = header[5];
    ctx->unsync = (flags & 0x80) ? 1 : 0;
    uint32_t extendedSize = 0;
    if ((flags & 0x40) != 0 && ctx->version == 3) {
        if (ctx->unsync == 0) {
            uint8_t field[4];
            if (MEx_fread(field, 1, 4, h) != 4) return MM_E_FAIL;
            extendedSize = ReadBE32(field);
            if (MEx_fseek(h, static_cast<int64_t>(extendedSize), SEEK_CUR) != 0) return MM_E_FAIL;
        } else {
            const int32_t skipped = SkipUnsyncExtendedHeader(h, tagSize, &extendedSize);
            if (skipped != MM_OK) return skipped;
        }
    } else if ((flags & 0x40) != 0 && ctx->version == 4 && !quirks.id3V24ExtendedHeaderAsFrames) {
        // Its size counts itself; a frame in its place means a writer set the flag for nothing.
        uint8_t field[4];
        if (MEx_fread(field, 1, 4, h) != 4) return MM_E_FAIL;
        const uint32_t size = ReadSyncsafe32(field);
        const bool frameInstead = IsFrameIdChar(field[0]) && IsFrameIdChar(field[1]) && IsFrameIdChar(field[2]);
        if (!frameInstead && (size < 6 || size > tagSize)) return MM_E_FAIL;
        const int64_t skip = frameInstead ? -4 : static_cast<int64_t>(size) - 4;
        if (MEx_fseek(h, skip, SEEK_CUR) != 0) return MM_E_FAIL;
    }
    if (quirks.id3NeedsPadding) {
        // The header's ten bytes are counted against the tag size as well, as
        // the handset always has; a tag too small for that holds no frames.
        const uint64_t consumed = uint64_t(kTagHeaderSize) + extendedSize;
        ctx->remaining = tagSize > consumed ? static_cast<uint32_t>(tagSize - consumed) : 0;
        return MM_OK;
    }
    const int64_t framesStart = MEx_ftell(h);
    const uint64_t consumed = framesStart > start ? static_cast<uint64_t>(framesStart - start) - kTagHeaderSize : 0;
    ctx->remaining = tagSize > consumed ? static_cast<uint32_t>(tagSize - consumed) : 0;
    return MM_OK;
}

int32_t ParseID3V2_2(int h, ID3_MetaInfo* ctx) { return ParseFrames(h, ctx); }
int32_t ParseID3V2_3(int h, ID3_MetaInfo* ctx) { return ParseFrames(h, ctx); }
int32_t ParseID3V2_4(int h, ID3_MetaInfo* ctx) { return ParseFrames(h, ctx); }

int32_t GetPicData(int h, uint32_t frameSize, ID3_MetaInfo* ctx, bool unsync) {
    _MMMetaInfo* meta = ctx->meta;
    if (ctx->pictureLimit == 0) return MM_OK;
    if (meta->aItems[META_PICTURE_FORMAT].nLength != 0 || meta->pPicture != nullptr) return MM_OK;
    if (!unsync && frameSize > kPictureCeiling && frameSize > ctx->pictureLimit) return MM_OK;
    return unsync ? GetUnsyncPicData(h, frameSize, ctx) : GetSyncPicData(h, frameSize, ctx);
}

int32_t ParseID3V2(int h, ID3_MetaInfo* ctx) {
    if (ctx == nullptr || ctx->meta == nullptr) return 1;
    if (ParseV2Header(h, ctx) != MM_OK) return 1;
    int32_t result = MM_E_FAIL;
    switch (ctx->version) {
        case 2: result = ParseID3V2_2(h, ctx); break;
        case 3: result = ParseID3V2_3(h, ctx); break;
        case 4: result = ParseID3V2_4(h, ctx); break;
        default: break;
    }
    return result == MM_OK ? 0 : 1;
}

int32_t ParseID3V1(int h, _MMMetaInfo* meta) {
    if (meta == nullptr) return MM_E_INVALIDARG;
    uint8_t tag[kV1TagSize];
    if (MEx_fseek(h, -static_cast<int64_t>(kV1TagSize), SEEK_END) != 0 ||
        MEx_fread(tag, 1, kV1TagSize, h) != static_cast<int>(kV1TagSize)) {
        return MM_E_OUTOFMEMORY;
    }
    if (!BytesEqual(tag, "TAG", 3)) return MM_E_FAIL;
    delete[] meta->pPicture;
    std::memset(meta, 0, sizeof *meta);

    struct Field {
        uint32_t offset;
        int item;
    };
    static const Field kTextFields[] = {{3, META_TITLE}, {33, META_ARTIST}, {63, META_ALBUM}, {97, META_COMMENT}};
    for (const Field& field : kTextFields) {
        _MMMetaItem* item = &meta->aItems[field.item];
        const uint8_t* text = tag + field.offset;
        const void* zero = std::memchr(text, 0, kV1FieldSize);
        const uint32_t n =
            zero != nullptr ? static_cast<uint32_t>(static_cast<const uint8_t*>(zero) - text) : kV1FieldSize;
        std::memcpy(item->szData, text, n);
        ReshapeV1Item(item, kV1FieldSize);
        item->nEncoding = ENCODING_LATIN1;
    }
    _MMMetaItem* year = &meta->aItems[META_YEAR];
    const void* yearEnd = std::memchr(tag + 93, 0, 4);
    const uint32_t yearLength =
        yearEnd != nullptr ? static_cast<uint32_t>(static_cast<const uint8_t*>(yearEnd) - (tag + 93)) : 4;
    std::memcpy(year->szData, tag + 93, yearLength);
    year->nLength = yearLength;
    year->nEncoding = ENCODING_LATIN1;

    if (tag[125] == 0 && tag[126] != 0) {
        // The track byte has always been printed as a signed number.
        _MMMetaItem* track = &meta->aItems[META_TRACKNUMBER];
        char digits[8];
        const int n = std::snprintf(digits, sizeof digits, "%d", static_cast<int>(static_cast<int8_t>(tag[126])));
        const uint32_t length = static_cast<uint32_t>(std::min(std::max(n, 0), 4));
        std::memcpy(track->szData, digits, length);
        track->nLength = length;
        track->nEncoding = ENCODING_LATIN1;
    }
    if (tag[127] < kGenreCount) {
        _MMMetaItem* genre = &meta->aItems[META_GENRE];
        const char* name = id3_strGenre[tag[127]];
        const uint32_t length = static_cast<uint32_t>(std::strlen(name));
        std::memcpy(genre->szData, name, length);
        genre->nLength = length;
        genre->nEncoding = ENCODING_LATIN1;
    }
    return MM_OK;
}

int32_t ID3_InitMetaData(const char* path, _MMMetaInfo* meta, ID3_MetaInfo* ctx, int pictureLimit, int h) {
    if (meta == nullptr || ctx == nullptr) return MM_E_INVALIDARG;
    uint64_t size = 0;
    const uint32_t fileSize = path != nullptr && OpenedFileSize(h, path, &size) ? SaturateU32(size) : 0;
    ctx->meta = meta;
    ctx->sizeBound = fileSize;
    ctx->remaining = 0;
    ctx->pictureLimit = static_cast<uint32_t>(pictureLimit);
    ctx->version = 0;
    ctx->unsync = 0;
    for (_MMMetaItem& item : meta->aItems) {
        item.nEncoding = 0;
        item.nLength = 0;
    }
    meta->pPicture = nullptr;
    meta->nPictureSize = 0;
    meta->nRating = 0;
    meta->nPlayCount = 0;
    meta->stAlbumArtist.nEncoding = 0;
    meta->stAlbumArtist.nLength = 0;
    return MM_OK;
}

int32_t ID3_GetMetaInfo(const char* path, _MMMetaInfo* meta, int pictureLimit) {
    if (path == nullptr || meta == nullptr) return MM_E_INVALIDARG;
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return MM_E_INVALIDARG;
    FileCloser closer(h);
    std::memset(meta, 0, sizeof *meta);
    return GetMetaInfoOnHandle(h, path, meta, pictureLimit);
}

}  // namespace metainfo
