package com.orvanta.android.kzsdk;

/** Something that is wrong in a catalogue. */
public final class CatalogueFault {
    private final long track;
    private final String text;

    CatalogueFault(long track, String text) {
        this.track = track;
        this.text = text;
    }

    /**
     * Returns the track's id.
     *
     * @return 0 when no single track is concerned
     */
    public long track() {
        return track;
    }

    /**
     * Returns what is wrong.
     *
     * @return a sentence
     */
    public String text() {
        return text;
    }

    @Override
    public String toString() {
        return text;
    }
}
