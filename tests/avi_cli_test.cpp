// The metainfo tool over byte-built AVI and RealMedia files: "probe" shows
// both formats and "frames" reads the index and frames through the exported
// parser object.
#include <gtest/gtest.h>

#include <limits.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "support/avi_builder.h"
#include "support/bytes.h"
#include "support/rm_builder.h"

using namespace testing_support;

namespace {

// The tool is built beside the test directory; "" when it is not there.
std::string ToolPath() {
    char self[PATH_MAX] = {};
    if (readlink("/proc/self/exe", self, sizeof self - 1) <= 0) return "";
    std::string dir(self);
    dir = dir.substr(0, dir.rfind('/'));
    std::string tool = dir.substr(0, dir.rfind('/')) + "/metainfo";
    return access(tool.c_str(), X_OK) == 0 ? tool : "";
}

int RunTool(const std::string& args, std::string* out) {
    FILE* p = popen((ToolPath() + " " + args + " 2>&1").c_str(), "r");
    if (p == nullptr) return -1;
    char buf[256];
    while (fgets(buf, sizeof buf, p) != nullptr) *out += buf;
    int status = pclose(p);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

}  // namespace

TEST(MetainfoTool, FramesListsEntriesAndReadsFramesFromTheSeekPoint) {
    if (ToolPath().empty()) GTEST_SKIP() << "metainfo tool not built beside the tests";
    TempDir dir;
    std::string path = dir.Write("clip.avi", AviVideoOnly(20, 5));
    std::string out;
    ASSERT_EQ(RunTool("frames '" + path + "' --stream 0 --seek 500", &out), 0) << out;
    EXPECT_NE(out.find("index: 20 entries"), std::string::npos) << out;
    EXPECT_NE(out.find("#19     00dc time 760 ms, size 9, -"), std::string::npos) << out;
    EXPECT_NE(out.find("seek to 500 ms: at 400 ms"), std::string::npos) << out;
    EXPECT_NE(out.find("time 400 ms, size 7, key"), std::string::npos) << out;
    EXPECT_NE(out.find("9 frame(s)"), std::string::npos) << out << "frames 10..18; the last entry stays";

    EXPECT_EQ(RunTool("frames '" + path + "' --stream 3", &out), 1);
    EXPECT_EQ(RunTool("frames", &out), 2);
    std::string rm = dir.Write("clip.rm", RmFile(RmProps(), {RmMdpr(RmStream())}));
    EXPECT_EQ(RunTool("frames '" + rm + "'", &out), 1) << "not an AVI file";
}

TEST(MetainfoTool, ProbeShowsAviAndRealMedia) {
    if (ToolPath().empty()) GTEST_SKIP() << "metainfo tool not built beside the tests";
    TempDir dir;
    std::string avi = dir.Write("clip.avi", AviVideoOnly(50, 10));
    RmStream audio;
    audio.typeData = RaHeaderV4(22050, 16, 1, "cook");
    std::string rm = dir.Write("clip.rm", RmFile(RmProps(), {RmCont("Song", "", "", ""), RmMdpr(audio)}));
    std::string out;
    ASSERT_EQ(RunTool("probe '" + avi + "' '" + rm + "'", &out), 0) << out;
    EXPECT_NE(out.find("media type: 11 (avi)"), std::string::npos) << out;
    EXPECT_NE(out.find("16x16, 25 fps"), std::string::npos) << out;
    EXPECT_NE(out.find("media type: 2 (realmedia)"), std::string::npos) << out;
    EXPECT_NE(out.find("CODEC_RMAUDIO_COOK"), std::string::npos) << out;
    EXPECT_NE(out.find("Song"), std::string::npos) << out;
}
