// Raw AAC files (ADTS, ADIF): every query, plain and through the protection service.
#include "support.h"

namespace {
const fuzz::Variant kVariants[] = {{".aac", MEDIA_TYPE_AAC}};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzFamily(data, size, kVariants);
    return 0;
}
