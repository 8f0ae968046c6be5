#include "avi/avi_queries.h"

#include <cstring>

#include "metainfo/avi_parser.h"

namespace metainfo {

int32_t AVI_GetClipInfo(const char* path, _MMClipInfo* clip) {
    if (path == nullptr || clip == nullptr) return MM_E_INVALIDARG;
    std::memset(clip, 0, sizeof *clip);
    CAVIParser* parser = nullptr;
    int32_t result = CreateAVIParserObject(&parser);
    if (result != MM_OK) return result;
    result = parser->init(path, clip);
    FreeAVIParserObject(parser);
    return result;
}

int32_t AVI_GetTrackType(const char* path, int* bits) {
    if (path == nullptr || bits == nullptr) return MM_E_INVALIDARG;
    _MMClipInfo clip;
    std::memset(&clip, 0, sizeof clip);
    CAVIParser* parser = nullptr;
    int32_t result = CreateAVIParserObject(&parser);
    if (result != MM_OK) return result;
    result = parser->init(path, &clip);
    if (result == MM_OK) *bits = (clip.bHasAudio == 1 ? TRACK_AUDIO : 0) + (clip.bHasVideo == 1 ? TRACK_VIDEO : 0);
    FreeAVIParserObject(parser);
    return result;
}

int32_t AVI_GetCodecType(const char*, _MM_CODECTYPE*) { return MM_E_NOTPROVIDED; }

int32_t AVI_GetMIMEType(const char*, _MM_MIMETYPE*) { return MM_E_NOTPROVIDED; }

}  // namespace metainfo
