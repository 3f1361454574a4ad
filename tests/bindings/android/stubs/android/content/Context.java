package android.content;

import android.media.AudioManager;

/** As far as the example uses it. */
public class Context {
    public static final String AUDIO_SERVICE = "audio";

    public Object getSystemService(String name) {
        return AUDIO_SERVICE.equals(name) ? new AudioManager() : null;
    }
}
