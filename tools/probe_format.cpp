#include "probe_format.h"

#include <cstdio>

#include "core/text.h"

namespace probe {
namespace {

const char* const kMetaItemNames[MM_META_ITEMS] = {
    "title",    "artist",  "album",     "genre",     "year",      "copyright", "reserved", "composer",     "track",
    "language", "comment", "file_type", "conductor", "publisher", "date",      "time",     "picture_mime",
};

}  // namespace

const char* MetaItemName(int kind) {
    if (kind >= 0 && kind < MM_META_ITEMS) return kMetaItemNames[kind];
    return "item";
}

std::string ResultText(int32_t result) {
    char text[16];
    std::snprintf(text, sizeof text, "0x%08X", static_cast<uint32_t>(result));
    return text;
}

}  // namespace probe
