// metainfo export: a library database written out with the probe command's
// keys, as JSON Lines or as the CSV of probe --csv.
#pragma once

#include <string>

namespace scan {

// 0, or 1 when the database cannot be read.
int ExportCommand(const std::string& db, bool json);

}  // namespace scan
