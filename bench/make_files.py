#!/usr/bin/env python3
"""Generates the benchmark's media files with ffmpeg, lame and sox.

    make_files.py OUT_DIR

OUT_DIR/work/     the sources the others are encoded from (not measured)
OUT_DIR/set/      a few files of every family the library reads, with tags and
                  covers where the format has them
OUT_DIR/scaling/  <variant>.<seconds>s.<ext>: the same encoding at 10, 100 and
                  1000 seconds, for the scaling table

AMR has no encoder in Debian's ffmpeg: its files are written frame by frame
(valid frame headers, deterministic payload), which is all a probe reads.
Files that exist already are kept, so a second run costs nothing.
"""
import os
import random
import subprocess
import sys

DURATIONS = (10, 100, 1000)
FFMPEG = ["ffmpeg", "-nostdin", "-hide_banner", "-loglevel", "error", "-y"]
TAGS = ["-metadata", "title=Benchmark tone", "-metadata", "artist=libmetainfo",
        "-metadata", "album=Bench", "-metadata", "date=2026", "-metadata", "genre=Test",
        "-metadata", "track=3/12"]


def noise(seconds, rate=44100, channels=2):
    """An ffmpeg input of pink noise: enough entropy for realistic bit rates."""
    layout = "stereo" if channels == 2 else "mono"
    return ["-f", "lavfi", "-i",
            "anoisesrc=c=pink:a=0.2:r=%d:d=%d,aformat=channel_layouts=%s" % (rate, seconds, layout)]


def video(seconds, size="176x144", fps=10):
    return ["-f", "lavfi", "-i", "testsrc=s=%s:r=%d:d=%d" % (size, fps, seconds)]


def run(cmd, out):
    if os.path.exists(out):
        return
    tmp = out + ".part" + os.path.splitext(out)[1]
    subprocess.run(cmd + [tmp], check=True)
    os.replace(tmp, out)


def ffmpeg(out, *args):
    run(FFMPEG + [a for part in args for a in part], out)


def lame(out, wav, *opts):
    run(["lame", "--quiet", *opts, wav], out)


def pcm(path, seconds, rate=44100, channels=2):
    ffmpeg(path, noise(seconds, rate, channels), ["-c:a", "pcm_s16le"])


def amr(path, seconds, wideband, mode):
    if os.path.exists(path):
        return
    sizes = [18, 24, 33, 37, 41, 47, 51, 59, 61] if wideband else [13, 14, 16, 18, 20, 21, 27, 32]
    rng = random.Random(seconds * 16 + mode)
    with open(path + ".part", "wb") as f:
        f.write(b"#!AMR-WB\n" if wideband else b"#!AMR\n")
        for _ in range(seconds * 50):   # 20 ms frames
            f.write(bytes([mode << 3 | 0x04]) + rng.randbytes(sizes[mode] - 1))
    os.replace(path + ".part", path)


def scaling(out, work, cover):
    wav = {}
    for d in DURATIONS:
        wav[d] = os.path.join(work, "src.%ds.wav" % d)
        pcm(wav[d], d)
    for d in DURATIONS:
        name = lambda variant, ext: os.path.join(out, "%s.%ds.%s" % (variant, d, ext))
        lame(name("mp3-cbr", "mp3"), wav[d], "-b", "128", "--tt", "Tone", "--ta", "Bench", "--ti", cover)
        lame(name("mp3-vbr", "mp3"), wav[d], "-V", "2", "--tt", "Tone", "--ta", "Bench")
        ffmpeg(name("aac-adts", "aac"), ["-i", wav[d]], ["-c:a", "aac", "-b:a", "128k", "-f", "adts"])
        ffmpeg(name("m4a", "m4a"), ["-i", wav[d]], ["-c:a", "aac", "-b:a", "128k"], TAGS)
        ffmpeg(name("mp4-h264", "mp4"), video(d), ["-i", wav[d]],
               ["-c:v", "libx264", "-preset", "ultrafast", "-c:a", "aac", "-shortest"], TAGS)
        ffmpeg(name("wma", "wma"), ["-i", wav[d]], ["-c:a", "wmav2", "-b:a", "128k"], TAGS)
        ffmpeg(name("wmv", "wmv"), video(d), ["-i", wav[d]],
               ["-c:v", "wmv2", "-c:a", "wmav2", "-shortest"], TAGS)
        ffmpeg(name("wav", "wav"), noise(d, 8000, 1), ["-c:a", "pcm_s16le"], TAGS)
        amr(name("amr-nb", "amr"), d, False, 7)
        amr(name("amr-wb", "awb"), d, True, 8)
        ffmpeg(name("avi", "avi"), video(d), ["-i", wav[d]],
               ["-c:v", "mpeg4", "-c:a", "libmp3lame", "-shortest"])
        ffmpeg(name("rm", "rm"), video(d), ["-i", wav[d]], ["-c:v", "rv10", "-c:a", "ac3", "-shortest"])


