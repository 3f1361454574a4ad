package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertNotEquals;
import static org.junit.Assert.assertSame;
import static org.junit.Assert.assertThrows;
import static org.junit.Assert.assertTrue;

import java.io.File;
import java.io.IOException;
import java.lang.ref.WeakReference;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.util.ArrayList;
import java.util.List;
import java.util.concurrent.BlockingQueue;
import java.util.concurrent.CompletableFuture;
import java.util.concurrent.ExecutionException;
import java.util.concurrent.LinkedBlockingQueue;
import java.util.concurrent.TimeUnit;
import org.junit.Test;

/** The class that an app uses, over the library itself. */
public class FingerprintTest {
    private static final AudioDescription MONO = AudioDescription.pcm16(11025, 1);
    private static final byte[] MUSIC = Audio.music(15);

    /** Queues what it receives, and from whom. */
    private static class Told implements Fingerprint.Listener {
        final BlockingQueue<Object> queue = new LinkedBlockingQueue<>();
        volatile Thread thread;
        volatile Fingerprint source;

        @Override
        public void onFingerprint(Fingerprint source, QueryDocument document) {
            this.thread = Thread.currentThread();
            this.source = source;
            queue.add(document);
        }

        @Override
        public void onFailure(Fingerprint source, FingerprintException reason) {
            this.thread = Thread.currentThread();
            this.source = source;
            queue.add(reason);
        }

        Object next() throws InterruptedException {
            Object told = queue.poll(300, TimeUnit.SECONDS);
            if (told == null) {
                throw new AssertionError("nothing was told");
            }
            return told;
        }
    }

    private static QueryDocument get(CompletableFuture<QueryDocument> future) throws Exception {
        return future.get(300, TimeUnit.SECONDS);
    }

    /** Native threads of that name, of which the system shows 15 characters. */
    private static int workers() throws Exception {
        int count = 0;
        for (File thread : new File("/proc/self/task").listFiles()) {
            try {
                byte[] name = Files.readAllBytes(new File(thread, "comm").toPath());
                if (new String(name, StandardCharsets.US_ASCII).trim().equals("FingerprintThre")) {
                    ++count;
                }
            } catch (IOException ended) {
                // between the listing and the reading
            }
        }
        return count;
    }

    private static void awaitWorkers(int count) throws Exception {
        for (int i = 0; i < 1000 && workers() != count; ++i) {
            System.gc();
            System.runFinalization();
            Thread.sleep(10);
        }
        assertEquals(count, workers());
    }

    @Test
    public void givesAFutureItsDocument() throws Exception {
        try (Fingerprint fingerprint = new Fingerprint()) {
            QueryDocument document = get(fingerprint.generate(MONO, MUSIC));
            assertEquals(30, document.values().length);
            assertEquals("Quenvar", document.algorithm());
            assertEquals(document, get(fingerprint.generate(MONO, MUSIC)));
        }
    }

    @Test
    public void looksAtSoManyBytesAsItIsTold() throws Exception {
        byte[] longer = java.util.Arrays.copyOf(MUSIC, MUSIC.length + 5000);
        try (Fingerprint fingerprint = new Fingerprint()) {
            assertEquals(get(fingerprint.generate(MONO, MUSIC)),
                    get(fingerprint.generate(MONO, longer, MUSIC.length)));
            ExecutionException thrown = assertThrows(ExecutionException.class,
                    () -> get(fingerprint.generate(MONO, MUSIC, MUSIC.length / 4 * 2)));
            assertTrue(thrown.getCause() instanceof FingerprintException);
            assertTrue(thrown.getMessage(), thrown.getMessage().contains("14.22 seconds"));
        }
    }

    @Test
    public void tellsAListenerOffTheFingerprintThread() throws Exception {
        try (Fingerprint fingerprint = new Fingerprint()) {
            Told told = new Told();
            fingerprint.setListener(told);
            QueryDocument document = get(fingerprint.generate(MONO, MUSIC));
            assertEquals(document, told.next());
            assertSame(fingerprint, told.source);
            assertNotEquals("FingerprintThread", told.thread.getName());
            assertTrue(told.thread.isDaemon());
            fingerprint.generate(MONO, MUSIC, 2);
            assertTrue(told.next() instanceof FingerprintException);
        }
    }

    @Test
    public void tellsAListenerThroughItsExecutor() throws Exception {
        BlockingQueue<Runnable> tasks = new LinkedBlockingQueue<>();
        try (Fingerprint fingerprint = new Fingerprint()) {
            Told told = new Told();
            fingerprint.setListener(told, tasks::add);
            get(fingerprint.generate(MONO, MUSIC));
            tasks.take().run();
            assertSame(Thread.currentThread(), told.thread);
        }
    }

    @Test
    public void tellsNobodyWithoutAListener() throws Exception {
        try (Fingerprint fingerprint = new Fingerprint()) {
            Told told = new Told();
            fingerprint.setListener(told);
            fingerprint.setListener(null);
            get(fingerprint.generate(MONO, MUSIC));
            assertTrue(told.queue.isEmpty());
            assertThrows(NullPointerException.class, () -> fingerprint.setListener(told, null));
        }
    }

