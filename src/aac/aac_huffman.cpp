#include "aac/aac_huffman.h"

#include <vector>

#include "aac/aac_tables.h"

namespace metainfo {
namespace {

constexpr int kBooks = 12;
// The deepest codeword of any book has 19 bits.
constexpr int kMaxDepth = 32;

struct Tree {
    const HuffNode* nodes;
    int count;
    bool IsLeaf(int n) const { return (nodes[n].zero & kHuffLeaf) != 0; }
};

// Depth of the deepest codeword below node n (0 for a leaf or a missing node).
int DepthBelow(const Tree& t, int n, int depth = 0) {
    if (n >= t.count || t.IsLeaf(n) || depth >= kMaxDepth) return 0;
    const int zero = DepthBelow(t, t.nodes[n].zero, depth + 1);
    const int one = DepthBelow(t, t.nodes[n].one, depth + 1);
    return 1 + (zero > one ? zero : one);
}

class Builder {
public:
    Builder(const Tree& tree, const SpectralBook* book) : tree_(tree), book_(book) {}

    std::vector<HuffEntry> Build() {
        table_.assign(size_t{1} << kHuffRootBits, HuffEntry{0, 0, 0});
        Fill(0, 0, kHuffRootBits, 0, 0, 0);
        return table_;
    }

private:
    // Fills the entries of table `base` (indexed by `width` bits) that start
    // with the `depth` bits of `code`, which lead to node n, `total` bits from
    // the root.
    void Fill(int n, size_t base, int width, uint32_t code, int depth, int total) {
        if (n >= tree_.count) return Spread(base, width, code, depth, HuffEntry{0, Bits(total), 0});
        if (tree_.IsLeaf(n)) {
            const auto index = static_cast<uint16_t>(tree_.nodes[n].zero & (kHuffLeaf - 1));
            return Spread(base, width, code, depth, HuffEntry{index, Bits(total), LeafFlags(index)});
        }
        if (depth == width) {
            const int below = DepthBelow(tree_, n);
            const size_t sub = table_.size();
            table_.resize(sub + (size_t{1} << below), HuffEntry{0, 0, 0});
            table_[base + code] = HuffEntry{static_cast<uint16_t>(sub), Bits(below), kHuffEntryLink};
            return Fill(n, sub, below, 0, 0, total);
        }
        Fill(tree_.nodes[n].zero, base, width, code << 1, depth + 1, total + 1);
        Fill(tree_.nodes[n].one, base, width, code << 1 | 1, depth + 1, total + 1);
    }

    void Spread(size_t base, int width, uint32_t code, int depth, HuffEntry e) {
        const int free = width - depth;
        const size_t first = base + (static_cast<size_t>(code) << free);
        for (size_t i = 0; i < (size_t{1} << free); ++i) table_[first + i] = e;
    }

    static uint8_t Bits(int n) { return static_cast<uint8_t>(n); }

    // Sign bits and escapes of an unsigned spectral codeword.
    uint8_t LeafFlags(int index) const {
        uint8_t flags = kHuffEntryLeaf;
        if (book_ == nullptr || book_->isSigned) return flags;
        int values[4] = {};
        int count = 2;
        if (book_->dimension == 4) {
            values[0] = index / 27;
            values[1] = index / 9 % 3;
            values[2] = index / 3 % 3;
            values[3] = index % 3;
            count = 4;
        } else {
            values[0] = index / (book_->lav + 1);
            values[1] = index % (book_->lav + 1);
        }
        int signs = 0;
        int escapes = 0;
        for (int i = 0; i < count; ++i) {
            signs += values[i] != 0;
            escapes += book_->escape && values[i] == 16;
        }
        return static_cast<uint8_t>(flags | signs << kHuffSignShift | escapes << kHuffEscapeShift);
    }

    Tree tree_;
    const SpectralBook* book_;
    std::vector<HuffEntry> table_;
};

struct Tables {
    std::vector<HuffEntry> books[kBooks];
    Tables() {
        books[0] = Builder(Tree{hcb_sf, kScaleFactorNodes}, nullptr).Build();
        for (int b = 1; b < kBooks; ++b) {
            books[b] = Builder(Tree{hcb_table[b].tree, hcb_table[b].nodes}, &hcb_table[b]).Build();
        }
    }
};

}  // namespace

const HuffEntry* HuffTableFor(int book) {
    static const Tables tables;
    if (book < 0 || book >= kBooks) return nullptr;
    return tables.books[book].data();
}

}  // namespace metainfo
