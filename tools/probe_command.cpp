#include "probe_command.h"

#include <cstdio>
#include <cstring>

#include "probe/codec_names.h"
#include "file_problem.h"
#include "probe_format.h"
#include "probe_json.h"

namespace probe {
namespace {

std::string TakeString(char* s, uint32_t length) {
    std::string out = s != nullptr ? std::string(s, strnlen(s, length)) : std::string();
    MM_MediaExtractor_FreeBuffer(s);
    return out;
}

std::string TakeBuffer(unsigned char* data, uint32_t size) {
    std::string out = data != nullptr ? std::string(reinterpret_cast<const char*>(data), size) : std::string();
    MM_MediaExtractor_FreeBuffer(data);
    return out;
}

void ProbeMaker(const std::string& path, Report* r) {
    _MAKERINFO maker;
    std::memset(&maker, 0, sizeof maker);
    r->makerResult = MM_MediaExtractor_GetMakerInfo(path.c_str(), &maker);
    if (r->makerResult == MM_OK && maker.nValid == 0) r->makerResult = MM_E_FAIL;
    r->phoneModel = TakeBuffer(maker.pPhoneModel, maker.nPhoneModelSize);
    r->smartAlbum = TakeBuffer(maker.pSmartAlbum, maker.nSmartAlbumSize);
    r->thumbnailSize = maker.pThumbnail != nullptr ? maker.nThumbnailSize : 0;
    MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
}

std::string Status(int32_t result) { return result == MM_OK ? "ok" : ResultText(result); }

std::string CodecText(uint32_t code) {
    const char* name = metainfo::CodecCodeName(code);
    return std::string(name != nullptr ? name : "?") + " (" + ResultText(static_cast<int32_t>(code)) + ")";
}

void PrintCodecField(const char* label, uint32_t code) {
    if (code != 0) std::printf("    %-14s %s\n", label, CodecText(code).c_str());
}

void PrintClip(const _MMClipInfo& c) {
    std::printf("    format %s, size %u, duration %u ms, bit rate %u\n", c.szFormat, c.nFileSize, c.nDuration,
                c.nBitrate);
    if (c.bHasAudio) {
        std::printf("    audio x%u: %u Hz, %u ch, %u bits, %u samples/frame, %u bit/s\n", c.bHasAudio, c.nSampleRate,
                    c.nChannels, c.nBitsPerSample, c.nSamplesPerFrame, c.nAudioBitrate);
    }
    if (c.bHasVideo) {
        std::printf("    video x%u: %ux%u, %u fps, %u bit/s\n", c.bHasVideo, c.nWidth, c.nHeight, c.nFrameRate,
                    c.nVideoBitrate);
    }
    if (c.nReserved1 != 0) std::printf("    creation time %u\n", c.nReserved1);
}

void PrintMeta(const _MMMetaInfo& meta) {
    for (int k = 0; k < MM_META_ITEMS; ++k) {
        if (meta.aItems[k].nLength == 0) continue;
        std::printf("    %-12s %s\n", MetaItemName(k), DecodeItemText(meta.aItems[k]).c_str());
    }
    if (meta.stAlbumArtist.nLength != 0) {
        std::printf("    %-12s %s\n", "album_artist", DecodeItemText(meta.stAlbumArtist).c_str());
    }
    if (meta.nRating != 0) std::printf("    %-12s %u\n", "rating", meta.nRating);
    if (meta.nPlayCount != 0) std::printf("    %-12s %u\n", "play_count", meta.nPlayCount);
    if (meta.pPicture != nullptr) std::printf("    %-12s %u bytes\n", "picture", meta.nPictureSize);
}

void PrintStream(const mi_stream& s) {
    const char* codec = s.codec != nullptr ? s.codec : "?";
    if (s.kind == MI_STREAM_VIDEO) {
        std::printf("    video %s%s%s, %ux%u", codec, s.profile != nullptr ? " " : "",
                    s.profile != nullptr ? s.profile : "", s.width, s.height);
        if (s.frame_rate_den != 0) std::printf(", %.3f fps", static_cast<double>(s.frame_rate_num) / s.frame_rate_den);
    } else {
        std::printf("    audio %s%s%s", codec, s.profile != nullptr ? " " : "", s.profile != nullptr ? s.profile : "");
        // MIDI and other event streams have neither.
        if (s.sample_rate != 0) std::printf(", %u Hz", s.sample_rate);
        if (s.channels != 0) std::printf(", %u ch", s.channels);
        if (s.bits_per_sample != 0) std::printf(", %u bits", s.bits_per_sample);
    }
    if (s.bit_rate != 0) std::printf(", %llu bit/s", static_cast<unsigned long long>(s.bit_rate));
    std::printf("\n");
}

// The accurate answers: what the file holds.
void PrintAccurate(const mi_info& info) {
    std::printf("  %s", info.format != nullptr ? info.format : "?");
    if (info.mime != nullptr) std::printf(" (%s)", info.mime);
    if (info.duration_ms >= 0) {
        std::printf(", %.3f s%s", static_cast<double>(info.duration_ms) / 1000.0,
                    info.duration_exact != 0 ? "" : " (estimated)");
    }
    if (info.bit_rate != 0) std::printf(", %llu bit/s", static_cast<unsigned long long>(info.bit_rate));
    std::printf("\n");
    for (size_t i = 0; i < info.stream_count; ++i) PrintStream(info.streams[i]);
    const std::pair<const char*, const char*> texts[] = {
        {"title", info.title}, {"artist", info.artist}, {"album", info.album},     {"album artist", info.album_artist},
        {"genre", info.genre}, {"date", info.date},     {"comment", info.comment}, {"composer", info.composer},
    };
    for (const auto& t : texts) {
        if (t.second != nullptr) std::printf("    %-12s %s\n", t.first, t.second);
    }
    if (info.track != 0) std::printf("    %-12s %u/%u\n", "track", info.track, info.track_total);
    if (info.disc != 0) std::printf("    %-12s %u/%u\n", "disc", info.disc, info.disc_total);
    for (size_t i = 0; i < info.tag_count; ++i) std::printf("    %-12s %s\n", info.tags[i].key, info.tags[i].value);
    for (size_t i = 0; i < info.picture_count; ++i) {
        const mi_picture& p = info.pictures[i];
        std::printf("    picture %zu: %s, %llu bytes\n", i, p.mime != nullptr ? p.mime : "?",
                    static_cast<unsigned long long>(p.size));
    }
}

void PrintCsvRow(const std::vector<std::string>& row) {
    std::string line;
    for (size_t i = 0; i < row.size(); ++i) line += (i == 0 ? "" : ",") + CsvField(row[i]);
    std::printf("%s\r\n", line.c_str());
}

}  // namespace

Report::~Report() {
    MM_MediaExtractor_FreeMetaInfo(&meta);
    mi_info_free(info);
}

void Probe(const std::string& path, Report* r) {
    r->path = path;
    r->problem = FileProblem(path, &r->size);
    if (!r->problem.empty()) return;
    const char* p = path.c_str();
    r->infoResult = mi_probe(p, &r->info);
    r->detectResult = MM_MediaExtractor_DetectMediaType(p, &r->type);
    if (r->detectResult != MM_OK || r->type == MEDIA_TYPE_UNKNOWN) {
        // A type only the accurate interface reads (RF64) is still probed.
        if (r->infoResult == MI_OK) return;
        r->problem =
            "not a media file (" + (r->detectResult != MM_OK ? ResultText(r->detectResult) : "no known type") + ")";
        return;
    }
    r->probed = true;
    r->checkResult = MM_MediaExtractor_CheckMediaType(p);
    r->trackResult = MM_MediaExtractor_GetTrackType(p, r->type, &r->mask);
    r->codecResult = MM_MediaExtractor_GetCodecType(p, r->type, &r->codec);
    _MM_MIMETYPE mime{};
    r->mimeResult = MM_MediaExtractor_GetMIMEType(p, &mime);
    r->mime = TakeString(mime.pszMimeType, mime.nMimeLength);
    r->videoMime = TakeString(mime.pszVideoMimeType, mime.nVideoMimeLength);
    r->clipResult = MM_MediaExtractor_GetClipInfo(p, r->type, &r->clip);
    r->metaResult = MM_MediaExtractor_GetMetaInfo(p, r->type, &r->meta);
    if (r->type == MEDIA_TYPE_MP4) ProbeMaker(path, r);
    // A failure (rather than "unsupported") of the clip information of a file
    // whose type was recognised means its structure breaks off or is broken.
    if (r->clipResult == MM_E_FAIL)
        r->problem = "damaged or truncated (clip information " + ResultText(r->clipResult) + ")";
    // What the accurate interface cannot read on its own is reported too.
    if (r->problem.empty() && r->infoResult != MI_OK) r->problem = mi_result_text(r->infoResult);
}

void PrintText(const Report& r) {
    std::printf("%s\n", r.path.c_str());
    if (r.info != nullptr) PrintAccurate(*r.info);
    if (!r.probed) return;
    std::printf("  exact answers:\n");
    std::printf("  media type: %d (%s)\n", r.type, metainfo::MediaTypeName(r.type));
    std::printf("  extension check: %s\n", Status(r.checkResult).c_str());
    std::printf("  track type: %s", Status(r.trackResult).c_str());
    if (r.trackResult == MM_OK) {
        std::printf(" [%s%s]", (r.mask & TRACK_AUDIO) ? "audio" : "",
                    (r.mask & TRACK_VIDEO) ? ((r.mask & TRACK_AUDIO) ? " video" : "video") : "");
    }
    std::printf("\n  codec: %s\n", Status(r.codecResult).c_str());
    if (r.codecResult == MM_OK) {
        PrintCodecField("audio codec", r.codec.nAudioCodec);
        PrintCodecField("audio profile", r.codec.nAudioProfile);
        PrintCodecField("audio subtype", r.codec.nAudioSubType);
        PrintCodecField("video codec", r.codec.nVideoCodec);
        PrintCodecField("video profile", r.codec.nVideoProfile);
        PrintCodecField("video level", r.codec.nVideoLevel);
    }
    std::printf("  mime: %s", Status(r.mimeResult).c_str());
    if (!r.mime.empty()) std::printf(" %s", r.mime.c_str());
    if (!r.videoMime.empty()) std::printf(" (video %s)", r.videoMime.c_str());
    std::printf("\n  clip: %s\n", Status(r.clipResult).c_str());
    if (r.clipResult == MM_OK) PrintClip(r.clip);
    std::printf("  metadata: %s\n", Status(r.metaResult).c_str());
    if (r.metaResult == MM_OK) PrintMeta(r.meta);
}

ProbePrinter::ProbePrinter(Output output) : output_(output) {
    if (output_ == Output::kCsv) PrintCsvRow(CsvColumns());
}

bool ProbePrinter::Print(const std::string& path) {
    Report r;
    Probe(path, &r);
    if (!r.problem.empty()) std::fprintf(stderr, "metainfo: %s: %s\n", path.c_str(), r.problem.c_str());
    switch (output_) {
        case Output::kJson:
            std::printf("%s\n", ReportJson(r).dump(-1, ' ', false, Json::error_handler_t::replace).c_str());
            break;
        case Output::kCsv: PrintCsvRow(CsvRow(ReportJson(r))); break;
        case Output::kText:
            if (r.probed || r.info != nullptr) PrintText(r);
            break;
    }
    std::fflush(stdout);
    return r.problem.empty();
}

}  // namespace probe
