package com.orvanta.android.kzsdk;

import java.io.File;
import java.io.FileNotFoundException;
import java.io.IOException;
import java.io.InputStream;
import java.nio.ByteOrder;
import java.util.Arrays;
import java.util.List;
import javax.sound.sampled.AudioFormat;
import javax.sound.sampled.AudioInputStream;
import javax.sound.sampled.AudioSystem;
import javax.sound.sampled.UnsupportedAudioFileException;

/** A sound file as the Java platform reads it. */
final class SoundFile extends Sound {
    private final File file;

    SoundFile(File file) throws IOException {
        super(formatOf(file));
        this.file = file;
    }

    private static SoundFormat formatOf(File file) throws IOException {
        try (AudioInputStream in = opened(file)) {
            AudioFormat format = in.getFormat();
            SoundFormat.Encoding encoding = encodingOf(format);
            if (encoding == null) {
                throw new IOException(file + " has samples that cannot be used: " + format
                        + ". Convert the file to 16-bit PCM");
            }
            return SoundFormat.of(encoding, Math.round(format.getSampleRate()), format.getChannels());
        }
    }

    private static AudioInputStream opened(File file) throws IOException {
        if (!file.isFile()) {
            throw new FileNotFoundException("There is no file " + file);
        }
        OpenCatalogues.refuse(file);
        try {
            return AudioSystem.getAudioInputStream(file);
        } catch (UnsupportedAudioFileException unknown) {
            throw new IOException(file + " is in no format that this Java reads (WAV, AIFF, AU): "
                    + "convert it, add a javax.sound.sampled provider for its format, or pass "
                    + "the samples of a decoder", unknown);
        }
    }

    /** Null for what cannot be used. */
    private static SoundFormat.Encoding encodingOf(AudioFormat format) {
        AudioFormat.Encoding encoding = format.getEncoding();
        int bits = format.getSampleSizeInBits();
        if (encoding.equals(AudioFormat.Encoding.PCM_SIGNED)) {
            return bits == 16 ? SoundFormat.Encoding.PCM16 : bits == 24 ? SoundFormat.Encoding.PCM24
                    : bits == 32 ? SoundFormat.Encoding.PCM32 : null;
        }
        if (encoding.equals(AudioFormat.Encoding.PCM_FLOAT)) {
            return bits == 32 ? SoundFormat.Encoding.FLOAT32
                    : bits == 64 ? SoundFormat.Encoding.FLOAT64 : null;
        }
        List<AudioFormat.Encoding> ofEightBits = Arrays.asList(AudioFormat.Encoding.PCM_UNSIGNED,
                AudioFormat.Encoding.ALAW, AudioFormat.Encoding.ULAW);
        SoundFormat.Encoding[] same = {SoundFormat.Encoding.UNSIGNED8, SoundFormat.Encoding.A_LAW,
            SoundFormat.Encoding.MU_LAW};
        int place = ofEightBits.indexOf(encoding);
        return bits == 8 && place >= 0 ? same[place] : null;
    }

    @Override
    InputStream open() throws IOException {
        AudioInputStream in = opened(file);
        AudioFormat format = in.getFormat();
        boolean otherOrder =
                format.isBigEndian() != (ByteOrder.nativeOrder() == ByteOrder.BIG_ENDIAN);
        int size = format.getSampleSizeInBits() / 8;
        return otherOrder && size > 1 ? new SwappedSamples(in, size) : in;
    }
}
