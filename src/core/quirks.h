// Where the device contract's answers and a file's truth part ways, the shared
// parser asks one of these switches. The MM_ interface passes kContract, the
// accurate interface kAccurate; docs/accurate.md lists each switch, what
// either side answers and why.
#pragma once

namespace metainfo {

struct Quirks {
    // ID3v2.3 frames are only read when the tag ends in padding (LAME writes
    // a cover-carrying v2.3 tag without any).
    bool id3NeedsPadding;
    // TYER/TDRC keep their text-encoding byte in the year.
    bool id3YearKeepsEncodingByte;
    // UTF-16 text without a byte-order mark (encoding 2, UTF-16BE) is empty.
    bool id3Utf16BeEmpty;
    // The v2.4 extended header is not passed over: its bytes are walked as frames.
    bool id3V24ExtendedHeaderAsFrames;
    // A frame size is read only as the version states it (iTunes writes
    // syncsafe sizes into v2.3 and plain ones into v2.4); one that runs past
    // the tag fails the whole tag.
    bool id3FrameSizeAsStated;
    // Under v2.2/2.3 whole-tag unsynchronisation a frame takes its stated
    // size in stored bytes, so frames after one holding FF bytes are read
    // out of step.
    bool id3UnsyncSizeIsStored;
    // An AAC-LC stream at 88.2 kHz or more reads as SBR at twice the rate.
    bool aacHighRateIsSbr;
    // An MPEG-4 audio configuration that opens with object type 29 (SBR with
    // parametric stereo) is not read: plain AAC of no known profile.
    bool aacPsConfigUnread;
};

inline constexpr Quirks kContract{true, true, true, true, true, true, true, true};
inline constexpr Quirks kAccurate{false, false, false, false, false, false, false, false};

}  // namespace metainfo
