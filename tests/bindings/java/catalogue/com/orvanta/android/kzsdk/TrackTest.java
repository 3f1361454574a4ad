package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;

import java.nio.charset.StandardCharsets;
import java.util.Collections;
import org.junit.Test;

/** A track's record, as the native side fills it. */
public class TrackTest {
    private static Track track(String... words) {
        byte[][] texts = new byte[words.length][];
        for (int i = 0; i < words.length; ++i) {
            texts[i] = words[i].getBytes(StandardCharsets.UTF_8);
        }
        return new Track(new long[] {1, 0, 44100, 0, 1}, texts);
    }

    @Test
    public void ofTagsWithOneNameTheFirstCounts() {
        Track track = track("a.flac", "artist", "First", "title", "Song", "artist", "Second", "title", "");
        assertEquals(Collections.singletonList("a.flac"), track.sources());
        assertEquals("{artist=First, title=Song}", track.tags().toString());
        assertEquals("Song", track.title());
        assertEquals("[artist=First, title=Song, artist=Second, title=]", track.allTags().toString());
    }
}
