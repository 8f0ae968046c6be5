// The AVI parser object: init, the "movi" list and "idx1" index, seeks and a
// bounded run of frames of each stream; then a second init of the same object
// on the protected name, which must start from a clean state.
#include <cstring>

#include "metainfo/avi_parser.h"
#include "support.h"

namespace {

constexpr int kFramesPerStream = 64;

void ReadFrames(CAVIParser* parser, uint32_t stream) {
    for (int i = 0; i < kFramesPerStream; ++i) {
        _FrameInfo frame;
        std::memset(&frame, 0, sizeof frame);
        int32_t r = parser->getNextFrame(stream, &frame);
        if (frame.pData != nullptr) fuzz::Touch(frame.pData, frame.dwSize);
        MM_MediaExtractor_FreeBuffer(frame.pData);
        if (r != MM_OK) break;
    }
}

void Walk(CAVIParser* parser, const std::string& path, uint8_t tail) {
    _MMClipInfo clip;
    std::memset(&clip, 0, sizeof clip);
    if (parser->init(path.c_str(), &clip) != MM_OK) return;
    fuzz::CheckClip(clip);
    const uint32_t streams = parser->getStreamNum();
    for (uint32_t i = 0; i <= streams && i < 8; ++i) {
        parser->getStreamType(static_cast<int>(i));
        parser->getStreamHeader(i);
    }
    parser->getMediaInfo();
    if (const _AVIVideoFormat* v = parser->getVideoFormat()) fuzz::Touch(v, sizeof *v);
    if (const _AVIAudioFormat* a = parser->getAudioFormat()) fuzz::Touch(a, sizeof *a);

    if (parser->locateChunk("movi") == MM_OK) parser->parseMovi(parser->getFileHandle());
    if (parser->locateChunk("idx1") == MM_OK) parser->parseIdx1(parser->getFileHandle());
    const uint32_t count = parser->getIndexCount();
    if (count != 0) fuzz::Touch(parser->getIndexEntries(), count * sizeof(_AVIIndexEntry));

    const uint32_t duration = parser->getDuration();
    const uint32_t probes[] = {0, 1, count / 2, count - 1, count, count + 1, 0xFFFFFFFFu};
    for (uint32_t stream = 0; stream <= streams && stream < AVI_STREAM_SLOTS + 1; ++stream) {
        for (uint32_t i : probes) {
            parser->searchNextIndex(stream, i);
            parser->searchPreIndex(stream, i);
        }
        ReadFrames(parser, stream);
        const uint32_t times[] = {0, static_cast<uint32_t>(static_cast<uint64_t>(duration) * tail / 255), duration,
                                  duration + 1};
        for (uint32_t t : times) {
            uint32_t actual = 0;
            if (parser->setMediaTime(stream, t, &actual) == MM_OK) ReadFrames(parser, stream);
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::InputFile input(data, size);
    CAVIParser* parser = nullptr;
    if (CreateAVIParserObject(&parser) != MM_OK) return 0;
    Walk(parser, input.Path(".avi"), input.Tail());
    Walk(parser, input.ProtectedPath(), input.Tail());
    parser->free();
    FreeAVIParserObject(parser);
    return 0;
}
