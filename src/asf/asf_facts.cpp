#include "asf/asf_facts.h"

#include <array>
#include <cstdlib>
#include <string>
#include <vector>

#include "asf/asf_codec.h"
#include "asf/asf_guids.h"
#include "asf/asf_header.h"
#include "asf/asf_io.h"
#include "asf/asf_meta.h"
#include "core/byte_reader.h"
#include "core/codes.h"
#include "core/file_access.h"
#include "core/text.h"
#include "probe/contract_facts.h"

namespace metainfo {

using namespace asf;

namespace {

// A part running past its object ends that object's reading, not the walk.
constexpr int32_t kStop = 1;
constexpr uint32_t kMaxText = 1u << 20;  // longer text values are stepped over
constexpr uint32_t kMaxPictureText = 1u << 16;  // MIME type and description together
constexpr uint32_t kStreamFixed = 54;  // Stream Properties from its size field to the type-specific data
constexpr uint32_t kTypeSpecificRead = 64;  // as much of it as any field below needs
constexpr uint32_t kExtStreamFixed = 64;  // Extended Stream Properties up to its name count
constexpr uint32_t kBitmapEnd = 51;  // encoded size, flags, format size, BITMAPINFOHEADER
constexpr uint16_t kExtensible = 0xFFFE;

bool SameName(const std::string& a, const char* b) {
    size_t i = 0;
    for (; i < a.size() && b[i] != '\0'; ++i) {
        const auto lower = [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; };
        if (lower(a[i]) != lower(b[i])) return false;
    }
    return i == a.size() && b[i] == '\0';
}

void SetOnce(std::string* field, const std::string& value) {
    if (field->empty()) *field = value;
}

uint32_t Gcd(uint64_t a, uint64_t b) {
    while (b != 0) {
        const uint64_t t = a % b;
        a = b;
        b = t;
    }
    return static_cast<uint32_t>(a);
}

class FactsWalk final : public AsfObjectVisitor, public AsfAttributeSink, public AsfExtensionVisitor {
public:
    explicit FactsWalk(MediaFacts* f) : f_(f) {}

    int32_t Object(int h, const AsfObjectRef& o) override {
        end_ = o.start + static_cast<int64_t>(o.size);
        const uint8_t* g = o.guid;
        if (SameGuid(g, ASF_File_Properties_Object)) {
            uint8_t b[kAsfFileFieldsSize] = {};
            if (!ReadExact(h, b + 8, sizeof b - 8)) return kStop;
            file_ = ASF_DecodeFileFields(b);
            haveFile_ = true;
        } else if (SameGuid(g, ASF_Stream_Properties_Object)) {
            StreamProperties(h);
        } else if (SameGuid(g, ASF_Stream_Bitrate_Properties_Object)) {
            StreamBitrates(h);
        } else if (SameGuid(g, ASF_Header_Extension_Object) && o.size >= 46) {
            extensionEnd_ = end_;
            if (SeekTo(h, o.start + 16)) ASF_WalkHdrExtension(h, this);
        } else if (SameGuid(g, ASF_Content_Description_Object) && o.size >= 34) {
            if (SeekTo(h, o.start + 16)) ASF_WalkContentDescription(h, this);
        } else if (SameGuid(g, ASF_Extended_Content_Description_Object) && o.size >= 26) {
            if (SeekTo(h, o.start + 16)) ASF_WalkExtContentDescription(h, this);
        }
        return 0;
    }

    int32_t Inner(int h, const uint8_t* guid, uint64_t size) override {
        const int64_t start = MEx_ftell(h) - static_cast<int64_t>(kObjectHeaderSize);
        if (start < 0 || start > extensionEnd_ || size > static_cast<uint64_t>(extensionEnd_ - start)) return kStop;
        end_ = start + static_cast<int64_t>(size);
        if (SameGuid(guid, ASF_Extended_Stream_Properties_Object)) {
            uint8_t e[kExtStreamFixed];
            if (Inside(h, sizeof e) && ReadExact(h, e, sizeof e)) {
                const uint32_t number = ReadLE16(e + 48) & 0x7Fu;
                timePerFrame_[number] = ReadLE64(e + 52);
                bitrate_[number] = ReadLE32(e + 16);
            }
        } else if (SameGuid(guid, ASF_Metadata_Object) || SameGuid(guid, ASF_Metadata_Library_Object)) {
            ASF_WalkMetaData(h, this);
        }
        return SeekTo(h, end_) ? 0 : kStop;
    }

    int32_t Description(int h, uint32_t field, uint16_t length) override {
        std::string text;
        if (!Text(h, length, &text)) return kStop;
        TagFacts& t = f_->tags;
        std::string* const fields[] = {&t.title, &t.artist, nullptr, &t.comment, nullptr};
        if (fields[field] != nullptr) {
            SetOnce(fields[field], text);
        } else {
            Extra(field == 2 ? "Copyright" : "Rating", text);
        }
        return 0;
    }

