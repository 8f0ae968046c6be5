// The AVI parser object: header list, clip record, and the factory.
#include "metainfo/avi_parser.h"

#include <cstdio>
#include <cstring>
#include <new>

#include "avi/avi_riff.h"
#include "core/byte_reader.h"
#include "core/file_access.h"

using namespace metainfo;
using namespace metainfo::avi;

namespace {

// Codecs whose private bytes follow the 40-byte bitmap header rather than
// starting with it.
bool PrivateDataAfterBitmapHeader(uint32_t codec) {
    static const uint32_t kCodecs[] = {Fourcc("DIVX"), Fourcc("divx"), Fourcc("XVID"),
                                       Fourcc("xvid"), Fourcc("mp4v"), Fourcc("FMP4")};
    for (uint32_t c : kCodecs) {
        if (c == codec) return true;
    }
    return false;
}

// Copies up to n bytes of a structure that starts at offset within a region of
// avail bytes; what the region does not hold reads as zero.
void CopyPadded(uint8_t* out, size_t n, const unsigned char* region, uint64_t avail, uint64_t offset) {
    std::memset(out, 0, n);
    if (offset >= avail) return;
    uint64_t have = avail - offset;
    std::memcpy(out, region + offset, have < n ? static_cast<size_t>(have) : n);
}

}  // namespace

CAVIParser::CAVIParser()
    : hFile(0),
      nFileSize(0),
      nRiffEnd(0),
      mainHeader(),
      aStreams(),
      nExtraSize(),
      pExtra(),
      pIndex(nullptr),
      pVideoFormat(nullptr),
      pAudioFormat(nullptr),
      nStreamNum(0),
      nDurationMs(0),
      nIndexCount(0),
      nCurIndex(),
      nLastIndex(),
      nMoviBase(0),
      nMoviEnd(0),
      nMoviSize(0) {}

CAVIParser::~CAVIParser() {
    delete pAudioFormat;
    delete pVideoFormat;
    releaseIndex();
    free();
    for (unsigned char*& extra : pExtra) {
        delete[] extra;
        extra = nullptr;
    }
}

void CAVIParser::releaseIndex() {
    delete[] pIndex;
    pIndex = nullptr;
    nIndexCount = 0;
    for (uint32_t s = 0; s < AVI_STREAM_SLOTS; ++s) {
        nCurIndex[s] = 0;
        nLastIndex[s] = 0;
    }
}

// A second init on the same object starts from a clean state.
void CAVIParser::reset() {
    free();
    delete pAudioFormat;
    pAudioFormat = nullptr;
    delete pVideoFormat;
    pVideoFormat = nullptr;
    releaseIndex();
    for (uint32_t s = 0; s < AVI_STREAM_SLOTS; ++s) {
        delete[] pExtra[s];
        pExtra[s] = nullptr;
        nExtraSize[s] = 0;
        std::memset(&aStreams[s], 0, sizeof aStreams[s]);
    }
    std::memset(&mainHeader, 0, sizeof mainHeader);
    nFileSize = 0;
    nRiffEnd = 0;
    nStreamNum = 0;
    nDurationMs = 0;
    nMoviBase = nMoviEnd = nMoviSize = 0;
}

int32_t CAVIParser::free() {
    if (hFile != 0) {
        MEx_fclose(hFile);
        hFile = 0;
    }
    return MM_OK;
}

uint32_t CAVIParser::getDuration() { return nDurationMs; }
uint32_t CAVIParser::getStreamNum() { return nStreamNum; }

int32_t CAVIParser::getStreamType(int i) {
    if (i < 0 || static_cast<uint32_t>(i) >= nStreamNum || i >= AVI_STREAM_SLOTS) return -1;
    return static_cast<int32_t>(aStreams[i].nStreamCodec);
}

int32_t CAVIParser::getMediaInfo() { return MM_OK; }
int32_t CAVIParser::parseJunk(int) { return MM_OK; }

int32_t CAVIParser::getChunkHeader(int handle, _CHUNKHEADER* header) {
    if (handle == 0 || header == nullptr) return MM_E_INVALIDARG;
    uint8_t b[12] = {};
    // A short read leaves the missing bytes zero; the size checks reject it.
    MEx_fread(b, 1, sizeof b, handle);
    header->ckID = ReadBE32(b);
    header->ckSize = ReadLE32(b + 4);
    header->ckType = ReadBE32(b + 8);
    return MM_OK;
}

