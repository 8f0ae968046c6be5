#include "probe_json.h"

#include <cstdio>
#include <ctime>

#include "codec_names.h"
#include "probe_format.h"

namespace probe {
namespace {

// Seconds from 1904-01-01 (MP4 times) to 1970-01-01.
constexpr int64_t kMp4EpochOffset = 2082844800;

Json CountOrNull(uint64_t v) { return v != 0 ? Json(v) : Json(nullptr); }
Json TextOrNull(const std::string& s) { return s.empty() ? Json(nullptr) : Json(s); }
Json NameOrNull(const char* s) { return s != nullptr ? Json(s) : Json(nullptr); }

// Bytes of the valid UTF-8 sequence at s[i], or 0.
size_t Utf8Length(const std::string& s, size_t i) {
    const auto c = static_cast<unsigned char>(s[i]);
    const size_t n = c < 0x80 ? 1 : (c >> 5) == 6 ? 2 : (c >> 4) == 14 ? 3 : (c >> 3) == 30 ? 4 : 0;
    if (n == 0 || i + n > s.size()) return 0;
    uint32_t cp = n == 1 ? c : c & (0x7Fu >> n);
    for (size_t k = 1; k < n; ++k) {
        const auto d = static_cast<unsigned char>(s[i + k]);
        if ((d & 0xC0) != 0x80) return 0;
        cp = cp << 6 | (d & 0x3Fu);
    }
    const uint32_t least[5] = {0, 0, 0x80, 0x800, 0x10000};
    if (cp < least[n] || cp > 0x10FFFF || (cp >= 0xD800 && cp <= 0xDFFF)) return 0;
    return n;
}

// s with every byte that is not part of valid UTF-8 replaced by U+FFFD;
// *exact false when one was.
std::string Utf8(const std::string& s, bool* exact) {
    std::string out;
    *exact = true;
    for (size_t i = 0; i < s.size();) {
        const size_t n = Utf8Length(s, i);
        if (n == 0) {
            out += "\xEF\xBF\xBD";
            *exact = false;
            ++i;
        } else {
            out.append(s, i, n);
            i += n;
        }
    }
    return out;
}

std::string Hex(const std::string& s) {
    std::string out;
    char two[3];
    for (char c : s) {
        std::snprintf(two, sizeof two, "%02x", static_cast<unsigned char>(c));
        out += two;
    }
    return out;
}

// Text without padding: control bytes dropped, blanks trimmed at both ends.
std::string Clean(const std::string& s) {
    std::string out;
    for (char c : s) {
        const auto u = static_cast<unsigned char>(c);
        if (u >= 0x20 && u != 0x7F) out.push_back(c);
    }
    const size_t first = out.find_first_not_of(' ');
    if (first == std::string::npos) return std::string();
    return out.substr(first, out.find_last_not_of(' ') - first + 1);
}

std::string ItemText(const _MMMetaItem& item) {
    return item.nLength != 0 ? Clean(DecodeItemText(item)) : std::string();
}

// "3", "3/11": the number before the slash, and the one after.
Json NumberPart(const std::string& s, bool total) {
    const size_t slash = s.find('/');
    const std::string part =
        total ? (slash == std::string::npos ? std::string() : s.substr(slash + 1)) : s.substr(0, slash);
    if (part.empty() || part.size() > 9 || part.find_first_not_of("0123456789") != std::string::npos) return nullptr;
    return std::stoi(part);
}

Json Iso8601(int64_t unixSeconds) {
    const std::time_t t = static_cast<std::time_t>(unixSeconds);
    std::tm tm{};
    if (gmtime_r(&t, &tm) == nullptr) return nullptr;
    char text[32];
    std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &tm);
    return text;
}

// Whether the file has a stream of a kind: the clip information counts it, or
// the codec query names its codec.
bool HasStream(const Report& r, uint32_t count, uint32_t codec) {
    return (r.clipResult == MM_OK && count != 0) || (r.codecResult == MM_OK && codec != 0);
}

// A number of the clip information; null when that query failed or it is 0.
Json ClipNumber(const Report& r, uint32_t v) { return r.clipResult == MM_OK ? CountOrNull(v) : Json(nullptr); }

// A name taken from the codec query's answer; null when that query failed.
Json CodecName(const Report& r, const char* name) { return r.codecResult == MM_OK ? NameOrNull(name) : Json(nullptr); }

Json AudioJson(const Report& r) {
    const _MMClipInfo& c = r.clip;
    if (!HasStream(r, c.bHasAudio, r.codec.nAudioCodec)) return nullptr;
    const uint32_t bits = r.clipResult == MM_OK ? c.nBitsPerSample : 0;
    Json a;
    a["codec"] = CodecName(r, FfprobeCodecName(r.codec.nAudioCodec, bits));
    a["profile"] = CodecName(r, FfprobeAudioProfile(r.codec.nAudioCodec, r.codec.nAudioSubType));
    a["sample_rate"] = ClipNumber(r, c.nSampleRate);
    // A channel configuration of 0 reads as 0xFFFFFFFF: unknown.
    a["channels"] = ClipNumber(r, c.nChannels != 0xFFFFFFFFu ? c.nChannels : 0);
    a["bits_per_sample"] = ClipNumber(r, c.nBitsPerSample);
    a["bit_rate"] = ClipNumber(r, c.nAudioBitrate);
    return a;
}

Json VideoJson(const Report& r) {
    const _MMClipInfo& c = r.clip;
    if (!HasStream(r, c.bHasVideo, r.codec.nVideoCodec)) return nullptr;
    Json v;
    v["codec"] = CodecName(r, FfprobeCodecName(r.codec.nVideoCodec, 0));
    v["profile"] = CodecName(r, VideoProfileName(r.codec.nVideoProfile));
    v["level"] = nullptr;
    v["width"] = ClipNumber(r, c.nWidth);
    v["height"] = ClipNumber(r, c.nHeight);
    v["frame_rate"] = ClipNumber(r, c.nFrameRate);
    v["bit_rate"] = ClipNumber(r, c.nVideoBitrate);
    return v;
}

Json TagsJson(const Report& r) {
    Json t;
    const bool ok = r.metaResult == MM_OK;
    auto item = [&](int kind) { return ok ? ItemText(r.meta.aItems[kind]) : std::string(); };
    const std::string track = item(META_TRACKNUMBER);
    const std::string year = item(META_YEAR);
    t["title"] = TextOrNull(item(META_TITLE));
    t["artist"] = TextOrNull(item(META_ARTIST));
    t["album"] = TextOrNull(item(META_ALBUM));
    t["album_artist"] = ok ? TextOrNull(ItemText(r.meta.stAlbumArtist)) : nullptr;
    t["genre"] = TextOrNull(item(META_GENRE));
    t["date"] = TextOrNull(item(META_DATE));
    t["year"] = year.size() >= 4 ? NumberPart(year.substr(0, 4), false) : Json(nullptr);
    t["track"] = NumberPart(track, false);
    t["track_total"] = NumberPart(track, true);
    t["disc"] = nullptr;
    t["comment"] = TextOrNull(item(META_COMMENT));
    t["composer"] = TextOrNull(item(META_COMPOSER));
    return t;
}

// A MIME type as stated, or from an ID3v2.2 image format ("PNG", "JPG").
Json PictureMime(const std::string& stated) {
    if (stated.empty()) return nullptr;
    if (stated.find('/') != std::string::npos) return stated;
    std::string lower;
    for (char c : stated) lower.push_back(static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c));
    return "image/" + (lower == "jpg" ? std::string("jpeg") : lower);
}

