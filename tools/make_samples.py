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


def id3v23(frames):
    body = b""
    for fid, text in frames:
        payload = b"\x00" + text.encode("latin-1")
        body += fid.encode() + struct.pack(">I", len(payload)) + b"\x00\x00" + payload
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
}


def main():
    out = sys.argv[1] if len(sys.argv) > 1 else os.path.join(os.path.dirname(__file__), "..", "samples")
    os.makedirs(out, exist_ok=True)
    for name, make in SAMPLES.items():
        with open(os.path.join(out, name), "wb") as f:
            f.write(make())


if __name__ == "__main__":
    main()
