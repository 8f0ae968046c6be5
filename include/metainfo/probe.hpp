// libmetainfo's accurate interface for C++: mi_probe's answer owned by an
// object, failures thrown, picture bytes as vectors.
#ifndef METAINFO_PROBE_HPP
#define METAINFO_PROBE_HPP

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "probe.h"

namespace metainfo {

class ProbeError : public std::runtime_error {
public:
    ProbeError(const std::string& path, int result)
        : std::runtime_error(path + ": " + mi_result_text(result)), result_(result) {}
    int result() const { return result_; }

private:
    int result_;
};

class MediaInfo {
public:
    // Throws ProbeError with the mi_result when the file cannot be probed.
    explicit MediaInfo(std::string path) : path_(std::move(path)), info_(nullptr, mi_info_free) {
        mi_info* info = nullptr;
        const int result = mi_probe(path_.c_str(), &info);
        if (result != MI_OK) throw ProbeError(path_, result);
        info_.reset(info);
    }

    const mi_info& operator*() const { return *info_; }
    const mi_info* operator->() const { return info_.get(); }
    const std::string& path() const { return path_; }

    // The first stream of a kind (MI_STREAM_AUDIO, MI_STREAM_VIDEO), or null.
    const mi_stream* stream(int kind) const {
        for (size_t i = 0; i < info_->stream_count; ++i) {
            if (info_->streams[i].kind == kind) return &info_->streams[i];
        }
        return nullptr;
    }

    // The bytes of picture `index`; throws ProbeError when they cannot be read.
    std::vector<unsigned char> picture(size_t index) const {
        size_t size = 0;
        int result = mi_picture_copy(path_.c_str(), info_.get(), index, nullptr, 0, &size);
        std::vector<unsigned char> bytes(result == MI_E_BUFFER ? size : 0);
        if (result == MI_E_BUFFER) result = mi_picture_copy(path_.c_str(), info_.get(), index, bytes.data(), size, &size);
        if (result != MI_OK) throw ProbeError(path_, result);
        return bytes;
    }

private:
    std::string path_;
    std::unique_ptr<mi_info, void (*)(mi_info*)> info_;
};

}  // namespace metainfo

#endif  // METAINFO_PROBE_HPP
