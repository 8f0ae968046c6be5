// The C consumer's checks from C++, built with pkg-config or the CMake package,
// and the accurate interface through its C++ wrapper.
#include <metainfo/metainfo.h>
#include <metainfo/probe.hpp>

#include <cstdio>
#include <cstring>

int main(int argc, char** argv) {
    std::printf("version %s %s\n", MM_Version(),
                std::strcmp(MM_Version(), MM_VERSION_STRING) == 0 ? "matches" : "differs");
    for (int i = 1; i < argc; ++i) {
        int type = -1;
        const int32_t result = MM_MediaExtractor_DetectMediaType(argv[i], &type);
        std::printf("%s type %d result %d\n", argv[i], type, static_cast<int>(result));
        const metainfo::MediaInfo info(argv[i]);
        std::printf("%s format %s\n", argv[i], info->format);
    }
    return MM_VersionNumber() == MM_VERSION_NUMBER ? 0 : 1;
}
