// AVI files through the C interface: every query, plain and through the protection service.
#include "support.h"

namespace {
const fuzz::Variant kVariants[] = {{".avi", MEDIA_TYPE_AVI}};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzFamily(data, size, kVariants);
    return 0;
}