    int32_t Attribute(int h, const AsfAttribute& a) override {
        const int64_t at = MEx_ftell(h);
        if (at < 0 || !Inside(h, a.length)) return kStop;
        const std::string name = TrimText(Utf16ToUtf8(a.name, a.nameLength, false));
        std::string value;
        if (a.type == 0) {
            if (a.length <= kMaxText && !Text(h, a.length, &value)) return kStop;
        } else if (a.type >= 2 && a.type <= 5 && a.length >= 1 && a.length <= 8) {
            uint8_t b[8] = {};
            if (!ReadExact(h, b, a.length)) return kStop;
            value = std::to_string(ReadLE64(b));
        } else if (a.type == 1 && name == "WM/Picture") {
            Picture(h, at, a.length);
        }
        if (!value.empty()) Take(name, value);
        return SeekTo(h, at + a.length) ? 0 : kStop;
    }

    void Finish(uint64_t fileSize) {
        f_->format = "asf";
        f_->mime = f_->FirstStream(StreamFacts::kVideo) != nullptr ? "video/x-ms-wmv" : "audio/x-ms-wma";
        const uint64_t play = file_.playDuration / 10;
        const uint64_t preroll = uint64_t{file_.preroll} * 1000;
        if (haveFile_ && play > preroll) {
            f_->durationUs = static_cast<int64_t>(play - preroll);
            f_->durationExact = true;
            // As ffprobe states it: the whole file over the play time.
            f_->bitRate =
                static_cast<uint64_t>(static_cast<double>(fileSize) * 8e6 / static_cast<double>(f_->durationUs));
        }
        for (size_t i = 0; i < f_->streams.size(); ++i) {
            StreamFacts& s = f_->streams[i];
            const uint32_t n = numbers_[i];
            if (s.bitRate == 0) s.bitRate = bitrate_[n];
            const uint64_t perFrame = timePerFrame_[n];
            if (s.kind == StreamFacts::kVideo && perFrame != 0 && perFrame <= 0xFFFFFFFFu) {
                const uint32_t gcd = Gcd(10000000, perFrame);
                s.frameRateNum = 10000000 / gcd;
                s.frameRateDen = static_cast<uint32_t>(perFrame / gcd);
            }
        }
        TagFacts& t = f_->tags;
        SetOnce(&t.genre, genreId_);
        SplitNumberPair(trackText_, &t.track, &t.trackTotal);
        uint32_t zeroBased = 0, unused = 0;
        SplitNumberPair(trackZero_, &zeroBased, &unused);
        if (t.track == 0 && !trackZero_.empty()) t.track = zeroBased + 1;
        if (t.date.size() >= 4 && t.date.find_first_not_of("0123456789") >= 4) {
            for (size_t i = 0; i < 4; ++i) t.year = t.year * 10 + (t.date[i] - '0');
        }
    }

private:
    bool Inside(int h, uint64_t n) const {
        const int64_t at = MEx_ftell(h);
        return at >= 0 && at <= end_ && n <= static_cast<uint64_t>(end_ - at);
    }

    bool Text(int h, uint32_t n, std::string* out) const {
        if (!Inside(h, n)) return false;
        std::vector<uint8_t> b(n);
        if (!ReadExact(h, b.data(), n)) return false;
        *out = TrimText(Utf16ToUtf8(b.data(), b.size(), false));
        return true;
    }

    void Extra(const std::string& key, const std::string& value) {
        if (value.empty()) return;
        for (const auto& e : f_->tags.extra) {
            if (e.first == key) return;
        }
        f_->tags.extra.emplace_back(key, value);
    }

    void Take(const std::string& name, const std::string& value) {
        TagFacts& t = f_->tags;
        static const struct {
            const char* name;
            std::string TagFacts::*field;
        } kFields[] = {
            {"Title", &TagFacts::title},
            {"Author", &TagFacts::artist},
            {"Description", &TagFacts::comment},
            {"WM/AlbumTitle", &TagFacts::album},
            {"WM/AlbumArtist", &TagFacts::albumArtist},
            {"WM/Genre", &TagFacts::genre},
            {"WM/Year", &TagFacts::date},
            {"date", &TagFacts::date},
            {"WM/Composer", &TagFacts::composer},
        };
        for (const auto& k : kFields) {
            if (SameName(name, k.name)) return SetOnce(&(t.*k.field), value);
        }
        if (SameName(name, "WM/GenreID")) return SetOnce(&genreId_, value);
        if (SameName(name, "WM/TrackNumber")) return SetOnce(&trackText_, value);
        if (SameName(name, "WM/Track")) return SetOnce(&trackZero_, value);
        if (SameName(name, "WM/PartOfSet")) {
            if (t.disc == 0) SplitNumberPair(value, &t.disc, &t.discTotal);
            return;
        }
        Extra(name, value);
    }

