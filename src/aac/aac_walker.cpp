#include "aac/aac_walker.h"

#include "aac/aac_huffman.h"
#include "aac/aac_tables.h"

namespace metainfo {
namespace {

enum WindowSequence {
    ONLY_LONG_SEQUENCE = 0,
    LONG_START_SEQUENCE = 1,
    EIGHT_SHORT_SEQUENCE = 2,
    LONG_STOP_SEQUENCE = 3,
};

enum Codebook {
    ZERO_HCB = 0,
    ESC_HCB = 11,
    NOISE_HCB = 13,
    INTENSITY_HCB2 = 14,
    INTENSITY_HCB = 15,
};

enum ElementId {
    ID_SCE = 0,
    ID_CPE = 1,
    ID_CCE = 2,
    ID_LFE = 3,
    ID_DSE = 4,
    ID_PCE = 5,
    ID_FIL = 6,
    ID_END = 7,
};

// SBR extension payloads of a fill element (with and without CRC).
constexpr uint32_t EXT_SBR_DATA = 13;
constexpr uint32_t EXT_SBR_DATA_CRC = 14;

// max_sfb has 6 bits; after the num_swb check it is at most 51.
constexpr int kMaxBands = 64;
constexpr int kMaxGroups = 8;
// An escape_prefix of more than 8 ones would code a value above 8191.
constexpr int kMaxEscapePrefix = 8;

struct IcsInfo {
    int window_sequence;
    int window_shape;
    int max_sfb;
    int scale_factor_grouping;
    int num_windows;
    int num_window_groups;
    int window_group_length[kMaxGroups];
    int num_swb;
    // Band offsets of one window; a group's band is as many times wider as
    // the group has windows.
    const uint16_t* swb_offset;
    int predictor_data_present;
};

// What one channel's walk keeps while it lasts: the window information and the
// section codebook of every band. Nothing survives the element, and a band's
// codebook is read only after section_data has written it, so the storage is
// never cleared.
struct ChannelStream {
    IcsInfo info;
    uint8_t sfb_cb[kMaxGroups][kMaxBands];
    int global_gain;
};

int OutOfDataOr(const AacBitReader* r, int result) { return r->exhausted ? kWalkOutOfData : result; }

int DecodeScaleFactor(AacBitReader* r) { return DecodeCodeword(r, HuffTableFor(0)); }

int ics_info(AacBitReader* r, int samplingIndex, IcsInfo* info) {
    if (samplingIndex < 0 || samplingIndex >= kSamplingIndexCount) return kWalkBadSamplingIndex;
    ReadBits(r, 1);  // ics_reserved_bit
    info->window_sequence = static_cast<int>(ReadBits(r, 2));
    info->window_shape = static_cast<int>(ReadBits(r, 1));
    const bool isShort = info->window_sequence == EIGHT_SHORT_SEQUENCE;
    if (isShort) {
        info->max_sfb = static_cast<int>(ReadBits(r, 4));
        info->scale_factor_grouping = static_cast<int>(ReadBits(r, 7));
    } else {
        info->max_sfb = static_cast<int>(ReadBits(r, 6));
    }
    if (r->exhausted) return kWalkOutOfData;

    if (isShort) {
        info->num_windows = 8;
        info->num_swb = num_swb_short_window[samplingIndex];
        info->num_window_groups = 1;
        info->window_group_length[0] = 1;
        for (int bit = 6; bit >= 0; --bit) {
            if (info->scale_factor_grouping & (1 << bit)) {
                ++info->window_group_length[info->num_window_groups - 1];
            } else {
                if (info->num_window_groups >= kMaxGroups) return kWalkTooManyGroups;
                info->window_group_length[info->num_window_groups++] = 1;
            }
        }
        info->swb_offset = swb_offset_short_window[samplingIndex];
    } else {
        info->num_windows = 1;
        info->num_window_groups = 1;
        info->window_group_length[0] = 1;
        info->num_swb = num_swb_long_window[samplingIndex];
        info->swb_offset = swb_offset_long_window[samplingIndex];
    }
    if (info->max_sfb > info->num_swb) return kWalkMaxSfb;

    if (!isShort) {
        info->predictor_data_present = static_cast<int>(ReadBits(r, 1));
        if (info->predictor_data_present) {
            if (ReadBits(r, 1)) ReadBits(r, 5);  // predictor_reset, predictor_reset_group_number
            const int limit = info->max_sfb < pred_sfb_max[samplingIndex] ? info->max_sfb : pred_sfb_max[samplingIndex];
            for (int sfb = 0; sfb < limit; ++sfb) ReadBits(r, 1);  // prediction_used
        }
    }
    return OutOfDataOr(r, 0);
}

int section_data(AacBitReader* r, ChannelStream* cs) {
    const IcsInfo& info = cs->info;
    const int lenBits = info.window_sequence == EIGHT_SHORT_SEQUENCE ? 3 : 5;
    const uint32_t escape = bitmask[lenBits];
    for (int g = 0; g < info.num_window_groups; ++g) {
        int k = 0;
        while (k < info.max_sfb) {
            // Each section reads at least seven bits, so a stream of empty
            // sections still ends at the end of the data.
            if (r->exhausted) return kWalkOutOfData;
            const uint8_t sect_cb = static_cast<uint8_t>(ReadBits(r, 4));
            int sect_len = 0;
            uint32_t incr;
            while ((incr = ReadBits(r, lenBits)) == escape) sect_len += static_cast<int>(escape);
            sect_len += static_cast<int>(incr);
            const int end = k + sect_len < info.max_sfb ? k + sect_len : info.max_sfb;
            for (int sfb = k; sfb < end; ++sfb) cs->sfb_cb[g][sfb] = sect_cb;
            k += sect_len;
        }
    }
    return OutOfDataOr(r, 0);
}

int scale_factor_data(AacBitReader* r, ChannelStream* cs) {
    const IcsInfo& info = cs->info;
    int scale_factor = cs->global_gain;
    bool noise_pcm_flag = true;
    const HuffEntry* table = HuffTableFor(0);
    // While a whole 64-bit load lies inside the data, codewords (19 bits at
    // most) come from a word refilled below 32 bits, with no end check.
    const int64_t lastLoad = static_cast<int64_t>(r->size) * 8 - 64;
    uint64_t bits = 0;
    int held = 0;
    for (int g = 0; g < info.num_window_groups; ++g) {
        for (int sfb = 0; sfb < info.max_sfb; ++sfb) {
            const int cb = cs->sfb_cb[g][sfb];
            if (cb == ZERO_HCB) continue;
            if (cb == NOISE_HCB && noise_pcm_flag) {
                noise_pcm_flag = false;
                ReadBits(r, 9);  // dpcm_noise_nrg of the first noise band
                held = 0;
            } else {
                int code;
                if (held < 32 && !r->exhausted && r->bitPos <= lastLoad) {
                    bits = ReadBE64(r->buf + (r->bitPos >> 3)) << (r->bitPos & 7);
                    held = 64 - static_cast<int>(r->bitPos & 7);
                }
                if (held >= 32) {
                    const HuffEntry e = EntryOf(bits, table);
                    r->bitPos += e.length;
                    bits <<= e.length;
                    held -= e.length;
                    code = (e.flags & kHuffEntryLeaf) ? e.value : -1;
                } else {
                    code = DecodeCodeword(r, table);
                }
                if (code < 0) return OutOfDataOr(r, kWalkBadCodeword);
                if (cb != NOISE_HCB && cb != INTENSITY_HCB && cb != INTENSITY_HCB2) {
                    scale_factor += code - 60;
                    if (scale_factor > 255) return kWalkScaleFactorRange;
                }
            }
            if (r->exhausted) return kWalkOutOfData;
        }
    }
    return 0;
}

int pulse_data(AacBitReader* r, const ChannelStream* cs) {
    const int number_pulse = static_cast<int>(ReadBits(r, 2));
    const int pulse_start_sfb = static_cast<int>(ReadBits(r, 6));
    if (r->exhausted) return kWalkOutOfData;
    if (pulse_start_sfb > cs->info.num_swb) return kWalkPulseStart;
    for (int i = 0; i <= number_pulse; ++i) {
        ReadBits(r, 5);  // pulse_offset
        ReadBits(r, 4);  // pulse_amp
    }
    return OutOfDataOr(r, 0);
}

int tns_data(AacBitReader* r, const ChannelStream* cs) {
    const bool isShort = cs->info.window_sequence == EIGHT_SHORT_SEQUENCE;
    for (int w = 0; w < cs->info.num_windows; ++w) {
        const int n_filt = static_cast<int>(ReadBits(r, isShort ? 1 : 2));
        int coef_res = 0;
        if (n_filt) coef_res = static_cast<int>(ReadBits(r, 1));
        for (int filt = 0; filt < n_filt; ++filt) {
            ReadBits(r, isShort ? 4 : 6);  // length
            const int order = static_cast<int>(ReadBits(r, isShort ? 3 : 5));
            if (order == 0) continue;
            ReadBits(r, 1);  // direction
            const int coef_compress = static_cast<int>(ReadBits(r, 1));
            // Short windows take their coefficients one bit shorter: the walk
            // has always read them so, and where SBR is found depends on it.
            int coefBits = coef_res + 3 - coef_compress;
            if (isShort) {
                --coefBits;
                r->shortWindowTns = true;
            }
            for (int i = 0; i < order; ++i) ReadBits(r, coefBits);
        }
        if (r->exhausted) return kWalkOutOfData;
    }
    return 0;
}

// The adjustments of one window: adjust_num, then alevcode and aloccode each.
void GainWindow(AacBitReader* r, int locBits) {
    const int adjust_num = static_cast<int>(ReadBits(r, 3));
    for (int ad = 0; ad < adjust_num; ++ad) ReadBits(r, 4 + locBits);
}

// The second window of LONG_STOP_SEQUENCE (4 and 5 bits) is not read: this
// shortened form is what the walker has always read.
int gain_control_data(AacBitReader* r, const ChannelStream* cs) {
    const int max_band = static_cast<int>(ReadBits(r, 2));
    for (int bd = 1; bd <= max_band; ++bd) {
        switch (cs->info.window_sequence) {
            case ONLY_LONG_SEQUENCE: GainWindow(r, 5); break;
            case LONG_START_SEQUENCE:
                GainWindow(r, 4);
                GainWindow(r, 2);
                break;
            case EIGHT_SHORT_SEQUENCE:
                for (int wd = 0; wd < 8; ++wd) GainWindow(r, 2);
                break;
            default:  // LONG_STOP_SEQUENCE
                GainWindow(r, 4);
                break;
        }
    }
    return OutOfDataOr(r, 0);
}

// The escape sequences of a book-11 codeword's values of 16.
int Escapes(AacBitReader* r, int count) {
    for (int i = count; i > 0; --i) {
        int prefix = 0;
        while (ReadBits(r, 1) == 1) {
            if (++prefix > kMaxEscapePrefix) return kWalkBadCodeword;
        }
        ReadBits(r, prefix + 4);  // escape_word
    }
    return OutOfDataOr(r, 0);
}

// One codeword of an unsigned-or-signed spectral book with its sign bits and
// escapes. The codeword and its sign bits are claimed together: data that ends
// in either ends the element the same way.
int huffman_spectral_data(AacBitReader* r, const HuffEntry* table) {
    if (r->exhausted || RemainingBits(r) <= 0) {
        r->exhausted = true;
        return kWalkOutOfData;
    }
    const HuffEntry e = LookUpCodeword(r, table);
    if (!(e.flags & kHuffEntryLeaf)) {
        if (!Claim(r, e.length)) return kWalkOutOfData;
        r->bitPos += e.length;
        return kWalkBadCodeword;
    }
    if (!Claim(r, e.length + SignBits(e))) return kWalkOutOfData;
    r->bitPos += e.length + SignBits(e);
    return Escapes(r, EscapeCount(e));
}

// `codewords` codewords of one band. The bits are taken from a 64-bit word
// loaded whole from inside the data and refilled when fewer than 32 remain
// (a spectral codeword with its signs has at most 20), so no codeword needs
// a check of the data's end; the last bytes go through huffman_spectral_data.
int SpectralBand(AacBitReader* r, const HuffEntry* table, int codewords) {
    const int64_t lastLoad = static_cast<int64_t>(r->size) * 8 - 64;
    int64_t pos = r->bitPos;
    uint64_t bits = 0;
    int held = 0;
    for (int i = 0; i < codewords; ++i) {
        if (held < 32) {
            if (pos > lastLoad || r->exhausted) {
                r->bitPos = pos;
                for (; i < codewords; ++i) {
                    const int result = huffman_spectral_data(r, table);
                    if (result != 0) return result;
                }
                return 0;
            }
            bits = ReadBE64(r->buf + (pos >> 3)) << (pos & 7);
            held = 64 - static_cast<int>(pos & 7);
        }
        HuffEntry e = table[bits >> (64 - kHuffRootBits)];
        if (e.flags & kHuffEntryLink) e = table[e.value + ((bits << kHuffRootBits) >> (64 - e.length))];
        if (!(e.flags & kHuffEntryLeaf)) {
            r->bitPos = pos + e.length;
            return kWalkBadCodeword;
        }
        const int taken = e.length + SignBits(e);
        pos += taken;
        bits <<= taken;
        held -= taken;
        if (EscapeCount(e) != 0) {
            r->bitPos = pos;
            const int result = Escapes(r, EscapeCount(e));
            if (result != 0) return result;
            pos = r->bitPos;
            held = 0;
        }
    }
    r->bitPos = pos;
    return 0;
}

int spectral_data(AacBitReader* r, const ChannelStream* cs) {
    const IcsInfo& info = cs->info;
    for (int g = 0; g < info.num_window_groups; ++g) {
        for (int sfb = 0; sfb < info.max_sfb; ++sfb) {
            const int cb = cs->sfb_cb[g][sfb];
            if (cb == ZERO_HCB || cb == NOISE_HCB || cb == INTENSITY_HCB || cb == INTENSITY_HCB2) continue;
            // Book 12 is reserved: there is no table to read it with.
            if (cb < 1 || cb > ESC_HCB) return kWalkBadCodebook;
            const int lines = (info.swb_offset[sfb + 1] - info.swb_offset[sfb]) * info.window_group_length[g];
            const int step = hcb_table[cb].dimension;
            const int result = SpectralBand(r, HuffTableFor(cb), (lines + step - 1) / step);
            if (result != 0) return result;
        }
    }
    return 0;
}

int individual_channel_stream(AacBitReader* r, int samplingIndex, ChannelStream* cs, bool commonWindow) {
    cs->global_gain = static_cast<int>(ReadBits(r, 8));
    int result;
    if (!commonWindow && (result = ics_info(r, samplingIndex, &cs->info)) != 0) return result;
    if ((result = section_data(r, cs)) != 0) return result;
    if ((result = scale_factor_data(r, cs)) != 0) return result;
    if (ReadBits(r, 1) && (result = pulse_data(r, cs)) != 0) return result;
    if (ReadBits(r, 1) && (result = tns_data(r, cs)) != 0) return result;
    if (ReadBits(r, 1) && (result = gain_control_data(r, cs)) != 0) return result;
    result = spectral_data(r, cs);
    return OutOfDataOr(r, result);
}

}  // namespace

int single_lfe_channel_element(AacBitReader* r, int samplingIndex) {
    ReadBits(r, 4);  // element_instance_tag
    ChannelStream cs;
    const int result = individual_channel_stream(r, samplingIndex, &cs, false);
    return result < 0 ? 0 : result;
}

int channel_pair_element(AacBitReader* r, int samplingIndex) {
    ReadBits(r, 4);  // element_instance_tag
    const bool common_window = ReadBits(r, 1) != 0;
    ChannelStream first;
    ChannelStream second;
    if (common_window) {
        const int result = ics_info(r, samplingIndex, &first.info);
        if (result != 0) return result;
        if (ReadBits(r, 2) == 1) {  // ms_mask_present
            for (int g = 0; g < first.info.num_window_groups; ++g) {
                for (int sfb = 0; sfb < first.info.max_sfb; ++sfb) ReadBits(r, 1);  // ms_used
            }
        }
        second.info = first.info;
    }
    int result = individual_channel_stream(r, samplingIndex, &first, common_window);
    if (result != 0) return result;
    result = individual_channel_stream(r, samplingIndex, &second, common_window);
    return result < 0 ? 0 : result;
}

int coupling_channel_element(AacBitReader* r, int samplingIndex) {
    ReadBits(r, 4);  // element_instance_tag
    const bool ind_sw_cce_flag = ReadBits(r, 1) != 0;
    const int num_coupled_elements = static_cast<int>(ReadBits(r, 3));
    int num_gain_element_lists = 0;
    for (int c = 0; c <= num_coupled_elements; ++c) {
        ++num_gain_element_lists;
        const bool cc_target_is_cpe = ReadBits(r, 1) != 0;
        ReadBits(r, 4);  // cc_target_tag_select
        if (cc_target_is_cpe) {
            const uint32_t cc_l = ReadBits(r, 1);
            const uint32_t cc_r = ReadBits(r, 1);
            if (cc_l && cc_r) ++num_gain_element_lists;
        }
    }
    ReadBits(r, 1);  // cc_domain
    ReadBits(r, 1);  // gain_element_sign
    ReadBits(r, 2);  // gain_element_scale
    ChannelStream cs;
    const int result = individual_channel_stream(r, samplingIndex, &cs, false);
    if (result != 0) return result;

    for (int c = 1; c < num_gain_element_lists; ++c) {
        const bool common_gain_element_present = ind_sw_cce_flag || ReadBits(r, 1) != 0;
        if (common_gain_element_present) {
            if (DecodeScaleFactor(r) < 0) return OutOfDataOr(r, kWalkBadCodeword);
            continue;
        }
        for (int g = 0; g < cs.info.num_window_groups; ++g) {
            for (int sfb = 0; sfb < cs.info.max_sfb; ++sfb) {
                if (cs.sfb_cb[g][sfb] == ZERO_HCB) continue;
                if (DecodeScaleFactor(r) < 0) return OutOfDataOr(r, kWalkBadCodeword);
            }
        }
    }
    return OutOfDataOr(r, 0);
}

int program_config_element(AacBitReader* r, uint32_t* channels, uint32_t* objectType) {
    ReadBits(r, 4);  // element_instance_tag
    *objectType = ReadBits(r, 2);
    ReadBits(r, 4);  // sampling_frequency_index
    const uint32_t num_front = ReadBits(r, 4);
    const uint32_t num_side = ReadBits(r, 4);
    const uint32_t num_back = ReadBits(r, 4);
    const uint32_t num_lfe = ReadBits(r, 2);
    const uint32_t num_assoc_data = ReadBits(r, 3);
    const uint32_t num_valid_cc = ReadBits(r, 4);
    *channels += num_front + num_side + num_back + num_lfe;
    if (ReadBits(r, 1)) ReadBits(r, 4);  // mono_mixdown
    if (ReadBits(r, 1)) ReadBits(r, 4);  // stereo_mixdown
    if (ReadBits(r, 1)) ReadBits(r, 3);  // matrix_mixdown_idx, pseudo_surround_enable
    for (uint32_t i = 0; i < num_front + num_side + num_back; ++i) {
        *channels += ReadBits(r, 1);  // is_cpe: a channel pair counts two
        ReadBits(r, 4);  // tag_select
    }
    for (uint32_t i = 0; i < num_lfe + num_assoc_data; ++i) ReadBits(r, 4);
    for (uint32_t i = 0; i < num_valid_cc; ++i) ReadBits(r, 5);
    AlignToByte(r);
    SkipBytes(r, ReadBits(r, 8));  // comment_field_bytes
    return 0;
}

int RawDataStream(AacBitReader* r, uint32_t* walkerState, int samplingIndex) {
    while (!r->exhausted) {
        const uint32_t id = ReadBits(r, 3);
        if (r->exhausted) break;
        switch (id) {
            case ID_SCE:
            case ID_LFE: single_lfe_channel_element(r, samplingIndex); break;
            case ID_CPE: channel_pair_element(r, samplingIndex); break;
            case ID_CCE: coupling_channel_element(r, samplingIndex); break;
            case ID_DSE: {
                ReadBits(r, 4);  // element_instance_tag
                const bool data_byte_align_flag = ReadBits(r, 1) != 0;
                uint32_t count = ReadBits(r, 8);
                if (count == 255) count += ReadBits(r, 8);
                if (data_byte_align_flag) AlignToByte(r);
                SkipBytes(r, count);
                break;
            }
            case ID_PCE: {
                uint32_t channels = 0;
                uint32_t objectType = 0;
                program_config_element(r, &channels, &objectType);
                break;
            }
            case ID_FIL: {
                uint32_t count = ReadBits(r, 4);
                if (count == 15) count = 14 + ReadBits(r, 8);
                if (count >= 1) {
                    const uint32_t extension_type = PeekBits(r, 4);
                    if (!r->exhausted && (extension_type == EXT_SBR_DATA || extension_type == EXT_SBR_DATA_CRC)) {
                        *walkerState = kWalkSbrFound;
                    }
                }
                SkipBytes(r, count);
                break;
            }
            default:  // ID_END
                AlignToByte(r);
                return 1;
        }
    }
    return 1;
}

}  // namespace metainfo
