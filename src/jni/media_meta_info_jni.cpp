#include "jni/media_meta_info_jni.h"

#include <pthread.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "core/codes.h"
#include "core/drm.h"
#include "core/log.h"
#include "metainfo/metainfo.h"

namespace metainfo {
namespace {

const char* const kClassPath = "com/velorana/android/mediametainfo/MediaMetaInfo";
const char* const kTag = "MetaInfo_JNI";
const char* const kNoDefine = "MediaInfo_NODEFINE";
const char* const kContextField = "mNativeContext";
constexpr jint kJniVersion = 0x10006;
constexpr jint kOnLoadVersion = 0x10004;

// Serialises every native method: the Java side may call from any thread.
// Ready before the methods are registered, so JNI_OnLoad has nothing to set up.
pthread_mutex_t mutex = PTHREAD_MUTEX_INITIALIZER;

class Locked {
public:
    Locked() { pthread_mutex_lock(&mutex); }
    ~Locked() { pthread_mutex_unlock(&mutex); }
    Locked(const Locked&) = delete;
    Locked& operator=(const Locked&) = delete;
};

const JNINativeMethod gMethods[] = {
    {const_cast<char*>("GetMediaMetaInfo"), const_cast<char*>("(I)Ljava/lang/String;"),
     reinterpret_cast<void*>(Java_MediaMetaInfo_GetMediaMetaInfo)},
    {const_cast<char*>("setFileSource"), const_cast<char*>("(Ljava/lang/String;)V"),
     reinterpret_cast<void*>(Java_MediaMetaInfo_setFileSource)},
    {const_cast<char*>("Release"), const_cast<char*>("()V"), reinterpret_cast<void*>(Java_MediaMetaInfo_Release)},
};

// Leaves an exception pending: the one asked for, or the JVM's own when the
// class cannot be found. The caller returns to Java straight away, since no
// JNI function may be called while an exception is pending.
void Throw(JNIEnv* env, const char* className, const char* message) {
    jclass cls = env->FindClass(className);
    if (cls != nullptr) env->ThrowNew(cls, message);
}

// Null, with the JVM's NoSuchFieldError pending, when the object has no such field.
jfieldID ContextField(JNIEnv* env, jobject thiz) {
    jclass cls = env->GetObjectClass(thiz);
    if (cls == nullptr) return nullptr;
    return env->GetFieldID(cls, kContextField, "J");
}

MP_MetaInfo_Adapter* AdapterIn(JNIEnv* env, jobject thiz, jfieldID field) {
    return reinterpret_cast<MP_MetaInfo_Adapter*>(static_cast<intptr_t>(env->GetLongField(thiz, field)));
}

void StoreAdapter(JNIEnv* env, jobject thiz, jfieldID field, MP_MetaInfo_Adapter* adapter) {
    env->SetLongField(thiz, field, static_cast<jlong>(reinterpret_cast<intptr_t>(adapter)));
}

uint32_t CodecField(const _MM_CODECTYPE& codec, jint key) {
    switch (key) {
        case 0: return codec.nAudioCodec;
        case 1: return codec.nAudioProfile;
        case 2: return codec.nVideoCodec;
        default: return codec.nVideoProfile;
    }
}

}  // namespace

MP_MetaInfo_Adapter::MP_MetaInfo_Adapter(const char* path)
    : mPath(strdup(path)), mDrmKind(CheckDRM(path)), mMediaType(MEDIA_TYPE_UNKNOWN) {
    if (MM_MediaExtractor_DetectMediaType(path, &mMediaType) != MM_OK) {
        LogPrint(kLogError, nullptr, "MP_MetaInfo_Adapter: invalid media type: %s", path);
    }
}

MP_MetaInfo_Adapter::~MP_MetaInfo_Adapter() { std::free(mPath); }

void Java_MediaMetaInfo_setFileSource(JNIEnv* env, jobject thiz, jstring path) {
    Locked lock;
    const char* chars = path != nullptr ? env->GetStringUTFChars(path, nullptr) : nullptr;
    if (chars == nullptr) {
        // The characters can only be missing for want of memory: the JVM's
        // OutOfMemoryError is then pending and says so better.
        if (!env->ExceptionCheck()) Throw(env, "java/lang/IllegalArgumentException", nullptr);
        return;
    }
    MP_MetaInfo_Adapter* adapter = new MP_MetaInfo_Adapter(chars);
    env->ReleaseStringUTFChars(path, chars);
    jfieldID field = ContextField(env, thiz);
    if (field == nullptr) {
        // Nowhere to keep it: the object cannot use it, so it is not kept.
        delete adapter;
        return;
    }
    delete AdapterIn(env, thiz, field);
    StoreAdapter(env, thiz, field, adapter);
}

void Java_MediaMetaInfo_Release(JNIEnv* env, jobject thiz) {
    Locked lock;
    jfieldID field = ContextField(env, thiz);
    if (field == nullptr) return;
    delete AdapterIn(env, thiz, field);
    StoreAdapter(env, thiz, field, nullptr);
}

jstring Java_MediaMetaInfo_GetMediaMetaInfo(JNIEnv* env, jobject thiz, jint key) {
    Locked lock;
    jfieldID field = ContextField(env, thiz);
    MP_MetaInfo_Adapter* adapter = field != nullptr ? AdapterIn(env, thiz, field) : nullptr;
    if (adapter == nullptr) {
        // Java hears of a missing field as a missing extractor.
        if (env->ExceptionCheck()) env->ExceptionClear();
        Throw(env, "java/io/IOException", "No extractor available");
        return nullptr;
    }
    if (static_cast<uint32_t>(key) > 3) {
        // The caller still gets an answer beside the pending exception; the
        // string is made first, while no exception is pending.
        jstring answer = env->NewStringUTF(kNoDefine);
        if (answer == nullptr) return nullptr;
        Throw(env, "java/lang/IllegalArgumentException", nullptr);
        return answer;
    }
    _MM_CODECTYPE codec;
    std::memset(&codec, 0, sizeof codec);
    if (MM_MediaExtractor_GetCodecType(adapter->path(), adapter->mediaType(), &codec) == MM_OK) {
        const char* name = CodecName(CodecField(codec, key));
        if (name != nullptr) return env->NewStringUTF(name);
    }
    return env->NewStringUTF(kNoDefine);
}

}  // namespace metainfo

extern "C" JNIEXPORT jint JNICALL JNI_OnLoad(JavaVM* vm, void* /*reserved*/) {
    using namespace metainfo;
    JNIEnv* env = nullptr;
    if (vm->GetEnv(reinterpret_cast<void**>(&env), kJniVersion) != JNI_OK || env == nullptr) return -1;
    jclass cls = env->FindClass(kClassPath);
    if (cls == nullptr) {
        LogPrint(kLogError, kTag, "find class failed : %s\n", kClassPath);
        LogPrint(kLogError, kTag, "register natives failed \n");
        return 0;
    }
    if (env->RegisterNatives(cls, gMethods, sizeof gMethods / sizeof gMethods[0]) < 0) {
        LogPrint(kLogError, kTag, "RegisterNatives failed\n");
        LogPrint(kLogError, kTag, "register natives failed \n");
        return 0;
    }
    return kOnLoadVersion;
}
