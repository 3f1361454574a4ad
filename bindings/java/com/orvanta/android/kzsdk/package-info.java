/**
 * Recognition of audio. A {@link com.orvanta.android.kzsdk.Catalogue} keeps what recordings sound
 * like, and names a clip from anywhere in one of them. A {@link
 * com.orvanta.android.kzsdk.Fingerprint} condenses 14.22 seconds of sound into 30 numbers, in a
 * short document that a recognition service can be asked with; a {@link
 * com.orvanta.android.kzsdk.StreamingFingerprint} does so while the sound is still coming.
 */
package com.orvanta.android.kzsdk;
