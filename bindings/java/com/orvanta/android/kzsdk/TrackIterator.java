package com.orvanta.android.kzsdk;

import java.util.Iterator;
import java.util.NoSuchElementException;

/** Goes through the tracks of a catalogue by their ids; holds nothing open. */
final class TrackIterator implements Iterator<Track> {
    private final Catalogue catalogue;
    private Track next;
    private long last;
    private boolean removable;

    TrackIterator(Catalogue catalogue) {
        this.catalogue = catalogue;
    }

    @Override
    public boolean hasNext() {
        if (next == null) {
            next = catalogue.trackAfter(last);
        }
        return next != null;
    }

    @Override
    public Track next() {
        if (!hasNext()) {
            throw new NoSuchElementException("There are no more tracks");
        }
        Track track = next;
        next = null;
        last = track.id();
        removable = true;
        return track;
    }

    @Override
    public void remove() {
        if (!removable) {
            throw new IllegalStateException("There is no track to remove: call next() first");
        }
        catalogue.remove(last);
        removable = false;
    }
}
