package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertArrayEquals;
import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertNotEquals;
import static org.junit.Assert.assertThrows;
import static org.junit.Assert.assertTrue;

import org.junit.Test;

public class QueryDocumentTest {
    private static final String TEXT = "<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n"
            + "<KZFPX_FP_QUERY VERSION=\"1.0\">\n  <ALGORITHM>\n    <NAME>Quenvar</NAME>\n"
            + "    <VERSION>1.1</VERSION>\n    <QUERY>Quenvar&quot;1.1</QUERY>\n  </ALGORITHM>\n"
            + "  <FP_BLOCKS>\n    <FP_BLOCK TYPE=\"SIGNED_INT_16\" COUNT=\"4\" ENCODING=\"ASCII\" "
            + "SEPARATOR=\" \">0 32767 32768 65535</FP_BLOCK>\n  </FP_BLOCKS>\n</KZFPX_FP_QUERY>\n";

    private static void assertRefused(String text, String reason) {
        IllegalArgumentException thrown =
                assertThrows(IllegalArgumentException.class, () -> QueryDocument.parse(text));
        assertTrue(thrown.getMessage(), thrown.getMessage().contains(reason));
    }

    @Test
    public void givesItsPartsAndSignedValues() {
        QueryDocument document = QueryDocument.parse(TEXT);
        assertEquals(TEXT, document.text());
        assertEquals("1.0", document.documentVersion());
        assertEquals("Quenvar", document.algorithm());
        assertEquals("1.1", document.algorithmVersion());
        assertArrayEquals(new short[] {0, 32767, -32768, -1}, document.values());
        assertEquals("Quenvar 1.1 [0, 32767, -32768, -1]", document.toString());
    }

    @Test
    public void keepsItsValuesToItself() {
        QueryDocument document = QueryDocument.parse(TEXT);
        document.values()[0] = 7;
        assertEquals(0, document.values()[0]);
    }

    @Test
    public void namesWhatIsMissing() {
        assertRefused("", "KZFPX_FP_QUERY");
        assertRefused(TEXT.substring(0, 300), "KZFPX_FP_QUERY"); // cut
        assertRefused(TEXT.replace("ALGORITHM", "OTHER"), "ALGORITHM");
        assertRefused(TEXT.replace("NAME>", "OTHER>"), "NAME");
        assertRefused(TEXT.replace("FP_BLOCK ", "OTHER "), "FP_BLOCK");
        assertRefused(TEXT.replace("COUNT", "OTHER"), "COUNT");
        assertThrows(NullPointerException.class, () -> QueryDocument.parse(null));
    }

    @Test
    public void refusesValuesThatAreNoneOrTooFew() {
        assertRefused(TEXT.replace("COUNT=\"4\"", "COUNT=\"5\""), "4 values where COUNT says 5");
        assertRefused(TEXT.replace("65535", "65536"), "65536");
        assertRefused(TEXT.replace("65535", "-1"), "-1");
        assertRefused(TEXT.replace("65535", "six"), "six");
    }

    @Test
    public void equalsAnotherOfTheSameText() {
        assertEquals(QueryDocument.parse(TEXT), QueryDocument.parse(TEXT));
        assertEquals(QueryDocument.parse(TEXT).hashCode(), QueryDocument.parse(TEXT).hashCode());
        assertNotEquals(QueryDocument.parse(TEXT), QueryDocument.parse(TEXT.replace("65535", "1")));
        assertNotEquals(QueryDocument.parse(TEXT), TEXT);
    }
}
