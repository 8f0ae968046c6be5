// The walk over an MP4 file's boxes: top level, moov, trak, mdia, minf, stbl,
// the movie/track/media headers and the public per-format entry points.
#include <sys/stat.h>

#include <cstdio>
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/thread_state.h"
#include "metainfo/mp4.h"
#include "mp4/mp4_file.h"
#include "mp4/mp4_internal.h"
#include "mp4/mp4_truth.h"

namespace metainfo {
namespace {

constexpr uint32_t kSoun = FourCC("soun");
constexpr uint32_t kVide = FourCC("vide");

// Reads the header of the box at the current position; on a wrong type or
// size the stream is left after the header.
bool ReadExpectedBox(int h, uint32_t type, _BOXHEADER* header, int64_t* start) {
    *start = Tell(h);
    getBoxHeader(h, header);
    return header->type == type && !BadBoxSize(header->size);
}

// A container's start: checks its header and gives the end of its content.
bool EnterContainer(int h, uint32_t type, int64_t* end) {
    _BOXHEADER header{};
    int64_t start = 0;
    if (!ReadExpectedBox(h, type, &header, &start)) return false;
    *end = start + header.size;
    return true;
}

// The exact timescale and duration of a movie or media header for the
// accurate reader (version 1 keeps 64-bit times).
void RecordTimes(const BoxBuffer& buf, size_t at, uint8_t version, uint32_t type, Mp4Truth* truth) {
    const size_t need = version == 1 ? 28 : 16;
    if (version > 1 || buf.size < at + need) return;
    const uint32_t timescale = ReadBE32(buf.data + at + (version == 1 ? 16 : 8));
    const uint64_t duration = version == 1 ? ReadBE64(buf.data + at + 20) : ReadBE32(buf.data + at + 12);
    if (type == FourCC("mvhd")) {
        truth->movieTimescale = timescale;
        truth->movieDuration = duration;
    } else if (Mp4TrackTruth* track = truth->Track()) {
        track->timescale = timescale;
        track->duration = duration;
    }
}

// Movie and media headers differ only in type and in one error code.
int32_t AnaTimeHeader(int h, uint32_t type, int32_t noMemory, _ME_ClipInfoEx* info) {
    _BOXHEADER header{};
    int64_t start = 0;
    if (!ReadExpectedBox(h, type, &header, &start)) return kMp4BadContainer;
    SeekTo(h, start);
    BoxBuffer buf;
    if (!ReadBoxBuffer(h, header.size, &buf)) return noMemory;
    _MP4FULLBOX full;
    const size_t at = static_cast<size_t>(AnaFullBox(buf.data, buf.size, &full));
    if (at == 0) return MM_E_FAIL;
    ByteReader r(buf.data, buf.size);
    r.Seek(at);
    uint32_t creation = 0, timescale = 0, duration = 0;
    if (full.version == 0) {
        if (r.remaining() < 16) return MM_E_FAIL;
        creation = ReadBE32(buf.data + at);
        timescale = ReadBE32(buf.data + at + 8);
        duration = ReadBE32(buf.data + at + 12);
    } else if (full.version == 1) {
        if (r.remaining() < 24) return MM_E_FAIL;
        // The upper words of the 64-bit times, as callers have always seen them.
        creation = ReadBE32(buf.data + at);
        timescale = ReadBE32(buf.data + at + 16);
        duration = ReadBE32(buf.data + at + 20);
    }
    if (info->truth != nullptr) RecordTimes(buf, at, full.version, type, info->truth);
    int32_t seconds = static_cast<int32_t>(duration);
    if (timescale != 0) {
        // Signed division; through 64 bits so that INT_MIN / -1 cannot trap.
        seconds = static_cast<int32_t>(static_cast<int64_t>(static_cast<int32_t>(duration)) /
                                       static_cast<int32_t>(timescale));
    }
    if (seconds > static_cast<int32_t>(info->clip.nDuration)) info->clip.nDuration = static_cast<uint32_t>(seconds);
    info->clip.nReserved1 = creation;
    return MM_OK;
}

void SetKind(_ME_ClipInfoEx* info, uint32_t handlerType) {
    MP4TrackNode* node = CurrentTrack(info);
    if (node == nullptr) return;
    if (handlerType == kSoun) node->kind = 1;
    if (handlerType == kVide) node->kind = 16;
    if (info->truth != nullptr && info->truth->Track() != nullptr) info->truth->Track()->handler = handlerType;
}

int32_t AnaStbl(int h, uint32_t handlerType, _ME_ClipInfoEx* info) {
    int64_t end = 0;
    if (!EnterContainer(h, FourCC("stbl"), &end)) return kMp4BadContainer;
    Mp4TrackTruth* truth = info->truth != nullptr ? info->truth->Track() : nullptr;
    return WalkChildren(h, end, [&](uint32_t type, int64_t start, uint32_t size) {
        if (type == FourCC("stsd")) AnaStsd(h, handlerType, info);
        if (type == FourCC("stsz")) AnaStsz(h, handlerType, info);
        if (truth == nullptr) return;
        if (type == FourCC("stts")) SttsFacts(h, start, size, truth);
        if (type == FourCC("stco") || type == FourCC("co64"))
            ChunkOffsetFacts(h, start, size, type == FourCC("co64"), truth);
    });
}

int32_t AnaMinf(int h, uint32_t handlerType, _ME_ClipInfoEx* info) {
    int64_t end = 0;
    if (!EnterContainer(h, FourCC("minf"), &end)) return kMp4BadContainer;
    return WalkChildren(h, end, [&](uint32_t type, int64_t, uint32_t) {
        // Only "stbl" passes AnaStbl's own type check.
        if (type == FourCC("stbl") || type == FourCC("dinf") || type == FourCC("hmhd") || type == FourCC("nmhd") ||
            type == FourCC("smhd") || type == FourCC("vmhd")) {
            AnaStbl(h, handlerType, info);
        }
    });
}

int32_t AnaMdia(int h, int mode, void* out) {
    int64_t end = 0;
    if (!EnterContainer(h, FourCC("mdia"), &end)) return kMp4BadContainer;
    _ME_ClipInfoEx* info = mode == kModeClip ? static_cast<_ME_ClipInfoEx*>(out) : nullptr;
    uint32_t handlerType = 0;
    int64_t minf = -1;
    auto applyHandler = [&](int32_t result) {
        if (result != MM_OK) return;
        if (mode == kModeTrackType) {
            int* bits = static_cast<int*>(out);
            if (handlerType == kSoun) *bits |= TRACK_AUDIO;
            if (handlerType == kVide) *bits |= TRACK_VIDEO;
        }
        if (info != nullptr) SetKind(info, handlerType);
    };
    int32_t result = WalkChildren(h, end, [&](uint32_t type, int64_t start, uint32_t) {
        if (type == FourCC("hdlr")) {
            applyHandler(AnaHdlr(h, &handlerType));
        } else if (type == FourCC("mdhd")) {
            // The handler box is looked for right behind the media header; in
            // other modes the stream still stands at "mdhd", which AnaHdlr refuses.
            if (info != nullptr) AnaMdhd(h, info);
            applyHandler(AnaHdlr(h, &handlerType));
        } else if (type == FourCC("minf")) {
            minf = start;
        }
    });
    if (info != nullptr && minf >= 0 && handlerType != 0) {
        SeekTo(h, minf);
        AnaMinf(h, handlerType, info);
    }
    return result;
}

bool AddTruthTrack(Mp4Truth* truth) {
    try {
        truth->tracks.emplace_back();
    } catch (const std::bad_alloc&) {
        return false;
    }
    return true;
}

int32_t AnaTrak(int h, int mode, void* out) {
    int64_t end = 0;
    if (!EnterContainer(h, FourCC("trak"), &end)) return kMp4BadContainer;
    _ME_ClipInfoEx* info = mode == kModeClip ? static_cast<_ME_ClipInfoEx*>(out) : nullptr;
    if (info != nullptr) {
        MP4TrackNode* node = new (std::nothrow) MP4TrackNode();
        if (node == nullptr) return MM_E_OUTOFMEMORY;
        ListNodeInit(&node->link);
        if (info->tracks == nullptr) {
            info->tracks = node;
        } else {
            _ListNodeAddPrev(&info->tracks->link, &node->link);
        }
        if (info->truth != nullptr && !AddTruthTrack(info->truth)) return MM_E_OUTOFMEMORY;
    }
    return WalkChildren(h, end, [&](uint32_t type, int64_t start, uint32_t size) {
        if (type == FourCC("mdia")) AnaMdia(h, mode, out);
        if (type == FourCC("tkhd") && info != nullptr) AnaTkhd(h, info);
        if (type == FourCC("edts") && info != nullptr && info->truth != nullptr)
            EditListFacts(h, start, size, info->truth->Track());
    });
}

int32_t AnaMoov(int h, int mode, void* out) {
    int64_t end = 0;
    if (!EnterContainer(h, FourCC("moov"), &end)) return kMp4BadContainer;
    Mp4Truth* truth = mode == kModeClip ? static_cast<_ME_ClipInfoEx*>(out)->truth : nullptr;
    return WalkChildren(h, end, [&](uint32_t type, int64_t start, uint32_t size) {
        if (truth != nullptr && type == FourCC("meta")) MetaFacts(h, start, size, truth);
        if (truth != nullptr && type == FourCC("udta")) UdtaFacts(h, start, size, truth);
        if (truth != nullptr && type == FourCC("mvex")) truth->fragmented = true;
        if (type == FourCC("mvhd") && mode == kModeClip) {
            AnaMvhd(h, static_cast<_ME_ClipInfoEx*>(out));
        } else if (type == FourCC("trak") && (mode == kModeClip || mode == kModeTrackType)) {
            AnaTrak(h, mode, out);
        } else if (type == FourCC("meta") && mode == kModeMeta) {
            AnaMeta(h, static_cast<_MMMetaInfo*>(out));
        } else if (type == FourCC("udta") && (mode == kModeMeta || mode == kModeMaker)) {
            AnaUdta(h, mode, out);
        }
    });
}

void RecordBrands(const _FILETYPEBOX& ftyp, Mp4Truth* truth) {
    if (truth == nullptr) return;
    truth->majorBrand = ftyp.majorBrand;
    if (ftyp.compatibleBrands == nullptr) return;
    try {
        truth->brands.assign(ftyp.compatibleBrands, ftyp.compatibleBrands + ftyp.brandCount);
    } catch (const std::bad_alloc&) {
        truth->brands.clear();
    }
}

int32_t OpenedWalk(int h, uint64_t fileSize, int mode, void* out) {
    // Sizes are kept in 32 bits: 2 GiB and more is refused.
    if (fileSize > 0x7FFFFFFFu) return MM_E_FAIL;
    s_mp4FileSize = static_cast<uint32_t>(fileSize);
    return MP4_ParseFile(h, mode, out);
}

}  // namespace

MP4TrackNode* CurrentTrack(_ME_ClipInfoEx* info) {
    if (info == nullptr || info->tracks == nullptr) return nullptr;
    return reinterpret_cast<MP4TrackNode*>(info->tracks->link.prev);
}

void FreeTrackList(_ME_ClipInfoEx* info) {
    if (info->tracks != nullptr) ListNodeFreeAll<MP4TrackNode>(&info->tracks->link);
    info->tracks = nullptr;
}

void RefineClipInfo(_ME_ClipInfoEx* info) {
    if ((info->clip.bHasAudio < 2 && info->clip.bHasVideo < 2) || info->tracks == nullptr) return;
    ListNode* node = &info->tracks->link;
    uint32_t ordinal = 0;
    do {
        reinterpret_cast<MP4TrackNode*>(node)->ordinal = ordinal++;
        node = node->next;
    } while (node != &info->tracks->link);
}

int32_t AnaMvhd(int h, _ME_ClipInfoEx* info) { return AnaTimeHeader(h, FourCC("mvhd"), kMp4BadEntry, info); }

int32_t AnaMdhd(int h, _ME_ClipInfoEx* info) { return AnaTimeHeader(h, FourCC("mdhd"), MM_E_OUTOFMEMORY, info); }

int32_t AnaTkhd(int h, _ME_ClipInfoEx* info) {
    _BOXHEADER header{};
    int64_t start = 0;
    if (!ReadExpectedBox(h, FourCC("tkhd"), &header, &start)) return kMp4BadContainer;
    SeekTo(h, start);
    BoxBuffer buf;
    if (!ReadBoxBuffer(h, header.size, &buf)) return MM_E_OUTOFMEMORY;
    _MP4FULLBOX full;
    const size_t at = static_cast<size_t>(AnaFullBox(buf.data, buf.size, &full));
    if (at == 0 || full.version > 1) return MM_E_FAIL;
    const size_t offset = static_cast<size_t>(at) + (full.version == 0 ? 72 : 84);
    if (buf.size < offset + 8) return MM_E_FAIL;
    const uint32_t width = ReadBE32(buf.data + offset) >> 16;
    const uint32_t height = ReadBE32(buf.data + offset + 4) >> 16;
    // The first track that declares a size wins.
    if (info->truth != nullptr && info->truth->Track() != nullptr) {
        info->truth->Track()->trackId = ReadBE32(buf.data + at + (full.version == 0 ? 8 : 16));
        info->truth->Track()->tkhdWidth = width;
        info->truth->Track()->tkhdHeight = height;
    }
    if (width != 0 && info->clip.nWidth == 0) info->clip.nWidth = width;
    if (height != 0 && info->clip.nHeight == 0) info->clip.nHeight = height;
    return MM_OK;
}

int32_t AnaHdlr(int h, uint32_t* handlerType) {
    _BOXHEADER header{};
    int64_t start = 0;
    if (!ReadExpectedBox(h, FourCC("hdlr"), &header, &start)) return kMp4BadContainer;
    SeekTo(h, start);
    BoxBuffer buf;
    if (!ReadBoxBuffer(h, header.size, &buf)) return MM_E_OUTOFMEMORY;
    _MP4FULLBOX full;
    const size_t at = static_cast<size_t>(AnaFullBox(buf.data, buf.size, &full));
    if (at == 0 || buf.size < static_cast<size_t>(at) + 8) return MM_E_FAIL;
    *handlerType = ReadBE32(buf.data + at + 4);
    return MM_OK;
}

int32_t MP4_ParseFile(int h, int mode, void* out) {
    // A descriptor's stream may start anywhere: the first box is where it stands.
    const int64_t origin = Tell(h);
    _BOXHEADER first{};
    getBoxHeader(h, &first);
    if (BadBoxSize(first.size)) return MM_E_FAIL;
    _FILETYPEBOX ftyp;
    std::memset(&ftyp, 0, sizeof ftyp);
    if (first.type == FourCC("ftyp")) {
        SeekTo(h, origin);
        BoxBuffer buf;
        if (!ReadBoxBuffer(h, first.size, &buf)) return MM_E_OUTOFMEMORY;
        AnaFileType(buf.data, buf.size, &ftyp);
        if (mode == kModeClip) RecordBrands(ftyp, static_cast<_ME_ClipInfoEx*>(out)->truth);
    } else if (first.type == FourCC("mdat")) {
        SeekTo(h, origin);
    } else {
        return kMp4BadFirstBox;
    }
    for (;;) {
        const int64_t start = Tell(h);
        _BOXHEADER box{};
        if (start < 0 || getBoxHeader(h, &box) == 0 || BadBoxSize(box.size)) break;
        SeekTo(h, start);
        if (box.type == FourCC("moov")) {
            AnaMoov(h, mode, out);
        } else if (box.type == FourCC("udta") && (mode == kModeMeta || mode == kModeMaker)) {
            AnaUdta(h, mode, out);
        } else if (box.type == FourCC("udta") && mode == kModeClip && static_cast<_ME_ClipInfoEx*>(out)->truth) {
            UdtaFacts(h, start, box.size, static_cast<_ME_ClipInfoEx*>(out)->truth);
        }
        // "free", "skip", "mdat", "moof", "mfra", "uuid" and others carry nothing to gather.
        SeekTo(h, start + box.size);
        if (Tell(h) >= static_cast<int64_t>(s_mp4FileSize) || MEx_feof(h)) break;
    }
    delete[] ftyp.compatibleBrands;
    if (mode == kModeClip) {
        _MMClipInfo& clip = static_cast<_ME_ClipInfoEx*>(out)->clip;
        clip.nFileSize = s_mp4FileSize;
        if (clip.nDuration != 0) {
            // The product is taken in 32 bits and wraps for files of 512 MiB
            // and more; callers have always seen that bit rate.
            const uint32_t bits = static_cast<uint32_t>(s_mp4FileSize * 8u);
            clip.nBitrate = bits / clip.nDuration;
        }
    }
    return MM_OK;
}

int32_t MP4_GetMediaInfo(const char* path, int mode, void* out, FileMemoKey* key) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return kMp4NotOpened;
    FileCloser closer(h);
    if (key != nullptr) *key = FileMemoKey::Of(h);
    return Mp4WalkOpened(h, path, mode, out);
}

