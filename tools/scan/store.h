// A probed file as rows of the library database, and those rows read back
// as the probe command's JSON object.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "../probe_json.h"
#include "sqlite_db.h"
#include "walk.h"

namespace scan {

// One file's probe, made on a worker thread.
struct Probed {
    FileStat file;
    int64_t id = 0;  // its row, 0 for a new file
    bool moved = false;  // the row was found under another name
    std::unique_ptr<probe::Report> report;
    probe::Json json;  // the report as probe --json writes it
    std::vector<std::string> pictureData;  // the pictures' bytes, with --pictures
};

// Probes a file (and reads its pictures' bytes when asked).
void ProbeFile(Probed* p, bool pictures);

class Store {
public:
    explicit Store(Db* db);
    void Write(const Probed& p, int64_t now);
    // A file found under a new name: only its path changes.
    void Move(int64_t id, const std::string& path);
    void Remove(int64_t id);

private:
    void WriteTags(int64_t id, const mi_info& info);
    Db* db_;
    Statement insert_, update_, insertTag_, insertPicture_, deleteTags_, deletePictures_, deleteFile_, move_;
};

// Reads every file of a database, in path order, as probe --json does.
class Reader {
public:
    explicit Reader(Db* db);
    bool Next(probe::Json* out);

private:
    Statement files_, tags_, pictures_;
};

}  // namespace scan
