#include "asf/asf_header.h"

#include <cstring>

#include "asf/asf_codec.h"
#include "asf/asf_guids.h"
#include "asf/asf_io.h"
#include "asf/asf_meta.h"
#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/log.h"
#include "core/thread_state.h"

namespace metainfo {

using namespace asf;

namespace {

constexpr uint32_t kNoVideoStream = 0xFFFFFFFF;
constexpr uint32_t kMaxHeaderObjects = 256;
constexpr int32_t kWalkFailed = -1;

// Stream Properties layout, counted from the object's start.
constexpr uint32_t kStreamTypeEnd = 40;  // GUID, size, Stream Type
constexpr uint32_t kStreamFlagsOffset = 72;  // after the error correction fields

struct TrackBit {
    const uint8_t* type;
    uint32_t bit;
};

const TrackBit kTrackBits[] = {
    {ASF_Audio_Media, 0x1},
    {ASF_Video_Media, 0x10},
    {ASF_Command_Media, 0x100},
    {ASF_JFIF_Media, 0x1000},
    {ASF_Degradable_JPEG_Media, 0x10000},
    {ASF_File_Transfer_Media, 0x100000},
    {ASF_Binary_Media, 0x1000000},
};

// Moves from `consumed` bytes into an object to `consumed` + `remaining`,
// where remaining is worked out from the object's size. A size below the
// object header would put the next read at or before the object's start.
bool SkipRest(int h, uint32_t size, int64_t consumed) {
    if (size < kObjectHeaderSize) return false;
    return SeekBy(h, static_cast<int64_t>(size) - consumed);
}

// Reads an object's size and moves to its end; the file stands after the GUID.
bool SkipObject(int h) {
    uint32_t size = static_cast<uint32_t>(Get64(h));
    return SkipRest(h, size, kObjectHeaderSize);
}

// Where the walk stands just after a GUID; -1 when it cannot tell.
int64_t Here(int h) { return MEx_ftell(h); }

bool PrepareOutput(uint16_t mode, void* out) {
    switch (mode) {
        case kAsfModeMeta: return ASF_InitMetaInfo(static_cast<_MMMetaInfo*>(out)) == 0;
        case kAsfModeClip:
            if (out == nullptr) return false;
            std::memset(out, 0, sizeof(_MMClipInfo));
            return true;
        case kAsfModeTrack:
            if (out == nullptr) return false;
            *static_cast<uint32_t*>(out) = 0;
            return true;
        case kAsfModeCodec:
            if (out == nullptr) return false;
            std::memset(out, 0, sizeof(_MM_CODECTYPE));
            return true;
        default: return true;
    }
}

// Positions just after the GUIDs of the objects whose parsing waits for the
// end of the walk; -1 while not met.
struct Deferred {
    int64_t extContent = -1;
    int64_t headerExtension = -1;
    int64_t bitrate = -1;
};

int32_t WalkObject(int h, const uint8_t* guid, uint16_t mode, void* out, uint32_t allowance, uint32_t* videoStream,
                   Deferred* deferred) {
    if (SameGuid(guid, ASF_File_Properties_Object) && mode == kAsfModeClip) {
        return ASF_ParseFilePropertyObj(h, static_cast<_MMClipInfo*>(out));
    }
    if (SameGuid(guid, ASF_Stream_Properties_Object)) {
        if (mode == kAsfModeClip) {
            const int64_t start = Here(h);
            ASF_GetVideoIndex(h, videoStream);
            if (!SeekTo(h, start)) return kWalkFailed;
            return ASF_ParseStreamPropertyObj(h, static_cast<_MMClipInfo*>(out));
        }
        if (mode == kAsfModeTrack) {
            uint32_t size = static_cast<uint32_t>(Get64(h));
            *static_cast<uint32_t*>(out) |= ASF_GetSteamType(h);
            return SkipRest(h, size, kStreamTypeEnd) ? 0 : kWalkFailed;
        }
        if (mode == kAsfModeCodec) {
            uint32_t size = static_cast<uint32_t>(Get64(h));
            LogPrint(kVerbose, kLogTag, "the currObjSize = %d\n", static_cast<int>(size));
            if (size < kObjectHeaderSize) return kWalkFailed;
            // Its result is not the walk's: the walk goes on from wherever it
            // leaves the file.
            ASF_GetCodecInfo(h, static_cast<_MM_CODECTYPE*>(out));
            return 0;
        }
    } else if (SameGuid(guid, ASF_Header_Extension_Object) && (mode == kAsfModeMeta || mode == kAsfModeClip)) {
        deferred->headerExtension = Here(h);
    } else if (SameGuid(guid, ASF_Content_Description_Object) && mode == kAsfModeMeta) {
        return ASF_ParseContentDescriptionObj(h, static_cast<_MMMetaInfo*>(out));
    } else if (SameGuid(guid, ASF_Extended_Content_Description_Object) && mode == kAsfModeMeta) {
        deferred->extContent = Here(h);
    } else if (SameGuid(guid, ASF_Content_Branding_Object) && mode == kAsfModeMeta) {
        return ASF_ParseContentBrandingObj(h, static_cast<_MMMetaInfo*>(out), allowance);
    } else if (SameGuid(guid, ASF_Stream_Bitrate_Properties_Object) && mode == kAsfModeClip) {
        deferred->bitrate = Here(h);
    }
    return SkipObject(h) ? 0 : kWalkFailed;
}

int32_t RunDeferred(int h, uint16_t mode, void* out, uint32_t allowance, uint32_t videoStream,
                    const Deferred& deferred) {
    if (mode == kAsfModeMeta) {
        _MMMetaInfo* meta = static_cast<_MMMetaInfo*>(out);
        if (deferred.extContent >= 0) {
            if (!SeekTo(h, deferred.extContent)) return kWalkFailed;
            if (ASF_ParseExtContentDescriptionObj(h, meta, allowance) != 0) return kWalkFailed;
        }
        if (deferred.headerExtension >= 0) {
            if (!SeekTo(h, deferred.headerExtension)) return kWalkFailed;
            if (ASF_ParseHdrExtensionObj(h, meta, allowance) != 0) return kWalkFailed;
        }
        return 0;
    }
    if (mode == kAsfModeClip) {
        _MMClipInfo* clip = static_cast<_MMClipInfo*>(out);
        if (clip->bHasVideo > 0) {
            if (deferred.bitrate >= 0) {
                if (!SeekTo(h, deferred.bitrate)) return kWalkFailed;
                if (ASF_ParseStreamBiterateObj(h, clip, videoStream) != 0) return kWalkFailed;
            } else {
                // Unsigned, as the record's fields are: a larger audio rate wraps.
                clip->nVideoBitrate = clip->nBitrate - clip->nAudioBitrate;
            }
        }
        if (deferred.headerExtension >= 0) {
            if (!SeekTo(h, deferred.headerExtension)) return kWalkFailed;
            if (ASF_ParseExtStreamPropertyObj(h, clip, videoStream) != 0) return kWalkFailed;
        }
    }
    return 0;
}

// Checks the Header Object at the start of the opened file and leaves the
// file at its first object; the walk's file size is set on the way.
bool OpenHeader(int h, const char* path, uint64_t* fileSize, uint32_t* count, uint64_t* headerSize) {
    s_asfFileSize = OpenedFileSize(h, path, fileSize) ? SaturateU32(*fileSize) : 0;
    if (h == 0) return false;
    uint8_t head[24];  // GUID and the size, which only the facts walk uses
    if (!ReadExact(h, head, sizeof head) || !SameGuid(head, ASF_Header_Object)) return false;
    if (headerSize != nullptr) *headerSize = ReadLE64(head + 16);
    return Read32(h, count) && *count <= kMaxHeaderObjects && SeekBy(h, 2);
}

}  // namespace

int32_t ASF_WalkHeader(const char* path, AsfObjectVisitor* visitor, uint64_t* fileSize) {
    const int h = MEx_fopen(path, "rb");
    FileCloser closer(h);
    *fileSize = 0;
    uint32_t count = 0;
    uint64_t headerSize = 0;
    if (!OpenHeader(h, path, fileSize, &count, &headerSize)) return kWalkFailed;
    const uint64_t headerEnd = headerSize < *fileSize ? headerSize : *fileSize;
    uint64_t at = 30;  // past the Header Object's own fields
    for (uint32_t i = 0; i < count && at + kObjectHeaderSize <= headerEnd; ++i) {
        uint8_t head[kObjectHeaderSize];
        if (!SeekTo(h, static_cast<int64_t>(at)) || !ReadExact(h, head, sizeof head)) return kWalkFailed;
        const uint64_t size = ReadLE64(head + 16);
        if (size < kObjectHeaderSize || size > headerEnd - at) return kWalkFailed;
        const int32_t result = visitor->Object(h, AsfObjectRef{head, static_cast<int64_t>(at), size});
        if (result != 0) return result;
        at += size;
    }
    return 0;
}

int32_t ASF_GetMediaInfo(const char* path, uint16_t mode, void* out, int32_t flag) {
    uint32_t videoStream = kNoVideoStream;
    const bool prepared = PrepareOutput(mode, out);
    const int h = prepared ? MEx_fopen(path, "rb") : 0;
    FileCloser closer(h);
    uint64_t fileSize = 0;
    uint32_t count = 0;
    if (!OpenHeader(h, path, &fileSize, &count, nullptr)) return kWalkFailed;

    const uint32_t allowance = static_cast<uint32_t>(flag);
    Deferred deferred;
    for (uint32_t i = 0; i < count; ++i) {
        uint8_t guid[16];
        // Fewer objects than counted: the header ends where the file does.
        if (!ReadExact(h, guid, 16)) break;
        if (WalkObject(h, guid, mode, out, allowance, &videoStream, &deferred) != 0) {
            return kWalkFailed;
        }
    }
    return RunDeferred(h, mode, out, allowance, videoStream, deferred);
}

int32_t ASF_ParseFilePropertyObj(int h, _MMClipInfo* clip) {
    // Size, File ID, File Size, Creation Date, Data Packets Count, Play and
    // Send Duration, Preroll, Flags, Minimum and Maximum Data Packet Size,
    // Maximum Bitrate.
    uint8_t b[kAsfFileFieldsSize];
    ReadOrZero(h, b, sizeof b);
    const AsfFileFields p = ASF_DecodeFileFields(b);
    clip->nFileSize = static_cast<uint32_t>(p.fileSize);
    // Milliseconds as a signed 32-bit value: a Preroll longer than the play
    // time gives a negative duration, truncated toward zero.
    int32_t ms = static_cast<int32_t>(static_cast<uint32_t>(p.playDuration / 10000 - p.preroll));
    clip->nDuration = static_cast<uint32_t>(ms / 1000);
    clip->nBitrate = p.maxBitrate;
    return 0;
}

AsfFileFields ASF_DecodeFileFields(const uint8_t* b) {
    return AsfFileFields{ReadLE64(b + 24), ReadLE64(b + 48), ReadLE32(b + 64), ReadLE32(b + 84)};
}

int32_t ASF_GetVideoIndex(int h, uint32_t* videoStream) {
    // The caller returns to where it called from, so the object's end is not sought.
    // Offsets in b count from the end of the object's GUID.
    constexpr uint32_t kTypeEnd = kStreamTypeEnd - 16;
    constexpr uint32_t kFlags = kStreamFlagsOffset - 16;
    uint8_t b[kFlags + 2];
    ReadOrZero(h, b, kTypeEnd);
    if (SameGuid(b + 8, ASF_Video_Media) && *videoStream == kNoVideoStream) {
        ReadOrZero(h, b + kTypeEnd, sizeof b - kTypeEnd);
        *videoStream = ReadLE16(b + kFlags) & 0x7F;
    }
    return 0;
}

int32_t ASF_ParseStreamPropertyObj(int h, _MMClipInfo* clip) {
    uint8_t b[kStreamTypeEnd - 16];
    ReadOrZero(h, b, sizeof b);
    uint32_t size = ReadLE32(b);
    int64_t consumed = kStreamTypeEnd;
    if (SameGuid(b + 8, ASF_Audio_Media)) {
        if (++clip->bHasAudio == 1) {
            // Up to the WAVEFORMATEX, past its format tag, to bits per sample.
            uint8_t w[38 + 2 + 14];
            ReadOrZero(h, w, sizeof w);
            clip->nChannels = ReadLE16(w + 40);
            clip->nSampleRate = ReadLE32(w + 42);
            // Bits per second as the 32-bit field holds it.
            clip->nAudioBitrate = ReadLE32(w + 46) * 8u;
            clip->nBitsPerSample = ReadLE16(w + 52);
            consumed += static_cast<int64_t>(sizeof w);
        }
    } else if (SameGuid(b + 8, ASF_Video_Media)) {
        if (++clip->bHasVideo == 1) {
            uint8_t v[38 + 8];
            ReadOrZero(h, v, sizeof v);
            clip->nWidth = ReadLE32(v + 38);
            clip->nHeight = ReadLE32(v + 42);
            consumed += static_cast<int64_t>(sizeof v);
        }
    }
    return SkipRest(h, size, consumed) ? 0 : kWalkFailed;
}

uint32_t ASF_GetSteamType(int h) {
    uint8_t type[16];
    ReadOrZero(h, type, sizeof type);
    for (const TrackBit& t : kTrackBits) {
        if (SameGuid(type, t.type)) return t.bit;
    }
    return 0;
}

int32_t ASF_ParseStreamBiterateObj(int h, _MMClipInfo* clip, uint32_t videoStream) {
    // Nothing reads on from the object's end (every later step seeks to a
    // remembered position), so the walk does not seek there.
    Get64(h);
    uint16_t records = Get16(h);
    for (uint32_t i = 0; i < records; ++i) {
        uint8_t r[6];
        if (!ReadExact(h, r, sizeof r)) break;
        if ((ReadLE16(r) & 0x7Fu) == videoStream) {
            clip->nVideoBitrate = ReadLE32(r + 2);
            break;
        }
    }
    return 0;
}

int32_t ASF_ParseExtStreamPropertyObj(int h, _MMClipInfo* clip, uint32_t videoStream) {
    // Size, Reserved Field 1 and 2, then Header Extension Data Size.
    uint8_t b[30];
    ReadOrZero(h, b, sizeof b);
    uint32_t dataSize = ReadLE32(b + 26);
    if (dataSize >= s_asfFileSize) return kWalkFailed;

    uint64_t timePerFrame = 0;
    for (uint64_t total = 0; total < dataSize;) {
        uint8_t head[kObjectHeaderSize];
        ReadOrZero(h, head, sizeof head);
        uint32_t size = ReadLE32(head + 16);
        // An object smaller than its own header would never move the walk on.
        if (size < kObjectHeaderSize) return kWalkFailed;
        int64_t consumed = kObjectHeaderSize;
        if (SameGuid(head, ASF_Extended_Stream_Properties_Object)) {
            // Start and End Time, rates, buffers, sizes, Flags, then Stream Number.
            uint8_t e[48 + 2];
            ReadOrZero(h, e, sizeof e);
            consumed += static_cast<int64_t>(sizeof e);
            if (ReadLE16(e + 48) == videoStream) {
                Get16(h);  // Stream Language ID Index
                timePerFrame = Get64(h);
                consumed += 10;
            }
        }
        if (!SeekBy(h, static_cast<int64_t>(size) - consumed)) return kWalkFailed;
        total += size;
    }
    if (timePerFrame != 0) clip->nFrameRate = static_cast<uint32_t>(10000000u / timePerFrame);
    return 0;
}

int32_t ASF_GetClipInfo(const char* path, _MMClipInfo* clip) {
    int32_t result = ASF_GetMediaInfo(path, kAsfModeClip, clip, 0);
    if (result != 0) return result;
    return CopyExtensionAsFormat(path, clip->szFormat);
}

int32_t ASF_GetTrackType(const char* path, int* mask) {
    return ASF_GetMediaInfo(path, kAsfModeTrack, mask, 0) == 0 ? 0 : 1;
}

int32_t ASF_GetCodecType(const char* path, _MM_CODECTYPE* codec) {
    LogPrint(kVerbose, kLogTag, "\nEnter the ASF GetCodec Type %s\n", path != nullptr ? path : "");
    return ASF_GetMediaInfo(path, kAsfModeCodec, codec, 0) == 0 ? 0 : 1;
}

int32_t ASF_GetMetaInfo(const char* path, _MMMetaInfo* meta, int pictureLimit) {
    return ASF_GetMediaInfo(path, kAsfModeMeta, meta, pictureLimit) == 0 ? 0 : 1;
}

uint32_t ASF_unicode2ascii(uint8_t* buf, uint32_t length) {
    if (buf == nullptr) return 0;
    uint32_t kept = 0;
    for (uint32_t i = 0; i < length / 2; ++i) {
        // Byte i is only rewritten for a non-zero low byte: text beyond
        // Latin-1 is not compacted, and the count is what callers compare.
        uint8_t low = buf[size_t{2} * i];
        if (low != 0) {
            buf[i] = low;
            ++kept;
        }
    }
    return kept;
}

int ASF_IsEqualName(const uint8_t* bytes, const char* name, uint32_t length, uint32_t nameLength) {
    if (length != nameLength) return 0;
    return length == 0 || std::memcmp(bytes, name, length) == 0 ? 1 : 0;
}

}  // namespace metainfo
