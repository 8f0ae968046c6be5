#include "store.h"

#include <cstdlib>
#include <deque>
#include <iterator>
#include <utility>

namespace scan {
namespace {

// Columns in the order of the insert and of Reader's select (from size on).
#define SCAN_FILE_COLUMNS                                                                                      \
    "path_text, size, mtime_ns, inode, device, format, mime, duration_ms, duration_exact, bit_rate, streams, " \
    "creation_time, maker, exact, error, scanned_at"

const char* const kNamed[] = {"title", "artist", "album", "album_artist", "genre", "date", "comment", "composer"};
const char* const kNumbers[] = {"year", "track", "track_total", "disc", "disc_total"};

// A JSON value as a column: NULL for null, compact text otherwise.
void BindJson(Statement* s, int at, const probe::Json& v) {
    if (v.is_null()) {
        s->BindNull(at);
    } else {
        s->Bind(at, v.dump(-1, ' ', false, probe::Json::error_handler_t::replace));
    }
}

void BindText(Statement* s, int at, const char* text) {
    if (text != nullptr) {
        s->Bind(at, std::string(text));
    } else {
        s->BindNull(at);
    }
}

probe::Json StreamsJson(const mi_info& info) {
    probe::Json out = probe::Json::array();
    for (size_t i = 0; i < info.stream_count; ++i) {
        const mi_stream& s = info.streams[i];
        out.push_back({{"kind", s.kind == MI_STREAM_VIDEO ? "video" : "audio"},
                       {"codec", s.codec != nullptr ? probe::Json(s.codec) : probe::Json(nullptr)},
                       {"profile", s.profile != nullptr ? probe::Json(s.profile) : probe::Json(nullptr)},
                       {"level", s.level},
                       {"sample_rate", s.sample_rate},
                       {"channels", s.channels},
                       {"bits_per_sample", s.bits_per_sample},
                       {"width", s.width},
                       {"height", s.height},
                       {"frame_rate_num", s.frame_rate_num},
                       {"frame_rate_den", s.frame_rate_den},
                       {"bit_rate", s.bit_rate}});
    }
    return out;
}

// An mi_info rebuilt from rows, owning its texts, for ReportJson.
struct Rebuilt {
    mi_info info{};
    std::deque<std::string> texts;
    std::vector<mi_stream> streams;
    std::vector<mi_tag> tags;
    std::vector<mi_picture> pictures;

