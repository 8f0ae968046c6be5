// Values that a parse leaves behind for the next call of the same format.
//
// Callers rely on them carrying over between calls made one after another, but
// a media scanner probes files from several threads at once. Each value is
// therefore held per thread: on one thread the behaviour is that of a single
// process-wide value, and parses on different threads cannot see each other's
// state. Any format that needs such a value declares it here, thread_local.
#pragma once

#include <cstdint>

namespace metainfo {

// Size of the MP4 file being walked: the upper bound for every box size.
extern thread_local uint32_t s_mp4FileSize;
// Size of the ASF file being walked: the upper bound for object sizes.
extern thread_local uint32_t s_asfFileSize;
// QCP codec seen in the last "fmt " chunk (1 QCELP, 2 EVRC); never reset.
extern thread_local uint32_t s_codectype;

}  // namespace metainfo
