// Expected answers kept as data: tests/data/<suite>.txt holds one "section/name<TAB>answer"
// line per case. METAINFO_UPDATE_GOLDEN=1 rewrites a section from the answers given; read
// the diff then, since a changed line is a changed answer of the library. Header only: the
// fuzz seed writer builds every .cpp of this folder, without gtest.
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "metainfo/metainfo.h"
#include "support/summary.h"

namespace testing_support {

class Golden {
public:
    Golden(const std::string& suite, const std::string& section);
    ~Golden();
    Golden(const Golden&) = delete;
    Golden& operator=(const Golden&) = delete;
    // Compares (or records) the answer of one case; names are unique within a section.
    void Check(const std::string& name, const std::string& answer);

private:
    std::string path_, section_;
    bool update_;
    std::vector<std::pair<std::string, std::string>> lines_, given_;
};

// Every slot's answer for a file of a type on one line, records filled with `fill`
// first (a pattern shows the fields a slot leaves alone): track, codec, clip, metadata (items,
// then the picture's first bytes), MIME type, the first second's audio data. With
// viaPublic the exported queries answer instead of the type's slots (MIME and audio
// data come from the slots either way). A slot the type lacks shows "-".
std::string SlotAnswers(const std::string& path, int type, bool viaPublic = false, int pictureLimit = 1,
                        uint8_t fill = 0);

namespace golden_detail {

inline std::string OneLine(const std::string& text) {
    std::string out;
    for (char c : text) out += c == '\n' ? "\\n" : c == '\t' ? "\\t" : std::string(1, c);
    return out;
}

inline std::string Hex(int32_t r) { return (std::ostringstream() << std::hex << static_cast<uint32_t>(r)).str(); }

}  // namespace golden_detail

using golden_detail::Hex;
using golden_detail::OneLine;

inline Golden::Golden(const std::string& suite, const std::string& section)
    : path_(std::string(METAINFO_TEST_DATA_DIR) + "/" + suite + ".txt"), section_(section + "/") {
    const char* update = std::getenv("METAINFO_UPDATE_GOLDEN");
    update_ = update != nullptr && std::string(update) == "1";
    std::ifstream in(path_);
    for (std::string line; std::getline(in, line);) {
        const size_t tab = line.find('\t');
        if (tab != std::string::npos) lines_.emplace_back(line.substr(0, tab), line.substr(tab + 1));
    }
}

inline void Golden::Check(const std::string& name, const std::string& answer) {
    const std::string key = section_ + name, text = OneLine(answer);
    for (const auto& g : given_) {
        if (g.first == key) ADD_FAILURE() << key << " is checked twice";
    }
    given_.emplace_back(key, text);
    if (update_) return;
    for (const auto& l : lines_) {
        if (l.first == key) {
            EXPECT_EQ(text, l.second) << key;
            return;
        }
    }
    ADD_FAILURE() << "no answer for " << key << " in " << path_ << " (METAINFO_UPDATE_GOLDEN=1 writes it)";
}

inline Golden::~Golden() {
    auto inSection = [this](const std::string& key) { return key.compare(0, section_.size(), section_) == 0; };
    if (!update_) {
        for (const auto& l : lines_) {
            bool seen = false;
            for (const auto& g : given_) seen = seen || g.first == l.first;
            if (inSection(l.first) && !seen) ADD_FAILURE() << l.first << " in " << path_ << " was not checked";
        }
        return;
    }
    // The section's new lines take the place of its old ones.
    std::vector<std::pair<std::string, std::string>> out;
    bool placed = false;
    for (const auto& l : lines_) {
        if (!inSection(l.first)) {
            out.push_back(l);
        } else if (!placed) {
            out.insert(out.end(), given_.begin(), given_.end());
            placed = true;
        }
    }
    if (!placed) out.insert(out.end(), given_.begin(), given_.end());
    std::ofstream file(path_);
    for (const auto& l : out) file << l.first << '\t' << l.second << '\n';
}

inline std::string SlotAnswers(const std::string& path, int type, bool viaPublic, int pictureLimit, uint8_t fill) {
    const char* p = path.c_str();
    const bool slot = type > 0 && type < MM_MEDIA_SLOTS;
    std::string s;
    int mask = 0x5A;
    if (viaPublic || (slot && MM_GetTrackType[type] != nullptr)) {
        const int32_t r = viaPublic ? MM_MediaExtractor_GetTrackType(p, type, &mask) : MM_GetTrackType[type](p, &mask);
        s += "track " + Hex(r) + "/" + Hex(mask);
    } else {
        s += "track -";
    }
    _MM_CODECTYPE codec;
    std::memset(&codec, fill, sizeof codec);
    if (viaPublic || (slot && MM_GetCodecType[type] != nullptr)) {
        const int32_t r =
            viaPublic ? MM_MediaExtractor_GetCodecType(p, type, &codec) : MM_GetCodecType[type](p, &codec);
        s += " | " + (r == MM_OK ? "" : Hex(r) + " ") + CodecSummary(codec);
    } else {
        s += " | -";
    }
    _MMClipInfo clip, pattern;
    std::memset(&clip, fill, sizeof clip);
    std::memset(&pattern, fill, sizeof pattern);
    std::memset(clip.szFormat, 0, sizeof clip.szFormat);
    std::memset(pattern.szFormat, 0, sizeof pattern.szFormat);
    if (viaPublic || (slot && MM_GetClipInfo[type] != nullptr)) {
        const int32_t r = viaPublic ? MM_MediaExtractor_GetClipInfo(p, type, &clip) : MM_GetClipInfo[type](p, &clip);
        const bool touched = std::memcmp(&clip, &pattern, sizeof clip) != 0;
        s += " | " + (r == MM_OK ? ClipSummary(clip) : Hex(r) + (touched ? " " + ClipSummary(clip) : ""));
    } else {
        s += " | -";
    }
    _MMMetaInfo meta;
    std::memset(&meta, 0, sizeof meta);
    if (viaPublic || (slot && MM_GetMetaInfo[type] != nullptr)) {
        const int32_t r =
            viaPublic ? MM_MediaExtractor_GetMetaInfo(p, type, &meta) : MM_GetMetaInfo[type](p, &meta, pictureLimit);
        s += " | meta " + Hex(r) + " " + MetaSummary(meta);
        for (uint32_t i = 0; meta.pPicture != nullptr && i < meta.nPictureSize && i < 8; ++i) {
            s += (i == 0 ? " " : "") + Hex(meta.pPicture[i]);
        }
        MM_MediaExtractor_FreeMetaInfo(&meta);
    } else {
        s += " | -";
    }
    _MM_MIMETYPE mime{};
    if (slot && MM_GetMIMEType[type] != nullptr) {
        const int32_t r = MM_GetMIMEType[type](p, &mime);
        s += " | " + (r != MM_OK
                          ? Hex(r) + (mime.pszMimeType != nullptr ? " (set)" : "")
                          : std::string(mime.pszMimeType != nullptr ? mime.pszMimeType : "(null)") + "/" +
                                std::to_string(mime.nMimeLength) +
                                (mime.pszVideoMimeType != nullptr ? std::string(" ") + mime.pszVideoMimeType : ""));
        MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
        MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);
    } else {
        s += " | -";
    }
    if (slot && MM_GetAudioData[type] != nullptr) {
        unsigned char* data = nullptr;
        int size = -1;
        const int32_t r = MM_GetAudioData[type](p, 0, 1, &data, &size);
        s += " | cut " + Hex(r) + (r == MM_OK ? " " + std::to_string(size) : data != nullptr ? " (set)" : "");
        MM_MediaExtractor_FreeBuffer(data);
    } else {
        s += " | -";
    }
    return s;
}

}  // namespace testing_support
