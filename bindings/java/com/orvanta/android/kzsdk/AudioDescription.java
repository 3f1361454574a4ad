package com.orvanta.android.kzsdk;

import java.util.Arrays;

/**
 * What bytes of audio mean: their encoding, sample rate and number of channels. Immutable.
 *
 * <p>Channels are interleaved. The sample rate is 8000, 11025, 16000, 22050, 24000, 32000, 44100 or
 * 48000 Hz; there are one or two channels.
 */
public final class AudioDescription {
    private static final int WAVE_PCM = 1;
    private static final int WAVE_A_LAW = 6;
    private static final int WAVE_MU_LAW = 7;
    private static final int[] SAMPLE_RATES = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};

    private final int sampleRate;
    private final int channels;
    private final int formatCode;
    private final int bitsPerSample;

    private AudioDescription(int sampleRate, int channels, int formatCode, int bitsPerSample) {
        if (Arrays.binarySearch(SAMPLE_RATES, sampleRate) < 0) {
            throw new IllegalArgumentException("A sample rate of " + sampleRate + " Hz is not one of "
                    + Arrays.toString(SAMPLE_RATES));
        }
        if (channels != 1 && channels != 2) {
            throw new IllegalArgumentException("There are 1 or 2 channels, not " + channels);
        }
        this.sampleRate = sampleRate;
        this.channels = channels;
        this.formatCode = formatCode;
        this.bitsPerSample = bitsPerSample;
    }

    /**
     * Describes signed 16-bit PCM in the processor's byte order: least significant byte first on
     * Android and on most desktops.
     *
     * @param sampleRate frames in a second
     * @param channels 1 or 2
     * @return the description
     * @throws IllegalArgumentException for a rate or a number of channels that is not supported
     */
    public static AudioDescription pcm16(int sampleRate, int channels) {
        return new AudioDescription(sampleRate, channels, WAVE_PCM, 16);
    }

    /**
     * Describes 8-bit PCM with silence at 128. The library folds the lower half of its range
     * upwards: the fingerprint differs from that of the same music in 16 bits. Widen the samples to
     * 16 bits unless the other side does the same.
     *
     * @param sampleRate frames in a second
     * @param channels 1 or 2
     * @return the description
     * @throws IllegalArgumentException for a rate or a number of channels that is not supported
     */
    public static AudioDescription pcm8(int sampleRate, int channels) {
        return new AudioDescription(sampleRate, channels, WAVE_PCM, 8);
    }

    /**
     * Describes G.711 A-law.
     *
     * @param sampleRate frames in a second
     * @param channels 1 or 2
     * @return the description
     * @throws IllegalArgumentException for a rate or a number of channels that is not supported
     */
    public static AudioDescription aLaw(int sampleRate, int channels) {
        return new AudioDescription(sampleRate, channels, WAVE_A_LAW, 8);
    }

    /**
     * Describes G.711 mu-law.
     *
     * @param sampleRate frames in a second
     * @param channels 1 or 2
     * @return the description
     * @throws IllegalArgumentException for a rate or a number of channels that is not supported
     */
    public static AudioDescription muLaw(int sampleRate, int channels) {
        return new AudioDescription(sampleRate, channels, WAVE_MU_LAW, 8);
    }

    /**
     * Describes audio by the fields of a WAVE file's header. Only what can be fingerprinted is
     * accepted; audio of 24 or 32 bits has to be narrowed to 16 first.
     *
     * @param formatCode 1 for PCM, 6 for A-law, 7 for mu-law
     * @param bitsPerSample 8 or 16 for PCM, 8 for A-law and mu-law
     * @param sampleRate frames in a second
     * @param channels 1 or 2
     * @return the description
     * @throws IllegalArgumentException for what is not supported
     */
    public static AudioDescription wave(
            int formatCode, int bitsPerSample, int sampleRate, int channels) {
        boolean supported = formatCode == WAVE_PCM && bitsPerSample == 16
                || (formatCode == WAVE_PCM || formatCode == WAVE_A_LAW || formatCode == WAVE_MU_LAW)
                        && bitsPerSample == 8;
        if (!supported) {
            throw new IllegalArgumentException("WAVE format " + formatCode + " with " + bitsPerSample
                    + " bits is none of 16-bit PCM, 8-bit PCM, A-law and mu-law");
        }
        return new AudioDescription(sampleRate, channels, formatCode, bitsPerSample);
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
     * @return 1 or 2
     */
    public int channels() {
        return channels;
    }

    /**
     * Returns the WAVE format code.
     *
     * @return 1 for PCM, 6 for A-law, 7 for mu-law
     */
    public int formatCode() {
        return formatCode;
    }

    /**
     * Returns the size of one sample.
     *
     * @return 8 or 16
     */
    public int bitsPerSample() {
        return bitsPerSample;
    }

    /**
     * Returns the size of a frame, which is one sample of every channel.
     *
     * @return bytes
     */
    public int frameSize() {
        return channels * bitsPerSample / 8;
    }

    @Override
    public boolean equals(Object other) {
        if (!(other instanceof AudioDescription)) {
            return false;
        }
        AudioDescription that = (AudioDescription) other;
        return sampleRate == that.sampleRate && channels == that.channels
                && formatCode == that.formatCode && bitsPerSample == that.bitsPerSample;
    }

    @Override
    public int hashCode() {
        return Arrays.hashCode(new int[] {sampleRate, channels, formatCode, bitsPerSample});
    }

    @Override
    public String toString() {
        String encoding = formatCode == WAVE_A_LAW ? "A-law"
                : formatCode == WAVE_MU_LAW ? "mu-law" : bitsPerSample + "-bit PCM";
        return encoding + ", " + sampleRate + " Hz, " + (channels == 1 ? "mono" : "stereo");
    }
}
