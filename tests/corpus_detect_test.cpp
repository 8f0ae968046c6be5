// Detection over real files kept by other projects, hostile ones included.
#include <gtest/gtest.h>

#include <dirent.h>
#include <sys/stat.h>

#include <algorithm>
#include <cctype>
#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "support/bytes.h"

namespace {

std::vector<std::string> CorpusFiles() {
    std::vector<std::string> files;
    std::string root = testing_support::CorpusDir();
    if (root.empty()) return files;
    for (const char* sub : {"mutagen", "taglib"}) {
        std::string dir = root + "/" + sub;
        DIR* d = opendir(dir.c_str());
        if (d == nullptr) continue;
        while (dirent* e = readdir(d)) {
            std::string path = dir + "/" + e->d_name;
            struct stat st;
            if (e->d_name[0] != '.' && stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode)) files.push_back(path);
        }
        closedir(d);
    }
    std::sort(files.begin(), files.end());
    return files;
}

std::string LowerExtension(const std::string& path) {
    size_t dot = path.rfind('.');
    std::string ext = dot == std::string::npos ? "" : path.substr(dot);
    for (char& c : ext) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return ext;
}

}  // namespace

TEST(Corpus, DetectionAnswersEveryReadableFileAndKnowsTheObviousOnes) {
    std::vector<std::string> files = CorpusFiles();
    if (files.empty()) GTEST_SKIP() << "no corpus beside the project";
    for (const std::string& path : files) {
        struct stat st;
        ASSERT_EQ(stat(path.c_str(), &st), 0);
        int type = -1;
        int32_t result = MM_MediaExtractor_DetectMediaType(path.c_str(), &type);
        if (st.st_size < 16) {
            EXPECT_EQ(result, MM_E_FAIL) << path;
            continue;
        }
        ASSERT_EQ(result, MM_OK) << path;
        std::string ext = LowerExtension(path);
        if (ext == ".m4a" || ext == ".mp4" || ext == ".3g2" || ext == ".m4b" || ext == ".m4v") {
            // MP4 is known by a leading "ftyp" or "mdat"; the 64bit files open with "moov".
            if (path.find("64bit") == std::string::npos) {
                EXPECT_EQ(type, MEDIA_TYPE_MP4) << path;
            }
        } else if (ext == ".wma") {
            EXPECT_EQ(type, MEDIA_TYPE_ASF) << path;
        } else if (ext == ".wav" && path.find("rf64") == std::string::npos) {
            EXPECT_EQ(type, MEDIA_TYPE_WAVE) << path;
        } else if (ext == ".mid") {
            EXPECT_EQ(type, MEDIA_TYPE_MIDI) << path;
        }
        MM_MediaExtractor_CheckMediaType(path.c_str());
    }
}

TEST(Corpus, Mp3FilesWithFramesAreMp3) {
    std::string root = testing_support::CorpusDir();
    if (root.empty()) GTEST_SKIP() << "no corpus beside the project";
    for (const char* name : {"mutagen/silence-44-s.mp3", "mutagen/silence-44-s-v1.mp3", "mutagen/xing.mp3",
                             "mutagen/vbri.mp3", "mutagen/lame.mp3", "mutagen/silence-44-s-mpeg2.mp3",
                             "mutagen/silence-44-s-mpeg25.mp3", "taglib/lame_cbr.mp3", "taglib/lame_vbr.mp3"}) {
        int type = -1;
        std::string path = root + "/" + name;
        ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK) << name;
        EXPECT_EQ(type, MEDIA_TYPE_MP3) << name;
    }
}
