#include "probe/facts_readers.h"

#include "metainfo/metainfo.h"
#include "mp3/mp3_facts.h"
#include "probe/contract_facts.h"

namespace metainfo {
namespace {

using FactsReader = int32_t (*)(const char* path, int type, MediaFacts* facts);

// A null row reads the MM_ answers.
constexpr FactsReader kFactsReaders[MM_MEDIA_SLOTS] = {
    /* 0 unknown */ nullptr,
    /* 1 MP3 */ Mp3Facts,
    /* 2 */ nullptr,
    /* 3 */ nullptr,
    /* 4 */ nullptr,
    /* 5 */ nullptr,
    /* 6 AAC */ Mp3Facts,
};

}  // namespace

int AccurateMediaType(const char* path) {
    int type = MEDIA_TYPE_UNKNOWN;
    if (MM_MediaExtractor_DetectMediaType(path, &type) != MM_OK) return MEDIA_TYPE_UNKNOWN;
    return type;
}

int32_t ReadFacts(const char* path, int type, MediaFacts* facts) {
    if (type <= 0 || type >= MM_MEDIA_SLOTS) return MM_E_UNSUPPORTED;
    const FactsReader reader = kFactsReaders[type];
    return reader != nullptr ? reader(path, type, facts) : ContractFacts(path, type, facts);
}

}  // namespace metainfo
