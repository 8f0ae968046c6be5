// The accurate interface: mi_probe, every picture copied, and a cut whose
// range the input's last two bytes pick (tenths of seconds).
#include "metainfo/probe.h"
#include "support.h"

namespace {

const char* const kSuffixes[] = {".mp3", ".aac", ".m4a", ".wma", ".wav", ".amr", ".avi", ""};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::InputFile input(data, size);
    const std::string path = input.Path(kSuffixes[input.Tail() & 7]);
    fuzz::ProbeAndCopy(path, size);
    const int64_t start = size >= 2 ? data[size - 2] * 100 : 0;
    mi_cut(path.c_str(), start, start + 1 + (size >= 1 ? data[size - 1] * 100 : 0), input.OutputPath(".out").c_str());
    return 0;
}
