#!/usr/bin/env python3
"""How often `metainfo probe --json` agrees with ffprobe and mutagen.

Makes media files with ffmpeg, lame and sox across containers, codecs and tag encodings, adds
the corpus files, asks metainfo, ffprobe and mutagen about each and counts, field by field, how
often metainfo gives the answer its two peers agree on.
"""
import argparse, base64, concurrent.futures, json, os, re, shutil, subprocess, sys, tempfile

try:
    import mutagen
    import mutagen.id3, mutagen.mp3, mutagen.mp4, mutagen.wave, mutagen.aiff, mutagen.apev2
    import mutagen.flac, mutagen._vorbis
except ImportError:
    mutagen = None

REPO = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))

# The first 80 ID3v1 genres: "(13)" or "13" in a tag names "Pop".
ID3_GENRES = (
    "Blues,Classic Rock,Country,Dance,Disco,Funk,Grunge,Hip-Hop,Jazz,Metal,New Age,Oldies,Other,"
    "Pop,R&B,Rap,Reggae,Rock,Techno,Industrial,Alternative,Ska,Death Metal,Pranks,Soundtrack,"
    "Euro-Techno,Ambient,Trip-Hop,Vocal,Jazz+Funk,Fusion,Trance,Classical,Instrumental,Acid,House,"
    "Game,Sound Clip,Gospel,Noise,AlternRock,Bass,Soul,Punk,Space,Meditative,Instrumental Pop,"
    "Instrumental Rock,Ethnic,Gothic,Darkwave,Techno-Industrial,Electronic,Pop-Folk,Eurodance,Dream,"
    "Southern Rock,Comedy,Cult,Gangsta,Top 40,Christian Rap,Pop/Funk,Jungle,Native American,Cabaret,"
    "New Wave,Psychadelic,Rave,Showtunes,Trailer,Lo-Fi,Tribal,Acid Punk,Acid Jazz,Polka,Retro,"
    "Musical,Rock & Roll,Hard Rock").split(",")

# Tag fields and where each tag type keeps them: ffprobe, ID3, MP4, ASF, Vorbis comment, APE;
# "A|B": the first of the keys there (ffmpeg writes a comment as DESCRIPTION). Only Vorbis
# comments keep a track total apart; the others write "3/10".
TAG_KEYS = {
    "title": ("title", "TIT2", "\xa9nam", "Title", "TITLE", "Title"),
    "artist": ("artist", "TPE1", "\xa9ART", "Author", "ARTIST", "Artist"),
    "album": ("album", "TALB", "\xa9alb", "WM/AlbumTitle", "ALBUM", "Album"),
    "album_artist": ("album_artist", "TPE2", "aART", "WM/AlbumArtist", "ALBUMARTIST",
                     "Album Artist"),
    "genre": ("genre", "TCON", "\xa9gen", "WM/Genre", "GENRE", "Genre"),
    "date": ("date", "TDRC", "\xa9day", "WM/Year", "DATE", "Year"),
    "track": ("track", "TRCK", "trkn", "WM/TrackNumber", "TRACKNUMBER", "Track"),
    "disc": ("disc", "TPOS", "disk", "WM/PartOfSet", "DISCNUMBER", "Disc"),
    "comment": ("comment", "COMM", "\xa9cmt", "Description", "COMMENT|DESCRIPTION", "Comment"),
    "composer": ("composer", "TCOM", "\xa9wrt", "WM/Composer", "COMPOSER", "Composer"),
    "track_total": ("tracktotal", None, None, None, "TRACKTOTAL", None),
}

# Compared fields and how two answers agree: "dur" within 0.5 % or 50 ms; "rate" (bit
# rates) within 1 %, because the peers round differently (ffprobe truncates size*8/duration,
# mutagen averages frame headers, containers declare kbit/s); "fps" within 0.01;
# "num" and "count" equal ("count" keeps 0 as an answer); "str" equal after trimming.
FIELDS = [
    ("duration", "dur"), ("bit_rate", "rate"),
    ("audio.codec", "str"), ("audio.profile", "str"), ("audio.sample_rate", "num"),
    ("audio.channels", "num"), ("audio.bits_per_sample", "num"), ("audio.bit_rate", "rate"),
    ("video.codec", "str"), ("video.width", "num"), ("video.height", "num"),
    ("video.frame_rate", "fps"),
    *[("tags." + f, "str") for f in ("title", "artist", "album", "album_artist", "genre", "date",
                                     "comment", "composer")],
    *[("tags." + f, "num") for f in ("track", "track_total", "disc", "year")],
    ("pictures", "count"),
]

# mutagen's MP4 sample entry names in ffprobe's words (matched on the name's start).
MP4_CODECS = {"mp4a.40": "aac", "mp4a.67": "aac", "mp4a.6b": "mp3", "mp4a.69": "mp3",
              "alac": "alac", "ac-3": "ac3", "ec-3": "eac3", "opus": "opus", "flac": "flac",
              "samr": "amr_nb", "sawb": "amr_wb"}
# mutagen's stream facts by field; its bit rate is the audio stream's, not the file's.
MUTAGEN_INFO = {"duration": "length", "audio.bit_rate": "bitrate", "audio.sample_rate": "sample_rate",
                "audio.channels": "channels", "audio.bits_per_sample": "bits_per_sample"}
AAC_PROFILES = {"1": "Main", "2": "LC", "4": "LTP", "5": "HE-AAC", "29": "HE-AACv2"}


# ---------------------------------------------------------------------------- generation

LATIN, UNI = "Caf\xe9 Ol\xe9", "\xdcn\xefc\xf6d\xe9 \u2603 \u65e5\u672c"


