// Diagnostics: Android's log on the handset, the caller's sink elsewhere.
#pragma once

namespace metainfo {

enum LogPriority { kLogVerbose = 2, kLogDebug = 3, kLogInfo = 4, kLogWarn = 5, kLogError = 6 };

// tag may be null (the binding's untagged messages).
void LogPrint(int priority, const char* tag, const char* fmt, ...) __attribute__((format(printf, 3, 4)));

}  // namespace metainfo
