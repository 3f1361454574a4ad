package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertTrue;

import java.util.ArrayList;
import java.util.Collections;
import java.util.List;
import java.util.concurrent.CompletableFuture;
import java.util.concurrent.CompletionException;
import java.util.concurrent.atomic.AtomicInteger;
import java.util.concurrent.atomic.AtomicReference;
import org.junit.Test;

/** Catalogues that are closed while others work with them. */
public class CatalogueStressTest {
    private static void expectClosed(Throwable thrown, AtomicReference<Throwable> failure) {
        Throwable cause = thrown instanceof CompletionException ? thrown.getCause() : thrown;
        boolean closed = cause instanceof IllegalStateException
                && cause.getMessage().equals("This catalogue is closed");
        if (!closed) {
            failure.set(thrown);
        }
    }

    @Test
    public void handlesAreClosedWhileWorkRuns() throws Exception {
        AtomicReference<Throwable> failure = new AtomicReference<>();
        AtomicInteger found = new AtomicInteger();
        Sound tune = Tunes.sound(1, 0, 20);
        Sound clip = Tunes.sound(1, 5, 10);
        for (int turn = 0; turn < 25; ++turn) {
            Catalogue music = Catalogue.inMemory();
            music.add(tune, "tune", Collections.emptyMap());
            List<Thread> users = new ArrayList<>();
            users.add(new Thread(() -> {
                for (;;) {
                    try {
                        assertEquals(1, music.match(clip).best().track());
                        found.incrementAndGet();
                    } catch (Throwable thrown) {
                        expectClosed(thrown, failure);
                        return;
                    }
                }
            }));
            users.add(new Thread(() -> {
                for (int i = 0;; ++i) {
                    try {
                        music.add(Tunes.sound(2 + i, 0, 2), "other " + i, Collections.emptyMap());
                        for (Track track : music) {
                            music.track(track.id());
                        }
                        music.verify();
                    } catch (Throwable thrown) {
                        expectClosed(thrown, failure);
                        return;
                    }
                }
            }));
            users.add(new Thread(System::gc));
            for (Thread user : users) {
                user.start();
            }
            Thread.sleep(3 * turn);
            music.close();
            for (Thread user : users) {
                user.join();
            }
        }
        assertEquals(null, failure.get());
        assertTrue("some clips were found", found.get() > 0);
    }

    @Test
    public void futuresEndWhenTheCatalogueIsClosed() throws Exception {
        AtomicReference<Throwable> failure = new AtomicReference<>();
        List<CompletableFuture<?>> futures = new ArrayList<>();
        try (Catalogue music = Catalogue.inMemory()) {
            music.add(Tunes.sound(1, 0, 20), "tune", Collections.emptyMap());
            for (int i = 0; i < 20; ++i) {
                futures.add(music.matchAsync(Tunes.sound(1, 2, 10)));
                futures.add(music.addAsync(
                        Tunes.sound(i + 2, 0, 3), "more " + i, Collections.emptyMap()));
            }
            futures.get(0).join();
        }
        for (CompletableFuture<?> future : futures) {
            try {
                future.join();
            } catch (CompletionException thrown) {
                expectClosed(thrown, failure);
            }
        }
        assertEquals(null, failure.get());
    }

    @Test
    public void forgottenCataloguesAreCollected() throws Exception {
        int before = new java.io.File("/proc/self/fd").list().length;
        java.io.File file = java.io.File.createTempFile("forgotten", ".kzc");
        assertTrue(file.delete());
        for (int i = 0; i < 40; ++i) {
            Catalogue.create(file.getPath()).size();
        }
        for (int i = 0; i < 100 && open(file) > 0; ++i) {
            System.gc();
            System.runFinalization();
            Thread.sleep(10);
        }
        assertEquals(before + " files were open before", 0, open(file));
        assertTrue(file.delete());
    }

    /** How often this process has a file open. */
    private static int open(java.io.File file) throws java.io.IOException {
        int count = 0;
        for (java.io.File entry : new java.io.File("/proc/self/fd").listFiles()) {
            try {
                if (java.nio.file.Files.readSymbolicLink(entry.toPath()).toString()
                        .startsWith(file.getPath())) {
                    ++count;
                }
            } catch (java.io.IOException gone) {
                // closed meanwhile
            }
        }
        return count;
    }
}
