// Writes starting inputs for the fuzz targets: valid files of every format,
// made with the tests' byte builders, and the media files found under the
// folders given (the bundled samples, the real-world corpus), each handed to
// the targets of the type the library detects in it or, failing that, of its
// extension.
//
//   metainfo_make_seeds OUT_DIR [MEDIA_DIR...]
//
// OUT_DIR/<target>/ receives the files of each target.
#include <dirent.h>
#include <strings.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstddef>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <map>
#include <string>
#include <vector>

#include "accurate_seeds.h"
#include "metainfo/metainfo.h"
#include "support/bytes.h"
#include "support/fixture_files.h"

using namespace testing_support;

namespace {

using Seed = std::vector<uint8_t>;

// Media files larger than this are left out: they slow every run down.
constexpr size_t kMaxSeedBytes = 512 * 1024;
// Files of the formats only the accurate interface reads keep their first
// 48 KiB and last 16 KiB (the readers look at both ends) when larger.
constexpr size_t kAccurateHead = 48 * 1024, kAccurateTail = 16 * 1024;

// Formats the MM_ detection does not know, routed by their suffix.
constexpr int kFlac = 100, kOgg = 101, kMatroska = 102, kAiff = 103;

std::string g_out;
std::map<std::string, int> g_written;

void Put(const std::string& target, const std::string& name, const Seed& bytes) {
    const std::string dir = g_out + "/" + target;
    mkdir(dir.c_str(), 0755);
    std::ofstream out(dir + "/" + name, std::ios::binary);
    out.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    ++g_written[target];
}

// The extraction target reads a selector (the extension's slot) and a start
// and end second before the media.
void PutRanges(const std::string& name, int extensionSlot, const Seed& media) {
    const int ranges[][2] = {{0, 1}, {1, 4}, {0, 0x7F}};
    for (const auto& r : ranges) {
        Seed s = {static_cast<uint8_t>(extensionSlot), static_cast<uint8_t>(r[0]), static_cast<uint8_t>(r[1])};
        s.insert(s.end(), media.begin(), media.end());
        Put("extract", name + "-" + std::to_string(r[0]) + "-" + std::to_string(r[1]), s);
    }
}

// Targets for a media type, and the extraction slot (-1: not cut).
struct Route {
    int type;
    std::vector<std::string> targets;
    int extractSlot;
};

const std::vector<Route>& Routes() {
    static const std::vector<Route> routes = {
        {MEDIA_TYPE_MP3, {"mp3", "ape"}, 0},
        {MEDIA_TYPE_AAC, {"aac", "ape"}, 1},
        {MEDIA_TYPE_AMR_NB, {"speech"}, 2},
        {MEDIA_TYPE_AMR_WB, {"speech"}, 3},
        {MEDIA_TYPE_WAVE, {"speech"}, 4},
        {MEDIA_TYPE_QCP, {"speech"}, -1},
        {MEDIA_TYPE_EVRC, {"speech"}, -1},
        {MEDIA_TYPE_MIDI, {"speech"}, -1},
        {MEDIA_TYPE_SND, {"speech"}, -1},
        {MEDIA_TYPE_MP4, {"mp4", "mp4_maker"}, -1},
        {MEDIA_TYPE_ASF, {"asf"}, -1},
        {MEDIA_TYPE_REALMEDIA, {"realmedia"}, -1},
        {MEDIA_TYPE_AVI, {"avi", "avi_parser"}, -1},
        {kFlac, {"flac"}, -1},
        {kOgg, {"ogg"}, -1},
        {kMatroska, {"matroska"}, -1},
        {kAiff, {"aiff"}, -1},
    };
    return routes;
}

void PutForType(int type, const std::string& name, const Seed& bytes) {
    Put("detect", name, bytes);
    Put("probe", name, bytes);
    for (const Route& r : Routes()) {
        if (r.type != type) continue;
        for (const std::string& t : r.targets) Put(t, name, bytes);
        if (r.extractSlot >= 0) PutRanges(name, r.extractSlot, bytes);
    }
}

// --- media files of the given folders ---------------------------------------

int TypeByExtension(const std::string& name) {
    static const std::pair<const char*, int> kExtensions[] = {
        {".mp3", MEDIA_TYPE_MP3},
        {".aac", MEDIA_TYPE_AAC},
        {".m4a", MEDIA_TYPE_MP4},
        {".mp4", MEDIA_TYPE_MP4},
        {".3gp", MEDIA_TYPE_MP4},
        {".m4b", MEDIA_TYPE_MP4},
        {".wma", MEDIA_TYPE_ASF},
        {".asf", MEDIA_TYPE_ASF},
        {".wmv", MEDIA_TYPE_ASF},
        {".rm", MEDIA_TYPE_REALMEDIA},
        {".ra", MEDIA_TYPE_REALMEDIA},
        {".avi", MEDIA_TYPE_AVI},
        {".amr", MEDIA_TYPE_AMR_NB},
        {".awb", MEDIA_TYPE_AMR_WB},
        {".wav", MEDIA_TYPE_WAVE},
        {".qcp", MEDIA_TYPE_QCP},
        {".evc", MEDIA_TYPE_EVRC},
        {".mid", MEDIA_TYPE_MIDI},
        {".flac", kFlac},
        {".ogg", kOgg},
        {".oga", kOgg},
        {".ogv", kOgg},
        {".opus", kOgg},
        {".mkv", kMatroska},
        {".mka", kMatroska},
        {".webm", kMatroska},
        {".aif", kAiff},
        {".aiff", kAiff},
        {".aifc", kAiff},
    };
    const size_t dot = name.rfind('.');
    if (dot == std::string::npos) return MEDIA_TYPE_UNKNOWN;
    for (const auto& e : kExtensions) {
        if (strcasecmp(name.c_str() + dot, e.first) == 0) return e.second;
    }
    return MEDIA_TYPE_UNKNOWN;
}

// Files under dir (recursively), each routed by content, else by extension.
int AddFolder(const std::string& dir, const std::string& prefix) {
    int added = 0;
    DIR* d = opendir(dir.c_str());
    if (d == nullptr) return 0;
    while (dirent* e = readdir(d)) {
        const std::string name = e->d_name;
        if (name[0] == '.') continue;
        const std::string path = dir + "/" + name;
        struct stat st;
        if (stat(path.c_str(), &st) != 0) continue;
        if (S_ISDIR(st.st_mode)) {
            added += AddFolder(path, prefix + name + "-");
            continue;
        }
        if (!S_ISREG(st.st_mode) || static_cast<size_t>(st.st_size) > kMaxSeedBytes) continue;
        int type = MEDIA_TYPE_UNKNOWN;
        if (MM_MediaExtractor_DetectMediaType(path.c_str(), &type) != MM_OK || type == MEDIA_TYPE_UNKNOWN) {
            type = TypeByExtension(name);
        }
        if (type == MEDIA_TYPE_UNKNOWN) continue;
        Seed bytes = ReadFileBytes(path);
        if (type >= kFlac && bytes.size() > kAccurateHead + kAccurateTail) {
            bytes.erase(bytes.begin() + static_cast<std::ptrdiff_t>(kAccurateHead),
                        bytes.end() - static_cast<std::ptrdiff_t>(kAccurateTail));
        }
        PutForType(type, prefix + name, bytes);
        ++added;
    }
    closedir(d);
    return added;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 2) {
        std::fprintf(stderr, "usage: %s OUT_DIR [MEDIA_DIR...]\n", argv[0]);
        return 2;
    }
    g_out = argv[1];
    mkdir(g_out.c_str(), 0755);
    for (const FixtureFile& f : FixtureFiles()) PutForType(f.type, f.name, f.bytes);
    for (const AccurateSeed& f : AccurateSeeds()) {
        Put(f.target, f.name, f.bytes);
        Put("probe", f.name, f.bytes);
        Put("detect", f.name, f.bytes);
    }
    for (int i = 2; i < argc; ++i) {
        const std::string dir = argv[i];
        const std::string base = dir.substr(dir.find_last_of('/') + 1);
        const int added = AddFolder(dir, base + "-");
        if (added == 0) {
            std::printf("%s: no media file there (%s), so no seed from it\n", dir.c_str(),
                        access(dir.c_str(), F_OK) == 0 ? "the folder holds none" : "the folder is absent");
        } else {
            std::printf("%s: %d media file(s)\n", dir.c_str(), added);
        }
    }
    for (const auto& t : g_written) std::printf("  %-12s %d seed(s)\n", t.first.c_str(), t.second);
    return 0;
}