def tag_values(text, genre):
    return {"title": text + " title", "artist": text + " artist", "album": text + " album",
            "album_artist": text + " band", "genre": genre, "date": "2021-06-15", "track": "3/10",
            "disc": "1/2", "comment": text + " comment", "composer": text + " composer"}


def meta_args(text, genre):
    return [a for k, v in tag_values(text, genre).items() for a in ("-metadata", f"{k}={v}")]


# MP3 through lame from a sox sine: rate, channels, seconds, lame options. lame writes its
# Xing/LAME header unless told -t; --resample stops it choosing a rate of its own.
LAME_FILES = [
    (8000, 1, 3.3, "-b 32"), (11025, 2, 0.5, "-b 32"), (16000, 1, 9.6, "-b 64"),
    (22050, 2, 3.3, "-b 64"), (24000, 1, 3.3, "-b 64"), (32000, 2, 9.6, "-b 128"),
    (44100, 2, 3.3, "-b 128"), (48000, 1, 0.5, "-b 128"), (44100, 2, 61, "-b 128"),
    (44100, 2, 3.3, "-b 128 -t"), (8000, 1, 3.3, "-V 4"), (12000, 2, 9.6, "-V 4"),
    (22050, 1, 3.3, "-V 4"), (44100, 2, 9.6, "-V 4"), (48000, 2, 3.3, "-V 4"), (44100, 1, 61, "-V 4")]

