#include "cover_command.h"

#include <cstdio>
#include <cstring>
#include <vector>

#include "file_problem.h"
#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "probe_format.h"

namespace probe {
namespace {

// The extension of a picture, from its stated type or its first bytes.
std::string ExtensionOf(const std::string& mime, const unsigned char* data, size_t size) {
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

// A picture's bytes and MIME type, as one of the interfaces gives them.
struct Picture {
    std::string mime;
    std::vector<unsigned char> bytes;
};

// Writes picture n of a file: to out, or beside the file; numbered with all.
bool Write(const std::string& path, const std::string& out, const Picture& p, size_t n, bool all) {
    const std::string ext = ExtensionOf(p.mime, p.bytes.data(), p.bytes.size());
    const std::string number = all ? "-" + std::to_string(n) : "";
    const std::string name = out.empty() ? Stem(path) + ".cover" + number + ext : all ? Stem(out) + number + ext : out;
    FILE* f = std::fopen(name.c_str(), "wb");
    bool ok = f != nullptr && std::fwrite(p.bytes.data(), 1, p.bytes.size(), f) == p.bytes.size();
    if (f != nullptr && std::fclose(f) != 0) ok = false;
    if (ok) std::printf("%s: picture of %zu bytes written to %s\n", path.c_str(), p.bytes.size(), name.c_str());
    if (!ok) std::fprintf(stderr, "metainfo: %s: cannot write %s\n", path.c_str(), name.c_str());
    return ok;
}

// Every picture the accurate interface finds; an empty list and the reason
// when the file cannot be read.
std::vector<Picture> AccuratePictures(const std::string& path, std::string* problem) {
    std::vector<Picture> out;
    mi_info* info = nullptr;
    const int result = mi_probe(path.c_str(), &info);
    if (result != MI_OK) {
        *problem = mi_result_text(result);
        return out;
    }
    for (size_t i = 0; i < info->picture_count; ++i) {
        Picture p;
        p.mime = info->pictures[i].mime != nullptr ? info->pictures[i].mime : "";
        size_t size = 0;
        if (mi_picture_copy(path.c_str(), info, i, nullptr, 0, &size) != MI_E_BUFFER) continue;
        p.bytes.resize(size);
        if (mi_picture_copy(path.c_str(), info, i, p.bytes.data(), size, &size) == MI_OK) out.push_back(p);
    }
    mi_info_free(info);
    return out;
}

// The one picture the C interface's tags hold.
std::vector<Picture> ExactPictures(const std::string& path, std::string* problem) {
    std::vector<Picture> out;
    int type = MEDIA_TYPE_UNKNOWN;
    const int32_t result = MM_MediaExtractor_DetectMediaType(path.c_str(), &type);
    if (result != MM_OK) {
        *problem = "not a media file (" + ResultText(result) + ")";
        return out;
    }
    _MMMetaInfo meta;
    std::memset(&meta, 0, sizeof meta);
    if (MM_MediaExtractor_GetMetaInfo(path.c_str(), type, &meta) == MM_OK && meta.pPicture != nullptr &&
        meta.nPictureSize != 0) {
        const _MMMetaItem& mimeItem = meta.aItems[META_PICTURE_FORMAT];
        Picture p;
        p.mime = mimeItem.nLength != 0 ? DecodeItemText(mimeItem) : std::string();
        p.bytes.assign(meta.pPicture, meta.pPicture + meta.nPictureSize);
        out.push_back(p);
    }
    MM_MediaExtractor_FreeMetaInfo(&meta);
    return out;
}

}  // namespace

int CoverCommand(const std::string& path, const std::string& out, int index, bool all, bool exact) {
    std::string problem = FileProblem(path);
    if (!problem.empty()) {
        std::fprintf(stderr, "metainfo: %s: %s\n", path.c_str(), problem.c_str());
        return 1;
    }
    const std::vector<Picture> pictures = exact ? ExactPictures(path, &problem) : AccuratePictures(path, &problem);
    if (!problem.empty()) {
        std::fprintf(stderr, "metainfo: %s: %s\n", path.c_str(), problem.c_str());
        return 1;
    }
    const size_t n = static_cast<size_t>(index);
    if (pictures.empty() || (!all && n >= pictures.size())) {
        std::fprintf(stderr, "metainfo: %s: no picture%s\n", path.c_str(),
                     pictures.empty() ? "" : (" " + std::to_string(index)).c_str());
        return 1;
    }
    bool ok = true;
    for (size_t i = all ? 0 : n; i < (all ? pictures.size() : n + 1); ++i)
        ok = Write(path, out, pictures[i], i, all) && ok;
    return ok ? 0 : 1;
}

}  // namespace probe
