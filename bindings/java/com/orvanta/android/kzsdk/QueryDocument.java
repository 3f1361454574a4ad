package com.orvanta.android.kzsdk;

import java.util.Arrays;
import java.util.Objects;
import java.util.regex.Matcher;
import java.util.regex.Pattern;

/**
 * A fingerprint as it is sent to a recognition service: a short XML document around 30 numbers.
 * Immutable.
 */
public final class QueryDocument {
    private static final Pattern ROOT =
            Pattern.compile("<KZFPX_FP_QUERY\\s+VERSION=\"([^\"<]*)\"\\s*>(.*)</KZFPX_FP_QUERY\\s*>",
                    Pattern.DOTALL);
    private static final Pattern ALGORITHM =
            Pattern.compile("<ALGORITHM\\s*>(.*)</ALGORITHM\\s*>", Pattern.DOTALL);
    private static final Pattern NAME = Pattern.compile("<NAME\\s*>([^<]*)</NAME\\s*>");
    private static final Pattern VERSION = Pattern.compile("<VERSION\\s*>([^<]*)</VERSION\\s*>");
    private static final Pattern BLOCK =
            Pattern.compile("<FP_BLOCK\\s([^>]*)>([^<]*)</FP_BLOCK\\s*>");
    private static final Pattern COUNT = Pattern.compile("\\bCOUNT=\"(\\d{1,9})\"");

    private final String text;
    private final String documentVersion;
    private final String algorithm;
    private final String algorithmVersion;
    private final short[] values;

    private QueryDocument(String text) {
        this.text = text;
        Matcher root = find(ROOT, text, "root element KZFPX_FP_QUERY");
        documentVersion = root.group(1);
        String about = find(ALGORITHM, root.group(2), "element ALGORITHM").group(1);
        algorithm = find(NAME, about, "element NAME").group(1).trim();
        algorithmVersion = find(VERSION, about, "element VERSION").group(1).trim();
        Matcher block = find(BLOCK, root.group(2), "element FP_BLOCK");
        int count = Integer.parseInt(find(COUNT, block.group(1), "attribute COUNT").group(1));
        values = numbers(block.group(2).trim(), count);
    }

    /**
     * Reads a document.
     *
     * @param text what a job of the library wrote
     * @return the document
     * @throws IllegalArgumentException when the text is no such document; the message says what is
     *     missing
     */
    public static QueryDocument parse(String text) {
        return new QueryDocument(Objects.requireNonNull(text, "text"));
    }

    private static Matcher find(Pattern pattern, String text, String what) {
        Matcher matcher = pattern.matcher(text);
        if (!matcher.find()) {
            throw new IllegalArgumentException("Not a query document: no " + what);
        }
        return matcher;
    }

    private static short[] numbers(String text, int count) {
        String[] words = text.isEmpty() ? new String[0] : text.split(" ");
        if (words.length != count) {
            throw new IllegalArgumentException("Not a query document: " + words.length
                    + " values where COUNT says " + count);
        }
        short[] numbers = new short[count];
        for (int i = 0; i < count; ++i) {
            numbers[i] = number(words[i]);
        }
        return numbers;
    }

    /** The document writes the 16 bits of a value without a sign, from 0 to 65535. */
    private static short number(String word) {
        if (!word.matches("\\d{1,5}") || Integer.parseInt(word) > 0xffff) {
            throw new IllegalArgumentException("Not a query document: value \"" + word + "\"");
        }
        return (short) Integer.parseInt(word);
    }

    /**
     * Returns the document as it is to be sent.
     *
     * @return XML
     */
    public String text() {
        return text;
    }

    /**
     * Returns the version of the document's form.
     *
     * @return for example "1.0"
     */
    public String documentVersion() {
        return documentVersion;
    }

    /**
     * Returns the name of the algorithm.
     *
     * @return for example "Quenvar"
     */
    public String algorithm() {
        return algorithm;
    }

    /**
     * Returns the version of the algorithm.
     *
     * @return for example "1.1"
     */
    public String algorithmVersion() {
        return algorithmVersion;
    }

    /**
     * Returns the fingerprint: the means of 15 bands from low to high, then their spreads.
     *
     * @return a copy of the values, signed
     */
    public short[] values() {
        return values.clone();
    }

    /** Documents are equal when their texts are. */
    @Override
    public boolean equals(Object other) {
        return other instanceof QueryDocument && text.equals(((QueryDocument) other).text);
    }

    @Override
    public int hashCode() {
        return text.hashCode();
    }

    /** Returns algorithm, version and values on one line. */
    @Override
    public String toString() {
        return algorithm + " " + algorithmVersion + " " + Arrays.toString(values);
    }
}
