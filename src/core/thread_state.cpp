#include "core/thread_state.h"

namespace metainfo {

thread_local uint32_t s_mp4FileSize = 0;
thread_local uint32_t s_asfFileSize = 0;
thread_local uint32_t s_codectype = 0;

}  // namespace metainfo
