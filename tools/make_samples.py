#!/usr/bin/env python3
"""Writes the bundled sample files (small, synthetic, each a valid file of its format).

Run from anywhere: python3 tools/make_samples.py [OUTDIR]   (default: samples/)
"""
import math
import os
import struct
import sys


def wave_pcm(seconds=0.5, rate=8000, freq=440):
    n = int(seconds * rate)
    pcm = b"".join(struct.pack("<h", int(12000 * math.sin(2 * math.pi * freq * i / rate))) for i in range(n))
    fmt = struct.pack("<HHIIHH", 1, 1, rate, rate * 2, 2, 16)
    body = b"WAVE" + b"fmt " + struct.pack("<I", len(fmt)) + fmt + b"data" + struct.pack("<I", len(pcm)) + pcm
    return b"RIFF" + struct.pack("<I", len(body)) + body


def syncsafe(n):
    return bytes([(n >> 21) & 0x7F, (n >> 14) & 0x7F, (n >> 7) & 0x7F, n & 0x7F])


def id3v23(frames, padding=64):
    body = b""
    for fid, text in frames:
        payload = b"\x00" + text.encode("latin-1")
        body += fid.encode() + struct.pack(">I", len(payload)) + b"\x00\x00" + payload
    # Padding after the frames, as taggers write it: readers count the header
    # inside the tag size, so a tag that ends right at its last frame loses it.
    body += bytes(padding)
    return b"ID3\x03\x00\x00" + syncsafe(len(body)) + body


def mp3_silence(frames=28):
    # MPEG-1 Layer III, 32 kbit/s, 32 kHz, mono, no CRC: 144-byte frames whose
    # side information is all zero (no main data), which decoders play as silence.
    header = bytes([0xFF, 0xFB, 0x18, 0xC0])
    frame = header + bytes(144 - 4)
    tag = id3v23([("TIT2", "Silence"), ("TPE1", "libmetainfo")])
    return tag + frame * frames


def adts_silence(frames=16):
    # AAC LC, 16 kHz, mono: one single channel element with no scale factor
    # bands, then END: a silent raw data block of exactly four bytes.
    payload = bytes([0x00, 0xC8, 0x00, 0x07])  # SCE tag 0, global_gain 100, ics_info 0, END
    length = 7 + len(payload)
    profile, sf_index, channels = 1, 8, 1
    hdr = bytearray(7)
    hdr[0] = 0xFF
    hdr[1] = 0xF1  # MPEG-4, layer 0, no CRC
    hdr[2] = (profile << 6) | (sf_index << 2) | (channels >> 2)
    hdr[3] = ((channels & 3) << 6) | (length >> 11)
    hdr[4] = (length >> 3) & 0xFF
    hdr[5] = ((length & 7) << 5) | 0x1F
    hdr[6] = 0xFC
    return (bytes(hdr) + payload) * frames


def box(kind, body=b""):
    return struct.pack(">I", 8 + len(body)) + kind + body


def full_box(kind, version=0, flags=0, body=b""):
    return box(kind, struct.pack(">I", version << 24 | flags) + body)


def descriptor(tag, body):
    return bytes([tag, len(body)]) + body


