#include "core/detect.h"

#include <strings.h>

#include <cstring>

#include "aac/aac_frame.h"
#include "asf/asf_guids.h"
#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/read_ahead.h"
#include "metainfo/records.h"
#include "mp3/mp3_frame.h"

namespace metainfo {
namespace {

constexpr unsigned kProbeSize = 128;
constexpr int kMinProbe = 16;

struct Probe {
    uint8_t bytes[kProbeSize];
};

int32_t OpenAndProbe(const char* path, Probe* probe, int* handle) {
    *handle = MEx_fopen(path, "rb");
    if (*handle == 0) return MM_E_FAIL;
    std::memset(probe->bytes, 0, sizeof probe->bytes);
    if (MEx_fread(probe->bytes, 1, kProbeSize, *handle) < kMinProbe) {
        MEx_fclose(*handle);
        *handle = 0;
        return MM_E_FAIL;
    }
    return MM_OK;
}

bool At(const uint8_t* p, size_t offset, const char* tag) { return BytesEqual(p + offset, tag, std::strlen(tag)); }

bool IsMP4(const uint8_t* p) { return At(p, 4, "ftyp") || At(p, 4, "mdat"); }
bool IsASF(const uint8_t* p) { return std::memcmp(p, ASF_Header_Object, 16) == 0; }
bool IsRealMedia(const uint8_t* p) { return At(p, 0, ".RMF"); }
bool IsMidiFamily(const uint8_t* p) {
    return At(p, 0, "MThd") || At(p, 0, "MMMD") || At(p, 0, "XMF") || At(p, 0, "BEGIN:IMELODY");
}
bool IsRiff(const uint8_t* p, const char* form) { return At(p, 0, "RIFF") && At(p, 8, form); }
bool IsEVRC(const uint8_t* p) { return At(p, 0, "#!EVRC\n"); }
bool IsAMRNB(const uint8_t* p) { return At(p, 0, "#!AMR\n"); }
bool IsAMRWB(const uint8_t* p) { return At(p, 0, "#!AMR-WB\n"); }

int DetectContent(int h, const uint8_t* p) {
    if (IsMP4(p)) return MEDIA_TYPE_MP4;
    if (IsASF(p)) return MEDIA_TYPE_ASF;
    if (IsRealMedia(p)) return MEDIA_TYPE_REALMEDIA;
    if (IsMidiFamily(p)) return MEDIA_TYPE_MIDI;
    if (At(p, 0, ".snd")) return MEDIA_TYPE_SND;
    if (IsRiff(p, "AVI ")) return MEDIA_TYPE_AVI;
    if (IsRiff(p, "WAVE")) return MEDIA_TYPE_WAVE;
    if (IsRiff(p, "QLCM")) return MEDIA_TYPE_QCP;
    if (IsEVRC(p)) return MEDIA_TYPE_EVRC;
    // MP3 is tried before the AMR signatures on purpose: an AMR file whose head
    // passes the frame check has always been reported as MP3.
    if (VerifyMP3(h, p, nullptr) == MM_OK) return MEDIA_TYPE_MP3;
    if (IsAMRNB(p)) return MEDIA_TYPE_AMR_NB;
    if (IsAMRWB(p)) return MEDIA_TYPE_AMR_WB;
    // iMelody has a code of its own, but the MIDI-family test above always
    // claims it first; so code 10 is never produced.
    if (VerifyAAC(h, p) == MM_OK) return MEDIA_TYPE_AAC;
    return MEDIA_TYPE_UNKNOWN;
}

enum class Check { kMP3, kAAC, kASF, kRealMedia, kMP4, kMidi, kWave, kAVI, kQCP, kEVRC, kAMRNB, kAMRWB };

struct ExtensionGroup {
    const char* const* extensions;
    Check check;
};

const char* const kMP3Ext[] = {".mp3", ".mpga", nullptr};
const char* const kAACExt[] = {".aac", nullptr};
const char* const kASFExt[] = {".wma", ".wmv", ".asf", nullptr};
const char* const kRMExt[] = {".rm", ".ram", ".rmvb", ".ra", ".rv", nullptr};
const char* const kMP4Ext[] = {".m4a", ".mp4", ".3ga", ".3gp", nullptr};
const char* const kMidiExt[] = {".mid", ".midi", ".smf", ".mmf", ".xmf", ".xmf0", ".xmf1", ".mxmf", ".imy", nullptr};
const char* const kWaveExt[] = {".wav", nullptr};
const char* const kAVIExt[] = {".avi", nullptr};
const char* const kQCPExt[] = {".qcp", nullptr};
const char* const kEVRCExt[] = {".evc", nullptr};
const char* const kAMRExt[] = {".amr", nullptr};
const char* const kAWBExt[] = {".awb", nullptr};

const ExtensionGroup kGroups[] = {
    {kMP3Ext, Check::kMP3}, {kAACExt, Check::kAAC},   {kASFExt, Check::kASF},   {kRMExt, Check::kRealMedia},
    {kMP4Ext, Check::kMP4}, {kMidiExt, Check::kMidi}, {kWaveExt, Check::kWave}, {kAVIExt, Check::kAVI},
    {kQCPExt, Check::kQCP}, {kEVRCExt, Check::kEVRC}, {kAMRExt, Check::kAMRNB}, {kAWBExt, Check::kAMRWB},
};

const ExtensionGroup* FindGroup(const char* ext) {
    for (const ExtensionGroup& group : kGroups) {
        for (const char* const* e = group.extensions; *e != nullptr; ++e) {
            if (strcasecmp(ext, *e) == 0) return &group;
        }
    }
    return nullptr;
}

int32_t SignatureResult(bool matches) { return matches ? MM_OK : MM_E_UNSUPPORTED; }

int32_t RunCheck(Check check, int h, const uint8_t* p) {
    switch (check) {
        case Check::kMP3: return VerifyMP3(h, p, nullptr);
        case Check::kAAC: return VerifyAAC(h, p);
        case Check::kASF: return SignatureResult(IsASF(p));
        case Check::kRealMedia: return SignatureResult(IsRealMedia(p));
        case Check::kMP4: return SignatureResult(IsMP4(p));
        case Check::kMidi: return SignatureResult(IsMidiFamily(p));
        case Check::kWave: return SignatureResult(IsRiff(p, "WAVE"));
        case Check::kAVI: return SignatureResult(IsRiff(p, "AVI "));
        case Check::kQCP: return SignatureResult(IsRiff(p, "QLCM"));
        case Check::kEVRC: return SignatureResult(IsEVRC(p));
        case Check::kAMRNB: return SignatureResult(IsAMRNB(p));
        case Check::kAMRWB: return SignatureResult(IsAMRWB(p));
    }
    return MM_E_UNSUPPORTED;
}

}  // namespace

int32_t DetectMediaType(const char* path, int* type) {
    if (path == nullptr || type == nullptr) return MM_E_INVALIDARG;
    Probe probe;
    int h = 0;
    int32_t result = OpenAndProbe(path, &probe, &h);
    if (result != MM_OK) return result;
    FileCloser closer(h);
    *type = DetectContent(h, probe.bytes);
    ReadAheadForType(h, *type, probe.bytes, sizeof probe.bytes);
    return MM_OK;
}

int32_t CheckMediaType(const char* path) {
    if (path == nullptr) return MM_E_INVALIDARG;
    char ext[10] = {0};
    if (GetFileExtension(path, ext) != 0) return MM_E_NOEXTENSION;
    Probe probe;
    int h = 0;
    int32_t result = OpenAndProbe(path, &probe, &h);
    if (result != MM_OK) return result;
    FileCloser closer(h);
    const ExtensionGroup* group = FindGroup(ext);
    if (group == nullptr) return MM_E_UNSUPPORTED;
    return RunCheck(group->check, h, probe.bytes);
}

}  // namespace metainfo
