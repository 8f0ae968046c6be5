package com.velorana.android.mediametainfo;

/** Stand-in for the platform class the binding registers its methods on. */
public class MediaMetaInfo {
    private long mNativeContext;

    public native String GetMediaMetaInfo(int key) throws java.io.IOException;

    public native void setFileSource(String path);

    public native void Release();

    public long nativeContext() {
        return mNativeContext;
    }
}