def variety(out, work, cover):
    src = os.path.join(work, "src.wav")
    mono = os.path.join(work, "src-mono22k.wav")
    pcm(src, 20)
    pcm(mono, 20, 22050, 1)
    p = lambda name: os.path.join(out, name)
    # MP3: constant, variable and average rates, ID3v1 and v2 tags, covers
    lame(p("cbr320-id3v2.mp3"), src, "-b", "320", "--tt", "Tone", "--ta", "Bench", "--tl", "Album",
         "--ty", "2026", "--tn", "3/12", "--tg", "Rock", "--ti", cover)
    lame(p("vbr-v0.mp3"), src, "-V", "0", "--tt", "Tone", "--id3v2-only")
    lame(p("vbr-v6-mono.mp3"), mono, "-V", "6")
    lame(p("abr96-id3v1.mp3"), src, "--abr", "96", "--id3v1-only", "--tt", "Tone")
    lame(p("cbr64-mono22k.mp3"), mono, "-b", "64", "-t")
    ffmpeg(p("ffmpeg-id3v24.mp3"), ["-i", src, "-i", cover], ["-map", "0", "-map", "1", "-c:a", "libmp3lame",
           "-c:v", "copy", "-id3v2_version", "4"], TAGS)
    ffmpeg(p("ffmpeg-id3v23.mp3"), ["-i", src], ["-c:a", "libmp3lame", "-id3v2_version", "3"], TAGS)
    # AAC in ADTS and MP4
    ffmpeg(p("lc-stereo.aac"), ["-i", src], ["-c:a", "aac", "-b:a", "160k", "-f", "adts"])
    ffmpeg(p("lc-mono22k.aac"), ["-i", mono], ["-c:a", "aac", "-b:a", "48k", "-f", "adts"])
    ffmpeg(p("cover.m4a"), ["-i", src, "-i", cover], ["-map", "0", "-map", "1", "-c:a", "aac", "-c:v", "copy",
           "-disposition:v", "attached_pic"], TAGS)
    ffmpeg(p("plain.m4a"), ["-i", mono], ["-c:a", "aac"])
    ffmpeg(p("faststart.mp4"), video(20, "320x240", 25), ["-i", src],
           ["-c:v", "libx264", "-preset", "ultrafast", "-c:a", "aac", "-shortest", "-movflags", "+faststart"], TAGS)
    ffmpeg(p("mpeg4-part2.mp4"), video(20), ["-i", src], ["-c:v", "mpeg4", "-c:a", "aac", "-shortest"])
    ffmpeg(p("h264-aac.3gp"), video(20, "176x144", 15), ["-i", mono],
           ["-c:v", "libx264", "-preset", "ultrafast", "-c:a", "aac", "-ar", "22050", "-shortest"])
    ffmpeg(p("h264-aac.m4v"), video(20), ["-i", src], ["-c:v", "libx264", "-preset", "ultrafast", "-c:a", "aac", "-shortest"])
    # ASF
    ffmpeg(p("wmav1.wma"), ["-i", src], ["-c:a", "wmav1"], TAGS)
    ffmpeg(p("wmav2-64k.wma"), ["-i", mono], ["-c:a", "wmav2", "-b:a", "64k"])
    ffmpeg(p("wmv1.wmv"), video(20), ["-i", src], ["-c:v", "wmv1", "-c:a", "wmav2", "-shortest"], TAGS)
    ffmpeg(p("msmpeg4.asf"), video(20), ["-i", src], ["-c:v", "msmpeg4", "-c:a", "wmav2", "-shortest"])
    # WAVE: PCM, companded and ADPCM
    ffmpeg(p("pcm16-tags.wav"), ["-i", src], ["-c:a", "pcm_s16le"], TAGS)
    ffmpeg(p("pcm8-mono.wav"), ["-i", mono], ["-c:a", "pcm_u8"])
    ffmpeg(p("pcm24.wav"), ["-i", src], ["-c:a", "pcm_s24le"])
    ffmpeg(p("mulaw.wav"), ["-i", mono], ["-c:a", "pcm_mulaw", "-ar", "8000"])
    ffmpeg(p("alaw.wav"), ["-i", mono], ["-c:a", "pcm_alaw", "-ar", "8000"])
    ffmpeg(p("ima-adpcm.wav"), ["-i", src], ["-c:a", "adpcm_ima_wav"])
    ffmpeg(p("ms-adpcm.wav"), ["-i", mono], ["-c:a", "adpcm_ms"])
    run(["sox", src, "-e", "ms-adpcm"], p("sox-ms-adpcm.wav"))
    # AMR narrow and wide band, several modes
    for mode in (0, 4, 7):
        amr(p("nb-mode%d.amr" % mode), 20, False, mode)
    for mode in (0, 2, 8):
        amr(p("wb-mode%d.awb" % mode), 20, True, mode)
    # AVI and RealMedia
    ffmpeg(p("mpeg4-mp3.avi"), video(20), ["-i", src], ["-c:v", "mpeg4", "-c:a", "libmp3lame", "-shortest"])
    ffmpeg(p("msmpeg4-pcm.avi"), video(20), ["-i", mono], ["-c:v", "msmpeg4", "-c:a", "pcm_s16le", "-shortest"])
    ffmpeg(p("h264-aac.avi"), video(20), ["-i", src], ["-c:v", "libx264", "-preset", "ultrafast", "-c:a", "aac", "-shortest"])
    ffmpeg(p("rv10-ac3.rm"), video(20), ["-i", src], ["-c:v", "rv10", "-c:a", "ac3", "-shortest"], TAGS)
    ffmpeg(p("rv20-ac3.rm"), video(20), ["-i", src], ["-c:v", "rv20", "-c:a", "ac3", "-shortest"])
    ffmpeg(p("ac3-only.ra"), ["-i", src], ["-c:a", "ac3", "-f", "rm"])
    # Formats only the accurate interface reads
    ffmpeg(p("cover.flac"), ["-i", src, "-i", cover], ["-map", "0", "-map", "1", "-c:v", "copy",
           "-disposition:v", "attached_pic"], TAGS)
    ffmpeg(p("24bit.flac"), ["-i", mono], ["-c:a", "flac", "-sample_fmt", "s32"], TAGS)
    ffmpeg(p("vorbis.ogg"), ["-i", src], ["-c:a", "libvorbis"], TAGS)
    ffmpeg(p("opus.opus"), ["-i", src], ["-c:a", "libopus"], TAGS)
    ffmpeg(p("h264-aac.mkv"), video(20), ["-i", src], ["-c:v", "libx264", "-preset", "ultrafast", "-c:a", "aac",
           "-shortest"], TAGS)
    ffmpeg(p("vp9-opus.webm"), video(20), ["-i", src], ["-c:v", "libvpx-vp9", "-deadline", "realtime",
           "-c:a", "libopus", "-shortest"], TAGS)
    ffmpeg(p("pcm16.aiff"), ["-i", src], ["-c:a", "pcm_s16be"], TAGS)
    run(["sox", src, "-e", "floating-point"], p("float.aifc"))


def main():
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    out = sys.argv[1]
    for sub in ("set", "scaling", "work"):
        os.makedirs(os.path.join(out, sub), exist_ok=True)
    work = os.path.join(out, "work")   # sources, not measured
    cover = os.path.join(work, "cover.jpg")
    ffmpeg(cover, ["-f", "lavfi", "-i", "testsrc=s=300x300"], ["-frames:v", "1"])
    variety(os.path.join(out, "set"), work, cover)
    scaling(os.path.join(out, "scaling"), work, cover)


if __name__ == "__main__":
    main()
