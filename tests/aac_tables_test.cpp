// The compiled AAC tables must be those of the table data they were generated
// from (when the data file is at hand).
#include <gtest/gtest.h>

#include <fstream>
#include <map>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "aac/aac_tables.h"

using metainfo::HuffNode;
using metainfo::kHuffLeaf;

namespace {

struct TableData {
    // book -> index -> (length, code)
    std::map<int, std::map<int, std::pair<int, uint32_t>>> codes;
    std::map<int, std::vector<int>> books;  // dimension, lav, signed, escape
    std::map<int, std::vector<int>> swbLong, swbShort;
    std::map<int, int> predSfbMax;
};

std::string TablePath() {
#ifdef METAINFO_CORPUS_DIR
    return std::string(METAINFO_CORPUS_DIR) + "/../data/aac_tables.tsv";
#else
    return "";
#endif
}

bool LoadTables(TableData* t) {
    std::ifstream in(TablePath());
    if (!in) return false;
    std::string line;
    while (std::getline(in, line)) {
        if (line.empty() || line[0] == '#') continue;
        std::istringstream cols(line);
        std::string kind;
        cols >> kind;
        if (kind == "huffman") {
            int book, index, length;
            std::string hex;
            cols >> book >> index >> length >> hex;
            t->codes[book][index] = {length, static_cast<uint32_t>(std::stoul(hex, nullptr, 16))};
        } else if (kind == "books") {
            int book, v;
            cols >> book;
            while (cols >> v) t->books[book].push_back(v);
        } else if (kind == "swb_long" || kind == "swb_short") {
            int sf, num, v;
            cols >> sf >> num;
            auto& list = (kind == "swb_long" ? t->swbLong : t->swbShort)[sf];
            while (cols >> v) list.push_back(v);
        } else if (kind == "pred_sfb_max") {
            int sf, v;
            cols >> sf >> v;
            t->predSfbMax[sf] = v;
        }
    }
    return true;
}

// Every leaf of a tree with the bits that lead to it.
void CollectLeaves(const HuffNode* tree, int nodes, int at, int length, uint32_t code,
                   std::map<int, std::pair<int, uint32_t>>* out, int* visited) {
    ASSERT_LT(at, nodes);
    ASSERT_LE(length, 32);
    ++*visited;
    if (tree[at].zero & kHuffLeaf) {
        const int index = tree[at].zero & ~kHuffLeaf;
        EXPECT_EQ(0u, out->count(index)) << "index " << index << " twice";
        (*out)[index] = {length, code};
        return;
    }
    CollectLeaves(tree, nodes, tree[at].zero, length + 1, code << 1, out, visited);
    CollectLeaves(tree, nodes, tree[at].one, length + 1, code << 1 | 1, out, visited);
}

}  // namespace

TEST(AacTables, HuffmanTreesHoldExactlyTheCodebooksOfTheTableData) {
    TableData t;
    if (!LoadTables(&t)) GTEST_SKIP() << "no table data at " << TablePath();
    ASSERT_EQ(12u, t.codes.size());
    for (int book = 0; book < 12; ++book) {
        const HuffNode* tree = book == 0 ? metainfo::hcb_sf : metainfo::hcb_table[book].tree;
        const int nodes = book == 0 ? metainfo::kScaleFactorNodes : metainfo::hcb_table[book].nodes;
        std::map<int, std::pair<int, uint32_t>> leaves;
        int visited = 0;
        CollectLeaves(tree, nodes, 0, 0, 0, &leaves, &visited);
        EXPECT_EQ(nodes, visited) << "book " << book << ": every node is reached once";
        EXPECT_EQ(t.codes[book], leaves) << "book " << book;
    }
}

TEST(AacTables, SpectralBookShapesMatchTheTableData) {
    TableData t;
    if (!LoadTables(&t)) GTEST_SKIP() << "no table data at " << TablePath();
    for (int book = 1; book <= 11; ++book) {
        const metainfo::SpectralBook& b = metainfo::hcb_table[book];
        const std::vector<int> expected = t.books[book];
        ASSERT_EQ(4u, expected.size()) << book;
        EXPECT_EQ(expected[0], b.dimension) << book;
        EXPECT_EQ(expected[1], b.lav) << book;
        EXPECT_EQ(expected[2] != 0, b.isSigned) << book;
        EXPECT_EQ(expected[3] != 0, b.escape) << book;
    }
}

TEST(AacTables, BandOffsetsAndPredictionLimitsMatchTheTableData) {
    TableData t;
    if (!LoadTables(&t)) GTEST_SKIP() << "no table data at " << TablePath();
    for (int sf = 0; sf < metainfo::kSamplingIndexCount; ++sf) {
        const int numLong = metainfo::num_swb_long_window[sf];
        const int numShort = metainfo::num_swb_short_window[sf];
        EXPECT_EQ(t.swbLong[sf], std::vector<int>(metainfo::swb_offset_long_window[sf],
                                                  metainfo::swb_offset_long_window[sf] + numLong + 1))
            << sf;
        EXPECT_EQ(t.swbShort[sf], std::vector<int>(metainfo::swb_offset_short_window[sf],
                                                   metainfo::swb_offset_short_window[sf] + numShort + 1))
            << sf;
        EXPECT_EQ(t.predSfbMax[sf], metainfo::pred_sfb_max[sf]) << sf;
    }
}
