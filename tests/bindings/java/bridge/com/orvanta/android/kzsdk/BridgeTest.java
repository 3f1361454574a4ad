package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertArrayEquals;
import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertFalse;
import static org.junit.Assert.assertNotEquals;
import static org.junit.Assert.assertNull;
import static org.junit.Assert.assertTrue;

import java.lang.ref.WeakReference;
import java.util.Arrays;
import java.util.concurrent.atomic.AtomicReference;
import org.junit.After;
import org.junit.Before;
import org.junit.Test;

/** The native methods, with everything below the worker scripted. */
public class BridgeTest {
    private static final int REFUSED = -4;
    private static final int BAD_AUDIO = -3;
    private static final int NO_MEMORY = -2;
    private static final byte[] AUDIO = {1, 2, 3, 4};

    private final Fingerprint.Events events = new Fingerprint.Events();
    private Fingerprint object;

    @Before
    public void setUp() {
        object = new Fingerprint(); // loads the library
        Script.reset();
    }

    @After
    public void tearDown() {
        Script.hold(false);
        Script.signals(true);
        object.native_release();
    }

    private void start() {
        assertEquals(0, object.native_setup(events));
    }

    private int request(byte[] audio) {
        return object.native_generate(44100, 2, 1, 16, audio, audio.length);
    }

    private static String repeat(char letter, int count) {
        char[] letters = new char[count];
        Arrays.fill(letters, letter);
        return new String(letters);
    }

    @Test
    public void aRequestIsAnsweredByOneEventAndAText() throws Exception {
        start();
        assertNotEquals(0, object.mNativeContext);
        assertEquals(0, request(AUDIO));
        assertEquals("0 0 0", events.next());
        assertEquals("<text/>", object.native_getFingerprint());
        assertEquals("44100 2 2", Script.format());
        assertArrayEquals(AUDIO, Script.audio());
        assertTrue(events.queue.isEmpty());
    }

    @Test
    public void aFailedJobIsReportedAndLeavesAnEmptyText() throws Exception {
        start();
        assertEquals(0, object.native_generate(44100, 2, 3, 32, AUDIO, 4));
        assertEquals("1 0 0", events.next());
        assertEquals("", object.native_getFingerprint());
        assertEquals(0, request(AUDIO));
        assertEquals("0 0 0", events.next());
    }

    @Test
    public void beforeTheFirstJobTheTextIsEmpty() {
        start();
        assertEquals("", object.native_getFingerprint());
    }

    @Test
    public void badAudioIsRefusedWithoutTouchingTheWorker() {
        start();
        assertEquals(BAD_AUDIO, object.native_generate(44100, 2, 1, 16, null, 4));
        for (int length : new int[] {0, -1, Integer.MIN_VALUE, 5, Integer.MAX_VALUE}) {
            assertEquals(BAD_AUDIO, object.native_generate(44100, 2, 1, 16, AUDIO, length));
        }
        assertEquals(BAD_AUDIO, request(new byte[0]));
        assertTrue(events.queue.isEmpty());
        assertEquals(0, request(AUDIO)); // it is still ready
    }

    @Test
    public void badAudioIsNamedBeforeAnObjectWithoutWorker() {
        assertEquals(BAD_AUDIO, object.native_generate(44100, 2, 1, 16, null, 4));
        assertEquals(BAD_AUDIO, object.native_generate(44100, 2, 1, 16, AUDIO, 5));
    }

    @Test
    public void onlyTheFirstBytesCount() throws Exception {
        start();
        assertEquals(0, object.native_generate(8000, 1, 1, 8, AUDIO, 3));
        events.next();
        assertArrayEquals(new byte[] {1, 2, 3}, Script.audio());
        assertEquals("8000 1 1", Script.format());
    }

    @Test
    public void aSecondRequestIsRefusedWhileTheFirstWaits() throws Exception {
        start();
        Script.awaitWaits(2); // the starter's and the worker's
        Script.signals(false);
        assertEquals(0, request(AUDIO));
        assertEquals(REFUSED, request(new byte[] {9, 9, 9, 9}));
        Script.signals(true);
        Script.wake();
        assertEquals("0 0 0", events.next());
        assertArrayEquals("of the accepted request", AUDIO, Script.audio());
        assertEquals(0, request(AUDIO));
        events.next();
    }

