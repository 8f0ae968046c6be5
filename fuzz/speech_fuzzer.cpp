// Speech and simple audio files (AMR-NB/WB, WAVE, QCP, EVRC, MIDI family):
// every query, plain and through the protection service. A file of one of
// these types is queried as that type; any other as the type its tail picks.
#include "support.h"

namespace {
const fuzz::Variant kVariants[] = {
    {".amr", MEDIA_TYPE_AMR_NB}, {".awb", MEDIA_TYPE_AMR_WB}, {".wav", MEDIA_TYPE_WAVE},
    {".qcp", MEDIA_TYPE_QCP},    {".evc", MEDIA_TYPE_EVRC},   {".mid", MEDIA_TYPE_MIDI},
    {".imy", MEDIA_TYPE_MIDI},   {".xmf", MEDIA_TYPE_MIDI},   {".mmf", MEDIA_TYPE_MIDI},
};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzFamily(data, size, kVariants);
    return 0;
}
