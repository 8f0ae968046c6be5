// The codec query: the audio and video codecs of the first tracks of each
// kind, from the same walk as the clip information.
#include <cstring>

#include "core/file_access.h"
#include "core/file_memo.h"
#include "metainfo/mp4.h"
#include "mp4/mp4_file.h"
#include "mp4/mp4_internal.h"

namespace metainfo {
namespace {

// What a codec query answers after a walk: whether the record was written,
// and the result.
struct CodecAnswer {
    bool written = false;
    int32_t result = MM_E_FAIL;
    _MM_CODECTYPE codec{};
};

CodecAnswer AnswerOf(int32_t walk, const _ME_ClipInfoEx& info) {
    CodecAnswer a;
    if (walk != MM_OK) return a;
    a.written = true;
    if (info.tracks == nullptr) return a;
    const ListNode* node = &info.tracks->link;
    do {
        const auto* track = reinterpret_cast<const MP4TrackNode*>(node);
        if (track->kind == 1) {
            if (a.codec.nAudioCodec == 0) a.codec.nAudioCodec = track->codec;
            if (a.codec.nAudioSubType == 0) a.codec.nAudioSubType = track->codecDetail;
        } else if (track->kind == 16) {
            if (a.codec.nVideoCodec == 0) a.codec.nVideoCodec = track->codec;
        }
        node = node->next;
    } while (node != &info.tracks->link);
    a.result = MM_OK;
    return a;
}

int32_t Give(const CodecAnswer& a, _MM_CODECTYPE* codec) {
    if (a.written) *codec = a.codec;
    return a.result;
}

// The answer of this thread's last clip walk of a file by path.
thread_local FileMemo<CodecAnswer> t_lastCodec;

// The answer of a codec-only clip walk made by walk(&info).
template <typename Walk>
int32_t CodecOfWalk(const Walk& walk, _MM_CODECTYPE* codec) {
    _ME_ClipInfoEx info;
    std::memset(&info, 0, sizeof info);
    info.codecOnly = true;
    const CodecAnswer a = AnswerOf(walk(&info), info);
    FreeTrackList(&info);
    return Give(a, codec);
}

}  // namespace

void RememberCodecAnswer(const FileMemoKey& key, int32_t walk, const _ME_ClipInfoEx& info) {
    t_lastCodec.Remember(key, AnswerOf(walk, info));
}

int32_t MP4_GetCodecType(const char* path, _MM_CODECTYPE* codec) {
    if (path == nullptr || codec == nullptr) return MM_E_INVALIDARG;
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return MM_E_FAIL;
    FileCloser closer(h);
    CodecAnswer recalled;
    if (t_lastCodec.Recall(FileMemoKey::Of(h), &recalled)) return Give(recalled, codec);
    return CodecOfWalk([&](_ME_ClipInfoEx* info) { return Mp4WalkOpened(h, path, kModeClip, info); }, codec);
}

}  // namespace metainfo

using namespace metainfo;

extern "C" int32_t MP4_GetCodecTypeEx(int fd, _MM_CODECTYPE* codec) {
    if (codec == nullptr) return MM_E_INVALIDARG;
    return CodecOfWalk([&](_ME_ClipInfoEx* info) { return MP4_GetMediaInfoFd(fd, kModeClip, info); }, codec);
}
