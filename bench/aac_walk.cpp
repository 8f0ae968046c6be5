// What the AAC walk costs per frame, beside what reading the same bits once
// costs: the first frames of each ADTS file are walked as the clip
// information walks them, many times over, and timed.
#include <CLI/CLI.hpp>

#include <chrono>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "aac/aac_bits.h"
#include "aac/aac_walker.h"

namespace {

struct Frame {
    size_t offset;
    size_t length;
    int samplingIndex;
    int headerSize;
};

std::vector<uint8_t> ReadAll(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::vector<uint8_t>(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// The first `count` ADTS frames of one raw data block each.
std::vector<Frame> FirstFrames(const std::vector<uint8_t>& d, size_t count) {
    std::vector<Frame> frames;
    size_t p = 0;
    while (p + 7 <= d.size() && frames.size() < count) {
        if (d[p] != 0xFF || (d[p + 1] & 0xF6) != 0xF0) break;
        const size_t length = (d[p + 3] & 3u) << 11 | size_t{d[p + 4]} << 3 | d[p + 5] >> 5;
        if (length < 7 || p + length > d.size()) break;
        if ((d[p + 6] & 3) == 0) frames.push_back({p, length, (d[p + 2] >> 2) & 0x0F, (d[p + 1] & 1) ? 7 : 9});
        p += length;
    }
    return frames;
}

template <typename Pass>
double NanosecondsPerPass(int repeats, Pass&& pass) {
    const auto start = std::chrono::steady_clock::now();
    uint64_t sink = 0;
    for (int i = 0; i < repeats; ++i) {
        sink += pass();
        // Every pass reads the data anew: nothing may be carried over.
        asm volatile("" : "+r"(sink) : : "memory");
    }
    const auto end = std::chrono::steady_clock::now();
    if (sink == 1) std::fputs("", stderr);  // keeps the passes from being optimised away
    return std::chrono::duration<double, std::nano>(end - start).count() / repeats;
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"Times the AAC walk per frame against reading the same bits once."};
    std::vector<std::string> paths;
    size_t count = 10;
    int repeats = 2000;
    app.add_option("files", paths, "ADTS files")->required();
    app.add_option("--frames", count, "frames walked per file (the clip information walks about ten)");
    app.add_option("--repeats", repeats, "passes timed")->check(CLI::Range(1, 1000000));
    CLI11_PARSE(app, argc, argv);

    std::printf("| file | frames | bytes | walk µs | walk ns/frame | walk ns/byte | read once ns/byte | ratio |\n");
    std::printf("|---|---:|---:|---:|---:|---:|---:|---:|\n");
    for (const std::string& path : paths) {
        const std::vector<uint8_t> data = ReadAll(path);
        const std::vector<Frame> frames = FirstFrames(data, count);
        if (frames.empty()) continue;
        size_t bytes = 0;
        for (const Frame& f : frames) bytes += f.length - static_cast<size_t>(f.headerSize);
        const double walk = NanosecondsPerPass(repeats, [&] {
            uint64_t ends = 0;
            for (const Frame& f : frames) {
                metainfo::AacBitReader r =
                    metainfo::MakeAacBitReader(data.data() + f.offset, static_cast<int>(f.length), f.headerSize);
                uint32_t state = metainfo::kWalkPlain;
                metainfo::RawDataStream(&r, &state, f.samplingIndex);
                ends += static_cast<uint64_t>(r.bitPos) + state;
            }
            return ends;
        });
        // The same bits read once through the same reader, 7 at a time (about
        // the mean length of a spectral codeword with its signs).
        const double once = NanosecondsPerPass(repeats, [&] {
            uint64_t sum = 0;
            for (const Frame& f : frames) {
                metainfo::AacBitReader r =
                    metainfo::MakeAacBitReader(data.data() + f.offset, static_cast<int>(f.length), f.headerSize);
                while (!r.exhausted) sum += metainfo::ReadBits(&r, 7);
            }
            return sum;
        });
        std::printf("| %s | %zu | %zu | %.1f | %.0f | %.2f | %.2f | %.1fx |\n", path.c_str(), frames.size(), bytes,
                    walk / 1000, walk / static_cast<double>(frames.size()), walk / static_cast<double>(bytes),
                    once / static_cast<double>(bytes), walk / once);
    }
    return 0;
}
