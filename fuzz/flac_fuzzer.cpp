// FLAC files (ID3v2 before "fLaC" too) through the accurate interface. The input's last byte picks the
// suffix, and every picture found is copied.
#include "support.h"

namespace {
const char* const kSuffixes[] = {".flac", ".fla"};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzProbe(data, size, kSuffixes);
    return 0;
}
