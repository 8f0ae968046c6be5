// Byte-built seeds of the formats only the accurate interface reads, each
// with the parts its reader looks at: tags, pictures, several streams, and
// the layouts that send a reader to the end of the file (Matroska without
// Duration, APE tags before ID3v1).
#include "accurate_seeds.h"

#include "support/aac_builder.h"
#include "support/ebml_builder.h"
#include "support/flac_builder.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"
#include "support/ogg_builder.h"

using namespace testing_support;

namespace {

const Bytes kPng{0x89, 'P', 'N', 'G', 13, 10, 26, 10, 0, 0, 0, 0};
const std::vector<std::string> kComments = {"TITLE=T",   "ARTIST=A",        "ALBUM=Al",         "ALBUMARTIST=AA",
                                            "GENRE=G",   "DATE=2020-01-02", "TRACKNUMBER=3/11", "DISCTOTAL=2",
                                            "COMMENT=C", "COMPOSER=Co",     "MOOD=calm"};

Bytes Cat(std::initializer_list<std::vector<uint8_t>> parts) {
    Bytes b;
    for (const auto& p : parts) b.raw(p);
    return b;
}

Bytes Flac(bool id3) {
    Bytes b = id3 ? Bytes(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "Id3"))})) : Bytes();
    return b.str("fLaC")
        .raw(FlacBlock(0, FlacStreamInfo(44100, 2, 16, 44100)))
        .raw(FlacBlock(4, VorbisComments(kComments)))
        .raw(FlacBlock(6, FlacPicture(3, "image/png", "front", kPng)))
        .raw(FlacBlock(1, Bytes().zeros(8), true))
        .u8(0xFF)
        .u8(0xF8)
        .fill(64, 0x11);
}

Bytes Prefixed(const std::string& prefix, const Bytes& body) { return Bytes().str(prefix).raw(body); }

Bytes Ogg(const std::string& codec) {
    std::vector<std::string> comments = kComments;
    comments.push_back("METADATA_BLOCK_PICTURE=" + Base64Picture(3, "image/png", "front", kPng.data()));
    const Bytes body = VorbisComments(comments), audio = Bytes().fill(200, 0x55);
    if (codec == "opus") {
        return OggStreamPages(1, {OpusHeadPacket(2, 312, 48000), Prefixed("OpusTags", body), audio, audio}, 4, 48312);
    }
    if (codec == "flac") {
        return OggStreamPages(3,
                              {FlacMappingPacket(44100, 2, 16),
                               Bytes().u8(0x84).be24(static_cast<uint32_t>(body.size())).raw(body), audio},
                              8, 44100);
    }
    return OggStreamPages(2,
                          {VorbisIdPacket(2, 44100, 128000), Prefixed("\x03vorbis", body),
                           Prefixed("\x05vorbis", Bytes().fill(30, 0)), audio, audio},
                          2, 88200);
}

constexpr uint32_t kSegment = 0x18538067, kSeekHead = 0x114D9B74, kInfo = 0x1549A966, kTracks = 0x1654AE6B;
constexpr uint32_t kTags = 0x1254C367, kAttachments = 0x1941A469, kCues = 0x1C53BB6B, kCluster = 0x1F43B675;

Bytes Track(uint64_t number, uint64_t type, const std::string& codec, const Bytes& priv, const Bytes& settings) {
    return Ebml(0xAE, Bytes()
                          .raw(EbmlUint(0xD7, number))
                          .raw(EbmlUint(0x83, type))
                          .raw(EbmlText(0x86, codec))
                          .raw(Ebml(0x63A2, priv))
                          .raw(Ebml(type == 1 ? 0xE0 : 0xE1, settings)));
}

Bytes Cluster(uint64_t timecode, bool unknownSize) {
    const Bytes block = Bytes().u8(0x81).be16(40).u8(0x80).fill(8, 0);
    return Ebml(kCluster, Bytes().raw(EbmlUint(0xE7, timecode)).raw(Ebml(0xA3, block)), unknownSize);
}

