#include "probe_json.h"

#include <cstdio>
#include <ctime>

#include "core/text.h"
#include "probe/codec_names.h"
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

Json Iso8601(int64_t unixSeconds) {
    const std::time_t t = static_cast<std::time_t>(unixSeconds);
    std::tm tm{};
    if (gmtime_r(&t, &tm) == nullptr) return nullptr;
    char text[32];
    std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &tm);
    return text;
}

const mi_stream* FirstStream(const mi_info& info, int kind) {
    for (size_t i = 0; i < info.stream_count; ++i) {
        if (info.streams[i].kind == kind) return &info.streams[i];
    }
    return nullptr;
}

Json Rate(uint32_t num, uint32_t den) {
    if (num == 0 || den == 0) return nullptr;
    return den == 1 ? Json(num) : Json(static_cast<double>(num) / den);
}

Json AudioJson(const mi_info& info) {
    const mi_stream* s = FirstStream(info, MI_STREAM_AUDIO);
    if (s == nullptr) return nullptr;
    Json a;
    a["codec"] = NameOrNull(s->codec);
    a["profile"] = NameOrNull(s->profile);
    a["sample_rate"] = CountOrNull(s->sample_rate);
    a["channels"] = CountOrNull(s->channels);
    a["bits_per_sample"] = CountOrNull(s->bits_per_sample);
    a["bit_rate"] = CountOrNull(s->bit_rate);
    return a;
}

Json VideoJson(const mi_info& info) {
    const mi_stream* s = FirstStream(info, MI_STREAM_VIDEO);
    if (s == nullptr) return nullptr;
    Json v;
    v["codec"] = NameOrNull(s->codec);
    v["profile"] = NameOrNull(s->profile);
    v["level"] = s->level >= 0 ? Json(s->level) : Json(nullptr);
    v["width"] = CountOrNull(s->width);
    v["height"] = CountOrNull(s->height);
    v["frame_rate"] = Rate(s->frame_rate_num, s->frame_rate_den);
    v["bit_rate"] = CountOrNull(s->bit_rate);
    return v;
}

Json TagsJson(const mi_info& info) {
    Json t;
    t["title"] = NameOrNull(info.title);
    t["artist"] = NameOrNull(info.artist);
    t["album"] = NameOrNull(info.album);
    t["album_artist"] = NameOrNull(info.album_artist);
    t["genre"] = NameOrNull(info.genre);
    t["date"] = NameOrNull(info.date);
    t["year"] = info.year != 0 ? Json(info.year) : Json(nullptr);
    t["track"] = CountOrNull(info.track);
    t["track_total"] = CountOrNull(info.track_total);
    t["disc"] = CountOrNull(info.disc);
    t["disc_total"] = CountOrNull(info.disc_total);
    t["comment"] = NameOrNull(info.comment);
    t["composer"] = NameOrNull(info.composer);
    Json other = Json::object();
    for (size_t i = 0; i < info.tag_count; ++i) other[info.tags[i].key] = info.tags[i].value;
    t["other"] = other;
    return t;
}

Json PicturesJson(const mi_info& info) {
    Json pictures = Json::array();
    for (size_t i = 0; i < info.picture_count; ++i) {
        const mi_picture& p = info.pictures[i];
        Json j;
        j["mime"] = NameOrNull(p.mime);
        j["type"] = p.type >= 0 ? Json(p.type) : Json(nullptr);
        j["description"] = NameOrNull(p.description);
        j["size"] = p.size;
        pictures.push_back(j);
    }
    return pictures;
}

Json MakerJson(const Report& r) {
    if (r.makerResult != MM_OK) return nullptr;
    Json m;
    m["phone_model"] = TextOrNull(metainfo::TrimText(r.phoneModel));
    m["smart_album"] = TextOrNull(metainfo::TrimText(r.smartAlbum));
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
    const mi_info* info = r.info;
    j["size"] = r.size != 0 || r.problem == "empty" ? Json(r.size) : Json(nullptr);
    j["format"] = info != nullptr ? NameOrNull(info->format) : nullptr;
    j["mime"] = info != nullptr ? NameOrNull(info->mime) : nullptr;
    j["duration"] = info != nullptr && info->duration_ms > 0 ? Json(static_cast<double>(info->duration_ms) / 1000.0)
                                                             : Json(nullptr);
    j["duration_exact"] = info != nullptr && info->duration_ms > 0 ? Json(info->duration_exact != 0) : Json(nullptr);
    j["bit_rate"] = info != nullptr ? CountOrNull(info->bit_rate) : nullptr;
    const bool clip = probed && r.clipResult == MM_OK;
    j["creation_time"] = clip && r.type == MEDIA_TYPE_MP4 && r.clip.nReserved1 != 0
                             ? Iso8601(static_cast<int64_t>(r.clip.nReserved1) - kMp4EpochOffset)
                             : Json(nullptr);
    j["audio"] = info != nullptr ? AudioJson(*info) : nullptr;
    j["video"] = info != nullptr ? VideoJson(*info) : nullptr;
    j["tags"] = info != nullptr ? TagsJson(*info) : nullptr;
    j["pictures"] = info != nullptr ? PicturesJson(*info) : Json::array();
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
            "duration_exact",
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
            "tags.disc_total",
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
