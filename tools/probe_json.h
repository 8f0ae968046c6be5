// The key set of `metainfo probe --json` and `--csv`, filled from the
// accurate interface (mi_probe) with the MM_ interface's answers under exact:
//
//   path (path_bytes, hex, when the name is not UTF-8), size, format, mime,
//   duration (s), duration_exact, bit_rate, creation_time (ISO 8601),
//   audio{codec, profile, sample_rate, channels, bits_per_sample, bit_rate},
//   video{codec, profile, level, width, height, frame_rate, bit_rate},
//   tags{title, artist, album, album_artist, genre, date, year, track,
//   track_total, disc, disc_total, comment, composer, other{key: value}},
//   pictures[{mime, type, description, size}], maker, error,
//   exact (the C interface's answers unchanged).
//
// Unknown values are null; texts are UTF-8 without padding or control bytes.
#pragma once

#include <nlohmann/json.hpp>

#include <string>
#include <vector>

#include "probe_command.h"

namespace probe {

using Json = nlohmann::ordered_json;

Json ReportJson(const Report& r);

// The CSV columns (flattened keys, "audio.codec") and one row of a report.
std::vector<std::string> CsvColumns();
std::vector<std::string> CsvRow(const Json& report);

// A field quoted as RFC 4180 asks (quotes doubled; quoted when it holds a
// comma, a quote or a line break).
std::string CsvField(const std::string& s);

}  // namespace probe
