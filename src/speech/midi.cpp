#include "speech/midi.h"

#include "metainfo/metainfo.h"

extern "C" {
// Attachment points for a separate MIDI component; never read here.
void* Get_MIDI_MetaInfo_init = nullptr;
void* Get_MIDI_MetaInfo_metadataitemcount = nullptr;
void* Get_MIDI_MetaInfo_metadataitem = nullptr;
void* Get_MIDI_MetaInfo_free = nullptr;
void* Get_MIDI_MetaInfo_close = nullptr;
void* Check_MIDI_Duration = nullptr;
}

namespace metainfo {

int32_t MIDI_GetTrackType(const char* /*path*/, int* mask) {
    if (mask != nullptr) *mask = TRACK_AUDIO;
    return MM_OK;
}

int32_t MIDI_GetClipInfo(const char* /*path*/, _MMClipInfo* /*clip*/) { return MM_E_NOTIMPL; }

int32_t MIDI_GetMetaInfo(const char* /*path*/, _MMMetaInfo* /*meta*/, int /*pictureLimit*/) { return MM_E_NOTIMPL; }

}  // namespace metainfo
