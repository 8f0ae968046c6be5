#include "maker_command.h"

#include <cstdio>
#include <cstring>
#include <string>

#include "metainfo/metainfo.h"
#include "probe_format.h"

namespace probe {
namespace {

// Printable bytes as they stand, others as \xNN.
std::string Shown(const unsigned char* data, uint32_t size) {
    std::string out;
    for (uint32_t i = 0; i < size; ++i) {
        if (data[i] >= 0x20 && data[i] < 0x7F && data[i] != '\\') {
            out += static_cast<char>(data[i]);
        } else {
            char hex[8];
            std::snprintf(hex, sizeof hex, "\\x%02X", data[i]);
            out += hex;
        }
    }
    return out;
}

void PrintBuffer(const char* label, const unsigned char* data, uint32_t size, bool text) {
    std::printf("  %-12s %u bytes", label, size);
    if (data != nullptr && text) std::printf(": %s", Shown(data, size).c_str());
    if (data == nullptr && size != 0) std::printf(" (not held)");
    std::printf("\n");
}

}  // namespace

int MakerCommand(const std::string& path, const std::string& thumbnail) {
    const char* file = path.c_str();
    const char* thumbnailOut = thumbnail.empty() ? nullptr : thumbnail.c_str();
    _MAKERINFO maker;
    std::memset(&maker, 0, sizeof maker);
    const int32_t result = MM_MediaExtractor_GetMakerInfo(file, &maker);
    std::printf("%s\n  maker: %s\n", file, result == MM_OK ? "ok" : ResultText(result).c_str());
    if (result != MM_OK) std::fprintf(stderr, "metainfo: %s: no maker box (%s)\n", file, ResultText(result).c_str());
    int status = result == MM_OK ? 0 : 1;
    if (result == MM_OK && maker.nValid == 0) {
        std::fprintf(stderr, "metainfo: %s: no maker box\n", file);
        status = 1;
    }
    if (result == MM_OK) {
        std::printf("  %-12s %u\n", "valid", maker.nValid);
        if (maker.nValid != 0) {
            PrintBuffer("phone model", maker.pPhoneModel, maker.nPhoneModelSize, true);
            PrintBuffer("smart album", maker.pSmartAlbum, maker.nSmartAlbumSize, true);
            PrintBuffer("thumbnail", maker.pThumbnail, maker.nThumbnailSize, false);
        }
        if (thumbnailOut != nullptr) {
            if (maker.pThumbnail == nullptr) {
                std::fprintf(stderr, "metainfo: %s has no thumbnail\n", file);
                status = 1;
            } else {
                FILE* out = std::fopen(thumbnailOut, "wb");
                bool written = out != nullptr &&
                               std::fwrite(maker.pThumbnail, 1, maker.nThumbnailSize, out) == maker.nThumbnailSize;
                if (out != nullptr && std::fclose(out) != 0) written = false;
                if (written) {
                    std::printf("  thumbnail written to %s\n", thumbnailOut);
                } else {
                    std::fprintf(stderr, "metainfo: cannot write %s\n", thumbnailOut);
                    status = 1;
                }
            }
        }
    }
    MM_MediaExtractor_FreeBuffer(maker.pPhoneModel);
    MM_MediaExtractor_FreeBuffer(maker.pSmartAlbum);
    MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
    return status;
}

}  // namespace probe
