#include "support/fixture_files.h"

#include "metainfo/metainfo.h"
#include "support/aac_builder.h"
#include "support/asf_builder.h"
#include "support/avi_builder.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"
#include "support/mp4_builder.h"
#include "support/rm_builder.h"
#include "support/speech_builder.h"

namespace testing_support {
namespace {

using Seed = std::vector<uint8_t>;

using Files = std::vector<FixtureFile>;

void Add(Files& out, int type, const std::string& name, const Seed& bytes) { out.push_back({type, name, bytes}); }

const Seed kJpeg = {0xFF, 0xD8, 0xFF, 0xE0, 0, 16, 'J', 'F', 'I', 'F', 0, 1, 1, 0, 0, 1, 0, 1, 0, 0, 0xFF, 0xD9};

Seed Id3Frames(int version) {
    const uint8_t enc = version == 4 ? 3 : 0;
    return Id3Tag(
        version, {Id3Frame(version, "TIT2", TextBody(enc, "Title")), Id3Frame(version, "TPE1", TextBody(enc, "Artist")),
                  Id3Frame(version, "TALB", TextBody(enc, "Album")),
                  Id3Frame(version, "TCON", TextBody(enc, "(13)Pop")), Id3Frame(version, "TRCK", TextBody(enc, "3/12")),
                  Id3Frame(version, version == 4 ? "TDRC" : "TYER", TextBody(enc, "2009")),
                  Id3Frame(version, "TCOM", TextBytes(1, {0xFF, 0xFE, 'C', 0, 'o', 0})),
                  Id3Frame(version, "COMM", Bytes().u8(0).str("eng").u8(0).str("Note").data()),
                  Id3Frame(version, "APIC", ApicBody("image/jpeg", kJpeg, "cover"))});
}

void AddMp3Files(Files& out) {
    const Id3v1Fields v1{"Title", "Artist", "", "", "", 4, 13};
    const Mp3Shape mpeg2{2, 3, 8, 0, 0, 3}, layer2{3, 2}, mpeg25{0, 3, 5};
    const XingFields xing{0xF, 40, 40 * Mp3FrameSize({})};
    const VbriFields vbri{0x0102, 1, 4, 40 * Mp3FrameSize({}), 40};

    Add(out, MEDIA_TYPE_MP3, "frames.mp3", Mp3Frames(40));
    Add(out, MEDIA_TYPE_MP3, "id3v23.mp3", Join({Id3Frames(3), Mp3Frames(20), Id3v1(v1)}));
    Add(out, MEDIA_TYPE_MP3, "id3v24.mp3", Join({Id3Frames(4), Mp3Frames(20)}));
    Add(out, MEDIA_TYPE_MP3, "id3v22.mp3",
        Join({Id3Tag(2, {Id3Frame22("TT2", TextBody(0, "Title")), Id3Frame22("TP1", TextBody(0, "Artist")),
                         Id3Frame22("PIC", Bytes().u8(0).str("JPG").u8(3).u8(0).raw(kJpeg).data())}),
              Mp3Frames(20)}));
    Add(out, MEDIA_TYPE_MP3, "unsync.mp3",
        Join(
            {Id3Tag(3, {Unsynchronise(Id3Frame(3, "APIC", ApicBody("image/jpeg", kJpeg)))}, 16, 0x80), Mp3Frames(10)}));
    Add(out, MEDIA_TYPE_MP3, "xing.mp3", Join({XingFrame(xing), Mp3Frames(40)}));
    Add(out, MEDIA_TYPE_MP3, "vbri.mp3", Join({VbriFrame(vbri), Mp3Frames(40)}));
    Add(out, MEDIA_TYPE_MP3, "mpeg2-mono.mp3", Mp3Frames(30, mpeg2));
    Add(out, MEDIA_TYPE_MP3, "layer2.mp3", Mp3Frames(30, layer2));
    Add(out, MEDIA_TYPE_MP3, "mpeg25.mp3", Mp3Frames(30, mpeg25));
}

void AddAacFiles(Files& out) {
    const std::vector<size_t> sizes(30, 180);
    AdtsFields crc = AdtsLayout(3, 1);
    crc.crc = true;
    AdifLayout adif;
    adif.pces[0].front = {true};
    adif.pces[0].comment = "pce";
    Add(out, MEDIA_TYPE_AAC, "adts-lc.aac", AdtsFrames(AdtsLayout(4, 2), sizes));
    Add(out, MEDIA_TYPE_AAC, "adts-sbr.aac", AdtsFrames(AdtsLayout(6, 2), sizes, 13));
    Add(out, MEDIA_TYPE_AAC, "adts-crc-mono.aac", AdtsFrames(crc, sizes));
    Add(out, MEDIA_TYPE_AAC, "adts-id3.aac",
        Join({Id3Frames(3), AdtsFrames(AdtsLayout(4, 2), sizes), Id3v1Titled("Title")}));
    Add(out, MEDIA_TYPE_AAC, "adif.aac", AdifFile(adif, AacBlock(true)));
}

ByteVec Meta(const ByteVec& children) { return FullBox("meta", 0, 0, Join({Hdlr("mdir"), children})); }
ByteVec Item(const std::string& type, const std::string& s) { return IlstItem(type, 1, ByteVec(s.begin(), s.end())); }

ByteVec MakerBox() {
    return FullBox(
        "@mkr", 0, 0,
        Join({FullBox("modl", 0, 0, Bytes().str("PX-100").data()),
              FullBox("thub", 0, 0, Bytes().be32(0xCAFE).be32(static_cast<uint32_t>(kJpeg.size())).raw(kJpeg)),
              FullBox("salb", 0, 0, Bytes().be16(0x15C7).str("Holiday").data())}));
}

ByteVec AudioTrak() {
    return Trak("soun", 44100, 220500,
                Join({Stsd({AudioEntry("mp4a", 2, 16, 44100, Esds(0x40, 128000, {0x12, 0x10}))}),
                      Stsz(0, 3, {100, 100, 100})}));
}

ByteVec VideoTrak() {
    ByteVec avcC =
        Box("avcC",
            Bytes().u8(1).u8(66).u8(0).u8(30).u8(0xFF).u8(0xE1).be16(4).be32(0x6742001E).u8(1).be16(2).be16(0x68CE));
    ByteVec btrt = Box("btrt", Bytes().be32(0).be32(900000).be32(750000));
    return Trak("vide", 1000, 5000,
                Join({Stsd({VisualEntry("avc1", 320, 240, Join({Box("pasp", Bytes().be32(1).be32(1)), avcC, btrt}))}),
                      Stsz(0, 3, {500, 400, 300})}),
                320, 240);
}

void AddMp4Files(Files& out) {
    const ByteVec ilst =
        Meta(Box("ilst", Join({Item("\251nam", "Title"), Item("\251ART", "Artist"), Item("\251alb", "Album"),
                               Item("\251day", "2009"), IlstItem("trkn", 0, {0, 0, 0, 3, 0, 12, 0, 0}),
                               IlstItem("gnre", 0, {0, 14}), IlstItem("covr", 13, kJpeg)})));
    const ByteVec udta3gp =
        Box("udta", Join({TextBox("titl", "Title"), TextBox("auth", "Author"), TextBox("perf", "Performer"),
                          TextBox("gnre", "Genre"), TextBox("dscp", "About"), TextBox("cprt", "(c)"), MakerBox()}));
    const ByteVec damr = Box("damr", Bytes().str("vndr").u8(0).be16(0x81FF).u8(0).u8(3));
    const ByteVec d263 = Box(
        "d263", Join({Bytes().str("vndr").u8(0).u8(10).u8(0).data(), Box("bitr", Bytes().be32(64000).be32(128000))}));
    const ByteVec camera = Join({
        Trak("soun", 8000, 40000, Join({Stsd({AudioEntry("samr", 1, 16, 8000, damr)}), Stsz(32, 250)})),
        Trak("vide", 1000, 5000, Join({Stsd({VisualEntry("s263", 176, 144, d263)}), Stsz(0, 2, {900, 800})}), 176, 144),
    });
    const ByteVec id32 = Meta(FullBox("ID32", 0, 0, Join({Bytes().be16(0x15C7).data(), Id3Frames(4)})));

    Add(out, MEDIA_TYPE_MP4, "audio.m4a", Movie(Join({Mvhd(0, 1000, 5000), AudioTrak(), Box("udta", ilst)})));
    Add(out, MEDIA_TYPE_MP4, "video.mp4", Movie(Join({Mvhd(1, 1000, 5000, 3000000000u), VideoTrak(), AudioTrak()})));
    Add(out, MEDIA_TYPE_MP4, "camera.3gp", Movie(Join({Mvhd(0, 1000, 5000), camera, udta3gp})));
    Add(out, MEDIA_TYPE_MP4, "maker-top.3gp",
        Movie(Mvhd(0, 1000, 1000), Join({Box("udta", MakerBox()), Box("mdat", ByteVec(16, 0))})));
    Add(out, MEDIA_TYPE_MP4, "id32.m4a", Movie(Join({Mvhd(0, 1000, 5000), AudioTrak(), Box("udta", id32)})));
    Add(out, MEDIA_TYPE_MP4, "qcelp.3g2",
        Movie(Join({Mvhd(0, 1000, 5000),
                    Trak("soun", 8000, 40000, Join({Stsd({AudioEntry("sqcp", 1, 16, 8000)}), Stsz(35, 250)}))})));
    Add(out, MEDIA_TYPE_MP4, "mdat-first.mp4",
        Join({Ftyp("mp42"), Box("mdat", ByteVec(64, 0)), Box("moov", Join({Mvhd(0, 600, 3000), VideoTrak()}))}));
}

void AddAsfFiles(Files& out) {
    constexpr uint64_t kSecond = 10000000;
    const std::vector<AsfDescriptor> descriptors = {
        {"WM/AlbumTitle", 0, Utf16("Album").data()},
        {"WM/Year", 0, Utf16("2009").data()},
        {"WM/TrackNumber", 3, Bytes().le32(3).data()},
        {"WM/Genre", 0, Utf16("Rock").data()},
        {"IsVBR", 2, Bytes().le32(1).data()},
        {"WM/Picture", 1, AsfWmPicture(3, "image/jpeg", "cover", Bytes(kJpeg)).data()},
    };
    const Bytes props = AsfFileProperties(4096, 3 * kSecond, 500, 128000);
    const Bytes audio = AsfAudioStream(1, 0x161, 44100, 2, 128000);
    const Bytes description = AsfContentDescription("Title", "Author", "(c)", "About", "PG");

    Add(out, MEDIA_TYPE_ASF, "audio.wma",
        AsfFile({props, audio, description, AsfExtContentDescription(descriptors), AsfStreamBitrates({{1, 128000}})}));
    Add(out, MEDIA_TYPE_ASF, "video.wmv",
        AsfFile({AsfFileProperties(8192, 5 * kSecond, 3000, 500000), audio,
                 AsfVideoStream(2, "WMV3", 320, 240, {0x4F, 0xD1, 0x1A, 0x01}),
                 AsfHeaderExtension({AsfExtStreamProperties(2, 333333), AsfMetadata(descriptors)}),
                 AsfStreamBitrates({{1, 128000}, {2, 372000}})}));
    Add(out, MEDIA_TYPE_ASF, "branding.asf",
        AsfFile({props, AsfAudioStream(1, 0x0A, 16000, 1, 20000), AsfContentBranding(3, Bytes(kJpeg), "u", "c"),
                 AsfHeaderExtension({AsfMetadata(descriptors, true)})}));
}

void AddRealMediaFiles(Files& out) {
    const RmProps two{64000, 48000, 5000, 2};
    const RmStream audio{
        0, 32000, 24000, 5000, "Audio Stream", "audio/x-pn-realaudio", RaHeaderV4(44100, 16, 2, "cook")};
    const RmStream audio5{
        0, 32000, 24000, 5000, "Audio Stream", "audio/x-pn-realaudio", RaHeaderV5(22050, 16, 1, "raac")};
    const RmStream video{1, 32000, 24000, 5000, "Video Stream", "video/x-pn-realvideo", RvHeader("RV40", 320, 240, 15)};
    const RmStream multi{
        0, 32000, 24000, 5000, "Audio Stream", "logical-fileinfo", RmMulti(2, RaHeaderV4(8000, 16, 1, "sipr"))};

    Add(out, MEDIA_TYPE_REALMEDIA, "audio.ra",
        RmFile(RmProps{}, {RmCont("Title", "Author", "(c)", "About"), RmMdpr(audio)}));
    Add(out, MEDIA_TYPE_REALMEDIA, "av.rm", RmFile(two, {RmCont("T", "A", "C", "X"), RmMdpr(audio5), RmMdpr(video)}));
    Add(out, MEDIA_TYPE_REALMEDIA, "multi.rm", RmFile(RmProps{}, {RmMdpr(multi)}));
}

void AddAviFiles(Files& out) {
    const AviMainFields main{40000, 0, 2, 320, 240};
    const Bytes hdrl = AviHdrl(main, {AviStrl(AviVideoStream(1, 25, 10), AviVideoFormat(320, 240, "XVID")),
                                      AviStrl(AviAudioStream(16000, 10), AviAudioFormat(1, 1, 8000, 16000, 2, 16))});
    std::vector<AviFrame> frames;
    for (uint32_t i = 0; i < 10; ++i) {
        frames.push_back({0, "dc", Bytes().fill(40 + i, static_cast<uint8_t>(i)), i % 5 == 0 ? 0x10u : 0u});
        frames.push_back({1, "wb", Bytes().fill(64, 0x80), 0x10u});
    }
    Add(out, MEDIA_TYPE_AVI, "video.avi", AviVideoOnly(30, 5));
    Add(out, MEDIA_TYPE_AVI, "av.avi", AviFile(hdrl, frames));
    Add(out, MEDIA_TYPE_AVI, "no-index.avi", AviFile(hdrl, frames, false));
}

void AddSpeechFiles(Files& out) {
    Add(out, MEDIA_TYPE_AMR_NB, "nb.amr", AmrFile(false, 7, 100));
    Add(out, MEDIA_TYPE_AMR_NB, "nb-mixed.amr",
        Join(
            {AmrFile(false, 2, 20), AmrFrame(false, 8).data(), AmrFrame(false, 15).data(), AmrFrame(false, 0).data()}));
    Add(out, MEDIA_TYPE_AMR_NB, "nb-mc.amr", AmrFile(false, 4, 30, 2));
    Add(out, MEDIA_TYPE_AMR_WB, "wb.awb", AmrFile(true, 8, 100));
    Add(out, MEDIA_TYPE_WAVE, "pcm.wav", CanonicalWave(1, 2, 8000, 16, 8000 * 4 * 3));
    Add(out, MEDIA_TYPE_WAVE, "adpcm.wav", CanonicalWave(0x11, 1, 8000, 4, 12000));
    Add(out, MEDIA_TYPE_WAVE, "chunks.wav",
        RiffForm("WAVE", {SpeechChunk("LIST", Bytes().str("INFOINAM").le32(4).str("abc")),
                          SpeechChunk("fmt ", WaveFmtBody(1, 1, 11025, 8)), SpeechChunk("fact", Bytes().le32(9)),
                          SpeechChunk("data", Bytes().fill(11025 * 2, 0x80))}));
    Add(out, MEDIA_TYPE_QCP, "qcelp.qcp",
        RiffForm("QLCM",
                 {QcpFmtChunk(kQcelpGuid1, 13000), QcpVratChunk(100), SpeechChunk("data", SpeechPackets(4, 34, 100))}));
    // Its packets are counted with the rates of the codec read last on the
    // thread: after "qcelp.qcp", QCELP's.
    Add(out, MEDIA_TYPE_QCP, "smv.qcp",
        RiffForm("QLCM", {QcpFmtChunk(kSmvGuid, 0), SpeechChunk("data", SpeechPackets(4, 34, 200))}));
    Add(out, MEDIA_TYPE_QCP, "evrc.qcp",
        RiffForm("QLCM", {SpeechChunk("labl", Bytes().str("abc")), QcpFmtChunk(kEvrcGuid, 0),
                          SpeechChunk("data", SpeechPackets(4, 22, 50).raw(SpeechPackets(2, 5, 49)))}));
    Add(out, MEDIA_TYPE_EVRC, "speech.evc", EvrcFile(SpeechPackets(4, 22, 100)));
    Add(out, MEDIA_TYPE_MIDI, "song.mid",
        Bytes().str("MThd").be32(6).be16(0).be16(1).be16(96).str("MTrk").be32(4).u8(0).u8(0xFF).u8(0x2F).u8(0).data());
    Add(out, MEDIA_TYPE_MIDI, "tune.imy",
        Bytes().str("BEGIN:IMELODY\r\nVERSION:1.2\r\nMELODY:c2d2\r\nEND:IMELODY\r\n").data());
    Add(out, MEDIA_TYPE_SND, "tone.snd",
        Bytes().str(".snd").be32(24).be32(64).be32(2).be32(8000).be32(1).zeros(64).data());
}

}  // namespace

std::vector<FixtureFile> FixtureFiles() {
    Files files;
    AddMp3Files(files);
    AddAacFiles(files);
    AddMp4Files(files);
    AddAsfFiles(files);
    AddRealMediaFiles(files);
    AddAviFiles(files);
    AddSpeechFiles(files);
    return files;
}

}  // namespace testing_support
