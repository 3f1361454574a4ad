package com.orvanta.android.kzsdk;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertFalse;
import static org.junit.Assert.assertNotNull;
import static org.junit.Assert.assertNull;
import static org.junit.Assert.assertThrows;
import static org.junit.Assert.assertTrue;

import java.io.ByteArrayInputStream;
import java.io.File;
import java.io.IOException;
import java.io.RandomAccessFile;
import java.nio.ByteBuffer;
import java.nio.ByteOrder;
import java.nio.file.Files;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.Collections;
import java.util.Iterator;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import java.util.NoSuchElementException;
import java.util.concurrent.ExecutionException;
import javax.sound.sampled.AudioFileFormat;
import javax.sound.sampled.AudioFormat;
import javax.sound.sampled.AudioInputStream;
import javax.sound.sampled.AudioSystem;
import org.junit.Before;
import org.junit.Rule;
import org.junit.Test;
import org.junit.rules.TemporaryFolder;

/** Catalogues from Java: what is kept, what is found, what is refused. */
public class CatalogueTest {
    @Rule public final TemporaryFolder folder = new TemporaryFolder();

    private String path;

    @Before
    public void choosePath() {
        path = new File(folder.getRoot(), "music.kzc").getPath();
    }

    private static Map<String, String> title(String title) {
        return Collections.singletonMap("title", title);
    }

    private static Catalogue ofThreeTunes() throws IOException {
        Catalogue catalogue = Catalogue.inMemory();
        for (int tune = 1; tune <= 3; ++tune) {
            AddedTrack added = catalogue.add(
                    Tunes.sound(tune, 0, 40), "tune " + tune, title("Tune number " + tune));
            assertEquals(tune, added.track());
            assertTrue(added.isNew());
        }
        return catalogue;
    }

    @Test
    public void aClipIsFoundWithItsPlace() throws Exception {
        try (Catalogue music = ofThreeTunes()) {
            Recognition result = music.match(Tunes.sound(2, 17, 10));
            assertEquals(Recognition.Verdict.MATCH, result.verdict());
            assertEquals(1, result.matches().size());
            Match match = result.best();
            assertEquals(2, match.track());
            assertEquals("tune 2", match.source());
            assertEquals("Tune number 2", match.title());
            assertNull(match.artist());
            assertEquals(17.0, match.offset(), 0.1);
            assertEquals(1.0, match.speed(), 0.001);
            assertTrue(match.score() > match.threshold());
            assertEquals(10.0, result.clipSeconds(), 0.1);
            assertFalse(match.isWeak());
            assertTrue(match.toString(), match.toString().startsWith("Tune number 2 (tune 2) at 17.0 s"));
            assertEquals("match: " + match, result.toString());
        }
    }

    @Test
    public void floatsAreFoundLikeShorts() throws Exception {
        try (Catalogue music = ofThreeTunes()) {
            short[] clip = Tunes.play(3, 5, 10);
            Match ofShorts = music.match(Sound.of(Tunes.RATE, 1, clip)).best();
            Match ofFloats = music.match(Sound.of(Tunes.RATE, 1, Tunes.floats(clip))).best();
            assertEquals(ofShorts.toString(), ofFloats.toString());
            assertEquals(ofShorts.score(), ofFloats.score(), 0.0);
        }
    }

    @Test
    public void verdictsAreThoseOfTheLibrary() throws Exception {
        try (Catalogue music = ofThreeTunes()) {
            Recognition unknown = music.match(Tunes.sound(77, 0, 10));
            assertEquals(Recognition.Verdict.NO_MATCH, unknown.verdict());
            assertNull(unknown.best());
            assertEquals("no match", unknown.toString());
            assertFalse(unknown.iterator().hasNext());
            Recognition silence = music.match(Sound.of(8000, 2, new short[160000]));
            assertEquals(Recognition.Verdict.TOO_QUIET, silence.verdict());
        }
    }

