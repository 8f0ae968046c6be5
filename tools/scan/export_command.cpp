#include "export_command.h"

#include <cstdio>

#include "schema.h"
#include "store.h"

namespace scan {
namespace {

void PrintCsv(const std::vector<std::string>& fields) {
    std::string line;
    for (size_t i = 0; i < fields.size(); ++i) line += (i == 0 ? "" : ",") + probe::CsvField(fields[i]);
    std::printf("%s\r\n", line.c_str());
}

}  // namespace

int ExportCommand(const std::string& path, bool json) {
    try {
        Db db(path, false);
        if (SchemaVersion(&db) != kSchemaVersion) {
            std::fprintf(stderr, "metainfo: DB: %s: not a database of this version (scan it first)\n", path.c_str());
            return 1;
        }
        db.Exec("BEGIN");  // one snapshot, while a scan may be writing
        Reader reader(&db);
        if (!json) PrintCsv(probe::CsvColumns());
        probe::Json row;
        while (reader.Next(&row)) {
            if (json) {
                std::printf("%s\n", row.dump(-1, ' ', false, probe::Json::error_handler_t::replace).c_str());
                continue;
            }
            PrintCsv(probe::CsvRow(row));
        }
        db.Exec("COMMIT");
        return 0;
    } catch (const DbError& e) {
        std::fprintf(stderr, "metainfo: DB: %s\n", e.what());
        return 1;
    }
}

}  // namespace scan
