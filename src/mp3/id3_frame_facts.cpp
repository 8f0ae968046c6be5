#include "mp3/id3_frame_facts.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <new>
#include <string>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/text.h"
#include "core/unsync.h"
#include "metainfo/records.h"
#include "mp3/id3.h"
#include "mp3/id3_text.h"
#include "probe/contract_facts.h"

namespace metainfo {
namespace {

constexpr uint32_t kPictureHead = 65536;  // bytes read to find where a picture starts

// v2.2 frames under their later names, so one key names a frame in every version.
constexpr const char* kV22Names[][2] = {
    {"TT1", "TIT1"}, {"TT2", "TIT2"}, {"TT3", "TIT3"}, {"TP1", "TPE1"}, {"TP2", "TPE2"}, {"TP3", "TPE3"},
    {"TP4", "TPE4"}, {"TAL", "TALB"}, {"TCO", "TCON"}, {"TCM", "TCOM"}, {"TYE", "TYER"}, {"TDA", "TDAT"},
    {"TIM", "TIME"}, {"TRK", "TRCK"}, {"TPA", "TPOS"}, {"TCR", "TCOP"}, {"TPB", "TPUB"}, {"TEN", "TENC"},
    {"TSS", "TSSE"}, {"TLA", "TLAN"}, {"TBP", "TBPM"}, {"TKE", "TKEY"}, {"TLE", "TLEN"}, {"TMT", "TMED"},
    {"TOA", "TOPE"}, {"TOF", "TOFN"}, {"TOL", "TOLY"}, {"TOR", "TORY"}, {"TOT", "TOAL"}, {"TRC", "TSRC"},
    {"TXT", "TEXT"}, {"TFT", "TFLT"}, {"TRD", "TRDA"}, {"TDY", "TDLY"}, {"TXX", "TXXX"}, {"WXX", "WXXX"},
    {"WAR", "WOAR"}, {"WAF", "WOAF"}, {"WAS", "WOAS"}, {"WCM", "WCOM"}, {"WCP", "WCOP"}, {"WPB", "WPUB"},
    {"COM", "COMM"}, {"ULT", "USLT"}, {"PIC", "APIC"},
};

std::string KeyOf(uint32_t id, uint8_t version) {
    std::string key;
    for (int shift = version == 2 ? 16 : 24; shift >= 0; shift -= 8) {
        const char c = static_cast<char>((id >> shift) & 0xFF);
        if (!((c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9'))) return std::string();
        key.push_back(c);
    }
    if (version == 2) {
        for (const auto& names : kV22Names) {
            if (key == names[0]) return names[1];
        }
    }
    return key;
}

std::string TrimEnds(const std::string& s) {
    const size_t first = s.find_first_not_of(" \t\r\n");
    return first == std::string::npos ? std::string() : s.substr(first, s.find_last_not_of(" \t\r\n") - first + 1);
}

std::string Joined(const std::vector<std::string>& values) {
    std::string out;
    for (const std::string& v : values) {
        if (v.empty()) continue;
        out += out.empty() ? v : "; " + v;
    }
    return out;
}

std::string FirstOf(const std::vector<std::string>& values) {
    for (const std::string& v : values) {
        if (!v.empty()) return v;
    }
    return std::string();
}

// A picture format as stated; a bare "JPG" or "PNG" (v2.2, some v2.3 writers) as a MIME type.
std::string PictureMime(const std::string& stated) {
    if (stated.empty() || stated.find('/') != std::string::npos) return stated;
    std::string lower;
    for (char c : stated) lower.push_back(static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c));
    return "image/" + (lower == "jpg" ? std::string("jpeg") : lower);
}

struct Comment {
    std::string description, text;
};

// The frames of a v2 tag into facts.
class FactsSink final : public ID3_FrameSink {
public:
    FactsSink(TagFacts* tags, std::vector<PictureFacts>* pictures) : tags_(tags), pictures_(pictures) {}

    int32_t Frame(int h, const ID3_Frame& frame, ID3_MetaInfo* ctx) override {
        const int64_t bodyStart = MEx_ftell(h);
        try {
            Read(h, frame, ctx->version, bodyStart);
        } catch (const std::bad_alloc&) {
            return MM_E_OUTOFMEMORY;
        }
        return MEx_fseek(h, bodyStart + static_cast<int64_t>(frame.stored), SEEK_SET) == 0 ? MM_OK : MM_E_FAIL;
    }

    // Date, comment and the numbers, once every frame was seen.
    void Finish() {
        if (tags_->date.empty()) tags_->date = StartsWithYear(tdrc_) ? tdrc_ : DateOf(tyer_, tdat_);
        const Comment* chosen = nullptr;
        for (const Comment& c : comments_) {
            if (c.description.empty() && !c.text.empty()) {
                chosen = &c;
                break;
            }
        }
        for (const Comment& c : comments_) {
            if (chosen == nullptr && !c.text.empty() && c.description.compare(0, 4, "iTun") != 0) chosen = &c;
        }
        if (chosen != nullptr && tags_->comment.empty()) tags_->comment = chosen->text;
        for (const Comment& c : comments_) {
            if (&c != chosen && !c.text.empty()) tags_->extra.emplace_back("COMM:" + c.description, c.text);
        }
        if (tags_->track == 0) SplitNumberPair(trck_, &tags_->track, &tags_->trackTotal);
        if (tags_->disc == 0) SplitNumberPair(tpos_, &tags_->disc, &tags_->discTotal);
    }

private:
    TagFacts* tags_;
    std::vector<PictureFacts>* pictures_;
    std::string tdrc_, tyer_, tdat_, trck_, tpos_;
    std::vector<Comment> comments_;

    // v2.3 "YYYY" and "DDMM" as "YYYY-MM-DD".
    static std::string DateOf(const std::string& year, const std::string& dayMonth) {
        const auto digits = [](const std::string& s) {
            return s.size() == 4 && s.find_first_not_of("0123456789") == std::string::npos;
        };
        if (!digits(year)) return std::string();
        if (!digits(dayMonth)) return year;
        return year + "-" + dayMonth.substr(2, 2) + "-" + dayMonth.substr(0, 2);
    }

    // Bytes before the frame's data: group id, data length indicator. False
    // for a frame that cannot be read (compressed, encrypted).
    static bool DataPrefix(uint8_t version, uint8_t flags, uint32_t* prefix) {
        if (version == 3) {
            if ((flags & 0xC0) != 0) return false;
            *prefix = (flags & 0x20) != 0 ? 1 : 0;
        } else if (version == 4) {
            if ((flags & 0x0C) != 0) return false;
            *prefix = ((flags & 0x40) != 0 ? 1 : 0) + ((flags & 0x01) != 0 ? 4 : 0);
        } else {
            *prefix = 0;
        }
        return true;
    }

    void Read(int h, const ID3_Frame& frame, uint8_t version, int64_t bodyStart) {
        const std::string key = KeyOf(frame.id, version);
        uint32_t prefix = 0;
        if (key.empty() || !DataPrefix(version, frame.flags, &prefix) || frame.stored <= prefix) return;
        const bool picture = key == "APIC";
        if (!picture && key[0] != 'T' && key[0] != 'W' && key != "COMM" && key != "USLT") return;
        const uint32_t stored = frame.stored - prefix;
        // A picture's own bytes need no reading unless they are unsynchronised.
        const uint32_t want = picture && !frame.unsync ? std::min(stored, kPictureHead) : stored;
        std::vector<uint8_t> raw(want);
        if (MEx_fseek(h, bodyStart + prefix, SEEK_SET) != 0) return;
        if (MEx_fread(raw.data(), 1, want, h) != static_cast<int>(want)) return;
        std::vector<uint8_t> data = raw;
        if (frame.unsync) data.resize(static_cast<size_t>(Sync(data.data(), static_cast<int>(data.size()))));
        if (data.empty()) return;
        if (picture) {
            Picture(data, raw, stored, version, frame.unsync, static_cast<uint64_t>(bodyStart) + prefix);
        } else {
            Text(key, data);
        }
    }

    void Text(const std::string& key, const std::vector<uint8_t>& data) {
        const uint8_t* p = data.data();
        const size_t n = data.size();
        if (key[0] == 'W' && key != "WXXX") {
            Extra(key, TrimText(Latin1ToUtf8(p, n)));
            return;
        }
        const uint8_t encoding = p[0];
        if (encoding > 3) return;
        size_t at = 1;
        std::string description;
        if (key == "COMM" || key == "USLT") at = std::min<size_t>(n, 4);  // the language
        if (key == "COMM" || key == "USLT" || key == "TXXX" || key == "WXXX") {
            at += TakeId3Text(encoding, p + at, n - at, &description);
            description = TrimText(description);
        }
        if (key == "WXXX") return Extra("WXXX:" + description, TrimText(Latin1ToUtf8(p + at, n - at)));
        if (key == "USLT") {
            std::string lyrics;
            TakeId3Text(encoding, p + at, n - at, &lyrics);
            return Extra("USLT", TrimEnds(lyrics));
        }
        const std::vector<std::string> values = Id3TextValues(encoding, p + at, n - at);
        if (key == "COMM") return comments_.push_back({description, FirstOf(values)});
        if (key == "TXXX") return Extra("TXXX:" + description, Joined(values));
        Named(key, values);
    }

    void Named(const std::string& key, const std::vector<std::string>& values) {
        const std::string first = FirstOf(values);
        static const std::pair<const char*, std::string TagFacts::*> kFields[] = {
            {"TIT2", &TagFacts::title},       {"TPE1", &TagFacts::artist},   {"TALB", &TagFacts::album},
            {"TPE2", &TagFacts::albumArtist}, {"TCOM", &TagFacts::composer},
        };
        for (const auto& field : kFields) {
            if (key != field.first) continue;
            std::string& value = tags_->*field.second;
            if (value.empty()) value = first;
            return;
        }
        std::string* kept = key == "TDRC"   ? &tdrc_
                            : key == "TYER" ? &tyer_
                            : key == "TDAT" ? &tdat_
                            : key == "TRCK" ? &trck_
                            : key == "TPOS" ? &tpos_
                                            : nullptr;
        if (kept != nullptr) {
            if (kept->empty()) *kept = first;
        } else if (key == "TCON") {
            if (tags_->genre.empty() && !first.empty()) tags_->genre = Id3GenreName(first);
        } else {
            Extra(key, Joined(values));
        }
    }

    void Extra(const std::string& key, const std::string& value) {
        if (!value.empty()) tags_->extra.emplace_back(key, value);
    }

    // data: the frame's data (read through unsynchronisation), raw: as
    // stored from `at` in the file, of `stored` bytes in all.
    void Picture(const std::vector<uint8_t>& data, const std::vector<uint8_t>& raw, uint32_t stored, uint8_t version,
                 bool unsync, uint64_t at) {
        ByteReader r(data.data(), data.size());
        uint8_t encoding = 0;
        PictureFacts pic;
        if (!r.U8(&encoding) || encoding > 3) return;
        // v2.2: a three-letter format; later: a MIME type up to its terminator.
        const uint8_t* format = data.data() + 1;
        const void* zero = std::memchr(format, 0, r.remaining());
        const size_t formatLength = version == 2      ? 3
                                    : zero != nullptr ? static_cast<size_t>(static_cast<const uint8_t*>(zero) - format)
                                                      : 0;
        if (!r.Skip(formatLength + (version == 2 ? 0 : 1))) return;
        pic.mime = PictureMime(TrimText(Latin1ToUtf8(format, formatLength)));
        uint8_t type = 0;
        if (!r.U8(&type)) return;
        pic.type = type;
        const size_t position = r.position();
        const size_t taken = TakeId3Text(encoding, data.data() + position, data.size() - position, &pic.description);
        pic.description = TrimText(pic.description);
        const size_t start = position + taken;
        if (start >= data.size()) return;  // no picture bytes (or the head outgrew what was read)
        if (unsync) {
            const uint32_t rawStart =
                UnsyncRawSpan(raw.data(), static_cast<uint32_t>(raw.size()), static_cast<uint32_t>(start));
            pic.unsynchronised = true;
            pic.offset = at + rawStart;
            pic.storedSize = raw.size() - rawStart;
            pic.size = data.size() - start;
        } else {
            pic.offset = at + start;
            pic.size = stored - start;
        }
        pictures_->push_back(pic);
    }
};

}  // namespace

bool ReadId3V2Facts(int h, uint64_t fileSize, uint64_t at, TagFacts* tags, std::vector<PictureFacts>* pictures) {
    ID3_MetaInfo ctx{};
    ctx.sizeBound = SaturateU32(fileSize);
    FactsSink sink(tags, pictures);
    bool memory = true;
    if (SeekToOffset(h, at) && ParseV2Header(h, &ctx, kAccurate) == MM_OK) {
        memory = WalkID3Frames(h, &ctx, kAccurate, &sink) != MM_E_OUTOFMEMORY;
    }
    sink.Finish();
    return memory;
}

}  // namespace metainfo
