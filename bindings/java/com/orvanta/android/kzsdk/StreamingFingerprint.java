package com.orvanta.android.kzsdk;

import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.util.Objects;
import java.util.concurrent.CompletableFuture;

/**
 * Makes one fingerprint of sound that comes in pieces, as from a microphone or a decoder.
 *
 * <pre>{@code
 * try (StreamingFingerprint stream = new StreamingFingerprint(SoundFormat.float32(48000, 1))) {
 *     int count;
 *     while ((count = read(samples)) > 0 && !stream.feed(samples, 0, count)) {
 *         show(stream.progress().percent());
 *     }
 *     if (stream.finish()) { // false when the sound ended too early: see progress()
 *         send(stream.document().text());
 *     }
 * }
 * }</pre>
 *
 * <p>Pieces may have any length, and may end in the middle of a frame: the same sound gives the
 * same document. A fingerprint is complete after 14.22 seconds of sound that follow leading
 * silence.
 *
 * <p>Threads: an object may be used from any thread; calls take turns. {@link #close} may be called
 * at any time, while others feed too: a call that is under way is finished, later ones throw.
 */
public final class StreamingFingerprint implements AutoCloseable {
    /** How samples become a fingerprint. */
    public enum Algorithm {
        /** In integers: the same on every processor. What {@link Fingerprint} uses. */
        FIXED(1),
        /** In floating point: at any sample rate. */
        FLOAT(2);

        final int code;

        Algorithm(int code) {
            this.code = code;
        }
    }

    private static final int PIECE = 1 << 16;

    private final SoundFormat format;
    private final NativeHandle handle;
    private final CompletableFuture<QueryDocument> completion = new CompletableFuture<>();
    /** What arrays are copied to, piece by piece. */
    private ByteBuffer pieces;
    /** Null until the fingerprint is complete. */
    private volatile QueryDocument document;

    /**
     * Begins with the fixed-point algorithm.
     *
     * @param format what is going to be fed
     * @throws IllegalArgumentException when the algorithm does not take the format
     */
    public StreamingFingerprint(SoundFormat format) {
        this(format, Algorithm.FIXED);
    }

    /**
     * Begins with an algorithm.
     *
     * @param format what is going to be fed
     * @param algorithm how it becomes a fingerprint
     * @throws IllegalArgumentException when the algorithm does not take the format
     * @throws OutOfMemoryError when memory is short
     * @throws UnsatisfiedLinkError when the native library is not found
     */
    public StreamingFingerprint(SoundFormat format, Algorithm algorithm) {
        this.format = Objects.requireNonNull(format, "format");
        Objects.requireNonNull(algorithm, "algorithm");
        NativeLibrary.loadSdk();
        long[] out = new long[1];
        Statuses.check(NativeStream.create(algorithm.code, format.code(), format.sampleRate(),
                format.channels(), out));
        handle = new NativeHandle("stream", out[0], NativeStream::free);
    }

    /**
     * Feeds bytes.
     *
     * @param bytes the array
     * @param offset of the first byte
     * @param count how many; 0 and below feed nothing, so that what a recorder returns can be
     *     passed on. At the end of the sound leave the loop and call {@link #finish}
     * @return whether the fingerprint is complete; what is fed after that is ignored
     * @throws IndexOutOfBoundsException when the array has fewer bytes
     * @throws IllegalStateException when the object is closed, or {@link #finish} was called
     */
    public boolean feed(byte[] bytes, int offset, int count) {
        checkRange(bytes.length, offset, count);
        return feedPieces(count, 1, (buffer, done, size) -> buffer.put(bytes, offset + done, size));
    }

    /**
     * Feeds 16-bit samples to a stream of {@link SoundFormat#pcm16}.
     *
     * @param samples interleaved channels
     * @param offset of the first sample
     * @param count how many samples, of all channels together
     * @return whether the fingerprint is complete
     * @throws IllegalArgumentException when the stream has another format
     */
    public boolean feed(short[] samples, int offset, int count) {
        require(SoundFormat.Encoding.PCM16);
        checkRange(samples.length, offset, count);
        return feedPieces(count, 2,
                (buffer, done, size) -> buffer.asShortBuffer().put(samples, offset + done, size));
    }

    /**
     * Feeds floating-point samples to a stream of {@link SoundFormat#float32}.
     *
     * @param samples interleaved channels, full scale being 1
     * @param offset of the first sample
     * @param count how many samples, of all channels together
     * @return whether the fingerprint is complete
     * @throws IllegalArgumentException when the stream has another format
     */
    public boolean feed(float[] samples, int offset, int count) {
        require(SoundFormat.Encoding.FLOAT32);
        checkRange(samples.length, offset, count);
        return feedPieces(count, 4,
                (buffer, done, size) -> buffer.asFloatBuffer().put(samples, offset + done, size));
    }

    /**
     * Feeds the bytes between a buffer's position and its limit; those of a direct buffer are not
     * copied. The position moves to the limit.
     *
     * @param bytes the buffer
     * @return whether the fingerprint is complete
     */
    public boolean feed(ByteBuffer bytes) {
        int count = bytes.remaining();
        boolean complete;
        if (bytes.isDirect()) {
            complete = feedDirect(bytes, bytes.position(), count);
        } else {
            ByteBuffer rest = bytes.slice();
            complete = feedPieces(count, 1, (buffer, done, size) -> {
                rest.limit(done + size);
                buffer.put(rest);
            });
        }
        bytes.position(bytes.position() + count);
        return complete;
    }

