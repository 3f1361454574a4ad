package com.example.fingerprint;

import static org.junit.Assert.assertEquals;
import static org.junit.Assert.assertTrue;

import android.content.Context;
import android.media.AudioManager;
import android.media.AudioRecord;
import android.media.MediaRecorder;
import android.os.Build;
import com.orvanta.android.kzsdk.QueryDocument;
import com.orvanta.android.kzsdk.SoundFormat;
import com.orvanta.android.kzsdk.StreamProgress;
import com.orvanta.android.kzsdk.StreamingFingerprint;
import java.util.ArrayList;
import java.util.List;
import java.util.concurrent.BlockingQueue;
import java.util.concurrent.LinkedBlockingQueue;
import java.util.concurrent.TimeUnit;
import org.junit.Before;
import org.junit.Test;

/** The feeder of the example app, over a simulated microphone. */
public class MicrophoneFeederTest {
    private static final int RATE = 44100;

    /** Keeps what is reported, and ends with the last report. */
    private static final class Reports implements MicrophoneFeeder.Listener {
        final List<String> all = new ArrayList<>();
        final BlockingQueue<String> last = new LinkedBlockingQueue<>();
        int percent;

        @Override
        public void onProgress(StreamProgress progress) {
            assertTrue(progress.percent() >= percent);
            percent = progress.percent();
        }

        @Override
        public void onSilenced(boolean silenced) {
            all.add(silenced ? "silenced" : "heard again");
        }

        @Override
        public void onFingerprint(QueryDocument document) {
            last.add(document.text());
        }

        @Override
        public void onFailure(String reason) {
            last.add(reason);
        }

        String end() throws InterruptedException {
            return last.poll(300, TimeUnit.SECONDS);
        }
    }

    private static float[] melody(double seconds) {
        int[] hertz = {262, 330, 392, 523, 440, 349, 294, 392, 330, 247, 494, 587};
        float[] samples = new float[(int) (seconds * RATE)];
        for (int i = 0; i < samples.length; ++i) {
            int note = i / 11025;
            samples[i] = (float) (i * (double) hertz[(note * 5 + note / 7) % 12] / RATE % 1 - 0.5) / 2;
        }
        return samples;
    }

    private static String document(float[] samples) {
        try (StreamingFingerprint stream = new StreamingFingerprint(SoundFormat.float32(RATE, 1))) {
            assertTrue(stream.feed(samples, 0, samples.length));
            return stream.document().text();
        }
    }

    private static String listen(Reports reports) throws InterruptedException {
        try (MicrophoneFeeder feeder = new MicrophoneFeeder(new Context(), Runnable::run, reports)) {
            feeder.start();
            String end = reports.end();
            for (int i = 0; i < 500 && AudioRecord.open > 0; ++i) {
                Thread.sleep(10);
            }
            assertEquals("recorders that were not released", 0, AudioRecord.open);
            return end;
        }
    }

    @Before
    public void reset() {
        AudioRecord.sound = melody(20);
        AudioRecord.firstSilenced = -1;
        AudioRecord.lastSilenced = -1;
        AudioRecord.state = AudioRecord.STATE_INITIALIZED;
        AudioRecord.refusal = null;
        AudioManager.unprocessed = "true";
        Build.VERSION.SDK_INT = 35;
    }

    @Test
    public void musicGivesItsFingerprint() throws Exception {
        Reports reports = new Reports();
        assertEquals(document(AudioRecord.sound), listen(reports));
        assertTrue(reports.percent > 50);
        assertEquals(MediaRecorder.AudioSource.UNPROCESSED, AudioRecord.lastSource);
    }

    @Test
    public void voiceRecognitionStandsInForUnprocessed() throws Exception {
        for (String property : new String[] {"false", null}) {
            AudioManager.unprocessed = property;
            listen(new Reports());
            assertEquals(MediaRecorder.AudioSource.VOICE_RECOGNITION, AudioRecord.lastSource);
        }
    }

    @Test
    public void silencedPiecesAreReportedAndLeftOut() throws Exception {
        AudioRecord.firstSilenced = 30;
        AudioRecord.lastSilenced = 60;
        Reports reports = new Reports();
        assertEquals(document(AudioRecord.sound), listen(reports));
        assertEquals("[silenced, heard again]", reports.all.toString());
    }

    @Test
    public void aMicrophoneThatStaysSilencedIsNamed() throws Exception {
        AudioRecord.firstSilenced = 0;
        AudioRecord.lastSilenced = Integer.MAX_VALUE;
        assertTrue(listen(new Reports()).startsWith("Another app has the microphone"));
        Build.VERSION.SDK_INT = 28;
        assertEquals("No music was heard in 60 seconds", listen(new Reports()));
    }

    @Test
    public void failuresOfTheMicrophoneAreReported() throws Exception {
        AudioRecord.sound = new float[0];
        assertEquals("The microphone failed (-3)", listen(new Reports()));
        AudioRecord.state = AudioRecord.STATE_UNINITIALIZED;
        assertEquals("The microphone cannot be opened", listen(new Reports()));
    }

    @Test
    public void everyFailureReachesTheListener() throws Exception {
        for (Throwable refusal : new Throwable[] {new SecurityException("no permission"),
            new IllegalArgumentException("no such rate"), new UnsatisfiedLinkError("no library"),
            new OutOfMemoryError("no memory")}) {
            AudioRecord.refusal = refusal;
            assertEquals(refusal.getMessage(), listen(new Reports()));
        }
        AudioRecord.refusal = new NullPointerException();
        assertEquals("java.lang.NullPointerException", listen(new Reports()));
    }

    @Test
    public void closingDropsReportsThatWait() throws Exception {
        BlockingQueue<Runnable> waiting = new LinkedBlockingQueue<>();
        Reports reports = new Reports();
        MicrophoneFeeder feeder = new MicrophoneFeeder(new Context(), waiting::add, reports);
        AudioRecord.sound = new float[0];
        feeder.start();
        Runnable failure = waiting.poll(300, TimeUnit.SECONDS);
        feeder.close();
        failure.run();
        assertTrue(reports.last.isEmpty());
    }
}