    // WM/Picture: type, data length, MIME type and description (terminated
    // UTF-16LE), then the picture's bytes, which stay in the file.
    void Picture(int h, int64_t at, uint32_t length) {
        uint8_t head[5];
        if (length < sizeof head || !ReadExact(h, head, sizeof head)) return;
        const uint32_t size = ReadLE32(head + 1);
        if (size > length - 5 || length - 5 - size > kMaxPictureText) return;
        std::vector<uint8_t> text(length - 5 - size);
        if (!ReadExact(h, text.data(), static_cast<uint32_t>(text.size()))) return;
        size_t split = 0;  // after the MIME type's terminator
        while (split + 1 < text.size() && (text[split] != 0 || text[split + 1] != 0)) split += 2;
        PictureFacts p;
        p.mime = TrimText(Utf16ToUtf8(text.data(), split, false));
        p.type = head[0];
        if (split + 2 < text.size())
            p.description = TrimText(Utf16ToUtf8(&text[split + 2], text.size() - split - 2, false));
        p.size = size;
        p.offset = static_cast<uint64_t>(at) + length - size;
        f_->pictures.push_back(p);
    }

    void StreamProperties(int h) {
        uint8_t b[kStreamFixed + kTypeSpecificRead] = {};
        if (!Inside(h, kStreamFixed) || !ReadExact(h, b, kStreamFixed)) return;
        const uint32_t length = ReadLE32(b + 40);
        if (!Inside(h, length)) return;
        const uint32_t n = length < kTypeSpecificRead ? length : kTypeSpecificRead;
        if (!ReadExact(h, b + kStreamFixed, n)) return;
        const uint8_t* ts = b + kStreamFixed;
        StreamFacts s;
        if (SameGuid(b, ASF_Audio_Media) && length >= 16) {
            uint16_t tag = ReadLE16(ts);
            if (tag == kExtensible && length >= 26) tag = ReadLE16(ts + 24);
            const uint16_t bits = ReadLE16(ts + 14);
            const char* codec = ASF_AudioCodecName(tag, bits);
            s.codec = codec != nullptr ? codec : "";
            s.channels = ReadLE16(ts + 2);
            s.sampleRate = ReadLE32(ts + 4);
            s.bitRate = uint64_t{ReadLE32(ts + 8)} * 8;
            s.bitsPerSample = ASF_AudioSampleBits(tag, bits);
        } else if (SameGuid(b, ASF_Video_Media) && length >= kBitmapEnd) {
            s.kind = StreamFacts::kVideo;
            const char* codec = ASF_VideoCodecName(ReadLE32(ts + 27));
            s.codec = codec != nullptr ? codec : "";
            s.width = ReadLE32(ts + 15);
            const int64_t height = static_cast<int32_t>(ReadLE32(ts + 19));
            s.height = static_cast<uint32_t>(std::llabs(height));
            if (s.codec == "wmv3" && length > kBitmapEnd) s.profile = ASF_Wmv3ProfileName(ts[kBitmapEnd]);
            if (s.codec == "vc1") s.profile = "Advanced";
        } else {
            return;
        }
        numbers_.push_back(ReadLE16(b + 48) & 0x7Fu);
        f_->streams.push_back(s);
    }

    void StreamBitrates(int h) {
        uint16_t count = 0;
        if (!Inside(h, 2) || !Read16(h, &count)) return;
        for (uint32_t i = 0; i < count && Inside(h, 6); ++i) {
            uint8_t r[6];
            if (!ReadExact(h, r, sizeof r)) return;
            bitrate_[ReadLE16(r) & 0x7Fu] = ReadLE32(r + 2);
        }
    }

    MediaFacts* f_;
    int64_t end_ = 0;  // end of the object being read
    int64_t extensionEnd_ = 0;
    AsfFileFields file_{};
    bool haveFile_ = false;
    std::vector<uint32_t> numbers_;  // stream number of each of f_->streams
    std::array<uint64_t, 128> timePerFrame_{};
    std::array<uint32_t, 128> bitrate_{};
    std::string genreId_, trackText_, trackZero_;
};

}  // namespace

int32_t AsfFacts(const char* path, int /*type*/, MediaFacts* facts) {
    FactsWalk walk(facts);
    uint64_t fileSize = 0;
    if (ASF_WalkHeader(path, &walk, &fileSize) != 0) return MM_E_FAIL;
    walk.Finish(fileSize);
    return MM_OK;
}

}  // namespace metainfo