    @Test
    public void optionsReachTheLibrary() throws Exception {
        try (Catalogue music = ofThreeTunes()) {
            Sound clip = Tunes.sound(2, 3, 10);
            MatchOptions options = MatchOptions.USUAL.withCandidates(3);
            assertEquals(3, music.match(clip, options).candidates().size());
            assertEquals(0, music.match(clip, options.withCandidates(0)).candidates().size());
            assertEquals(2, music.match(clip).candidates().size());

            short[] one = Tunes.play(1, 0, 20);
            short[] both = Arrays.copyOf(one, 2 * one.length);
            System.arraycopy(Tunes.play(3, 10, 20), 0, both, one.length, one.length);
            Recognition passages = music.match(
                    Sound.of(Tunes.RATE, 1, both), MatchOptions.USUAL.withPassages(true));
            assertEquals(2, passages.matches().size());

            short[] clipped = Tunes.play(2, 5, 12);
            Sound faster = Sound.of((int) (Tunes.RATE * 1.04), 1, clipped);
            assertEquals(1.04, music.match(faster).best().speed(), 0.005);
            assertNull(music.match(faster, MatchOptions.USUAL.withSpeeds(false)).best());
            assertThrows(IllegalArgumentException.class, () -> options.withCandidates(1001));
        }
    }

    @Test
    public void tracksKeepTheirTagsInEveryScript() throws Exception {
        Map<String, String> tags = new LinkedHashMap<>();
        tags.put("title", "Köçekçe — 夜 \uD83C\uDFB5");
        tags.put("artist", "Ännchen");
        String source = "Música/夜 \uD83C\uDFB5.flac";
        try (Catalogue music = Catalogue.create(path)) {
            music.add(Tunes.sound(1, 0, 40), source, tags);
        }
        try (Catalogue music = Catalogue.open(path)) {
            Track track = music.find(source);
            assertEquals(tags, track.tags());
            assertEquals(Collections.singletonList(source), track.sources());
            assertEquals(tags.get("title"), track.title());
            assertEquals(40.0, track.seconds(), 0.01);
            assertTrue(Math.abs(track.added().getTime() - System.currentTimeMillis()) < 600000);
            assertEquals(tags.get("title"), music.match(Tunes.sound(1, 9, 10)).best().title());
            assertEquals(track.toString(), music.track(track.id()).toString());
            assertNull(music.find("nothing"));
            assertNull(music.track(99));
        }
    }

    @Test
    public void aTextWithACharacterZeroIsRefused() throws Exception {
        try (Catalogue music = Catalogue.inMemory()) {
            for (String[] texts : new String[][] {{"a\0b", "t"}, {"a", "t\0"}}) {
                IllegalArgumentException refused = assertThrows(IllegalArgumentException.class,
                        () -> music.add(Tunes.sound(1, 0, 5), texts[0], title(texts[1])));
                assertTrue(refused.getMessage(), refused.getMessage().contains("character 0"));
            }
            assertEquals(0, music.size());
        }
        assertThrows(IllegalArgumentException.class, () -> Catalogue.open(path + "\0"));
    }

    @Test
    public void theSameRecordingIsOneTrack() throws Exception {
        try (Catalogue music = ofThreeTunes()) {
            AddedTrack again =
                    music.add(Tunes.sound(2, 0, 40), "copy of 2", Collections.emptyMap());
            assertFalse(again.isNew());
            assertEquals(2, again.track());
            assertEquals(Arrays.asList("tune 2", "copy of 2"), music.track(2).sources());
            music.remove("tune 2");
            assertEquals(Collections.singletonList("copy of 2"), music.track(2).sources());
            music.remove("copy of 2");
            assertNull(music.track(2));
        }
    }

