#!/usr/bin/env bash
# Writes short real files of the formats only the accurate interface reads
# (FLAC, Ogg, Matroska/WebM, AIFF/AIFC, MP3 and ADTS with APE tags, fragmented MP4) into
# OUT_DIR with ffmpeg, lame and mutagen, for metainfo_make_seeds to route by
# suffix. A tool that is missing leaves its files out.
#
#   fuzz/make_media.sh OUT_DIR
set -uo pipefail

out=$1
mkdir -p "$out"
cd "$out" || exit 1
command -v ffmpeg >/dev/null || { echo "make_media: no ffmpeg, no real files"; exit 0; }

ff() { ffmpeg -nostdin -hide_banner -loglevel error -y "$@" || echo "make_media: ffmpeg failed for ${*: -1}"; }
tone=(-f lavfi -i "sine=frequency=440:duration=1:sample_rate=8000")
clip=(-f lavfi -i "testsrc=size=64x48:rate=10:duration=1")
tags=(-metadata title=Title -metadata artist=Artist -metadata album=Album -metadata date=2020
      -metadata track=3/11 -metadata genre=Rock -metadata comment=Comment)

ff -f lavfi -i "color=red:size=8x8" -frames:v 1 cover.png
cover=(-i cover.png -map 0 -map 1 -c:v copy -disposition:v attached_pic)

# FLAC: plain, tagged with a picture block, 24-bit stereo.
ff "${tone[@]}" -c:a flac plain.flac
ff "${tone[@]}" "${cover[@]}" "${tags[@]}" -c:a flac tagged.flac
ff -f lavfi -i "sine=duration=0.5:sample_rate=48000" -ac 2 -c:a flac -sample_fmt s32 -bits_per_raw_sample 24 deep.flac
# Ogg: Vorbis, Opus, FLAC and Theora with Vorbis streams.
ff "${tone[@]}" "${tags[@]}" -c:a libvorbis -q:a 0 vorbis.ogg
ff "${tone[@]}" "${tags[@]}" -c:a libopus -b:a 16k opus.opus
ff "${tone[@]}" -c:a flac flac.oga
ff "${clip[@]}" "${tone[@]}" -c:v libtheora -q:v 1 -c:a libvorbis -q:a 0 theora.ogv
# Matroska and WebM: several codecs, tags, an attached cover, and one written
# to a pipe (no Duration, no Cues, Clusters of unknown size).
ff "${clip[@]}" "${tone[@]}" "${tags[@]}" -c:v libx264 -preset ultrafast -c:a aac -b:a 16k h264.mkv
ff "${clip[@]}" "${tone[@]}" -c:v mpeg4 -c:a libmp3lame -b:a 32k mpeg4.mkv
ff "${clip[@]}" "${tone[@]}" -c:v libvpx -b:v 50k -c:a libvorbis -q:a 0 vp8.webm
ff "${clip[@]}" "${tone[@]}" -c:v libvpx-vp9 -b:v 50k -c:a libopus -b:a 16k vp9.webm
ff "${tone[@]}" "${tags[@]}" -attach cover.png -metadata:s:t mimetype=image/png -c:a flac attached.mka
ffmpeg -nostdin -loglevel error "${clip[@]}" "${tone[@]}" -c:v libx264 -preset ultrafast -c:a aac -b:a 16k \
  -f matroska - >piped.mkv 2>/dev/null || echo "make_media: ffmpeg failed for piped.mkv"
# Fragmented MP4: the last fragment named by mfra, and a DASH segment index.
ff "${tone[@]}" -c:a aac -b:a 16k -movflags frag_keyframe+empty_moov fragmented.m4a
ff "${clip[@]}" "${tone[@]}" -c:v libx264 -preset ultrafast -c:a aac -b:a 16k -f mp4 -movflags dash+global_sidx dash.mp4
# AIFF and AIFC, with an ID3 chunk.
ff "${tone[@]}" "${tags[@]}" -write_id3v2 1 -c:a pcm_s16be tagged.aiff
ff "${tone[@]}" -c:a pcm_s16le little.aifc
ff "${tone[@]}" -c:a pcm_f32be float.aifc
# MP3 and ADTS with an APE tag, then an ID3v1 tag after it (as mutagen writes them).
ff "${tone[@]}" -c:a libmp3lame -b:a 32k ape.mp3
ff "${tone[@]}" -c:a aac -b:a 16k -f adts ape.aac
if [ -x /usr/bin/python3 ] && /usr/bin/python3 -c 'import mutagen' 2>/dev/null; then
  /usr/bin/python3 - <<'PY' || echo "make_media: mutagen failed"
import shutil
from mutagen.apev2 import APEv2, APEValue, BINARY
from mutagen.id3 import ID3, TIT2
for name in ("ape.mp3", "ape.aac"):
    tag = APEv2()
    tag["Title"] = "Ape title"
    tag["Artist"] = "Ape artist"
    tag["Track"] = "3/11"
    tag["Cover Art (Front)"] = APEValue(b"cover.png\0" + open("cover.png", "rb").read(), BINARY)
    tag.save(name)
shutil.copy("ape.mp3", "ape-id3v1.mp3")
id3 = ID3()
id3.add(TIT2(encoding=3, text="V1 title"))
id3.save("ape-id3v1.mp3", v1=2, v2_version=3)
PY
fi
rm -f cover.png
