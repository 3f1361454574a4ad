package com.orvanta.android.kzsdk;

import java.io.BufferedReader;
import java.io.IOException;
import java.io.InputStream;
import java.io.InputStreamReader;
import java.nio.file.Files;
import java.nio.file.Path;
import java.nio.file.attribute.PosixFilePermissions;
import java.util.ArrayList;
import java.util.List;
import java.util.Locale;

/**
 * Native libraries out of the jar for desktops. They are unpacked into a new folder that no other
 * user may enter, so that nobody can put another file there before it is loaded, and deleted as
 * soon as they are loaded: nothing is left, however the program ends.
 */
final class BundledLibrary {
    private BundledLibrary() {}

    /** The folder of the jar that holds the libraries for this system and processor. */
    static String platform() {
        String system = System.getProperty("os.name", "").toLowerCase(Locale.ROOT);
        String processor = System.getProperty("os.arch", "").toLowerCase(Locale.ROOT);
        if (processor.equals("amd64")) {
            processor = "x86_64";
        }
        return system.replaceAll("[^a-z0-9]", "") + "-" + processor.replaceAll("[^a-z0-9_]", "");
    }

    /** Loads a library and what it needs; false when the jar has none for this system. */
    static boolean load(String name) {
        String folder = "native/" + platform() + "/";
        try {
            List<String> files = listed(folder + name + ".list");
            if (files.isEmpty()) {
                return false;
            }
            loadAll(folder, files);
            return true;
        } catch (IOException failed) {
            throw NativeLibrary.failure("The native library of the jar cannot be unpacked into "
                    + System.getProperty("java.io.tmpdir") + ": " + failed
                    + ". Name another folder with -Djava.io.tmpdir=", failed);
        }
    }

    /** The files of a library, in the order in which they are to be loaded. */
    private static List<String> listed(String list) throws IOException {
        List<String> files = new ArrayList<>();
        InputStream in = BundledLibrary.class.getResourceAsStream(list);
        if (in == null) {
            return files;
        }
        try (BufferedReader lines = new BufferedReader(new InputStreamReader(in, "UTF-8"))) {
            for (String line; (line = lines.readLine()) != null;) {
                files.add(line);
            }
        }
        return files;
    }

    private static void loadAll(String folder, List<String> files) throws IOException {
        Path place = Files.createTempDirectory("kzsdk-",
                PosixFilePermissions.asFileAttribute(PosixFilePermissions.fromString("rwx------")));
        try {
            for (String file : files) {
                load(folder + file, place.resolve(file));
            }
        } finally {
            Files.delete(place);
        }
    }

    private static void load(String resource, Path file) throws IOException {
        try (InputStream in = BundledLibrary.class.getResourceAsStream(resource)) {
            if (in == null) {
                throw new IOException("the jar lists " + resource + " and does not hold it");
            }
            Files.copy(in, file);
            System.load(file.toString());
        } catch (UnsatisfiedLinkError refused) {
            throw NativeLibrary.failure("The native library of the jar was unpacked and cannot be loaded: "
                    + refused.getMessage() + ". Install what it needs; where programs may not be run "
                    + "from that folder, name another one with -Djava.io.tmpdir=", refused);
        } finally {
            Files.deleteIfExists(file);
        }
    }
}
