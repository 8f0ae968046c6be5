// ASF files (WMA, WMV): every query, plain and through the protection service.
#include "support.h"

namespace {
const fuzz::Variant kVariants[] = {
    {".wma", MEDIA_TYPE_ASF},
    {".asf", MEDIA_TYPE_ASF},
    {".wmv", MEDIA_TYPE_ASF},
};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzFamily(data, size, kVariants);
    return 0;
}
