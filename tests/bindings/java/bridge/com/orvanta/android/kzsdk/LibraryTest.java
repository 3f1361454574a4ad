package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertNotEquals;
import static org.junit.Assert.assertTrue;

import java.util.ArrayList;
import java.util.Arrays;
import java.util.List;
import java.util.concurrent.atomic.AtomicBoolean;
import java.util.concurrent.atomic.AtomicReference;
import org.junit.Test;

/** The native methods over the library itself. */
public class LibraryTest {
    private static final byte[] MUSIC = Audio.music(15);

    private static String outcome(int rate, int channels, int code, int bits, byte[] audio)
            throws Exception {
        Fingerprint object = new Fingerprint();
        Fingerprint.Events events = new Fingerprint.Events();
        assertEquals(0, object.native_setup(events));
        assertEquals(0, object.native_generate(rate, channels, code, bits, audio, audio.length));
        String event = events.next();
        String text = object.native_getFingerprint();
        object.native_release();
        return event + ":" + text;
    }

    @Test
    public void musicGivesADocumentInEverySupportedEncoding() throws Exception {
        String sixteen = outcome(11025, 1, 1, 16, MUSIC);
        assertTrue(sixteen, sixteen.startsWith("0 0 0:<?xml"));
        assertTrue(sixteen, sixteen.contains("COUNT=\"30\""));
        for (int code : new int[] {1, 6, 7}) {
            String other = outcome(11025, 1, code, 8, MUSIC);
            assertTrue(other, other.startsWith("0 0 0:<?xml"));
            assertNotEquals(sixteen, other);
        }
    }

    @Test
    public void moreBitsThanSixteenAreReadAsSixteen() throws Exception {
        String sixteen = outcome(11025, 1, 1, 16, MUSIC);
        for (int bits : new int[] {9, 24, 32, 0x10010}) {
            assertEquals(sixteen, outcome(11025, 1, 1, bits, MUSIC));
        }
        assertEquals("only 16 bits of a format count", sixteen,
                outcome(11025, 1, 0x70001, 16, MUSIC));
    }

    @Test
    public void everyOtherFormatFails() throws Exception {
        for (int code = -1; code < 130; ++code) {
            if (code != 1 && code != 6 && code != 7) {
                assertEquals("1 0 0:", outcome(11025, 1, code, 16, MUSIC));
            }
        }
    }

    @Test
    public void whatTheLibraryRefusesFails() throws Exception {
        assertEquals("1 0 0:", outcome(12345, 1, 1, 16, MUSIC));
        assertEquals("1 0 0:", outcome(-1, 1, 1, 16, MUSIC));
        assertEquals("1 0 0:", outcome(11025, 0, 1, 16, MUSIC));
        assertEquals("1 0 0:", outcome(11025, -2, 1, 16, MUSIC));
        assertEquals("1 0 0:", outcome(11025, 1, 1, 16, Arrays.copyOf(MUSIC, MUSIC.length / 2)));
        assertEquals("1 0 0:", outcome(11025, 1, 1, 16, new byte[] {1}));
    }

    @Test
    public void hundredsOfRequestsGiveTheSameDocument() throws Exception {
        Fingerprint object = new Fingerprint();
        Fingerprint.Events events = new Fingerprint.Events();
        assertEquals(0, object.native_setup(events));
        String first = null;
        for (int i = 0; i < 100; ++i) {
            assertEquals(0, object.native_generate(11025, 1, 1, 16, MUSIC, MUSIC.length));
            assertEquals("0 0 0", events.next());
            String text = object.native_getFingerprint();
            first = first == null ? text : first;
            assertEquals(first, text);
        }
        object.native_release();
    }

    @Test
    public void eightThreadsWorkWhileGarbageIsCollected() throws Exception {
        String expected = outcome(11025, 1, 1, 16, MUSIC);
        AtomicReference<Throwable> failure = new AtomicReference<>();
        AtomicBoolean done = new AtomicBoolean();
        Thread collector = new Thread(() -> {
            while (!done.get()) {
                System.gc();
            }
        });
        List<Thread> users = new ArrayList<>();
        for (int i = 0; i < 8; ++i) {
            Thread user = new Thread(() -> {
                try {
                    for (int turn = 0; turn < 4; ++turn) {
                        assertEquals(expected, outcome(11025, 1, 1, 16, MUSIC.clone()));
                    }
                } catch (Throwable thrown) {
                    failure.set(thrown);
                }
            });
            users.add(user);
            user.start();
        }
        collector.start();
        for (Thread user : users) {
            user.join();
        }
        done.set(true);
        collector.join();
        assertEquals(null, failure.get());
    }
}