Json PicturesJson(const Report& r) {
    Json pictures = Json::array();
    if (r.metaResult != MM_OK || r.meta.pPicture == nullptr) return pictures;
    Json p;
    p["mime"] = PictureMime(ItemText(r.meta.aItems[META_PICTURE_FORMAT]));
    p["type"] = nullptr;
    p["description"] = nullptr;
    p["size"] = r.meta.nPictureSize;
    pictures.push_back(p);
    return pictures;
}

Json MakerJson(const Report& r) {
    if (r.makerResult != MM_OK) return nullptr;
    Json m;
    m["phone_model"] = TextOrNull(Clean(r.phoneModel));
    m["smart_album"] = TextOrNull(Clean(r.smartAlbum));
    m["thumbnail_size"] = CountOrNull(r.thumbnailSize);
    return m;
}

std::string Code(int32_t result) { return ResultText(result); }

// The C interface's answers as they came: result codes, raw codes and
// numbers, zeros included.
Json ExactJson(const Report& r) {
    Json e;
    e["probe_result"] = Code(r.detectResult);
    if (r.detectResult != MM_OK) return e;
    e["media_type"] = r.type;
    e["extension_check"] = Code(r.checkResult);
    e["tracks"] = {{"result", Code(r.trackResult)}};
    if (r.trackResult == MM_OK) {
        e["tracks"]["audio"] = (r.mask & TRACK_AUDIO) != 0;
        e["tracks"]["video"] = (r.mask & TRACK_VIDEO) != 0;
    }
    Json codec = {{"result", Code(r.codecResult)}};
    if (r.codecResult == MM_OK) {
        const std::pair<const char*, uint32_t> fields[] = {
            {"audio_codec", r.codec.nAudioCodec},     {"audio_profile", r.codec.nAudioProfile},
            {"audio_subtype", r.codec.nAudioSubType}, {"video_codec", r.codec.nVideoCodec},
            {"video_profile", r.codec.nVideoProfile}, {"video_level", r.codec.nVideoLevel},
        };
        for (const auto& f : fields) codec[f.first] = f.second;
    }
    e["codec"] = codec;
    e["mime"] = {{"result", Code(r.mimeResult)}, {"mime_type", r.mime}, {"video_mime_type", r.videoMime}};
    Json clip = {{"result", Code(r.clipResult)}};
    if (r.clipResult == MM_OK) {
        const _MMClipInfo& c = r.clip;
        clip["format"] = std::string(c.szFormat, strnlen(c.szFormat, sizeof c.szFormat));
        const std::pair<const char*, uint32_t> fields[] = {
            {"size", c.nFileSize},
            {"duration_ms", c.nDuration},
            {"bit_rate", c.nBitrate},
            {"has_audio", c.bHasAudio},
            {"has_video", c.bHasVideo},
            {"audio_bit_rate", c.nAudioBitrate},
            {"sample_rate", c.nSampleRate},
            {"channels", c.nChannels},
            {"bits_per_sample", c.nBitsPerSample},
            {"samples_per_frame", c.nSamplesPerFrame},
            {"video_bit_rate", c.nVideoBitrate},
            {"width", c.nWidth},
            {"height", c.nHeight},
            {"frame_rate", c.nFrameRate},
            {"creation_time", c.nReserved1},
        };
        for (const auto& f : fields) clip[f.first] = f.second;
    }
    e["clip"] = clip;
    Json meta = {{"result", Code(r.metaResult)}};
    if (r.metaResult == MM_OK) {
        Json items = Json::object();
        for (int k = 0; k < MM_META_ITEMS; ++k) {
            const _MMMetaItem& item = r.meta.aItems[k];
            if (item.nLength != 0)
                items[MetaItemName(k)] = {{"encoding", item.nEncoding}, {"text", DecodeItemText(item)}};
        }
        meta["items"] = items;
        meta["rating"] = r.meta.nRating;
        meta["play_count"] = r.meta.nPlayCount;
        meta["picture_size"] = r.meta.nPictureSize;
    }
    e["meta"] = meta;
    return e;
}

}  // namespace

