package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertArrayEquals;
import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertThrows;
import static org.junit.Assert.assertTrue;

import java.io.ByteArrayInputStream;
import java.io.ByteArrayOutputStream;
import java.io.File;
import java.io.IOException;
import java.io.InputStream;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.Arrays;
import java.util.Collections;
import javax.sound.sampled.AudioFileFormat;
import javax.sound.sampled.AudioFormat;
import javax.sound.sampled.AudioInputStream;
import javax.sound.sampled.AudioSystem;
import org.junit.Rule;
import org.junit.Test;
import org.junit.rules.TemporaryFolder;

/** Files that are no sound although a program passes them, and decoders that give odd pieces. */
public class SoundOfFilesTest {
    @Rule public final TemporaryFolder folder = new TemporaryFolder();

    private static String refusal(File file) {
        return assertThrows(IOException.class, () -> Sound.file(file)).getMessage();
    }

    /** Opening and closing one of them would give up the locks on it. */
    @Test
    public void filesOfAnOpenCatalogueAreNotOpenedAsSound() throws Exception {
        File file = new File(folder.getRoot(), "music.kzc");
        File link = new File(folder.getRoot(), "other name");
        Catalogue music = Catalogue.create(file.getPath());
        music.add(Tunes.sound(1, 0, 10), "tune", Collections.emptyMap());
        Files.createSymbolicLink(link.toPath(), file.toPath());
        String[] names = {"music.kzc", "music.kzc-wal", "music.kzc-shm", "other name"};
        try (Catalogue second = Catalogue.inMemory(); Catalogue reading = Catalogue.open(file.getPath())) {
            for (String name : names) {
                File part = new File(folder.getRoot(), name);
                assertTrue(name, part.exists());
                assertTrue(refusal(part), refusal(part).contains("which is open"));
                assertThrows(IOException.class, () -> music.add(part));
                assertThrows(IOException.class, () -> second.add(part));
            }
            music.close();
            assertTrue("one of two is closed", refusal(file).contains("which is open"));
            assertEquals(1, reading.size());
        }
        assertTrue(refusal(file), refusal(file).contains("in no format that this Java reads"));
    }

    @Test
    public void aFileThatIsNoCatalogueStaysSound() throws Exception {
        File file = folder.newFile("clip.wav");
        byte[] bytes = bytesOf(Tunes.play(1, 0, 1), ByteOrder.LITTLE_ENDIAN);
        AudioFormat format = new AudioFormat(Tunes.RATE, 16, 1, true, false);
        AudioSystem.write(new AudioInputStream(new ByteArrayInputStream(bytes), format, bytes.length / 2),
                AudioFileFormat.Type.WAVE, file);
        assertThrows(CatalogueException.class, () -> Catalogue.open(file.getPath()));
        assertEquals(SoundFormat.pcm16(Tunes.RATE, 1), Sound.file(file).format());
    }

    @Test
    public void aCatalogueOfARelativePathIsRefusedToo() throws Exception {
        File file = new File(folder.getRoot().getCanonicalFile(), "music.kzc");
        Path relative = new File("").getCanonicalFile().toPath().relativize(file.toPath());
        try (Catalogue music = Catalogue.create(relative.toString())) {
            assertTrue(refusal(file), refusal(file).contains("which is open"));
            assertEquals(0, music.size());
        }
    }

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