Bytes Matroska(const std::string& doc, bool duration) {
    Bytes info = EbmlUint(0x2AD7B1, 1000000);
    if (duration) info.raw(EbmlFloat(0x4489, 2000.0));
    const Bytes video = Bytes().raw(EbmlUint(0xB0, 64)).raw(EbmlUint(0xBA, 48));
    const Bytes audio = Bytes().raw(EbmlFloat(0xB5, 48000.0)).raw(EbmlUint(0x9F, 2));
    const Bytes tracks = Ebml(kTracks, Bytes()
                                           .raw(Track(1, 1, doc == "webm" ? "V_VP9" : "V_MPEG4/ISO/AVC",
                                                      Bytes{0x01, 0x64, 0x00, 0x1F, 0xFF}, video))
                                           .raw(Track(2, 2, "A_OPUS", Bytes().str("OpusHead"), audio)));
    const Bytes tag = Ebml(0x67C8, Bytes().raw(EbmlText(0x45A3, "TITLE")).raw(EbmlText(0x4487, "Song")));
    const Bytes tags = Ebml(kTags, Ebml(0x7373, Bytes().raw(Ebml(0x63C0, EbmlUint(0x68CA, 50))).raw(tag)));
    const Bytes attachment = Ebml(
        kAttachments,
        Ebml(0x61A7,
             Bytes().raw(EbmlText(0x466E, "cover.png")).raw(EbmlText(0x4660, "image/png")).raw(Ebml(0x465C, kPng))));
    const Bytes cues = Ebml(kCues, Ebml(0xBB, Bytes().raw(EbmlUint(0xB3, 1000)).raw(Ebml(0xB7, EbmlUint(0xF1, 0)))));
    const Bytes seek = Ebml(0x4DBB, Bytes().raw(EbmlUint(0x53AB, kCues)).raw(Ebml(0x53AC, Bytes().be64(0))));
    const Bytes body = Cat({Ebml(kSeekHead, seek), Ebml(kInfo, info), tracks, tags, attachment, Cluster(0, !duration),
                            Cluster(1000, !duration), cues});
    return Cat({EbmlDocHeader(doc), Ebml(kSegment, body, !duration)});
}

Bytes Aiff(const std::string& kind) {
    const Bytes sound = Bytes().be32(0).be32(0).zeros(64);
    std::vector<Bytes> chunks = {AiffChunk("COMM", AiffComm(2, 16, 16, 44100, kind == "AIFC" ? "sowt" : "")),
                                 AiffChunk("NAME", Bytes().str("Name")),
                                 AiffChunk("AUTH", Bytes().str("Author")),
                                 AiffChunk("ANNO", Bytes().str("Note")),
                                 AiffChunk("SSND", sound),
                                 AiffChunk("ID3 ", Bytes(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "Id3 title"))})))};
    if (kind == "AIFC") chunks.insert(chunks.begin(), AiffChunk("FVER", Bytes().be32(0xA2805140)));
    return AiffForm(kind, chunks);
}

Bytes Ape(uint32_t version) {
    return ApeTag({{"Title", Bytes().str("Ape title")},
                   {"Artist", Bytes().str("A")},
                   {"Track", Bytes().str("3/11")},
                   {"Cover Art (Front)", Bytes().str("cover.png").u8(0).raw(kPng), true}},
                  version);
}

}  // namespace

std::vector<AccurateSeed> AccurateSeeds() {
    const std::vector<uint8_t> mp3 = Mp3Frames(20);
    const std::vector<uint8_t> adts = AdtsFrames(AdtsLayout(4, 2), std::vector<size_t>(20, 40));
    return {
        {"flac", "built.flac", Flac(false)},
        {"flac", "built-id3.flac", Flac(true)},
        {"ogg", "built-vorbis.ogg", Ogg("vorbis")},
        {"ogg", "built-opus.opus", Ogg("opus")},
        {"ogg", "built-flac.oga", Ogg("flac")},
        {"matroska", "built.mkv", Matroska("matroska", true)},
        {"matroska", "built-no-duration.webm", Matroska("webm", false)},
        {"aiff", "built.aiff", Aiff("AIFF")},
        {"aiff", "built.aifc", Aiff("AIFC")},
        {"ape", "built-ape.mp3", Cat({mp3, Ape(2000)})},
        {"ape", "built-ape-id3v1.mp3", Cat({mp3, Ape(2000), Id3v1Titled("V1")})},
        {"ape", "built-apev1.mp3", Cat({mp3, Ape(1000), Id3v1Titled("V1")})},
        {"ape", "built-ape.aac", Cat({adts, Ape(2000), Id3v1Titled("V1")})},
    };
}
