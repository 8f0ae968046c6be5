// Every real file of the corpus, some of them hostile: detection, the extension check,
// the public answers for the detected type and every slot's answers for the type the
// name suggests, against tests/data/corpus.txt; then every type's readers, the cuts to
// a file and the maker box over every file, without a fault or a leaked handle.
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "metainfo/aac.h"
#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "metainfo/mp4.h"
#include "mp3/mp3_info.h"
#include "support/bytes.h"
#include "support/golden.h"

using namespace testing_support;

TEST(Corpus, EveryFileAnswersAsRecorded) {
    const std::string root = CorpusDir();
    if (root.empty()) GTEST_SKIP() << NoCorpusReason();
    const std::map<std::string, int> byExtension = {
        {".mp3", MEDIA_TYPE_MP3}, {".id3", MEDIA_TYPE_MP3}, {".aac", MEDIA_TYPE_AAC}, {".wav", MEDIA_TYPE_WAVE},
        {".wma", MEDIA_TYPE_ASF}, {".m4a", MEDIA_TYPE_MP4}, {".m4b", MEDIA_TYPE_MP4}, {".m4v", MEDIA_TYPE_MP4},
        {".mp4", MEDIA_TYPE_MP4}, {".3g2", MEDIA_TYPE_MP4}, {".mid", MEDIA_TYPE_MIDI}};
    TempDir dir;
    const std::string out = dir.PathOf("cut");
    Golden golden("corpus", "files");
    const int before = OpenDescriptors();
    for (const std::string& path : FilesUnder(root)) {
        std::string ext = std::filesystem::path(path).extension().string();
        if (ext == ".md") continue;
        SCOPED_TRACE(path);
        const char* p = path.c_str();
        for (char& c : ext) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
        int type = -1;
        const int32_t detected = MM_MediaExtractor_DetectMediaType(p, &type);
        const auto named = byExtension.find(ext);
        const int asked = named != byExtension.end() ? named->second : type;
        // One query at a time: a reader may leave state for the next one.
        std::string row = "detect " + golden_detail::Hex(detected) + "/" + std::to_string(type);
        row += " check " + golden_detail::Hex(MM_MediaExtractor_CheckMediaType(p));
        row += " | public " + SlotAnswers(path, type, true);
        row += " | slots " + SlotAnswers(path, asked);
        if (asked == MEDIA_TYPE_MP3) {
            metainfo::_MP3AudioInfo info{};
            const int32_t r = metainfo::GetMediaInfo_MP3(p, &info, INFO_MP3_AUDIO);
            row += " | vbr " + std::to_string(r) + " " + std::to_string(info.headerKind) + "/" +
                   std::to_string(info.xingOffset);
            delete[] info.xingToc;
        }
        golden.Check(path.substr(root.size() + 1), row);
        for (int t = 1; t < MM_MEDIA_SLOTS; ++t) SlotAnswers(path, t, false, 0x7FFFFFFF);
        MP3_GetAudioData2File(p, 0, 100, out.c_str());
        AAC_GetAuidoData_File(p, 0, 1, out.c_str());
        WAVE_GetAudioData2File(p, 0, 2, out.c_str());
        AMR_GetAudioData2File(p, 0, 1, out.c_str());
        _MAKERINFO maker{};
        MP4_GetMakerInfo(p, &maker);
        MM_MediaExtractor_FreeBuffer(maker.pPhoneModel);
        MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
        MM_MediaExtractor_FreeBuffer(maker.pSmartAlbum);
    }
    EXPECT_EQ(OpenDescriptors(), before);
}
