// Byte builders and temporary files shared by every test.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <string>
#include <vector>

namespace testing_support {

// Appends fields in an explicit byte order.
class Bytes {
public:
    Bytes() = default;
    Bytes(std::initializer_list<uint8_t> init) : data_(init) {}
    explicit Bytes(const std::vector<uint8_t>& data) : data_(data) {}

    Bytes& u8(uint32_t v) {
        data_.push_back(static_cast<uint8_t>(v));
        return *this;
    }
    Bytes& be16(uint32_t v) { return u8(v >> 8).u8(v); }
    Bytes& be24(uint32_t v) { return u8(v >> 16).u8(v >> 8).u8(v); }
    Bytes& be32(uint32_t v) { return u8(v >> 24).u8(v >> 16).u8(v >> 8).u8(v); }
    Bytes& be64(uint64_t v) { return be32(static_cast<uint32_t>(v >> 32)).be32(static_cast<uint32_t>(v)); }
    Bytes& le16(uint32_t v) { return u8(v).u8(v >> 8); }
    Bytes& le32(uint32_t v) { return u8(v).u8(v >> 8).u8(v >> 16).u8(v >> 24); }
    Bytes& le64(uint64_t v) { return le32(static_cast<uint32_t>(v)).le32(static_cast<uint32_t>(v >> 32)); }
    // ID3v2's four 7-bit bytes.
    Bytes& syncsafe32(uint32_t v) { return u8((v >> 21) & 0x7F).u8((v >> 14) & 0x7F).u8((v >> 7) & 0x7F).u8(v & 0x7F); }
    Bytes& str(const std::string& s) {
        data_.insert(data_.end(), s.begin(), s.end());
        return *this;
    }
    Bytes& zeros(size_t n) { return fill(n, 0); }
    Bytes& fill(size_t n, uint8_t v) {
        data_.insert(data_.end(), n, v);
        return *this;
    }
    Bytes& raw(const std::vector<uint8_t>& v) {
        data_.insert(data_.end(), v.begin(), v.end());
        return *this;
    }
    Bytes& raw(const Bytes& b) { return raw(b.data_); }
    // Overwrites 4 bytes at offset (sizes known only once the body is built).
    Bytes& patch_be32(size_t offset, uint32_t v);
    Bytes& patch_le32(size_t offset, uint32_t v);

    const std::vector<uint8_t>& data() const { return data_; }
    std::vector<uint8_t>& data() { return data_; }
    size_t size() const { return data_.size(); }
    operator const std::vector<uint8_t>&() const { return data_; }

private:
    std::vector<uint8_t> data_;
};

// A directory that lives as long as the object; files written into it.
class TempDir {
public:
    TempDir();
    ~TempDir();
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;

    const std::string& path() const { return path_; }
    // Writes bytes to name inside the directory and returns the full path.
    std::string Write(const std::string& name, const std::vector<uint8_t>& bytes) const;
    std::string PathOf(const std::string& name) const { return path_ + "/" + name; }

private:
    std::string path_;
};

// Byte runs one after another.
std::vector<uint8_t> Join(std::initializer_list<std::vector<uint8_t>> parts);

std::vector<uint8_t> ReadFileBytes(const std::string& path);
// Every regular file under root, sorted by path.
std::vector<std::string> FilesUnder(const std::string& root);

// Folder of real-world media kept beside the project, or "" when absent.
std::string CorpusDir();
// Why a test over the corpus skips: where it looked.
std::string NoCorpusReason();

// True when ffmpeg and ffprobe are installed (tests that use them skip otherwise).
bool HaveFfmpeg();

// Number of file descriptors this process holds open (for leak checks).
int OpenDescriptors();

}  // namespace testing_support
