package com.orvanta.android.kzsdk;

import java.util.AbstractMap.SimpleImmutableEntry;
import java.util.ArrayList;
import java.util.Collections;
import java.util.Date;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;

/** A track of a catalogue, with its tags and sources. Immutable. */
public final class Track {
    private final long[] integers;
    private final List<String> sources = new ArrayList<>();
    private final Map<String, String> tags = new LinkedHashMap<>();
    private final List<Map.Entry<String, String>> allTags = new ArrayList<>();

    Track(long[] integers, byte[][] texts) {
        this.integers = integers;
        int sourceCount = (int) integers[4];
        for (int i = 0; i < sourceCount; ++i) {
            sources.add(Texts.of(texts[i]));
        }
        for (int i = sourceCount; i < texts.length; i += 2) {
            String name = Texts.of(texts[i]);
            String value = Texts.of(texts[i + 1]);
            tags.putIfAbsent(name, value);
            allTags.add(new SimpleImmutableEntry<>(name, value));
        }
    }

    /** Reads and frees a native record; null for none. */
    static Track taken(long track) {
        if (track == 0) {
            return null;
        }
        try {
            long[] integers = new long[5];
            byte[][] texts = NativeCatalogue.track(track, integers);
            return new Track(integers, texts);
        } finally {
            NativeCatalogue.freeTrack(track);
        }
    }

    /**
     * Returns the track's id, which is never given to another one.
     *
     * @return above 0
     */
    public long id() {
        return integers[0];
    }

    /**
     * Returns how long the recording is.
     *
     * @return seconds
     */
    public double seconds() {
        return (double) integers[1] / integers[2];
    }

    /**
     * Returns when the track was added.
     *
     * @return a new object
     */
    public Date added() {
        return new Date(integers[3] * 1000);
    }

    /**
     * Returns the files or other places that the track came from.
     *
     * @return in the order in which they were added; bytes that are no UTF-8 are replaced
     */
    public List<String> sources() {
        return Collections.unmodifiableList(sources);
    }

    /**
     * Returns the tags: "title", "artist" and so on.
     *
     * @return in the order in which they were added; of several with one name the first
     */
    public Map<String, String> tags() {
        return Collections.unmodifiableMap(tags);
    }

    /**
     * Returns every tag, several with one name too: a track may have two artists.
     *
     * @return names and values in the order in which they were added
     */
    public List<Map.Entry<String, String>> allTags() {
        return Collections.unmodifiableList(allTags);
    }

    /**
     * Returns the title.
     *
     * @return null when there is none
     */
    public String title() {
        return tags.get("title");
    }

    /** Returns id, sources and tags on one line. */
    @Override
    public String toString() {
        return "track " + id() + " " + sources + " " + tags;
    }
}
