// Builders of MP4 boxes: size, type, full-box header and nesting.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <string>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

using ByteVec = std::vector<uint8_t>;

// Joins boxes (or any byte runs) one after another.
ByteVec Join(std::initializer_list<ByteVec> parts);

// A box whose 32-bit size covers the header and the body.
ByteVec Box(const std::string& type, const ByteVec& body = {});
// The same box with a 64-bit size (size field 1, then the large size).
ByteVec Box64(const std::string& type, const ByteVec& body = {});
// A full box: the version byte and 24-bit flags, then the body.
ByteVec FullBox(const std::string& type, uint8_t version, uint32_t flags, const ByteVec& body = {});

ByteVec Ftyp(const std::string& brand = "isom");
// Movie / media header: version 0 takes 32-bit times, version 1 the 64-bit ones.
ByteVec Mvhd(uint8_t version, uint32_t timescale, uint64_t duration, uint64_t creation = 0);
ByteVec Mdhd(uint8_t version, uint32_t timescale, uint64_t duration, uint64_t creation = 0);
ByteVec Tkhd(uint8_t version, uint32_t width, uint32_t height);
ByteVec Hdlr(const std::string& handler);

// Sample entries.
ByteVec AudioEntry(const std::string& type, uint16_t channels, uint16_t bits, uint16_t rate,
                   const ByteVec& children = {});
ByteVec VisualEntry(const std::string& type, uint16_t width, uint16_t height, const ByteVec& children = {});
// An "esds" with an ES descriptor, a decoder configuration and, when not
// empty, its decoder-specific information.
ByteVec Esds(uint8_t objectType, uint32_t avgBitrate, const ByteVec& decoderSpecific = {});
ByteVec Stsd(std::initializer_list<ByteVec> entries);
ByteVec Stsz(uint32_t sampleSize, uint32_t sampleCount, const std::vector<uint32_t>& sizes = {});

// A "trak" of the handler's kind: tkhd, mdia(mdhd, hdlr, minf(stbl(children))).
ByteVec Trak(const std::string& handler, uint32_t timescale, uint32_t duration, const ByteVec& stblChildren,
             uint32_t width = 0, uint32_t height = 0);

// User data: a 3GPP text box (language "eng"), an iTunes item with its "data".
ByteVec TextBox(const std::string& type, const std::string& text);
ByteVec IlstItem(const std::string& type, uint32_t dataType, const ByteVec& value);

}  // namespace testing_support