Json ReportJson(const Report& r) {
    Json j;
    bool exactName = true;
    j["path"] = Utf8(r.path, &exactName);
    // A name that is not UTF-8 is given losslessly too, as hexadecimal bytes.
    j["path_bytes"] = exactName ? Json(nullptr) : Json(Hex(r.path));
    const bool probed = r.probed;
    j["size"] = r.size != 0 || r.problem == "empty" ? Json(r.size) : Json(nullptr);
    j["format"] = probed ? NameOrNull(MediaTypeName(r.type)) : nullptr;
    j["mime"] = probed ? TextOrNull(r.mime) : nullptr;
    const bool clip = probed && r.clipResult == MM_OK;
    j["duration"] = clip && r.clip.nDuration != 0 ? Json(r.clip.nDuration / 1000.0) : Json(nullptr);
    j["bit_rate"] = clip ? CountOrNull(r.clip.nBitrate) : nullptr;
    j["creation_time"] = clip && r.type == MEDIA_TYPE_MP4 && r.clip.nReserved1 != 0
                             ? Iso8601(static_cast<int64_t>(r.clip.nReserved1) - kMp4EpochOffset)
                             : Json(nullptr);
    j["audio"] = probed ? AudioJson(r) : nullptr;
    j["video"] = probed ? VideoJson(r) : nullptr;
    j["tags"] = probed ? TagsJson(r) : nullptr;
    j["pictures"] = probed ? PicturesJson(r) : Json::array();
    j["maker"] = probed ? MakerJson(r) : nullptr;
    j["error"] = TextOrNull(r.problem);
    j["exact"] = ExactJson(r);
    return j;
}

std::vector<std::string> CsvColumns() {
    return {"path",
            "path_bytes",
            "size",
            "format",
            "mime",
            "duration",
            "bit_rate",
            "creation_time",
            "audio.codec",
            "audio.profile",
            "audio.sample_rate",
            "audio.channels",
            "audio.bits_per_sample",
            "audio.bit_rate",
            "video.codec",
            "video.profile",
            "video.level",
            "video.width",
            "video.height",
            "video.frame_rate",
            "video.bit_rate",
            "tags.title",
            "tags.artist",
            "tags.album",
            "tags.album_artist",
            "tags.genre",
            "tags.date",
            "tags.year",
            "tags.track",
            "tags.track_total",
            "tags.disc",
            "tags.comment",
            "tags.composer",
            "pictures",
            "error"};
}

std::vector<std::string> CsvRow(const Json& report) {
    std::vector<std::string> row;
    for (const std::string& column : CsvColumns()) {
        const Json* v = &report;
        size_t at = 0;
        while (v != nullptr && at <= column.size()) {
            const size_t dot = column.find('.', at);
            const std::string key = column.substr(at, dot == std::string::npos ? std::string::npos : dot - at);
            v = v->is_object() && v->contains(key) ? &(*v)[key] : nullptr;
            if (dot == std::string::npos) break;
            at = dot + 1;
        }
        if (v == nullptr || v->is_null()) {
            row.emplace_back();
        } else if (column == "pictures") {
            row.push_back(std::to_string(v->size()));
        } else if (v->is_string()) {
            row.push_back(v->get<std::string>());
        } else {
            row.push_back(v->dump());
        }
    }
    return row;
}

std::string CsvField(const std::string& s) {
    if (s.find_first_of(",\"\r\n") == std::string::npos) return s;
    std::string out = "\"";
    for (char c : s) {
        if (c == '"') out += '"';
        out += c;
    }
    return out + "\"";
}

}  // namespace probe