    @Test
    public void theArrayMayChangeAsSoonAsTheRequestIsMade() throws Exception {
        start();
        Script.awaitWaits(2);
        Script.signals(false);
        byte[] audio = AUDIO.clone();
        assertEquals(0, request(audio));
        Arrays.fill(audio, (byte) 9);
        audio = null;
        System.gc();
        Script.signals(true);
        Script.wake();
        events.next();
        assertArrayEquals(AUDIO, Script.audio());
    }

    @Test
    public void aSpuriousWakeRepeatsTheLastJob() throws Exception {
        start();
        assertEquals(0, request(AUDIO));
        events.next();
        while (events.queue.isEmpty()) {
            Script.wake();
            Thread.yield();
        }
        assertEquals("0 0 0", events.next());
        assertArrayEquals(AUDIO, Script.audio());
    }

    @Test
    public void anObjectThatWasNeverSetUpIsRefused() {
        assertEquals(REFUSED, request(AUDIO));
        assertNull(object.native_getFingerprint());
        object.native_finalize();
        object.native_release();
        assertEquals(0, object.mNativeContext);
    }

    @Test
    public void aReleasedObjectIsRefused() {
        start();
        object.native_release();
        assertEquals(0, object.mNativeContext);
        assertEquals(REFUSED, request(AUDIO));
        assertNull(object.native_getFingerprint());
        object.native_finalize();
        object.native_release();
        assertEquals(0, object.mNativeContext);
    }

    @Test
    public void theNumberOfAFinalizedObjectFindsNothing() {
        start();
        int number = object.mNativeContext;
        object.native_finalize();
        assertEquals(number, object.mNativeContext);
        assertEquals(REFUSED, request(AUDIO));
        assertNull(object.native_getFingerprint());
        object.native_finalize();
        object.native_release();
        assertEquals(0, object.mNativeContext);
    }

    @Test
    public void aForgedOrStaleNumberFindsNothing() {
        start();
        int number = object.mNativeContext;
        for (int forged : new int[] {-1, number + 1, number - 1, Integer.MIN_VALUE, 0x7f001000}) {
            object.mNativeContext = forged;
            assertEquals(REFUSED, request(AUDIO));
            assertNull(object.native_getFingerprint());
            object.native_finalize();
        }
        object.mNativeContext = number;
        object.native_release();
        Fingerprint next = new Fingerprint();
        assertEquals(0, next.native_setup(events));
        assertNotEquals("numbers are not given again", number, next.mNativeContext);
        object.mNativeContext = number;
        assertEquals(REFUSED, request(AUDIO));
        next.native_release();
    }

    @Test
    public void aReleasedObjectCanBeSetUpAgain() throws Exception {
        start();
        object.native_release();
        start();
        assertEquals(0, request(AUDIO));
        assertEquals("0 0 0", events.next());
    }

    @Test
    public void aSecondSetUpEndsTheFirstWorker() throws Exception {
        start();
        int threads = nativeThreads();
        int first = object.mNativeContext;
        start();
        assertNotEquals(first, object.mNativeContext);
        assertEquals(0, request(AUDIO));
        assertEquals("0 0 0", events.next());
        awaitThreads(threads);
    }

    @Test
    public void onlySixHundredCharactersOfATextArrive() throws Exception {
        start();
        for (int length : new int[] {599, 600, 601, 5000}) {
            Script.text(repeat('x', length));
            assertEquals(0, request(AUDIO));
            assertEquals("0 0 0", events.next());
            assertEquals(repeat('x', Math.min(length, 600)), object.native_getFingerprint());
        }
        Script.text("short");
        assertEquals(0, request(AUDIO));
        events.next();
        assertEquals("short", object.native_getFingerprint());
    }

    @Test
    public void theTextCanBeFetchedFromTheEvent() throws Exception {
        AtomicReference<String> text = new AtomicReference<>();
        events.during = () -> text.set(object.native_getFingerprint());
        start();
        assertEquals(0, request(AUDIO));
        events.next();
        assertEquals("<text/>", text.get());
    }

