package com.orvanta.android.kzsdk;

import java.util.concurrent.BlockingQueue;
import java.util.concurrent.LinkedBlockingQueue;
import java.util.concurrent.TimeUnit;

/** No more than the native side needs: five methods, a field and a callback. */
class Fingerprint {
    static {
        System.load(System.getProperty("kzsdk.library"));
    }

    /** What the native side has reported to one object. */
    static final class Events {
        final BlockingQueue<String> queue = new LinkedBlockingQueue<>();
        /** Run on the worker's thread, before the event is queued. */
        volatile Runnable during = () -> {};
        volatile String threadName;
        volatile boolean daemon;

        String next() throws InterruptedException {
            String event = queue.poll(300, TimeUnit.SECONDS);
            if (event == null) {
                throw new AssertionError("The request was lost: no event");
            }
            return event;
        }
    }

    int mNativeContext;

    static void postEventFromNative(Object reference, int event, int argument1, int argument2) {
        if (reference instanceof Events) {
            Events events = (Events) reference;
            events.threadName = Thread.currentThread().getName();
            events.daemon = Thread.currentThread().isDaemon();
            try {
                events.during.run();
            } finally {
                events.queue.add(event + " " + argument1 + " " + argument2);
            }
        }
    }

    native int native_setup(Object weakThis);

    native void native_finalize();

    native int native_generate(int sampleRate, int channels, int formatCode, int bitsPerSample,
            byte[] audio, int length);

    native String native_getFingerprint();

    native void native_release();
}
