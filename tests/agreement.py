#!/usr/bin/env python3
"""How often `metainfo probe --json` agrees with ffprobe and mutagen.

Makes media files with ffmpeg, lame and sox across containers, codecs and tag
encodings, adds every file of the corpus folder, asks metainfo, ffprobe and
mutagen about each one and counts, field by field, how often metainfo gives
the answer its two peers agree on.

  tests/agreement.py --metainfo build/metainfo [--corpus DIR] [--keep DIR]
      [--list-disagreements] [--min-agreement P] [--json OUT] [--no-generate]
"""
import argparse
import concurrent.futures
import json
import os
import re
import shutil
import subprocess
import sys
import tempfile

try:
    import mutagen
    import mutagen.id3
    import mutagen.mp4
    import mutagen.wave
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

# Tag fields and where each tag type keeps them: ffprobe, ID3, MP4, ASF, Vorbis comment.
TAG_KEYS = {
    "title": ("title", "TIT2", "\xa9nam", "Title", "title"),
    "artist": ("artist", "TPE1", "\xa9ART", "Author", "artist"),
    "album": ("album", "TALB", "\xa9alb", "WM/AlbumTitle", "album"),
    "album_artist": ("album_artist", "TPE2", "aART", "WM/AlbumArtist", "albumartist"),
    "genre": ("genre", "TCON", "\xa9gen", "WM/Genre", "genre"),
    "date": ("date", "TDRC", "\xa9day", "WM/Year", "date"),
    "track": ("track", "TRCK", "trkn", "WM/TrackNumber", "tracknumber"),
    "disc": ("disc", "TPOS", "disk", "WM/PartOfSet", "discnumber"),
    "comment": ("comment", "COMM", "\xa9cmt", "Description", "comment"),
    "composer": ("composer", "TCOM", "\xa9wrt", "WM/Composer", "composer"),
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
KIND = dict(FIELDS)

# mutagen's MP4 sample entry names in ffprobe's words (matched on the name's start).
MP4_CODECS = {"mp4a.40": "aac", "mp4a.67": "aac", "mp4a.6b": "mp3", "mp4a.69": "mp3",
              "alac": "alac", "ac-3": "ac3", "ec-3": "eac3", "opus": "opus", "flac": "flac",
              "samr": "amr_nb", "sawb": "amr_wb"}
AAC_PROFILES = {"1": "Main", "2": "LC", "4": "LTP", "5": "HE-AAC", "29": "HE-AACv2"}


# ---------------------------------------------------------------------------- generation

def tag_values(text, genre):
    return {"title": text + " title", "artist": text + " artist", "album": text + " album",
            "album_artist": text + " band", "genre": genre, "date": "2021-06-15",
            "track": "3/10", "disc": "1/2", "comment": text + " comment",
            "composer": text + " composer"}


def meta_args(text, genre):
    return [a for k, v in tag_values(text, genre).items() for a in ("-metadata", f"{k}={v}")]


def fill_id3(tags, enc, text, genre, cover, covers):
    for field, val in tag_values(text, genre).items():
        fid = TAG_KEYS[field][1]
        extra = {"lang": "eng", "desc": ""} if fid == "COMM" else {}
        tags.add(getattr(mutagen.id3, fid)(encoding=enc, text=[val], **extra))
    if cover:
        tags.add(mutagen.id3.APIC(encoding=enc, mime="image/" + cover, type=3, desc="cover",
                                  data=covers[cover]))


def tagger(kind, text, genre, version=4, enc=3, cover=None, padding=None):
    """A step that tags a made file: mutagen where present (it chooses text encodings and
    padding), else ffmpeg's own metadata writer."""
    def post(path, covers):
        if mutagen is None:
            tmp = path + ".tmp" + os.path.splitext(path)[1]
            ver = ["-id3v2_version", str(version)] if kind != "mp4" else []
            run(["ffmpeg", "-v", "error", "-y", "-i", path, "-c", "copy", *ver,
                 *meta_args(text, genre), tmp], check=True)
            os.replace(tmp, path)
        elif kind == "mp4":
            f = mutagen.mp4.MP4(path)
            if f.tags is None:
                f.add_tags()
            for field, val in tag_values(text, genre).items():
                key = TAG_KEYS[field][2]
                f.tags[key] = [tuple(map(int, val.split("/")))] if "/" in val else [val]
            if cover:
                fmt = mutagen.mp4.MP4Cover.FORMAT_PNG if cover == "png" else \
                    mutagen.mp4.MP4Cover.FORMAT_JPEG
                f.tags["covr"] = [mutagen.mp4.MP4Cover(covers[cover], fmt)]
            f.save()
        else:
            pad = None if padding is None else (lambda info: padding)
            if kind == "wav":
                f = mutagen.wave.WAVE(path)
                f.add_tags()
                fill_id3(f.tags, enc, text, genre, cover, covers)
                f.save(v2_version=version, padding=pad)
            else:
                tags = mutagen.id3.ID3()
                fill_id3(tags, enc, text, genre, cover, covers)
                tags.save(path, v2_version=version, padding=pad)
    return post


def ff(*args):
    return [["ffmpeg", "-v", "error", "-y", *args, "-threads", "1", "{out}"]]


def sine(rate, dur):
    return ["-f", "lavfi", "-i", f"sine=f=440:r={rate}:d={dur}"]


def picture(size, fps, dur):
    return ["-f", "lavfi", "-i", f"testsrc2=s={size}:r={fps}:d={dur}"]


def lame(rate, ch, dur, opts):
    return [["sox", "-n", "-r", str(rate), "-c", str(ch), "-b", "16", "{w}.wav", "synth",
             str(dur), "sine", "440"],
            ["lame", "--quiet", "--resample", f"{rate / 1000:g}", *opts, "{w}.wav", "{out}"]]


def recipes(encoders):
    """(file name, steps, what the steps need, tagging step) for every generated file."""
    out = []

    def add(name, steps, needs=(), post=None):
        tools = {s[0] for s in steps}
        out.append((name, steps, set(needs) | tools, post))

    for rate, ch, dur in [(8000, 1, 3.3), (11025, 2, 0.5), (16000, 1, 9.6), (22050, 2, 3.3),
                          (24000, 1, 3.3), (32000, 2, 9.6), (44100, 2, 3.3), (48000, 1, 0.5),
                          (44100, 2, 61)]:
        kb = 32 if rate < 16000 else 64 if rate < 32000 else 128
        add(f"mp3_cbr{kb}_{rate}_{ch}ch_{dur}s.mp3", lame(rate, ch, dur, ["-b", str(kb)]))
    for rate, ch, dur in [(8000, 1, 3.3), (12000, 2, 9.6), (22050, 1, 3.3), (44100, 2, 9.6),
                          (48000, 2, 3.3), (44100, 1, 61)]:
        add(f"mp3_vbr_{rate}_{ch}ch_{dur}s.mp3", lame(rate, ch, dur, ["-V", "4"]))
    add("mp3_cbr_noxing_44100_2ch_3.3s.mp3", lame(44100, 2, 3.3, ["-b", "128", "-t"]))
    add("mp3_ffmpeg_44100_2ch_3.3s.mp3",
        ff(*sine(44100, 3.3), "-ac", "2", "-c:a", "libmp3lame", "-b:a", "192k"), ["libmp3lame"])
    latin, uni = "Caf\xe9 Ol\xe9", "\xdcn\xefc\xf6d\xe9 \u2603 \u65e5\u672c"
    for name, text, genre, kw in [
            ("id3v23_latin1", latin, "Rock", dict(version=3, enc=0)),
            ("id3v23_utf16", uni, "(13)", dict(version=3, enc=1)),
            ("id3v24_utf16be", uni, "Jazz", dict(version=4, enc=2)),
            ("id3v24_utf8", uni, "17", dict(version=4, enc=3)),
            ("id3v23_png_nopad", latin, "Pop", dict(version=3, enc=1, cover="png", padding=0)),
            ("id3v24_jpeg_pad4k", uni, "Rock", dict(version=4, enc=3, cover="jpeg", padding=4096)),
            ("id3v24_nopad", uni, "Blues", dict(version=4, enc=3, padding=0))]:
        add(f"{name}.mp3", lame(44100, 2, 3.3, ["-b", "128"]), post=tagger("id3", text, genre, **kw))
    add("id3v24_vbr_48000.mp3", lame(48000, 2, 9.6, ["-V", "2"]),
        post=tagger("id3", uni, "Pop", cover="png"))

    for rate, ch, dur in [(8000, 1, 3.3), (16000, 2, 0.5), (22050, 1, 9.6), (32000, 2, 3.3),
                          (44100, 2, 3.3), (48000, 1, 61), (88200, 2, 3.3)]:
        add(f"adts_{rate}_{ch}ch_{dur}s.aac",
            ff(*sine(rate, dur), "-ac", str(ch), "-c:a", "aac", "-f", "adts"), ["aac"])
    for rate, ch, dur in [(44100, 2, 9.6), (22050, 1, 3.3), (48000, 2, 61)]:
        add(f"m4a_aac_{rate}_{ch}ch_{dur}s.m4a", ff(*sine(rate, dur), "-ac", str(ch), "-c:a", "aac"),
            ["aac"])
    add("m4a_tags_ffmpeg.m4a", ff(*sine(44100, 3.3), "-c:a", "aac", *meta_args(latin, "Pop")),
        ["aac"])
    add("m4a_tags_cover.m4a", ff(*sine(44100, 3.3), "-ac", "2", "-c:a", "aac"), ["aac"],
        tagger("mp4", uni, "Jazz", cover="png"))
    add("m4a_tags_jpeg.m4a", ff(*sine(22050, 9.6), "-c:a", "aac"), ["aac"],
        tagger("mp4", latin, "Rock", cover="jpeg"))

    yuv = ["-pix_fmt", "yuv420p"]
    x264 = ["-c:v", "libx264", "-preset", "ultrafast", *yuv]
    aac = ["-c:a", "aac", "-ac", "2"]
    for size, fps, dur, audio in [("160x120", 25, 3.3, True), ("176x144", "30000/1001", 3.3, True),
                                  ("320x240", 24, 1, False), ("160x120", 15, 9.6, True),
                                  ("128x96", 30, 0.5, False)]:
        tag = fps if isinstance(fps, int) else "29.97"
        inputs = picture(size, fps, dur) + (sine(44100, dur) if audio else [])
        add(f"mp4_h264_{size}_{tag}fps_{dur}s{'_aac' if audio else ''}.mp4",
            ff(*inputs, *x264, *(aac if audio else [])), ["libx264"])
    add("mp4_mpeg4_160x120_25fps_aac.mp4",
        ff(*picture("160x120", 25, 3.3), *sine(48000, 3.3), "-c:v", "mpeg4", *yuv, *aac), ["mpeg4"])
    add("mp4_mpeg4_176x144_29.97fps.mp4",
        ff(*picture("176x144", "30000/1001", 3.3), "-c:v", "mpeg4", *yuv), ["mpeg4"])
    add("mp4_hevc_160x120_25fps_aac.mp4",
        ff(*picture("160x120", 25, 1), *sine(44100, 1), "-c:v", "libx265", "-preset", "ultrafast",
           "-x265-params", "log-level=error", *yuv, *aac), ["libx265"])
    av1 = next((e for e in ("libsvtav1", "libaom-av1", "librav1e") if e in encoders), "libaom-av1")
    add("mp4_av1_160x120_25fps.mp4",
        ff(*picture("160x120", 25, 1), "-c:v", av1, *yuv,
           *({"libsvtav1": ["-preset", "12"], "libaom-av1": ["-cpu-used", "8"]}.get(av1, []))), [av1])
    add("mp4_vp9_160x120_25fps_opus.mp4",
        ff(*picture("160x120", 25, 1), *sine(48000, 1), "-c:v", "libvpx-vp9", "-deadline",
           "realtime", "-cpu-used", "8", *yuv, "-c:a", "libopus"), ["libvpx-vp9", "libopus"])
    for codec, rate, ext in [("libopus", 48000, "mp4"), ("flac", 44100, "mp4"), ("alac", 44100, "m4a"),
                             ("ac3", 48000, "mp4"), ("eac3", 44100, "mp4")]:
        add(f"{ext}_{codec.replace('lib', '')}_{rate}.{ext}",
            ff(*sine(rate, 3.3), "-ac", "2", "-c:a", codec, "-strict", "-2"), [codec])
    add("3gp_h264_176x144_aac.3gp",
        ff(*picture("176x144", 15, 3.3), *sine(16000, 3.3), *x264, "-c:a", "aac", "-ac", "1"),
        ["libx264"])
    if "libopencore_amrnb" in encoders:
        add("3gp_amrnb.3gp", ff(*sine(8000, 9.6), "-c:a", "libopencore_amrnb", "-ar", "8000"))
    else:  # a stream of AMR-NB 12.2 kbit/s frames of silence, copied into 3GP by ffmpeg
        add("amrnb_raw_9.6s.amr", [["write-amr", "{out}", "480"]])
        add("3gp_amrnb_copy.3gp", [["write-amr", "{w}.amr", "480"],
                                   ["ffmpeg", "-v", "error", "-y", "-i", "{w}.amr", "-c", "copy",
                                    "{out}"]])

    for codec, rate, ch, dur in [("pcm_u8", 8000, 1, 3.3), ("pcm_s16le", 44100, 2, 3.3),
                                 ("pcm_s16le", 22050, 1, 0.5), ("pcm_s24le", 48000, 2, 9.6),
                                 ("pcm_s24le", 96000, 1, 3.3), ("pcm_s16le", 16000, 1, 61),
                                 ("adpcm_ms", 22050, 1, 3.3), ("adpcm_ms", 44100, 2, 9.6),
                                 ("adpcm_ima_wav", 8000, 1, 3.3), ("adpcm_ima_wav", 44100, 2, 3.3)]:
        add(f"wav_{codec}_{rate}_{ch}ch_{dur}s.wav",
            ff(*sine(rate, dur), "-ac", str(ch), "-c:a", codec), [codec])
    add("wav_sox_s24_96000_2ch_0.5s.wav",
        [["sox", "-n", "-r", "96000", "-c", "2", "-b", "24", "{out}", "synth", "0.5", "sine", "440"]])
    add("wav_info_tags.wav", ff(*sine(44100, 3.3), "-c:a", "pcm_s16le", *meta_args(latin, "Rock")))
    add("wav_id3.wav", ff(*sine(44100, 3.3), "-c:a", "pcm_s16le"),
        post=tagger("wav", uni, "Pop", version=3, enc=1))
    add("rf64_s16_44100_2ch_3.3s.wav",
        ff(*sine(44100, 3.3), "-ac", "2", "-c:a", "pcm_s16le", "-rf64", "always"))
    add("rf64_s24_48000_1ch_0.5s.wav", ff(*sine(48000, 0.5), "-c:a", "pcm_s24le", "-rf64", "always"))

    add("asf_wmav2_44100_2ch_3.3s.wma",
        ff(*sine(44100, 3.3), "-ac", "2", "-c:a", "wmav2", *meta_args(latin, "Rock")), ["wmav2"])
    add("asf_wmav2_22050_1ch_9.6s.wma", ff(*sine(22050, 9.6), "-c:a", "wmav2",
                                           "-metadata", "title=Short", "-metadata", "artist=Someone"),
        ["wmav2"])
    add("asf_wmv2_160x120_25fps.wmv",
        ff(*picture("160x120", 25, 3.3), *sine(44100, 3.3), "-c:v", "wmv2", *yuv, "-c:a", "wmav2",
           *meta_args(uni, "Jazz")), ["wmv2", "wmav2"])
    add("avi_mpeg4_mp3_160x120_25fps.avi",
        ff(*picture("160x120", 25, 3.3), *sine(44100, 3.3), "-c:v", "mpeg4", *yuv,
           "-c:a", "libmp3lame", "-b:a", "128k"), ["mpeg4", "libmp3lame"])
    add("avi_mpeg4_pcm_176x144_29.97fps.avi",
        ff(*picture("176x144", "30000/1001", 9.6), *sine(22050, 9.6), "-c:v", "mpeg4", *yuv,
           "-c:a", "pcm_s16le"), ["mpeg4"])
    return out


def run(argv, check=False, timeout=120):
    r = subprocess.run(argv, stdout=subprocess.PIPE, stderr=subprocess.PIPE, timeout=timeout)
    if check and r.returncode:
        raise RuntimeError(f"{' '.join(argv)}: {r.stderr.decode(errors='replace').strip()[-300:]}")
    return r


def make_one(recipe, folder, covers):
    name, steps, _, post = recipe
    out, work = os.path.join(folder, name), os.path.join(folder, "work", name)
    try:
        for step in steps:
            argv = [a.replace("{out}", out).replace("{w}", work) for a in step]
            if argv[0] == "write-amr":
                with open(argv[1], "wb") as f:  # 12.2 kbit/s frames: type 7, quality bit set
                    f.write(b"#!AMR\n" + (b"\x3c" + bytes(31)) * int(argv[2]))
            else:
                run(argv, check=True)
        if post:
            post(out, covers)
        return out, None
    except Exception as e:  # one recipe failing must not stop the others
        if os.path.exists(out):
            os.remove(out)
        return None, f"{name}: {e}"


def generate(folder, encoders):
    os.makedirs(os.path.join(folder, "work"), exist_ok=True)
    tools = {t for t in ("ffmpeg", "lame", "sox") if shutil.which(t)}
    covers = {}
    if "ffmpeg" in tools:
        for fmt in ("png", "jpeg"):
            path = os.path.join(folder, "work", "cover." + fmt)
            run(["ffmpeg", "-v", "error", "-y", "-f", "lavfi", "-i", "testsrc2=s=32x24",
                 "-frames:v", "1", "-update", "1", "-c:v", {"png": "png", "jpeg": "mjpeg"}[fmt],
                 path])
            if os.path.exists(path):
                covers[fmt] = open(path, "rb").read()
    todo, missing = [], {}
    for rec in recipes(encoders):
        lack = sorted(n for n in rec[2] - {"write-amr"} if n not in tools and n not in encoders)
        if lack:
            missing.setdefault(", ".join(lack), []).append(rec[0])
        else:
            todo.append(rec)
    for lack, names in sorted(missing.items()):
        print(f"note: {len(names)} files not made, this machine lacks {lack}")
    with concurrent.futures.ThreadPoolExecutor(2) as pool:
        made = list(pool.map(lambda r: make_one(r, folder, covers), todo))
    for _, err in made:
        if err:
            print("note: not made:", err)
    return [p for p, _ in made if p]


# ---------------------------------------------------------------------------- the three views

def clean(value, kind):
    """One answer in comparable form; None when the source gives no answer."""
    if value is None or isinstance(value, (dict, list)):
        return None
    if kind == "str":
        text = str(value).strip(" \t\r\n\0")
        return text or None
    try:
        number = float(str(value).strip(" \0").split("/")[0])
    except ValueError:
        return None
    if kind == "count":
        return int(number)
    if number <= 0:
        return None
    return int(number) if kind == "num" else number


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
    for field, total in (("track", "tags.track_total"), ("disc", None)):
        num, _, tot = str(raw.get(field) or "").partition("/")
        out["tags." + field] = num or None
        if total:
            out[total] = tot or raw.get("tracktotal") or raw.get("totaltracks")
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
    r = run(["ffprobe", "-v", "error", "-print_format", "json", "-show_format", "-show_streams",
             path], timeout=60)
    try:
        data = json.loads(r.stdout or b"{}")
    except ValueError:
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
    """(raw tag texts by field, picture count) for ID3, MP4, ASF and Vorbis comments."""
    kind = type(tags).__name__
    if isinstance(tags, mutagen.id3.ID3):
        def get(key):
            frames = tags.getall(key)
            if key == "COMM":
                frames = [f for f in frames if not f.desc] or frames
            return str(frames[0].text[0]) if frames and frames[0].text else None
        return {f: get(k[1]) for f, k in TAG_KEYS.items()}, len(tags.getall("APIC"))
    if kind == "MP4Tags":
        def get(key):
            value = (tags.get(key) or [None])[0]
            return "/".join(map(str, value)) if isinstance(value, tuple) else value
        return {f: get(k[2]) for f, k in TAG_KEYS.items()}, len(tags.get("covr") or [])
    if kind == "ASFTags":
        def get(key):
            values = tags.get(key) or []
            return str(values[0].value) if values else None
        return {f: get(k[3]) for f, k in TAG_KEYS.items()}, len(tags.get("WM/Picture") or [])
    if hasattr(tags, "as_dict"):  # Vorbis comments
        d = {k.lower(): v[0] for k, v in tags.as_dict().items() if v}
        return {f: d.get(k[4]) for f, k in TAG_KEYS.items()} | {
            "tracktotal": d.get("tracktotal") or d.get("totaltracks")}, None
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
    out = {"duration": getattr(info, "length", None), "audio.bit_rate": getattr(info, "bitrate", None),
           "audio.sample_rate": getattr(info, "sample_rate", None),
           "audio.channels": getattr(info, "channels", None),
           "audio.bits_per_sample": getattr(info, "bits_per_sample", None),
           "audio.codec": {"MP3": f"mp{getattr(info, 'layer', 3)}", "AAC": "aac", "FLAC": "flac"}.get(
               kind, next((v for k, v in MP4_CODECS.items() if codec.startswith(k)), None))}
    if codec.startswith("mp4a.40."):
        out["audio.profile"] = AAC_PROFILES.get(codec.rsplit(".", 1)[1])
    raw, pictures = mutagen_tags(f.tags) if f.tags is not None else ({}, 0)
    if kind == "FLAC":
        pictures = len(f.pictures)
    out.update(tag_fields(raw))
    out["pictures"] = pictures
    return out


def run_metainfo(binary, paths):
    """One JSON object per path; a file that stops the batch is asked about alone."""
    found = {}
    for chunk in [paths[i:i + 200] for i in range(0, len(paths), 200)]:
        r = run([binary, "probe", "--json", *chunk], timeout=600)
        for line in r.stdout.decode(errors="replace").splitlines():
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


def compare(paths, views, formats):
    """Per field: consensus (both peers answer alike) and how often metainfo matches it,
    peers differing (metainfo with one / neither), one peer answering (metainfo agrees or not)."""
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
            if len(peers) == 2 and agree(kind, f, g):
                t["consensus"] += 1
                ok = agree(kind, m, f)
                t["mi_agrees"] += ok
            elif len(peers) == 2:
                t["peers_differ"] += 1
                ok = agree(kind, m, f) or agree(kind, m, g)
                t["mi_one" if ok else "mi_neither"] += 1
            else:
                t["one_peer"] += 1
                ok = agree(kind, m, peers[0])
                t["mi_agrees_one"] += ok
            if not ok:
                fmt = formats.get(path) or os.path.splitext(path)[1].lstrip(".") or "?"
                misses.append({"file": path, "format": fmt, "field": field,
                               "metainfo": m, "ffprobe": f, "mutagen": g})
    for t in table.values():
        t["consensus_pct"] = pct(t["mi_agrees"], t["consensus"])
        ref = t["consensus"] + t["peers_differ"] + t["one_peer"]
        t["any_pct"] = pct(t["mi_agrees"] + t["mi_one"] + t["mi_agrees_one"], ref)
    return table, misses


def pct(part, whole):
    return round(100.0 * part / whole, 1) if whole else None


def show(value):
    return "-" if value is None else f"{value:.1f}"


def print_table(table, overall, misses):
    head = ("field", "consensus", "mi ok", "%", "differ", "mi=one", "mi=none", "1 peer", "mi ok",
            "any %", "mi only")
    print("%-22s %9s %6s %6s | %6s %6s %7s | %6s %6s | %6s %7s" % head)
    for field, t in table.items():
        print("%-22s %9d %6d %6s | %6d %6d %7d | %6d %6d | %6s %7d" % (
            field, t["consensus"], t["mi_agrees"], show(t["consensus_pct"]), t["peers_differ"],
            t["mi_one"], t["mi_neither"], t["one_peer"], t["mi_agrees_one"], show(t["any_pct"]),
            t["mi_only"]))
    print(f"overall consensus agreement: {show(overall)} %")
    print("disagreements by field and format:")
    for field in table:
        counts = {}
        for d in misses:
            if d["field"] == field:
                counts[d["format"]] = counts.get(d["format"], 0) + 1
        if counts:
            print(f"  {field}: " + ", ".join(f"{k} {v}" for k, v in
                                            sorted(counts.items(), key=lambda kv: -kv[1])))


def main():
    ap = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    ap.add_argument("--metainfo", default=os.environ.get("METAINFO_BIN"))
    ap.add_argument("--corpus", action="append",
                    help="extra file or folder (repeatable); default ../shared/corpus")
    ap.add_argument("--keep", help="make the files in this folder and keep them")
    ap.add_argument("--no-generate", action="store_true", help="only the corpus files")
    ap.add_argument("--list-disagreements", action="store_true")
    ap.add_argument("--min-agreement", type=float)
    ap.add_argument("--json", help="write the table and disagreements here")
    args = ap.parse_args()
    if not args.metainfo or not os.access(args.metainfo, os.X_OK):
        sys.exit("agreement.py: give the metainfo program with --metainfo BIN or METAINFO_BIN")

    peers = []
    if shutil.which("ffprobe"):
        peers.append("ffprobe")
    else:
        print("SKIP: ffprobe not found")
    if mutagen is not None:
        peers.append("mutagen")
    else:
        print("SKIP: mutagen not installed (Debian python3-mutagen)")
    if not peers:
        return 0
    if len(peers) == 1:
        print(f"only {peers[0]} answers: metainfo is compared with it alone")

    paths = []
    folder = args.keep or tempfile.mkdtemp(prefix="metainfo-agreement-")
    try:
        if not args.no_generate and shutil.which("ffmpeg"):
            r = run(["ffmpeg", "-hide_banner", "-encoders"])
            encoders = {ln.split()[1] for ln in r.stdout.decode().splitlines()
                        if len(ln.split()) > 1 and re.fullmatch(r"[VAS][A-Z.]{5}", ln.split()[0])}
            paths += generate(os.path.abspath(folder), encoders)
        elif not args.no_generate:
            print("note: ffmpeg not found, no files made")
        default = os.path.join(REPO, "..", "shared", "corpus")
        for extra in args.corpus or ([default] if os.path.isdir(default) else []):
            if os.path.isfile(extra):
                paths.append(os.path.abspath(extra))
            for root, dirs, files in os.walk(extra):
                dirs.sort()
                # The corpus notes are prose; ffprobe would read them as a text video.
                paths += [os.path.abspath(os.path.join(root, n)) for n in sorted(files)
                          if not n.endswith(".md")]
        if not paths:
            print("SKIP: no media files to compare")
            return 0
        mi, formats = run_metainfo(args.metainfo, paths)
        views = [mi, {}, {}]
        with concurrent.futures.ThreadPoolExecutor(2) as pool:
            if "ffprobe" in peers:
                views[1] = dict(zip(paths, pool.map(from_ffprobe, paths)))
        if mutagen is not None:
            views[2] = {p: from_mutagen(p) for p in paths}
    finally:
        if not args.keep:
            shutil.rmtree(folder, ignore_errors=True)

    table, misses = compare(paths, views, formats)
    agreed = sum(t["mi_agrees"] for t in table.values())
    overall = pct(agreed, sum(t["consensus"] for t in table.values()))
    print(f"{len(paths)} files; peers: {', '.join(peers)}")
    print_table(table, overall, misses)
    if args.list_disagreements:
        for d in misses:
            print("DIFF %s  %s  metainfo=%r ffprobe=%r mutagen=%r" % (
                d["file"], d["field"], d["metainfo"], d["ffprobe"], d["mutagen"]))
    if args.json:
        with open(args.json, "w") as f:
            json.dump({"files": len(paths), "peers": peers, "fields": table,
                       "overall_consensus_pct": overall, "disagreements": misses}, f, indent=1)
    if args.min_agreement is not None:
        # A field no file gives a consensus on (video, with mutagen blind to it) is
        # judged on the files where any peer answers.
        low = [(f, t["consensus_pct"] if t["consensus"] else t["any_pct"])
               for f, t in table.items()]
        low = [(f, p) for f, p in low if p is not None and p < args.min_agreement]
        for field, p in low:
            print(f"FAIL: {field} agreement {p:.1f} % is below {args.min_agreement:g} %")
        if low:
            return 1
    return 0


if __name__ == "__main__":
    sys.exit(main())
