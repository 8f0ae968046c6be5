// Byte builders of ASF headers: objects, streams and metadata as they stand in a file.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

// GUIDs as the ASF standard writes them.
namespace asf_guid {
inline constexpr const char* kHeader = "75B22630-668E-11CF-A6D9-00AA0062CE6C";
inline constexpr const char* kFileProperties = "8CABDCA1-A947-11CF-8EE4-00C00C205365";
inline constexpr const char* kStreamProperties = "B7DC0791-A9B7-11CF-8EE6-00C00C205365";
inline constexpr const char* kHeaderExtension = "5FBF03B5-A92E-11CF-8EE3-00C00C205365";
inline constexpr const char* kContentDescription = "75B22633-668E-11CF-A6D9-00AA0062CE6C";
inline constexpr const char* kExtContentDescription = "D2D0A440-E307-11D2-97F0-00A0C95EA850";
inline constexpr const char* kContentBranding = "2211B3FA-BD23-11D2-B4B7-00A0C955FC6E";
inline constexpr const char* kStreamBitrate = "7BF875CE-468D-11D1-8D82-006097C9A2B2";
inline constexpr const char* kExtStreamProperties = "14E6A5CB-C672-4332-8399-A96952065B5A";
inline constexpr const char* kMetadata = "C5F8CBEA-5BAF-4877-8467-AA8C44FA4CCA";
inline constexpr const char* kMetadataLibrary = "44231C94-9498-49D1-A141-1D134E457054";
inline constexpr const char* kPadding = "1806D474-CADF-4509-A4BA-9AABCB96AAE8";
inline constexpr const char* kAudio = "F8699E40-5B4D-11CF-A8FD-00805F5C442B";
inline constexpr const char* kVideo = "BC19EFC0-5B4D-11CF-A8FD-00805F5C442B";
inline constexpr const char* kCommand = "59DACFC0-59E6-11D0-A3AC-00A0C90348F6";
inline constexpr const char* kJfif = "B61BE100-5B4E-11CF-A8FD-00805F5C442B";
inline constexpr const char* kDegradableJpeg = "35907DE0-E415-11CF-A917-00805F5C442B";
inline constexpr const char* kFileTransfer = "91BD222C-F21C-497A-8B6D-5AA86BFC0185";
inline constexpr const char* kBinary = "3AFB65E2-47EF-40F2-AC2C-70A90D71D343";
}  // namespace asf_guid

// The 16 bytes of a GUID given as text ("75B22630-668E-11CF-A6D9-00AA0062CE6C").
Bytes AsfGuid(const char* text);

// GUID, 64-bit size (24 + body unless given), body.
Bytes AsfObject(const char* guid, const Bytes& body, int64_t size = -1);
// Header Object holding the objects; the count defaults to their number.
Bytes AsfHeader(const std::vector<Bytes>& objects, int64_t count = -1);
// That header followed by a stub Data Object, as files have one.
std::vector<uint8_t> AsfFile(const std::vector<Bytes>& objects, int64_t count = -1);

// Durations in 100-ns units, preroll in milliseconds.
Bytes AsfFileProperties(uint64_t fileSize, uint64_t playDuration, uint64_t preroll, uint32_t maxBitrate);

Bytes AsfStreamProperties(const char* typeGuid, int streamNumber, const Bytes& typeSpecific);
// WAVEFORMATEX with 10 bytes of codec-specific data.
Bytes AsfAudioStream(int streamNumber, uint16_t formatTag, uint32_t sampleRate, uint16_t channels,
                     uint32_t bitsPerSecond, uint16_t bitsPerSample = 16);
// BITMAPINFOHEADER and the codec-specific data.
Bytes AsfVideoStream(int streamNumber, const std::string& compression, uint32_t width, uint32_t height,
                     const std::vector<uint8_t>& codecData = {0, 0, 0, 0});
Bytes AsfStreamBitrates(const std::vector<std::pair<int, uint32_t>>& rates);
Bytes AsfHeaderExtension(const std::vector<Bytes>& inner, int64_t dataSize = -1);
Bytes AsfExtStreamProperties(int streamNumber, uint64_t avgTimePerFrame);

// UTF-16LE of ASCII text, with a terminating zero unit when asked.
Bytes Utf16(const std::string& text, bool terminator = true);

Bytes AsfContentDescription(const std::string& title, const std::string& author, const std::string& copyright,
                            const std::string& description, const std::string& rating);

struct AsfDescriptor {
    std::string name;
    uint16_t type;
    std::vector<uint8_t> value;
};
Bytes AsfExtContentDescription(const std::vector<AsfDescriptor>& descriptors);
Bytes AsfMetadata(const std::vector<AsfDescriptor>& records, bool library = false);
Bytes AsfContentBranding(uint32_t imageType, const Bytes& image, const std::string& bannerUrl = "",
                         const std::string& copyrightUrl = "");
// A WM/Picture value: type, data length, MIME and description (UTF-16, terminated), data.
Bytes AsfWmPicture(uint8_t pictureType, const std::string& mime, const std::string& description, const Bytes& data);

}  // namespace testing_support
