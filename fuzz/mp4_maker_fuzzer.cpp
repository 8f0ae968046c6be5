// The exported MP4 functions beside the dispatch tables: the maker box "@mkr"
// (through the C interface and directly, plain and protected) and the codec
// query of an open descriptor.
#include <fcntl.h>
#include <unistd.h>

#include <cstring>

#include "metainfo/mp4.h"
#include "support.h"

namespace {

void Maker(int32_t (*query)(const char*, _MAKERINFO*), const std::string& path) {
    _MAKERINFO maker;
    std::memset(&maker, 0, sizeof maker);
    query(path.c_str(), &maker);
    fuzz::ReleaseMaker(&maker);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::InputFile input(data, size);
    const std::string plain = input.Path(".3gp");
    Maker(MM_MediaExtractor_GetMakerInfo, plain);
    Maker(MP4_GetMakerInfo, plain);
    Maker(MP4_GetMakerInfo, input.ProtectedPath());

    int fd = open(plain.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) fuzz::Fail("cannot open the input", plain);
    _MM_CODECTYPE codec;
    std::memset(&codec, 0, sizeof codec);
    MP4_GetCodecTypeEx(fd, &codec);
    close(fd);
    return 0;
}
