#include "cut_command.h"

#include <cstdio>
#include <cstdlib>

#include "metainfo/aac.h"
#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "probe_format.h"

namespace probe {
namespace {

struct FileCutter {
    int mediaType;
    MM_AudioToFileFn cut;
};

// One row per format whose audio can be cut into a file.
const FileCutter kCutters[] = {
    {MEDIA_TYPE_AAC, AAC_GetAuidoData_File},
    {MEDIA_TYPE_MP3, MP3_GetAudioData2File},
    {MEDIA_TYPE_WAVE, WAVE_GetAudioData2File},
    {MEDIA_TYPE_AMR_NB, AMR_GetAudioData2File},
    {MEDIA_TYPE_AMR_WB, AMR_GetAudioData2File},
};

MM_AudioToFileFn CutterFor(int type) {
    for (const FileCutter& row : kCutters) {
        if (row.mediaType == type && row.cut != nullptr) return row.cut;
    }
    return nullptr;
}

}  // namespace

int CutCommand(int argc, char** argv) {
    if (argc != 4) {
        std::fprintf(stderr, "usage: metainfo cut FILE START END OUT\n");
        return 2;
    }
    const char* path = argv[0];
    int type = MEDIA_TYPE_UNKNOWN;
    int32_t result = MM_MediaExtractor_DetectMediaType(path, &type);
    if (result != MM_OK) {
        std::fprintf(stderr, "%s: not probed (%s)\n", path, ResultText(result).c_str());
        return 1;
    }
    MM_AudioToFileFn cut = CutterFor(type);
    if (cut == nullptr) {
        std::fprintf(stderr, "%s: %s audio cannot be cut\n", path, MediaTypeName(type));
        return 1;
    }
    result = cut(path, std::atoi(argv[1]), std::atoi(argv[2]), argv[3]);
    if (result != MM_OK) {
        std::fprintf(stderr, "%s: cut failed (%s)\n", path, ResultText(result).c_str());
        return 1;
    }
    std::printf("%s: seconds %s..%s written to %s\n", path, argv[1], argv[2], argv[3]);
    return 0;
}

}  // namespace probe
