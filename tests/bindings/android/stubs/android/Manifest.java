package android;

/** As far as the example uses it. */
public final class Manifest {
    private Manifest() {}

    public static final class permission {
        public static final String RECORD_AUDIO = "android.permission.RECORD_AUDIO";

        private permission() {}
    }
}
