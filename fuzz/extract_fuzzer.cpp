// Copies of a time range of MP3, AAC, AMR and WAVE audio, to a buffer and to a
// file. The input is three bytes of parameters, then the media file:
//   byte 0: bits 0-2 the file's extension, bits 3-4 how it is read (plain,
//           ".dcf", ".fl", plain), bit 5 writes the copy to a ".dcf" name;
//   bytes 1, 2: start and end second, signed (0x7F and 0x80 stand for the
//           largest and smallest int).
#include <climits>

#include "metainfo/aac.h"
#include "metainfo/extract.h"
#include "support.h"

namespace {

const char* const kSuffixes[] = {".mp3", ".aac", ".amr", ".awb", ".wav", ".mp3", ".aac", ".wav"};

int Seconds(uint8_t b) {
    if (b == 0x7F) return INT_MAX;
    if (b == 0x80) return INT_MIN;
    return static_cast<int8_t>(b);
}

std::string SourcePath(const fuzz::InputFile& input, uint8_t selector) {
    switch ((selector >> 3) & 3) {
        case 1: return input.Path(".dcf");
        case 2: return input.Path(".fl");
        default: return input.Path(kSuffixes[selector & 7]);
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < 3) return 0;
    const uint8_t selector = data[0];
    const int start = Seconds(data[1]), end = Seconds(data[2]);
    fuzz::InputFile input(data + 3, size - 3);
    const std::string source = SourcePath(input, selector);
    const char* p = source.c_str();
    const std::string out = input.OutputPath((selector & 0x20) != 0 ? ".dcf" : kSuffixes[selector & 7]);

    unsigned char* buffer = nullptr;
    int length = 0;
    MM_MediaExtractor_GetAudioData(p, start, end, &buffer, &length);
    fuzz::ReleaseAudio(buffer, length);

    buffer = nullptr;
    length = 0;
    // The AAC buffer ends in a zero byte past its length.
    AAC_GetAuidoData_Buf(p, start, end, &buffer, &length);
    fuzz::ReleaseAudio(buffer, length, 1);

    AAC_GetAuidoData_File(p, start, end, out.c_str());
    MP3_GetAudioData2File(p, start, end, out.c_str());
    AMR_GetAudioData2File(p, start, end, out.c_str());
    WAVE_GetAudioData2File(p, start, end, out.c_str());
    return 0;
}
