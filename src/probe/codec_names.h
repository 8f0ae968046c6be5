// The library's codec codes in the vocabulary of ffprobe's codec_name and
// profile, for the accurate answers.
#pragma once

#include <cstdint>

namespace metainfo {

// Short name of a media type code ("mp3", "mp4", ... "unknown").
const char* MediaTypeName(int type);

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

}  // namespace metainfo
