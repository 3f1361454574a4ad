package com.orvanta.android.kzsdk;

import java.io.File;
import java.io.IOException;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.Collections;
import java.util.Iterator;
import java.util.List;
import java.util.Map;
import java.util.Objects;
import java.util.concurrent.CompletableFuture;
import java.util.concurrent.CompletionException;
import java.util.concurrent.Executor;
import java.util.concurrent.Executors;

/**
 * Keeps what recordings sound like and names a clip that comes from anywhere in one of them.
 *
 * <pre>{@code
 * try (Catalogue music = Catalogue.open("music.kzc")) {
 *     for (Match match : music.match(Sound.file("clip.wav"))) {
 *         System.out.println(match);
 *     }
 * }
 * }</pre>
 *
 * <p>Threads: a catalogue may be used by any number of threads. Recognising runs in parallel,
 * everything else takes turns. {@link #close} may be called at any time: what is under way is
 * finished, later calls throw an {@link IllegalStateException}.
 *
 * <p>Failures are a {@link CatalogueException}, whose message is a sentence with the cure; whatever
 * fails has changed nothing. The methods whose names end in {@code Async} work on threads of their
 * own, as many as there are processors, and their futures fail in the same way; those threads do
 * not keep a program from ending.
 *
 * <p>The native libraries are looked for as {@code System.loadLibrary} does, and else taken out of
 * the jar; the system properties {@code kzsdk.library} and {@code kzcat.library} name their files.
 * The package for Android has no catalogue.
 */
public final class Catalogue implements AutoCloseable, Iterable<Track> {
    private static final int READ = 1;
    private static final int WRITE = 2;
    private static final int CREATE = 3;

    private static final Executor WORKERS =
            Executors.newFixedThreadPool(Runtime.getRuntime().availableProcessors(), task -> {
                Thread thread = new Thread(task, "Catalogue");
                thread.setDaemon(true);
                return thread;
            });

    private final NativeHandle handle;

    private Catalogue(String path, int access) {
        byte[] bytes = path == null ? null : Texts.bytes(path, "path");
        NativeLibrary.loadCatalogue();
        Path file = OpenCatalogues.opening(path);
        handle = new NativeHandle("catalogue", opened(bytes, access, file), catalogue -> {
            NativeCatalogue.close(catalogue);
            OpenCatalogues.closed(file);
        });
    }

    private static long opened(byte[] path, int access, Path file) {
        try {
            return NativeCatalogue.open(path, access);
        } catch (RuntimeException | Error failed) {
            OpenCatalogues.closed(file);
            throw failed;
        }
    }

    /**
     * Opens a catalogue for reading.
     *
     * @param path of its file, or the address of a server: {@code postgresql://HOST/DATABASE}
     * @return the catalogue, which the caller closes
     */
    public static Catalogue open(String path) {
        return new Catalogue(Objects.requireNonNull(path, "path"), READ);
    }

    /**
     * Opens a catalogue for writing, which must exist.
     *
     * @param path as for {@link #open}
     * @return the catalogue, which the caller closes
     */
    public static Catalogue openForWriting(String path) {
        return new Catalogue(Objects.requireNonNull(path, "path"), WRITE);
    }

    /**
     * Opens a catalogue for writing, and makes an empty one when there is none.
     *
     * @param path as for {@link #open}
     * @return the catalogue, which the caller closes
     */
    public static Catalogue create(String path) {
        return new Catalogue(Objects.requireNonNull(path, "path"), CREATE);
    }

    /**
     * Makes a catalogue in memory, which is gone when it is closed.
     *
     * @return the catalogue, which the caller closes
     */
    public static Catalogue inMemory() {
        return new Catalogue(null, CREATE);
    }

    /** A call with the native catalogue. */
    private interface Call<T> {
        T with(long catalogue);
    }

    private <T> T call(Call<T> call) {
        long catalogue = handle.enter();
        try {
            return call.with(catalogue);
        } finally {
            handle.leave();
        }
    }

