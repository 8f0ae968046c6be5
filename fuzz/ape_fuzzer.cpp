// APE tags (and the ID3v1 tag after them) at the end of MP3 and ADTS files,
// through the accurate interface. The input's last byte picks the
// suffix, and every picture found is copied.
#include "support.h"

namespace {
const char* const kSuffixes[] = {".mp3", ".aac"};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzProbe(data, size, kSuffixes);
    return 0;
}
