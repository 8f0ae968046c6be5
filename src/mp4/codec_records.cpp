#include "mp4/codec_records.h"

#include "core/byte_reader.h"

namespace metainfo {
namespace {

const char* H264Profile(uint8_t idc, uint8_t constraints) {
    const bool set1 = (constraints & 0x40) != 0, set3 = (constraints & 0x10) != 0;
    switch (idc) {
        case 66: return set1 ? "Constrained Baseline" : "Baseline";
        case 77: return "Main";
        case 88: return "Extended";
        case 100: return "High";
        case 110: return set3 ? "High 10 Intra" : "High 10";
        case 122: return set3 ? "High 4:2:2 Intra" : "High 4:2:2";
        case 244: return set3 ? "High 4:4:4 Intra" : "High 4:4:4 Predictive";
        case 44: return "CAVLC 4:4:4";
        case 118: return "Multiview High";
        case 128: return "Stereo High";
        default: return nullptr;
    }
}

const char* const kHevcProfiles[5] = {nullptr, "Main", "Main 10", "Main Still Picture", "Rext"};
const char* const kAv1Profiles[3] = {"Main", "High", "Professional"};

const char* const kMpeg4Profiles[16] = {"Simple Profile",
                                        "Simple Scalable Profile",
                                        "Core Profile",
                                        "Main Profile",
                                        "N-bit Profile",
                                        "Scalable Texture Profile",
                                        "Simple Face Animation Profile",
                                        "Basic Animated Texture Profile",
                                        "Hybrid Profile",
                                        "Advanced Real Time Simple Profile",
                                        "Core Scalable Profile",
                                        "Advanced Coding Efficiency Profile",
                                        "Advanced Core Profile",
                                        "Advanced Scalable Texture Profile",
                                        "Simple Studio Profile",
                                        "Advanced Simple Profile"};

}  // namespace

void AvcRecordFacts(const uint8_t* p, size_t n, StreamFacts* s) {
    if (n < 4) return;
    const char* profile = H264Profile(p[1], p[2]);
    if (profile != nullptr) s->profile = profile;
    s->level = p[3];
}

void HevcRecordFacts(const uint8_t* p, size_t n, StreamFacts* s) {
    if (n < 13) return;
    const uint8_t idc = p[1] & 0x1F;
    if (idc < 5 && kHevcProfiles[idc] != nullptr) s->profile = kHevcProfiles[idc];
    s->level = p[12];
}

void Av1RecordFacts(const uint8_t* p, size_t n, StreamFacts* s) {
    if (n < 2) return;
    if ((p[1] >> 5) < 3) s->profile = kAv1Profiles[p[1] >> 5];
    s->level = p[1] & 0x1F;
}

void Mpeg4VisualFacts(const uint8_t* p, size_t n, StreamFacts* s) {
    if (n < 5 || ReadBE32(p) != 0x1B0) return;
    s->profile = kMpeg4Profiles[p[4] >> 4];
    s->level = p[4] & 0x0F;
}

const char* AacProfileName(const mp4AudioSpecificConfig& asc) {
    // An extension that signals no SBR leaves object type 5 over an LC core.
    if (asc.psPresentFlag == 1) return "HE-AACv2";
    if (asc.sbrPresentFlag == 1) return "HE-AAC";
    switch (asc.audioObjectType) {
        case 1: return "Main";
        case 2:
        case 5: return "LC";
        case 3: return "SSR";
        case 4: return "LTP";
        case 23: return "LD";
        case 39: return "ELD";
        default: return nullptr;
    }
}

}  // namespace metainfo
