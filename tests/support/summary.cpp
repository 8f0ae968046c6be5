#include "support/summary.h"

#include <cstdio>
#include <cstring>

namespace testing_support {

std::string ClipSummary(const _MMClipInfo& c) {
    std::string out(c.szFormat, strnlen(c.szFormat, sizeof c.szFormat));
    const struct {
        const char* name;
        uint32_t value;
    } fields[] = {
        {"size", c.nFileSize},     {"dur", c.nDuration},   {"bps", c.nBitrate},        {"c1", c.nReserved1},
        {"c2", c.nReserved2},      {"audio", c.bHasAudio}, {"video", c.bHasVideo},     {"abps", c.nAudioBitrate},
        {"hz", c.nSampleRate},     {"ch", c.nChannels},    {"bits", c.nBitsPerSample}, {"spf", c.nSamplesPerFrame},
        {"vbps", c.nVideoBitrate}, {"w", c.nWidth},        {"h", c.nHeight},           {"fps", c.nFrameRate}};
    for (const auto& f : fields) {
        if (f.value != 0) out += (out.empty() ? "" : " ") + std::string(f.name) + "=" + std::to_string(f.value);
    }
    return out;
}

std::string CodecSummary(const _MM_CODECTYPE& c) {
    char text[96];
    std::snprintf(text, sizeof text, "a=%x/%x/%x v=%x/%x/%x", c.nAudioCodec, c.nAudioProfile, c.nAudioSubType,
                  c.nVideoCodec, c.nVideoProfile, c.nVideoLevel);
    return text;
}

namespace {

std::string Item(const char* name, const _MMMetaItem& item) {
    const uint32_t length = item.nLength < sizeof item.szData ? item.nLength : sizeof item.szData;
    // UTF-16LE text of ASCII characters shows its low bytes only, marked "~".
    bool ascii16 = item.nEncoding == ENCODING_UTF16LE && length % 2 == 0;
    for (uint32_t i = 1; ascii16 && i < length; i += 2) ascii16 = item.szData[i] == 0;
    std::string out = std::string(" ") + name + "=" + std::to_string(item.nEncoding) + (ascii16 ? "~" : ":");
    for (uint32_t i = 0; i < length; i += ascii16 ? 2 : 1) {
        const unsigned char b = item.szData[i];
        if (b >= 0x20 && b < 0x7F && b != '\\') {
            out += static_cast<char>(b);
        } else {
            char hex[8];
            std::snprintf(hex, sizeof hex, "\\x%02X", b);
            out += hex;
        }
    }
    return out;
}

}  // namespace

std::string MetaSummary(const _MMMetaInfo& m) {
    static const char* const kNames[MM_META_ITEMS] = {
        "title",    "artist",  "album",    "genre",     "year",      "copyright", "reserved6", "composer", "track",
        "language", "comment", "filetype", "conductor", "publisher", "date",      "time",      "picformat"};
    std::string out;
    for (int k = 0; k < MM_META_ITEMS; ++k) {
        if (m.aItems[k].nLength != 0) out += Item(kNames[k], m.aItems[k]);
    }
    if (m.pPicture != nullptr || m.nPictureSize != 0) {
        out += (m.pPicture != nullptr ? " pic=" : " picsize=") + std::to_string(m.nPictureSize);
    }
    if (m.nRating != 0) out += " rating=" + std::to_string(m.nRating);
    if (m.nPlayCount != 0) out += " plays=" + std::to_string(m.nPlayCount);
    if (m.stAlbumArtist.nLength != 0) out += Item("albumartist", m.stAlbumArtist);
    return out.empty() ? out : out.substr(1);
}

}  // namespace testing_support
