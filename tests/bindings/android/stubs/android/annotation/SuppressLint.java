package android.annotation;

/** As far as the example uses it. */
public @interface SuppressLint {
    String[] value();
}
