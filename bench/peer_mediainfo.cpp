#include "peer.h"

#ifdef BENCH_WITH_MEDIAINFO
#include <MediaInfo/MediaInfo.h>

#include <cstdlib>

namespace bench {
namespace {

std::wstring Widen(const std::string& path) {
    std::wstring out(path.size() + 1, L'\0');
    const size_t n = std::mbstowcs(&out[0], path.c_str(), out.size());
    if (n == static_cast<size_t>(-1)) return std::wstring(path.begin(), path.end());
    out.resize(n);
    return out;
}

class MediainfoPeer : public Peer {
public:
    std::string Name() const override { return "mediainfo"; }
    Sample Run(const std::string& path) override {
        const std::wstring wide = Widen(path);
        return Measure([&] {
            MediaInfoLib::MediaInfo info;
            if (info.Open(wide) == 0) return false;
            sink_ += info.Get(MediaInfoLib::Stream_General, 0, L"Duration").size();
            sink_ += info.Get(MediaInfoLib::Stream_General, 0, L"Title").size();
            info.Close();
            return true;
        });
    }

private:
    size_t sink_ = 0;
};

}  // namespace

std::unique_ptr<Peer> MakeMediainfoPeer() { return std::make_unique<MediainfoPeer>(); }

}  // namespace bench
#else
namespace bench {
std::unique_ptr<Peer> MakeMediainfoPeer() { return nullptr; }
}  // namespace bench
#endif
