#include "support/bytes.h"

#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace testing_support {

Bytes& Bytes::patch_be32(size_t offset, uint32_t v) {
    for (size_t i = 0; i < 4; ++i) data_.at(offset + i) = static_cast<uint8_t>(v >> (24 - 8 * i));
    return *this;
}

Bytes& Bytes::patch_le32(size_t offset, uint32_t v) {
    for (size_t i = 0; i < 4; ++i) data_.at(offset + i) = static_cast<uint8_t>(v >> (8 * i));
    return *this;
}

std::vector<uint8_t> Join(std::initializer_list<std::vector<uint8_t>> parts) {
    std::vector<uint8_t> out;
    for (const auto& p : parts) out.insert(out.end(), p.begin(), p.end());
    return out;
}

std::vector<std::string> FilesUnder(const std::string& root) {
    std::vector<std::string> files;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(root)) {
        if (entry.is_regular_file()) files.push_back(entry.path().string());
    }
    std::sort(files.begin(), files.end());
    return files;
}

TempDir::TempDir() {
    const char* base = std::getenv("TMPDIR");
    std::string pattern = std::string(base != nullptr ? base : "/tmp") + "/metainfo-test-XXXXXX";
    std::vector<char> buf(pattern.begin(), pattern.end());
    buf.push_back('\0');
    if (mkdtemp(buf.data()) == nullptr) throw std::runtime_error("mkdtemp failed");
    path_ = buf.data();
}

TempDir::~TempDir() {
    if (DIR* dir = opendir(path_.c_str())) {
        while (dirent* entry = readdir(dir)) {
            std::string name = entry->d_name;
            if (name != "." && name != "..") std::remove((path_ + "/" + name).c_str());
        }
        closedir(dir);
    }
    rmdir(path_.c_str());
}

std::string TempDir::Write(const std::string& name, const std::vector<uint8_t>& bytes) const {
    std::string full = PathOf(name);
    std::ofstream out(full, std::ios::binary);
    out.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    return full;
}

std::vector<uint8_t> ReadFileBytes(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::vector<uint8_t>(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

std::string CorpusDir() {
#ifdef METAINFO_CORPUS_DIR
    struct stat st;
    if (stat(METAINFO_CORPUS_DIR, &st) == 0 && S_ISDIR(st.st_mode)) return METAINFO_CORPUS_DIR;
#endif
    return "";
}

std::string NoCorpusReason() {
#ifdef METAINFO_CORPUS_DIR
    return std::string("no corpus of real files at ") + METAINFO_CORPUS_DIR + " (a clone without ../shared/)";
#else
    return "no corpus of real files: METAINFO_CORPUS_DIR is not set";
#endif
}

bool HaveFfmpeg() { return access("/usr/bin/ffmpeg", X_OK) == 0 && access("/usr/bin/ffprobe", X_OK) == 0; }

int OpenDescriptors() {
    int n = 0;
    if (DIR* d = opendir("/proc/self/fd")) {
        while (readdir(d) != nullptr) ++n;
        closedir(d);
    }
    return n;
}

}  // namespace testing_support