# The rest through ffmpeg: file, arguments. A<rate>:<s> is a sine input, V<size>:<fps>:<s> a
# test picture; upper-case words are the option groups in GROUPS; {dir} is the output folder.
# The encoders named after -c:a / -c:v decide whether this ffmpeg can make the file.
FFMPEG_FILES = """
mp3_ffmpeg_44100_2ch_3.3s.mp3      A44100:3.3 -ac 2 -c:a libmp3lame -b:a 192k
adts_8000_1ch_3.3s.aac             A8000:3.3 -ac 1 -c:a aac -f adts
adts_16000_2ch_0.5s.aac            A16000:0.5 -ac 2 -c:a aac -f adts
adts_22050_1ch_9.6s.aac            A22050:9.6 -ac 1 -c:a aac -f adts
adts_32000_2ch_3.3s.aac            A32000:3.3 -ac 2 -c:a aac -f adts
adts_44100_2ch_3.3s.aac            A44100:3.3 -ac 2 -c:a aac -f adts
adts_48000_1ch_61s.aac             A48000:61 -ac 1 -c:a aac -f adts
adts_88200_2ch_3.3s.aac            A88200:3.3 -ac 2 -c:a aac -f adts
m4a_aac_44100_2ch_9.6s.m4a         A44100:9.6 AAC2
m4a_aac_22050_1ch_3.3s.m4a         A22050:3.3 -c:a aac
m4a_aac_48000_2ch_61s.m4a          A48000:61 AAC2
m4a_tags_ffmpeg.m4a                A44100:3.3 -c:a aac TAGS_LATIN
mp4_h264_160x120_25fps_aac.mp4     V160x120:25:3.3 A44100:3.3 H264 AAC2
mp4_h264_176x144_29.97fps_aac.mp4  V176x144:30000/1001:3.3 A44100:3.3 H264 AAC2
mp4_h264_320x240_24fps.mp4         V320x240:24:1 H264
mp4_h264_160x120_15fps_9.6s_aac.mp4  V160x120:15:9.6 A22050:9.6 H264 -c:a aac
mp4_h264_128x96_30fps_0.5s.mp4     V128x96:30:0.5 H264
mp4_mpeg4_160x120_25fps_aac.mp4    V160x120:25:3.3 A48000:3.3 -c:v mpeg4 YUV AAC2
mp4_mpeg4_176x144_29.97fps.mp4     V176x144:30000/1001:3.3 -c:v mpeg4 YUV
mp4_hevc_160x120_25fps_aac.mp4     V160x120:25:1 A44100:1 HEVC AAC2
mp4_av1_160x120_25fps.mp4          V160x120:25:1 AV1 YUV
mp4_vp9_160x120_25fps_opus.mp4     V160x120:25:1 A48000:1 VP9 -c:a libopus
mp4_opus_48000.mp4                 A48000:3.3 -ac 2 -c:a libopus
mp4_flac_44100.mp4                 A44100:3.3 -ac 2 -c:a flac -strict -2
m4a_alac_44100.m4a                 A44100:3.3 -ac 2 -c:a alac
mp4_ac3_48000.mp4                  A48000:3.3 -ac 2 -c:a ac3
mp4_eac3_44100.mp4                 A44100:3.3 -ac 2 -c:a eac3
m4a_fragmented_44100_2ch_9.6s.m4a  A44100:9.6 AAC2 -movflags frag_keyframe+empty_moov
mp4_dash_h264_aac_160x120.mp4      V160x120:25:3.3 A44100:3.3 H264 AAC2 -movflags dash+global_sidx
3gp_h264_176x144_aac.3gp           V176x144:15:3.3 A16000:3.3 H264 -c:a aac
3gp_amrnb_copy.3gp                 -i {dir}/amrnb_raw_9.6s.amr -c copy
3gp_amrnb_encoded.3gp              A8000:9.6 -ac 1 -c:a libopencore_amrnb
wav_pcm_u8_8000_1ch_3.3s.wav       A8000:3.3 -ac 1 -c:a pcm_u8
wav_pcm_s16le_44100_2ch_3.3s.wav   A44100:3.3 -ac 2 -c:a pcm_s16le
wav_pcm_s16le_22050_1ch_0.5s.wav   A22050:0.5 -ac 1 -c:a pcm_s16le
wav_pcm_s24le_48000_2ch_9.6s.wav   A48000:9.6 -ac 2 -c:a pcm_s24le
wav_pcm_s24le_96000_1ch_3.3s.wav   A96000:3.3 -ac 1 -c:a pcm_s24le
wav_pcm_s16le_16000_1ch_61s.wav    A16000:61 -ac 1 -c:a pcm_s16le
wav_adpcm_ms_22050_1ch_3.3s.wav    A22050:3.3 -ac 1 -c:a adpcm_ms
wav_adpcm_ms_44100_2ch_9.6s.wav    A44100:9.6 -ac 2 -c:a adpcm_ms
wav_ima_8000_1ch_3.3s.wav          A8000:3.3 -ac 1 -c:a adpcm_ima_wav
wav_ima_44100_2ch_3.3s.wav         A44100:3.3 -ac 2 -c:a adpcm_ima_wav
wav_info_tags.wav                  A44100:3.3 -c:a pcm_s16le TAGS_LATIN
rf64_s16_44100_2ch_3.3s.wav        A44100:3.3 -ac 2 -c:a pcm_s16le -rf64 always
rf64_s24_48000_1ch_0.5s.wav        A48000:0.5 -c:a pcm_s24le -rf64 always
asf_wmav2_44100_2ch_3.3s.wma       A44100:3.3 -ac 2 -c:a wmav2 TAGS_LATIN
asf_wmav2_22050_1ch_9.6s.wma       A22050:9.6 -c:a wmav2 -metadata title=Short -metadata artist=Someone
asf_wmv2_160x120_25fps.wmv         V160x120:25:3.3 A44100:3.3 -c:v wmv2 YUV -c:a wmav2 TAGS_UNI
avi_mpeg4_mp3_160x120_25fps.avi    V160x120:25:3.3 A44100:3.3 -c:v mpeg4 YUV -c:a libmp3lame -b:a 128k
avi_mpeg4_pcm_176x144_29.97fps.avi  V176x144:30000/1001:9.6 A22050:9.6 -c:v mpeg4 YUV -c:a pcm_s16le
flac_s16_44100_2ch_3.3s.flac       A44100:3.3 -ac 2 -c:a flac
flac_s24_96000_1ch_0.5s.flac       A96000:0.5 -ac 1 -c:a flac -sample_fmt s32
flac_tags_ffmpeg_22050_9.6s.flac   A22050:9.6 -c:a flac TAGS_UNI
flac_s24_96000_2ch_61s.flac        A96000:61 -ac 2 -c:a flac -sample_fmt s32
ogg_vorbis_q10_48000_2ch_61s.ogg   A48000:61 -ac 2 -c:a libvorbis -q:a 10
ogg_vorbis_44100_2ch_9.6s.ogg      A44100:9.6 -ac 2 -c:a libvorbis
ogg_vorbis_tags_ffmpeg.ogg         A22050:3.3 -c:a libvorbis TAGS_LATIN
opus_48000_2ch_9.6s.opus           A48000:9.6 -ac 2 -c:a libopus
opus_16000_1ch_tags_ffmpeg.opus    A16000:3.3 -c:a libopus TAGS_UNI
oggflac_44100_2ch_3.3s.oga         A44100:3.3 -ac 2 -c:a flac -f ogg
oggflac_tags_ffmpeg_48000.oga      A48000:0.5 -c:a flac -f ogg TAGS_UNI
ogv_theora_vorbis_160x120_25fps.ogv  V160x120:25:3.3 A44100:3.3 -c:v libtheora -c:a libvorbis
mkv_h264_aac_160x120_25fps.mkv     V160x120:25:3.3 A44100:3.3 H264 AAC2
mkv_h264_opus_320x240_30fps_61s.mkv  V320x240:30:61 A48000:61 H264 -c:a libopus
mkv_live_h264_aac_9.6s.mkv         V160x120:25:9.6 A44100:9.6 H264 AAC2 -live 1
mkv_hevc_opus_160x120_25fps.mkv    V160x120:25:1 A48000:1 HEVC -c:a libopus
mkv_av1_aac_160x120_25fps.mkv      V160x120:25:1 A44100:1 AV1 YUV AAC2
webm_vp9_opus_160x120_25fps.webm   V160x120:25:1 A48000:1 VP9 -c:a libopus
mkv_tags_cover_29.97fps.mkv        V176x144:30000/1001:3.3 A44100:3.3 H264 AAC2 TAGS_UNI ATTACH_PNG
mka_vorbis_tags.mka                A44100:9.6 -c:a libvorbis TAGS_LATIN
mka_flac_s24_48000.mka             A48000:3.3 -c:a flac -sample_fmt s32
aiff_s16_44100_2ch_3.3s.aiff       A44100:3.3 -ac 2 -c:a pcm_s16be
aiff_s24_96000_1ch_9.6s.aiff       A96000:9.6 -ac 1 -c:a pcm_s24be
aiff_id3_ffmpeg.aiff               A44100:3.3 -c:a pcm_s16be -write_id3v2 1 TAGS_UNI
aifc_f32_48000_2ch_3.3s.aifc       A48000:3.3 -ac 2 -c:a pcm_f32be -f aiff
aifc_alaw_8000_1ch_3.3s.aifc       A8000:3.3 -c:a pcm_alaw -f aiff
"""
GROUPS = {"YUV": ["-pix_fmt", "yuv420p"], "AAC2": ["-c:a", "aac", "-ac", "2"],
          "H264": ["-c:v", "libx264", "-preset", "ultrafast", "-pix_fmt", "yuv420p"],
          "HEVC": ["-c:v", "libx265", "-preset", "ultrafast", "-x265-params", "log-level=error",
                   "-pix_fmt", "yuv420p"],
          "VP9": ["-c:v", "libvpx-vp9", "-deadline", "realtime", "-cpu-used", "8", "-pix_fmt",
                  "yuv420p"],
          "ATTACH_PNG": ["-attach", "{dir}/work/cover.png", "-metadata:s:t", "mimetype=image/png"],
          "TAGS_LATIN": meta_args(LATIN, "Pop"), "TAGS_UNI": meta_args(UNI, "Jazz")}
