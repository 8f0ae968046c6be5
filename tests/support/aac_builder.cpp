#include "support/aac_builder.h"

#include <stdexcept>

namespace testing_support {

BitWriter& BitWriter::put(uint32_t value, int bits) {
    for (int i = bits - 1; i >= 0; --i) {
        if (bits_ % 8 == 0) data_.push_back(0);
        if ((value >> i) & 1) data_.back() |= static_cast<uint8_t>(0x80 >> (bits_ % 8));
        ++bits_;
    }
    return *this;
}

BitWriter& BitWriter::align() {
    bits_ = (bits_ + 7) / 8 * 8;
    return *this;
}

namespace {

// individual_channel_stream of one long window without bands.
void PutSilentIcs(BitWriter& w, bool withIcsInfo) {
    w.put(100, 8);  // global_gain
    if (withIcsInfo) {
        w.put(0, 1).put(0, 2).put(0, 1);  // ics_reserved_bit, ONLY_LONG_SEQUENCE, window_shape
        w.put(0, 6);  // max_sfb
        w.put(0, 1);  // predictor_data_present
    }
    w.put(0, 1).put(0, 1).put(0, 1);  // pulse, tns, gain control absent
}

}  // namespace

void PutSilentSce(BitWriter& w, int id) {
    w.put(static_cast<uint32_t>(id), 3).put(0, 4);
    PutSilentIcs(w, true);
}

void PutSilentCpe(BitWriter& w, bool commonWindow) {
    w.put(1, 3).put(0, 4).put(commonWindow ? 1 : 0, 1);
    if (commonWindow) {
        w.put(0, 1).put(0, 2).put(0, 1).put(0, 6).put(0, 1);  // ics_info
        w.put(0, 2);  // ms_mask_present
    }
    PutSilentIcs(w, !commonWindow);
    PutSilentIcs(w, !commonWindow);
}

void PutFill(BitWriter& w, int extensionType, int payloadBytes) {
    w.put(6, 3);
    if (payloadBytes >= 15) {
        w.put(15, 4).put(static_cast<uint32_t>(payloadBytes - 14), 8);
    } else {
        w.put(static_cast<uint32_t>(payloadBytes), 4);
    }
    if (payloadBytes > 0) {
        w.put(static_cast<uint32_t>(extensionType), 4).put(0, 4);
        for (int i = 1; i < payloadBytes; ++i) w.put(0, 8);
    }
}

void PutDataStream(BitWriter& w, int count, bool byteAlign) {
    w.put(4, 3).put(0, 4).put(byteAlign ? 1 : 0, 1);
    if (count >= 255) {
        w.put(255, 8).put(static_cast<uint32_t>(count - 255), 8);
    } else {
        w.put(static_cast<uint32_t>(count), 8);
    }
    if (byteAlign) w.align();
    for (int i = 0; i < count; ++i) w.put(0, 8);
}

void PutEnd(BitWriter& w) { w.put(7, 3).align(); }

std::vector<uint8_t> AacBlock(bool stereo, int sbrExtension, size_t bytes) {
    // Some sizes cannot be met with one padding fill element (its escaped
    // count costs a byte): then an empty fill element goes first.
    for (int emptyFills = 0; emptyFills < 8; ++emptyFills) {
        BitWriter w;
        if (stereo) {
            PutSilentCpe(w, true);
        } else {
            PutSilentSce(w);
        }
        if (sbrExtension != 0) PutFill(w, sbrExtension, 1);
        if (bytes != 0) {
            for (int i = 0; i < emptyFills; ++i) PutFill(w, 0, 0);
            // The padding fill's id, count (and escape count) and END take 10 (18) bits.
            const size_t used = w.bitSize();
            long payload = static_cast<long>(bytes) - static_cast<long>((used + 10 + 7) / 8);
            if (payload >= 15) payload = static_cast<long>(bytes) - static_cast<long>((used + 18 + 7) / 8);
            if (payload < 0) throw std::invalid_argument("block too small");
            PutFill(w, 0, static_cast<int>(payload));
        }
        PutEnd(w);
        if (bytes == 0 || w.bytes().size() == bytes) return w.bytes();
    }
    throw std::invalid_argument("block size not reachable");
}

namespace {

void PutPce(BitWriter& w, const PceLayout& p) {
    w.put(0, 4).put(static_cast<uint32_t>(p.objectType), 2).put(static_cast<uint32_t>(p.samplingIndex), 4);
    w.put(static_cast<uint32_t>(p.front.size()), 4).put(static_cast<uint32_t>(p.side.size()), 4);
    w.put(static_cast<uint32_t>(p.back.size()), 4).put(static_cast<uint32_t>(p.lfe), 2);
    w.put(static_cast<uint32_t>(p.assocData), 3).put(static_cast<uint32_t>(p.validCc), 4);
    w.put(p.monoMixdown ? 1 : 0, 1);
    if (p.monoMixdown) w.put(0, 4);
    w.put(0, 1).put(0, 1);  // stereo_mixdown, matrix_mixdown
    for (const auto* list : {&p.front, &p.side, &p.back}) {
        for (bool cpe : *list) w.put(cpe ? 1 : 0, 1).put(0, 4);
    }
    for (int i = 0; i < p.lfe + p.assocData; ++i) w.put(0, 4);
    for (int i = 0; i < p.validCc; ++i) w.put(0, 5);
    w.align();
    w.put(static_cast<uint32_t>(p.comment.size()), 8);
    for (char c : p.comment) w.put(static_cast<uint8_t>(c), 8);
}

}  // namespace

std::vector<uint8_t> AdifFile(const AdifLayout& s, const std::vector<uint8_t>& firstBlock) {
    BitWriter w;
    for (char c : std::string("ADIF")) w.put(static_cast<uint8_t>(c), 8);
    w.put(s.copyright ? 1 : 0, 1);
    if (s.copyright) {
        for (int i = 0; i < 9; ++i) w.put(0xA5, 8);
    }
    w.put(0, 1).put(0, 1);  // original_copy, home
    w.put(s.variableRate ? 1 : 0, 1);
    w.put(s.bitrate, 23);
    w.put(static_cast<uint32_t>(s.pces.size() - 1), 4);
    for (const PceLayout& pce : s.pces) {
        if (!s.variableRate) w.put(s.bufferFullness, 20);
        PutPce(w, pce);
    }
    w.align();
    std::vector<uint8_t> out = w.bytes();
    out.insert(out.end(), firstBlock.begin(), firstBlock.end());
    return out;
}

std::vector<uint8_t> AdtsFrames(const AdtsFields& layout, const std::vector<size_t>& sizes, int sbrExtension) {
    std::vector<uint8_t> out;
    const size_t header = layout.crc ? 9 : 7;
    for (size_t size : sizes) {
        std::vector<uint8_t> frame =
            AdtsFrame(layout, AacBlock(layout.channelConfig == 2, sbrExtension, size - header));
        out.insert(out.end(), frame.begin(), frame.end());
    }
    return out;
}

std::vector<uint8_t> SilentAdts(int n, const AdtsFields& shape) {
    std::vector<uint8_t> out;
    for (int i = 0; i < n; ++i) out = Join({out, AdtsFrame(shape, SilentAacBlock())});
    return out;
}

AdtsFields AdtsLayout(int samplingIndex, int channelConfig, int profile) {
    AdtsFields s;
    s.samplingIndex = samplingIndex;
    s.channelConfig = channelConfig;
    s.profile = profile;
    return s;
}

}  // namespace testing_support
