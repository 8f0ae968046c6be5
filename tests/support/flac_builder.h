// FLAC metadata blocks, Vorbis comments, AIFF chunks and APE tags for the
// tests of the accurate-only formats, and a one-line summary of mi_probe.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

// A metadata block: last flag and type, 24-bit size, body.
Bytes FlacBlock(uint8_t type, const Bytes& body, bool last = false);
Bytes FlacStreamInfo(uint32_t rate, uint32_t channels, uint32_t bits, uint64_t samples);
// A VORBIS_COMMENT body of "KEY=value" entries (also what follows
// "\x03vorbis" and "OpusTags").
Bytes VorbisComments(const std::vector<std::string>& entries);
Bytes FlacPicture(uint32_t type, const std::string& mime, const std::string& description, const Bytes& image);

// A chunk with its pad byte; a FORM of "AIFF" or "AIFC" around chunks.
Bytes AiffChunk(const std::string& id, const Bytes& body);
Bytes AiffForm(const std::string& kind, const std::vector<Bytes>& chunks);
// COMM with a whole-number rate as an 80-bit extended float; compression
// (four letters) only for AIFC.
Bytes AiffComm(uint16_t channels, uint32_t frames, uint16_t bits, uint32_t rate, const std::string& compression = "");

struct ApeItem {
    std::string key;
    Bytes value;
    bool binary = false;
};
// Items then a footer (APEv2: 2000, APEv1: 1000).
Bytes ApeTag(const std::vector<ApeItem>& items, uint32_t version = 2000);

// mi_probe's answer on one line: "format mime ms(~) | codec rate x channels x
// bits bitrate | title;artist;album;albumArtist;genre;date;year;track/total;
// disc/total;comment;composer KEY=value... | mime type description size
// first-bytes-as-copied", or "error N".
std::string ProbeSummary(const std::string& path);

}  // namespace testing_support