AV1 = {"libsvtav1": ["-preset", "12"], "libaom-av1": ["-cpu-used", "8"], "librav1e": []}

# Files tagged after they are made: the file made first (lame: rate channels seconds options;
# ffmpeg: as in FFMPEG_FILES), tag writer, text, genre, ID3 version, ID3 text encoding
# (0 ISO-8859-1, 1 UTF-16 with BOM, 2 UTF-16BE, 3 UTF-8), cover, padding.
MP3_BASE = "lame 44100 2 3.3 -b 128"
TAGGED = {
    "id3v23_latin1.mp3": (MP3_BASE, "id3", LATIN, "Rock", 3, 0, None, None),
    "id3v23_utf16.mp3": (MP3_BASE, "id3", UNI, "(13)", 3, 1, None, None),
    "id3v24_utf16be.mp3": (MP3_BASE, "id3", UNI, "Jazz", 4, 2, None, None),
    "id3v24_utf8.mp3": (MP3_BASE, "id3", UNI, "17", 4, 3, None, None),
    "id3v23_png_nopad.mp3": (MP3_BASE, "id3", LATIN, "Pop", 3, 1, "png", 0),
    "id3v24_jpeg_pad4k.mp3": (MP3_BASE, "id3", UNI, "Rock", 4, 3, "jpeg", 4096),
    "id3v24_nopad.mp3": (MP3_BASE, "id3", UNI, "Blues", 4, 3, None, 0),
    "id3v24_png_vbr_48000.mp3": ("lame 48000 2 9.6 -V 2", "id3", UNI, "Pop", 4, 3, "png", None),
    "m4a_tags_cover.m4a": ("ffmpeg A44100:3.3 AAC2", "mp4", UNI, "Jazz", 4, 3, "png", None),
    "m4a_tags_jpeg.m4a": ("ffmpeg A22050:9.6 -c:a aac", "mp4", LATIN, "Rock", 4, 3, "jpeg", None),
    "wav_id3.wav": ("ffmpeg A44100:3.3 -c:a pcm_s16le", "id3", UNI, "Pop", 3, 1, None, None),
    "aiff_id3_cover.aiff": ("ffmpeg A44100:3.3 -c:a pcm_s16be", "id3", UNI, "Jazz", 3, 1, "png",
                            None),
    "flac_after_id3v2.flac": ("ffmpeg A44100:3.3 -c:a flac", "id3", LATIN, "Pop", 4, 3, None, None),
    "flac_vc_cover.flac": ("ffmpeg A44100:3.3 -ac 2 -c:a flac", "vc", UNI, "Jazz", 0, 0, "png",
                           None),
    "flac_s24_vc_48000.flac": ("ffmpeg A48000:9.6 -c:a flac -sample_fmt s32", "vc", LATIN, "Rock",
                               0, 0, None, None),
    "ogg_vorbis_vc_cover.ogg": ("ffmpeg A44100:3.3 -c:a libvorbis", "vc", UNI, "Jazz", 0, 0, "jpeg",
                                None),
    "opus_vc.opus": ("ffmpeg A48000:3.3 -c:a libopus", "vc", LATIN, "Pop", 0, 0, None, None),
    "opus_vc_cover.opus": ("ffmpeg A48000:0.5 -ac 2 -c:a libopus", "vc", UNI, "Rock", 0, 0, "png",
                           None),
    "oggflac_vc_cover.oga": ("ffmpeg A44100:3.3 -c:a flac -f ogg", "vc", UNI, "Blues", 0, 0, "png",
                             None),
    "mp3_ape.mp3": (MP3_BASE, "ape", UNI, "Jazz", 0, 0, "jpeg", None),
    "mp3_ape_id3v1.mp3": (MP3_BASE, "ape", LATIN, "Rock", 1, 0, None, None),
}


def id3v1(values, genre):
    """A 128-byte ID3v1.1 tag of the same values, cut to its field sizes."""
    def text(key, size):
        return values[key].encode("latin-1", "replace")[:size].ljust(size, b"\0")
    return (b"TAG" + text("title", 30) + text("artist", 30) + text("album", 30) +
            values["date"][:4].encode() + text("comment", 28) +
            bytes([0, int(values["track"].split("/")[0]), ID3_GENRES.index(genre)]))


