// metainfo: what the library reports for media files. `metainfo --help` and
// `metainfo COMMAND --help` say how to use it; exit status 0 when every file
// was handled, 1 when one was not, 2 for a usage error.
#include <CLI/CLI.hpp>

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <iostream>
#include <string>
#include <vector>

#include "cover_command.h"
#include "cut_command.h"
#include "frames_command.h"
#include "maker_command.h"
#include "metainfo/metainfo.h"
#include "probe_command.h"
#include "scan/export_command.h"
#include "scan/scan_command.h"
#include "time_arg.h"

namespace {

constexpr int kUsageError = 2;

const char* const kExitCodes =
    "Exit status: 0 when every file was handled, 1 when one was not (its reason on standard error), "
    "2 for a usage error.";

// The files under a folder, sorted, symbolic links to folders not followed.
void AddFolder(const std::filesystem::path& folder, std::vector<std::string>* out) {
    std::vector<std::string> found;
    std::error_code ec;
    for (auto it = std::filesystem::recursive_directory_iterator(
             folder, std::filesystem::directory_options::skip_permission_denied, ec);
         !ec && it != std::filesystem::recursive_directory_iterator(); it.increment(ec)) {
        if (it->is_regular_file(ec)) found.push_back(it->path().string());
    }
    if (ec) std::fprintf(stderr, "metainfo: %s: %s\n", folder.string().c_str(), ec.message().c_str());
    std::sort(found.begin(), found.end());
    out->insert(out->end(), found.begin(), found.end());
}

// Probes the names read from standard input (one a line, or NUL-separated)
// as they come; false when one failed.
bool ProbeNamesFromStdin(bool nul, probe::ProbePrinter* printer) {
    bool ok = true;
    std::string name;
    while (std::getline(std::cin, name, nul ? '\0' : '\n')) {
        if (!nul && !name.empty() && name.back() == '\r') name.pop_back();
        if (!name.empty() && !printer->Print(name)) ok = false;
    }
    return ok;
}

// A time argument of the cut in milliseconds, or a usage error; whole seconds
// only for the MM_ cutters (--exact).
int64_t CutTime(const std::string& text, const char* what, bool wholeSeconds) {
    int64_t ms = 0;
    if (!probe::ParseTime(text, &ms)) throw CLI::ValidationError(what, "not a time: " + text + " (seconds, or MM:SS)");
    if (wholeSeconds && ms % 1000 != 0)
        throw CLI::ValidationError(what, text + ": the --exact cut is in whole seconds");
    if (ms / 1000 > 0x7FFFFFFF) throw CLI::ValidationError(what, text + ": too large");
    return ms;
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"metainfo: what a media file holds (type, clip information, tags, codec), without decoding it."};
    app.set_version_flag("--version", std::string("metainfo ") + MM_Version());
    app.footer(kExitCodes);
    app.require_subcommand(1);

    std::vector<std::string> files;
    bool json = false;
    bool csv = false;
    bool recursive = false;
    bool nul = false;
    CLI::App* probeCmd = app.add_subcommand("probe", "Every query the file's type supports, with result codes.");
    probeCmd->add_option("files", files, "files (folders with -r; - reads names from standard input)")->required();
    auto* jsonOpt = probeCmd->add_flag("--json", json, "JSON Lines: one object per file");
    probeCmd->add_flag("--csv", csv, "CSV with a header row (RFC 4180)")->excludes(jsonOpt);
    probeCmd->add_flag("-r,--recursive", recursive, "probe every file under the folders given");
    probeCmd->add_flag("-0,--null", nul, "names read from standard input are NUL-separated");
    probeCmd->footer(kExitCodes);

    std::string cutFile, cutStart, cutEnd, cutOut;
    CLI::App* cutCmd = app.add_subcommand("cut", "Copy a range of MP3, AAC, WAVE or AMR audio to a file.");
    cutCmd->add_option("file", cutFile, "the audio file")->required();
    cutCmd->add_option("start", cutStart, "start: seconds (90) or MM:SS (1:30)")->required();
    cutCmd->add_option("end", cutEnd, "end: seconds or MM:SS")->required();
    cutCmd->add_option("out", cutOut, "the file to write")->required();
    bool cutExact = false;
    cutCmd->add_flag("--exact", cutExact, "cut as the MM_ interface does: whole seconds, its own limits");
    cutCmd->footer(kExitCodes);

    std::string makerFile, thumbnail;
    CLI::App* makerCmd = app.add_subcommand("maker", "The maker box of an MP4 file (phone model, album, thumbnail).");
    makerCmd->add_option("file", makerFile, "the MP4 file")->required();
    makerCmd->add_option("--thumbnail", thumbnail, "write the thumbnail to this file");
    makerCmd->footer(kExitCodes);

    std::string framesFile;
    uint32_t stream = 0;
    uint32_t seekMs = 0;
    CLI::App* framesCmd =
        app.add_subcommand("frames", "The index of an AVI file, and its frames read through the parser.");
    framesCmd->add_option("file", framesFile, "the AVI file")->required();
    framesCmd->add_option("--stream", stream, "stream number")->check(CLI::Range(0, 0xFFFF));
    auto* seekOpt = framesCmd->add_option("--seek", seekMs, "start at this time (milliseconds)");
    framesCmd->footer(kExitCodes);