    /**
     * Returns how many tracks there are.
     *
     * @return the number now
     */
    public long size() {
        return call(catalogue -> {
            long[] out = new long[2];
            NativeCatalogue.facts(catalogue, out);
            return out[0];
        });
    }

    /**
     * Adds a file under its path, without tags.
     *
     * @param file see {@link Sound#file(File)}
     * @return what became of it; it is on disk
     * @throws IOException when the file cannot be read
     */
    public AddedTrack add(File file) throws IOException {
        long[] about = {file.length(), file.lastModified() * 1000000};
        return add(Sound.file(file), file.getPath(), Collections.emptyMap(), about);
    }

    /**
     * Adds a recording.
     *
     * @param sound the whole of it
     * @param source its path, or any other text that is not empty. A source that the catalogue has
     *     already moves to this track, and the one that had it is removed when that was its last
     * @param tags "title", "artist" and so on
     * @return what became of it; it is on disk
     * @throws IOException when a file cannot be read
     */
    public AddedTrack add(Sound sound, String source, Map<String, String> tags) throws IOException {
        return add(sound, source, tags, new long[] {-1, -1});
    }

    private AddedTrack add(Sound sound, String source, Map<String, String> tags, long[] about)
            throws IOException {
        byte[] place = Texts.bytes(source, "source");
        byte[][] words = new byte[2 * tags.size()][];
        int count = 0;
        for (Map.Entry<String, String> tag : tags.entrySet()) {
            words[count++] = Texts.bytes(tag.getKey(), "name of a tag");
            words[count++] = Texts.bytes(tag.getValue(), "value of a tag");
        }
        call(catalogue -> null); // a catalogue that is closed fails before the work, not after it
        long trail = NativeSound.trailOf(sound);
        try {
            return call(catalogue -> {
                long[] out = new long[2];
                NativeCatalogue.add(catalogue, trail, place, about, words, out);
                return new AddedTrack(out);
            });
        } finally {
            NativeCatalogue.freeTrail(trail);
        }
    }

    /**
     * Looks a clip up as is usual.
     *
     * @param clip about 14 seconds are a good length
     * @return what was concluded
     * @throws IOException when a file cannot be read
     */
    public Recognition match(Sound clip) throws IOException {
        return match(clip, MatchOptions.USUAL);
    }

    /**
     * Looks a clip up.
     *
     * @param clip about 14 seconds are a good length
     * @param options how
     * @return what was concluded
     * @throws IOException when a file cannot be read
     */
    public Recognition match(Sound clip, MatchOptions options) throws IOException {
        Objects.requireNonNull(options, "options");
        call(catalogue -> null);
        return recognise(NativeSound.queryOf(clip), options);
    }

    /**
     * Looks a query document up. Only tracks that {@code kzfp add --documents} added answer it, and
     * 30 numbers can say little: see {@link Match#isWeak}.
     *
     * @param document of a fingerprint
     * @return what was concluded
     */
    public Recognition match(QueryDocument document) {
        call(catalogue -> null);
        byte[] text = Texts.bytes(document.text(), "document");
        return recognise(NativeCatalogue.createQueryFromDocument(text), MatchOptions.USUAL);
    }

    /** Frees the query. */
    private Recognition recognise(long query, MatchOptions options) {
        try {
            return Recognition.taken(call(catalogue -> NativeCatalogue.recognise(catalogue, query,
                    options.speeds() ? 1 : 0, options.candidates(), options.passages() ? 1 : 0)));
        } finally {
            NativeCatalogue.freeQuery(query);
        }
    }

    /** Work that may read a file. */
    private interface Work<T> {
        T run() throws IOException;
    }

    private static <T> CompletableFuture<T> later(Work<T> work) {
        return CompletableFuture.supplyAsync(() -> {
            try {
                return work.run();
            } catch (IOException failed) {
                throw new CompletionException(failed);
            }
        }, WORKERS);
    }

    /**
     * Looks a clip up on another thread.
     *
     * @param clip see {@link #match(Sound)}
     * @return a future of what is concluded; cancelling it stops nothing
     */
    public CompletableFuture<Recognition> matchAsync(Sound clip) {
        return matchAsync(clip, MatchOptions.USUAL);
    }

