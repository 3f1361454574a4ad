package com.orvanta.android.kzsdk;

import java.io.File;
import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.InvalidPathException;
import java.nio.file.Path;
import java.nio.file.Paths;
import java.util.ArrayList;
import java.util.List;

/**
 * The files of the catalogues that this process has open. A process that opens and closes such a
 * file loses every lock that it holds on it, whichever descriptor took the lock; another process
 * could then write to the catalogue at the same time. So none of them is opened as sound.
 */
final class OpenCatalogues {
    private static final String[] ENDINGS = {"", "-wal", "-shm", "-journal", ".idx"};

    /** One entry for each opening. */
    private static final List<Path> OPEN = new ArrayList<>();

    private OpenCatalogues() {}

    /**
     * Keeps the path of a catalogue that is about to be opened. The address of a server is kept
     * too, as the path of a file that does not exist.
     *
     * @return what {@link #closed} takes; null for a catalogue in memory
     */
    static Path opening(String path) {
        if (path == null) {
            return null;
        }
        try {
            Path file = realPath(Paths.get(path));
            synchronized (OPEN) {
                OPEN.add(file);
            }
            return file;
        } catch (InvalidPathException noFile) {
            return null;
        }
    }

    private static Path realPath(Path path) {
        try {
            return path.toRealPath();
        } catch (IOException missing) {
            return path.toAbsolutePath(); // it may be made when it is opened
        }
    }

    /** Forgets one opening of a catalogue, whose files are closed, or which failed. */
    static void closed(Path file) {
        synchronized (OPEN) {
            OPEN.remove(file);
        }
    }

    /** @throws IOException when the file belongs to an open catalogue, under whatever name */
    static void refuse(File file) throws IOException {
        List<Path> open;
        synchronized (OPEN) {
            open = new ArrayList<>(OPEN);
        }
        for (Path catalogue : open) {
            for (String ending : ENDINGS) {
                if (isSame(file, catalogue.resolveSibling(catalogue.getFileName() + ending))) {
                    throw new IOException(file + " belongs to the catalogue " + catalogue
                            + ", which is open: pass a sound file");
                }
            }
        }
    }

    private static boolean isSame(File file, Path other) {
        try {
            return Files.isSameFile(file.toPath(), other);
        } catch (IOException | InvalidPathException missing) {
            return false;
        }
    }
}
