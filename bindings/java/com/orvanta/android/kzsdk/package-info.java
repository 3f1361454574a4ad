/**
 * Fingerprints of audio: 14.22 seconds of sound condensed into 30 numbers, in a short document that
 * a recognition service can be asked with.
 *
 * <p>{@link com.orvanta.android.kzsdk.Fingerprint} is where to start.
 */
package com.orvanta.android.kzsdk;