int32_t CAVIParser::getChunkHeader(const unsigned char* buf, _CHUNKHEADER* header) {
    if (buf == nullptr || header == nullptr) return MM_E_INVALIDARG;
    header->ckID = ReadBE32(buf);
    header->ckSize = ReadLE32(buf + 4);
    header->ckType = ReadBE32(buf + 8);
    return MM_OK;
}

int32_t CAVIParser::init(const char* path, _MMClipInfo* clip) {
    if (path == nullptr) return MM_E_INVALIDARG;
    reset();
    hFile = MEx_fopen(path, "rb");
    if (hFile == 0) return -1;
    MEx_fseek(hFile, 0, SEEK_END);
    nFileSize = PositionToU32(MEx_ftell(hFile));
    MEx_fseek(hFile, 0, SEEK_SET);

    _CHUNKHEADER riff{};
    getChunkHeader(hFile, &riff);
    if (riff.ckID != Fourcc("RIFF")) return MM_E_FAIL;
    nRiffEnd = SaturateU32(uint64_t(riff.ckSize) + 8);

    int32_t result = parseListChunks();
    if (clip == nullptr) return result;

    clip->nFileSize = nFileSize;
    uint32_t seconds = nDurationMs / 1000;
    clip->nDuration = seconds;
    // The product wraps in 32 bits, as the clip record has always reported it.
    if (seconds != 0) clip->nBitrate = static_cast<uint32_t>(nFileSize * 8u) / seconds;
    if (pAudioFormat != nullptr) {
        clip->bHasAudio = 1;
        clip->nAudioBitrate = pAudioFormat->nAvgBytesPerSec;  // bytes per second, as callers expect
        clip->nSampleRate = pAudioFormat->nSamplesPerSec;
        clip->nChannels = pAudioFormat->nChannels;
        clip->nBitsPerSample = pAudioFormat->wBitsPerSample;
        clip->nSamplesPerFrame = 0;
    }
    if (pVideoFormat != nullptr) {
        clip->bHasVideo = 1;
        clip->nVideoBitrate = clip->nBitrate - clip->nAudioBitrate;
        clip->nWidth = pVideoFormat->biWidth;
        clip->nHeight = pVideoFormat->biHeight;
        if (seconds != 0) clip->nFrameRate = mainHeader.dwTotalFrames / seconds;
    }
    if (CopyExtensionAsFormat(path, clip->szFormat) != MM_OK) return MM_E_FAIL;
    return result;
}

int32_t CAVIParser::parseListChunks() {
    uint64_t pos = 12;
    while (pos < nFileSize) {
        if (MEx_fseek(hFile, static_cast<int64_t>(pos), SEEK_SET) != 0) return MM_E_FAIL;
        _CHUNKHEADER header{};
        getChunkHeader(hFile, &header);
        MEx_fseek(hFile, static_cast<int64_t>(pos), SEEK_SET);
        if (pos < nRiffEnd && (header.ckSize == 0 || header.ckSize >= nFileSize)) return MM_E_FAIL;
        if (header.ckID == Fourcc("JUNK")) {
            parseJunk(hFile);
        } else if (header.ckType == Fourcc("INFO")) {
            parseInfo();
        } else if (header.ckType == Fourcc("hdrl")) {
            parseHdrl();  // a damaged header list still leaves what it read
        }
        uint64_t next = pos + 8 + header.ckSize;
        if (next >= nRiffEnd) return next <= nFileSize ? MM_OK : MM_E_FAIL;
        if (next > nFileSize) return MM_E_FAIL;
        pos = next;
    }
    return MM_OK;
}

int32_t CAVIParser::parseInfo() {
    _CHUNKHEADER header{};
    getChunkHeader(hFile, &header);
    if (header.ckSize > nFileSize || header.ckSize == 0) return MM_E_FAIL;
    return MM_OK;
}

