#include "schema.h"

#include <string>

#include "../probe_json.h"

namespace scan {
namespace {

const char* const kCreate = R"(
CREATE TABLE files(
  id INTEGER PRIMARY KEY,
  path BLOB NOT NULL UNIQUE,
  path_text TEXT,
  size INTEGER,
  mtime_ns INTEGER,
  inode INTEGER,
  device INTEGER,
  format TEXT,
  mime TEXT,
  duration_ms INTEGER,
  duration_exact INTEGER,
  bit_rate INTEGER,
  streams TEXT,
  creation_time TEXT,
  maker TEXT,
  exact TEXT,
  error TEXT,
  scanned_at INTEGER);
CREATE TABLE tags(file_id INTEGER NOT NULL, key TEXT NOT NULL, value TEXT, other INTEGER NOT NULL DEFAULT 1);
)";

// What version 1 adds to every layout: pictures, the indexes, the version.
const char* const kVersion1 = R"(
CREATE TABLE IF NOT EXISTS pictures(file_id INTEGER NOT NULL, idx INTEGER NOT NULL, mime TEXT, type INTEGER,
  description TEXT, size INTEGER, data BLOB, PRIMARY KEY(file_id, idx));
CREATE INDEX IF NOT EXISTS files_inode ON files(device, inode);
CREATE INDEX IF NOT EXISTS tags_file ON tags(file_id);
CREATE INDEX IF NOT EXISTS tags_key ON tags(key, value);
CREATE TABLE IF NOT EXISTS schema_version(version INTEGER NOT NULL);
DELETE FROM schema_version;
INSERT INTO schema_version VALUES(1);
)";

bool HasTable(Db* db, const char* name) {
    Statement s(db->Handle(), "SELECT 1 FROM sqlite_master WHERE type='table' AND name=?");
    s.Bind(1, std::string(name));
    return s.Step();
}

// The name as UTF-8, invalid bytes replaced, as the probe output writes it.
std::string PathText(const std::string& path) {
    probe::Report r;
    r.path = path;
    return probe::ReportJson(r)["path"].get<std::string>();
}

// Version 0 kept neither the path as text, the C interface's answers nor
// which tags were named fields: those columns are added, the text filled
// in, and every file probed again by the next scan (its mtime forgotten).
void From0To1(Db* db) {
    db->Exec(R"(
ALTER TABLE files ADD COLUMN path_text TEXT;
ALTER TABLE files ADD COLUMN creation_time TEXT;
ALTER TABLE files ADD COLUMN maker TEXT;
ALTER TABLE files ADD COLUMN exact TEXT;
ALTER TABLE tags ADD COLUMN other INTEGER NOT NULL DEFAULT 1;
UPDATE files SET mtime_ns = NULL;
UPDATE tags SET other = 0 WHERE key IN ('title', 'artist', 'album', 'album_artist', 'genre', 'date', 'year',
  'track', 'track_total', 'disc', 'disc_total', 'comment', 'composer');
)");
    Statement read(db->Handle(), "SELECT id, path FROM files");
    Statement write(db->Handle(), "UPDATE files SET path_text = ? WHERE id = ?");
    while (read.Step()) write.Bind(1, PathText(read.Text(1))).Bind(2, read.Int(0)).Run();
}

}  // namespace

int SchemaVersion(Db* db) {
    if (HasTable(db, "schema_version")) {
        Statement s(db->Handle(), "SELECT max(version) FROM schema_version");
        return s.Step() ? static_cast<int>(s.Int(0)) : 0;
    }
    return HasTable(db, "files") ? 0 : -1;
}

void Migrate(Db* db) {
    db->Exec("BEGIN IMMEDIATE");
    try {
        const int version = SchemaVersion(db);
        if (version > kSchemaVersion)
            throw DbError("made by a newer metainfo (layout version " + std::to_string(version) + ")");
        if (version < 0) db->Exec(kCreate);
        if (version == 0) From0To1(db);
        if (version < kSchemaVersion) db->Exec(kVersion1);
        db->Exec("COMMIT");
    } catch (...) {
        sqlite3_exec(db->Handle(), "ROLLBACK", nullptr, nullptr, nullptr);
        throw;
    }
}

}  // namespace scan
