// Facts from the MM_ interface's answers, for formats that have no facts
// reader of their own yet: what the contract answers, where it answers.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// Fills facts of a file of a known type. MM_OK, or the clip information's
// failure (the file's structure breaks off or is broken).
int32_t ContractFacts(const char* path, int type, MediaFacts* facts);

// "3", "3/11" into a number and its total (0 when absent or not a number).
void SplitNumberPair(const std::string& text, uint32_t* number, uint32_t* total);

}  // namespace metainfo
