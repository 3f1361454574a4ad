package com.orvanta.android.kzsdk;

/** Turns a status of libkzsdk into what Java throws, with the library's own sentence. */
final class Statuses {
    // The lower half of a status is its reason.
    private static final int MEMORY = 0x0001;
    private static final int INVALID_ARGUMENT = 0x0004;
    private static final int FIRST_OF_A_SETTING = 0x0010;
    private static final int LAST_OF_A_SETTING = 0x0013;

    private Statuses() {}

    static void check(int status) {
        if (status == 0) {
            return;
        }
        String text = NativeStream.statusText(status);
        int reason = status & 0xffff;
        if (reason == MEMORY) {
            throw new OutOfMemoryError(text);
        }
        if (reason == INVALID_ARGUMENT || reason >= FIRST_OF_A_SETTING && reason <= LAST_OF_A_SETTING) {
            throw new IllegalArgumentException(text);
        }
        throw new IllegalStateException(text);
    }
}