int32_t CAVIParser::parseHdrl() {
    int64_t start = MEx_ftell(hFile);
    if (start < 0) return MM_E_FAIL;
    _CHUNKHEADER header{};
    getChunkHeader(hFile, &header);
    if (header.ckSize >= nFileSize || header.ckSize == 0 || header.ckSize < 4) return MM_E_FAIL;
    uint32_t bodySize = header.ckSize - 4;
    uint64_t bodyStart = uint64_t(start) + 12;
    // A list that claims more than the file holds cannot be read whole.
    if (bodyStart + bodySize > nFileSize) return MM_E_FAIL;
    unsigned char* body = new (std::nothrow) unsigned char[bodySize == 0 ? 1 : bodySize];
    if (body == nullptr) return MM_E_OUTOFMEMORY;
    if (bodySize != 0 && MEx_fread(body, 1, bodySize, hFile) != static_cast<int>(bodySize)) {
        delete[] body;
        return MM_E_FAIL;
    }

    getAVIMainHeader(body, bodySize);

    int32_t result = MM_OK;
    uint64_t off = kMainHeaderBytes;
    while (off < bodySize) {
        if (bodySize - off < 12) {
            result = MM_E_FAIL;
            break;
        }
        _CHUNKHEADER list{};
        getChunkHeader(body + off, &list);
        if (off + 8 + list.ckSize > bodySize || list.ckType != Fourcc("strl")) {
            result = MM_E_FAIL;  // streams read so far stay
            break;
        }
        // Only two stream slots exist; later stream lists are skipped.
        if (nStreamNum < AVI_STREAM_SLOTS) {
            uint32_t strlSize = list.ckSize >= 4 ? list.ckSize - 4 : 0;
            result = ParseStrl(body + off + 12, strlSize);
            if (result != MM_OK) break;
        }
        off += uint64_t(list.ckSize) + 8;
    }
    delete[] body;
    return result;
}

// Takes the main header from the start of the header list without checking
// its "avih" identifier; it always occupies 64 bytes.
int32_t CAVIParser::getAVIMainHeader(const unsigned char* body, uint32_t size) {
    uint8_t avih[kMainHeaderBytes];
    CopyPadded(avih, sizeof avih, body, size, 0);
    mainHeader.cb = ReadLE32(avih + 4);
    mainHeader.dwMicroSecPerFrame = ReadLE32(avih + 8);
    mainHeader.dwMaxBytesPerSec = ReadLE32(avih + 12);
    mainHeader.dwFlags = ReadBE32(avih + 20);
    mainHeader.dwTotalFrames = ReadLE32(avih + 24);
    mainHeader.dwInitialFrames = ReadLE32(avih + 28);
    mainHeader.dwStreams = ReadLE32(avih + 32);
    mainHeader.dwSuggestedBufferSize = ReadLE32(avih + 36);
    mainHeader.dwWidth = ReadLE32(avih + 40);
    mainHeader.dwHeight = ReadLE32(avih + 44);
    for (size_t i = 0; i < 4; ++i) mainHeader.dwReserved[i] = ReadLE32(avih + 48 + 4 * i);
    // The flag word is read big-endian, so the bits come from its swapped form.
    mainHeader.bHasIndex = (mainHeader.dwFlags >> 4) & 1;
    mainHeader.bMustUseIndex = (mainHeader.dwFlags >> 5) & 1;
    mainHeader.bInterleaved = (mainHeader.dwFlags >> 8) & 1;
    mainHeader.bCopyrighted = (mainHeader.dwFlags >> 17) & 1;
    return MM_OK;
}

int32_t CAVIParser::getAVIStreamHeader(const unsigned char* body, uint32_t size, _AVIStreamHeader* header,
                                       uint32_t* chunkSize) {
    if (size < 8 || !BytesEqual(body, "strh", 4)) return MM_E_FAIL;
    uint8_t f[kStreamHeaderFieldBytes];
    CopyPadded(f, sizeof f, body, size, 8);
    header->fccType = ReadBE32(f);
    header->fccHandler = ReadBE32(f + 4);
    header->dwFlags = ReadBE32(f + 8);
    header->dwPriorityLanguage = ReadLE32(f + 12);
    header->dwInitialFrames = ReadLE32(f + 16);
    header->dwScale = ReadLE32(f + 20);
    header->dwRate = ReadLE32(f + 24);
    header->dwStart = ReadLE32(f + 28);
    header->dwLength = ReadLE32(f + 32);
    header->dwSuggestedBufferSize = ReadLE32(f + 36);
    header->dwQuality = ReadLE32(f + 40);
    header->dwSampleSize = ReadLE32(f + 44);
    *chunkSize = ReadLE32(body + 4);
    return MM_OK;
}

int32_t CAVIParser::ParseStrl(const unsigned char* body, uint32_t size) {
    uint32_t slot = nStreamNum;
    if (slot >= AVI_STREAM_SLOTS) return MM_OK;
    std::memset(&aStreams[slot], 0, sizeof aStreams[slot]);
    _AVIStreamHeader& h = aStreams[slot].header;
    uint32_t strhSize = 0;
    if (getAVIStreamHeader(body, size, &h, &strhSize) != MM_OK) return MM_E_FAIL;

    uint64_t formatAt = uint64_t(strhSize) + 8;
    if (formatAt < size) {
        getAVIStreamFormat(body + formatAt, static_cast<uint32_t>(size - formatAt), h.fccType);
    }

    // The first stream with a rate fixes the duration.
    if (h.dwScale != 0 && h.dwRate != 0 && nDurationMs == 0) {
        nDurationMs = static_cast<uint32_t>(uint64_t(h.dwScale) * h.dwLength * 1000 / h.dwRate);
    }
    aStreams[slot].nStreamIndex = slot;
    ++nStreamNum;
    return MM_OK;
}

