package android.media;

/** As far as the example uses it. */
public final class AudioRecordingConfiguration {
    private final boolean silenced;

    public AudioRecordingConfiguration(boolean silenced) {
        this.silenced = silenced;
    }

    public boolean isClientSilenced() {
        return silenced;
    }
}