    @Test
    public void goesOnAfterAListenerThatThrows() throws Exception {
        try (Fingerprint fingerprint = new Fingerprint()) {
            Told told = new Told() {
                @Override
                public void onFingerprint(Fingerprint source, QueryDocument document) {
                    super.onFingerprint(source, document);
                    throw new IllegalStateException(
                            "thrown by a listener; to be seen on standard error");
                }
            };
            fingerprint.setListener(told, Runnable::run);
            for (int i = 0; i < 3; ++i) {
                assertEquals(30, get(fingerprint.generate(MONO, MUSIC)).values().length);
                told.next();
            }
        }
    }

    @Test
    public void refusesARequestOnTheFingerprintThread() throws Exception {
        BlockingQueue<Throwable> thrown = new LinkedBlockingQueue<>();
        try (Fingerprint fingerprint = new Fingerprint()) {
            fingerprint.setListener(new Told() {
                @Override
                public void onFingerprint(Fingerprint source, QueryDocument document) {
                    try {
                        source.generate(MONO, MUSIC);
                    } catch (IllegalStateException expected) {
                        thrown.add(expected);
                    }
                }
            }, Runnable::run);
            get(fingerprint.generate(MONO, MUSIC));
            assertTrue(thrown.take().getMessage().contains("executor"));
        }
    }

    @Test
    public void canBeClosedOnTheFingerprintThread() throws Exception {
        Fingerprint fingerprint = new Fingerprint();
        Told told = new Told() {
            @Override
            public void onFingerprint(Fingerprint source, QueryDocument document) {
                source.close();
                super.onFingerprint(source, document);
            }
        };
        fingerprint.setListener(told, Runnable::run);
        get(fingerprint.generate(MONO, MUSIC));
        told.next();
        for (int i = 0; i < 500; ++i) {
            try {
                get(fingerprint.generate(MONO, MUSIC));
            } catch (IllegalStateException closed) {
                assertEquals("This object is closed", closed.getMessage());
                return;
            } catch (ExecutionException closedMeanwhile) {
                // the next one shows
            }
            Thread.sleep(10);
        }
        throw new AssertionError("not closed");
    }

    @Test
    public void namesBadArguments() {
        try (Fingerprint fingerprint = new Fingerprint()) {
            assertMessage("There is no audio: the length is 0",
                    () -> fingerprint.generate(MONO, new byte[0]));
            assertMessage("There is no audio: the length is -2",
                    () -> fingerprint.generate(MONO, MUSIC, -2));
            assertMessage("The length is 6, but the array has 4 bytes",
                    () -> fingerprint.generate(MONO, new byte[4], 6));
            assertMessage("A length of 6 is not a whole number of frames of 4 bytes",
                    () -> fingerprint.generate(AudioDescription.pcm16(44100, 2), new byte[8], 6));
            assertThrows(NullPointerException.class, () -> fingerprint.generate(null, MUSIC));
            assertThrows(NullPointerException.class, () -> fingerprint.generate(MONO, null));
        }
    }

    private static void assertMessage(String message, org.junit.function.ThrowingRunnable call) {
        assertEquals(message, assertThrows(IllegalArgumentException.class, call).getMessage());
    }

    @Test
    public void refusesARequestBeforeTheResultOfTheEarlierOne() throws Exception {
        try (Fingerprint fingerprint = new Fingerprint()) {
            int refused = 0;
            // A request may be answered before the next one is made.
            for (int tries = 0; refused == 0; ++tries) {
                assertTrue("never refused", tries < 5000);
                CompletableFuture<QueryDocument> first = fingerprint.generate(MONO, MUSIC);
                while (!first.isDone()) {
                    try {
                        get(fingerprint.generate(MONO, MUSIC));
                    } catch (IllegalStateException expected) {
                        ++refused;
                    }
                }
                get(first);
            }
        }
    }

    @Test
    public void refusesARequestWhenClosed() {
        Fingerprint fingerprint = new Fingerprint();
        fingerprint.close();
        fingerprint.close();
        assertThrows(IllegalStateException.class, () -> fingerprint.generate(MONO, MUSIC));
    }

    @Test
    public void answersEveryRequestThoughItIsClosedMeanwhile() throws Exception {
        for (int i = 0; i < 50; ++i) {
            Fingerprint fingerprint = new Fingerprint();
            CompletableFuture<QueryDocument> future = fingerprint.generate(MONO, MUSIC);
            if (i % 2 == 0) {
                Thread.sleep(i % 7);
            }
            fingerprint.close();
            try {
                assertEquals(30, get(future).values().length);
            } catch (ExecutionException thrown) {
                assertTrue(thrown.getMessage(),
                        thrown.getMessage().contains("closed before the work was begun"));
            }
        }
    }

    @Test
    public void answersARequestOfAnObjectThatNobodyHolds() throws Exception {
        for (int i = 0; i < 10; ++i) {
            CompletableFuture<QueryDocument> future = new Fingerprint().generate(MONO, MUSIC);
            System.gc();
            System.runFinalization();
            assertEquals(30, get(future).values().length);
        }
    }

    @Test
    public void stopsTheThreadsOfObjectsThatNobodyHasClosed() throws Exception {
        new Fingerprint().close();
        awaitWorkers(0);
        List<WeakReference<Fingerprint>> forgotten = new ArrayList<>();
        for (int i = 0; i < 20; ++i) {
            forgotten.add(new WeakReference<>(new Fingerprint()));
        }
        assertTrue(workers() > 0);
        awaitWorkers(0);
        for (WeakReference<Fingerprint> one : forgotten) {
            assertEquals(null, one.get());
        }
    }
}
