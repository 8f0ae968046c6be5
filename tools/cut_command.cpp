#include "cut_command.h"

#include <cstdio>

#include "metainfo/aac.h"
#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "file_problem.h"
#include "probe/codec_names.h"
#include "probe_format.h"

namespace probe {
namespace {

struct FileCutter {
    int mediaType;
    MM_AudioToFileFn cut;
};

// One row per format whose audio can be cut into a file.
const FileCutter kCutters[] = {
    {MEDIA_TYPE_AAC, AAC_GetAuidoData_File},    {MEDIA_TYPE_MP3, MP3_GetAudioData2File},
    {MEDIA_TYPE_WAVE, WAVE_GetAudioData2File},  {MEDIA_TYPE_AMR_NB, AMR_GetAudioData2File},
    {MEDIA_TYPE_AMR_WB, AMR_GetAudioData2File},
};

MM_AudioToFileFn CutterFor(int type) {
    for (const FileCutter& row : kCutters) {
        if (row.mediaType == type && row.cut != nullptr) return row.cut;
    }
    return nullptr;
}

int AccurateCut(const char* path, int64_t startMs, int64_t endMs, const std::string& out) {
    const int result = mi_cut(path, startMs, endMs, out.c_str());
    if (result != MI_OK) {
        const char* why = result == MI_E_NOT_MEDIA  ? "not MP3, ADTS AAC, WAVE or AMR audio"
                          : result == MI_E_ARGUMENT ? "nothing plays in that range"
                                                    : mi_result_text(result);
        std::fprintf(stderr, "metainfo: %s: cut failed: %s\n", path, why);
        return 1;
    }
    std::printf("%s: %.3f..%.3f s written to %s\n", path, static_cast<double>(startMs) / 1000.0,
                static_cast<double>(endMs) / 1000.0, out.c_str());
    return 0;
}

}  // namespace

int CutCommand(const std::string& file, int64_t startMs, int64_t endMs, const std::string& out, bool exact) {
    const char* path = file.c_str();
    const std::string problem = FileProblem(file);
    if (!problem.empty()) {
        std::fprintf(stderr, "metainfo: %s: %s\n", path, problem.c_str());
        return 1;
    }
    if (!exact) return AccurateCut(path, startMs, endMs, out);
    const int startSec = static_cast<int>(startMs / 1000);
    const int endSec = static_cast<int>(endMs / 1000);
    int type = MEDIA_TYPE_UNKNOWN;
    int32_t result = MM_MediaExtractor_DetectMediaType(path, &type);
    if (result != MM_OK) {
        std::fprintf(stderr, "metainfo: %s: not a media file (%s)\n", path, ResultText(result).c_str());
        return 1;
    }
    MM_AudioToFileFn cut = CutterFor(type);
    if (cut == nullptr) {
        std::fprintf(stderr, "metainfo: %s: %s audio cannot be cut\n", path, metainfo::MediaTypeName(type));
        return 1;
    }
    result = cut(path, startSec, endSec, out.c_str());
    if (result != MM_OK) {
        std::fprintf(stderr, "metainfo: %s: cut failed (%s)\n", path, ResultText(result).c_str());
        return 1;
    }
    std::printf("%s: seconds %d..%d written to %s\n", path, startSec, endSec, out.c_str());
    return 0;
}

}  // namespace probe
