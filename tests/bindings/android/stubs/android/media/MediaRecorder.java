package android.media;

/** As far as the example uses it. */
public class MediaRecorder {
    private MediaRecorder() {}

    public final class AudioSource {
        public static final int VOICE_RECOGNITION = 6;
        public static final int UNPROCESSED = 9;

        private AudioSource() {}
    }
}
