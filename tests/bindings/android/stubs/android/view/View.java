package android.view;

import android.content.Context;

/** As far as the example uses it. */
public class View {
    public interface OnClickListener {
        void onClick(View view);
    }

    public View(Context context) {}

    public void setOnClickListener(OnClickListener listener) {}

    public void setEnabled(boolean enabled) {}
}
