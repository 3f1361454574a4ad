package com.orvanta.android.kzsdk;

import java.nio.ByteBuffer;

/**
 * The native methods behind {@link Catalogue}, in {@code libkzcat_java}, which exports them under
 * their names. What fails throws a {@link CatalogueException}. Texts are bytes, those that are
 * passed with a 0 behind them; see {@link Texts}.
 */
final class NativeCatalogue {
    private NativeCatalogue() {}

    /** Returns the version of {@code libkzcat_java}. */
    static native byte[] version();

    static native long open(byte[] path, int access);

    static native void close(long catalogue);

    /** out: tracks, codes. */
    static native void facts(long catalogue, long[] out);

    static native long createBuilder(int format, int rate, int channels, boolean documents);

    static native void feedBuilder(long builder, ByteBuffer bytes, int count);

    static native long finishBuilder(long builder);

    static native void freeBuilder(long builder);

    static native void freeTrail(long trail);

    /** about: size and time of change of the file; tags: names and values in turn; out: the track,
     * whether it is new. */
    static native void add(long catalogue, long trail, byte[] source, long[] about, byte[][] tags,
            long[] out);

    static native void removeTrack(long catalogue, long track);

    static native void removeSource(long catalogue, byte[] source);

    static native long createQuery(int format, int rate, int channels);

    static native long createQueryFromDocument(byte[] text);

    static native void feedQuery(long query, ByteBuffer bytes, int count);

    static native void finishQuery(long query);

    static native void freeQuery(long query);

    static native long recognise(long catalogue, long query, int speeds, int candidates, int passages);

    /** integers: verdict, matches, candidates, tracks left out; reals: runner-up, clip's seconds. */
    static native void summary(long result, long[] integers, double[] reals);

    /**
     * Returns source, title and artist. integers: track, by, weak; reals: score, threshold, offset,
     * speed, tempo, pitch, begin and end in the clip.
     */
    static native byte[][] match(long result, boolean candidate, long place, long[] integers,
            double[] reals);

    static native void freeResult(long result);

    /** The first track with an id above this; 0 when there is none. */
    static native long nextTrack(long catalogue, long after);

    /** 0 when there is none. */
    static native long getTrack(long catalogue, long track);

    /** 0 when there is none. */
    static native long findSource(long catalogue, byte[] source);

    /** Returns sources, then names and values of tags in turn. integers: id, samples, rate, when it
     * was added, number of sources. */
    static native byte[][] track(long track, long[] integers);

    static native void freeTrack(long track);

    /** Returns a sentence for each fault. tracks: one array, of their tracks. */
    static native byte[][] verify(long catalogue, long[][] tracks);

    /** out: tracks that are new, known, damaged. */
    static native void merge(long catalogue, long other, long[] out);
}
