// RealMedia files: every query, plain and through the protection service.
#include "support.h"

namespace {
const fuzz::Variant kVariants[] = {
    {".rm", MEDIA_TYPE_REALMEDIA},
    {".ra", MEDIA_TYPE_REALMEDIA},
    {".rmvb", MEDIA_TYPE_REALMEDIA},
    {".rv", MEDIA_TYPE_REALMEDIA},
};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzFamily(data, size, kVariants);
    return 0;
}
