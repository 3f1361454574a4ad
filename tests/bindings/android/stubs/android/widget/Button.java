package android.widget;

import android.content.Context;

/** As far as the example uses it. */
public class Button extends TextView {
    public Button(Context context) {
        super(context);
    }
}
