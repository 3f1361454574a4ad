package com.orvanta.android.kzsdk;

/** Reports that audio gave no fingerprint. */
public final class FingerprintException extends Exception {
    private static final long serialVersionUID = 1L;

    FingerprintException(String message) {
        super(message);
    }
}