    std::string coverFile, coverOut;
    int coverIndex = 0;
    bool coverAll = false, coverExact = false;
    CLI::App* coverCmd = app.add_subcommand("cover", "Write the embedded picture of a file.");
    coverCmd->add_option("file", coverFile, "the media file")->required();
    coverCmd->add_option("-o,--output", coverOut, "the file to write (default: FILE.cover.jpg, .png, ...)");
    coverCmd->add_option("--index", coverIndex, "which picture (from 0)")->check(CLI::NonNegativeNumber);
    coverCmd->add_flag("--all", coverAll, "write every picture, numbered");
    coverCmd->add_flag("--exact", coverExact, "the one picture the MM_ interface's tags hold");
    coverCmd->footer(kExitCodes);

    scan::ScanOptions scanOpts;
    CLI::App* scanCmd =
        app.add_subcommand("scan", "Probe every file under folders into a SQLite database, again only what changed.");
    scanCmd->add_option("paths", scanOpts.roots, "folders (or files) to scan")->required();
    scanCmd->add_option("--db", scanOpts.db, "the database file (made when missing)")->required();
    scanCmd->add_option("-j,--jobs", scanOpts.jobs, "threads probing files (default: one a core)")
        ->check(CLI::Range(1, 256));
    scanCmd->add_flag("--full", scanOpts.full, "probe every file again, changed or not");
    scanCmd->add_flag("--follow", scanOpts.follow, "follow symbolic links (to folders too)");
    scanCmd->add_flag("--pictures", scanOpts.pictures, "keep the embedded pictures' bytes");
    scanCmd->add_flag("--json", scanOpts.json, "write each file probed as JSON Lines (the keys of probe --json)");
    scanCmd->add_flag("--cross-filesystems", scanOpts.crossFilesystems, "enter folders of other file systems");
    scanCmd->add_option("--wait", scanOpts.waitSeconds, "seconds to wait for another scan of the database (default 10)")
        ->check(CLI::Range(0.0, 86400.0));
    scanCmd->footer(
        "Exit status: 0 when every folder was read (files that fail get a row with their error), 1 when "
        "one was not or the database failed, 2 for a usage error.");

    std::string exportDb;
    bool exportJson = false, exportCsv = false;
    CLI::App* exportCmd =
        app.add_subcommand("export", "Write a scan's database out with the keys of probe --json or --csv.");
    exportCmd->add_option("--db", exportDb, "the database file")->required();
    auto* exportJsonOpt = exportCmd->add_flag("--json", exportJson, "JSON Lines: one object per file");
    auto* exportCsvOpt =
        exportCmd->add_flag("--csv", exportCsv, "CSV with a header row (RFC 4180)")->excludes(exportJsonOpt);
    exportCmd->callback([&] {
        if (exportJsonOpt->count() + exportCsvOpt->count() == 0) throw CLI::RequiredError("--json or --csv");
    });
    exportCmd->footer(kExitCodes);

    int64_t startMs = 0;
    int64_t endMs = 0;
    try {
        app.parse(argc, argv);
        if (cutCmd->parsed()) {
            startMs = CutTime(cutStart, "start", cutExact);
            endMs = CutTime(cutEnd, "end", cutExact);
            if (endMs <= startMs) throw CLI::ValidationError("end", "the end must come after the start");
        }
    } catch (const CLI::ParseError& e) {
        const int code = app.exit(e);
        return code == 0 ? 0 : kUsageError;
    }

    if (probeCmd->parsed()) {
        probe::ProbePrinter printer(json ? probe::Output::kJson : csv ? probe::Output::kCsv : probe::Output::kText);
        bool ok = true;
        for (const std::string& f : files) {
            std::error_code ec;
            if (f == "-") {
                ok = ProbeNamesFromStdin(nul, &printer) && ok;
            } else if (recursive && std::filesystem::is_directory(f, ec)) {
                std::vector<std::string> found;
                AddFolder(f, &found);
                for (const std::string& path : found) ok = printer.Print(path) && ok;
            } else {
                ok = printer.Print(f) && ok;
            }
        }
        return ok ? 0 : 1;
    }
    if (scanCmd->parsed()) return scan::ScanCommand(scanOpts);
    if (exportCmd->parsed()) return scan::ExportCommand(exportDb, exportJson);
    if (cutCmd->parsed()) return probe::CutCommand(cutFile, startMs, endMs, cutOut, cutExact);
    if (makerCmd->parsed()) return probe::MakerCommand(makerFile, thumbnail);
    if (framesCmd->parsed()) return probe::FramesCommand(framesFile, stream, seekOpt->count() > 0, seekMs);
    if (coverCmd->parsed()) return probe::CoverCommand(coverFile, coverOut, coverIndex, coverAll, coverExact);
    return kUsageError;
}
