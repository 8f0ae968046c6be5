#include "probe/contract_facts.h"

#include <cstring>

#include "core/text.h"
#include "metainfo/metainfo.h"
#include "probe/codec_names.h"
#include "probe/item_text.h"

namespace metainfo {
namespace {

uint32_t Number(const std::string& s) {
    if (s.empty() || s.size() > 9 || s.find_first_not_of("0123456789") != std::string::npos) return 0;
    return static_cast<uint32_t>(std::stoul(s));
}

std::string TakeMime(char* s, uint32_t length) {
    std::string out = s != nullptr ? std::string(s, strnlen(s, length)) : std::string();
    MM_MediaExtractor_FreeBuffer(s);
    return out;
}

void AddStreams(const _MMClipInfo& c, const _MM_CODECTYPE& codec, bool clipOk, bool codecOk, MediaFacts* f) {
    if ((clipOk && c.bHasVideo != 0) || (codecOk && codec.nVideoCodec != 0)) {
        StreamFacts v;
        v.kind = StreamFacts::kVideo;
        if (codecOk) {
            const char* name = FfprobeCodecName(codec.nVideoCodec, 0);
            const char* profile = VideoProfileName(codec.nVideoProfile);
            v.codec = name != nullptr ? name : "";
            v.profile = profile != nullptr ? profile : "";
        }
        if (clipOk) {
            v.width = c.nWidth;
            v.height = c.nHeight;
            v.frameRateNum = c.nFrameRate;
            v.frameRateDen = c.nFrameRate != 0 ? 1 : 0;
            v.bitRate = c.nVideoBitrate;
        }
        f->streams.push_back(v);
    }
    if ((clipOk && c.bHasAudio != 0) || (codecOk && codec.nAudioCodec != 0)) {
        StreamFacts a;
        if (codecOk) {
            const char* name = FfprobeCodecName(codec.nAudioCodec, clipOk ? c.nBitsPerSample : 0);
            const char* profile = FfprobeAudioProfile(codec.nAudioCodec, codec.nAudioSubType);
            a.codec = name != nullptr ? name : "";
            a.profile = profile != nullptr ? profile : "";
        }
        if (clipOk) {
            a.sampleRate = c.nSampleRate;
            // A channel configuration of 0 reads as 0xFFFFFFFF: unknown.
            a.channels = c.nChannels != 0xFFFFFFFFu ? c.nChannels : 0;
            a.bitsPerSample = c.nBitsPerSample;
            a.bitRate = c.nAudioBitrate;
        }
        f->streams.push_back(a);
    }
}

// A picture format as stated, or from an ID3v2.2 image format ("PNG", "JPG").
std::string PictureMime(const std::string& stated) {
    if (stated.empty() || stated.find('/') != std::string::npos) return stated;
    std::string lower;
    for (char c : stated) lower.push_back(static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c));
    return "image/" + (lower == "jpg" ? std::string("jpeg") : lower);
}

void AddTags(const _MMMetaInfo& meta, MediaFacts* f) {
    auto text = [](const _MMMetaItem& item) {
        return item.nLength != 0 ? TrimText(DecodeItemText(item)) : std::string();
    };
    auto item = [&](int kind) { return text(meta.aItems[kind]); };
    TagFacts& t = f->tags;
    t.title = item(META_TITLE);
    t.artist = item(META_ARTIST);
    t.album = item(META_ALBUM);
    t.albumArtist = text(meta.stAlbumArtist);
    t.genre = item(META_GENRE);
    t.date = item(META_DATE);
    t.comment = item(META_COMMENT);
    t.composer = item(META_COMPOSER);
    const std::string year = item(META_YEAR);
    t.year = year.size() >= 4 ? static_cast<int32_t>(Number(year.substr(0, 4))) : 0;
    SplitNumberPair(item(META_TRACKNUMBER), &t.track, &t.trackTotal);
    static const std::pair<int, const char*> kOthers[] = {
        {META_COPYRIGHT, "copyright"}, {META_LANGUAGE, "language"},  {META_CONDUCTOR, "conductor"},
        {META_PUBLISHER, "publisher"}, {META_FILETYPE, "file_type"}, {META_TIME, "time"},
    };
    for (const auto& other : kOthers) {
        const std::string value = item(other.first);
        if (!value.empty()) t.extra.emplace_back(other.second, value);
    }
    if (meta.pPicture != nullptr) {
        PictureFacts p;
        p.mime = PictureMime(item(META_PICTURE_FORMAT));
        p.size = meta.nPictureSize;
        p.viaContract = true;
        f->pictures.push_back(p);
    }
}

}  // namespace

void SplitNumberPair(const std::string& text, uint32_t* number, uint32_t* total) {
    const size_t slash = text.find('/');
    *number = Number(TrimText(text.substr(0, slash)));
    *total = slash == std::string::npos ? 0 : Number(TrimText(text.substr(slash + 1)));
}

int32_t ContractFacts(const char* path, int type, MediaFacts* f) {
    f->format = MediaTypeName(type);
    _MM_MIMETYPE mime{};
    if (MM_MediaExtractor_GetMIMEType(path, &mime) == MM_OK)
        f->mime = TakeMime(mime.pszMimeType, mime.nMimeLength);
    else
        TakeMime(mime.pszMimeType, 0);
    TakeMime(mime.pszVideoMimeType, 0);
    _MM_CODECTYPE codec{};
    const bool codecOk = MM_MediaExtractor_GetCodecType(path, type, &codec) == MM_OK;
    _MMClipInfo clip{};
    const int32_t clipResult = MM_MediaExtractor_GetClipInfo(path, type, &clip);
    if (clipResult == MM_E_FAIL) return clipResult;
    const bool clipOk = clipResult == MM_OK;
    if (clipOk && clip.nDuration != 0) f->durationUs = static_cast<int64_t>(clip.nDuration) * 1000;
    if (clipOk) f->bitRate = clip.nBitrate;
    AddStreams(clip, codec, clipOk, codecOk, f);
    _MMMetaInfo meta{};
    if (MM_MediaExtractor_GetMetaInfo(path, type, &meta) == MM_OK) AddTags(meta, f);
    MM_MediaExtractor_FreeMetaInfo(&meta);
    return MM_OK;
}

}  // namespace metainfo
