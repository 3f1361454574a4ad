package com.orvanta.android.kzsdk;

import java.util.Random;

/** Seeded test signals. */
final class Audio {
    private Audio() {}

    /** Notes of a scale with overtones, at 11025 Hz, one channel, 16 bits. */
    static byte[] music(double seconds) {
        int[] hertz = {262, 330, 392, 523, 440, 349, 294, 392, 330, 247, 494, 587};
        Random random = new Random(1);
        int count = (int) (seconds * 11025);
        byte[] bytes = new byte[2 * count];
        for (int i = 0; i < count; ++i) {
            int note = i / 2756;
            double saw = i * (double) hertz[(note * 5 + note / 7) % 12] / 11025 % 1 - 0.5;
            int sample = (int) (saw * 12000 + random.nextInt(200));
            bytes[2 * i] = (byte) sample;
            bytes[2 * i + 1] = (byte) (sample >> 8);
        }
        return bytes;
    }
}
