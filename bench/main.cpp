// probe_bench: the whole job per file (type, clip information, tags, codec)
// for libmetainfo and its peers, interleaved per file in one process.
#include <CLI/CLI.hpp>

#include <algorithm>
#include <clocale>
#include <cstdio>

#include "files.h"
#include "peer.h"
#include "report.h"

namespace {

using bench::Peer;

std::vector<std::unique_ptr<Peer>> MakePeers(const std::vector<std::string>& wanted, const std::string& worker,
                                             const std::string& python) {
    std::vector<std::unique_ptr<Peer>> all;
    all.push_back(bench::MakeMetainfoPeer());
    all.push_back(bench::MakeAccuratePeer());
    all.push_back(bench::MakeFloorPeer());
    all.push_back(bench::MakeTaglibPeer(false));
    all.push_back(bench::MakeTaglibPeer(true));
    all.push_back(bench::MakeAvformatPeer(false));
    all.push_back(bench::MakeAvformatPeer(true));
    all.push_back(bench::MakeMediainfoPeer());
    // The mutagen peer starts a worker process: only when it is asked for.
    if (wanted.empty() || std::find(wanted.begin(), wanted.end(), "mutagen") != wanted.end()) {
        all.push_back(bench::MakeMutagenPeer(worker, python));
    }
    std::vector<std::unique_ptr<Peer>> peers;
    for (auto& peer : all) {
        if (peer == nullptr) continue;
        if (wanted.empty() || std::find(wanted.begin(), wanted.end(), peer->Name()) != wanted.end()) {
            peers.push_back(std::move(peer));
        }
    }
    return peers;
}

// Every file with every peer, the peers' order rotated from file to file and
// from round to round so that none always runs on a cache the other warmed.
bench::Results Measure(std::vector<bench::BenchFile> files, std::vector<std::unique_ptr<Peer>>& peers, int rounds) {
    bench::Results r;
    r.files = std::move(files);
    for (const auto& peer : peers) r.peers.push_back(peer->Name());
    r.samples.assign(r.files.size(), std::vector<std::vector<bench::Sample>>(peers.size()));
    const size_t n = peers.size();
    for (int round = -1; round < rounds; ++round) {  // round -1 warms up
        for (size_t i = 0; i < r.files.size(); ++i) {
            for (size_t k = 0; k < n; ++k) {
                const size_t p = (i + static_cast<size_t>(round + 1) + k) % n;
                bench::Sample s = peers[p]->Run(r.files[i].path);
                if (round >= 0) r.samples[i][p].push_back(s);
            }
        }
        if (round >= 0) std::fprintf(stderr, "round %d of %d done\n", round + 1, rounds);
    }
    return r;
}

}  // namespace

int main(int argc, char** argv) {
    std::setlocale(LC_ALL, "C.UTF-8");
    CLI::App app{"Times the whole probe of each file for libmetainfo and its peers."};
    std::vector<std::string> roots;
    std::vector<std::string> wanted;
    std::string worker = "mutagen_worker.py";
    // Debian's interpreter, where python3-mutagen is installed
    std::string python = "/usr/bin/python3";
    int rounds = 5;
    bool once = false;
    std::string family;
    bool count = false;
    app.add_option("paths", roots, "files and folders to measure")->required();
    std::string peerList;
    app.add_option("--peers", peerList, "peers to run, comma-separated (default: every one built and installed)");
    app.add_option("--rounds", rounds, "measured rounds after the warm-up")->check(CLI::Range(1, 1000));
    app.add_option("--mutagen-worker", worker, "path of mutagen_worker.py");
    app.add_option("--family", family, "measure only this family (MP3, MP4, ...)");
    app.add_option("--python", python, "python3 that has mutagen");
    app.add_flag("--count", count, "print how many files would be measured, and stop");
    app.add_flag("--once", once, "run each job once and print nothing (for counting system calls)");
    CLI11_PARSE(app, argc, argv);
    for (size_t at = 0; at < peerList.size();) {
        const size_t comma = std::min(peerList.find(',', at), peerList.size());
        wanted.push_back(peerList.substr(at, comma - at));
        at = comma + 1;
    }

    std::vector<bench::BenchFile> files = bench::CollectFiles(roots);
    if (!family.empty()) {
        files.erase(
            std::remove_if(files.begin(), files.end(), [&](const bench::BenchFile& f) { return f.family != family; }),
            files.end());
    }
    if (count) {
        std::printf("%zu\n", files.size());
        return 0;
    }
    std::vector<std::unique_ptr<Peer>> peers = MakePeers(wanted, worker, python);
    if (files.empty() || peers.empty()) {
        std::fprintf(stderr, "probe_bench: nothing to measure (%zu files, %zu peers)\n", files.size(), peers.size());
        return 2;
    }
    if (once) {
        for (const auto& f : files) {
            for (auto& peer : peers) peer->Run(f.path);
        }
        return 0;
    }
    const bench::Results results = Measure(std::move(files), peers, rounds);
    bench::PrintTimes(results);
    bench::PrintSpeedups(results);
    bench::PrintBytes(results);
    bench::PrintScaling(results);
    return 0;
}
