package com.orvanta.android.kzsdk;

import java.io.IOException;
import java.io.InputStream;
import java.io.InterruptedIOException;
import java.nio.ByteBuffer;

/** Sound on its way to the native side, piece by piece: to a trail or a query. */
final class NativeSound {
    private static final int PIECE = 1 << 16;
    /** How many times in a row a decoder may return no bytes, with a millisecond in between. */
    private static final int MOST_TURNS = 2000;

    private NativeSound() {}

    /** Returns a trail, which the caller frees. */
    static long trailOf(Sound sound) throws IOException {
        SoundFormat format = sound.format();
        long builder = NativeCatalogue.createBuilder(
                format.code(), format.sampleRate(), format.channels(), false);
        try {
            feed(sound, (bytes, count) -> NativeCatalogue.feedBuilder(builder, bytes, count));
            return NativeCatalogue.finishBuilder(builder);
        } finally {
            NativeCatalogue.freeBuilder(builder);
        }
    }

    /** Returns a finished query, which the caller frees. */
    static long queryOf(Sound clip) throws IOException {
        SoundFormat format = clip.format();
        long query =
                NativeCatalogue.createQuery(format.code(), format.sampleRate(), format.channels());
        boolean finished = false;
        try {
            feed(clip, (bytes, count) -> NativeCatalogue.feedQuery(query, bytes, count));
            NativeCatalogue.finishQuery(query);
            finished = true;
            return query;
        } finally {
            if (!finished) {
                NativeCatalogue.freeQuery(query);
            }
        }
    }

    /** Takes the bytes at the start of a direct buffer. */
    private interface Feeding {
        void feed(ByteBuffer bytes, int count);
    }

    private static void feed(Sound sound, Feeding feeding) throws IOException {
        int frame = sound.format().frameSize();
        byte[] piece = new byte[Math.max(1, PIECE / frame) * frame]; // whole frames
        ByteBuffer direct = ByteBuffer.allocateDirect(piece.length);
        try (InputStream in = sound.open()) {
            for (int count; (count = readSome(in, piece)) >= 0;) {
                direct.clear();
                direct.put(piece, 0, count);
                feeding.feed(direct, count);
            }
        }
    }

    /** Some decoders return 0 bytes while they have none: only -1 is the end. */
    private static int readSome(InputStream in, byte[] piece) throws IOException {
        for (int turn = 0; turn < MOST_TURNS; ++turn) {
            int count = in.read(piece, 0, piece.length);
            if (count != 0) {
                return count;
            }
            pause();
        }
        throw new IOException("The sound's decoder returned no bytes " + MOST_TURNS + " times in a row, "
                + "and did not report the end: convert the file to WAV, or pass the samples");
    }

    private static void pause() throws IOException {
        try {
            Thread.sleep(1);
        } catch (InterruptedException interrupted) {
            Thread.currentThread().interrupt();
            throw new InterruptedIOException("The thread was interrupted while it waited for sound");
        }
    }
}