int32_t Mp4WalkOpened(int h, const char* path, int mode, void* out) {
    uint64_t size = 0;
    if (!OpenedFileSize(h, path, &size)) return MM_E_FAIL;
    return OpenedWalk(h, size, mode, out);
}

int32_t MP4_GetMediaInfoFd(int fd, int mode, void* out) {
    // Descriptor 0 stands for "no descriptor".
    if (fd <= 0) return kMp4NotOpened;
    struct stat st;
    if (::fstat(fd, &st) != 0 || st.st_size < 0) return MM_E_FAIL;
    if (static_cast<uint64_t>(st.st_size) > 0x7FFFFFFFu) return MM_E_FAIL;
    // A handle of our own over a duplicate: the caller keeps its descriptor.
    const int h = MEx_fdopen(fd, "rb");
    if (h == 0) return kMp4NotOpened;
    FileCloser closer(h);
    return OpenedWalk(h, static_cast<uint64_t>(st.st_size), mode, out);
}

int32_t MP4_GetTrackType(const char* path, int* bits) {
    if (path == nullptr || bits == nullptr) return MM_E_INVALIDARG;
    *bits = 0;
    return MP4_GetMediaInfo(path, kModeTrackType, bits);
}

int32_t MP4_GetMetaInfo(const char* path, _MMMetaInfo* meta, int /*pictureLimit*/) {
    if (path == nullptr || meta == nullptr) return MM_E_INVALIDARG;
    return MP4_GetMediaInfo(path, kModeMeta, meta);
}