    @Test
    public void aLoopGoesThroughAllTracks() throws Exception {
        try (Catalogue music = ofThreeTunes()) {
            List<Long> seen = new ArrayList<>();
            for (Track track : music) {
                seen.add(track.id());
            }
            assertEquals(Arrays.asList(1L, 2L, 3L), seen);
            Iterator<Track> tracks = music.iterator();
            assertThrows(IllegalStateException.class, tracks::remove);
            tracks.next();
            tracks.remove();
            assertThrows(IllegalStateException.class, tracks::remove);
            assertEquals(2, tracks.next().id());
            assertEquals(2, music.size());
            tracks.next();
            assertThrows(NoSuchElementException.class, tracks::next);
        }
    }

    @Test
    public void failuresHaveAReasonAndASentence() throws Exception {
        CatalogueException missing =
                assertThrows(CatalogueException.class, () -> Catalogue.open(path));
        assertEquals(CatalogueException.Reason.CANNOT_OPEN, missing.reason());
        assertTrue(missing.getMessage(), missing.getMessage().contains(path));
        Catalogue.create(path).close();
        try (Catalogue reading = Catalogue.open(path)) {
            CatalogueException readOnly = assertThrows(CatalogueException.class,
                    () -> reading.add(Tunes.sound(1, 0, 10), "a", Collections.emptyMap()));
            assertEquals(CatalogueException.Reason.READ_ONLY, readOnly.reason());
            CatalogueException none =
                    assertThrows(CatalogueException.class, () -> reading.remove(5));
            assertEquals(CatalogueException.Reason.READ_ONLY, none.reason());
        }
        try (Catalogue writing = Catalogue.openForWriting(path)) {
            CatalogueException none =
                    assertThrows(CatalogueException.class, () -> writing.remove("none"));
            assertEquals(CatalogueException.Reason.NOT_FOUND, none.reason());
            CatalogueException empty = assertThrows(CatalogueException.class,
                    () -> writing.add(Sound.of(8000, 1, new short[10]), "a", Collections.emptyMap()));
            assertEquals(CatalogueException.Reason.INVALID_ARGUMENT, empty.reason());
            CatalogueException rate = assertThrows(CatalogueException.class,
                    () -> writing.match(QueryDocument.parse(Documents.WRONG)));
            assertEquals(CatalogueException.Reason.NOT_READABLE, rate.reason());
        }
    }

    @Test
    public void damageIsReportedByVerify() throws Exception {
        try (Catalogue music = Catalogue.create(path)) {
            music.add(Tunes.sound(1, 0, 40), "tune 1", Collections.emptyMap());
            assertEquals(Collections.emptyList(), music.verify());
            assertEquals(Collections.emptyList(), music.verifyAsync().get());
        }
        try (RandomAccessFile file = new RandomAccessFile(path, "rw")) {
            for (long place = 4096; place < file.length(); place += 512) { // behind the schema
                file.seek(place + 256);
                file.write(new byte[] {99, 99, 99, 99});
            }
        }
        try (Catalogue music = Catalogue.open(path)) {
            List<CatalogueFault> faults = music.verify();
            assertFalse(faults.isEmpty());
            assertFalse(faults.get(0).text().isEmpty());
        } catch (CatalogueException damaged) {
            assertEquals(CatalogueException.Reason.DAMAGED, damaged.reason());
        }
    }

    @Test
    public void mergingTakesWhatIsNew() throws Exception {
        try (Catalogue music = ofThreeTunes(); Catalogue other = Catalogue.inMemory()) {
            other.add(Tunes.sound(2, 0, 40), "elsewhere", Collections.emptyMap());
            other.add(Tunes.sound(4, 0, 40), "tune 4", title("Tune number 4"));
            assertEquals(1, music.merge(other));
            assertEquals(0, music.merge(other));
            assertEquals("Tune number 4", music.find("tune 4").title());
            assertEquals(Arrays.asList("tune 2", "elsewhere"), music.track(2).sources());
            assertThrows(CatalogueException.class, () -> music.merge(music));
        }
    }

    private File write(String name, AudioFormat format, byte[] bytes, AudioFileFormat.Type type)
            throws IOException {
        File file = folder.newFile(name);
        try (AudioInputStream in = new AudioInputStream(new ByteArrayInputStream(bytes), format,
                bytes.length / format.getFrameSize())) {
            AudioSystem.write(in, type, file);
        }
        return file;
    }

