#include "mp3/mp3_tables.h"

// Laid out in columns by hand.
// clang-format off
namespace metainfo {

const uint8_t lsfIndex[4] = {1, 1, 1, 0};
const uint8_t idIndex[4] = {2, 3, 1, 0};

// Two LSF rows are identical (Layers II and III); a spare copy of the LSF rows
// follows and is never indexed.
const int16_t bitrateTab[135] = {
    0, 32, 64, 96, 128, 160, 192, 224, 256, 288, 320, 352, 384, 416, 448,
    0, 32, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320, 384,
    0, 32, 40, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320,
    0, 32, 48, 56, 64, 80, 96, 112, 128, 144, 160, 176, 192, 224, 256,
    0, 8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160,
    0, 8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160,
    0, 32, 48, 56, 64, 80, 96, 112, 128, 144, 160, 176, 192, 224, 256,
    0, 8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160,
    0, 8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160,
};

const uint32_t samplerateTab[9] = {44100, 48000, 32000, 22050, 24000, 16000, 11025, 12000, 8000};
const uint16_t samplesPerFrameTab[10] = {384, 1152, 1152, 384, 1152, 576, 384, 1152, 576, 0};
const uint32_t dwCoefficients[6] = {12, 144, 144, 12, 144, 72};
const uint32_t dwSlotSizes[3] = {4, 1, 1};

// "auido/x-mpg" is the alias as the handset has always listed it.
const char* const szMP3MimeType[8] = {
    "audio/mp3", "audio/x-mp3", "audio/mpeg3", "audio/x-mpeg3",
    "audio/mpeg", "audio/x-mpeg", "audio/mpg", "auido/x-mpg",
};

}  // namespace metainfo
