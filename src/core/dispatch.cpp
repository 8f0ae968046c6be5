// The per-format dispatch tables, indexed by media type. A format fills its
// row here and nothing else of the core knows about it.
#include "core/dispatch.h"

#include "aac/aac_clip.h"
#include "asf/asf_header.h"
#include "avi/avi_queries.h"
#include "metainfo/mp4.h"
#include "mp3/id3.h"
#include "mp3/mp3_extract.h"
#include "mp3/mp3_info.h"
#include "mp4/mp4_file.h"
#include "realmedia/rm_parser.h"
#include "speech/amr.h"
#include "speech/evrc.h"
#include "speech/midi.h"
#include "speech/qcp.h"
#include "speech/wave.h"

namespace metainfo {
const MakerInfoFn kMakerInfoReader = MP4_GetMakerInfo;
}  // namespace metainfo

using namespace metainfo;

extern "C" {

const MM_TrackTypeFn MM_GetTrackType[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ MP3_GetTrackType,
    /* 2 RealMedia */ RM_GetTrackType,
    /* 3 MP4 */ MP4_GetTrackType,
    /* 4 ASF */ ASF_GetTrackType,
    /* 5 MIDI */ MIDI_GetTrackType,
    /* 6 AAC */ AAC_GetTrackType,
    /* 7 WAVE */ WAVE_GetTrackType,
    /* 8 AMR-NB */ AMR_GetTrackType,
    /* 9 AMR-WB */ AMR_GetTrackType,
    /* 10 */ nullptr,
    /* 11 AVI */ AVI_GetTrackType,
    /* 12 QCP */ QCP_GetTrackType,
    /* 13 EVRC */ EVRC_GetTrackType,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_MetaInfoFn MM_GetMetaInfo[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ ID3_GetMetaInfo,
    /* 2 RealMedia */ RM_GetMetaInfo,
    /* 3 MP4 */ MP4_GetMetaInfo,
    /* 4 ASF */ ASF_GetMetaInfo,
    /* 5 MIDI */ MIDI_GetMetaInfo,
    /* 6 AAC */ ID3_GetMetaInfo,
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

const MM_ClipInfoFn MM_GetClipInfo[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ MP3_GetClipInfo,
    /* 2 RealMedia */ RM_GetClipInfo,
    /* 3 MP4 */ MP4_GetClipInfo,
    /* 4 ASF */ ASF_GetClipInfo,
    /* 5 MIDI */ MIDI_GetClipInfo,
    /* 6 AAC */ AAC_GetClipInfo,
    /* 7 WAVE */ WAVE_GetClipInfo,
    /* 8 AMR-NB */ AMR_GetClipInfo,
    /* 9 AMR-WB */ AMR_GetClipInfo,
    /* 10 */ nullptr,
    /* 11 AVI */ AVI_GetClipInfo,
    /* 12 QCP */ QCP_GetClipInfo,
    /* 13 EVRC */ EVRC_GetClipInfo,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

const MM_MIMETypeFn MM_GetMIMEType[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ MP3_GetMIMEType,
    /* 2 RealMedia */ RM_GetMIMEType,
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
    /* 1 MP3 */ MP3_GetAudioData2Buf,
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

// AVI_GetCodecType exists but stays out of this table: AVI codec queries
// answer "unsupported".
const MM_CodecTypeFn MM_GetCodecType[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ MP3_GetCodecType,
    /* 2 RealMedia */ RM_GetCodecType,
    /* 3 MP4 */ MP4_GetCodecType,
    /* 4 ASF */ ASF_GetCodecType,
    /* 5 MIDI */ nullptr,
    /* 6 AAC */ AAC_GetCodecType,
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

// No format hands out video data.
const MM_VideoDataFn MM_GetVideoData[MM_MEDIA_SLOTS] = {};

}  // extern "C"