int32_t MP4_GetClipInfo(const char* path, _MMClipInfo* clip) {
    if (path == nullptr || clip == nullptr) return MM_E_INVALIDARG;
    _ME_ClipInfoEx info;
    std::memset(&info, 0, sizeof info);
    FileMemoKey key;
    int32_t result = MP4_GetMediaInfo(path, kModeClip, &info, &key);
    RememberCodecAnswer(key, result, info);
    if (result == MM_OK) {
        RefineClipInfo(&info);
        std::memcpy(clip, &info.clip, sizeof *clip);
        result = CopyExtensionAsFormat(path, clip->szFormat);
    }
    FreeTrackList(&info);
    return result;
}

}  // namespace metainfo

using namespace metainfo;

extern "C" {

int32_t MP4_GetMakerInfo(const char* path, _MAKERINFO* maker) {
    if (path == nullptr || maker == nullptr) return MM_E_INVALIDARG;
    // Gathered apart: the caller's record is only written once a maker box
    // was read to its end, and buffers of an earlier maker box are released.
    _MAKERINFO found;
    std::memset(&found, 0, sizeof found);
    int32_t result = MP4_GetMediaInfo(path, kModeMaker, &found);
    if (found.nValid == 1) std::memcpy(maker, &found, sizeof found);
    return result;
}

}  // extern "C"