int32_t CAVIParser::getAVIStreamFormat(const unsigned char* chunk, uint32_t avail, uint32_t fccType) {
    uint32_t slot = nStreamNum;
    if (avail < 8 || !BytesEqual(chunk, "strf", 4)) return MM_E_FAIL;
    uint32_t size = ReadLE32(chunk + 4);
    StreamSlot& s = aStreams[slot];
    if (fccType == Fourcc("vids")) {
        if (pVideoFormat == nullptr) pVideoFormat = new (std::nothrow) _AVIVideoFormat;
        if (pVideoFormat == nullptr) return MM_E_OUTOFMEMORY;
        std::memset(pVideoFormat, 0, sizeof *pVideoFormat);
        uint8_t b[kBitmapHeaderBytes];
        CopyPadded(b, sizeof b, chunk, avail, 8);
        pVideoFormat->biSize = ReadLE32(b);
        pVideoFormat->biWidth = ReadLE32(b + 4);
        pVideoFormat->biHeight = ReadLE32(b + 8);
        pVideoFormat->biPlanes = ReadLE16(b + 12);
        pVideoFormat->biBitCount = ReadLE16(b + 14);
        pVideoFormat->biCompression = ReadLE32(b + 16);
        pVideoFormat->biSizeImage = ReadLE32(b + 20);
        pVideoFormat->biXPelsPerMeter = ReadLE32(b + 24);
        pVideoFormat->biYPelsPerMeter = ReadLE32(b + 28);
        pVideoFormat->biClrUsed = ReadLE32(b + 32);
        pVideoFormat->biClrImportant = ReadLE32(b + 36);
        s.nStreamCodec = s.header.fccHandler;
    } else if (fccType == Fourcc("auds")) {
        if (pAudioFormat == nullptr) pAudioFormat = new (std::nothrow) _AVIAudioFormat;
        if (pAudioFormat == nullptr) return MM_E_OUTOFMEMORY;
        uint8_t b[kWaveFormatBytes];
        CopyPadded(b, sizeof b, chunk, avail, 8);
        pAudioFormat->wFormatTag = ReadLE16(b);
        pAudioFormat->nChannels = ReadLE16(b + 2);
        pAudioFormat->nSamplesPerSec = ReadLE32(b + 4);
        pAudioFormat->nAvgBytesPerSec = ReadLE32(b + 8);
        pAudioFormat->nBlockAlign = ReadLE16(b + 12);
        pAudioFormat->wBitsPerSample = ReadLE16(b + 14);
        pAudioFormat->cbSize = ReadLE16(b + 16);
        s.nStreamCodec = pAudioFormat->wFormatTag;
    }

    uint64_t extraAt = 8;
    uint64_t extraSize = size;
    if (PrivateDataAfterBitmapHeader(s.nStreamCodec)) {
        extraAt = 8 + kBitmapHeaderBytes;
        extraSize = size >= kBitmapHeaderBytes + 1 ? size - kBitmapHeaderBytes : 0;
    }
    if (extraSize == 0) return MM_OK;
    // Private bytes the stream list does not hold cannot be copied.
    if (extraAt + extraSize > avail) return MM_E_FAIL;
    const auto bytes = static_cast<size_t>(extraSize);  // within avail, so it fits
    unsigned char* extra = new (std::nothrow) unsigned char[bytes];
    if (extra == nullptr) return MM_E_FAIL;
    std::memcpy(extra, chunk + extraAt, bytes);
    delete[] pExtra[slot];
    pExtra[slot] = extra;
    nExtraSize[slot] = static_cast<uint32_t>(extraSize);
    return MM_OK;
}

extern "C" int32_t CreateAVIParserObject(CAVIParser** out) {
    if (out == nullptr) return MM_E_INVALIDARG;
    *out = new (std::nothrow) CAVIParser();
    return *out != nullptr ? MM_OK : MM_E_OUTOFMEMORY;
}

extern "C" int32_t FreeAVIParserObject(CAVIParser* p) {
    if (p == nullptr) return MM_E_INVALIDARG;
    delete p;
    return MM_OK;
}
