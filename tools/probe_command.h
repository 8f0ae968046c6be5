// metainfo probe: every query the file's type supports, as text, JSON Lines
// or CSV.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "metainfo/probe.h"

namespace probe {

// The C interface's answers for one file, as they came.
struct Report {
    std::string path;
    std::string problem;  // why the file failed; empty when it did not
    bool probed = false;  // its type was recognised and every query asked
    uint64_t size = 0;
    int32_t detectResult = MM_E_FAIL;
    int type = MEDIA_TYPE_UNKNOWN;
    int32_t checkResult = 0;
    int32_t trackResult = 0;
    int mask = 0;
    int32_t codecResult = 0;
    _MM_CODECTYPE codec{};
    int32_t mimeResult = 0;
    std::string mime;
    std::string videoMime;
    int32_t clipResult = 0;
    _MMClipInfo clip{};
    int32_t metaResult = 0;
    _MMMetaInfo meta{};
    int32_t makerResult = MM_E_UNSUPPORTED;
    std::string phoneModel;
    std::string smartAlbum;
    uint32_t thumbnailSize = 0;
    mi_info* info = nullptr;  // the accurate answers
    int infoResult = MI_E_NOT_MEDIA;

    Report() = default;
    Report(const Report&) = delete;
    Report& operator=(const Report&) = delete;
    ~Report();
};

// Probes one path; report->problem says why when it could not be probed.
void Probe(const std::string& path, Report* report);

enum class Output { kText, kJson, kCsv };

// Prints each file as it is probed (a CSV header first).
class ProbePrinter {
public:
    explicit ProbePrinter(Output output);
    // Probes and prints one file; false when it could not be probed (its
    // reason on stderr).
    bool Print(const std::string& path);

private:
    Output output_;
};

// Human-readable text of a report.
void PrintText(const Report& r);

}  // namespace probe
