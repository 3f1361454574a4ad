package com.orvanta.android.kzsdk;

/**
 * Something native that is freed once, and not before the last call that uses it has returned.
 * Every call is between {@link #enter} and {@link #leave}; {@link #close} never waits.
 */
final class NativeHandle {
    /** Frees what is behind a number. */
    interface Freeing {
        void free(long number);
    }

    private final String name;
    private final Freeing freeing;
    private final long number;
    private int users;
    private boolean closed;

    /** @param name what messages call it, for example "catalogue" */
    NativeHandle(String name, long number, Freeing freeing) {
        this.name = name;
        this.number = number;
        this.freeing = freeing;
    }

    /** Returns the number, which stays valid until {@link #leave}. */
    synchronized long enter() {
        if (closed) {
            throw new IllegalStateException("This " + name + " is closed");
        }
        ++users;
        return number;
    }

    void leave() {
        boolean last;
        synchronized (this) {
            --users;
            last = closed && users == 0;
        }
        if (last) {
            freeing.free(number);
        }
    }

    /** Refuses new calls, and frees at once or when the last user leaves. */
    void close() {
        boolean last;
        synchronized (this) {
            last = !closed && users == 0;
            closed = true;
        }
        if (last) {
            freeing.free(number);
        }
    }
}