def write_tags(path, covers, kind, text, genre, version, enc, cover, padding):
    """mutagen where present (it chooses text encodings and padding), else ffmpeg's writer.
    kind: "id3", "mp4", "vc" (Vorbis comments: FLAC, Ogg), "ape" (version 1: after an ID3v1)."""
    if mutagen is None:
        if kind == "ape":
            raise RuntimeError("APE tags need mutagen")
        tmp = path + ".tmp" + os.path.splitext(path)[1]
        ver = ["-id3v2_version", str(version)] if kind == "id3" else []
        run(["ffmpeg", "-v", "error", "-y", "-i", path, "-c", "copy", *ver,
             *meta_args(text, genre), tmp], check=True)
        return os.replace(tmp, path)
    values = tag_values(text, genre)
    mime, data = "image/" + (cover or ""), covers.get(cover)
    if kind == "ape":
        tags = mutagen.apev2.APEv2()
        for field, val in values.items():
            tags[TAG_KEYS[field][5]] = val
        if cover:
            tags["Cover Art (Front)"] = mutagen.apev2.APEValue(
                b"cover." + cover.encode() + b"\0" + data, mutagen.apev2.BINARY)
        tags.save(path)
        if version == 1:  # mutagen would put a new APE tag after an ID3v1 tag
            with open(path, "ab") as out:
                out.write(id3v1(values, genre))
        return
    cls = {"mp4": mutagen.mp4.MP4, "vc": mutagen.File}.get(kind) or {
        ".wav": mutagen.wave.WAVE, ".aiff": mutagen.aiff.AIFF, ".mp3": mutagen.mp3.MP3}.get(
        os.path.splitext(path)[1])
    f = cls(path) if cls else None  # else an ID3v2 tag put before the file's own bytes
    if f is not None and f.tags is None:
        f.add_tags()
    if kind == "mp4":
        for field, val in values.items():
            key = TAG_KEYS[field][2]
            f.tags[key] = [tuple(map(int, val.split("/")))] if key in ("trkn", "disk") else [val]
        if cover:
            f.tags["covr"] = [mutagen.mp4.MP4Cover(data, {"png": 14, "jpeg": 13}[cover])]
        return f.save()
    if kind == "vc":
        for field, val in values.items():
            num, _, total = val.partition("/") if field in ("track", "disc") else (val, "", "")
            f.tags[TAG_KEYS[field][4]] = [num]
            if total:
                f.tags[field.upper() + "TOTAL"] = [total]
        if cover:
            pic = mutagen.flac.Picture()
            pic.type, pic.mime, pic.desc, pic.data = 3, mime, "cover", data
            if isinstance(f, mutagen.flac.FLAC):
                f.add_picture(pic)
            else:
                f.tags["METADATA_BLOCK_PICTURE"] = [base64.b64encode(pic.write()).decode()]
        return f.save()
    tags = f.tags if f is not None else mutagen.id3.ID3()
    for field, val in values.items():
        fid = TAG_KEYS[field][1]
        extra = {"lang": "eng", "desc": ""} if fid == "COMM" else {}
        tags.add(getattr(mutagen.id3, fid)(encoding=enc, text=[val], **extra))
    if cover:
        tags.add(mutagen.id3.APIC(encoding=enc, mime=mime, type=3, desc="cover", data=data))
    pad = None if padding is None else (lambda info: padding)
    if f is None:
        return tags.save(path, v2_version=version, padding=pad)
    f.save(v2_version=version, padding=pad)


def lame(name, rate, ch, dur, opts):
    return (name, [["sox", "-n", "-r", str(rate), "-c", str(ch), "-b", "16", "{w}.wav", "synth",
                    str(dur), "sine", "440"],
                   ["lame", "--quiet", "--resample", f"{rate / 1000:g}", *opts.split(), "{w}.wav",
                    "{out}"]], {"sox", "lame"})


def ffmpeg(name, words, groups):
    argv = ["ffmpeg", "-v", "error", "-y"]
    for w in words:
        m = re.fullmatch(r"A(\d+):([\d.]+)|V(\w+):([\d/]+):([\d.]+)", w)
        if m and m.group(1):
            argv += ["-f", "lavfi", "-i", f"sine=f=440:r={m.group(1)}:d={m.group(2)}"]
        elif m:
            argv += ["-f", "lavfi", "-i", "testsrc2=s=%s:r=%s:d=%s" % m.group(3, 4, 5)]
        else:
            argv += groups.get(w, [w])
    needs = {argv[i + 1] for i, a in enumerate(argv[:-1]) if a in ("-c:a", "-c:v")} - {"copy"}
    return name, [argv + ["-threads", "1", "{out}"]], needs | {"ffmpeg"}


def recipes(encoders):
    """(file, commands, programs and encoders they need) for every file to make."""
    av1 = next((e for e in AV1 if e in encoders), "libaom-av1")
    groups = dict(GROUPS, AV1=["-c:v", av1, *AV1[av1]])
    out = [lame(f"mp3_{'vbr' if '-V' in o else 'cbr'}{'_noxing' if '-t' in o else ''}_{r}_{c}ch_"
                f"{d}s.mp3", r, c, d, o) for r, c, d, o in LAME_FILES]
    out += [ffmpeg(row.split()[0], row.split()[1:], groups)
            for row in FFMPEG_FILES.strip().split("\n")]
    for name, (base, *_) in TAGGED.items():
        tool, *words = base.split()
        out.append(ffmpeg(name, words, groups) if tool == "ffmpeg" else
                   lame(name, int(words[0]), words[1], words[2], " ".join(words[3:])))
    out += [(name, [["sox", "-n", *opts.split(), "{out}", "synth", "0.5", "sine", "440"]], {"sox"})
            for name, opts in (("wav_sox_s24_96000_2ch_0.5s.wav", "-r 96000 -c 2 -b 24"),
                               ("aifc_sox_s16_22050_2ch_0.5s.aifc", "-r 22050 -c 2 -b 16"),
                               ("aifc_sox_s8_8000_1ch_0.5s.aifc", "-r 8000 -c 1 -b 8"))]
    return out


def run(argv, check=False, timeout=120):
    r = subprocess.run(argv, stdout=subprocess.PIPE, stderr=subprocess.PIPE, timeout=timeout)
    if check and r.returncode:
        raise RuntimeError(f"{' '.join(argv)}: {r.stderr.decode(errors='replace').strip()[-300:]}")
    return r


