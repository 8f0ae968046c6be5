// The Java binding: three native methods of
// com.velorana.android.mediametainfo.MediaMetaInfo that name a file's codecs.
#pragma once

#include <jni.h>

namespace metainfo {

// What the Java object holds in its mNativeContext field: the file it was
// given and what detection said about it. No parsed data is kept.
class MP_MetaInfo_Adapter {
public:
    explicit MP_MetaInfo_Adapter(const char* path);
    virtual ~MP_MetaInfo_Adapter();
    MP_MetaInfo_Adapter(const MP_MetaInfo_Adapter&) = delete;
    MP_MetaInfo_Adapter& operator=(const MP_MetaInfo_Adapter&) = delete;

    const char* path() const { return mPath; }
    int drmKind() const { return mDrmKind; }
    int mediaType() const { return mMediaType; }

private:
    char* mPath;
    int mDrmKind;
    int mMediaType;
};

jstring Java_MediaMetaInfo_GetMediaMetaInfo(JNIEnv* env, jobject thiz, jint key);
void Java_MediaMetaInfo_setFileSource(JNIEnv* env, jobject thiz, jstring path);
void Java_MediaMetaInfo_Release(JNIEnv* env, jobject thiz);

}  // namespace metainfo

extern "C" JNIEXPORT jint JNICALL JNI_OnLoad(JavaVM* vm, void* reserved);
