#include <metainfo/metainfo.h>
#include <metainfo/probe.h>

#include "peer.h"

namespace bench {
namespace {

// What a scanner asks of each file: the type, the clip information, the
// tags and the codec.
bool MetainfoJob(const char* path) {
    int type = 0;
    if (MM_MediaExtractor_DetectMediaType(path, &type) != MM_OK) return false;
    _MMClipInfo clip{};
    const int32_t clipResult = MM_MediaExtractor_GetClipInfo(path, type, &clip);
    MM_MediaExtractor_FreeClipInfo(&clip);
    _MMMetaInfo meta{};
    MM_MediaExtractor_GetMetaInfo(path, type, &meta);
    MM_MediaExtractor_FreeMetaInfo(&meta);
    _MM_CODECTYPE codec{};
    MM_MediaExtractor_GetCodecType(path, type, &codec);
    return clipResult == MM_OK;
}

class MetainfoPeer : public Peer {
public:
    std::string Name() const override { return "metainfo"; }
    Sample Run(const std::string& path) override {
        return Measure([&] { return MetainfoJob(path.c_str()); });
    }
};

// The same questions through the accurate interface: one probe answers them
// all (durations to the millisecond, every tag and picture).
class AccuratePeer : public Peer {
public:
    std::string Name() const override { return "metainfo-accurate"; }
    Sample Run(const std::string& path) override {
        return Measure([&] {
            mi_info* info = nullptr;
            const bool ok = mi_probe(path.c_str(), &info) == MI_OK;
            mi_info_free(info);
            return ok;
        });
    }
};

}  // namespace

std::unique_ptr<Peer> MakeMetainfoPeer() { return std::make_unique<MetainfoPeer>(); }
std::unique_ptr<Peer> MakeAccuratePeer() { return std::make_unique<AccuratePeer>(); }

}  // namespace bench
