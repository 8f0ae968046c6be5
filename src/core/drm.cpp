#include "core/drm.h"

#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

namespace metainfo {
namespace {

std::mutex g_providerLock;
MM_DrmProvider g_provider;
bool g_hasProvider = false;

using MetadataPairs = std::vector<std::pair<std::string, std::string>>;

void CollectPair(void* ctx, const char* key, const char* value) {
    if (key == nullptr || value == nullptr) return;
    static_cast<MetadataPairs*>(ctx)->emplace_back(key, value);
}

void CopyText(char* dst, size_t capacity, const std::string& value) {
    size_t n = value.size() < capacity - 1 ? value.size() : capacity - 1;
    std::memcpy(dst, value.data(), n);
    dst[n] = '\0';
}

// A hexadecimal number (blanks, sign and "0x" allowed, as a "%x" conversion
// takes them); its low 32 bits, the same on every target; 0 without digits.
uint32_t ParseHex(const std::string& value) { return static_cast<uint32_t>(std::strtoull(value.c_str(), nullptr, 16)); }

void StoreMetadata(const MetadataPairs& pairs, _DRM_METADATA* meta) {
    for (const auto& kv : pairs) {
        const std::string& key = kv.first;
        if (key == "contentid") {
            CopyText(meta->szContentId, sizeof meta->szContentId, kv.second);
        } else if (key == "contenttype") {
            CopyText(meta->szContentType, sizeof meta->szContentType, kv.second);
        } else if (key == "rightsuri") {
            CopyText(meta->szRightsUri, sizeof meta->szRightsUri, kv.second);
        } else if (key == "contentlen") {
            meta->nContentLength = ParseHex(kv.second);
        } else if (key == "drmtype") {
            meta->nDrmType = ParseHex(kv.second);
        }
    }
}

bool EndsWith(const char* path, size_t len, const char* suffix) {
    size_t n = std::strlen(suffix);
    return len >= n && std::memcmp(path + len - n, suffix, n) == 0;
}

}  // namespace

bool MakeDrmClient(DrmClient* client) {
    std::lock_guard<std::mutex> lock(g_providerLock);
    if (!g_hasProvider) return false;
    client->provider = g_provider;
    return true;
}

int GetDRMMetaInfo(const char* path, const DrmClient* client, _DRM_METADATA* meta) {
    DrmClient temporary;
    if (client == nullptr) {
        if (!MakeDrmClient(&temporary)) return -1;
        client = &temporary;
    }
    const MM_DrmProvider& p = client->provider;
    if (p.getMetadata == nullptr) return -1;
    MetadataPairs pairs;
    if (p.getMetadata(p.context, path, CollectPair, &pairs) != 0) return -1;
    std::memset(meta, 0, sizeof *meta);
    StoreMetadata(pairs, meta);
    return 0;
}

int CheckDRM(const char* path) {
    DrmClient client;
    return CheckDRM(path, &client);
}

int CheckDRM(const char* path, DrmClient* client) {
    std::memset(client, 0, sizeof *client);
    size_t len = std::strlen(path);
    if (len < 5) return -1;
    if (!EndsWith(path, len, ".dcf") && !EndsWith(path, len, ".fl")) return 0;
    // Without a protection service every file is plain.
    if (!MakeDrmClient(client)) return 0;
    _DRM_METADATA meta;
    if (GetDRMMetaInfo(path, client, &meta) != 0) return 1;
    return static_cast<int>(meta.nDrmType);
}

}  // namespace metainfo

extern "C" void MM_MediaExtractor_SetDrmProvider(const MM_DrmProvider* provider) {
    std::lock_guard<std::mutex> lock(metainfo::g_providerLock);
    if (provider == nullptr) {
        metainfo::g_hasProvider = false;
        std::memset(&metainfo::g_provider, 0, sizeof metainfo::g_provider);
    } else {
        metainfo::g_provider = *provider;
        metainfo::g_hasProvider = true;
    }
}
