// Content protection: which paths are read through a decrypt session, and the
// metadata the protection service keeps for them.
#pragma once

#include <cstdint>

#include "metainfo/metainfo.h"

namespace metainfo {

struct _DRM_METADATA {
    char szContentId[512];
    char szContentType[256];
    char szRightsUri[1024];
    uint32_t nContentLength;  // plain bytes; 0 when the service does not say
    uint32_t nDrmType;
};

// The protection service as one open handle sees it: a copy of the provider
// taken when the handle was opened, so that installing another provider later
// cannot change the functions an open session is served by.
struct DrmClient {
    MM_DrmProvider provider;
};

// Copies the installed provider into *client; false when none is installed.
bool MakeDrmClient(DrmClient* client);

// 0 and *meta filled when the service has metadata for path, -1 otherwise.
// client may be null: a temporary client is made from the installed provider.
int GetDRMMetaInfo(const char* path, const DrmClient* client, _DRM_METADATA* meta);

// -1: path too short to be opened; 0: plain file; otherwise the DRM type
// (1 when the service has no metadata for a protected path).
int CheckDRM(const char* path);
// The same, decided with one copy of the installed provider, left in *client
// for whoever goes on to open the file: a provider removed or replaced
// meanwhile cannot change what was decided.
int CheckDRM(const char* path, DrmClient* client);

}  // namespace metainfo
