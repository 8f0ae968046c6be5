#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <unistd.h>
#include <thread>
#include <vector>

#include "core/file_access.h"
#include "support/bytes.h"

using metainfo::GetFileExtension;
using metainfo::GetUINT32;
using metainfo::MEx_fclose;
using metainfo::MEx_feof;
using metainfo::MEx_fopen;
using metainfo::MEx_fread;
using metainfo::MEx_fseek;
using metainfo::MEx_ftell;
using metainfo::MEx_fwrite;
using metainfo::MEx_stat;
using testing_support::Bytes;
using testing_support::TempDir;

namespace {

std::string Extension(const char* path, int* result) {
    char ext[10] = {0};
    *result = GetFileExtension(path, ext);
    return ext;
}

}  // namespace

TEST(PlainFile, ReadsItemsSeeksAndTellsLikeStdio) {
    TempDir dir;
    std::string path = dir.Write("a.bin", Bytes().str("0123456789"));
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    char buf[8] = {0};
    EXPECT_EQ(MEx_fread(buf, 4, 2, h), 2);  // items, not bytes
    EXPECT_EQ(std::string(buf, 8), "01234567");
    EXPECT_EQ(MEx_ftell(h), 8);
    EXPECT_EQ(MEx_fread(buf, 4, 1, h), 0);  // only 2 bytes left: no whole item
    EXPECT_NE(MEx_feof(h), 0);
    EXPECT_EQ(MEx_fseek(h, -3, SEEK_END), 0);
    EXPECT_EQ(MEx_fread(buf, 1, 8, h), 3);
    EXPECT_EQ(MEx_fseek(h, 2, SEEK_SET), 0);
    EXPECT_EQ(MEx_fseek(h, 1, SEEK_CUR), 0);
    EXPECT_EQ(MEx_ftell(h), 3);
    EXPECT_EQ(MEx_fclose(h), 0);
}

TEST(PlainFile, PathsOfFourCharactersOrFewerNeverOpen) {
    TempDir dir;
    dir.Write("abcd", Bytes().str("data"));
    char cwd[4096];
    ASSERT_NE(getcwd(cwd, sizeof cwd), nullptr);
    ASSERT_EQ(chdir(dir.path().c_str()), 0);
    struct stat st;
    EXPECT_EQ(MEx_fopen("abcd", "rb"), 0);
    EXPECT_EQ(MEx_stat("abcd", &st), -1);
    int h = MEx_fopen("./abcd", "rb");
    EXPECT_NE(h, 0) << "the same file under a five-character path opens";
    MEx_fclose(h);
    ASSERT_EQ(chdir(cwd), 0);
}

TEST(PlainFile, MissingFileFailsAndStatReportsSize) {
    TempDir dir;
    EXPECT_EQ(MEx_fopen(dir.PathOf("missing.mp3").c_str(), "rb"), 0);
    std::string path = dir.Write("sized.bin", Bytes().zeros(1234));
    struct stat st;
    ASSERT_EQ(MEx_stat(path.c_str(), &st), 0);
    EXPECT_EQ(st.st_size, 1234);
    EXPECT_NE(MEx_stat(dir.PathOf("missing.mp3").c_str(), &st), 0);
}

TEST(PlainFile, WritesThroughAWritableHandle) {
    TempDir dir;
    std::string path = dir.PathOf("out.bin");
    int h = MEx_fopen(path.c_str(), "wb");
    ASSERT_NE(h, 0);
    EXPECT_EQ(MEx_fwrite("abcdef", 3, 2, h), 2);
    MEx_fclose(h);
    EXPECT_EQ(testing_support::ReadFileBytes(path), Bytes().str("abcdef").data());
}

TEST(BadHandle, EveryCallAnswersMinusOneAndCloseAnswersZero) {
    char buf[4];
    for (int h : {0, -5, 1, 0x7FFFFFFF}) {
        EXPECT_EQ(MEx_fread(buf, 1, 4, h), -1);
        EXPECT_EQ(MEx_fwrite(buf, 1, 4, h), -1);
        EXPECT_EQ(MEx_fseek(h, 0, SEEK_SET), -1);
        EXPECT_EQ(MEx_ftell(h), -1);
        EXPECT_EQ(MEx_feof(h), -1);
        EXPECT_EQ(MEx_fclose(h), 0);
    }
}

TEST(BadHandle, AClosedHandleIsRefusedEvenAfterItsSlotIsReused) {
    TempDir dir;
    std::string path = dir.Write("a.bin", Bytes().str("abcd"));
    int first = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(first, 0);
    MEx_fclose(first);
    std::vector<int> open;
    for (int i = 0; i < 64; ++i) open.push_back(MEx_fopen(path.c_str(), "rb"));
    char buf[4];
    EXPECT_EQ(MEx_fread(buf, 1, 4, first), -1);
    for (int h : open) {
        EXPECT_NE(h, first);
        MEx_fclose(h);
    }
}

TEST(BadHandle, ManyThreadsOpenReadAndCloseIndependently) {
    TempDir dir;
    std::string path = dir.Write("shared.bin", Bytes().str("0123456789abcdef"));
    std::vector<std::thread> threads;
    std::vector<int> failures(8, 0);
    for (int t = 0; t < 8; ++t) {
        threads.emplace_back([&, t] {
            for (int i = 0; i < 200; ++i) {
                int h = MEx_fopen(path.c_str(), "rb");
                char c = 0;
                if (h == 0 || MEx_fseek(h, t, SEEK_SET) != 0 || MEx_fread(&c, 1, 1, h) != 1 ||
                    c != "0123456789abcdef"[t]) {
                    ++failures[static_cast<size_t>(t)];
                }
                MEx_fclose(h);
            }
        });
    }
    for (auto& th : threads) th.join();
    for (int f : failures) EXPECT_EQ(f, 0);
}

TEST(GetUINT32, ReadsBothByteOrdersAndZeroFillsAShortRead) {
    TempDir dir;
    std::string path = dir.Write("w.bin", Bytes{0x12, 0x34, 0x56, 0x78, 0x9A, 0xBC});
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    EXPECT_EQ(GetUINT32(h, false), 0x12345678u);
    EXPECT_EQ(GetUINT32(h, true), 0x0000BC9Au);
    MEx_fseek(h, 0, SEEK_SET);
    EXPECT_EQ(GetUINT32(h, true), 0x78563412u);
    MEx_fclose(h);
}

TEST(GetFileExtension, TakesTheLastDotBeforeAContentIdSuffix) {
    int r = -1;
    EXPECT_EQ(Extension("/a/b.music.mp3?cid=x.y", &r), ".mp3");
    EXPECT_EQ(r, 0);
    EXPECT_EQ(Extension("/a/b", &r), "");
    EXPECT_EQ(r, 1);
    EXPECT_EQ(Extension("/x/song.abcdefghijk", &r), ".abcdefgh");
    EXPECT_EQ(Extension("/dir.d/file", &r), ".d/file") << "a dot in a directory counts";
    EXPECT_EQ(Extension("/x/Song.MP3", &r), ".MP3") << "case is kept";
}

TEST(GetFileExtension, AVeryLongPathIsCutNotOverrun) {
    std::string path(6000, 'a');
    path += ".mp3";
    int r = -1;
    EXPECT_EQ(Extension(path.c_str(), &r), "");
    EXPECT_EQ(r, 1) << "only the first 4095 characters are looked at";
    std::string shorter(100, 'b');
    shorter += ".wav";
    EXPECT_EQ(Extension(shorter.c_str(), &r), ".wav");
}
