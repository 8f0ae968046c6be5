// MP3 files: every query, plain and through the protection service.
#include "support.h"

namespace {
const fuzz::Variant kVariants[] = {{".mp3", MEDIA_TYPE_MP3}, {".mpga", MEDIA_TYPE_MP3}};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzFamily(data, size, kVariants);
    return 0;
}
