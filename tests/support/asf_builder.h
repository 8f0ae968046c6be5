// Byte builders of ASF headers: objects, streams and metadata as they stand in a file.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

// GUIDs as the ASF standard writes them.
namespace asf_guid {
extern const char* const kHeader;
extern const char* const kFileProperties;
extern const char* const kStreamProperties;
extern const char* const kHeaderExtension;
extern const char* const kContentDescription;
extern const char* const kExtContentDescription;
extern const char* const kContentBranding;
extern const char* const kStreamBitrate;
extern const char* const kExtStreamProperties;
extern const char* const kMetadata;
extern const char* const kMetadataLibrary;
extern const char* const kPadding;
extern const char* const kAudio;
extern const char* const kVideo;
extern const char* const kCommand;
extern const char* const kJfif;
extern const char* const kDegradableJpeg;
extern const char* const kFileTransfer;
extern const char* const kBinary;
}  // namespace asf_guid

// The 16 bytes of a GUID given as text ("75B22630-668E-11CF-A6D9-00AA0062CE6C").
Bytes AsfGuid(const char* text);

// GUID, 64-bit size (24 + body unless given), body.
Bytes AsfObject(const char* guid, const Bytes& body, int64_t size = -1);
// Header Object holding the objects; the count defaults to their number.
Bytes AsfHeader(const std::vector<Bytes>& objects, int64_t count = -1);

// Durations in 100-ns units, preroll in milliseconds.
Bytes AsfFileProperties(uint64_t fileSize, uint64_t playDuration, uint64_t preroll, uint32_t maxBitrate);

struct AsfAudio {
    uint16_t formatTag = 0x0161;
    uint16_t channels = 2;
    uint32_t sampleRate = 44100;
    uint32_t avgBytesPerSec = 16000;
    uint16_t blockAlign = 2973;
    uint16_t bitsPerSample = 16;
    std::vector<uint8_t> extra;  // codec-specific bytes after the WAVEFORMATEX
};
struct AsfVideo {
    uint32_t width = 176;
    uint32_t height = 144;
    std::string compression = "WMV3";
    std::vector<uint8_t> codecData;
};
Bytes AsfStreamProperties(const char* typeGuid, int streamNumber, const Bytes& typeSpecific);
Bytes AsfAudioStream(int streamNumber, const AsfAudio& audio);
Bytes AsfVideoStream(int streamNumber, const AsfVideo& video);
Bytes AsfStreamBitrates(const std::vector<std::pair<int, uint32_t>>& rates);
Bytes AsfHeaderExtension(const std::vector<Bytes>& inner, int64_t dataSize = -1);
Bytes AsfExtStreamProperties(int streamNumber, uint64_t avgTimePerFrame);

// UTF-16LE of ASCII text, with a terminating zero unit when asked.
Bytes Utf16(const std::string& text, bool terminator = true);

Bytes AsfContentDescription(const std::string& title, const std::string& author,
                            const std::string& copyright, const std::string& description,
                            const std::string& rating);

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
Bytes AsfWmPicture(uint8_t pictureType, const std::string& mime, const std::string& description,
                   const Bytes& data);

}  // namespace testing_support
