package android.widget;

import android.content.Context;
import android.view.View;

/** As far as the example uses it. */
public class TextView extends View {
    public TextView(Context context) {
        super(context);
    }

    public final void setText(CharSequence text) {}

    public void setTextIsSelectable(boolean selectable) {}
}
