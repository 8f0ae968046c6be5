// The library's codec codes in the vocabulary of ffprobe's codec_name and
// profile, for the command line's key set.
#pragma once

#include <cstdint>

namespace probe {

// The library's own name of a code ("CODEC_MP3_LAYER3"), or nullptr.
const char* CodecCodeName(uint32_t code);

// ffprobe's codec_name for a codec code ("mp3", "aac", "h264", ...), or
// nullptr where the code names none or several (ADPCM, an unset code).
// bitsPerSample picks the PCM variant.
const char* FfprobeCodecName(uint32_t code, uint32_t bitsPerSample);

// ffprobe's profile name for an audio codec with its subtype ("LC",
// "HE-AAC", ...), or nullptr.
const char* FfprobeAudioProfile(uint32_t codec, uint32_t subtype);

// The profile name of a video profile code ("Simple", "Main", ...), or nullptr.
const char* VideoProfileName(uint32_t code);

}  // namespace probe
