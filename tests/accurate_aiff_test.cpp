// AIFF and AIFC files as the accurate interface reads them: chunks built one
// by one, every compression type, texts and an ID3 chunk.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "support/bytes.h"
#include "support/flac_builder.h"
#include "support/id3_builder.h"

using namespace testing_support;

namespace {

const Bytes kSound = Bytes().be32(0).be32(0).zeros(64);

struct Row {
    const char* name;
    Bytes file;
    std::string summary;
};

Bytes Aifc(const std::string& compression, uint16_t bits, uint32_t frames = 16000) {
    return AiffForm("AIFC",
                    {AiffChunk("FVER", Bytes().be32(0xA2805140)),
                     AiffChunk("COMM", AiffComm(1, frames, bits, 16000, compression)), AiffChunk("SSND", kSound)});
}

TEST(AccurateAiff, FactsOfBuiltChunks) {
    const std::vector<Row> rows = {
        {"AIFF with texts; the rate a fraction of a hertz off",
         AiffForm("AIFF", {AiffChunk("NAME", Bytes().str("T\xE9")), AiffChunk("AUTH", Bytes().str(" A ")),
                           AiffChunk("ANNO", Bytes().str("N")), AiffChunk("(c) ", Bytes().str("2020 X")),
                           AiffChunk("COMM", Bytes(AiffComm(2, 66150, 16, 44100)).patch_be32(14, 1)),
                           AiffChunk("SSND", kSound)}),
         "aiff audio/aiff 1500 | pcm_s16be 44100x2x16 1411200 | T\xC3\xA9;A;;;;;0;0/0;0/0;N; COPYRIGHT=2020 X"},
        {"12-bit samples stored in 16", AiffForm("AIFF", {AiffChunk("COMM", AiffComm(1, 8000, 12, 8000))}),
         "aiff audio/aiff 1000 | pcm_s16be 8000x1x16 128000 | ;;;;;;0;0/0;0/0;;"},
        {"an ID3 chunk wins over NAME",
         AiffForm("AIFF", {AiffChunk("COMM", AiffComm(1, 8000, 8, 8000)), AiffChunk("NAME", Bytes().str("N")),
                           AiffChunk("AUTH", Bytes().str("Au")),
                           AiffChunk("ID3 ", Bytes(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "Id3"))})))}),
         "aiff audio/aiff 1000 | pcm_s8 8000x1x8 64000 | Id3;Au;;;;;0;0/0;0/0;;"},
        {"AIFC none", Aifc("NONE", 24), "aiff audio/aiff 1000 | pcm_s24be 16000x1x24 384000 | ;;;;;;0;0/0;0/0;;"},
        {"AIFC twos", Aifc("twos", 32), "aiff audio/aiff 1000 | pcm_s32be 16000x1x32 512000 | ;;;;;;0;0/0;0/0;;"},
        {"AIFC sowt", Aifc("sowt", 16), "aiff audio/aiff 1000 | pcm_s16le 16000x1x16 256000 | ;;;;;;0;0/0;0/0;;"},
        {"AIFC fl32", Aifc("fl32", 32), "aiff audio/aiff 1000 | pcm_f32be 16000x1x32 512000 | ;;;;;;0;0/0;0/0;;"},
        {"AIFC fl64", Aifc("fl64", 64), "aiff audio/aiff 1000 | pcm_f64be 16000x1x64 1024000 | ;;;;;;0;0/0;0/0;;"},
        {"AIFC ulaw", Aifc("ulaw", 16), "aiff audio/aiff 1000 | pcm_mulaw 16000x1x8 128000 | ;;;;;;0;0/0;0/0;;"},
        {"AIFC alaw", Aifc("alaw", 16), "aiff audio/aiff 1000 | pcm_alaw 16000x1x8 128000 | ;;;;;;0;0/0;0/0;;"},
        {"AIFC ima4 counts packets of 64", Aifc("ima4", 0, 250),
         "aiff audio/aiff 1000 | adpcm_ima_qt 16000x1x4 68000 | ;;;;;;0;0/0;0/0;;"},
        {"no COMM", AiffForm("AIFF", {AiffChunk("SSND", kSound)}), "error 8"},
        {"a chunk past the end",
         AiffForm("AIFF", {AiffChunk("COMM", AiffComm(1, 8, 8, 8000)), Bytes().str("SSND").be32(999)}),
         "aiff audio/aiff 1 | pcm_s8 8000x1x8 64000 | ;;;;;;0;0/0;0/0;;"},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        TempDir dir;
        EXPECT_EQ(ProbeSummary(dir.Write("f.aif", row.file.data())), row.summary);
    }
    // The C interface answers for AIFF files as it always has.
    TempDir dir;
    int type = -1;
    const std::string path = dir.Write("f.aif", rows[0].file.data());
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    EXPECT_EQ(type, MEDIA_TYPE_UNKNOWN);
}

}  // namespace
