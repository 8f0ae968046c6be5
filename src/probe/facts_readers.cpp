#include "probe/facts_readers.h"

#include <new>
#include <vector>

#include "aac/aac_facts.h"
#include "asf/asf_facts.h"
#include "avi/avi_queries.h"
#include "core/file_access.h"
#include "core/quirks.h"
#include "core/thread_state.h"
#include "matroska/matroska_facts.h"
#include "flac/flac_facts.h"
#include "aiff/aiff_facts.h"
#include "metainfo/metainfo.h"
#include "mp3/mp3_stream_facts.h"
#include "mp4/mp4_facts.h"
#include "mp3/ape_facts.h"
#include "mp3/id3_facts.h"
#include "ogg/ogg_facts.h"
#include "probe/contract_facts.h"
#include "speech/amr.h"
#include "speech/midi_facts.h"
#include "speech/wave_facts.h"

namespace metainfo {
namespace {

using FactsReader = int32_t (*)(const char* path, int type, MediaFacts* facts);

int32_t ReadWave(const char* path, int /*type*/, MediaFacts* facts) { return WaveFacts(path, facts); }
// ADTS and MPEG audio carry ID3 tags: before the stream, and ID3v1 at its end;
// an APE tag at the end fills what the ID3v2 tag lacks, ahead of the ID3v1 tag.
int32_t WithId3Tags(int32_t read, const char* path, MediaFacts* facts) {
    if (read != MM_OK) return read;
    uint64_t tagEnd = 0;
    TagFacts ape;
    std::vector<PictureFacts> apePictures;
    try {
        if (!ReadApeFacts(path, &ape, &apePictures) ||
            !ReadId3Facts(path, &facts->tags, &facts->pictures, &tagEnd, &ape))
            return MM_E_OUTOFMEMORY;
        facts->pictures.insert(facts->pictures.end(), apePictures.begin(), apePictures.end());
    } catch (const std::bad_alloc&) {
        return MM_E_OUTOFMEMORY;
    }
    return MM_OK;
}

int32_t ReadAac(const char* path, int /*type*/, MediaFacts* facts) {
    return WithId3Tags(AacFacts(path, kAccurate, facts), path, facts);
}

int32_t ReadAmr(const char* path, int /*type*/, MediaFacts* facts) { return AmrFacts(path, facts); }

int32_t ReadAvi(const char* path, int /*type*/, MediaFacts* facts) { return AviFacts(path, facts); }

int32_t ReadMidi(const char* path, int /*type*/, MediaFacts* facts) { return MidiFacts(path, facts); }

int32_t ReadMp3(const char* path, int /*type*/, MediaFacts* facts) {
    return WithId3Tags(Mp3StreamFacts(path, facts), path, facts);
}

// A null row reads the MM_ answers.
const FactsReader kFactsReaders[MM_MEDIA_SLOTS] = {
    /* 0 */ nullptr,
    /* 1 MP3 */ ReadMp3,
    /* 2 RealMedia */ nullptr,
    /* 3 MP4 */ Mp4Facts,
    /* 4 ASF */ AsfFacts,
    /* 5 MIDI */ ReadMidi,
    /* 6 AAC */ ReadAac,
    /* 7 WAVE */ ReadWave,
    /* 8 AMR-NB */ ReadAmr,
    /* 9 AMR-WB */ ReadAmr,
    /* 10 */ nullptr,
    /* 11 AVI */ ReadAvi,
    /* 12 QCP */ nullptr,
    /* 13 EVRC */ nullptr,
    /* 14 */ nullptr,
    /* 15 */ nullptr,
};

// A format only the accurate interface reads: how its first bytes look, and
// its reader. A row's test sees the file's first kHeadBytes bytes (fewer for a
// shorter file) and may read more through the path when it is not null.
struct AccurateFormat {
    AccurateType type;
    bool (*looksLike)(const char* path, const uint8_t* head, size_t n);
    FactsReader reader;
};

const AccurateFormat kAccurateFormats[] = {
    {kAccurateMatroska, LooksLikeMatroska, MatroskaFacts},
    {kAccurateFlac, LooksLikeFlac, FlacFacts},
    {kAccurateAiff, LooksLikeAiff, AiffFacts},
    {kAccurateOgg, LooksLikeOgg, OggFacts},
};

constexpr size_t kHeadBytes = 128;

// The first bytes of a file, for the types the MM_ detection turns away.
size_t ReadHead(const char* path, uint8_t* head) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return 0;
    FileCloser closer(h);
    const int got = MEx_fread(head, 1, kHeadBytes, h);
    return got > 0 ? static_cast<size_t>(got) : 0;
}

// The accurate-only format whose test the head passes; with a null path the
// tests judge by the head alone.
int AccurateTypeOf(const char* path, const uint8_t* head, size_t n) {
    for (const AccurateFormat& f : kAccurateFormats) {
        if (f.looksLike(path, head, n)) return f.type;
    }
    return MEDIA_TYPE_UNKNOWN;
}

}  // namespace

int AccurateMediaType(const char* path) {
    uint8_t head[kHeadBytes];
    const size_t n = ReadHead(path, head);
    // Magic numbers first: on a file it does not know, the MM_ detection tries
    // the frame syncs of several formats.
    int type = AccurateTypeOf(nullptr, head, n);
    if (type != MEDIA_TYPE_UNKNOWN) return type;
    if (MM_MediaExtractor_DetectMediaType(path, &type) == MM_OK && type != MEDIA_TYPE_UNKNOWN) return type;
    if (IsRf64Wave(head, n)) return MEDIA_TYPE_WAVE;
    // Tests that read past the head (FLAC behind ID3 tags); then the search
    // for ADTS frames, which reads up to 64 KiB.
    type = AccurateTypeOf(path, head, n);
    if (type != MEDIA_TYPE_UNKNOWN) return type;
    return LooksLikeAdts(path) ? MEDIA_TYPE_AAC : MEDIA_TYPE_UNKNOWN;
}

int32_t ReadFacts(const char* path, int type, MediaFacts* facts) {
    for (const AccurateFormat& f : kAccurateFormats) {
        if (f.type == type) return f.reader(path, type, facts);
    }
    if (type <= 0 || type >= MM_MEDIA_SLOTS) return MM_E_UNSUPPORTED;
    const FactsReader reader = kFactsReaders[type];
    if (reader != nullptr) {
        const int32_t read = reader(path, type, facts);
        if (read == MM_OK || read == MM_E_OUTOFMEMORY) return read;
        // A file its reader turns away gets what the MM_ answers make of it.
        *facts = MediaFacts();
    }
    // The QCP reader keeps the last codec it saw for the next file on the
    // thread; the accurate answer of a file depends on that file alone, and the
    // thread's own sequence of MM_ calls is left as it was.
    const uint32_t qcpCodec = s_codectype;
    s_codectype = 0;
    const int32_t read = ContractFacts(path, type, facts);
    s_codectype = qcpCodec;
    return read;
}

}  // namespace metainfo
