package android.media;

/** As far as the example uses it. */
public final class AudioFormat {
    public static final int CHANNEL_IN_MONO = 0x10;
    public static final int ENCODING_PCM_FLOAT = 4;

    private AudioFormat() {}
}
