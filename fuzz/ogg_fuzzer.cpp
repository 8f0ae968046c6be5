// Ogg files (Vorbis, Opus, FLAC, Theora streams) through the accurate interface. The input's last byte picks the
// suffix, and every picture found is copied.
#include "support.h"

namespace {
const char* const kSuffixes[] = {".ogg", ".opus", ".oga", ".ogv"};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzProbe(data, size, kSuffixes);
    return 0;
}
