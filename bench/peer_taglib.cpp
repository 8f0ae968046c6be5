#include <taglib/fileref.h>
#include <taglib/tag.h>

#include "peer.h"

namespace bench {
namespace {

class TaglibPeer : public Peer {
public:
    explicit TaglibPeer(bool fast) : fast_(fast) {}
    std::string Name() const override { return fast_ ? "taglib-fast" : "taglib"; }
    Sample Run(const std::string& path) override {
        return Measure([&] {
            const auto style = fast_ ? TagLib::AudioProperties::Fast : TagLib::AudioProperties::Average;
            TagLib::FileRef ref(path.c_str(), true, style);
            if (ref.isNull()) return false;
            if (const TagLib::Tag* tag = ref.tag()) sink_ += tag->title().size() + tag->year();
            if (const TagLib::AudioProperties* audio = ref.audioProperties())
                sink_ += static_cast<unsigned>(audio->lengthInMilliseconds());
            return true;
        });
    }

private:
    bool fast_;
    unsigned sink_ = 0;
};

}  // namespace

std::unique_ptr<Peer> MakeTaglibPeer(bool fast) { return std::make_unique<TaglibPeer>(fast); }

}  // namespace bench
