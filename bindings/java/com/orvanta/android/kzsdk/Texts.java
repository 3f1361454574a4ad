package com.orvanta.android.kzsdk;

import java.nio.charset.Charset;
import java.util.Arrays;

/** Texts as the catalogue has them: UTF-8 with a 0 behind it. */
final class Texts {
    private static final Charset UTF_8 = Charset.forName("UTF-8");

    private Texts() {}

    /** @throws IllegalArgumentException for a text that would end early */
    static byte[] bytes(String text, String name) {
        if (text.indexOf('\0') >= 0) {
            throw new IllegalArgumentException("The " + name + " holds the character 0: \""
                    + text.replace('\0', '?') + "\"");
        }
        byte[] bytes = text.getBytes(UTF_8);
        return Arrays.copyOf(bytes, bytes.length + 1);
    }

    /** Null for null. */
    static String of(byte[] bytes) {
        return bytes == null ? null : new String(bytes, UTF_8);
    }
}
