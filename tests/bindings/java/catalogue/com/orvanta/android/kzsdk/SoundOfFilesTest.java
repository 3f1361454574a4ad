package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertArrayEquals;
import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertThrows;
import static org.junit.Assert.assertTrue;

import java.io.ByteArrayInputStream;
import java.io.ByteArrayOutputStream;
import java.io.IOException;
import java.io.InputStream;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.util.Arrays;
import java.util.Collections;
import org.junit.Test;

/** Decoders that give odd pieces. */
public class SoundOfFilesTest {
    /** Sound whose decoder gives odd numbers of bytes, or none, in turn. */
    private static final class Dripping extends InputStream {
        private static final int[] COUNTS = {0, 1, 3, 0, 0, 4001, 2, 65536};

        private final InputStream in;
        private int turn;

        Dripping(byte[] bytes) {
            in = new ByteArrayInputStream(bytes);
        }

        @Override
        public int read() {
            throw new UnsupportedOperationException();
        }

        @Override
        public int read(byte[] bytes, int offset, int most) throws IOException {
            return in.read(bytes, offset, Math.min(most, COUNTS[turn++ % COUNTS.length]));
        }
    }

    private static byte[] bytesOf(short[] samples, ByteOrder order) {
        ByteBuffer bytes = ByteBuffer.allocate(2 * samples.length).order(order);
        bytes.asShortBuffer().put(samples);
        return bytes.array();
    }

    private static Sound decoded(InputStream in) {
        return new Sound(SoundFormat.pcm16(Tunes.RATE, 1)) {
            @Override
            InputStream open() {
                return in;
            }
        };
    }

    @Test
    public void aDecoderThatPausesIsReadToTheEnd() throws Exception {
        short[] samples = Tunes.play(1, 0, 20);
        ByteOrder other = ByteOrder.nativeOrder() == ByteOrder.BIG_ENDIAN ? ByteOrder.LITTLE_ENDIAN
                : ByteOrder.BIG_ENDIAN;
        InputStream plain = new Dripping(bytesOf(samples, ByteOrder.nativeOrder()));
        InputStream swapped = new SwappedSamples(new Dripping(bytesOf(samples, other)), 2);
        for (InputStream in : Arrays.asList(plain, swapped)) {
            try (Catalogue music = Catalogue.inMemory()) {
                music.add(decoded(in), "tune", Collections.emptyMap());
                assertEquals(20.0, music.track(1).seconds(), 0.01);
                assertTrue("the same recording",
                        !music.add(Tunes.sound(1, 0, 20), "again", Collections.emptyMap()).isNew());
            }
        }
    }

    @Test
    public void swappedSamplesKeepTheirRemainders() throws Exception {
        byte[] bytes = new byte[30002];
        byte[] expected = new byte[bytes.length];
        for (int i = 0; i < bytes.length; ++i) {
            bytes[i] = (byte) (i * 7 + i / 256);
        }
        for (int i = 0; i < bytes.length; ++i) {
            expected[i] = i < 30000 ? bytes[i / 3 * 3 + 2 - i % 3] : bytes[i];
        }
        ByteArrayOutputStream got = new ByteArrayOutputStream();
        try (InputStream in = new SwappedSamples(new Dripping(bytes), 3)) {
            byte[] piece = new byte[9000];
            for (int count; (count = in.read(piece, 0, piece.length)) >= 0;) {
                got.write(piece, 0, count);
            }
        }
        assertArrayEquals(expected, got.toByteArray());
    }

    @Test
    public void aDecoderThatGivesNothingForEverIsReported() {
        InputStream empty = new InputStream() {
            @Override
            public int read() {
                throw new UnsupportedOperationException();
            }

            @Override
            public int read(byte[] bytes, int offset, int most) {
                return 0;
            }
        };
        try (Catalogue music = Catalogue.inMemory()) {
            IOException stuck = assertThrows(IOException.class, () -> music.match(decoded(empty)));
            assertTrue(stuck.getMessage(), stuck.getMessage().contains("returned no bytes"));
        }
    }
}
