package com.orvanta.android.kzsdk;

import java.io.File;
import java.util.HashMap;
import java.util.Map;
import java.util.function.Supplier;

/**
 * Finds and loads the native libraries, each once: the file that a system property names, else what
 * {@code System.loadLibrary} finds, else the copy inside the jar. A library of another version is
 * refused: its native methods may differ.
 */
final class NativeLibrary {
    /** What failed before fails again, with the same reason. */
    private static final Map<String, UnsatisfiedLinkError> OUTCOMES = new HashMap<>();

    private NativeLibrary() {}

    /** Loads {@code libkzsdk}; {@code -Dkzsdk.library} names its file. */
    static void loadSdk() {
        load("kzsdk", "kzsdk.library", NativeStream::version);
    }

    /** Loads what a {@link Catalogue} needs; {@code -Dkzcat.library} names the file. */
    static void loadCatalogue() {
        loadSdk();
        load("kzcat_java", "kzcat.library", () -> Texts.of(NativeCatalogue.version()));
    }

    private static synchronized void load(String name, String property, Supplier<String> version) {
        if (!OUTCOMES.containsKey(name)) {
            OUTCOMES.put(name, outcome(name, property, version));
        }
        UnsatisfiedLinkError failure = OUTCOMES.get(name);
        if (failure != null) {
            UnsatisfiedLinkError again = new UnsatisfiedLinkError(failure.getMessage());
            again.initCause(failure.getCause());
            throw again;
        }
    }

    /** Null when it is loaded now. */
    private static UnsatisfiedLinkError outcome(
            String name, String property, Supplier<String> version) {
        try {
            String file = System.getProperty(property);
            if (file != null) {
                loadNamed(file, property);
            } else {
                loadFound(name, property);
            }
            checkVersion(name, property, version);
            return null;
        } catch (UnsatisfiedLinkError failure) {
            return failure;
        }
    }

    private static void loadNamed(String file, String property) {
        try {
            System.load(new File(file).getAbsolutePath());
        } catch (UnsatisfiedLinkError refused) {
            throw failure("-D" + property + "=" + file + " names a file that cannot be loaded: "
                    + refused.getMessage(), refused);
        }
    }

    private static void loadFound(String name, String property) {
        try {
            System.loadLibrary(name);
        } catch (UnsatisfiedLinkError notFound) {
            if (isAndroid() || !BundledLibrary.load(name)) {
                throw failure(advice(name, property, notFound), notFound);
            }
        }
    }

    private static void checkVersion(String name, String property, Supplier<String> version) {
        String file = System.mapLibraryName(name);
        String found;
        try {
            found = version.get();
        } catch (UnsatisfiedLinkError none) {
            String fault = "is older than these classes: it does not report its version";
            throw failure(otherVersion(file, fault, property), none);
        }
        if (!Version.fits(found)) {
            throw failure(otherVersion(file, "is of version " + found, property), null);
        }
    }

    private static String otherVersion(String file, String fault, String property) {
        return "The native library " + file + " that was found " + fault + ". These classes are of version "
                + Version.TEXT + ": install the library of that version, or name its file: -D" + property
                + "=/path/" + file + "; kzsdk-desktop.jar has one, used when no other is found";
    }

    /** What the system says first: it may be that a library was found which needs another one. */
    private static String advice(String name, String property, Throwable notFound) {
        String file = System.mapLibraryName(name);
        String start = "The native library " + file + " cannot be loaded: " + notFound.getMessage();
        if (isAndroid()) {
            return start + ". The app's package must hold it for this processor: add kzsdk.aar, which "
                    + "has no catalogue";
        }
        return start + ". The jar has none for " + BundledLibrary.platform()
                + ". Install the library, take kzsdk-desktop.jar, or name the file: -D" + property
                + "=/path/" + file;
    }

    static UnsatisfiedLinkError failure(String message, Throwable cause) {
        UnsatisfiedLinkError error = new UnsatisfiedLinkError(message);
        error.initCause(cause);
        return error;
    }

    private static boolean isAndroid() {
        return "The Android Project".equals(System.getProperty("java.specification.vendor"));
    }
}
