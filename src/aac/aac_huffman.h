// Table-driven decoding of the AAC Huffman codebooks: a codeword is found
// with one or two lookups on the next bits instead of a walk of its tree.
#pragma once

#include <cstdint>

#include "aac/aac_bits.h"

namespace metainfo {

// One lookup result. A leaf gives the codeword's index and its length in
// bits; a link names a second-level table and how many further bits index
// it; `invalid` marks bits that no codeword starts with (its length is where
// the tree ran out).
struct HuffEntry {
    uint16_t value;
    uint8_t length;
    uint8_t flags;
};
constexpr uint8_t kHuffEntryLeaf = 1;
constexpr uint8_t kHuffEntryLink = 2;
// Leaves of the unsigned spectral books also carry the number of sign bits
// that follow the codeword and the number of escaped values (book 11).
constexpr int kHuffSignShift = 2;
constexpr int kHuffEscapeShift = 5;
inline int SignBits(const HuffEntry& e) { return (e.flags >> kHuffSignShift) & 7; }
inline int EscapeCount(const HuffEntry& e) { return (e.flags >> kHuffEscapeShift) & 3; }

// Bits that index the first-level table of every book.
constexpr int kHuffRootBits = 9;

// Book 0 is the scale factor book; 1..11 the spectral books. Built once,
// on first use, from the codebook trees.
const HuffEntry* HuffTableFor(int book);

// The entry of the codeword that starts a 64-bit window: a leaf or
// `invalid`, with the length the tree walk would read.
inline HuffEntry EntryOf(uint64_t window, const HuffEntry* table) {
    const HuffEntry e = table[window >> (64 - kHuffRootBits)];
    if (!(e.flags & kHuffEntryLink)) return e;
    return table[e.value + ((window << kHuffRootBits) >> (64 - e.length))];
}

// The entry of the codeword at the reader's position, without consuming it.
inline HuffEntry LookUpCodeword(const AacBitReader* r, const HuffEntry* table) { return EntryOf(BitWindow(r), table); }

// Index of the next codeword, or -1: a bit pattern that is no codeword (its
// bits consumed) or data that ends inside the codeword (reader exhausted).
inline int DecodeCodeword(AacBitReader* r, const HuffEntry* table) {
    if (r->exhausted || RemainingBits(r) <= 0) {
        r->exhausted = true;
        return -1;
    }
    const HuffEntry e = LookUpCodeword(r, table);
    if (!Claim(r, e.length)) return -1;
    r->bitPos += e.length;
    return (e.flags & kHuffEntryLeaf) ? e.value : -1;
}

}  // namespace metainfo