def make_one(recipe, folder, covers):
    name, steps, _ = recipe
    out, work = os.path.join(folder, name), os.path.join(folder, "work", name)
    try:
        for step in steps:
            run([a.replace("{out}", out).replace("{w}", work).replace("{dir}", folder)
                 for a in step], check=True)
        if name in TAGGED:
            write_tags(out, covers, *TAGGED[name][1:])
        return out, None
    except Exception as e:  # one recipe failing must not stop the others
        if os.path.exists(out):
            os.remove(out)
        return None, f"{name}: {e}"


def generate(folder, encoders):
    os.makedirs(os.path.join(folder, "work"), exist_ok=True)
    tools = {t for t in ("ffmpeg", "lame", "sox") if shutil.which(t)}
    covers = {}
    for fmt, codec in (("png", "png"), ("jpeg", "mjpeg")):
        path = os.path.join(folder, "work", "cover." + fmt)
        run(["ffmpeg", "-v", "error", "-y", "-f", "lavfi", "-i", "testsrc2=s=32x24", "-frames:v",
             "1", "-update", "1", "-c:v", codec, path])
        covers[fmt] = open(path, "rb").read() if os.path.exists(path) else b""
    amr = os.path.join(folder, "amrnb_raw_9.6s.amr")
    with open(amr, "wb") as f:  # AMR-NB 12.2 kbit/s frames (type 7, quality bit) of silence
        f.write(b"#!AMR\n" + (b"\x3c" + bytes(31)) * 480)
    todo, missing = [], {}
    for rec in recipes(encoders):
        lack = ", ".join(sorted(n for n in rec[2] if n not in tools and n not in encoders))
        if lack:
            missing.setdefault(lack, []).append(rec[0])
        else:
            todo.append(rec)
    for lack, names in sorted(missing.items()):
        print(f"note: {len(names)} files not made, this machine lacks {lack}")
    with concurrent.futures.ThreadPoolExecutor(2) as pool:
        made = list(pool.map(lambda r: make_one(r, folder, covers), todo))
    for _, err in made:
        if err:
            print("note: not made:", err)
    return [amr] + [p for p, _ in made if p]


# ---------------------------------------------------------------------------- the three views

def clean(value, kind):
    """One answer in comparable form; None when the source gives no answer."""
    if value is None or isinstance(value, (dict, list)):
        return None
    if kind == "str":
        return str(value).strip(" \t\r\n\0") or None
    try:
        number = float(str(value).strip(" \0").split("/")[0])
    except ValueError:
        return None
    if number <= 0 and kind != "count":  # a 0 rate, size or duration says "not known"
        return None
    return int(number) if kind in ("num", "count") else number


def rational(text):
    try:
        num, _, den = str(text).partition("/")
        return float(num) / float(den or 1) if float(den or 1) else None
    except ValueError:
        return None


def genre_name(text):
    m = re.fullmatch(r"\(?(\d+)\)?(.*)", (text or "").strip())
    if m and m.group(2):
        return m.group(2)
    if m and int(m.group(1)) < len(ID3_GENRES):
        return ID3_GENRES[int(m.group(1))]
    return text


def tag_fields(raw):
    """Peers' tag texts in metainfo's fields: "3/10" splits into track and total, the
    year comes from the date, numeric ID3 genres become names."""
    out = {"tags." + k: raw.get(k) for k in TAG_KEYS if k not in ("track", "disc")}
    out["tags.genre"] = genre_name(raw.get("genre"))
    for field in ("track", "disc"):
        num, _, tot = str(raw.get(field) or "").partition("/")
        out["tags." + field] = num or None
        if field == "track":
            out["tags.track_total"] = tot or raw.get("track_total")
    year = re.match(r"\s*(\d{4})", str(raw.get("date") or ""))
    out["tags.year"] = year.group(1) if year else None
    return out


def from_metainfo(obj):
    out = {"duration": obj.get("duration"), "bit_rate": obj.get("bit_rate")}
    for part in ("audio", "video", "tags"):
        for key, value in (obj.get(part) or {}).items():
            out[f"{part}.{key}"] = value
    out["pictures"] = None if obj.get("error") else len(obj.get("pictures") or [])
    return out


def from_ffprobe(path):
    try:
        data = json.loads(run(["ffprobe", "-v", "error", "-print_format", "json", "-show_format",
                               "-show_streams", path], timeout=60).stdout or b"{}")
    except (ValueError, subprocess.TimeoutExpired):  # a file ffprobe cannot read answers nothing
        return {}
    fmt, streams = data.get("format") or {}, data.get("streams") or []
    if not fmt:
        return {}
    cover = [s for s in streams if (s.get("disposition") or {}).get("attached_pic")]
    a = next((s for s in streams if s.get("codec_type") == "audio"), {})
    v = next((s for s in streams if s.get("codec_type") == "video" and s not in cover), {})
    profile = a.get("profile")
    out = {"duration": fmt.get("duration"), "bit_rate": fmt.get("bit_rate"),
           "audio.codec": a.get("codec_name"),
           "audio.profile": None if profile in (None, "unknown") else profile,
           "audio.sample_rate": a.get("sample_rate"), "audio.channels": a.get("channels"),
           "audio.bits_per_sample": a.get("bits_per_sample") or a.get("bits_per_raw_sample"),
           "audio.bit_rate": a.get("bit_rate"), "video.codec": v.get("codec_name"),
           "video.width": v.get("width"), "video.height": v.get("height"),
           "video.frame_rate": rational(v.get("avg_frame_rate")) or rational(v.get("r_frame_rate")),
           "pictures": len(cover)}
    tags = {k.lower(): v for k, v in (fmt.get("tags") or a.get("tags") or {}).items()}
    out.update(tag_fields({field: tags.get(keys[0]) for field, keys in TAG_KEYS.items()}))
    return out


