package com.orvanta.android.kzsdk;

/** Directs what lies below the bridge, and reports what it recorded. */
final class Script {
    private Script() {}

    /** Back to the start: every job gives the text "<text/>". */
    static native void reset();

    /** The text of the next job. */
    static native void text(String text);

    /** Whether threads can be started. */
    static native void threads(boolean allowed);

    /** Whether a request wakes the worker. */
    static native void signals(boolean arrive);

    /** Wakes the worker without a request. */
    static native void wake();

    /** Waits until so many waits have begun since reset(). */
    static native void awaitWaits(long count);

    /** Jobs stop in the middle until this is switched off again. */
    static native void hold(boolean hold);

    /** Waits until a job has stopped in the middle. */
    static native void awaitHeldJob();

    /** The bytes that the last job was given. */
    static native byte[] audio();

    /** Rate, channels and format that the last job was given. */
    static native String format();

    /** Lines logged since reset(): priority, tag and message. */
    static native String log();
}
