import com.orvanta.android.kzsdk.Catalogue;
import com.orvanta.android.kzsdk.CatalogueException;
import com.orvanta.android.kzsdk.Match;
import com.orvanta.android.kzsdk.Recognition;
import com.orvanta.android.kzsdk.Sound;
import java.io.IOException;

/**
 * Names clips by the tracks of a catalogue, which {@code kzfp add} makes.
 *
 * <pre>
 * javac -cp kzsdk-desktop.jar RecogniseClip.java
 * java -cp kzsdk-desktop.jar:. RecogniseClip music.kzc clip.wav
 * </pre>
 */
public final class RecogniseClip {
    private RecogniseClip() {}

    private static void print(String clip, Recognition result) {
        if (result.matches().isEmpty()) {
            System.out.println(clip + ": " + result);
        }
        for (Match match : result) {
            System.out.println(clip + ": " + match);
        }
    }

    /**
     * Runs the program.
     *
     * @param arguments the catalogue's path and the clips' names
     */
    public static void main(String[] arguments) {
        if (arguments.length < 2) {
            System.err.println("usage: RecogniseClip CATALOGUE CLIP...");
            System.exit(2);
        }
        try (Catalogue catalogue = Catalogue.open(arguments[0])) {
            for (int i = 1; i < arguments.length; ++i) {
                print(arguments[i], catalogue.match(Sound.file(arguments[i])));
            }
        } catch (CatalogueException | IOException failed) {
            System.err.println(failed.getMessage());
            System.exit(1);
        }
    }
}
