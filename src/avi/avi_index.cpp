// The AVI parser's index and frame reader: "movi", "idx1", entry times,
// seeking and frame delivery.
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "avi/avi_riff.h"
#include "core/byte_reader.h"
#include "core/file_access.h"
#include "metainfo/avi_parser.h"

using namespace metainfo;
using namespace metainfo::avi;

namespace {

// Milliseconds per video frame, truncated; a stream without a rate has none.
uint32_t FrameTimeMs(const _AVIStreamHeader& h) {
    if (h.dwRate == 0) return 0;
    double ms = static_cast<double>(h.dwScale) * 1000.0 / h.dwRate;
    return ms >= 4294967295.0 ? 0xFFFFFFFFu : static_cast<uint32_t>(ms);
}

// The first blank-delimited word of text (at most two characters), as a
// "%2s" conversion takes it.
void CopyWord(const char* text, char* out) {
    size_t i = 0;
    while (text[i] != '\0' && std::isspace(static_cast<unsigned char>(text[i])) != 0) ++i;
    for (size_t n = 0; n < 2 && text[i] != '\0' && std::isspace(static_cast<unsigned char>(text[i])) == 0; ++n) {
        out[n] = text[i++];
    }
}

}  // namespace

int32_t CAVIParser::locateChunk(const char* fourcc) {
    if (fourcc == nullptr || std::strlen(fourcc) != 4) return MM_E_INVALIDARG;
    if (hFile == 0) return MM_E_FAIL;
    uint32_t want = ReadBE32(reinterpret_cast<const uint8_t*>(fourcc));
    bool isList = want == Fourcc("movi");
    uint64_t end = nRiffEnd < nFileSize ? nRiffEnd : nFileSize;
    uint64_t pos = 12;
    while (pos + 8 <= end) {
        if (MEx_fseek(hFile, static_cast<int64_t>(pos), SEEK_SET) != 0) return MM_E_FAIL;
        _CHUNKHEADER header{};
        getChunkHeader(hFile, &header);
        bool found = isList ? header.ckID == Fourcc("LIST") && header.ckType == want : header.ckID == want;
        if (found) {
            MEx_fseek(hFile, static_cast<int64_t>(pos), SEEK_SET);
            return MM_OK;
        }
        pos += 8 + uint64_t(header.ckSize) + (header.ckSize & 1);
    }
    return MM_E_FAIL;
}

int32_t CAVIParser::getSubChunk(int handle, _SUBCHUNK* sub) {
    if (sub == nullptr) return MM_E_INVALIDARG;
    uint8_t b[8];
    if (MEx_fread(b, 1, sizeof b, handle) != static_cast<int>(sizeof b)) return MM_E_FAIL;
    sub->ckID = ReadBE32(b);
    sub->ckSize = ReadLE32(b + 4);
    char number[3] = {static_cast<char>(b[0]), static_cast<char>(b[1]), '\0'};
    char type[3] = {static_cast<char>(b[2]), static_cast<char>(b[3]), '\0'};
    // Read as a decimal number after optional blanks and sign; no digits read as 0.
    sub->nStream = static_cast<int>(std::strtol(number, nullptr, 10));
    std::memset(sub->szType, 0, sizeof sub->szType);
    CopyWord(type, sub->szType);
    return MM_OK;
}

int32_t CAVIParser::parseMovi(int handle) {
    if (handle == 0) return MM_E_INVALIDARG;
    int64_t start = MEx_ftell(handle);
    if (start < 0) return MM_E_FAIL;
    _CHUNKHEADER header{};
    getChunkHeader(handle, &header);
    if (header.ckSize == 0 || header.ckSize > nFileSize || header.ckSize < 4) return MM_E_FAIL;
    uint64_t end = uint64_t(start) + 12 + header.ckSize - 4;
    if (end > 0xFFFFFFFFull) return MM_E_FAIL;
    nMoviEnd = static_cast<uint32_t>(end);
    nMoviSize = header.ckSize;
    nMoviBase = nMoviEnd - nMoviSize;

    uint64_t pos = uint64_t(start) + 12;
    while (pos < nMoviEnd) {
        if (MEx_fseek(handle, static_cast<int64_t>(pos), SEEK_SET) != 0) break;
        _SUBCHUNK sub;
        if (getSubChunk(handle, &sub) != MM_OK) break;  // the file ends inside the list
        pos += uint64_t(sub.ckSize) + (sub.ckSize & 1) + 8;
    }
    return MM_OK;
}

