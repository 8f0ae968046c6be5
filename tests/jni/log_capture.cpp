// Native side of LogCapture: routes the library's log lines into a buffer the
// Java test can read.
#include <jni.h>

#include <mutex>
#include <string>

#include "metainfo/metainfo.h"

namespace {

std::mutex g_lock;
std::string g_lines;

void Capture(int priority, const char* tag, const char* message) {
    std::lock_guard<std::mutex> lock(g_lock);
    g_lines += std::to_string(priority) + "|" + (tag != nullptr ? tag : "(null)") + "|" + message + "\n";
}

}  // namespace

extern "C" JNIEXPORT void JNICALL Java_LogCapture_install(JNIEnv*, jclass) { MM_MediaExtractor_SetLogSink(Capture); }

extern "C" JNIEXPORT jstring JNICALL Java_LogCapture_drain(JNIEnv* env, jclass) {
    std::string lines;
    {
        std::lock_guard<std::mutex> lock(g_lock);
        lines.swap(g_lines);
    }
    return env->NewStringUTF(lines.c_str());
}

// Without its own, the JVM would find the library's JNI_OnLoad through this
// helper's dependency and register the binding before the sink is in place.
extern "C" JNIEXPORT jint JNICALL JNI_OnLoad(JavaVM*, void*) { return JNI_VERSION_1_6; }
