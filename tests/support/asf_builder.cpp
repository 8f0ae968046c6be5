#include "support/asf_builder.h"

#include <cstdlib>
#include <stdexcept>

namespace testing_support {

Bytes AsfGuid(const char* text) {
    std::string hex;
    for (const char* p = text; *p != '\0'; ++p) {
        if (*p != '-') hex.push_back(*p);
    }
    if (hex.size() != 32) throw std::invalid_argument("GUID text");
    auto byteAt = [&](size_t i) {
        return static_cast<uint32_t>(std::strtoul(hex.substr(2 * i, 2).c_str(), nullptr, 16));
    };
    Bytes out;
    // First three groups little-endian, the last eight bytes as written.
    for (size_t i : {3u, 2u, 1u, 0u, 5u, 4u, 7u, 6u}) out.u8(byteAt(i));
    for (size_t i = 8; i < 16; ++i) out.u8(byteAt(i));
    return out;
}

Bytes AsfObject(const char* guid, const Bytes& body, int64_t size) {
    uint64_t total = size >= 0 ? static_cast<uint64_t>(size) : 24 + body.size();
    return Bytes().raw(AsfGuid(guid)).le64(total).raw(body);
}

Bytes AsfHeader(const std::vector<Bytes>& objects, int64_t count) {
    Bytes body;
    body.le32(count >= 0 ? static_cast<uint32_t>(count) : static_cast<uint32_t>(objects.size()));
    body.u8(1).u8(2);
    for (const Bytes& o : objects) body.raw(o);
    return AsfObject(asf_guid::kHeader, body);
}

std::vector<uint8_t> AsfFile(const std::vector<Bytes>& objects, int64_t count) {
    return AsfHeader(objects, count).raw(AsfGuid("75B22636-668E-11CF-A6D9-00AA0062CE6C")).le64(50).fill(26, 0).data();
}

Bytes AsfFileProperties(uint64_t fileSize, uint64_t playDuration, uint64_t preroll, uint32_t maxBitrate) {
    Bytes b;
    b.fill(16, 0xAB);  // File ID
    b.le64(fileSize);
    b.le64(0);  // Creation Date
    b.le64(10);  // Data Packets Count
    b.le64(playDuration);
    b.le64(playDuration);  // Send Duration
    b.le64(preroll);
    b.le32(2);  // Flags: seekable
    b.le32(3200).le32(3200);  // Minimum and Maximum Data Packet Size
    b.le32(maxBitrate);
    return AsfObject(asf_guid::kFileProperties, b);
}

Bytes AsfStreamProperties(const char* typeGuid, int streamNumber, const Bytes& typeSpecific) {
    Bytes b;
    b.raw(AsfGuid(typeGuid));
    b.raw(AsfGuid("20FB5700-5B55-11CF-A8FD-00805F5C442B"));  // No Error Correction
    b.le64(0);  // Time Offset
    b.le32(static_cast<uint32_t>(typeSpecific.size()));
    b.le32(0);  // Error Correction Data Length
    b.le16(static_cast<uint32_t>(streamNumber) & 0x7F);
    b.le32(0);  // Reserved
    b.raw(typeSpecific);
    return AsfObject(asf_guid::kStreamProperties, b);
}

Bytes AsfAudioStream(int streamNumber, uint16_t formatTag, uint32_t sampleRate, uint16_t channels,
                     uint32_t bitsPerSecond, uint16_t bitsPerSample) {
    Bytes w;
    w.le16(formatTag).le16(channels).le32(sampleRate).le32(bitsPerSecond / 8);
    w.le16(2973).le16(bitsPerSample).le16(10).zeros(10);
    return AsfStreamProperties(asf_guid::kAudio, streamNumber, w);
}

Bytes AsfVideoStream(int streamNumber, const std::string& compression, uint32_t width, uint32_t height,
                     const std::vector<uint8_t>& codecData) {
    const uint32_t formatSize = static_cast<uint32_t>(40 + codecData.size());
    Bytes t;
    t.le32(width).le32(height).u8(2).le16(formatSize);
    t.le32(formatSize).le32(width).le32(height).le16(1).le16(24);  // BITMAPINFOHEADER
    t.str(compression.substr(0, 4));
    t.le32(width * height * 3).le32(0).le32(0).le32(0).le32(0);
    t.raw(codecData);
    return AsfStreamProperties(asf_guid::kVideo, streamNumber, t);
}

Bytes AsfStreamBitrates(const std::vector<std::pair<int, uint32_t>>& rates) {
    Bytes b;
    b.le16(static_cast<uint32_t>(rates.size()));
    for (const auto& r : rates) b.le16(static_cast<uint32_t>(r.first)).le32(r.second);
    return AsfObject(asf_guid::kStreamBitrate, b);
}

Bytes AsfHeaderExtension(const std::vector<Bytes>& inner, int64_t dataSize) {
    Bytes data;
    for (const Bytes& o : inner) data.raw(o);
    Bytes b;
    b.raw(AsfGuid("ABD3D211-A9BA-11CF-8EE6-00C00C205365"));  // Reserved Field 1
    b.le16(6);
    b.le32(dataSize >= 0 ? static_cast<uint32_t>(dataSize) : static_cast<uint32_t>(data.size()));
    b.raw(data);
    return AsfObject(asf_guid::kHeaderExtension, b);
}

Bytes AsfExtStreamProperties(int streamNumber, uint64_t avgTimePerFrame) {
    Bytes b;
    b.le64(0).le64(0);  // Start and End Time
    b.le32(200000).le32(4000).le32(0);  // Data Bitrate, Buffer Size, Initial Fullness
    b.le32(0).le32(0).le32(0);  // Alternate values
    b.le32(5000).le32(0);  // Maximum Object Size, Flags
    b.le16(static_cast<uint32_t>(streamNumber)).le16(0);
    b.le64(avgTimePerFrame);
    b.le16(0).le16(0);  // Stream Name and Payload Extension System counts
    return AsfObject(asf_guid::kExtStreamProperties, b);
}

Bytes Utf16(const std::string& text, bool terminator) {
    Bytes b;
    for (char c : text) b.le16(static_cast<unsigned char>(c));
    if (terminator) b.le16(0);
    return b;
}

Bytes AsfContentDescription(const std::string& title, const std::string& author, const std::string& copyright,
                            const std::string& description, const std::string& rating) {
    std::vector<Bytes> texts;
    for (const std::string* s : {&title, &author, &copyright, &description, &rating}) {
        texts.push_back(s->empty() ? Bytes() : Utf16(*s));
    }
    Bytes b;
    for (const Bytes& t : texts) b.le16(static_cast<uint32_t>(t.size()));
    for (const Bytes& t : texts) b.raw(t);
    return AsfObject(asf_guid::kContentDescription, b);
}

Bytes AsfExtContentDescription(const std::vector<AsfDescriptor>& descriptors) {
    Bytes b;
    b.le16(static_cast<uint32_t>(descriptors.size()));
    for (const AsfDescriptor& d : descriptors) {
        Bytes name = Utf16(d.name);
        b.le16(static_cast<uint32_t>(name.size())).raw(name);
        b.le16(d.type).le16(static_cast<uint32_t>(d.value.size())).raw(d.value);
    }
    return AsfObject(asf_guid::kExtContentDescription, b);
}

Bytes AsfMetadata(const std::vector<AsfDescriptor>& records, bool library) {
    Bytes b;
    b.le16(static_cast<uint32_t>(records.size()));
    for (const AsfDescriptor& r : records) {
        Bytes name = Utf16(r.name);
        b.le16(0).le16(0).le16(static_cast<uint32_t>(name.size())).le16(r.type);
        b.le32(static_cast<uint32_t>(r.value.size())).raw(name).raw(r.value);
    }
    return AsfObject(library ? asf_guid::kMetadataLibrary : asf_guid::kMetadata, b);
}

Bytes AsfContentBranding(uint32_t imageType, const Bytes& image, const std::string& bannerUrl,
                         const std::string& copyrightUrl) {
    Bytes b;
    b.le32(imageType).le32(static_cast<uint32_t>(image.size())).raw(image);
    b.le32(static_cast<uint32_t>(bannerUrl.size())).str(bannerUrl);
    b.le32(static_cast<uint32_t>(copyrightUrl.size())).str(copyrightUrl);
    return AsfObject(asf_guid::kContentBranding, b);
}

Bytes AsfWmPicture(uint8_t pictureType, const std::string& mime, const std::string& description, const Bytes& data) {
    Bytes b;
    b.u8(pictureType).le32(static_cast<uint32_t>(data.size()));
    b.raw(Utf16(mime)).raw(Utf16(description)).raw(data);
    return b;
}

}  // namespace testing_support
