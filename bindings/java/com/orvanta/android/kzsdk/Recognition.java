package com.orvanta.android.kzsdk;

import java.util.ArrayList;
import java.util.Collections;
import java.util.Iterator;
import java.util.List;

/** What was concluded about a clip. Immutable; a loop over it gives its matches, best first. */
public final class Recognition implements Iterable<Match> {
    /** What was concluded. */
    public enum Verdict {
        /** At least one track reached its threshold. */
        MATCH,
        /** No track did, nor came near. */
        NO_MATCH,
        /** The best track came near; {@link Recognition#candidates} has it. */
        NOT_SURE,
        /** The clip is too quiet or too short to say anything. */
        TOO_QUIET
    }

    private final long[] integers;
    private final double[] reals;
    private final List<Match> matches;
    private final List<Match> candidates;

    private Recognition(long[] integers, double[] reals, List<Match> matches, List<Match> candidates) {
        this.integers = integers;
        this.reals = reals;
        this.matches = Collections.unmodifiableList(matches);
        this.candidates = Collections.unmodifiableList(candidates);
    }

    /** Reads and frees a native result. */
    static Recognition taken(long result) {
        try {
            long[] integers = new long[4];
            double[] reals = new double[2];
            NativeCatalogue.summary(result, integers, reals);
            return new Recognition(integers, reals, matches(result, false, integers[1]),
                    matches(result, true, integers[2]));
        } finally {
            NativeCatalogue.freeResult(result);
        }
    }

    private static List<Match> matches(long result, boolean candidates, long count) {
        List<Match> matches = new ArrayList<>();
        for (long place = 0; place < count; ++place) {
            long[] integers = new long[3];
            double[] reals = new double[8];
            byte[][] texts = NativeCatalogue.match(result, candidates, place, integers, reals);
            matches.add(new Match(integers, reals, texts));
        }
        return matches;
    }

    /**
     * Returns what was concluded.
     *
     * @return never null
     */
    public Verdict verdict() {
        return Verdict.values()[(int) integers[0] - 1];
    }

    /**
     * Returns the tracks that reached their threshold, best first.
     *
     * @return empty unless the verdict is a match
     */
    public List<Match> matches() {
        return matches;
    }

    /**
     * Returns the best tracks whatever their score, best first.
     *
     * @return as many as the options ask for, as far as there are any
     */
    public List<Match> candidates() {
        return candidates;
    }

    /**
     * Returns the best match.
     *
     * @return null unless the verdict is a match
     */
    public Match best() {
        return matches.isEmpty() ? null : matches.get(0);
    }

    /**
     * Returns the score of the second best track.
     *
     * @return 0 when there is none
     */
    public double runnerUp() {
        return reals[0];
    }

    /**
     * Returns how long the clip is.
     *
     * @return seconds; 0 for a document, which does not say
     */
    public double clipSeconds() {
        return reals[1];
    }

    /**
     * Returns how many tracks were not looked through because they are damaged.
     *
     * @return 0 at best; {@link Catalogue#verify} says which
     */
    public long leftOut() {
        return integers[3];
    }

    @Override
    public Iterator<Match> iterator() {
        return matches.iterator();
    }

    /** Returns the verdict, and the best match if there is one. */
    @Override
    public String toString() {
        String name = verdict().toString().toLowerCase(java.util.Locale.ROOT).replace('_', ' ');
        return matches.isEmpty() ? name : name + ": " + best();
    }
}
