package com.orvanta.android.kzsdk;

import java.util.Locale;

/** A track in which a clip was found, and where. Immutable. */
public final class Match {
    private final long[] integers;
    private final double[] reals;
    private final byte[][] texts;

    Match(long[] integers, double[] reals, byte[][] texts) {
        this.integers = integers;
        this.reals = reals;
        this.texts = texts;
    }

    /**
     * Returns the track's id.
     *
     * @return for {@link Catalogue#track(long)}
     */
    public long track() {
        return integers[0];
    }

    /**
     * Returns the path or other text that the track was added with.
     *
     * @return of its first source; empty when the track has gone since
     */
    public String source() {
        return Texts.of(texts[0]);
    }

    /**
     * Returns the track's title.
     *
     * @return null when it has none
     */
    public String title() {
        return Texts.of(texts[1]);
    }

    /**
     * Returns the track's artist.
     *
     * @return null when it has none
     */
    public String artist() {
        return Texts.of(texts[2]);
    }

    /**
     * Returns how sure the match is: for sound in deviations of chance; for a document minus its
     * distance.
     *
     * @return higher is surer
     */
    public double score() {
        return reals[0];
    }

    /**
     * Returns the score that a match had to reach in this catalogue.
     *
     * @return it grows with the catalogue
     */
    public double threshold() {
        return reals[1];
    }

    /**
     * Returns where in the track the clip begins.
     *
     * @return seconds; negative when the clip began before the track
     */
    public double offset() {
        return reals[2];
    }

    /**
     * Returns by how much pitch and tempo were changed alike, as by a record player.
     *
     * @return 1.05 is 5 % faster
     */
    public double speed() {
        return reals[3];
    }

    /**
     * Returns by how much faster the clip runs, whatever its pitch.
     *
     * @return 1 when it was not changed
     */
    public double tempo() {
        return reals[4];
    }

    /**
     * Returns how many times the track's frequencies are the clip's.
     *
     * @return 1 when they were not changed
     */
    public double pitch() {
        return reals[5];
    }

    /**
     * Returns where in the clip the part begins that was found.
     *
     * @return seconds
     */
    public double clipBegin() {
        return reals[6];
    }

    /**
     * Returns where in the clip the part ends that was found.
     *
     * @return seconds
     */
    public double clipEnd() {
        return reals[7];
    }

    /**
     * Returns whether 30 numbers agree but not closely: a hint, no more.
     *
     * @return always false for sound
     */
    public boolean isWeak() {
        return integers[2] != 0;
    }

    /** Returns track, place and score on one line. */
    @Override
    public String toString() {
        String name = title() != null ? title() + " (" + source() + ")" : source();
        return String.format(Locale.ROOT, "%s at %.1f s (score %.1f, %.1f needed)", name,
                Math.round(offset() * 10) / 10.0, score(), threshold());
    }
}
