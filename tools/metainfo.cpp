// metainfo: what the library reports for media files.
//
//   metainfo probe [--json] FILE...
//   metainfo cut FILE START END OUT
//   metainfo frames FILE [--stream N] [--seek MS]
//   metainfo maker FILE [--thumbnail OUT]
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "cut_command.h"
#include "frames_command.h"
#include "maker_command.h"
#include "probe_format.h"

namespace {

struct Report {
    std::string path;
    int32_t detectResult = MM_E_FAIL;
    int type = MEDIA_TYPE_UNKNOWN;
    int32_t checkResult = 0;
    int32_t trackResult = 0;
    int mask = 0;
    int32_t codecResult = 0;
    _MM_CODECTYPE codec{};
    int32_t mimeResult = 0;
    std::string mime;
    std::string videoMime;
    int32_t clipResult = 0;
    _MMClipInfo clip{};
    int32_t metaResult = 0;
    _MMMetaInfo meta{};
};

const char* CodecName(uint32_t code) {
    for (const MM_CodecName& row : codecinfo) {
        if (row.code == code) return row.name;
    }
    return nullptr;
}

std::string TakeString(char* s, uint32_t length) {
    std::string out = s != nullptr ? std::string(s, strnlen(s, length)) : std::string();
    MM_MediaExtractor_FreeBuffer(s);
    return out;
}

Report Probe(const char* path) {
    Report r;
    r.path = path;
    r.detectResult = MM_MediaExtractor_DetectMediaType(path, &r.type);
    if (r.detectResult != MM_OK) return r;
    r.checkResult = MM_MediaExtractor_CheckMediaType(path);
    r.trackResult = MM_MediaExtractor_GetTrackType(path, r.type, &r.mask);
    r.codecResult = MM_MediaExtractor_GetCodecType(path, r.type, &r.codec);
    _MM_MIMETYPE mime{};
    r.mimeResult = MM_MediaExtractor_GetMIMEType(path, &mime);
    r.mime = TakeString(mime.pszMimeType, mime.nMimeLength);
    r.videoMime = TakeString(mime.pszVideoMimeType, mime.nVideoMimeLength);
    r.clipResult = MM_MediaExtractor_GetClipInfo(path, r.type, &r.clip);
    r.metaResult = MM_MediaExtractor_GetMetaInfo(path, r.type, &r.meta);
    return r;
}

std::string Status(int32_t result) { return result == MM_OK ? "ok" : probe::ResultText(result); }

std::string CodecText(uint32_t code) {
    const char* name = CodecName(code);
    return std::string(name != nullptr ? name : "?") + " (" + probe::ResultText(static_cast<int32_t>(code)) + ")";
}

void PrintCodecField(const char* label, uint32_t code) {
    if (code != 0) std::printf("    %-14s %s\n", label, CodecText(code).c_str());
}

void PrintText(const Report& r) {
    std::printf("%s\n", r.path.c_str());
    if (r.detectResult != MM_OK) {
        std::printf("  media type: not probed (%s)\n", probe::ResultText(r.detectResult).c_str());
        return;
    }
    std::printf("  media type: %d (%s)\n", r.type, probe::MediaTypeName(r.type));
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
    if (r.clipResult == MM_OK) {
        const _MMClipInfo& c = r.clip;
        std::printf("    format %s, size %u, duration %u ms, bit rate %u\n", c.szFormat, c.nFileSize, c.nDuration,
                    c.nBitrate);
        if (c.bHasAudio) {
            std::printf("    audio x%u: %u Hz, %u ch, %u bits, %u samples/frame, %u bit/s\n", c.bHasAudio,
                        c.nSampleRate, c.nChannels, c.nBitsPerSample, c.nSamplesPerFrame, c.nAudioBitrate);
        }
        if (c.bHasVideo) {
            std::printf("    video x%u: %ux%u, %u fps, %u bit/s\n", c.bHasVideo, c.nWidth, c.nHeight, c.nFrameRate,
                        c.nVideoBitrate);
        }
        if (c.nReserved1 != 0) std::printf("    creation time %u\n", c.nReserved1);
    }
    std::printf("  metadata: %s\n", Status(r.metaResult).c_str());
    if (r.metaResult == MM_OK) {
        for (int k = 0; k < MM_META_ITEMS; ++k) {
            if (r.meta.aItems[k].nLength == 0) continue;
            std::printf("    %-12s %s\n", probe::MetaItemName(k), probe::DecodeItemText(r.meta.aItems[k]).c_str());
        }
        if (r.meta.stAlbumArtist.nLength != 0) {
            std::printf("    %-12s %s\n", "album_artist", probe::DecodeItemText(r.meta.stAlbumArtist).c_str());
        }
        if (r.meta.nRating != 0) std::printf("    %-12s %u\n", "rating", r.meta.nRating);
        if (r.meta.nPlayCount != 0) std::printf("    %-12s %u\n", "play_count", r.meta.nPlayCount);
        if (r.meta.pPicture != nullptr) std::printf("    %-12s %u bytes\n", "picture", r.meta.nPictureSize);
    }
}

void JsonField(std::string* out, const char* key, const std::string& jsonValue) {
    if (out->back() != '{') *out += ",";
    *out += probe::JsonString(key) + ":" + jsonValue;
}

void JsonNumber(std::string* out, const char* key, unsigned long long value) {
    JsonField(out, key, std::to_string(value));
}

void JsonCodec(std::string* out, const char* key, uint32_t code) {
    if (code == 0) return;
    const char* name = CodecName(code);
    JsonField(out, key, probe::JsonString(name != nullptr ? name : probe::ResultText(static_cast<int32_t>(code))));
}

std::string JsonSection(int32_t result) {
    std::string s = "{";
    JsonField(&s, "result", probe::JsonString(probe::ResultText(result)));
    return s;
}

void PrintJson(const Report& r) {
    std::string out = "{";
    JsonField(&out, "filename", probe::JsonString(r.path));
    JsonField(&out, "probe_result", probe::JsonString(probe::ResultText(r.detectResult)));
    if (r.detectResult == MM_OK) {
        JsonNumber(&out, "media_type", static_cast<unsigned>(r.type));
        JsonField(&out, "format_name", probe::JsonString(probe::MediaTypeName(r.type)));
        JsonField(&out, "extension_check", probe::JsonString(probe::ResultText(r.checkResult)));

        std::string tracks = JsonSection(r.trackResult);
        if (r.trackResult == MM_OK) {
            JsonField(&tracks, "audio", (r.mask & TRACK_AUDIO) ? "true" : "false");
            JsonField(&tracks, "video", (r.mask & TRACK_VIDEO) ? "true" : "false");
        }
        JsonField(&out, "tracks", tracks + "}");

        std::string codec = JsonSection(r.codecResult);
        if (r.codecResult == MM_OK) {
            JsonCodec(&codec, "audio_codec_name", r.codec.nAudioCodec);
            JsonCodec(&codec, "audio_profile", r.codec.nAudioProfile);
            JsonCodec(&codec, "audio_subtype", r.codec.nAudioSubType);
            JsonCodec(&codec, "video_codec_name", r.codec.nVideoCodec);
            JsonCodec(&codec, "video_profile", r.codec.nVideoProfile);
            JsonCodec(&codec, "video_level", r.codec.nVideoLevel);
        }
        JsonField(&out, "codec", codec + "}");

        std::string mime = JsonSection(r.mimeResult);
        if (!r.mime.empty()) JsonField(&mime, "mime_type", probe::JsonString(r.mime));
        if (!r.videoMime.empty()) JsonField(&mime, "video_mime_type", probe::JsonString(r.videoMime));
        JsonField(&out, "mime", mime + "}");

        std::string format = JsonSection(r.clipResult);
        if (r.clipResult == MM_OK) {
            const _MMClipInfo& c = r.clip;
            JsonField(&format, "format_name", probe::JsonString(c.szFormat));
            JsonNumber(&format, "size", c.nFileSize);
            JsonNumber(&format, "duration_ms", c.nDuration);
            JsonNumber(&format, "bit_rate", c.nBitrate);
            JsonNumber(&format, "nb_audio_streams", c.bHasAudio);
            JsonNumber(&format, "nb_video_streams", c.bHasVideo);
            JsonNumber(&format, "audio_bit_rate", c.nAudioBitrate);
            JsonNumber(&format, "sample_rate", c.nSampleRate);
            JsonNumber(&format, "channels", c.nChannels);
            JsonNumber(&format, "bits_per_sample", c.nBitsPerSample);
            JsonNumber(&format, "samples_per_frame", c.nSamplesPerFrame);
            JsonNumber(&format, "video_bit_rate", c.nVideoBitrate);
            JsonNumber(&format, "width", c.nWidth);
            JsonNumber(&format, "height", c.nHeight);
            JsonNumber(&format, "frame_rate", c.nFrameRate);
            JsonNumber(&format, "creation_time", c.nReserved1);
        }
        JsonField(&out, "format", format + "}");

        std::string tags = JsonSection(r.metaResult);
        if (r.metaResult == MM_OK) {
            for (int k = 0; k < MM_META_ITEMS; ++k) {
                if (r.meta.aItems[k].nLength == 0) continue;
                JsonField(&tags, probe::MetaItemName(k), probe::JsonString(probe::DecodeItemText(r.meta.aItems[k])));
            }
            if (r.meta.stAlbumArtist.nLength != 0) {
                JsonField(&tags, "album_artist", probe::JsonString(probe::DecodeItemText(r.meta.stAlbumArtist)));
            }
            if (r.meta.nRating != 0) JsonNumber(&tags, "rating", r.meta.nRating);
            if (r.meta.nPlayCount != 0) JsonNumber(&tags, "play_count", r.meta.nPlayCount);
            if (r.meta.pPicture != nullptr) JsonNumber(&tags, "picture_size", r.meta.nPictureSize);
        }
        JsonField(&out, "tags", tags + "}");
    }
    out += "}";
    std::printf("%s\n", out.c_str());
}

int Usage() {
    std::fprintf(stderr, "usage: metainfo probe [--json] FILE...\n"
                         "       metainfo cut FILE START END OUT\n"
                         "       metainfo frames FILE [--stream N] [--seek MS]\n"
                         "       metainfo maker FILE [--thumbnail OUT]\n");
    return 2;
}

int ProbeCommand(int argc, char** argv) {
    bool json = false;
    std::vector<const char*> files;
    for (int i = 0; i < argc; ++i) {
        if (std::strcmp(argv[i], "--json") == 0) {
            json = true;
        } else {
            files.push_back(argv[i]);
        }
    }
    if (files.empty()) return Usage();
    int status = 0;
    for (const char* file : files) {
        Report r = Probe(file);
        if (json) {
            PrintJson(r);
        } else {
            PrintText(r);
        }
        MM_MediaExtractor_FreeMetaInfo(&r.meta);
        if (r.detectResult != MM_OK) status = 1;
    }
    return status;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 2) return Usage();
    if (std::strcmp(argv[1], "probe") == 0) return ProbeCommand(argc - 2, argv + 2);
    if (std::strcmp(argv[1], "cut") == 0) return probe::CutCommand(argc - 2, argv + 2);
    if (std::strcmp(argv[1], "frames") == 0) return probe::FramesCommand(argc - 2, argv + 2);
    if (std::strcmp(argv[1], "maker") == 0) return probe::MakerCommand(argc - 2, argv + 2);
    return Usage();
}
