// The layout of a library database and its upgrades from older layouts.
//
//   files(id, path BLOB unique: the name's bytes, path_text: UTF-8 with
//         invalid bytes replaced, size, mtime_ns, inode, device, format, mime,
//         duration_ms, duration_exact, bit_rate, streams: JSON array,
//         creation_time, maker: JSON, exact: JSON (the C interface's answers),
//         error, scanned_at: Unix seconds)
//   tags(file_id, key, value, other: 0 for the named fields (title, artist,
//        ..., track_total), 1 for the file's own keys)
//   pictures(file_id, idx, mime, type, description, size, data: NULL unless
//            scanned with --pictures)
//   schema_version(version)
#pragma once

#include "sqlite_db.h"

namespace scan {

constexpr int kSchemaVersion = 1;

// Creates the tables of an empty database or upgrades an older one, in one
// transaction; throws when the database comes from a newer program.
void Migrate(Db* db);

// The layout's version: 0 for the first layout (files and tags without a
// version table), -1 for an empty database.
int SchemaVersion(Db* db);

}  // namespace scan
