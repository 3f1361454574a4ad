package com.orvanta.android.kzsdk;

import java.util.Random;

/** Tunes that differ, and whose clips have one place each. */
final class Tunes {
    static final int RATE = 11025;

    private static final int[] HERTZ =
            {262, 330, 392, 523, 440, 349, 294, 392, 330, 247, 494, 587};

    private Tunes() {}

    /** One note every fifth of a second, drawn by the tune's number. */
    static short[] play(int tune, double from, double seconds) {
        Random random = new Random(tune);
        int[] notes = new int[1000];
        for (int i = 0; i < notes.length; ++i) {
            notes[i] = HERTZ[random.nextInt(HERTZ.length)];
        }
        short[] samples = new short[(int) (seconds * RATE)];
        int first = (int) (from * RATE);
        int length = RATE / 5;
        for (int i = 0; i < samples.length; ++i) {
            int at = first + i;
            double saw = at * (double) notes[at / length] / RATE % 1 - 0.5;
            samples[i] = (short) (saw * 16000 * (length - at % length) / length);
        }
        return samples;
    }

    static Sound sound(int tune, double from, double seconds) {
        return Sound.of(RATE, 1, play(tune, from, seconds));
    }

    static float[] floats(short[] samples) {
        float[] floats = new float[samples.length];
        for (int i = 0; i < samples.length; ++i) {
            floats[i] = samples[i] / 32768f;
        }
        return floats;
    }
}