    @Test
    public void theTextCanBeFetchedWhileAReleaseWaits() throws Exception {
        AtomicReference<String> text = new AtomicReference<>();
        events.during = () -> text.set(object.native_getFingerprint());
        start();
        Script.hold(true);
        assertEquals(0, request(AUDIO));
        Script.awaitHeldJob();
        Thread releaser = new Thread(object::native_release);
        releaser.start();
        releaser.join(50);
        Script.hold(false);
        releaser.join();
        events.next();
        assertEquals("<text/>", text.get());
        assertEquals(0, object.mNativeContext);
    }

    @Test
    public void eventsComeOnADaemonThreadUnderItsFullName() throws Exception {
        start();
        assertEquals(0, request(AUDIO));
        events.next();
        assertEquals("FingerprintThread", events.threadName);
        assertTrue(events.daemon);
    }

    @Test
    public void theWorkerGoesOnAfterAnEventThatThrows() throws Exception {
        events.during = () -> {
            throw new IllegalStateException("thrown by a listener; to be seen on standard error");
        };
        start();
        for (int i = 0; i < 3; ++i) {
            assertEquals(0, request(AUDIO));
            assertEquals("0 0 0", events.next());
        }
    }

    @Test
    public void aSetUpWithoutAThreadIsLoggedAndReturned() {
        Script.threads(false);
        assertEquals(NO_MEMORY, object.native_setup(events));
        assertEquals(0, object.mNativeContext);
        assertEquals("3 FingerprintJNI: native_setup: init error\n"
                + "3 FingerprintJNI: native_setup error\n", Script.log());
        Script.threads(true);
        start();
    }

    @Test
    public void aFailedSetUpLeavesTheEarlierWorkerInPlace() throws Exception {
        start();
        int number = object.mNativeContext;
        Script.threads(false);
        assertEquals(NO_MEMORY, object.native_setup(events));
        assertEquals(number, object.mNativeContext);
        assertEquals(0, request(AUDIO));
        events.next();
    }

    @Test
    public void aReleaseWaitsForTheRunningJobAndItsEvent() throws Exception {
        start();
        Script.hold(true);
        assertEquals(0, request(AUDIO));
        Script.awaitHeldJob();
        Thread releaser = new Thread(object::native_release);
        releaser.start();
        releaser.join(50);
        assertTrue(releaser.isAlive());
        Script.hold(false);
        releaser.join();
        assertEquals("0 0 0", events.queue.poll());
        assertEquals(REFUSED, request(AUDIO));
    }

    @Test
    public void aRequestDuringAJobWaitsForItsEnd() throws Exception {
        start();
        Script.hold(true);
        assertEquals(0, request(AUDIO));
        Script.awaitHeldJob();
        Thread second = new Thread(() -> assertEquals(0, request(new byte[] {5, 6})));
        second.start();
        second.join(50);
        assertTrue(second.isAlive());
        assertArrayEquals("a waiting request leaves the audio of the job alone", AUDIO,
                Script.audio());
        Script.hold(false);
        second.join();
        events.next();
        events.next();
        assertArrayEquals(new byte[] {5, 6}, Script.audio());
    }

    @Test
    public void theReferenceIsGivenBackWithTheWorker() throws Exception {
        for (boolean finalizing : new boolean[] {false, true}) {
            Object cookie = new Object();
            WeakReference<Object> watched = new WeakReference<>(cookie);
            assertEquals(0, object.native_setup(cookie));
            cookie = null;
            System.gc();
            assertFalse("the worker holds it", watched.get() == null);
            if (finalizing) {
                object.native_finalize();
            } else {
                object.native_release();
            }
            for (int i = 0; i < 100 && watched.get() != null; ++i) {
                System.gc();
                Thread.sleep(10);
            }
            assertNull(watched.get());
        }
    }

    @Test
    public void setUpTakesNullForTheReference() throws Exception {
        assertEquals(0, object.native_setup(null));
        assertEquals(0, request(AUDIO));
    }

    static int nativeThreads() {
        return new java.io.File("/proc/self/task").list().length;
    }

    /** Threads end a little after their worker has acknowledged. */
    static void awaitThreads(int atMost) throws InterruptedException {
        for (int i = 0; i < 500 && nativeThreads() > atMost; ++i) {
            Thread.sleep(10);
        }
        assertTrue(nativeThreads() + " threads", nativeThreads() <= atMost);
    }
}