int32_t CAVIParser::getIndexEntry(int handle, _AVIIndexEntry* entry) {
    if (entry == nullptr) return MM_E_INVALIDARG;
    uint8_t b[kIndexEntryBytes];
    if (MEx_fread(b, 1, sizeof b, handle) != static_cast<int>(sizeof b)) return MM_E_FAIL;
    entry->ckid = ReadBE32(b);
    entry->dwFlags = ReadBE32(b + 4);
    entry->dwChunkOffset = ReadLE32(b + 8);
    entry->dwChunkLength = ReadLE32(b + 12);
    entry->wStream = static_cast<uint16_t>((b[0] & 0x0F) * 10 + (b[1] & 0x0F));
    entry->wType = ReadBE16(b + 2);
    entry->dwTimeMs = 0;
    return MM_OK;
}

int32_t CAVIParser::parseIdx1(int handle) {
    if (handle == 0) return MM_E_INVALIDARG;
    int64_t start = MEx_ftell(handle);
    if (start < 0) return MM_E_FAIL;
    _CHUNKHEADER header{};
    getChunkHeader(handle, &header);
    if (header.ckSize >= nFileSize || header.ckSize == 0) return MM_E_FAIL;
    uint64_t first = uint64_t(start) + 8;
    if (MEx_fseek(handle, static_cast<int64_t>(first), SEEK_SET) != 0) return MM_E_FAIL;

    // No more entries than the rest of the file can hold.
    uint64_t count = header.ckSize >> 4;
    uint64_t fileRoom = nFileSize > first ? (nFileSize - first) / kIndexEntryBytes : 0;
    if (count > fileRoom) count = fileRoom;
    releaseIndex();
    if (count == 0) return MM_OK;
    pIndex = new (std::nothrow) _AVIIndexEntry[count]();
    if (pIndex == nullptr) return MM_E_OUTOFMEMORY;
    nIndexCount = static_cast<uint32_t>(count);

    bool haveVideo = false, haveAudio = false;
    uint32_t videoTime = 0, frameTime = 0;
    uint32_t audioTime = 0, audioLength = 0, audioStep = 0;
    for (uint32_t i = 0; i < nIndexCount; ++i) {
        _AVIIndexEntry& e = pIndex[i];
        if (getIndexEntry(handle, &e) != MM_OK) {
            nIndexCount = i;  // an entry that cannot be read ends the index
            break;
        }
        uint32_t s = e.wStream;
        if (s >= nStreamNum || s >= AVI_STREAM_SLOTS) return MM_E_FAIL;
        const _AVIStreamHeader& h = aStreams[s].header;
        if (h.fccType == Fourcc("vids")) {
            if (!haveVideo) {
                haveVideo = true;
                videoTime = 0;
                nCurIndex[s] = i;
            } else {
                videoTime += frameTime;
            }
            e.dwTimeMs = videoTime;
            frameTime = FrameTimeMs(h);
        } else if (h.fccType == Fourcc("auds")) {
            if (!haveAudio) {
                haveAudio = true;
                audioTime = 0;
                nCurIndex[s] = i;
            } else {
                if (pAudioFormat != nullptr && pAudioFormat->nAvgBytesPerSec != 0) {
                    audioStep = static_cast<uint32_t>(uint64_t(audioLength) * 1000 / pAudioFormat->nAvgBytesPerSec);
                }
                audioTime += audioStep;
            }
            e.dwTimeMs = audioTime;
            audioLength = e.dwChunkLength;
        } else {
            return MM_E_FAIL;  // entries read so far stay
        }
        nLastIndex[s] = i;
    }
    return MM_OK;
}

uint32_t CAVIParser::searchNextIndex(uint32_t stream, uint32_t i) {
    if (nIndexCount == 0) return 0;
    if (i >= nIndexCount - 1) return nIndexCount - 1;
    for (uint32_t j = i + 1; j < nIndexCount; ++j) {
        if (pIndex[j].wStream == stream) return j;
    }
    return nIndexCount;
}

uint32_t CAVIParser::searchPreIndex(uint32_t stream, uint32_t i) {
    // Entry 0 is never examined; "none" answers 0.
    if (i <= 1 || nIndexCount == 0) return 0;
    if (i > nIndexCount) i = nIndexCount;
    for (uint32_t j = i - 1; j >= 1; --j) {
        if (pIndex[j].wStream == stream) return j;
    }
    return 0;
}

