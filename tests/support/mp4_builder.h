// Builders of MP4 boxes: size, type, full-box header and nesting.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <string>
#include <vector>

#include "support/bytes.h"
#include "mp4/mp4_internal.h"

namespace testing_support {

using ByteVec = std::vector<uint8_t>;

// A box whose 32-bit size covers the header and the body.
ByteVec Box(const std::string& type, const ByteVec& body = {});
// A full box: the version byte and 24-bit flags, then the body.
ByteVec FullBox(const std::string& type, uint8_t version, uint32_t flags, const ByteVec& body = {});

ByteVec Ftyp(const std::string& brand = "isom");
// Movie / media header: version 0 takes 32-bit times, version 1 the 64-bit ones.
ByteVec Mvhd(uint8_t version, uint32_t timescale, uint64_t duration, uint64_t creation = 0);
ByteVec Mdhd(uint8_t version, uint32_t timescale, uint64_t duration, uint64_t creation = 0);
ByteVec Hdlr(const std::string& handler);

// Sample entries.
ByteVec AudioEntry(const std::string& type, uint16_t channels, uint16_t bits, uint16_t rate,
                   const ByteVec& children = {});
ByteVec VisualEntry(const std::string& type, uint16_t width, uint16_t height, const ByteVec& children = {});
// An "esds" with an ES descriptor, a decoder configuration and, when not
// empty, its decoder information.
ByteVec Esds(uint8_t objectType, uint32_t avgBitrate, const ByteVec& decoderInfo = {});
ByteVec Stsd(std::initializer_list<ByteVec> entries);
ByteVec Stsz(uint32_t sampleSize, uint32_t sampleCount, const std::vector<uint32_t>& sizes = {});

// A "trak" of the handler's kind: tkhd, mdia(mdhd, hdlr, minf(stbl(children))).
ByteVec Trak(const std::string& handler, uint32_t timescale, uint32_t duration, const ByteVec& stblChildren,
             uint32_t width = 0, uint32_t height = 0);

// User data: a 3GPP text box (language "eng"), an iTunes item with its "data".
ByteVec TextBox(const std::string& type, const std::string& text);
ByteVec IlstItem(const std::string& type, uint32_t dataType, const ByteVec& value);

// ftyp, moov(moovChildren), then what follows the movie (by default an mdat).
ByteVec Movie(const ByteVec& moovChildren, const ByteVec& after = Box("mdat", ByteVec(32, 0)));

// A clip walk of the file at path: its result, the clip record and a copy of
// the track nodes, refined as the public queries do when refine is set.
struct Mp4ClipWalk {
    int32_t result = 0;
    _MMClipInfo clip{};
    std::vector<metainfo::MP4TrackNode> nodes;
};
Mp4ClipWalk WalkClip(const std::string& path, bool refine = false);

}  // namespace testing_support
