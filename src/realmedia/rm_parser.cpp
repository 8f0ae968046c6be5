// RealMedia: one walk over the header chunks answers each request.
#include "realmedia/rm_parser.h"

#include <cstdio>
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "mp3/id3.h"

namespace metainfo {
namespace {

constexpr uint32_t kRmfFieldBytes = 18;  // through the header count
constexpr uint32_t kPropFieldBytes = 50;  // through the flags
constexpr uint32_t kMdprFieldBytes = 41;  // through the stream name length

// A whole chunk read into a buffer of at least minBytes (zero beyond the chunk).
class ChunkBuffer {
public:
    ChunkBuffer() = default;
    ~ChunkBuffer() { delete[] data_; }
    ChunkBuffer(const ChunkBuffer&) = delete;
    ChunkBuffer& operator=(const ChunkBuffer&) = delete;

    // The file stands at the chunk's start, fileSize - start bytes before the
    // end. 0 or kRmReadFailed.
    int32_t Read(int h, uint32_t size, uint32_t minBytes, uint64_t left) {
        delete[] data_;
        data_ = nullptr;
        // A chunk the file cannot hold is a short read; nothing is allocated for it.
        if (size > left) return kRmReadFailed;
        uint64_t room = size > minBytes ? size : minBytes;
        data_ = new (std::nothrow) unsigned char[room]();
        if (data_ == nullptr) return kRmReadFailed;
        if (MEx_fread(data_, 1, size, h) != static_cast<int>(size)) return kRmReadFailed;
        return 0;
    }
    const unsigned char* data() const { return data_; }

private:
    unsigned char* data_ = nullptr;
};

uint64_t Left(uint64_t fileSize, int64_t start) {
    return start >= 0 && uint64_t(start) < fileSize ? fileSize - uint64_t(start) : 0;
}

bool ReadTag(int h, unsigned char tag[4]) { return MEx_fread(tag, 1, 4, h) == 4; }

bool NameHas(const _MEDIA_PROPERTIES& mp, const char* word) {
    return mp.stream_name != nullptr && std::strstr(reinterpret_cast<const char*>(mp.stream_name), word) != nullptr;
}

bool IsLogical(const _MEDIA_PROPERTIES& mp) {
    return mp.mime_type != nullptr && mp.mime_type_size >= 8 && std::memcmp(mp.mime_type, "logical-", 8) == 0;
}

// Copies a stream's MIME type (with its two terminating zeros) into a new buffer.
int32_t HandOutMime(const _MEDIA_PROPERTIES& mp, char** out, uint32_t* length) {
    delete[] * out;
    *out = nullptr;
    *length = 0;
    uint32_t n = mp.mime_type_size;
    char* p = new (std::nothrow) char[n + 2];
    if (p == nullptr) return MM_E_OUTOFMEMORY;
    if (mp.mime_type != nullptr) {
        std::memcpy(p, mp.mime_type, n + 2);
    } else {
        std::memset(p, 0, n + 2);
    }
    *out = p;
    *length = n;
    return 0;
}

// What the walk over the stream headers found.
struct Streams {
    uint32_t audioCount = 0;
    uint32_t videoCount = 0;
    // The first audio and first video stream; one record may be both.
    _MEDIA_PROPERTIES kept[2];
    int keptCount = 0;
    int audio = -1;
    int video = -1;
    _RA_OpaqueHdr ra{};
    _RV_OpaqueHdr rv{};
};

void Classify(_MEDIA_PROPERTIES* mp, Streams* s) {
    if (IsLogical(*mp)) return;
    bool isAudio = NameHas(*mp, "Audio");
    bool isVideo = NameHas(*mp, "Video");
    if (isAudio) ++s->audioCount;
    if (isVideo) ++s->videoCount;
    bool firstAudio = isAudio && s->audio < 0;
    bool firstVideo = isVideo && s->video < 0;
    if (!firstAudio && !firstVideo) return;
    int slot = s->keptCount++;
    s->kept[slot].TakeFrom(mp);
    const _MEDIA_PROPERTIES& k = s->kept[slot];
    if (firstAudio) {
        s->audio = slot;
        parseRAOpaquedata(k.type_specific_data, k.type_specific_len, &s->ra);
    }
    if (firstVideo) {
        s->video = slot;
        parseRVOpaquedata(k.type_specific_data, k.type_specific_len, &s->rv);
    }
}

void FillClip(const _PROPERTIES& prop, const Streams& s, _MMClipInfo* clip) {
    clip->nDuration = static_cast<uint32_t>(prop.duration);
    clip->nBitrate = prop.avg_bit_rate;
    clip->bHasAudio = s.audioCount;
    clip->bHasVideo = s.videoCount;
    uint32_t audioSeconds = 0, videoSeconds = 0;
    if (s.audio >= 0) {
        const _MEDIA_PROPERTIES& a = s.kept[s.audio];
        clip->nAudioBitrate = a.max_bit_rate;
        clip->nSampleRate = s.ra.sample_rate;
        clip->nChannels = s.ra.channels;
        clip->nBitsPerSample = s.ra.sample_size;
        audioSeconds = a.duration;
    }
    if (s.video >= 0) {
        const _MEDIA_PROPERTIES& v = s.kept[s.video];
        clip->nVideoBitrate = v.max_bit_rate;
        clip->nWidth = s.rv.width;
        clip->nHeight = s.rv.height;
        clip->nFrameRate = s.rv.frame_rate;
        videoSeconds = v.duration;
    }
    if (prop.duration < 1) clip->nDuration = audioSeconds > videoSeconds ? audioSeconds : videoSeconds;
}

}  // namespace

int32_t RM_GetMediaInfo(const char* path, uint16_t request, void* out) {
    if (path == nullptr || out == nullptr) return MM_E_INVALIDARG;
    int h = MEx_fopen(path, "rb");
    if (h == 0) return kRmNotRealMedia;
    FileCloser closer(h);
    uint64_t fileSize = 0;
    if (!OpenedFileSize(h, path, &fileSize)) return kRmNotRealMedia;

    unsigned char tag[4];
    if (!ReadTag(h, tag) || std::memcmp(tag, ".RMF", 4) != 0) return kRmNotRealMedia;
    uint32_t size = GetUINT32(h, false);
    if (size < 1 || size >= fileSize) return kRmNotRealMedia;
    MEx_fseek(h, 0, SEEK_SET);
    ChunkBuffer chunk;
    int32_t r = chunk.Read(h, size, kRmfFieldBytes, fileSize);
    if (r != 0) return r;
    uint16_t version = ReadBE16(chunk.data() + 8);
    uint32_t headerCount = ReadBE32(chunk.data() + 14);
    if (version > 1 || headerCount < 3) return kRmBadHeader;

    const int64_t propStart = MEx_ftell(h);
    if (propStart < 0 || !ReadTag(h, tag) || std::memcmp(tag, "PROP", 4) != 0) return kRmBadHeader;
    size = GetUINT32(h, false);
    if (size < 1 || size >= fileSize) return kRmNotRealMedia;
    MEx_fseek(h, propStart, SEEK_SET);
    r = chunk.Read(h, size, kPropFieldBytes, Left(fileSize, propStart));
    if (r != 0) return r;
    _PROPERTIES prop;
    anaProperties(chunk.data(), size, &prop);

    Streams streams;
    uint32_t taken = 0;
    int32_t contentResult = -1;
    for (uint32_t k = 0; k + 2 < headerCount; ++k) {
        int64_t start = MEx_ftell(h);
        if (start < 0) return kRmBadChunk;
        unsigned char id[4] = {};
        MEx_fread(id, 1, 4, h);
        size = GetUINT32(h, false);
        if (size <= 9 || size >= fileSize) return kRmBadChunk;
        if (std::memcmp(id, "MDPR", 4) == 0 && request != INFO_METADATA && taken < prop.num_streams) {
            MEx_fseek(h, start, SEEK_SET);
            r = chunk.Read(h, size, kMdprFieldBytes, Left(fileSize, start));
            if (r != 0) return r;
            _MEDIA_PROPERTIES mp;
            r = anaMediaProperties(chunk.data(), size, &mp);
            if (r != 0) return r;
            ++taken;
            Classify(&mp, &streams);
        } else if (std::memcmp(id, "CONT", 4) == 0 && request == INFO_METADATA) {
            MEx_fseek(h, start, SEEK_SET);
            r = chunk.Read(h, size, 0, Left(fileSize, start));
            if (r != 0) return r;
            contentResult = anaContentHdr(chunk.data(), size, static_cast<_MMMetaInfo*>(out));
            break;
        } else {
            // A skip past the end is only noticed when another header must be
            // read there: its size then reads as 0 and is rejected.
            uint64_t next = uint64_t(start) + size;
            if (MEx_fseek(h, static_cast<int64_t>(next), SEEK_SET) != 0) return kRmBadChunk;
        }
    }

    switch (request) {
        case INFO_METADATA:
            if (contentResult == 0) return 0;
            // No usable "CONT": an ID3v1 tag at the end may still name the clip.
            return ParseID3V1(h, static_cast<_MMMetaInfo*>(out)) == 0 ? 0 : contentResult;
        case INFO_CLIPINFO: FillClip(prop, streams, static_cast<_MMClipInfo*>(out)); return 0;
        case INFO_TRACKTYPE: {
            int* flags = static_cast<int*>(out);
            if (streams.audioCount != 0) *flags |= TRACK_AUDIO;
            if (streams.videoCount != 0) *flags |= TRACK_VIDEO;
            return 0;
        }
        case INFO_MIMETYPE: {
            _MM_MIMETYPE* mime = static_cast<_MM_MIMETYPE*>(out);
            if (streams.audio >= 0) {
                r = HandOutMime(streams.kept[streams.audio], &mime->pszMimeType, &mime->nMimeLength);
                if (r != 0) return r;
            }
            if (streams.video >= 0) {
                r = HandOutMime(streams.kept[streams.video], &mime->pszVideoMimeType, &mime->nVideoMimeLength);
                if (r != 0) return r;
            }
            return 0;
        }
        case INFO_CODECTYPE: {
            _MM_CODECTYPE* codec = static_cast<_MM_CODECTYPE*>(out);
            if (streams.audio >= 0) codec->nAudioCodec = RmCodecCode(streams.ra.fourcc);
            if (streams.video >= 0) codec->nVideoCodec = RmCodecCode(streams.rv.fourcc);
            return 0;
        }
        default: return 0;
    }
}

int32_t RM_GetMetaInfo(const char* path, _MMMetaInfo* meta, int /*pictureLimit*/) {
    return RM_GetMediaInfo(path, INFO_METADATA, meta) == 0 ? 0 : 1;
}

int32_t RM_GetTrackType(const char* path, int* mask) {
    if (mask == nullptr) return 1;
    *mask = 0;
    return RM_GetMediaInfo(path, INFO_TRACKTYPE, mask) == 0 ? 0 : 1;
}

int32_t RM_GetMIMEType(const char* path, _MM_MIMETYPE* mime) {
    return RM_GetMediaInfo(path, INFO_MIMETYPE, mime) == 0 ? 0 : 1;
}

int32_t RM_GetCodecType(const char* path, _MM_CODECTYPE* codec) {
    return RM_GetMediaInfo(path, INFO_CODECTYPE, codec) == 0 ? 0 : 1;
}

int32_t RM_GetClipInfo(const char* path, _MMClipInfo* clip) {
    int32_t r = RM_GetMediaInfo(path, INFO_CLIPINFO, clip);
    if (r != 0) return r;
    uint64_t size = 0;
    if (MEx_fsize(path, &size)) clip->nFileSize = SaturateU32(size);
    return CopyExtensionAsFormat(path, clip->szFormat);
}

}  // namespace metainfo