bool CAVIParser::nextOfStream(uint32_t stream, uint32_t i, uint32_t* j) const {
    for (uint32_t k = i + 1; k < nIndexCount; ++k) {
        if (pIndex[k].wStream == stream) {
            *j = k;
            return true;
        }
    }
    return false;
}

bool CAVIParser::previousOfStream(uint32_t stream, uint32_t i, uint32_t* j) const {
    for (uint32_t k = i; k-- > 0;) {
        if (pIndex[k].wStream == stream) {
            *j = k;
            return true;
        }
    }
    return false;
}

int32_t CAVIParser::setMediaTime(uint32_t stream, uint32_t timeMs, uint32_t* actualMs) {
    if (actualMs == nullptr || timeMs > nDurationMs || stream >= nStreamNum || nDurationMs == 0) {
        return MM_E_INVALIDARG;
    }
    if (pIndex == nullptr || nIndexCount == 0 || stream >= AVI_STREAM_SLOTS) return MM_E_FAIL;

    double share = static_cast<double>(timeMs) / nDurationMs * nIndexCount;
    uint32_t cur = share >= nIndexCount ? nIndexCount - 1 : static_cast<uint32_t>(share);
    if (pIndex[cur].wStream != stream) {
        uint32_t j;
        // Failing a later entry, the estimate lies past the stream's last one.
        if (nextOfStream(stream, cur, &j) || previousOfStream(stream, cur, &j)) {
            cur = j;
        } else {
            return MM_E_FAIL;  // the stream has no entries
        }
    }

    if (timeMs > pIndex[cur].dwTimeMs) {
        uint32_t j;
        while (pIndex[cur].dwTimeMs <= timeMs && nextOfStream(stream, cur, &j)) cur = j;
    } else if (timeMs < pIndex[cur].dwTimeMs) {
        uint32_t j;
        while (previousOfStream(stream, cur, &j) && pIndex[j].dwTimeMs >= timeMs) cur = j;
    }

    if (aStreams[stream].header.fccType == Fourcc("vids")) {
        uint32_t j;
        while (pIndex[cur].dwFlags != AVI_KEYFRAME_FLAGS && cur != 0 && previousOfStream(stream, cur, &j)) cur = j;
    }
    *actualMs = pIndex[cur].dwTimeMs;
    nCurIndex[stream] = cur;
    return MM_OK;
}

int32_t CAVIParser::getNextFrame(uint32_t stream, _FrameInfo* info) {
    if (info == nullptr) return MM_E_INVALIDARG;
    if (nMoviSize == 0 || pIndex == nullptr || nIndexCount == 0 || stream >= nStreamNum || stream >= AVI_STREAM_SLOTS ||
        hFile == 0) {
        return MM_E_FAIL;
    }
    uint32_t cur = nCurIndex[stream];
    // The stream's last entry is never delivered.
    if (cur >= nLastIndex[stream]) return 1;
    if (cur >= nIndexCount) return MM_E_FAIL;
    const _AVIIndexEntry& e = pIndex[cur];
    if (e.wStream != stream) return MM_E_FAIL;
    uint64_t at = uint64_t(nMoviBase) + e.dwChunkOffset + 8;
    if (at > nMoviEnd || e.dwChunkLength > nMoviSize) return MM_E_FAIL;

    uint32_t next;
    if (nextOfStream(stream, cur, &next)) nCurIndex[stream] = next;

    info->dwFlags = e.dwFlags;
    info->pData = nullptr;
    info->dwSize = e.dwChunkLength;
    info->dwTimeMs = e.dwTimeMs;
    if (e.dwChunkLength == 0) return MM_OK;
    // A chunk the file cannot hold is a short read; nothing is allocated for it.
    if (at + e.dwChunkLength > nFileSize) return MM_E_FAIL;
    unsigned char* data = new (std::nothrow) unsigned char[e.dwChunkLength];
    if (data == nullptr) return MM_E_OUTOFMEMORY;
    if (MEx_fseek(hFile, static_cast<int64_t>(at), SEEK_SET) != 0 ||
        MEx_fread(data, 1, e.dwChunkLength, hFile) != static_cast<int>(e.dwChunkLength)) {
        delete[] data;
        info->pData = nullptr;
        return MM_E_FAIL;
    }
    info->pData = data;
    return MM_OK;
}
