package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertFalse;
import static org.junit.Assert.assertTrue;

import java.io.ByteArrayOutputStream;
import java.io.File;
import java.io.IOException;
import java.io.InputStream;
import java.nio.file.Files;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.Collections;
import java.util.List;
import org.junit.Rule;
import org.junit.Test;
import org.junit.rules.TemporaryFolder;

/** How the native libraries are found, in VMs of their own. */
public class NativeLibraryTest {
    @Rule public final TemporaryFolder folder = new TemporaryFolder();

    /** What each VM runs. */
    public static final class Program {
        private Program() {}

        public static void main(String[] arguments) throws Exception {
            for (int attempt = 0; attempt < 2; ++attempt) {
                try (Catalogue music = Catalogue.inMemory()) {
                    music.add(Tunes.sound(1, 0, 20), "tune", Collections.emptyMap());
                    System.out.println(music.match(Tunes.sound(1, 4, 10)).verdict());
                } catch (UnsatisfiedLinkError missing) {
                    System.out.println(missing.getMessage());
                }
            }
        }
    }

    /** Runs the program with a jar, and a folder for temporary files of its own. */
    private List<String> run(String jar, String... options) throws Exception {
        List<String> words = new ArrayList<>();
        words.add(System.getProperty("java.home") + "/bin/java");
        words.addAll(Arrays.asList("-Xcheck:jni", "-Xmx256m", "-XX:+UseSerialGC", "-XX:-UsePerfData"));
        words.add("-Djava.library.path=" + folder.getRoot());
        words.add("-Djava.io.tmpdir=" + folder.getRoot());
        words.addAll(Arrays.asList(options));
        words.addAll(Arrays.asList("-cp", jar + ":" + System.getProperty("tests"),
                Program.class.getName()));
        Process process = new ProcessBuilder(words).redirectErrorStream(true).start();
        String output = read(process.getInputStream());
        process.waitFor();
        return Arrays.asList(output.split("\n"));
    }

    private static String read(InputStream in) throws IOException {
        ByteArrayOutputStream bytes = new ByteArrayOutputStream();
        for (int next; (next = in.read()) >= 0;) {
            bytes.write(next);
        }
        return bytes.toString("UTF-8");
    }

    private void expectNothingLeft() {
        assertEquals(Collections.emptyList(), Arrays.asList(folder.getRoot().list()));
    }

    @Test
    public void theJarForDesktopsNeedsNothingElse() throws Exception {
        assertEquals(Arrays.asList("MATCH", "MATCH"), run(System.getProperty("desktop")));
        expectNothingLeft();
    }

    @Test
    public void whereNoLibraryIsFoundTheMessageSaysWhatHelps() throws Exception {
        List<String> lines = run(System.getProperty("plain"));
        assertEquals(2, lines.size());
        for (String line : lines) {
            assertTrue(line, line.contains("libkzsdk.so") && line.contains("kzsdk-desktop.jar")
                    && line.contains("-Dkzsdk.library=") && line.contains(BundledLibrary.platform()));
        }
        expectNothingLeft();
    }

    @Test
    public void theNamedFileWins() throws Exception {
        File named = new File(folder.getRoot(), "named.so");
        for (String property : new String[] {"kzsdk.library", "kzcat.library"}) {
            String line = run(System.getProperty("desktop"), "-D" + property + "=" + named).get(0);
            assertTrue(line, line.contains("-D" + property + "=" + named + " names a file"));
        }
        List<String> lines = run(System.getProperty("plain"),
                "-Dkzsdk.library=" + System.getProperty("kzsdk.library"),
                "-Dkzcat.library=" + System.getProperty("kzcat.library"));
        assertEquals(Arrays.asList("MATCH", "MATCH"), lines);
    }

    @Test
    public void aLibraryOfAnotherVersionIsRefused() throws Exception {
        File found = new File(folder.getRoot(), "libkzsdk.so");
        Files.copy(new File(System.getProperty("other")).toPath(), found.toPath());
        for (String line : run(System.getProperty("desktop"))) {
            assertTrue(line, line.contains("libkzsdk.so that was found is of version 0.9.7")
                    && line.contains("These classes are of version " + Version.TEXT)
                    && line.contains("-Dkzsdk.library="));
        }
        String named = run(System.getProperty("plain"), "-Dkzsdk.library=" + found).get(0);
        assertTrue(named, named.contains("is of version 0.9.7"));
    }

    @Test
    public void aLibraryWithoutAVersionIsRefused() throws Exception {
        Files.copy(new File(System.getProperty("scripted")).toPath(),
                new File(folder.getRoot(), "libkzsdk.so").toPath());
        List<String> lines = run(System.getProperty("desktop"));
        for (String line : lines.subList(lines.size() - 2, lines.size())) {
            assertTrue(line, line.contains("libkzsdk.so that was found is older")
                    && line.contains(Version.TEXT));
        }
    }

    @Test
    public void librariesFitThatDifferInTheirPatch() {
        String series = Version.TEXT.substring(0, Version.TEXT.lastIndexOf('.'));
        assertTrue(Version.fits(Version.TEXT));
        assertTrue(Version.fits(series + ".77"));
        assertTrue(Version.fits(series));
        for (String other : new String[] {series + "1.0", "9.0.0", "0.9.7", "", "1"}) {
            assertFalse(other, Version.fits(other));
        }
    }

    @Test
    public void aFolderThatCannotBeWrittenIsNamed() throws Exception {
        String nowhere = folder.getRoot() + "/nowhere";
        String line = run(System.getProperty("desktop"), "-Djava.io.tmpdir=" + nowhere).get(0);
        assertTrue(line, line.contains(nowhere) && line.contains("-Djava.io.tmpdir="));
    }
}
