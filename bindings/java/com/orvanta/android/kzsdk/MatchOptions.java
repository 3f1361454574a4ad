package com.orvanta.android.kzsdk;

/** How a clip is looked up. Immutable: each {@code with} method returns a changed copy. */
public final class MatchOptions {
    /** What is usual: any speed up to 6 % either way, 2 candidates, a single passage. */
    public static final MatchOptions USUAL = new MatchOptions(true, 2, false);

    private final boolean speeds;
    private final int candidates;
    private final boolean passages;

    private MatchOptions(boolean speeds, int candidates, boolean passages) {
        this.speeds = speeds;
        this.candidates = candidates;
        this.passages = passages;
    }

    /**
     * Sets whether the clip is looked for at other speeds, tempi and pitches too. Without them
     * clips that are not found take less time.
     *
     * @param speeds whether
     * @return the changed copy
     */
    public MatchOptions withSpeeds(boolean speeds) {
        return new MatchOptions(speeds, candidates, passages);
    }

    /**
     * Sets how many of the best tracks are reported whatever their score.
     *
     * @param candidates 0 to 1000
     * @return the changed copy
     */
    public MatchOptions withCandidates(int candidates) {
        if (candidates < 0 || candidates > 1000) {
            throw new IllegalArgumentException("There are 0 to 1000 candidates, not " + candidates);
        }
        return new MatchOptions(speeds, candidates, passages);
    }

    /**
     * Sets whether the clip may hold several tracks one after the other.
     *
     * @param passages whether
     * @return the changed copy
     */
    public MatchOptions withPassages(boolean passages) {
        return new MatchOptions(speeds, candidates, passages);
    }

    boolean speeds() {
        return speeds;
    }

    int candidates() {
        return candidates;
    }

    boolean passages() {
        return passages;
    }
}