def mp4_aac(frames=16):
    # AAC LC 16 kHz mono in an MP4 file: the same silent raw data blocks as the
    # ADTS sample, one per sample, with the sample tables that locate them.
    block = bytes([0x00, 0xC8, 0x00, 0x07])
    ftyp = box(b"ftyp", b"M4A " + struct.pack(">I", 0) + b"M4A isom")
    mdat = box(b"mdat", block * frames)
    matrix = struct.pack(">9I", 0x10000, 0, 0, 0, 0x10000, 0, 0, 0, 0x40000000)
    duration_ms = frames * 1024 * 1000 // 16000
    mvhd = full_box(b"mvhd", body=struct.pack(">IIIIIH", 0, 0, 1000, duration_ms, 0x10000, 0x0100)
                    + bytes(10) + matrix + bytes(24) + struct.pack(">I", 2))
    tkhd = full_box(b"tkhd", flags=7, body=struct.pack(">IIIII", 0, 0, 1, 0, duration_ms) + bytes(8)
                    + struct.pack(">hhhH", 0, 0, 0x0100, 0) + matrix + struct.pack(">II", 0, 0))
    mdhd = full_box(b"mdhd", body=struct.pack(">IIIIHH", 0, 0, 16000, frames * 1024, 0x55C4, 0))
    hdlr = full_box(b"hdlr", body=struct.pack(">I", 0) + b"soun" + bytes(12) + b"Sound\0")
    audio_config = bytes([0x14, 0x08])  # AAC LC, 16 kHz, one channel
    decoder = descriptor(0x04, bytes([0x40, 0x15]) + bytes(3) + struct.pack(">II", 8000, 8000)
                         + descriptor(0x05, audio_config))
    esds = full_box(b"esds", body=descriptor(0x03, struct.pack(">HB", 1, 0) + decoder + descriptor(0x06, b"\x02")))
    mp4a = box(b"mp4a", bytes(6) + struct.pack(">H", 1) + bytes(8) + struct.pack(">HHHHI", 1, 16, 0, 0, 16000 << 16)
               + esds)
    stbl = box(b"stbl", full_box(b"stsd", body=struct.pack(">I", 1) + mp4a)
               + full_box(b"stts", body=struct.pack(">III", 1, frames, 1024))
               + full_box(b"stsc", body=struct.pack(">IIII", 1, 1, frames, 1))
               + full_box(b"stsz", body=struct.pack(">II", len(block), frames))
               + full_box(b"stco", body=struct.pack(">II", 1, len(ftyp) + 8)))
    dinf = box(b"dinf", full_box(b"dref", body=struct.pack(">I", 1) + full_box(b"url ", flags=1)))
    minf = box(b"minf", full_box(b"smhd", body=bytes(4)) + dinf + stbl)
    trak = box(b"trak", tkhd + box(b"mdia", mdhd + hdlr + minf))
    return ftyp + mdat + box(b"moov", mvhd + trak)


def evrc(packets=50):
    # EVRC storage file: eighth-rate packets (rate octet 1, two payload bytes).
    return b"#!EVRC\n" + (bytes([0x01]) + bytes(2)) * packets


def amr_nb(frames=50):
    # 12.2 kbit/s frames (frame type 7, quality bit set): 1 + 31 bytes each.
    return b"#!AMR\n" + (bytes([0x3C]) + bytes(31)) * frames


def amr_wb(frames=50):
    # 23.85 kbit/s frames (frame type 8, quality bit set): 1 + 60 bytes each.
    return b"#!AMR-WB\n" + (bytes([0x44]) + bytes(60)) * frames


def midi():
    track = bytes([0x00, 0x90, 0x3C, 0x60, 0x60, 0x80, 0x3C, 0x40, 0x00, 0xFF, 0x2F, 0x00])
    return b"MThd" + struct.pack(">IHHH", 6, 0, 1, 96) + b"MTrk" + struct.pack(">I", len(track)) + track


SAMPLES = {
    "tone.wav": wave_pcm,
    "silence.mp3": mp3_silence,
    "silence.aac": adts_silence,
    "silence.amr": amr_nb,
    "silence.awb": amr_wb,
    "note.mid": midi,
    "silence.m4a": mp4_aac,
    "silence.evc": evrc,
}


def main():
    out = sys.argv[1] if len(sys.argv) > 1 else os.path.join(os.path.dirname(__file__), "..", "samples")
    os.makedirs(out, exist_ok=True)
    for name, make in SAMPLES.items():
        with open(os.path.join(out, name), "wb") as f:
            f.write(make())


if __name__ == "__main__":
    main()
