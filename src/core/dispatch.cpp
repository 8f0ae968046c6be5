// The per-format dispatch tables, indexed by media type. A format fills its
// row here and nothing else of the core knows about it.
#include "core/dispatch.h"

#include "metainfo/mp4.h"
#include "mp4/mp4_file.h"
#include "speech/midi.h"

namespace metainfo {
const MakerInfoFn kMakerInfoReader = MP4_GetMakerInfo;
}  // namespace metainfo

using namespace metainfo;

extern "C" {

const MM_TrackTypeFn MM_GetTrackType[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ MP4_GetTrackType,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ MIDI_GetTrackType,
    /* 6 AAC */ nullptr,
    /* 7 WAVE */ nullptr,
    /* 8 AMR-NB */ nullptr,
    /* 9 AMR-WB */ nullptr,
    /* 10 */ nullptr,
    /* 11 AVI */ nullptr,
    /* 12 QCP */ nullptr,
    /* 13 EVRC */ nullptr,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_MetaInfoFn MM_GetMetaInfo[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ MP4_GetMetaInfo,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ MIDI_GetMetaInfo,
    /* 6 AAC */ nullptr,
    /* 7..15 */ nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr,
};

const MM_ClipInfoFn MM_GetClipInfo[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ MP4_GetClipInfo,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ MIDI_GetClipInfo,
    /* 6 AAC */ nullptr,
    /* 7 WAVE */ nullptr,
    /* 8 AMR-NB */ nullptr,
    /* 9 AMR-WB */ nullptr,
    /* 10 */ nullptr,
    /* 11 AVI */ nullptr,
    /* 12 QCP */ nullptr,
    /* 13 EVRC */ nullptr,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_MIMETypeFn MM_GetMIMEType[MM_MEDIA_SLOTS] = {};
const MM_AudioDataFn MM_GetAudioData[MM_MEDIA_SLOTS] = {};
const MM_CodecTypeFn MM_GetCodecType[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ MP4_GetCodecType,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ nullptr,
    /* 6 AAC */ nullptr,
    /* 7 WAVE */ nullptr,
    /* 8 AMR-NB */ nullptr,
    /* 9 AMR-WB */ nullptr,
    /* 10 */ nullptr,
    /* 11 AVI */ nullptr,
    /* 12 QCP */ nullptr,
    /* 13 EVRC */ nullptr,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};
const MM_VideoDataFn MM_GetVideoData[MM_MEDIA_SLOTS] = {};

}  // extern "C"
