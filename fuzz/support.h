// What every fuzz target shares: the input as a file under the names a target
// asks for, a protection service that serves the input's bytes for ".dcf" and
// ".fl" paths, and checks that returned buffers are whole and that every file
// handle and decrypt session is closed again.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "metainfo/metainfo.h"

namespace fuzz {

// One input for the duration of a call of LLVMFuzzerTestOneInput. The
// constructor writes it to this process's scratch file; the destructor fails
// the run when a descriptor or decrypt session was left open.
class InputFile {
public:
    InputFile(const uint8_t* data, size_t size);
    ~InputFile();
    InputFile(const InputFile&) = delete;
    InputFile& operator=(const InputFile&) = delete;

    // The input under a name ending in suffix (".mp3", ".dcf", "" ...).
    // ".dcf" paths are served by the protection service with their length
    // in its metadata, ".fl" paths without metadata (the length then comes
    // from the file system).
    std::string Path(const std::string& suffix) const;
    // A path in the scratch directory for a file the library writes; it is
    // removed when the input is done.
    std::string OutputPath(const std::string& suffix) const;
    // Last byte of the input (0 for an empty one): picks a target's variant,
    // so that a plain media file replays the plain variant.
    uint8_t Tail() const;
    // The protected name the tail picks: ".dcf" or ".fl".
    std::string ProtectedPath() const;

private:
    const uint8_t* data_;
    size_t size_;
    int lowestFreeDescriptor_;
};

// Stops the run with a message (a failed check is a finding like a crash).
[[noreturn]] void Fail(const char* what, const std::string& detail = "");

// Reads every byte of a returned buffer, so that a buffer shorter than its
// announced size is caught by AddressSanitizer.
void Touch(const void* data, size_t size);

void CheckClip(const _MMClipInfo& clip);
void ReleaseMeta(_MMMetaInfo* meta);
void ReleaseMime(_MM_MIMETYPE* mime);
void ReleaseMaker(_MAKERINFO* maker);
void ReleaseAudio(unsigned char* data, int size, int extraBytes = 0);

// Every query of the C interface on path, with type where a query takes one.
void QueryAll(const std::string& path, int type);

// A name a family's files carry and the media type it is queried as.
struct Variant {
    const char* suffix;
    int type;
};

// The queries of a media family: once on the plain file, named with the
// variant the tail byte picks (the first variant of the detected type when
// detection finds one of the family), then once more through the protection
// service.
void FuzzFamily(const uint8_t* data, size_t size, const Variant* variants, size_t count);

template <size_t N>
void FuzzFamily(const uint8_t* data, size_t size, const Variant (&variants)[N]) {
    FuzzFamily(data, size, variants, N);
}

// The accurate interface on path: mi_probe, then every picture it finds
// copied (a picture announced larger than the input is not copied).
void ProbeAndCopy(const std::string& path, size_t inputSize);

// A format's accurate reader: the input under the suffix its tail byte picks,
// probed and its pictures copied.
void FuzzProbe(const uint8_t* data, size_t size, const char* const* suffixes, size_t count);

template <size_t N>
void FuzzProbe(const uint8_t* data, size_t size, const char* const (&suffixes)[N]) {
    FuzzProbe(data, size, suffixes, N);
}

}  // namespace fuzz

// Removes this process's scratch files (also called by the replay driver when
// an input runs out of time).
extern "C" void MetainfoFuzzRemoveScratch();
