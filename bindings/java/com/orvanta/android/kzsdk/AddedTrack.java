package com.orvanta.android.kzsdk;

/** What became of a track that was to be added. */
public final class AddedTrack {
    private final long[] numbers;

    AddedTrack(long[] numbers) {
        this.numbers = numbers;
    }

    /**
     * Returns the track's id.
     *
     * @return above 0
     */
    public long track() {
        return numbers[0];
    }

    /**
     * Returns whether the catalogue did not have this recording before.
     *
     * @return false when the track that has it got one source more
     */
    public boolean isNew() {
        return numbers[1] != 0;
    }
}
