// MP4, 3GPP and M4A files: every query, plain and through the protection service.
#include "support.h"

namespace {
const fuzz::Variant kVariants[] = {
    {".m4a", MEDIA_TYPE_MP4},
    {".mp4", MEDIA_TYPE_MP4},
    {".3gp", MEDIA_TYPE_MP4},
    {".3ga", MEDIA_TYPE_MP4},
};
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::FuzzFamily(data, size, kVariants);
    return 0;
}
