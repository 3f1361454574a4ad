package android.os;

/** As far as the example uses it. */
public final class Bundle {}
