import com.orvanta.android.kzsdk.AudioDescription;
import com.orvanta.android.kzsdk.Fingerprint;
import com.orvanta.android.kzsdk.SoundFormat;
import com.orvanta.android.kzsdk.StreamingFingerprint;

/** What an app does with the package, to be shrunk together with it. */
public final class Program {
    private Program() {}

    public static void main(String[] arguments) throws Exception {
        byte[] audio = new byte[2 * 11025 * 16];
        for (int i = 0; i < audio.length / 2; ++i) {
            int sample = i * (200 + 37 * (i / 2756 % 11)) % 11025 - 5512;
            audio[2 * i] = (byte) sample;
            audio[2 * i + 1] = (byte) (sample >> 8);
        }
        try (Fingerprint whole = new Fingerprint();
                StreamingFingerprint stream =
                        new StreamingFingerprint(SoundFormat.pcm16(11025, 1))) {
            String text = whole.generate(AudioDescription.pcm16(11025, 1), audio).get().text();
            stream.feed(audio, 0, audio.length);
            System.out.println(text.equals(stream.document().text()) ? "the same" : "different");
        }
    }
}
