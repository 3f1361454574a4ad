package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertFalse;
import static org.junit.Assert.assertSame;
import static org.junit.Assert.assertThrows;
import static org.junit.Assert.assertTrue;

import java.io.ByteArrayInputStream;
import java.io.InputStream;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.util.ArrayList;
import java.util.List;
import java.util.concurrent.ExecutionException;
import java.util.concurrent.atomic.AtomicReference;
import org.junit.Test;

/** Fingerprints of sound in pieces. */
public class StreamingFingerprintTest {
    private static final SoundFormat MONO = SoundFormat.pcm16(11025, 1);
    private static final byte[] MUSIC = Audio.music(15);

    private static short[] samples() {
        short[] samples = new short[MUSIC.length / 2];
        ByteBuffer.wrap(MUSIC).order(ByteOrder.LITTLE_ENDIAN).asShortBuffer().get(samples);
        return samples;
    }

    private static QueryDocument expected() throws Exception {
        try (Fingerprint whole = new Fingerprint()) {
            return whole.generate(AudioDescription.pcm16(11025, 1), MUSIC).get();
        }
    }

    @Test
    public void piecesOfAnyLengthGiveTheDocumentOfTheWhole() throws Exception {
        QueryDocument expected = expected();
        for (int size : new int[] {1001, 65536, 100000, MUSIC.length}) {
            try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
                boolean complete = false;
                for (int done = 0; done < MUSIC.length && !complete; done += size) {
                    complete = stream.feed(MUSIC, done, Math.min(size, MUSIC.length - done));
                }
                assertTrue(complete);
                assertEquals(expected, stream.document());
            }
        }
    }

    @Test
    public void shortsFloatsAndBuffersGiveTheSameDocument() throws Exception {
        QueryDocument expected = expected();
        short[] samples = samples();
        try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
            assertTrue(stream.feed(samples, 0, samples.length));
            assertEquals(expected, stream.document());
        }
        float[] floats = Tunes.floats(samples);
        try (StreamingFingerprint stream =
                new StreamingFingerprint(SoundFormat.float32(11025, 1))) {
            assertTrue(stream.feed(floats, 0, floats.length));
            assertEquals(expected, stream.document());
        }
        ByteBuffer direct = ByteBuffer.allocateDirect(MUSIC.length + 3);
        for (ByteBuffer buffer : new ByteBuffer[] {direct, ByteBuffer.allocate(MUSIC.length + 3)}) {
            buffer.position(3);
            buffer.put(MUSIC);
            buffer.position(3);
            try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
                assertTrue(stream.feed(buffer));
                assertFalse(buffer.hasRemaining());
                assertEquals(expected, stream.document());
            }
        }
    }

    @Test
    public void progressGrowsUntilTheFingerprintIsComplete() {
        try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
            assertEquals(StreamProgress.Phase.NOTHING_FED, stream.progress().phase());
            int percent = 0;
            int missing = Integer.MAX_VALUE;
            boolean complete = false;
            for (int done = 0; !complete; done += 22050) {
                assertEquals(done / 2, stream.progress().frames());
                complete = stream.feed(MUSIC, done, Math.min(22050, MUSIC.length - done));
                StreamProgress progress = stream.progress();
                assertTrue(progress.percent() >= percent);
                assertTrue(progress.missingMillis() < missing);
                percent = progress.percent();
                missing = progress.missingMillis();
            }
            assertEquals(100, percent);
            assertEquals(0, missing);
            assertEquals(StreamProgress.Phase.COMPLETE, stream.progress().phase());
            assertTrue("more sound is ignored", stream.feed(MUSIC, 0, MUSIC.length));
        }
    }

    @Test
    public void completionComesWithTheLastSoundNeeded() throws Exception {
        try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
            AtomicReference<QueryDocument> seen = new AtomicReference<>();
            stream.completion().thenAccept(seen::set);
            stream.feed(MUSIC, 0, MUSIC.length / 2);
            assertFalse(stream.completion().isDone());
            stream.feed(MUSIC, MUSIC.length / 2, MUSIC.length / 2);
            assertSame(seen.get(), stream.completion().get());
            assertEquals(stream.document(), seen.get());
        }
    }

    private static String failure(StreamingFingerprint stream) throws InterruptedException {
        ExecutionException failed =
                assertThrows(ExecutionException.class, () -> stream.completion().get());
        assertEquals(FingerprintException.class, failed.getCause().getClass());
        return failed.getCause().getMessage();
    }

    @Test
    public void completionFailsWithWhatIsMissing() throws Exception {
        try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
            stream.feed(MUSIC, 0, 2 * 11025 * 5);
            assertFalse(stream.finish());
            assertTrue(failure(stream), failure(stream).startsWith("The sound is too short: "));
            assertThrows(IllegalStateException.class, stream::document);
            assertThrows(IllegalStateException.class, () -> stream.feed(MUSIC, 0, 2));
        }
        try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
            stream.feed(new byte[2 * 11025 * 5], 0, 2 * 11025 * 5);
            assertFalse(stream.finish());
            assertTrue(failure(stream), failure(stream).contains("silence"));
        }
        StreamingFingerprint closed = new StreamingFingerprint(MONO);
        closed.close();
        assertTrue(failure(closed), failure(closed).contains("closed"));
    }

    @Test
    public void closingDoesNotFailACompleteFingerprint() throws Exception {
        ByteBuffer direct = ByteBuffer.allocateDirect(MUSIC.length);
        direct.put(MUSIC);
        StreamingFingerprint stream = new StreamingFingerprint(MONO);
        // As far as a call has come when another thread closes the stream before the call returns.
        assertTrue(stream.feedNative(direct, 0, MUSIC.length));
        stream.close();
        assertEquals(expected(), stream.completion().get());
    }

    @Test
    public void aLoopOverAStreamEndsWithTheSound() throws Exception {
        for (int seconds : new int[] {0, 5, 15}) {
            InputStream in = new ByteArrayInputStream(MUSIC, 0, 2 * 11025 * seconds);
            byte[] piece = new byte[4000];
            try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
                int count;
                while ((count = in.read(piece)) > 0 && !stream.feed(piece, 0, count)) {
                    assertTrue(stream.progress().percent() < 100);
                }
                assertEquals(seconds == 15, stream.finish());
                assertEquals(seconds == 15, !stream.completion().isCompletedExceptionally());
            }
        }
    }

    @Test
    public void whatCannotBeFedIsRefused() {
        try (StreamingFingerprint stream = new StreamingFingerprint(MONO)) {
            assertThrows(IndexOutOfBoundsException.class, () -> stream.feed(MUSIC, -1, 1));
            assertThrows(IndexOutOfBoundsException.class,
                    () -> stream.feed(MUSIC, MUSIC.length, 1));
            assertThrows(IndexOutOfBoundsException.class,
                    () -> stream.feed(MUSIC, 1, Integer.MAX_VALUE));
            IllegalArgumentException other = assertThrows(IllegalArgumentException.class,
                    () -> stream.feed(new float[1], 0, 1));
            assertTrue(other.getMessage(), other.getMessage().contains("PCM16"));
            assertFalse("the end of a stream", stream.feed(MUSIC, 0, -1));
        }
    }

    @Test
    public void whatTheAlgorithmDoesNotTakeIsRefused() {
        IllegalArgumentException refused = assertThrows(IllegalArgumentException.class,
                () -> new StreamingFingerprint(SoundFormat.pcm16(12345, 1)));
        assertTrue(refused.getMessage(), refused.getMessage().contains("rate"));
        new StreamingFingerprint(
                SoundFormat.pcm16(12345, 1), StreamingFingerprint.Algorithm.FLOAT).close();
        assertThrows(IllegalArgumentException.class, () -> SoundFormat.pcm16(0, 1));
        assertThrows(IllegalArgumentException.class, () -> SoundFormat.pcm16(44100, 0));
    }

    @Test
    public void aClosedStreamSaysSo() {
        StreamingFingerprint stream = new StreamingFingerprint(MONO);
        stream.close();
        stream.close();
        IllegalStateException closed =
                assertThrows(IllegalStateException.class, () -> stream.feed(MUSIC, 0, 2));
        assertEquals("This stream is closed", closed.getMessage());
        assertThrows(IllegalStateException.class, stream::progress);
        assertThrows(IllegalStateException.class, stream::finish);
    }

    @Test
    public void streamsAreClosedWhileOthersFeedThem() throws Exception {
        AtomicReference<Throwable> failure = new AtomicReference<>();
        for (int turn = 0; turn < 20; ++turn) {
            StreamingFingerprint stream = new StreamingFingerprint(MONO);
            List<Thread> feeders = new ArrayList<>();
            for (int i = 0; i < 3; ++i) {
                Thread feeder = new Thread(() -> {
                    try {
                        for (;;) {
                            stream.feed(MUSIC, 0, MUSIC.length);
                            stream.progress();
                        }
                    } catch (IllegalStateException closed) {
                        // as it should be
                    } catch (Throwable other) {
                        failure.set(other);
                    }
                });
                feeders.add(feeder);
                feeder.start();
            }
            Thread.sleep(turn);
            stream.close();
            for (Thread feeder : feeders) {
                feeder.join();
            }
        }
        assertEquals(null, failure.get());
    }
}
