#include "support/speech_builder.h"

#include <cstdio>

namespace testing_support {
namespace {

const uint32_t kNbFrameBytes[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 0, 0, 0, 0, 0, 0, 1};
const uint32_t kWbFrameBytes[16] = {18, 24, 33, 37, 41, 47, 51, 59, 61, 6, 0, 0, 0, 0, 0, 1};

}  // namespace

const std::vector<uint8_t> kQcelpGuid1 = {0x41, 0x6D, 0x7F, 0x5E, 0x15, 0xB1, 0xD0, 0x11,
                                          0xBA, 0x91, 0x00, 0x80, 0x5F, 0xB4, 0xB9, 0x7E};
const std::vector<uint8_t> kQcelpGuid2 = {0x42, 0x6D, 0x7F, 0x5E, 0x15, 0xB1, 0xD0, 0x11,
                                          0xBA, 0x91, 0x00, 0x80, 0x5F, 0xB4, 0xB9, 0x7E};
const std::vector<uint8_t> kEvrcGuid = {0x8D, 0xD4, 0x89, 0xE6, 0x76, 0x90, 0xB5, 0x46,
                                        0x91, 0xEF, 0x73, 0x6A, 0x51, 0x00, 0xCE, 0xB4};
const std::vector<uint8_t> kSmvGuid = {0x75, 0x2B, 0x7C, 0x8D, 0x97, 0xA7, 0x49, 0xED,
                                       0x98, 0x5E, 0xD5, 0x3C, 0x8C, 0xC7, 0x5F, 0x84};

Bytes SpeechChunk(const std::string& id, const Bytes& body) {
    Bytes b;
    b.str(id).le32(static_cast<uint32_t>(body.size())).raw(body);
    return b;
}

std::vector<uint8_t> RiffForm(const std::string& form, const std::vector<Bytes>& chunks) {
    Bytes body;
    body.str(form);
    for (const Bytes& c : chunks) body.raw(c);
    return SpeechChunk("RIFF", body).data();
}

Bytes WaveFmtBody(uint16_t tag, uint16_t channels, uint32_t rate, uint16_t bits) {
    uint32_t blockAlign = uint32_t{channels} * bits / 8;
    Bytes b;
    b.le16(tag).le16(channels).le32(rate).le32(rate * blockAlign).le16(blockAlign).le16(bits);
    return b;
}

std::vector<uint8_t> CanonicalWave(uint16_t tag, uint16_t channels, uint32_t rate, uint16_t bits, uint32_t dataBytes) {
    return RiffForm("WAVE", {SpeechChunk("fmt ", WaveFmtBody(tag, channels, rate, bits)),
                             SpeechChunk("data", Bytes().fill(dataBytes, 0x80))});
}

Bytes AmrFrame(bool wideBand, int frameType, bool quality) {
    Bytes b;
    b.u8(static_cast<uint32_t>((frameType & 15) << 3) | (quality ? 0x04u : 0u));
    uint32_t size = wideBand ? kWbFrameBytes[frameType & 15] : kNbFrameBytes[frameType & 15];
    if (size > 1) b.zeros(size - 1);
    return b;
}

std::vector<uint8_t> AmrFile(bool wideBand, int frameType, uint32_t frames, uint32_t channels) {
    Bytes b;
    if (channels == 0)
        b.str(wideBand ? "#!AMR-WB\n" : "#!AMR\n");
    else
        b.str(wideBand ? "#!AMR-WB_MC1.0\n" : "#!AMR_MC1.0\n").be32(channels);
    Bytes frame = AmrFrame(wideBand, frameType);
    for (uint32_t i = 0; i < frames; ++i) b.raw(frame);
    return b.data();
}

Bytes QcpFmtChunk(const std::vector<uint8_t>& guid, uint16_t avgBitrate) {
    Bytes body;
    body.u8(1).u8(0).raw(guid).le16(1);
    std::string name = "speech";
    body.str(name).zeros(80 - name.size());
    body.le16(avgBitrate).le16(35).le16(160).le16(8000).le16(16);
    body.le32(5);
    for (uint32_t i = 0; i < 8; ++i) body.u8(i < 5 ? 4 - i : 0).u8(i < 5 ? 4 - i : 0);
    body.zeros(20);
    return SpeechChunk("fmt ", body);
}

Bytes QcpVratChunk(uint32_t packets) { return SpeechChunk("vrat", Bytes().le32(1).le32(packets)); }

Bytes SpeechPackets(uint8_t rate, uint32_t payloadBytes, uint32_t count) {
    Bytes b;
    for (uint32_t i = 0; i < count; ++i) b.u8(rate).zeros(payloadBytes);
    return b;
}

std::vector<uint8_t> EvrcFile(const Bytes& packets) { return Bytes().str("#!EVRC\n").raw(packets).data(); }

std::string SpeechFile(const std::string& name, const std::vector<uint8_t>& bytes) {
    static TempDir dir;
    return dir.Write(name, bytes);
}

double FfprobePlayTime(const std::string& file) {
    std::string cmd = "/usr/bin/ffprobe -v error -show_entries packet=pts_time,duration_time -of csv=p=0 '";
    FILE* p = popen((cmd + file + "'").c_str(), "r");
    if (p == nullptr) return -1;
    char line[128];
    double end = -1;
    while (std::fgets(line, sizeof line, p) != nullptr) {
        double pts = 0;
        double duration = 0;
        if (std::sscanf(line, "%lf,%lf", &pts, &duration) == 2) end = pts + duration;
    }
    pclose(p);
    return end;
}

}  // namespace testing_support