    private void require(SoundFormat.Encoding encoding) {
        if (format.encoding() != encoding) {
            throw new IllegalArgumentException("This stream takes " + format + ", not " + encoding
                    + ": create it with that format, or feed bytes");
        }
    }

    private static void checkRange(int length, int offset, int count) {
        if (offset < 0 || offset > length || count > length - offset) {
            throw new IndexOutOfBoundsException(
                    count + " from " + offset + " on, in an array of " + length);
        }
    }

    /** Puts a part of what is fed at the start of an empty buffer. */
    private interface Copying {
        void copy(ByteBuffer buffer, int done, int count);
    }

    private boolean feedPieces(int count, int size, Copying copying) {
        boolean complete;
        synchronized (this) {
            if (pieces == null) {
                pieces = ByteBuffer.allocateDirect(PIECE).order(ByteOrder.nativeOrder());
            }
            int done = 0;
            do { // also once without any samples, to report the state
                int some = Math.max(0, Math.min(count - done, PIECE / size));
                pieces.clear();
                copying.copy(pieces, done, some);
                complete = feedNative(pieces, 0, some * size);
                done += some;
            } while (done < count && !complete);
        }
        settle();
        return complete;
    }

    private boolean feedDirect(ByteBuffer bytes, int position, int count) {
        boolean complete = feedNative(bytes, position, count);
        settle();
        return complete;
    }

    synchronized boolean feedNative(ByteBuffer bytes, int position, int count) {
        long stream = handle.enter();
        try {
            long[] out = new long[2];
            Statuses.check(NativeStream.feed(stream, bytes, position, count, out));
            return keepDocument(stream, out[1] != 0);
        } finally {
            handle.leave();
        }
    }

    private boolean keepDocument(long stream, boolean complete) {
        if (complete && document == null) {
            document = documentOf(stream);
        }
        return complete;
    }

    private static QueryDocument documentOf(long stream) {
        long[] out = new long[1];
        String text = NativeStream.document(stream, out);
        Statuses.check((int) out[0]);
        return QueryDocument.parse(text);
    }

    /** Completes the future, which runs what waits for it: not while other calls wait for this. */
    private void settle() {
        QueryDocument made = document;
        if (made != null) {
            completion.complete(made);
        }
    }

    /**
     * Ends the sound: what is kept is analysed. May be repeated.
     *
     * @return whether the fingerprint is complete; if not, {@link #progress} says what it lacks,
     *     and {@link #completion} fails with the same reason
     * @throws IllegalStateException when the object is closed
     */
    public boolean finish() {
        boolean complete = finishNative();
        settle();
        if (!complete) {
            completion.completeExceptionally(new FingerprintException(lack(progress())));
        }
        return complete;
    }

    private synchronized boolean finishNative() {
        long stream = handle.enter();
        try {
            long[] out = new long[1];
            Statuses.check(NativeStream.finish(stream, out));
            return keepDocument(stream, out[0] != 0);
        } finally {
            handle.leave();
        }
    }

    private static String lack(StreamProgress progress) {
        switch (progress.phase()) {
            case NOTHING_FED:
                return "No sound was fed";
            case SILENT:
                return "All " + progress.silenceMillis() / 1000.0 + " s of the sound are silence";
            default:
                return "The sound is too short: " + progress.missingMillis() / 1000.0
                        + " s are missing";
        }
    }

    /**
     * Returns how far the stream is.
     *
     * @return a copy of the numbers
     * @throws IllegalStateException when the object is closed
     */
    public synchronized StreamProgress progress() {
        long stream = handle.enter();
        try {
            long[] out = new long[8];
            Statuses.check(NativeStream.state(stream, out));
            return new StreamProgress(out);
        } finally {
            handle.leave();
        }
    }

    /**
     * Returns the fingerprint.
     *
     * @return the document
     * @throws IllegalStateException when it is not complete, or the object is closed
     */
    public synchronized QueryDocument document() {
        long stream = handle.enter();
        try {
            return documentOf(stream);
        } finally {
            handle.leave();
        }
    }

    /**
     * Returns a future of the fingerprint.
     *
     * @return completed by the call that feeds the last sound needed, on its thread; with a {@link
     *     FingerprintException} by a {@link #finish} or {@link #close} before that
     */
    public CompletableFuture<QueryDocument> completion() {
        return completion;
    }

    /** Frees the stream, when no call uses it any more. Closing twice does nothing. */
    @Override
    public void close() {
        handle.close();
        settle(); // the call that completed the fingerprint may not have come to it yet
        completion.completeExceptionally(
                new FingerprintException("The stream was closed before the fingerprint was complete"));
    }

    /** Frees the stream of an object that was not closed. */
    @Override
    protected void finalize() throws Throwable {
        try {
            if (handle != null) { // null where the constructor threw
                handle.close();
            }
        } finally {
            super.finalize();
        }
    }
}
