package android.media;

import java.util.List;

/** As far as the example uses it; what the device has is what a test wants. */
public class AudioManager {
    public static final String PROPERTY_SUPPORT_AUDIO_SOURCE_UNPROCESSED =
            "android.media.property.SUPPORT_AUDIO_SOURCE_UNPROCESSED";

    /** What the property is; null on a device that does not know it. */
    public static String unprocessed = "true";

    public String getProperty(String key) {
        return PROPERTY_SUPPORT_AUDIO_SOURCE_UNPROCESSED.equals(key) ? unprocessed : null;
    }

    public abstract static class AudioRecordingCallback {
        public void onRecordingConfigChanged(List<AudioRecordingConfiguration> configurations) {}
    }
}
