package com.orvanta.android.kzsdk;

import java.io.IOException;
import java.io.InputStream;

/** Samples with their bytes in the other order. */
final class SwappedSamples extends InputStream {
    private final InputStream in;
    /** The start of a sample whose other bytes were not there yet. */
    private final byte[] rest;
    private int restCount;

    /** @param size bytes in a sample */
    SwappedSamples(InputStream in, int size) {
        this.in = in;
        this.rest = new byte[size];
    }

    @Override
    public int read() {
        throw new UnsupportedOperationException("whole samples only");
    }

    /** Returns whole samples; 0 when there is none yet. The array has room for several. */
    @Override
    public int read(byte[] bytes, int offset, int most) throws IOException {
        System.arraycopy(rest, 0, bytes, offset, restCount);
        int more = in.read(bytes, offset + restCount, most - restCount);
        if (more < 0) {
            return atEnd();
        }
        int count = restCount + more;
        restCount = count % rest.length;
        int whole = count - restCount;
        System.arraycopy(bytes, offset + whole, rest, 0, restCount);
        for (int first = 0; first < whole; first += rest.length) {
            swap(bytes, offset + first);
        }
        return whole;
    }

    /** A part of a sample is passed on, as from a file that needs no swapping. */
    private int atEnd() {
        int count = restCount;
        restCount = 0;
        return count > 0 ? count : -1;
    }

    private void swap(byte[] bytes, int first) {
        for (int i = 0; i < rest.length / 2; ++i) {
            int last = first + rest.length - 1 - i;
            byte other = bytes[last];
            bytes[last] = bytes[first + i];
            bytes[first + i] = other;
        }
    }

    @Override
    public void close() throws IOException {
        in.close();
    }
}
