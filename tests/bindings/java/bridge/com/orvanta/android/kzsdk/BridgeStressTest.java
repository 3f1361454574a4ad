package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertTrue;

import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Paths;
import java.util.ArrayList;
import java.util.List;
import java.util.Random;
import java.util.concurrent.atomic.AtomicReference;
import org.junit.Before;
import org.junit.Test;

/** Many requests, many set-ups, many threads. */
public class BridgeStressTest {
    private static final byte[] AUDIO = new byte[4096];

    @Before
    public void setUp() {
        new Fingerprint().native_release(); // loads the library
        Script.reset();
    }

    private static int request(Fingerprint object) {
        return object.native_generate(44100, 2, 1, 16, AUDIO, AUDIO.length);
    }

    @Test
    public void noRequestMadeAsTheEventArrivesIsLost() throws Exception {
        Fingerprint object = new Fingerprint();
        Fingerprint.Events events = new Fingerprint.Events();
        assertEquals(0, object.native_setup(events));
        for (int i = 0; i < 1000; ++i) {
            assertEquals(0, request(object));
            assertEquals("0 0 0", events.next());
        }
        object.native_release();
    }

    @Test
    public void noRequestIsLostThatIsMadeTheMomentSetUpIsDone() throws Exception {
        for (int i = 0; i < 200; ++i) {
            Fingerprint object = new Fingerprint();
            Fingerprint.Events events = new Fingerprint.Events();
            assertEquals(0, object.native_setup(events));
            assertEquals(0, request(object));
            assertEquals("0 0 0", events.next());
            object.native_release();
        }
    }

    private static long residentKibibytes() throws Exception {
        for (String line : Files.readAllLines(Paths.get("/proc/self/status"),
                StandardCharsets.US_ASCII)) {
            if (line.startsWith("VmRSS:")) {
                return Long.parseLong(line.replaceAll("\\D", ""));
            }
        }
        throw new AssertionError("no VmRSS");
    }

    private static void cycle(int times) throws Exception {
        for (int i = 0; i < times; ++i) {
            Fingerprint object = new Fingerprint();
            assertEquals(0, object.native_setup(object));
            if (i % 10 == 0) {
                request(object);
            }
            if (i % 2 == 0) {
                object.native_release();
            } else {
                object.native_finalize();
            }
        }
    }

    @Test
    public void aThousandCyclesLeaveNoThreadAndNoMemoryBehind() throws Exception {
        cycle(200);
        System.gc();
        int threads = BridgeTest.nativeThreads();
        long before = residentKibibytes();
        cycle(1000);
        System.gc();
        BridgeTest.awaitThreads(threads + 2); // the VM's own come and go
        long grown = residentKibibytes() - before;
        assertTrue(grown + " KiB", grown < 32 * 1024); // one thread's stack each would be 8 GB
    }

    @Test
    public void oneObjectMayBeUsedByManyThreadsAtOnce() throws Exception {
        Fingerprint object = new Fingerprint();
        int threads = BridgeTest.nativeThreads();
        AtomicReference<Throwable> failure = new AtomicReference<>();
        List<Thread> users = new ArrayList<>();
        for (int i = 0; i < 6; ++i) {
            Random random = new Random(i);
            Thread user = new Thread(() -> {
                for (int turn = 0; turn < 300; ++turn) {
                    anything(object, random.nextInt(8));
                }
            });
            user.setUncaughtExceptionHandler((thread, thrown) -> failure.set(thrown));
            users.add(user);
        }
        for (Thread user : users) {
            user.start();
        }
        for (Thread user : users) {
            user.join();
        }
        assertEquals(null, failure.get());
        object.native_release();
        BridgeTest.awaitThreads(threads + 2);
    }

    private static void anything(Fingerprint object, int choice) {
        switch (choice) {
            case 0:
                assertEquals(0, object.native_setup(object));
                break;
            case 1:
                object.native_release();
                break;
            case 2:
                object.native_finalize();
                break;
            case 3:
            case 4:
                object.native_getFingerprint();
                break;
            default:
                int code = request(object);
                assertTrue("" + code, code == 0 || code == -4);
        }
    }
}