    const char* Keep(std::string s) {
        texts.push_back(std::move(s));
        return texts.back().c_str();
    }
    const char* Keep(const probe::Json& v) { return v.is_string() ? Keep(v.get<std::string>()) : nullptr; }
};

template <typename T>
T Number(const probe::Json& v) {
    return v.is_number() ? v.get<T>() : T{};
}

void RebuildStreams(const std::string& text, Rebuilt* r) {
    const probe::Json streams = probe::Json::parse(text, nullptr, false);
    if (!streams.is_array()) return;
    for (const probe::Json& j : streams) {
        mi_stream s{};
        s.kind = j.value("kind", "") == "video" ? MI_STREAM_VIDEO : MI_STREAM_AUDIO;
        s.codec = r->Keep(j["codec"]);
        s.profile = r->Keep(j["profile"]);
        s.level = Number<int32_t>(j["level"]);
        s.sample_rate = Number<uint32_t>(j["sample_rate"]);
        s.channels = Number<uint32_t>(j["channels"]);
        s.bits_per_sample = Number<uint32_t>(j["bits_per_sample"]);
        s.width = Number<uint32_t>(j["width"]);
        s.height = Number<uint32_t>(j["height"]);
        s.frame_rate_num = Number<uint32_t>(j["frame_rate_num"]);
        s.frame_rate_den = Number<uint32_t>(j["frame_rate_den"]);
        s.bit_rate = Number<uint64_t>(j["bit_rate"]);
        r->streams.push_back(s);
    }
}

uint32_t Count(const std::string& v) { return static_cast<uint32_t>(std::strtoul(v.c_str(), nullptr, 10)); }

void RebuildNamed(const std::string& key, const std::string& value, Rebuilt* r) {
    const char** texts[] = {&r->info.title, &r->info.artist, &r->info.album,   &r->info.album_artist,
                            &r->info.genre, &r->info.date,   &r->info.comment, &r->info.composer};
    for (size_t i = 0; i < std::size(kNamed); ++i) {
        if (key == kNamed[i]) *texts[i] = r->Keep(value);
    }
    uint32_t* counts[] = {&r->info.track, &r->info.track_total, &r->info.disc, &r->info.disc_total};
    for (size_t i = 1; i < std::size(kNumbers); ++i) {
        if (key == kNumbers[i]) *counts[i - 1] = Count(value);
    }
    if (key == "year") r->info.year = static_cast<int32_t>(std::strtol(value.c_str(), nullptr, 10));
}

}  // namespace

void ProbeFile(Probed* p, bool pictures) {
    p->report = std::make_unique<probe::Report>();
    probe::Probe(p->file.path, p->report.get());
    p->json = probe::ReportJson(*p->report);
    const mi_info* info = p->report->info;
    if (!pictures || info == nullptr) return;
    for (size_t i = 0; i < info->picture_count; ++i) {
        std::string bytes(static_cast<size_t>(info->pictures[i].size), '\0');
        size_t size = 0;
        if (mi_picture_copy(p->file.path.c_str(), info, i, bytes.data(), bytes.size(), &size) != MI_OK) bytes.clear();
        p->pictureData.push_back(std::move(bytes));
    }
}

Store::Store(Db* db)
    : db_(db),
      insert_(db->Handle(), "INSERT INTO files(path, " SCAN_FILE_COLUMNS
                            ") VALUES(?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, ?11, ?12, ?13, ?14, ?15, ?16, ?17)"),
      update_(db->Handle(),
              "UPDATE files SET path = ?1, path_text = ?2, size = ?3, mtime_ns = ?4, inode = ?5, device = ?6, "
              "format = ?7, mime = ?8, duration_ms = ?9, duration_exact = ?10, bit_rate = ?11, streams = ?12, "
              "creation_time = ?13, maker = ?14, exact = ?15, error = ?16, scanned_at = ?17 WHERE id = ?18"),
      insertTag_(db->Handle(), "INSERT INTO tags(file_id, key, value, other) VALUES(?, ?, ?, ?)"),
      insertPicture_(
          db->Handle(),
          "INSERT INTO pictures(file_id, idx, mime, type, description, size, data) VALUES(?, ?, ?, ?, ?, ?, ?)"),
      deleteTags_(db->Handle(), "DELETE FROM tags WHERE file_id = ?"),
      deletePictures_(db->Handle(), "DELETE FROM pictures WHERE file_id = ?"),
      deleteFile_(db->Handle(), "DELETE FROM files WHERE id = ?"),
      move_(db->Handle(), "UPDATE files SET path = ?, path_text = ? WHERE id = ?") {}

void Store::Write(const Probed& p, int64_t now) {
    Statement* s = p.id != 0 ? &update_ : &insert_;
    const mi_info* info = p.report->info;
    const probe::Json& j = p.json;
    s->BindBlob(1, p.file.path).Bind(2, j["path"].get<std::string>());
    s->Bind(3, p.file.size).Bind(4, p.file.mtimeNs).Bind(5, p.file.inode).Bind(6, p.file.device);
    if (info != nullptr) {
        BindText(s, 7, info->format);
        BindText(s, 8, info->mime);
        if (info->duration_ms >= 0) s->Bind(9, static_cast<int64_t>(info->duration_ms));
        s->Bind(10, static_cast<int64_t>(info->duration_exact != 0));
        s->Bind(11, static_cast<int64_t>(info->bit_rate));
        BindJson(s, 12, StreamsJson(*info));
    }
    if (j["creation_time"].is_string()) s->Bind(13, j["creation_time"].get<std::string>());
    BindJson(s, 14, j["maker"]);
    BindJson(s, 15, j["exact"]);
    if (!p.report->problem.empty()) s->Bind(16, p.report->problem);
    s->Bind(17, now);
    if (p.id != 0) s->Bind(18, p.id);
    s->Run();
    const int64_t id = p.id != 0 ? p.id : db_->LastId();
    if (p.id != 0) {
        deleteTags_.Bind(1, id).Run();
        deletePictures_.Bind(1, id).Run();
    }
    if (info == nullptr) return;
    WriteTags(id, *info);
    for (size_t i = 0; i < info->picture_count; ++i) {
        const mi_picture& pic = info->pictures[i];
        insertPicture_.Bind(1, id).Bind(2, static_cast<int64_t>(i));
        BindText(&insertPicture_, 3, pic.mime);
        if (pic.type >= 0) insertPicture_.Bind(4, static_cast<int64_t>(pic.type));
        BindText(&insertPicture_, 5, pic.description);
        insertPicture_.Bind(6, static_cast<int64_t>(pic.size));
        if (i < p.pictureData.size()) insertPicture_.BindBlob(7, p.pictureData[i]);
        insertPicture_.Run();
    }
}

void Store::WriteTags(int64_t id, const mi_info& info) {
    const auto add = [&](const char* key, const std::string& value, int64_t other) {
        insertTag_.Bind(1, id).Bind(2, std::string(key)).Bind(3, value).Bind(4, other).Run();
    };
    const char* const texts[] = {info.title, info.artist, info.album,   info.album_artist,
                                 info.genre, info.date,   info.comment, info.composer};
    for (size_t i = 0; i < std::size(kNamed); ++i) {
        if (texts[i] != nullptr) add(kNamed[i], texts[i], 0);
    }
    const int64_t numbers[] = {info.year, info.track, info.track_total, info.disc, info.disc_total};
    for (size_t i = 0; i < std::size(kNumbers); ++i) {
        if (numbers[i] != 0) add(kNumbers[i], std::to_string(numbers[i]), 0);
    }
    for (size_t i = 0; i < info.tag_count; ++i) add(info.tags[i].key, info.tags[i].value, 1);
}

void Store::Move(int64_t id, const std::string& path) {
    probe::Report r;
    r.path = path;
    move_.BindBlob(1, path).Bind(2, probe::ReportJson(r)["path"].get<std::string>()).Bind(3, id).Run();
}

void Store::Remove(int64_t id) {
    deleteTags_.Bind(1, id).Run();
    deletePictures_.Bind(1, id).Run();
    deleteFile_.Bind(1, id).Run();
}

Reader::Reader(Db* db)
    : files_(db->Handle(), "SELECT id, path, " SCAN_FILE_COLUMNS " FROM files ORDER BY path"),
      tags_(db->Handle(), "SELECT key, value, other FROM tags WHERE file_id = ? ORDER BY rowid"),
      pictures_(db->Handle(), "SELECT mime, type, description, size FROM pictures WHERE file_id = ? ORDER BY idx") {}

bool Reader::Next(probe::Json* out) {
    if (!files_.Step()) return false;
    // columns: 0 id, 1 path, 2 path_text, 3 size, 4 mtime_ns, 5 inode, 6 device, 7 format, 8 mime,
    // 9 duration_ms, 10 duration_exact, 11 bit_rate, 12 streams, 13 creation_time, 14 maker, 15 exact, 16 error
    const int64_t id = files_.Int(0);
    Rebuilt b;
    probe::Report r;
    r.path = files_.Text(1);
    r.size = static_cast<uint64_t>(files_.Int(3));
    r.problem = files_.Text(16);
    if (!files_.IsNull(12)) {
        b.info.format = files_.IsNull(7) ? nullptr : b.Keep(files_.Text(7));
        b.info.mime = files_.IsNull(8) ? nullptr : b.Keep(files_.Text(8));
        b.info.duration_ms = files_.IsNull(9) ? -1 : files_.Int(9);
        b.info.duration_exact = static_cast<int>(files_.Int(10));
        b.info.bit_rate = static_cast<uint64_t>(files_.Int(11));
        RebuildStreams(files_.Text(12), &b);
        tags_.Bind(1, id);
        while (tags_.Step()) {
            if (tags_.Int(2) == 0) {
                RebuildNamed(tags_.Text(0), tags_.Text(1), &b);
            } else {
                b.tags.push_back({b.Keep(tags_.Text(0)), b.Keep(tags_.Text(1))});
            }
        }
        tags_.Reset();
        pictures_.Bind(1, id);
        while (pictures_.Step()) {
            mi_picture p{};
            p.mime = pictures_.IsNull(0) ? nullptr : b.Keep(pictures_.Text(0));
            p.type = pictures_.IsNull(1) ? -1 : static_cast<int32_t>(pictures_.Int(1));
            p.description = pictures_.IsNull(2) ? nullptr : b.Keep(pictures_.Text(2));
            p.size = static_cast<uint64_t>(pictures_.Int(3));
            b.pictures.push_back(p);
        }
        pictures_.Reset();
        b.info.streams = b.streams.data();
        b.info.stream_count = b.streams.size();
        b.info.tags = b.tags.data();
        b.info.tag_count = b.tags.size();
        b.info.pictures = b.pictures.data();
        b.info.picture_count = b.pictures.size();
        r.info = &b.info;
    }
    {
        // b's info, not the library's: r must not free it.
        struct Detach {
            probe::Report* report;
            ~Detach() { report->info = nullptr; }
        } detach{&r};
        *out = probe::ReportJson(r);
    }
    // The C interface's answers were kept as they came.
    (*out)["creation_time"] = files_.IsNull(13) ? probe::Json(nullptr) : probe::Json(files_.Text(13));
    (*out)["maker"] = files_.IsNull(14) ? probe::Json(nullptr) : probe::Json::parse(files_.Text(14), nullptr, false);
    (*out)["exact"] = files_.IsNull(15) ? probe::Json(nullptr) : probe::Json::parse(files_.Text(15), nullptr, false);
    return true;
}

}  // namespace scan
