package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertNotEquals;
import static org.junit.Assert.assertThrows;
import static org.junit.Assert.assertTrue;

import org.junit.Test;

public class AudioDescriptionTest {
    @Test
    public void tellsWhatItWasMadeOf() {
        AudioDescription cd = AudioDescription.pcm16(44100, 2);
        assertEquals(44100, cd.sampleRate());
        assertEquals(2, cd.channels());
        assertEquals(1, cd.formatCode());
        assertEquals(16, cd.bitsPerSample());
        assertEquals(4, cd.frameSize());
        assertEquals("16-bit PCM, 44100 Hz, stereo", cd.toString());
        assertEquals("8-bit PCM, 8000 Hz, mono", AudioDescription.pcm8(8000, 1).toString());
        assertEquals("A-law, 8000 Hz, mono", AudioDescription.aLaw(8000, 1).toString());
        assertEquals("mu-law, 8000 Hz, mono", AudioDescription.muLaw(8000, 1).toString());
        assertEquals(1, AudioDescription.muLaw(8000, 1).frameSize());
    }

    @Test
    public void speaksTheWordsOfAWaveHeader() {
        assertEquals(AudioDescription.pcm16(48000, 1), AudioDescription.wave(1, 16, 48000, 1));
        assertEquals(AudioDescription.pcm8(48000, 1), AudioDescription.wave(1, 8, 48000, 1));
        assertEquals(AudioDescription.aLaw(8000, 1), AudioDescription.wave(6, 8, 8000, 1));
        assertEquals(AudioDescription.muLaw(8000, 1), AudioDescription.wave(7, 8, 8000, 1));
    }

    @Test
    public void refusesWhatWouldGiveAWrongFingerprint() {
        for (int[] wave : new int[][] {{1, 24}, {1, 32}, {1, 0}, {3, 32}, {2, 4}, {6, 16}, {17, 4}}) {
            IllegalArgumentException thrown = assertThrows(IllegalArgumentException.class,
                    () -> AudioDescription.wave(wave[0], wave[1], 44100, 2));
            assertTrue(thrown.getMessage(), thrown.getMessage().startsWith("WAVE format "));
        }
    }

    @Test
    public void refusesRatesAndChannelsThatAreNotSupported() {
        for (int rate : new int[] {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000}) {
            assertEquals(rate, AudioDescription.pcm16(rate, 1).sampleRate());
        }
        for (int rate : new int[] {-1, 0, 12000, 96000}) {
            assertThrows(IllegalArgumentException.class, () -> AudioDescription.pcm16(rate, 1));
        }
        for (int channels : new int[] {-1, 0, 3}) {
            assertThrows(IllegalArgumentException.class, () -> AudioDescription.aLaw(8000, channels));
        }
    }

    @Test
    public void equalsAnotherOfTheSameValues() {
        AudioDescription one = AudioDescription.pcm16(44100, 2);
        assertEquals(one.hashCode(), AudioDescription.pcm16(44100, 2).hashCode());
        assertNotEquals(one, AudioDescription.pcm16(44100, 1));
        assertNotEquals(one, AudioDescription.pcm16(48000, 2));
        assertNotEquals(AudioDescription.aLaw(8000, 1), AudioDescription.muLaw(8000, 1));
        assertNotEquals(one, "16-bit PCM, 44100 Hz, stereo");
    }
}
