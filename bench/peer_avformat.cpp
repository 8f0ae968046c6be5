extern "C" {
#include <libavformat/avformat.h>
#include <libavutil/log.h>
}

#include "peer.h"

namespace bench {
namespace {

class AvformatPeer : public Peer {
public:
    explicit AvformatPeer(bool streamInfo) : streamInfo_(streamInfo) { av_log_set_level(AV_LOG_QUIET); }
    std::string Name() const override { return streamInfo_ ? "lavf-info" : "lavf-open"; }
    Sample Run(const std::string& path) override {
        return Measure([&] {
            AVFormatContext* context = nullptr;
            if (avformat_open_input(&context, path.c_str(), nullptr, nullptr) != 0) return false;
            const bool ok = !streamInfo_ || avformat_find_stream_info(context, nullptr) >= 0;
            avformat_close_input(&context);
            return ok;
        });
    }

private:
    bool streamInfo_;
};

}  // namespace

std::unique_ptr<Peer> MakeAvformatPeer(bool streamInfo) { return std::make_unique<AvformatPeer>(streamInfo); }

}  // namespace bench
