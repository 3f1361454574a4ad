import com.orvanta.android.kzsdk.AudioDescription;
import com.orvanta.android.kzsdk.Fingerprint;
import com.orvanta.android.kzsdk.FingerprintException;
import com.orvanta.android.kzsdk.QueryDocument;
import java.io.ByteArrayOutputStream;
import java.io.File;
import java.io.IOException;
import java.io.InputStream;
import java.nio.ByteOrder;
import java.util.concurrent.ExecutionException;
import javax.sound.sampled.AudioFormat;
import javax.sound.sampled.AudioFormat.Encoding;
import javax.sound.sampled.AudioInputStream;
import javax.sound.sampled.AudioSystem;
import javax.sound.sampled.UnsupportedAudioFileException;

/**
 * Prints the query document of a WAV file: 16-bit or 8-bit PCM, A-law or mu-law.
 *
 * <pre>
 * javac -cp kzsdk.jar FingerprintFile.java
 * java -cp kzsdk.jar:. -Djava.library.path=/usr/local/lib FingerprintFile song.wav
 * </pre>
 */
public final class FingerprintFile {
    private static final int SECONDS = 120; // more than the longest silence that one would wait for

    private FingerprintFile() {}

    private static AudioDescription describe(AudioFormat format) {
        int rate = Math.round(format.getSampleRate());
        int channels = format.getChannels();
        if (format.getEncoding().equals(Encoding.ALAW)) {
            return AudioDescription.aLaw(rate, channels);
        }
        if (format.getEncoding().equals(Encoding.ULAW)) {
            return AudioDescription.muLaw(rate, channels);
        }
        if (format.getEncoding().equals(Encoding.PCM_SIGNED) && format.getSampleSizeInBits() == 16) {
            return AudioDescription.pcm16(rate, channels);
        }
        // Eight bits are widened to sixteen: the library would fold them.
        if (format.getEncoding().equals(Encoding.PCM_UNSIGNED) && format.getSampleSizeInBits() == 8) {
            return AudioDescription.pcm16(rate, channels);
        }
        throw new IllegalArgumentException("cannot read " + format);
    }

    private static byte[] widen(byte[] audio) {
        boolean little = ByteOrder.nativeOrder() == ByteOrder.LITTLE_ENDIAN;
        byte[] wide = new byte[2 * audio.length];
        for (int i = 0; i < audio.length; ++i) {
            wide[2 * i + (little ? 1 : 0)] = (byte) (audio[i] - 128);
        }
        return wide;
    }

    private static byte[] read(InputStream in, long most) throws IOException {
        ByteArrayOutputStream bytes = new ByteArrayOutputStream();
        byte[] piece = new byte[1 << 16];
        int count;
        while (bytes.size() < most && (count = in.read(piece, 0,
                (int) Math.min(piece.length, most - bytes.size()))) > 0) {
            bytes.write(piece, 0, count);
        }
        return bytes.toByteArray();
    }

    private static QueryDocument fingerprint(File file)
            throws IOException, UnsupportedAudioFileException, InterruptedException,
                    ExecutionException {
        try (AudioInputStream in = AudioSystem.getAudioInputStream(file);
                Fingerprint fingerprint = new Fingerprint()) {
            AudioFormat format = in.getFormat();
            AudioDescription description = describe(format);
            long frames = (long) (SECONDS * format.getSampleRate());
            byte[] audio = read(in, frames * format.getFrameSize());
            if (format.getEncoding().equals(Encoding.PCM_UNSIGNED)) {
                audio = widen(audio);
            }
            return fingerprint.generate(description, audio).get();
        }
    }

    /**
     * Runs the program.
     *
     * @param arguments the file's name
     */
    public static void main(String[] arguments) {
        if (arguments.length != 1) {
            System.err.println("usage: FingerprintFile FILE.wav");
            System.exit(2);
        }
        try {
            System.out.print(fingerprint(new File(arguments[0])).text());
            System.out.flush();
        } catch (ExecutionException failed) {
            boolean expected = failed.getCause() instanceof FingerprintException;
            System.err.println(arguments[0] + ": " + (expected ? failed.getCause().getMessage() : failed));
            System.exit(1);
        } catch (IOException | UnsupportedAudioFileException | InterruptedException
                | IllegalArgumentException failed) {
            System.err.println(arguments[0] + ": " + failed.getMessage());
            System.exit(1);
        }
    }
}
