#include "core/log.h"

#include <atomic>
#include <cstdarg>
#include <cstdio>

#include "metainfo/metainfo.h"

#ifdef __ANDROID__
#include <android/log.h>
#endif

namespace metainfo {
namespace {
std::atomic<MM_LogSink> g_sink{nullptr};
}

void LogPrint(int priority, const char* tag, const char* fmt, ...) {
    va_list args;
    va_start(args, fmt);
#ifdef __ANDROID__
    __android_log_vprint(priority, tag, fmt, args);
#else
    MM_LogSink sink = g_sink.load(std::memory_order_acquire);
    if (sink != nullptr) {
        char message[1024];
        (void)vsnprintf(message, sizeof message, fmt, args);
        sink(priority, tag, message);
    }
#endif
    va_end(args);
}

}  // namespace metainfo

extern "C" void MM_MediaExtractor_SetLogSink(MM_LogSink sink) {
    metainfo::g_sink.store(sink, std::memory_order_release);
}