    private static byte[] bytesOf(short[] samples, ByteOrder order) {
        ByteBuffer bytes = ByteBuffer.allocate(2 * samples.length).order(order);
        bytes.asShortBuffer().put(samples);
        return bytes.array();
    }

    @Test
    public void soundFilesOfEitherByteOrderAreRead() throws Exception {
        short[] clip = Tunes.play(2, 11, 10);
        AudioFormat little = new AudioFormat(Tunes.RATE, 16, 1, true, false);
        AudioFormat big = new AudioFormat(Tunes.RATE, 16, 1, true, true);
        File wav = write("clip.wav", little, bytesOf(clip, ByteOrder.LITTLE_ENDIAN),
                AudioFileFormat.Type.WAVE);
        File aiff = write("clip.aiff", big, bytesOf(clip, ByteOrder.BIG_ENDIAN),
                AudioFileFormat.Type.AIFF);
        try (Catalogue music = ofThreeTunes()) {
            String expected = music.match(Sound.of(Tunes.RATE, 1, clip)).toString();
            assertEquals(expected, music.match(Sound.file(wav)).toString());
            assertEquals(expected, music.match(Sound.file(aiff.getPath())).toString());
            assertEquals(expected, music.matchAsync(Sound.file(wav)).get().toString());
            assertTrue(music.add(wav).isNew());
            assertNotNull(music.find(wav.getPath()));
        }
    }

    @Test
    public void soundFilesThatCannotBeReadSayWhy() throws Exception {
        IOException missing =
                assertThrows(IOException.class, () -> Sound.file("/nowhere/clip.wav"));
        assertTrue(missing.getMessage(), missing.getMessage().contains("/nowhere/clip.wav"));
        File text = folder.newFile("text.wav");
        Files.write(text.toPath(), "no sound at all, no sound at all".getBytes("UTF-8"));
        IOException unknown = assertThrows(IOException.class, () -> Sound.file(text));
        assertTrue(unknown.getMessage(), unknown.getMessage().contains("convert it"));
        File vanishing = write("gone.wav", new AudioFormat(8000, 16, 1, true, false),
                new byte[16000], AudioFileFormat.Type.WAVE);
        Sound gone = Sound.file(vanishing);
        assertTrue(vanishing.delete());
        try (Catalogue music = Catalogue.inMemory()) {
            assertThrows(IOException.class, () -> music.match(gone));
            ExecutionException later =
                    assertThrows(ExecutionException.class, () -> music.matchAsync(gone).get());
            assertTrue(later.getCause() instanceof IOException);
        }
    }

    @Test
    public void aClosedCatalogueSaysSo() throws Exception {
        Catalogue music = ofThreeTunes();
        music.close();
        music.close();
        IllegalStateException closed = assertThrows(
                IllegalStateException.class, () -> music.match(Tunes.sound(1, 0, 10)));
        assertEquals("This catalogue is closed", closed.getMessage());
        assertThrows(IllegalStateException.class, music::size);
        assertThrows(IllegalStateException.class, () -> music.iterator().hasNext());
        assertThrows(IllegalStateException.class,
                () -> music.add(Tunes.sound(1, 0, 10), "a", Collections.emptyMap()));
        ExecutionException later = assertThrows(ExecutionException.class,
                () -> music.matchAsync(Tunes.sound(1, 0, 10)).get());
        assertTrue(later.getCause() instanceof IllegalStateException);
    }

    /** Documents that no library wrote. */
    private static final class Documents {
        static final String WRONG = "<KZFPX_FP_QUERY VERSION=\"1\"><ALGORITHM><NAME>x</NAME>"
                + "<VERSION>1</VERSION></ALGORITHM><FP_BLOCK COUNT=\"1\">5</FP_BLOCK></KZFPX_FP_QUERY>";
    }
}
