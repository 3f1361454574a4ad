package android.content.pm;

/** As far as the example uses it. */
public abstract class PackageManager {
    public static final int PERMISSION_GRANTED = 0;
}
