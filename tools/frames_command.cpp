// Reads an AVI file's index through the exported parser object, lists the
// entries of one stream, then delivers that stream's frames (from the seek
// point when one is given) with their time, size and key-frame flag.
#include "frames_command.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "metainfo/avi_parser.h"
#include "metainfo/metainfo.h"

namespace probe {
namespace {

std::string FourccText(uint32_t v) {
    std::string s;
    for (int shift = 24; shift >= 0; shift -= 8) {
        char c = static_cast<char>((v >> shift) & 0xFF);
        s += (c >= 0x20 && c < 0x7F) ? c : '.';
    }
    return s;
}

const char* KeyText(uint32_t flags) { return flags == AVI_KEYFRAME_FLAGS ? "key" : "-"; }

void PrintStreams(CAVIParser* parser) {
    std::printf("  duration %u ms, %u stream(s)\n", parser->getDuration(), parser->getStreamNum());
    for (uint32_t i = 0; i < parser->getStreamNum(); ++i) {
        const _AVIStreamHeader* h = parser->getStreamHeader(i);
        if (h == nullptr) continue;
        std::printf("  stream %u: %s codec 0x%08X, scale %u, rate %u, length %u\n", i, FourccText(h->fccType).c_str(),
                    static_cast<unsigned>(parser->getStreamType(static_cast<int>(i))), h->dwScale, h->dwRate,
                    h->dwLength);
    }
}

// Reads the "movi" list and the "idx1" index; false (with a message) when either is missing.
bool ReadIndex(CAVIParser* parser) {
    int32_t r = parser->locateChunk("movi");
    if (r == MM_OK) r = parser->parseMovi(parser->getFileHandle());
    if (r != MM_OK) {
        std::printf("  movi: not read (0x%08X)\n", static_cast<unsigned>(r));
        return false;
    }
    r = parser->locateChunk("idx1");
    if (r == MM_OK) r = parser->parseIdx1(parser->getFileHandle());
    std::printf("  index: %u entries", parser->getIndexCount());
    if (r != MM_OK) std::printf(" (idx1 0x%08X)", static_cast<unsigned>(r));
    std::printf("\n");
    return parser->getIndexCount() != 0;
}

void PrintEntries(CAVIParser* parser, uint32_t stream) {
    const _AVIIndexEntry* entries = parser->getIndexEntries();
    std::printf("  entries of stream %u:\n", stream);
    for (uint32_t i = 0; i < parser->getIndexCount(); ++i) {
        const _AVIIndexEntry& e = entries[i];
        if (e.wStream != stream) continue;
        std::printf("    #%-6u %s time %u ms, size %u, %s\n", i, FourccText(e.ckid).c_str(), e.dwTimeMs,
                    e.dwChunkLength, KeyText(e.dwFlags));
    }
}

int ReadFrames(CAVIParser* parser, uint32_t stream) {
    std::printf("  frames of stream %u:\n", stream);
    uint32_t count = 0;
    uint64_t bytes = 0;
    for (;;) {
        _FrameInfo frame{};
        int32_t r = parser->getNextFrame(stream, &frame);
        if (r == 1) break;
        if (r != MM_OK) {
            std::printf("    frame read failed (0x%08X)\n", static_cast<unsigned>(r));
            return 1;
        }
        std::printf("    time %u ms, size %u, %s\n", frame.dwTimeMs, frame.dwSize, KeyText(frame.dwFlags));
        ++count;
        bytes += frame.dwSize;
        MM_MediaExtractor_FreeBuffer(frame.pData);
    }
    std::printf("  %u frame(s), %llu bytes\n", count, static_cast<unsigned long long>(bytes));
    return 0;
}

}  // namespace

int FramesCommand(const std::string& file, uint32_t stream, bool seek, uint32_t seekMs) {
    const char* path = file.c_str();
    CAVIParser* parser = nullptr;
    if (CreateAVIParserObject(&parser) != MM_OK) return 1;
    std::printf("%s\n", path);
    int status = 0;
    int32_t r = parser->init(path, nullptr);
    if (r != MM_OK) {
        std::printf("  init failed (0x%08X)\n", static_cast<unsigned>(r));
        std::fprintf(stderr, "metainfo: %s: not a readable AVI file (0x%08X)\n", path, static_cast<unsigned>(r));
        status = 1;
    } else {
        PrintStreams(parser);
        if (!ReadIndex(parser)) {
            status = 1;
        } else {
            const uint32_t s = stream;
            PrintEntries(parser, s);
            if (seek) {
                uint32_t actual = 0;
                r = parser->setMediaTime(s, seekMs, &actual);
                if (r != MM_OK) {
                    std::printf("  seek to %u ms failed (0x%08X)\n", seekMs, static_cast<unsigned>(r));
                    status = 1;
                } else {
                    std::printf("  seek to %u ms: at %u ms\n", seekMs, actual);
                }
            }
            if (status == 0) status = ReadFrames(parser, s);
        }
    }
    FreeAVIParserObject(parser);
    return status;
}

}  // namespace probe
