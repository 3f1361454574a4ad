package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertArrayEquals;
import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertTrue;

import java.io.BufferedReader;
import java.io.File;
import java.io.IOException;
import java.io.InputStreamReader;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.Collections;
import java.util.List;
import java.util.Locale;
import javax.sound.sampled.AudioInputStream;
import javax.sound.sampled.AudioSystem;
import org.junit.Rule;
import org.junit.Test;
import org.junit.rules.TemporaryFolder;

/** What Java makes of sound files is what the program kzfp makes of them. */
public class SameAnswersTest {
    @Rule public final TemporaryFolder folder = new TemporaryFolder();

    private static final String KZFP = System.getProperty("kzfp");

    private static List<String> clips() {
        String[] names = new File(System.getProperty("clips")).list((place, name) ->
                name.matches("music-(8000|11025|16000|44100)-(mono|stereo)-(s16|alaw|ulaw)\\.wav")
                        || name.equals("music-24bit.wav"));
        Arrays.sort(names);
        List<String> clips = new ArrayList<>();
        for (String name : names) {
            clips.add(System.getProperty("clips") + "/" + name);
        }
        assertTrue(clips.size() + " clips", clips.size() >= 10);
        return clips;
    }

    private static List<String> lines(String first, List<String> others, String... command)
            throws IOException, InterruptedException {
        List<String> words = new ArrayList<>();
        words.add(KZFP);
        words.addAll(Arrays.asList(command));
        if (first != null) {
            words.add(first);
        }
        words.addAll(others);
        Process process =
                new ProcessBuilder(words).redirectError(ProcessBuilder.Redirect.INHERIT).start();
        List<String> lines = new ArrayList<>();
        try (BufferedReader in = new BufferedReader(
                new InputStreamReader(process.getInputStream(), "UTF-8"))) {
            for (String line; (line = in.readLine()) != null;) {
                lines.add(line);
            }
        }
        assertEquals(0, process.waitFor());
        return lines;
    }

    private static QueryDocument document(String file) throws Exception {
        Sound sound = Sound.file(file);
        try (AudioInputStream in = AudioSystem.getAudioInputStream(new File(file));
                StreamingFingerprint stream = new StreamingFingerprint(sound.format())) {
            byte[] piece = new byte[sound.format().frameSize() * 777];
            int count;
            while ((count = in.read(piece)) > 0 && !stream.feed(piece, 0, count)) {
                // feed on
            }
            stream.finish();
            return stream.completion().get();
        }
    }

    @Test
    public void streamsGiveTheValuesOfKzfp() throws Exception {
        List<String> clips = clips();
        List<String> expected = lines(null, clips, "--format", "values");
        for (int i = 0; i < clips.size(); ++i) {
            short[] values = new short[30];
            String[] words = expected.get(i).trim().split("[ ,]+");
            for (int j = 0; j < 30; ++j) {
                values[j] = Short.parseShort(words[j]);
            }
            assertArrayEquals(clips.get(i), values, document(clips.get(i)).values());
        }
    }

    private static String number(double value) {
        return String.format(Locale.ROOT, "%.4f", value);
    }

    /** A line as kzfp writes it, without what it alone has. */
    private static String line(String file, Recognition result) {
        String line = file + "," + result.verdict().name().toLowerCase(Locale.ROOT).replace('_', ' ');
        Match match = result.best();
        if (match == null) {
            return line;
        }
        for (double value : new double[] {match.clipBegin(), match.clipEnd()}) {
            line += "," + number(value);
        }
        line += "," + match.track() + "," + match.source() + "," + match.title();
        for (double value : new double[] {match.offset(), match.score(), match.threshold(),
                 match.speed(), match.tempo(), match.pitch()}) {
            line += "," + number(value);
        }
        return line;
    }

    /** The same columns of a line of kzfp: without the line, the artist and how sure it is. */
    private static String line(String ofKzfp) {
        List<String> words = new ArrayList<>(Arrays.asList(ofKzfp.split(",")));
        if (words.size() > 10) {
            words.remove(10);
            words.remove(8);
        }
        words.remove(1);
        return String.join(",", words);
    }

    @Test
    public void catalogueAnswersAreThoseOfKzfp() throws Exception {
        List<String> clips = clips();
        String music = System.getProperty("music");
        String byJava = new File(folder.getRoot(), "java.kzc").getPath();
        String byKzfp = new File(folder.getRoot(), "kzfp.kzc").getPath();
        lines(byKzfp, Collections.singletonList(music), "add", "--quiet");
        try (Catalogue catalogue = Catalogue.create(byJava)) {
            catalogue.add(Sound.file(music), music, Collections.singletonMap("title", "music"));
        }
        List<String> expected = lines(byKzfp, clips, "match", "--format", "csv");
        try (Catalogue catalogue = Catalogue.open(byJava)) {
            for (int i = 0; i < clips.size(); ++i) {
                assertEquals(line(expected.get(i + 1)),
                        line(clips.get(i), catalogue.match(Sound.file(clips.get(i)))));
            }
        }
        assertEquals("kzfp reads what Java wrote", expected,
                lines(byJava, clips, "match", "--format", "csv"));
    }
}
