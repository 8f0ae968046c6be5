// Detection, and the check of the content against each extension the library
// knows (in either case, after a DRM content id, or none at all).
#include "support.h"

namespace {
const char* const kSuffixes[] = {
    ".mp3", ".MPGA", ".aac", ".wma", ".wmv", ".asf",       ".rm",
    ".RAM", ".rmvb", ".ra",  ".rv",  ".m4a", ".mp4",       ".3ga",
    ".3gp", ".mid",  ".xmf", ".imy", ".wav", ".avi",       ".Qcp",
    ".evc", ".amr",  ".awb", "",     ".txt", ".mp3?cid=7", ".toolongextension",
    ".dcf", ".fl",
};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::InputFile input(data, size);
    int type = MEDIA_TYPE_NONE;
    MM_MediaExtractor_DetectMediaType(input.Path("").c_str(), &type);
    MM_MediaExtractor_DetectMediaType(input.ProtectedPath().c_str(), &type);
    for (const char* suffix : kSuffixes) MM_MediaExtractor_CheckMediaType(input.Path(suffix).c_str());
    return 0;
}