    /**
     * Looks a clip up on another thread.
     *
     * @param clip see {@link #match(Sound)}
     * @param options how
     * @return a future of what is concluded; cancelling it stops nothing
     */
    public CompletableFuture<Recognition> matchAsync(Sound clip, MatchOptions options) {
        return later(() -> match(clip, options));
    }

    /**
     * Adds a recording on another thread. Several at once use several processors.
     *
     * @param sound see {@link #add(Sound, String, Map)}
     * @param source its path
     * @param tags "title", "artist" and so on
     * @return a future of what becomes of it; cancelling it stops nothing
     */
    public CompletableFuture<AddedTrack> addAsync(Sound sound, String source, Map<String, String> tags) {
        return later(() -> add(sound, source, tags));
    }

    /**
     * Reads a track.
     *
     * @param id as {@link Match#track} gives it
     * @return null when there is none
     */
    public Track track(long id) {
        return call(catalogue -> Track.taken(NativeCatalogue.getTrack(catalogue, id)));
    }

    /**
     * Finds the track that has a source.
     *
     * @param source the text that it was added with
     * @return null when there is none
     */
    public Track find(String source) {
        byte[] bytes = Texts.bytes(source, "source");
        return call(catalogue -> Track.taken(NativeCatalogue.findSource(catalogue, bytes)));
    }

    /**
     * Goes through the tracks in the order of their ids, each read when it is reached: tracks that
     * are added meanwhile are seen too.
     *
     * @return an iterator that can remove tracks; it throws {@link CatalogueException}
     */
    @Override
    public Iterator<Track> iterator() {
        return new TrackIterator(this);
    }

    /** The first track with an id above this; null when there is none. */
    Track trackAfter(long id) {
        return call(catalogue -> Track.taken(NativeCatalogue.nextTrack(catalogue, id)));
    }

    /**
     * Removes a track with all its sources.
     *
     * @param track its id
     */
    public void remove(long track) {
        call(catalogue -> {
            NativeCatalogue.removeTrack(catalogue, track);
            return null;
        });
    }

    /**
     * Removes a source, and its track when it was the last one.
     *
     * @param source the text that it was added with
     */
    public void remove(String source) {
        byte[] bytes = Texts.bytes(source, "source");
        call(catalogue -> {
            NativeCatalogue.removeSource(catalogue, bytes);
            return null;
        });
    }

    /**
     * Reads everything in the catalogue, and changes nothing.
     *
     * @return what is wrong; empty when nothing is
     */
    public List<CatalogueFault> verify() {
        return call(catalogue -> {
            long[][] tracks = new long[1][];
            byte[][] texts = NativeCatalogue.verify(catalogue, tracks);
            List<CatalogueFault> faults = new ArrayList<>();
            for (int i = 0; i < texts.length; ++i) {
                faults.add(new CatalogueFault(tracks[0][i], Texts.of(texts[i])));
            }
            return faults;
        });
    }

    /**
     * Reads everything on another thread.
     *
     * @return a future of what is wrong; cancelling it stops nothing
     */
    public CompletableFuture<List<CatalogueFault>> verifyAsync() {
        return later(this::verify);
    }

    /**
     * Adds all tracks of another catalogue, with their tags and sources. It may be repeated.
     *
     * @param other is only read
     * @return how many tracks are new here
     */
    public long merge(Catalogue other) {
        return call(catalogue -> other.call(from -> {
            long[] out = new long[3];
            NativeCatalogue.merge(catalogue, from, out);
            return out[0];
        }));
    }

    /**
     * Closes the catalogue, when no call uses it any more. Everything that was added is on disk
     * already. Closing twice does nothing.
     */
    @Override
    public void close() {
        handle.close();
    }

    /** Closes a catalogue that was not closed. */
    @Override
    protected void finalize() throws Throwable {
        try {
            if (handle != null) { // null where the constructor threw
                handle.close();
            }
        } finally {
            super.finalize();
        }
    }
}
