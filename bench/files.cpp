#include "files.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <map>
#include <regex>

namespace bench {
namespace {

namespace fs = std::filesystem;

std::string FamilyOf(const fs::path& path) {
    static const std::map<std::string, std::string> kFamilies = {
        {"mp3", "MP3"},      {"aac", "AAC"},      {"m4a", "MP4"},        {"m4b", "MP4"},  {"m4v", "MP4"},
        {"mp4", "MP4"},      {"3gp", "MP4"},      {"3g2", "MP4"},        {"wma", "ASF"},  {"wmv", "ASF"},
        {"asf", "ASF"},      {"wav", "WAVE"},     {"amr", "AMR"},        {"awb", "AMR"},  {"avi", "AVI"},
        {"rm", "RealMedia"}, {"ra", "RealMedia"}, {"rmvb", "RealMedia"}, {"qcp", "QCP"},  {"evc", "EVRC"},
        {"mid", "MIDI"},     {"flac", "FLAC"},    {"ogg", "Ogg"},        {"opus", "Ogg"}, {"oga", "Ogg"},
        {"mkv", "Matroska"}, {"mka", "Matroska"}, {"webm", "Matroska"},  {"aif", "AIFF"}, {"aiff", "AIFF"},
        {"aifc", "AIFF"},
    };
    std::string ext = path.extension().string();
    if (!ext.empty()) ext.erase(0, 1);
    std::transform(ext.begin(), ext.end(), ext.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    const auto it = kFamilies.find(ext);
    return it != kFamilies.end() ? it->second : "other";
}

BenchFile Describe(const fs::path& path) {
    static const std::regex kScaled(R"(^(.+)\.([0-9]+)s\.[^.]+$)");
    BenchFile f;
    f.path = path.string();
    f.family = FamilyOf(path);
    std::error_code ec;
    f.size = static_cast<int64_t>(fs::file_size(path, ec));
    std::smatch m;
    const std::string name = path.filename().string();
    if (std::regex_match(name, m, kScaled)) {
        f.variant = m[1];
        f.seconds = std::stoi(m[2]);
    }
    return f;
}

}  // namespace

std::vector<BenchFile> CollectFiles(const std::vector<std::string>& roots) {
    std::vector<BenchFile> files;
    for (const std::string& root : roots) {
        std::error_code ec;
        if (fs::is_directory(root, ec)) {
            for (const auto& entry : fs::recursive_directory_iterator(root, ec)) {
                if (entry.is_regular_file(ec)) files.push_back(Describe(entry.path()));
            }
        } else if (fs::is_regular_file(root, ec)) {
            files.push_back(Describe(root));
        }
    }
    std::sort(files.begin(), files.end(), [](const BenchFile& a, const BenchFile& b) { return a.path < b.path; });
    return files;
}

}  // namespace bench
