package com.orvanta.android.kzsdk;

/** Reports what a catalogue could not do, in a sentence with what would cure it. */
public final class CatalogueException extends RuntimeException {
    private static final long serialVersionUID = 1L;

    /** Why something failed. */
    public enum Reason {
        /** The system failed for another reason. */
        FAILED,
        /** Memory is short. */
        MEMORY,
        /** An argument is out of range. */
        INVALID_ARGUMENT,
        /** The file is missing, may not be opened, or is no catalogue. */
        CANNOT_OPEN,
        /** A later version wrote the catalogue. */
        NEWER_VERSION,
        /** The features are of another profile and cannot be compared. */
        OTHER_PROFILE,
        /** The catalogue was opened for reading, or may not be written. */
        READ_ONLY,
        /** Another writer holds the catalogue. */
        BUSY,
        /** The disk or a quota is full. */
        FULL,
        /** The catalogue is damaged. */
        DAMAGED,
        /** There is no such track or source. */
        NOT_FOUND,
        /** The bytes are no query document, or a damaged one. */
        NOT_READABLE,
        /** The format, rate or number of channels cannot be used. */
        FORMAT
    }

    private final Reason reason;

    /** Called by the native side. */
    CatalogueException(int status, byte[] text) {
        super(Texts.of(text));
        Reason[] reasons = Reason.values();
        reason = status > 0 && status < reasons.length ? reasons[status] : Reason.FAILED;
    }

    CatalogueException(String message, Throwable cause) {
        super(message, cause);
        reason = Reason.FAILED;
    }

    /**
     * Returns the kind of failure, for programs.
     *
     * @return never null
     */
    public Reason reason() {
        return reason;
    }
}
