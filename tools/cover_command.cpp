#include "cover_command.h"

#include <cstdio>
#include <cstring>

#include "file_problem.h"
#include "metainfo/metainfo.h"
#include "probe_format.h"

namespace probe {
namespace {

// The extension of a picture, from its stated type or its first bytes.
std::string ExtensionOf(const std::string& mime, const unsigned char* data, uint32_t size) {
    if (mime.find("png") != std::string::npos || (size >= 4 && std::memcmp(data, "\x89PNG", 4) == 0)) return ".png";
    if (mime.find("gif") != std::string::npos || (size >= 3 && std::memcmp(data, "GIF", 3) == 0)) return ".gif";
    if (mime.find("bmp") != std::string::npos || (size >= 2 && std::memcmp(data, "BM", 2) == 0)) return ".bmp";
    return ".jpg";
}

std::string Stem(const std::string& path) {
    const size_t slash = path.find_last_of('/');
    const size_t dot = path.find_last_of('.');
    if (dot == std::string::npos || (slash != std::string::npos && dot < slash)) return path;
    return path.substr(0, dot);
}

bool WriteFile(const std::string& name, const unsigned char* data, uint32_t size) {
    FILE* f = std::fopen(name.c_str(), "wb");
    if (f == nullptr) return false;
    bool ok = std::fwrite(data, 1, size, f) == size;
    if (std::fclose(f) != 0) ok = false;
    return ok;
}

}  // namespace

int CoverCommand(const std::string& path, const std::string& out, int index, bool all) {
    const std::string problem = FileProblem(path);
    if (!problem.empty()) {
        std::fprintf(stderr, "metainfo: %s: %s\n", path.c_str(), problem.c_str());
        return 1;
    }
    int type = MEDIA_TYPE_UNKNOWN;
    int32_t result = MM_MediaExtractor_DetectMediaType(path.c_str(), &type);
    if (result != MM_OK) {
        std::fprintf(stderr, "metainfo: %s: not a media file (%s)\n", path.c_str(), ResultText(result).c_str());
        return 1;
    }
    _MMMetaInfo meta;
    std::memset(&meta, 0, sizeof meta);
    result = MM_MediaExtractor_GetMetaInfo(path.c_str(), type, &meta);
    // The tags hold one picture at most: index 0.
    const bool held = result == MM_OK && meta.pPicture != nullptr && meta.nPictureSize != 0;
    int status = 0;
    if (!held || (!all && index != 0)) {
        std::fprintf(stderr, "metainfo: %s: no picture%s\n", path.c_str(),
                     held ? (" " + std::to_string(index)).c_str() : "");
        status = 1;
    } else {
        const _MMMetaItem& mimeItem = meta.aItems[META_PICTURE_FORMAT];
        const std::string mime = mimeItem.nLength != 0 ? DecodeItemText(mimeItem) : std::string();
        const std::string ext = ExtensionOf(mime, meta.pPicture, meta.nPictureSize);
        std::string name = out.empty() ? Stem(path) + (all ? ".cover-0" : ".cover") + ext : out;
        if (!out.empty() && all) name = Stem(out) + "-0" + ext;
        if (WriteFile(name, meta.pPicture, meta.nPictureSize)) {
            std::printf("%s: picture of %u bytes written to %s\n", path.c_str(), meta.nPictureSize, name.c_str());
        } else {
            std::fprintf(stderr, "metainfo: %s: cannot write %s\n", path.c_str(), name.c_str());
            status = 1;
        }
    }
    MM_MediaExtractor_FreeMetaInfo(&meta);
    return status;
}

}  // namespace probe
