#include "mp3/mp3_facts.h"

#include "metainfo/records.h"
#include "mp3/id3_facts.h"
#include "probe/contract_facts.h"

namespace metainfo {

int32_t Mp3Facts(const char* path, int type, MediaFacts* facts) {
    const int32_t result = ContractFacts(path, type, facts);
    if (result != MM_OK) return result;
    facts->tags = TagFacts();
    facts->pictures.clear();
    uint64_t tagEnd = 0;
    return ReadId3Facts(path, &facts->tags, &facts->pictures, &tagEnd) ? MM_OK : MM_E_OUTOFMEMORY;
}

}  // namespace metainfo
