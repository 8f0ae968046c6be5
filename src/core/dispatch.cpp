// The per-format dispatch tables, indexed by media type. A format fills its
// row here and nothing else of the core knows about it.
#include "core/dispatch.h"

#include "speech/amr.h"
#include "speech/evrc.h"
#include "speech/midi.h"
#include "speech/qcp.h"
#include "speech/wave.h"

namespace metainfo {
const MakerInfoFn kMakerInfoReader = nullptr;
}  // namespace metainfo

using namespace metainfo;

extern "C" {

const MM_TrackTypeFn MM_GetTrackType[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ nullptr,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ MIDI_GetTrackType,
    /* 6 AAC */ nullptr,
    /* 7 WAVE */ WAVE_GetTrackType,
    /* 8 AMR-NB */ AMR_GetTrackType,
    /* 9 AMR-WB */ AMR_GetTrackType,
    /* 10 */ nullptr,
    /* 11 AVI */ nullptr,
    /* 12 QCP */ QCP_GetTrackType,
    /* 13 EVRC */ EVRC_GetTrackType,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_MetaInfoFn MM_GetMetaInfo[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ nullptr,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ MIDI_GetMetaInfo,
    /* 6 AAC */ nullptr,
    /* 7..15 */ nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr,
};

const MM_ClipInfoFn MM_GetClipInfo[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ nullptr,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ MIDI_GetClipInfo,
    /* 6 AAC */ nullptr,
    /* 7 WAVE */ WAVE_GetClipInfo,
    /* 8 AMR-NB */ AMR_GetClipInfo,
    /* 9 AMR-WB */ AMR_GetClipInfo,
    /* 10 */ nullptr,
    /* 11 AVI */ nullptr,
    /* 12 QCP */ QCP_GetClipInfo,
    /* 13 EVRC */ EVRC_GetClipInfo,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_MIMETypeFn MM_GetMIMEType[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ nullptr,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ nullptr,
    /* 6 AAC */ nullptr,
    /* 7 WAVE */ WAVE_GetMIMEType,
    /* 8 AMR-NB */ AMR_GetMIMEType,
    /* 9 AMR-WB */ AMR_GetMIMEType,
    /* 10 */ nullptr,
    /* 11 AVI */ nullptr,
    /* 12 QCP */ nullptr,
    /* 13 EVRC */ nullptr,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_AudioDataFn MM_GetAudioData[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ nullptr,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ nullptr,
    /* 6 AAC */ nullptr,
    /* 7 WAVE */ WAVE_GetAudioData2Buf,
    /* 8 AMR-NB */ AMR_GetAudioData2Buf,
    /* 9 AMR-WB */ AMR_GetAudioData2Buf,
    /* 10 */ nullptr,
    /* 11 AVI */ nullptr,
    /* 12 QCP */ nullptr,
    /* 13 EVRC */ nullptr,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_CodecTypeFn MM_GetCodecType[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ nullptr,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ nullptr,
    /* 4 ASF */ nullptr,
    /* 5 MIDI */ nullptr,
    /* 6 AAC */ nullptr,
    /* 7 WAVE */ WAVE_GetCodecType,
    /* 8 AMR-NB */ AMR_GetCodecType,
    /* 9 AMR-WB */ AMR_GetCodecType,
    /* 10 */ nullptr,
    /* 11 AVI */ nullptr,
    /* 12 QCP */ QCP_GetCodecType,
    /* 13 EVRC */ EVRC_GetCodecType,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_VideoDataFn MM_GetVideoData[MM_MEDIA_SLOTS] = {};

}  // extern "C"
