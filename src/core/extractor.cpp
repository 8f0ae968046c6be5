// The exported query functions: check arguments, clear the caller's record,
// find the format's slot and call it.
#include <cstring>

#include "core/detect.h"
#include "core/dispatch.h"
#include "metainfo/metainfo.h"

namespace metainfo {
namespace {

// The slot for a media type, or null when the type has none. Only 255 is a
// type that detection produces outside the table; any other value beyond it
// is refused rather than indexed.
template <typename Fn>
Fn Slot(const Fn (&table)[MM_MEDIA_SLOTS], int type) {
    if (type < 0 || type >= MM_MEDIA_SLOTS) return nullptr;
    return table[type];
}

uint32_t SecondsToMilliseconds(uint32_t seconds) {
    // The caller never sees less than one second.
    if (seconds == 0) seconds = 1;
    return seconds * 1000;
}

}  // namespace
}  // namespace metainfo

using namespace metainfo;

extern "C" {

int32_t MM_MediaExtractor_DetectMediaType(const char* path, int* type) { return DetectMediaType(path, type); }

int32_t MM_MediaExtractor_CheckMediaType(const char* path) { return CheckMediaType(path); }

int32_t MM_MediaExtractor_GetTrackType(const char* path, int type, int* mask) {
    if (path == nullptr || mask == nullptr) return MM_E_INVALIDARG;
    if (type == MEDIA_TYPE_UNKNOWN || type < 0 || type >= MM_MEDIA_SLOTS) return MM_E_UNSUPPORTED;
    MM_TrackTypeFn fn = Slot(MM_GetTrackType, type);
    if (fn == nullptr) {
        *mask = TRACK_AUDIO;
        return MM_OK;
    }
    return fn(path, mask);
}

int32_t MM_MediaExtractor_GetCodecType(const char* path, int type, _MM_CODECTYPE* codec) {
    if (path == nullptr || codec == nullptr) return MM_E_INVALIDARG;
    std::memset(codec, 0, sizeof *codec);
    MM_CodecTypeFn fn = Slot(MM_GetCodecType, type);
    return fn != nullptr ? fn(path, codec) : MM_E_UNSUPPORTED;
}

int32_t MM_MediaExtractor_GetCodecTypeEx(const char*, int, _MM_CODECTYPE*) { return MM_E_UNSUPPORTED; }

int32_t MM_MediaExtractor_GetClipInfo(const char* path, int type, _MMClipInfo* clip) {
    if (path == nullptr || clip == nullptr) return MM_E_INVALIDARG;
    std::memset(clip, 0, sizeof *clip);
    MM_ClipInfoFn fn = Slot(MM_GetClipInfo, type);
    if (fn == nullptr) return MM_E_UNSUPPORTED;
    int32_t result = fn(path, clip);
    // Even a failed query reports its duration in milliseconds.
    clip->nDuration = SecondsToMilliseconds(clip->nDuration);
    return result;
}

int32_t MM_MediaExtractor_FreeClipInfo(_MMClipInfo*) { return MM_OK; }

int32_t MM_MediaExtractor_GetMetaInfo(const char* path, int type, _MMMetaInfo* meta) {
    if (path == nullptr || meta == nullptr) return MM_E_INVALIDARG;
    std::memset(meta, 0, sizeof *meta);
    MM_MetaInfoFn fn = Slot(MM_GetMetaInfo, type);
    // A limit of 1 loads only pictures within each reader's own ceiling.
    return fn != nullptr ? fn(path, meta, 1) : MM_E_UNSUPPORTED;
}

int32_t MM_MediaExtractor_FreeMetaInfo(_MMMetaInfo* meta) {
    if (meta == nullptr) return MM_E_INVALIDARG;
    delete[] meta->pPicture;
    std::memset(meta, 0, sizeof *meta);
    return MM_OK;
}

int32_t MM_MediaExtractor_GetMIMEType(const char* path, _MM_MIMETYPE* mime) {
    if (path == nullptr || mime == nullptr) return MM_E_INVALIDARG;
    std::memset(mime, 0, sizeof *mime);
    int type = MEDIA_TYPE_UNKNOWN;
    int32_t result = DetectMediaType(path, &type);
    if (result != MM_OK) return result;
    MM_MIMETypeFn fn = Slot(MM_GetMIMEType, type);
    return fn != nullptr ? fn(path, mime) : MM_E_UNSUPPORTED;
}

int32_t MM_MediaExtractor_GetAudioData(const char* path, int startSec, int endSec, unsigned char** data, int* size) {
    if (path == nullptr || data == nullptr || size == nullptr) return MM_E_INVALIDARG;
    int type = MEDIA_TYPE_UNKNOWN;
    int32_t result = DetectMediaType(path, &type);
    if (result != MM_OK) return result;
    MM_AudioDataFn fn = Slot(MM_GetAudioData, type);
    return fn != nullptr ? fn(path, startSec, endSec, data, size) : MM_E_UNSUPPORTED;
}

int32_t MM_MediaExtractor_GetVideoData(const char*, int, int, unsigned char**, int*) { return MM_OK; }

int32_t MM_MediaExtractor_GetMakerInfo(const char* path, _MAKERINFO* maker) {
    int type = MEDIA_TYPE_UNKNOWN;
    int32_t result = DetectMediaType(path, &type);
    if (result != MM_OK) return result;
    if (type != MEDIA_TYPE_MP4) return MM_OK;
    if (maker == nullptr) return MM_E_INVALIDARG;
    return kMakerInfoReader != nullptr ? kMakerInfoReader(path, maker) : MM_E_UNSUPPORTED;
}

void MM_MediaExtractor_FreeBuffer(void* p) { delete[] static_cast<unsigned char*>(p); }

}  // extern "C"
