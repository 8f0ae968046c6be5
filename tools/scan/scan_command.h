// metainfo scan: probes every file under folders into a SQLite database,
// again only what changed since the last scan.
#pragma once

#include <string>
#include <vector>

namespace scan {

struct ScanOptions {
    std::vector<std::string> roots;
    std::string db;
    unsigned jobs = 0;  // 0: one a core
    bool full = false;
    bool follow = false;
    bool pictures = false;
    bool json = false;
    bool crossFilesystems = false;
    double waitSeconds = 10;  // for another scan of the same database
};

// 0 when every folder was read, 1 otherwise or when the database failed.
int ScanCommand(const ScanOptions& options);

}  // namespace scan
