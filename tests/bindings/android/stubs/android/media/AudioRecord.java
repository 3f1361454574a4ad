package android.media;

import java.util.Collections;
import java.util.concurrent.Executor;

/** A microphone that hears what a test wants. */
public class AudioRecord {
    public static final int STATE_UNINITIALIZED = 0;
    public static final int STATE_INITIALIZED = 1;
    public static final int READ_BLOCKING = 0;

    /** What is heard, over and over; none: reading fails. */
    public static float[] sound = {};
    /** The pieces during which another app has the microphone, from the first one up to the last. */
    public static int firstSilenced = -1;
    public static int lastSilenced = -1;
    public static int state = STATE_INITIALIZED;
    /** What recording fails with, when it is not null: of a kind that needs no declaration. */
    public static Throwable refusal;
    /** The recorders that were made and not released, and the source of the last one. */
    public static int open;
    public static int lastSource;

    private int place;
    private int pieces;
    private Executor executor;
    private AudioManager.AudioRecordingCallback callback;

    public AudioRecord(int source, int rate, int channels, int encoding, int size) {
        lastSource = source;
        ++open;
    }

    public static int getMinBufferSize(int rate, int channels, int encoding) {
        return 3528;
    }

    public int getState() {
        return state;
    }

    public void registerAudioRecordingCallback(
            Executor executor, AudioManager.AudioRecordingCallback callback) {
        this.executor = executor;
        this.callback = callback;
    }

    public void startRecording() {
        if (refusal instanceof Error) {
            throw (Error) refusal;
        }
        if (refusal != null) {
            throw (RuntimeException) refusal;
        }
    }

    public int read(float[] audio, int offset, int count, int mode) {
        if (sound.length == 0) {
            return -3;
        }
        boolean silenced = pieces >= firstSilenced && pieces < lastSilenced;
        if (callback != null && (pieces == firstSilenced || pieces == lastSilenced)) {
            executor.execute(() -> callback.onRecordingConfigChanged(
                    Collections.singletonList(new AudioRecordingConfiguration(silenced))));
        }
        ++pieces;
        for (int i = 0; i < count; ++i) {
            audio[offset + i] = silenced ? 0 : sound[place++ % sound.length];
        }
        return count;
    }

    public void release() {
        --open;
    }
}