def mutagen_tags(tags):
    """(raw tag texts by field, picture count) from ID3, MP4, ASF, Vorbis comment and APE tags."""
    kind = type(tags).__name__

    def pick(get, column):
        return {f: next(filter(None, map(get, k[column].split("|"))), None)
                for f, k in TAG_KEYS.items() if k[column]}
    if isinstance(tags, mutagen.id3.ID3):
        def get(key):
            frames = tags.getall(key)
            if key == "COMM":
                frames = [f for f in frames if not f.desc] or frames
            return str(frames[0].text[0]) if frames and frames[0].text else None
        return pick(get, 1), len(tags.getall("APIC"))
    if kind == "MP4Tags":
        def get(key):
            value = (tags.get(key) or [None])[0]
            return "/".join(map(str, value)) if isinstance(value, tuple) else value
        return pick(get, 2), len(tags.get("covr") or [])
    if kind == "ASFTags":
        def get(key):
            values = tags.get(key) or []
            return str(values[0].value) if values else None
        return pick(get, 3), len(tags.get("WM/Picture") or [])
    if isinstance(tags, mutagen._vorbis.VCommentDict):
        return (pick(lambda key: (tags.get(key) or [None])[0], 4),
                len(tags.get("METADATA_BLOCK_PICTURE") or []))
    if isinstance(tags, mutagen.apev2.APEv2):
        text = {k: str(v) for k, v in tags.items() if v.kind == mutagen.apev2.TEXT}
        return pick(lambda key: text.get(key), 5), sum(
            k.lower().startswith("cover art") for k in tags.keys())
    return {}, None


def from_mutagen(path):
    try:
        f = mutagen.File(path)
    except Exception:  # mutagen refuses damaged files by raising
        return {}
    if f is None:
        return {}
    info, kind = f.info, type(f).__name__
    codec = str(getattr(info, "codec", "")).lower()
    out = {field: getattr(info, name, None) for field, name in MUTAGEN_INFO.items()}
    out["audio.codec"] = {"MP3": f"mp{getattr(info, 'layer', 3)}", "AAC": "aac", "FLAC": "flac",
                          "OggFLAC": "flac", "OggVorbis": "vorbis", "OggOpus": "opus"}.get(
        kind, next((v for k, v in MP4_CODECS.items() if codec.startswith(k)), None))
    if codec.startswith("mp4a.40."):
        out["audio.profile"] = AAC_PROFILES.get(codec.rsplit(".", 1)[1])
    raw, pictures = mutagen_tags(f.tags) if f.tags is not None else ({}, 0)
    if kind == "MP3":  # an APE tag at the end ranks below ID3v2 and above ID3v1, as in TagLib
        try:
            ape, ape_pictures = mutagen_tags(mutagen.apev2.APEv2(path))
            first, then = (ape, raw) if getattr(f.tags, "version", None) == (1, 1) else (raw, ape)
            raw = {k: first.get(k) or then.get(k) for k in TAG_KEYS}
            pictures += ape_pictures
        except mutagen.apev2.error:
            pass
    if kind == "OggTheora":  # mutagen sees the video stream only
        out["audio.bit_rate"], out["video.frame_rate"] = None, info.fps
    out.update(tag_fields(raw))
    out["pictures"] = pictures + len(getattr(f, "pictures", None) or [])
    return out


def run_metainfo(binary, paths):
    """One JSON object per path; a file that stops the batch is asked about alone."""
    found = {}
    for line in run([binary, "probe", "--json", *paths], timeout=600).stdout.splitlines():
        try:
            obj = json.loads(line)
            found[obj.get("path")] = obj
        except ValueError:
            pass
    for path in paths:
        if path not in found:
            r = run([binary, "probe", "--json", path], timeout=60)
            lines = r.stdout.decode(errors="replace").splitlines()
            found[path] = json.loads(lines[0]) if lines else {
                "error": f"no answer (exit {r.returncode})"}
    return {p: from_metainfo(found[p]) for p in paths}, {p: found[p].get("format") for p in paths}


# ---------------------------------------------------------------------------- comparison

def agree(kind, a, b):
    if a is None or b is None:
        return False
    if kind == "dur":
        return abs(a - b) <= max(0.05, 0.005 * max(a, b))
    if kind == "rate":
        return abs(a - b) <= 0.01 * max(a, b)
    if kind == "fps":
        return abs(a - b) <= 0.01
    return a == b


# Which count a file adds to, by how the peers answer and whether metainfo matches one.
TALLY = {("consensus", True): "mi_agrees", ("peers_differ", True): "mi_one",
         ("peers_differ", False): "mi_neither", ("one_peer", True): "mi_agrees_one"}


def compare(paths, views, formats):
    """Per field: files where both peers answer alike (consensus), answer differently, or only
    one answers, and in each how often metainfo matches."""
    table = {f: dict.fromkeys(("consensus", "mi_agrees", "peers_differ", "mi_one", "mi_neither",
                               "one_peer", "mi_agrees_one", "mi_only"), 0) for f, _ in FIELDS}
    misses = []
    for path in paths:
        for field, kind in FIELDS:
            m, f, g = (clean(v.get(path, {}).get(field), kind) for v in views)
            t, peers = table[field], [x for x in (f, g) if x is not None]
            if not peers:
                t["mi_only"] += m is not None
                continue
            group = "one_peer" if len(peers) == 1 else "consensus" if agree(kind, f, g) \
                else "peers_differ"
            ok = any(agree(kind, m, p) for p in peers)
            t[group] += 1
            if (group, ok) in TALLY:
                t[TALLY[group, ok]] += 1
            if not ok:
                fmt = formats.get(path) or os.path.splitext(path)[1].lstrip(".") or "?"
                misses.append({"file": path, "format": fmt, "field": field,
                               "metainfo": m, "ffprobe": f, "mutagen": g})
    for t in table.values():
        t["consensus_pct"] = pct(t["mi_agrees"], t["consensus"])
        t["any_pct"] = pct(t["mi_agrees"] + t["mi_one"] + t["mi_agrees_one"],
                           t["consensus"] + t["peers_differ"] + t["one_peer"])
    return table, misses


