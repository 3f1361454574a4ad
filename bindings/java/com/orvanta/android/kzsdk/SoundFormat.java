package com.orvanta.android.kzsdk;

import java.util.Arrays;

/**
 * How interleaved samples lie in bytes: their encoding, sample rate and number of channels, for
 * {@link StreamingFingerprint} and {@link Catalogue}. Immutable.
 *
 * <p>Samples of several bytes are in the processor's byte order, which is {@code
 * ByteOrder.nativeOrder()}. Any number of channels goes. A catalogue and the floating-point
 * algorithm take any rate; the fixed-point algorithm takes 8000, 11025, 16000, 22050, 24000, 32000,
 * 44100 and 48000 Hz and two, four, eight and sixteen times these.
 */
public final class SoundFormat {
    /** The encodings, by the library's numbers. */
    enum Encoding {
        PCM16(2, 2),
        A_LAW(3, 1),
        MU_LAW(4, 1),
        PCM24(5, 3),
        PCM32(6, 4),
        FLOAT32(7, 4),
        FLOAT64(8, 8),
        UNSIGNED8(9, 1);

        final int code;
        final int bytes;

        Encoding(int code, int bytes) {
            this.code = code;
            this.bytes = bytes;
        }
    }

    private static final int MAX_CHANNELS = 65535;
    private static final int MAX_RATE = 4000000;

    private final Encoding encoding;
    private final int sampleRate;
    private final int channels;

    private SoundFormat(Encoding encoding, int sampleRate, int channels) {
        if (sampleRate < 1 || sampleRate > MAX_RATE) {
            throw new IllegalArgumentException(
                    "A sample rate is 1 to " + MAX_RATE + " Hz, not " + sampleRate);
        }
        if (channels < 1 || channels > MAX_CHANNELS) {
            throw new IllegalArgumentException(
                    "There are 1 to " + MAX_CHANNELS + " channels, not " + channels);
        }
        this.encoding = encoding;
        this.sampleRate = sampleRate;
        this.channels = channels;
    }

    static SoundFormat of(Encoding encoding, int sampleRate, int channels) {
        return new SoundFormat(encoding, sampleRate, channels);
    }

    /**
     * Describes signed 16-bit samples.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @return the format
     * @throws IllegalArgumentException for numbers out of range; so do the other methods
     */
    public static SoundFormat pcm16(int sampleRate, int channels) {
        return new SoundFormat(Encoding.PCM16, sampleRate, channels);
    }

    /**
     * Describes signed 24-bit samples in three bytes.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @return the format
     */
    public static SoundFormat pcm24(int sampleRate, int channels) {
        return new SoundFormat(Encoding.PCM24, sampleRate, channels);
    }

    /**
     * Describes signed 32-bit samples.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @return the format
     */
    public static SoundFormat pcm32(int sampleRate, int channels) {
        return new SoundFormat(Encoding.PCM32, sampleRate, channels);
    }

    /**
     * Describes floating-point samples of single precision, full scale being 1.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @return the format
     */
    public static SoundFormat float32(int sampleRate, int channels) {
        return new SoundFormat(Encoding.FLOAT32, sampleRate, channels);
    }

    /**
     * Describes floating-point samples of double precision, full scale being 1.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @return the format
     */
    public static SoundFormat float64(int sampleRate, int channels) {
        return new SoundFormat(Encoding.FLOAT64, sampleRate, channels);
    }

    /**
     * Describes unsigned 8-bit samples with silence at 128, as WAVE files have them.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @return the format
     */
    public static SoundFormat unsigned8(int sampleRate, int channels) {
        return new SoundFormat(Encoding.UNSIGNED8, sampleRate, channels);
    }

    /**
     * Describes G.711 A-law.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @return the format
     */
    public static SoundFormat aLaw(int sampleRate, int channels) {
        return new SoundFormat(Encoding.A_LAW, sampleRate, channels);
    }

    /**
     * Describes G.711 mu-law.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @return the format
     */
    public static SoundFormat muLaw(int sampleRate, int channels) {
        return new SoundFormat(Encoding.MU_LAW, sampleRate, channels);
    }

    Encoding encoding() {
        return encoding;
    }

    /** The library's number for the encoding. */
    int code() {
        return encoding.code;
    }

    /**
     * Returns the sample rate.
     *
     * @return frames in a second
     */
    public int sampleRate() {
        return sampleRate;
    }

    /**
     * Returns the number of channels.
     *
     * @return how many are interleaved
     */
    public int channels() {
        return channels;
    }

    /**
     * Returns the size of a frame, which is one sample of every channel.
     *
     * @return bytes
     */
    public int frameSize() {
        return channels * encoding.bytes;
    }

    @Override
    public boolean equals(Object other) {
        if (!(other instanceof SoundFormat)) {
            return false;
        }
        SoundFormat that = (SoundFormat) other;
        return encoding == that.encoding && sampleRate == that.sampleRate
                && channels == that.channels;
    }

    @Override
    public int hashCode() {
        return Arrays.hashCode(new int[] {encoding.code, sampleRate, channels});
    }

    /** Returns encoding, rate and channels on one line. */
    @Override
    public String toString() {
        return encoding + ", " + sampleRate + " Hz, "
                + (channels == 1 ? "mono" : channels == 2 ? "stereo" : channels + " channels");
    }
}
