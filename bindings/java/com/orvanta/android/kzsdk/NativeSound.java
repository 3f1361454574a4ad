package com.orvanta.android.kzsdk;

import java.io.IOException;
import java.io.InputStream;
import java.nio.ByteBuffer;

/** Sound on its way to the native side, piece by piece: to a trail or a query. */
final class NativeSound {
    private static final int PIECE = 1 << 16;

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
            for (int count; (count = in.read(piece, 0, piece.length)) > 0;) {
                direct.clear();
                direct.put(piece, 0, count);
                feeding.feed(direct, count);
            }
        }
    }
}
