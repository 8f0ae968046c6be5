package com.velorana.android.mediametainfo;

/** A class of the right name that lacks the native methods. */
public class MediaMetaInfo {
    private long mNativeContext;
}
