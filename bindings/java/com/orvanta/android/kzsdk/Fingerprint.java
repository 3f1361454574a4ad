package com.orvanta.android.kzsdk;

import java.lang.ref.Reference;
import java.lang.ref.WeakReference;
import java.util.Collections;
import java.util.HashSet;
import java.util.Objects;
import java.util.Set;
import java.util.concurrent.CompletableFuture;
import java.util.concurrent.Executor;
import java.util.concurrent.Executors;

/**
 * Makes fingerprints of audio, one after the other, on a thread of its own.
 *
 * <pre>{@code
 * try (Fingerprint fingerprint = new Fingerprint()) {
 *     QueryDocument document =
 *             fingerprint.generate(AudioDescription.pcm16(44100, 2), audio).get();
 *     send(document.text());
 * }
 * }</pre>
 *
 * <p>A fingerprint takes 14.22 seconds of audio after leading silence; what follows is not read.
 * The bytes are copied when a request is made: the array may be changed or dropped at once.
 *
 * <p>Threads: an object may be used from any thread. Different objects work at the same time.
 *
 * <p>Close an object when it is not needed any more; one that is forgotten keeps its thread and the
 * last audio until it is garbage-collected. An object with a request under way is not collected.
 *
 * <p>The native library is looked for as {@code System.loadLibrary("kzsdk")} does, and else taken
 * out of the jar; or loaded from the file that the system property {@code kzsdk.library} names.
 */
public final class Fingerprint implements AutoCloseable {
    private static final int SUCCEEDED = 0;
    private static final int NO_MEMORY = -2;

    /** Keeps objects from being collected whose request somebody may still be waiting for. */
    private static final Set<Fingerprint> AT_WORK = Collections.synchronizedSet(new HashSet<>());

    /** As many threads as there are results being looked at. They do not keep a program from ending. */
    private static final Executor DELIVERY = Executors.newCachedThreadPool(task -> {
        Thread thread = new Thread(task, "Fingerprint results");
        thread.setDaemon(true);
        return thread;
    });

    /** Receives the result of every request. */
    public interface Listener {
        /**
         * Called when a fingerprint was made.
         *
         * @param source the object that the request was made of
         * @param document the fingerprint
         */
        void onFingerprint(Fingerprint source, QueryDocument document);

        /**
         * Called when none could be made.
         *
         * @param source the object that the request was made of
         * @param reason why
         */
        void onFailure(Fingerprint source, FingerprintException reason);
    }

    /** Read and written by the native side, which identifies this object by it; 0 when it has
     * none. */
    @SuppressWarnings("unused")
    private volatile int mNativeContext;

    private final Object lock = new Object();
    private boolean open;
    private CompletableFuture<QueryDocument> underWay;
    private Listener listener;
    private Executor listenerExecutor;
    private volatile Thread eventThread;

    /**
     * Starts the thread.
     *
     * @throws IllegalStateException when there is no memory or no thread
     * @throws UnsatisfiedLinkError when the native library is not found
     */
    public Fingerprint() {
        NativeLibrary.loadSdk();
        int code = native_setup(new WeakReference<>(this));
        if (code != SUCCEEDED) {
            throw new IllegalStateException("The fingerprint thread could not be started (" + code + ")");
        }
        open = true;
    }

    /**
     * Delivers results to a listener on threads that are kept for that.
     *
     * @param listener receives results from the next one on; null stops them
     */
    public void setListener(Listener listener) {
        setListener(listener, DELIVERY);
    }

    /**
     * Delivers results to a listener.
     *
     * @param listener receives results from the next one on; null stops them
     * @param executor runs the listener; on Android, for example, {@code
     *     context.getMainExecutor()}. An executor that runs it at once runs it on the fingerprint
     *     thread: there {@link #generate} of the same object is refused
     */
    public void setListener(Listener listener, Executor executor) {
        Objects.requireNonNull(executor, "executor");
        synchronized (lock) {
            this.listener = listener;
            this.listenerExecutor = executor;
        }
    }

    /**
     * Requests the fingerprint of a whole array.
     *
     * @param description what the bytes mean
     * @param audio the bytes
     * @return see {@link #generate(AudioDescription, byte[], int)}
     */
    public CompletableFuture<QueryDocument> generate(AudioDescription description, byte[] audio) {
        return generate(description, audio, Objects.requireNonNull(audio, "audio").length);
    }

    /**
     * Requests a fingerprint.
     *
     * @param description what the bytes mean
     * @param audio the bytes, which are copied
     * @param length how many of them count, from the first one: a whole number of frames
     * @return a future that gets the fingerprint; or a {@link FingerprintException} when there was
     *     too little audio, or when this object was closed before the work was begun. Cancelling it
     *     stops nothing
     * @throws IllegalArgumentException when the length is not positive, exceeds the array, or is
     *     not a whole number of frames
     * @throws IllegalStateException when the object is closed, or the result of an earlier request
     *     has not come yet
     * @throws OutOfMemoryError when there is no memory for the copy
     */
    public CompletableFuture<QueryDocument> generate(
            AudioDescription description, byte[] audio, int length) {
        Objects.requireNonNull(description, "description");
        Objects.requireNonNull(audio, "audio");
        check(description, audio, length);
        CompletableFuture<QueryDocument> request = new CompletableFuture<>();
        begin(request);
        int code = native_generate(description.sampleRate(), description.channels(),
                description.formatCode(), description.bitsPerSample(), audio, length);
        if (code != SUCCEEDED) {
            end(request);
            if (code == NO_MEMORY) {
                throw new OutOfMemoryError("No memory for a copy of " + length + " bytes of audio");
            }
            throw new IllegalStateException("The request was refused (" + code + ")");
        }
        return request;
    }

