#include "ogg/ogg_codecs.h"

#include "core/byte_reader.h"
#include "flac/vorbis_comment.h"

namespace metainfo {
namespace {

uint32_t ReadBE24(const uint8_t* p) { return uint32_t(p[0]) << 16 | uint32_t(p[1]) << 8 | p[2]; }

void IdentifyVorbis(const uint8_t* p, OggStream* s) {
    StreamFacts& f = s->facts;
    s->codec = OggStream::kVorbis;
    f.codec = "vorbis";
    f.channels = p[11];
    f.sampleRate = ReadLE32(p + 12);
    const uint32_t nominal = ReadLE32(p + 20);
    // A signed field: negative or zero when the encoder did not say.
    f.bitRate = nominal > 0 && nominal < 0x80000000u ? nominal : 0;
    s->granuleRate = f.sampleRate;
}

void IdentifyOpus(const uint8_t* p, OggStream* s) {
    s->codec = OggStream::kOpus;
    s->facts.codec = "opus";
    s->facts.channels = p[9];
    s->preSkip = ReadLE16(p + 10);
    s->outputGain = static_cast<int16_t>(ReadLE16(p + 16));
    // Opus always decodes at 48 kHz; the input rate is only a hint.
    s->facts.sampleRate = 48000;
    s->granuleRate = 48000;
}

void IdentifyFlac(const uint8_t* p, OggStream* s) {
    StreamFacts& f = s->facts;
    s->codec = OggStream::kFlac;
    f.codec = "flac";
    const uint8_t* info = p + 17;  // STREAMINFO past its block header
    f.sampleRate = ReadBE24(info + 10) >> 4;
    f.channels = ((info[12] >> 1) & 0x07u) + 1;
    f.bitsPerSample = ((uint32_t(info[12] & 1u) << 4) | (info[13] >> 4)) + 1;
    s->granuleRate = f.sampleRate;
    s->done = (p[13] & 0x80) != 0;  // STREAMINFO is the last block
}

void IdentifyTheora(const uint8_t* p, OggStream* s) {
    StreamFacts& f = s->facts;
    s->codec = OggStream::kTheora;
    f.kind = StreamFacts::kVideo;
    f.codec = "theora";
    f.width = ReadBE24(p + 14);
    f.height = ReadBE24(p + 17);
    f.frameRateNum = ReadBE32(p + 22);
    f.frameRateDen = ReadBE32(p + 26);
    s->granuleShift = (ReadBE16(p + 40) >> 5) & 31u;
    s->granuleFromZero = ReadBE24(p + 7) < 0x030201u;
    s->done = true;  // its comments repeat what the audio says, if anything
}

bool Identify(const uint8_t* p, size_t n, OggStream* s) {
    if (n >= 30 && BytesEqual(p, "\x01vorbis", 7)) {
        IdentifyVorbis(p, s);
    } else if (n >= 19 && BytesEqual(p, "OpusHead", 8)) {
        IdentifyOpus(p, s);
    } else if (n >= 51 && p[0] == 0x7F && BytesEqual(p + 1, "FLAC", 4) && BytesEqual(p + 9, "fLaC", 4) &&
               (p[13] & 0x7F) == 0) {
        IdentifyFlac(p, s);
    } else if (n >= 42 && BytesEqual(p, "\x80theora", 7)) {
        IdentifyTheora(p, s);
    } else {
        return false;
    }
    return true;
}

// A FLAC metadata block after the mapping header: comments and pictures.
bool ReadFlacBlock(const uint8_t* p, size_t n, OggStream* s, TagFacts* tags, PictureSink* pictures) {
    if (n < 4) return false;
    const uint8_t type = p[0] & 0x7F;
    const size_t size = ReadBE24(p + 1);
    if (size > n - 4) return false;
    if ((p[0] & 0x80) != 0) s->done = true;
    if (type == 4) return ReadVorbisComments(p + 4, size, tags, pictures);
    if (type == 6) {
        PictureFacts picture;
        size_t dataOffset = 0;
        if (ReadPictureBlock(p + 4, size, &picture, &dataOffset)) pictures->Add(picture, p + 4 + dataOffset);
    }
    return true;
}

}  // namespace

bool ReadHeaderPacket(const uint8_t* p, size_t n, OggStream* s, TagFacts* tags, PictureSink* pictures) {
    const uint32_t index = s->packets++;
    if (index == 0) {
        if (!Identify(p, n, s)) s->done = true;
        return s->codec != OggStream::kUnknown;
    }
    switch (s->codec) {
        case OggStream::kVorbis:
            s->done = true;
            return n >= 7 && BytesEqual(p, "\x03vorbis", 7) && ReadVorbisComments(p + 7, n - 7, tags, pictures);
        case OggStream::kOpus:
            s->done = true;
            return n >= 8 && BytesEqual(p, "OpusTags", 8) && ReadVorbisComments(p + 8, n - 8, tags, pictures);
        case OggStream::kFlac:
            if (ReadFlacBlock(p, n, s, tags, pictures)) return true;
            s->done = true;
            return false;
        default: s->done = true; return false;
    }
}

}  // namespace metainfo
