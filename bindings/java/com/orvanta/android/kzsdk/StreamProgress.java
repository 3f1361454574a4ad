package com.orvanta.android.kzsdk;

/** How far a {@link StreamingFingerprint} is. Immutable. */
public final class StreamProgress {
    /** Why a fingerprint is not complete. */
    public enum Phase {
        /** It is complete. */
        COMPLETE,
        /** No whole frame has come yet. */
        NOTHING_FED,
        /** All that was analysed is silence. */
        SILENT,
        /** More sound is needed. */
        TOO_SHORT,
        /** Memory was short, and the stream cannot go on. */
        FAILED
    }

    private final long[] numbers;

    StreamProgress(long[] numbers) {
        this.numbers = numbers;
    }

    /**
     * Returns what the fingerprint lacks.
     *
     * @return {@link Phase#COMPLETE} when it lacks nothing
     */
    public Phase phase() {
        return Phase.values()[(int) numbers[3]];
    }

    /**
     * Returns how much of the fingerprint is made.
     *
     * @return 0 to 100
     */
    public int percent() {
        return (int) numbers[4];
    }

    /**
     * Returns how much was taken.
     *
     * @return whole frames
     */
    public long frames() {
        return numbers[0];
    }

    /**
     * Returns the leading silence that was skipped.
     *
     * @return milliseconds
     */
    public long silenceMillis() {
        return numbers[1];
    }

    /**
     * Returns the sound that was taken after leading silence.
     *
     * @return milliseconds
     */
    public long soundMillis() {
        return numbers[2];
    }

    /**
     * Returns the sound that is missing.
     *
     * @return milliseconds; 0 when the fingerprint is complete
     */
    public int missingMillis() {
        return (int) numbers[5];
    }

    /**
     * Returns where the fingerprint starts.
     *
     * @return milliseconds from the start of the stream
     */
    public long startMillis() {
        return numbers[6];
    }

    /**
     * Returns how much sound the fingerprint describes.
     *
     * @return milliseconds
     */
    public long durationMillis() {
        return numbers[7];
    }

    @Override
    public String toString() {
        return phase() + ", " + percent() + " %, " + missingMillis() + " ms missing";
    }
}
