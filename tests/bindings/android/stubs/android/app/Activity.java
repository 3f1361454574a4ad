package android.app;

import android.content.Context;
import android.os.Bundle;
import android.view.View;

/** As far as the example uses it. */
public class Activity extends Context {
    protected void onCreate(Bundle state) {}

    protected void onStop() {}

    public void setContentView(View view) {}

    public int checkSelfPermission(String permission) {
        return 0;
    }

    public final void requestPermissions(String[] permissions, int code) {}

    public final void runOnUiThread(Runnable action) {
        action.run();
    }
}
