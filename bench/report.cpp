#include "report.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <map>
#include <set>

namespace bench {
namespace {

double Median(std::vector<double> v) {
    if (v.empty()) return NAN;
    std::sort(v.begin(), v.end());
    const size_t mid = v.size() / 2;
    return v.size() % 2 != 0 ? v[mid] : (v[mid - 1] + v[mid]) / 2;
}

double GeometricMean(const std::vector<double>& v) {
    if (v.empty()) return NAN;
    double logs = 0;
    for (double x : v) logs += std::log(x);
    return std::exp(logs / static_cast<double>(v.size()));
}

// The file's time with a peer: the median of its rounds, in microseconds.
double Micros(const std::vector<Sample>& rounds) {
    std::vector<double> ns;
    for (const Sample& s : rounds) ns.push_back(static_cast<double>(s.ns));
    return Median(ns) / 1000.0;
}

// Families in the order they first appear, the scaling set left out.
std::vector<std::string> Families(const Results& r) {
    std::vector<std::string> out;
    for (const BenchFile& f : r.files) {
        if (f.variant.empty() && std::find(out.begin(), out.end(), f.family) == out.end()) out.push_back(f.family);
    }
    std::sort(out.begin(), out.end());
    return out;
}

std::vector<size_t> FilesOf(const Results& r, const std::string& family) {
    std::vector<size_t> out;
    for (size_t i = 0; i < r.files.size(); ++i) {
        if (r.files[i].variant.empty() && r.files[i].family == family) out.push_back(i);
    }
    return out;
}

void PrintHeader(const char* first, const std::vector<std::string>& peers, size_t from) {
    std::printf("| %-10s | files |", first);
    for (size_t p = from; p < peers.size(); ++p) std::printf(" %11s |", peers[p].c_str());
    std::printf("\n|------------|------:|");
    for (size_t p = from; p < peers.size(); ++p) std::printf("------------:|");
    std::printf("\n");
}

void PrintCell(double value, const char* format) {
    if (std::isnan(value)) {
        std::printf(" %11s |", "-");
    } else {
        char text[32];
        std::snprintf(text, sizeof text, format, value);
        std::printf(" %11s |", text);
    }
}

}  // namespace

void PrintTimes(const Results& r) {
    std::printf("\nMedian microseconds per job (page cache warm)\n\n");
    PrintHeader("family", r.peers, 0);
    for (const std::string& family : Families(r)) {
        const std::vector<size_t> files = FilesOf(r, family);
        std::printf("| %-10s | %5zu |", family.c_str(), files.size());
        for (size_t p = 0; p < r.peers.size(); ++p) {
            std::vector<double> us;
            for (size_t i : files) us.push_back(Micros(r.samples[i][p]));
            PrintCell(Median(us), "%.1f");
        }
        std::printf("\n");
    }
}

void PrintSpeedups(const Results& r) {
    std::printf("\nHow many times faster %s is than each peer (geometric mean of per-file ratios)\n\n",
                r.peers[0].c_str());
    PrintHeader("family", r.peers, 1);
    std::vector<std::vector<double>> all(r.peers.size());
    for (const std::string& family : Families(r)) {
        const std::vector<size_t> files = FilesOf(r, family);
        std::printf("| %-10s | %5zu |", family.c_str(), files.size());
        for (size_t p = 1; p < r.peers.size(); ++p) {
            std::vector<double> ratios;
            for (size_t i : files) ratios.push_back(Micros(r.samples[i][p]) / Micros(r.samples[i][0]));
            all[p].insert(all[p].end(), ratios.begin(), ratios.end());
            PrintCell(GeometricMean(ratios), "%.2fx");
        }
        std::printf("\n");
    }
    std::printf("| %-10s | %5zu |", "all", all.size() > 1 ? all[1].size() : 0);
    for (size_t p = 1; p < r.peers.size(); ++p) PrintCell(GeometricMean(all[p]), "%.2fx");
    std::printf("\n");
}

void PrintBytes(const Results& r) {
    std::printf(
        "\nBytes read per job / file size: median (max); last column: most bytes %s read from a file over 1 MiB\n\n",
        r.peers[0].c_str());
    std::printf("| %-10s | files |", "family");
    for (const std::string& peer : r.peers) std::printf(" %15s |", peer.c_str());
    std::printf(" >1 MiB max |\n|------------|------:|");
    for (size_t p = 0; p < r.peers.size(); ++p) std::printf("----------------:|");
    std::printf("-----------:|\n");
    for (const std::string& family : Families(r)) {
        const std::vector<size_t> files = FilesOf(r, family);
        std::printf("| %-10s | %5zu |", family.c_str(), files.size());
        for (size_t p = 0; p < r.peers.size(); ++p) {
            std::vector<double> ratios;
            for (size_t i : files) {
                if (r.files[i].size > 0)
                    ratios.push_back(static_cast<double>(r.samples[i][p].front().bytes) /
                                     static_cast<double>(r.files[i].size));
            }
            char text[40];
            std::snprintf(text, sizeof text, "%.2f (%.2f)", Median(ratios),
                          ratios.empty() ? NAN : *std::max_element(ratios.begin(), ratios.end()));
            std::printf(" %15s |", text);
        }
        int64_t most = -1;
        for (size_t i : files) {
            if (r.files[i].size > (1 << 20)) most = std::max(most, r.samples[i][0].front().bytes);
        }
        if (most < 0) {
            std::printf(" %10s |\n", "-");
        } else {
            std::printf(" %7.1f KiB |\n", static_cast<double>(most) / 1024.0);
        }
    }
}

void PrintScaling(const Results& r) {
    std::map<std::string, std::map<int, size_t>> variants;
    std::set<int> durations;
    for (size_t i = 0; i < r.files.size(); ++i) {
        if (r.files[i].variant.empty()) continue;
        variants[r.files[i].variant][r.files[i].seconds] = i;
        durations.insert(r.files[i].seconds);
    }
    if (variants.empty() || durations.size() < 2) return;
    const int shortest = *durations.begin();
    const int longest = *durations.rbegin();
    std::printf("\nScaling: %s microseconds per job by duration, and the %d s / %d s ratio of every peer\n\n",
                r.peers[0].c_str(), longest, shortest);
    std::printf("| %-16s |", "file");
    for (int d : durations) std::printf(" %9d s |", d);
    for (const std::string& peer : r.peers) std::printf(" %11s |", peer.c_str());
    std::printf("\n|------------------|");
    for (size_t k = 0; k < durations.size() + r.peers.size(); ++k) std::printf("------------:|");
    std::printf("\n");
    for (const auto& [variant, byDuration] : variants) {
        std::printf("| %-16s |", variant.c_str());
        for (int d : durations) {
            const auto it = byDuration.find(d);
            PrintCell(it != byDuration.end() ? Micros(r.samples[it->second][0]) : NAN, "%.1f");
        }
        const auto a = byDuration.find(shortest);
        const auto b = byDuration.find(longest);
        for (size_t p = 0; p < r.peers.size(); ++p) {
            const double ratio = a != byDuration.end() && b != byDuration.end()
                                     ? Micros(r.samples[b->second][p]) / Micros(r.samples[a->second][p])
                                     : NAN;
            PrintCell(ratio, "%.2f");
        }
        std::printf("\n");
    }
}

}  // namespace bench
