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

const std::string kTablePath = std::string(METAINFO_CORPUS_DIR) + "/../data/aac_tables.tsv";

// Each line of the data file as a kind and its numbers; codewords are hex.
bool LoadTables(std::map<std::string, std::vector<std::vector<long>>>* rows) {
    std::ifstream in(kTablePath);
    std::string line;
    while (std::getline(in, line)) {
        if (line.empty() || line[0] == '#') continue;
        std::istringstream cols(line);
        std::string kind, field;
        cols >> kind;
        std::vector<long> values;
        while (cols >> field) values.push_back(std::stol(field, nullptr, kind == "huffman" && values.size() == 3 ? 16 : 10));
        (*rows)[kind].push_back(values);
    }
    return !rows->empty();
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

// The Huffman trees hold exactly the codebooks; book shapes, band offsets and
// prediction limits are the listed ones.
TEST(AacTables, CompiledTablesAreThoseOfTheTableData) {
    std::map<std::string, std::vector<std::vector<long>>> rows;
    if (!LoadTables(&rows)) GTEST_SKIP() << "no table data at " << kTablePath;
    std::map<int, std::map<int, std::pair<int, uint32_t>>> codes;
    for (const auto& r : rows["huffman"]) codes[static_cast<int>(r[0])][static_cast<int>(r[1])] = {static_cast<int>(r[2]), static_cast<uint32_t>(r[3])};
    ASSERT_EQ(12u, codes.size());
    for (int book = 0; book < 12; ++book) {
        const HuffNode* tree = book == 0 ? metainfo::hcb_sf : metainfo::hcb_table[book].tree;
        const int nodes = book == 0 ? metainfo::kScaleFactorNodes : metainfo::hcb_table[book].nodes;
        std::map<int, std::pair<int, uint32_t>> leaves;
        int visited = 0;
        CollectLeaves(tree, nodes, 0, 0, 0, &leaves, &visited);
        EXPECT_EQ(nodes, visited) << "book " << book << ": every node is reached once";
        EXPECT_EQ(codes[book], leaves) << "book " << book;
    }
    ASSERT_EQ(11u, rows["books"].size());
    for (const auto& r : rows["books"]) {
        const metainfo::SpectralBook& b = metainfo::hcb_table[r[0]];
        EXPECT_EQ(std::vector<long>(r.begin() + 1, r.end()),
                  (std::vector<long>{b.dimension, b.lav, b.isSigned ? 1 : 0, b.escape ? 1 : 0}))
            << "book " << r[0];
    }
    ASSERT_EQ(static_cast<size_t>(metainfo::kSamplingIndexCount), rows["pred_sfb_max"].size());
    for (const auto& r : rows["pred_sfb_max"]) EXPECT_EQ(r[1], metainfo::pred_sfb_max[r[0]]) << r[0];
    for (const bool isLong : {true, false}) {
        const auto& table = rows[isLong ? "swb_long" : "swb_short"];
        ASSERT_EQ(static_cast<size_t>(metainfo::kSamplingIndexCount), table.size());
        for (const auto& r : table) {
            const int sf = static_cast<int>(r[0]);
            const int num = isLong ? metainfo::num_swb_long_window[sf] : metainfo::num_swb_short_window[sf];
            const uint16_t* offsets = isLong ? metainfo::swb_offset_long_window[sf] : metainfo::swb_offset_short_window[sf];
            std::vector<long> compiled{num};
            compiled.insert(compiled.end(), offsets, offsets + num + 1);
            EXPECT_EQ(std::vector<long>(r.begin() + 1, r.end()), compiled) << sf << (isLong ? " long" : " short");
        }
    }
}
