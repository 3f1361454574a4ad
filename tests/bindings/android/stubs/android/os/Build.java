package android.os;

/** As far as the example uses it; the version is what a test wants. */
public final class Build {
    private Build() {}

    public static final class VERSION {
        public static int SDK_INT = 35;

        private VERSION() {}
    }

    public static final class VERSION_CODES {
        public static final int Q = 29;

        private VERSION_CODES() {}
    }
}
