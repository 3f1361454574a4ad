package android.widget;

import android.content.Context;
import android.view.View;

/** As far as the example uses it. */
public class LinearLayout extends View {
    public static final int VERTICAL = 1;

    public LinearLayout(Context context) {
        super(context);
    }

    public void setOrientation(int orientation) {}

    public void addView(View view) {}
}
