package com.orvanta.android.kzsdk;

import java.nio.ByteBuffer;

/**
 * The native methods behind {@link StreamingFingerprint}, in {@code libkzsdk}, which exports them
 * under their names. They return a status, 0 on success, and report the rest through an array.
 */
final class NativeStream {
    private NativeStream() {}

    static native int create(int algorithm, int format, int rate, int channels, long[] out);

    static native int feed(long stream, ByteBuffer bytes, int position, int count, long[] out);

    static native int finish(long stream, long[] out);

    static native int state(long stream, long[] out);

    static native String document(long stream, long[] out);

    static native String statusText(int status);

    /** Returns the version of {@code libkzsdk}. */
    static native String version();

    static native void free(long stream);
}
