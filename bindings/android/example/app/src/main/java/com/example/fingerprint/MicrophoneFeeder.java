package com.example.fingerprint;

import android.annotation.SuppressLint;
import android.content.Context;
import android.media.AudioFormat;
import android.media.AudioManager;
import android.media.AudioRecord;
import android.media.AudioRecordingConfiguration;
import android.media.MediaRecorder;
import android.os.Build;
import com.orvanta.android.kzsdk.QueryDocument;
import com.orvanta.android.kzsdk.SoundFormat;
import com.orvanta.android.kzsdk.StreamProgress;
import com.orvanta.android.kzsdk.StreamingFingerprint;
import java.util.List;
import java.util.concurrent.Executor;

/**
 * Feeds what the microphone hears to a fingerprint, until that is complete.
 *
 * <p>The source is UNPROCESSED where the device has it, else VOICE_RECOGNITION: both leave out the
 * gain control and noise suppression of calls, which take music for noise. While another app has
 * the microphone, or the user has switched it off, Android records silence: that is reported, and
 * not fed.
 */
final class MicrophoneFeeder implements AutoCloseable {
    /** Receives what becomes of it, on the executor. */
    interface Listener {
        /** Some sound was fed. */
        void onProgress(StreamProgress progress);

        /** Android has begun or ceased to record silence in place of the microphone. */
        void onSilenced(boolean silenced);

        /** The fingerprint is complete; nothing more comes. */
        void onFingerprint(QueryDocument document);

        /** There will be no fingerprint; nothing more comes. */
        void onFailure(String reason);
    }

    private static final int RATE = 44100;
    private static final int MOST_SECONDS = 60;
    private static final int PIECE = RATE / 10;

    private final int source;
    private final Executor executor;
    private final Listener listener;
    private volatile boolean silenced;
    private volatile boolean stopped;

    /**
     * Chooses the source.
     *
     * @param executor runs the listener: {@code context.getMainExecutor()}, for example
     */
    MicrophoneFeeder(Context context, Executor executor, Listener listener) {
        this.source = sourceOf(context);
        this.executor = executor;
        this.listener = listener;
    }

    private static int sourceOf(Context context) {
        AudioManager audio = (AudioManager) context.getSystemService(Context.AUDIO_SERVICE);
        String has = audio.getProperty(AudioManager.PROPERTY_SUPPORT_AUDIO_SOURCE_UNPROCESSED);
        return Boolean.parseBoolean(has) ? MediaRecorder.AudioSource.UNPROCESSED
                : MediaRecorder.AudioSource.VOICE_RECOGNITION;
    }

    /** Starts listening, on a thread of its own. To be called once, with the permission granted. */
    void start() {
        new Thread(this::listen, "microphone").start();
    }

    /**
     * Stops listening. On the thread that runs the listener, this is the end of all calls of it:
     * reports that wait for the executor are dropped.
     */
    @Override
    public void close() {
        stopped = true;
    }

    private void listen() {
        AudioRecord recorder = null;
        try (StreamingFingerprint stream =
                new StreamingFingerprint(SoundFormat.float32(RATE, 1))) {
            recorder = open();
            watch(recorder);
            recorder.startRecording();
            feed(recorder, stream);
        } catch (RuntimeException | LinkageError | OutOfMemoryError failed) {
            String reason = failed.getMessage();
            report(() -> listener.onFailure(reason != null ? reason : failed.toString()));
        } finally {
            if (recorder != null) {
                recorder.release(); // stops it too
            }
        }
    }

    @SuppressLint("MissingPermission") // callers of start() hold it
    private AudioRecord open() {
        int least = AudioRecord.getMinBufferSize(
                RATE, AudioFormat.CHANNEL_IN_MONO, AudioFormat.ENCODING_PCM_FLOAT);
        AudioRecord recorder = new AudioRecord(source, RATE, AudioFormat.CHANNEL_IN_MONO,
                AudioFormat.ENCODING_PCM_FLOAT, Math.max(4 * least, 4 * RATE));
        if (recorder.getState() != AudioRecord.STATE_INITIALIZED) {
            recorder.release();
            throw new IllegalStateException("The microphone cannot be opened");
        }
        return recorder;
    }

    /** Before Android 10 nothing says that a recording is silenced. */
    private void watch(AudioRecord recorder) {
        if (Build.VERSION.SDK_INT >= Build.VERSION_CODES.Q) {
            recorder.registerAudioRecordingCallback(Runnable::run, new Silencing(this));
        }
    }

    /** A class of its own, which devices before Android 10 do not load. */
    private static final class Silencing extends AudioManager.AudioRecordingCallback {
        private final MicrophoneFeeder feeder;

        Silencing(MicrophoneFeeder feeder) {
            this.feeder = feeder;
        }

        @Override
        public void onRecordingConfigChanged(List<AudioRecordingConfiguration> configurations) {
            boolean silenced = false;
            for (AudioRecordingConfiguration configuration : configurations) {
                silenced |= configuration.isClientSilenced();
            }
            feeder.setSilenced(silenced);
        }
    }

    private void setSilenced(boolean now) {
        if (silenced != now) {
            silenced = now;
            report(() -> listener.onSilenced(now));
        }
    }

    private void feed(AudioRecord recorder, StreamingFingerprint stream) {
        float[] piece = new float[PIECE];
        long left = (long) MOST_SECONDS * RATE;
        while (!stopped && left > 0) {
            int count = recorder.read(piece, 0, piece.length, AudioRecord.READ_BLOCKING);
            if (count < 0) {
                throw new IllegalStateException("The microphone failed (" + count + ")");
            }
            left -= count;
            if (silenced) {
                continue; // a hole in the music is worse than a later beginning
            }
            if (stream.feed(piece, 0, count)) {
                QueryDocument document = stream.document();
                report(() -> listener.onFingerprint(document));
                return;
            }
            StreamProgress progress = stream.progress();
            report(() -> listener.onProgress(progress));
        }
        if (!stopped) {
            String lack = silenced ? "Another app has the microphone, or it is switched off"
                    : "No music was heard in " + MOST_SECONDS + " seconds";
            report(() -> listener.onFailure(lack));
        }
    }

    private void report(Runnable report) {
        executor.execute(() -> {
            if (!stopped) {
                report.run();
            }
        });
    }
}