    private static void check(AudioDescription description, byte[] audio, int length) {
        if (length <= 0) {
            throw new IllegalArgumentException("There is no audio: the length is " + length);
        }
        if (length > audio.length) {
            throw new IllegalArgumentException(
                    "The length is " + length + ", but the array has " + audio.length + " bytes");
        }
        if (length % description.frameSize() != 0) {
            throw new IllegalArgumentException("A length of " + length
                    + " is not a whole number of frames of " + description.frameSize() + " bytes");
        }
    }

    private void begin(CompletableFuture<QueryDocument> request) {
        if (Thread.currentThread() == eventThread) {
            throw new IllegalStateException(
                    "On the fingerprint thread no further fingerprint can be asked for: give setListener "
                    + "an executor that runs the listener elsewhere");
        }
        synchronized (lock) {
            if (!open) {
                throw new IllegalStateException("This object is closed");
            }
            if (underWay != null) {
                throw new IllegalStateException("The result of an earlier request has not come yet");
            }
            underWay = request;
            AT_WORK.add(this);
        }
    }

    /** Forgets the request if it is still under way. */
    private boolean end(CompletableFuture<QueryDocument> request) {
        synchronized (lock) {
            if (request == null || underWay != request) {
                return false;
            }
            underWay = null;
            AT_WORK.remove(this);
            return true;
        }
    }

    /**
     * Stops the thread. Returns when it has stopped: a fingerprint that is being made is finished
     * first, and its result is still delivered. Closing twice does nothing.
     */
    @Override
    public void close() {
        if (Thread.currentThread() == eventThread) {
            DELIVERY.execute(this::close); // here it would wait for itself
            return;
        }
        synchronized (lock) {
            if (!open) {
                return;
            }
            open = false;
        }
        native_release();
        CompletableFuture<QueryDocument> dropped;
        synchronized (lock) {
            dropped = underWay;
        }
        if (end(dropped)) {
            tell(dropped, null, "The object was closed before the work was begun");
        }
    }

    /** Stops the thread of an object that was not closed. */
    @Override
    protected void finalize() throws Throwable {
        try {
            if (open) {
                open = false;
                native_finalize();
            }
        } finally {
            super.finalize();
        }
    }

    /** Called by the native side, on the fingerprint thread, once for every request. */
    @SuppressWarnings("unused")
    private static void postEventFromNative(
            Object reference, int event, int argument1, int argument2) {
        Object source = reference instanceof Reference ? ((Reference<?>) reference).get() : null;
        if (source instanceof Fingerprint) {
            ((Fingerprint) source).onEvent(event);
        }
    }

    private void onEvent(int event) {
        String text = event == SUCCEEDED ? native_getFingerprint() : null;
        CompletableFuture<QueryDocument> request;
        synchronized (lock) {
            request = underWay;
        }
        if (!end(request)) {
            return; // no request: a thread may wake up without reason, and repeats its last job
        }
        eventThread = Thread.currentThread();
        try {
            if (text == null) {
                tell(request, null, "No fingerprint can be made of this audio; 14.22 seconds are "
                        + "needed after leading silence");
            } else {
                tellDocument(request, text);
            }
        } finally {
            eventThread = null;
        }
    }

    private void tellDocument(CompletableFuture<QueryDocument> request, String text) {
        QueryDocument document;
        try {
            document = QueryDocument.parse(text);
        } catch (IllegalArgumentException unreadable) {
            tell(request, null, unreadable.getMessage());
            return;
        }
        tell(request, document, null);
    }

    private void tell(
            CompletableFuture<QueryDocument> request, QueryDocument document, String otherwise) {
        FingerprintException failure = document == null ? new FingerprintException(otherwise) : null;
        DELIVERY.execute(() -> {
            if (failure == null) {
                request.complete(document);
            } else {
                request.completeExceptionally(failure);
            }
        });
        Listener told;
        Executor executor;
        synchronized (lock) {
            told = listener;
            executor = listenerExecutor;
        }
        if (told != null) {
            executor.execute(() -> {
                if (failure == null) {
                    told.onFingerprint(this, document);
                } else {
                    told.onFailure(this, failure);
                }
            });
        }
    }

    // The native side binds these by name and signature.

    private native int native_setup(Object weakThis);

    private native void native_finalize();

    private native int native_generate(int sampleRate, int channels, int formatCode,
            int bitsPerSample, byte[] audio, int length);

    private native String native_getFingerprint();

    private native void native_release();
}