def pct(part, whole):
    return round(100.0 * part / whole, 1) if whole else None


def print_table(table, overall, misses):
    cols = ("consensus", "mi_agrees", "consensus_pct", "peers_differ", "mi_one", "mi_neither",
            "one_peer", "mi_agrees_one", "any_pct", "mi_only")
    print("%-22s %9s %6s %6s | %6s %6s %7s | %6s %6s | %6s %7s" % (
        "field", "consensus", "mi ok", "%", "differ", "mi=one", "mi=none", "1 peer", "mi ok", "any %",
        "mi only"))
    for field, t in table.items():
        print("%-22s %9s %6s %6s | %6s %6s %7s | %6s %6s | %6s %7s" % (
            field, *("-" if t[c] is None else t[c] for c in cols)))
    print(f"overall consensus agreement: {'-' if overall is None else overall} %")
    print("disagreements by field and format:")
    for field in table:
        counts = {}
        for d in (d for d in misses if d["field"] == field):
            counts[d["format"]] = counts.get(d["format"], 0) + 1
        if counts:
            print(f"  {field}: " + ", ".join(
                f"{k} {v}" for k, v in sorted(counts.items(), key=lambda kv: -kv[1])))


def media_files(extra):
    """Every file under the given files and folders, but the corpus notes: ffprobe would
    read their prose as a text video."""
    for top in extra:
        walk = [(os.path.dirname(top), [], [os.path.basename(top)])] if os.path.isfile(top) else \
            sorted(os.walk(top))
        for root, _, files in walk:
            yield from (os.path.abspath(os.path.join(root, n)) for n in sorted(files)
                        if not n.endswith(".md"))


def main():
    ap = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    ap.add_argument("--metainfo", default=os.environ.get("METAINFO_BIN"))
    ap.add_argument("--corpus", action="append", help="more files or folders; default "
                    "../shared/corpus beside the repository when it is there")
    ap.add_argument("--keep", help="make the files in this folder and keep them")
    ap.add_argument("--no-generate", action="store_true", help="only the corpus files")
    ap.add_argument("--list-disagreements", action="store_true")
    ap.add_argument("--min-agreement", type=float, metavar="P")
    ap.add_argument("--json", metavar="OUT", help="write the table and disagreements here")
    args = ap.parse_args()
    if not args.metainfo or not os.access(args.metainfo, os.X_OK):
        sys.exit("agreement.py: give the metainfo program with --metainfo BIN or METAINFO_BIN")
    peers = [p for p, there in (("ffprobe", shutil.which("ffprobe")), ("mutagen", mutagen)) if there]
    if "ffprobe" not in peers:
        print("SKIP: ffprobe not found")
    if "mutagen" not in peers:
        print("SKIP: mutagen not installed (Debian python3-mutagen)")
    if len(peers) == 1:
        print(f"only {peers[0]} answers: metainfo is compared with it alone")
    if not peers:
        return 0

    folder = args.keep or tempfile.mkdtemp(prefix="metainfo-agreement-")
    paths = []
    try:
        if not args.no_generate and shutil.which("ffmpeg"):
            lines = run(["ffmpeg", "-hide_banner", "-encoders"]).stdout.decode().splitlines()
            encoders = {ln.split()[1] for ln in lines if re.match(r" [VAS][A-Z.]{5} \S", ln)}
            paths += generate(os.path.abspath(folder), encoders)
        elif not args.no_generate:
            print("note: ffmpeg not found, no files made")
        default = os.path.join(REPO, "..", "shared", "corpus")
        paths += media_files(args.corpus or ([default] if os.path.isdir(default) else []))
        if not paths:
            print("SKIP: no media files to compare")
            return 0
        mi, formats = run_metainfo(args.metainfo, paths)
        with concurrent.futures.ThreadPoolExecutor(2) as pool:
            ff = dict(zip(paths, pool.map(from_ffprobe, paths))) if "ffprobe" in peers else {}
        mu = {p: from_mutagen(p) for p in paths} if mutagen else {}
    finally:
        if not args.keep:
            shutil.rmtree(folder, ignore_errors=True)

    table, misses = compare(paths, (mi, ff, mu), formats)
    overall = pct(sum(t["mi_agrees"] for t in table.values()),
                  sum(t["consensus"] for t in table.values()))
    print(f"{len(paths)} files; peers: {', '.join(peers)}")
    print_table(table, overall, misses)
    if args.list_disagreements:
        for d in misses:
            print("DIFF %(file)s  %(field)s  metainfo=%(metainfo)r ffprobe=%(ffprobe)r "
                  "mutagen=%(mutagen)r" % d)
    if args.json:
        with open(args.json, "w") as f:
            json.dump({"files": len(paths), "peers": peers, "fields": table,
                       "overall_consensus_pct": overall, "disagreements": misses}, f, indent=1)
    if args.min_agreement is None:
        return 0
    # Judged where both peers answer and agree; a field no file gives a consensus on (video:
    # mutagen does not see it) is shown in the table but not judged.
    low = [(f, t["consensus_pct"]) for f, t in table.items() if t["consensus"]]
    low = [(f, p) for f, p in low if p is not None and p < args.min_agreement]
    for field, p in low:
        print(f"FAIL: {field} agreement {p:.1f} % is below {args.min_agreement:g} %")
    return 1 if low else 0


if __name__ == "__main__":
    sys.exit(main())
