package com.orvanta.android.kzsdk;

import java.io.ByteArrayInputStream;
import java.io.File;
import java.io.IOException;
import java.io.InputStream;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.util.Objects;

/**
 * Sound that a {@link Catalogue} adds or looks up: samples in memory, or a file, which is read
 * piece by piece. Immutable, as long as the array or file is.
 */
public abstract class Sound {
    private final SoundFormat format;

    Sound(SoundFormat format) {
        this.format = Objects.requireNonNull(format, "format");
    }

    /**
     * Takes a sound file: WAV, AIFF or AU, and whatever else the system's {@code
     * javax.sound.sampled} reads. Not for Android, which has other decoders: pass their samples.
     *
     * @param file the file
     * @return the sound; the file is opened when it is used
     * @throws IOException when it cannot be read or has a format that cannot be used; the message
     *     says what would help
     */
    public static Sound file(File file) throws IOException {
        return new SoundFile(file);
    }

    /**
     * The same by name.
     *
     * @param file the file's path
     * @return the sound
     * @throws IOException when it cannot be read
     */
    public static Sound file(String file) throws IOException {
        return file(new File(file));
    }

    /**
     * Takes bytes.
     *
     * @param format what they mean
     * @param bytes not copied
     * @return the sound
     */
    public static Sound of(SoundFormat format, byte[] bytes) {
        Objects.requireNonNull(bytes, "bytes");
        return new Sound(format) {
            @Override
            InputStream open() {
                return new ByteArrayInputStream(bytes);
            }
        };
    }

    /**
     * Takes 16-bit samples.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @param samples not copied
     * @return the sound
     */
    public static Sound of(int sampleRate, int channels, short[] samples) {
        Objects.requireNonNull(samples, "samples");
        return new Sound(SoundFormat.pcm16(sampleRate, channels)) {
            @Override
            InputStream open() {
                return new Samples(samples.length, 2, (buffer, first, count) ->
                        buffer.asShortBuffer().put(samples, first, count));
            }
        };
    }

    /**
     * Takes floating-point samples.
     *
     * @param sampleRate frames in a second
     * @param channels how many are interleaved
     * @param samples full scale being 1; not copied
     * @return the sound
     */
    public static Sound of(int sampleRate, int channels, float[] samples) {
        Objects.requireNonNull(samples, "samples");
        return new Sound(SoundFormat.float32(sampleRate, channels)) {
            @Override
            InputStream open() {
                return new Samples(samples.length, 4, (buffer, first, count) ->
                        buffer.asFloatBuffer().put(samples, first, count));
            }
        };
    }

    /**
     * Returns what the samples are.
     *
     * @return the format
     */
    public final SoundFormat format() {
        return format;
    }

    /** The samples as bytes, from the first one on. */
    abstract InputStream open() throws IOException;

    /** Puts some samples at the start of a buffer. */
    private interface Copying {
        void copy(ByteBuffer buffer, int first, int count);
    }

    /** Samples of an array as bytes. */
    private static final class Samples extends InputStream {
        private final int length;
        private final int size;
        private final Copying copying;
        private int done;

        Samples(int length, int size, Copying copying) {
            this.length = length;
            this.size = size;
            this.copying = copying;
        }

        @Override
        public int read() {
            throw new UnsupportedOperationException("whole samples only");
        }

        @Override
        public int read(byte[] bytes, int offset, int most) {
            int count = Math.min(length - done, most / size);
            if (count == 0) {
                return -1;
            }
            ByteBuffer buffer = ByteBuffer.wrap(bytes, offset, count * size).slice();
            copying.copy(buffer.order(ByteOrder.nativeOrder()), done, count);
            done += count;
            return count * size;
        }
    }
}
