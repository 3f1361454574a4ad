package com.example.fingerprint;

import android.Manifest;
import android.app.Activity;
import android.content.pm.PackageManager;
import android.os.Bundle;
import android.widget.Button;
import android.widget.LinearLayout;
import android.widget.TextView;
import com.orvanta.android.kzsdk.QueryDocument;
import com.orvanta.android.kzsdk.StreamProgress;

/** Listens until there is a fingerprint, and shows it. */
public final class MainActivity extends Activity implements MicrophoneFeeder.Listener {
    private Button button;
    private TextView result;
    private MicrophoneFeeder microphone;

    @Override
    protected void onCreate(Bundle state) {
        super.onCreate(state);
        button = new Button(this);
        button.setText("Listen");
        button.setOnClickListener(view -> listen());
        result = new TextView(this);
        result.setTextIsSelectable(true);
        LinearLayout layout = new LinearLayout(this);
        layout.setOrientation(LinearLayout.VERTICAL);
        layout.addView(button);
        layout.addView(result);
        setContentView(layout);
    }

    @Override
    protected void onStop() {
        stop(); // Android would record silence from now on
        super.onStop();
    }

    private void stop() {
        if (microphone != null) {
            microphone.close();
            microphone = null;
        }
        button.setEnabled(true);
    }

    private void listen() {
        if (checkSelfPermission(Manifest.permission.RECORD_AUDIO)
                != PackageManager.PERMISSION_GRANTED) {
            requestPermissions(new String[] {Manifest.permission.RECORD_AUDIO}, 1);
            return;
        }
        button.setEnabled(false);
        result.setText("Listening ...");
        microphone = new MicrophoneFeeder(this, this::runOnUiThread, this);
        microphone.start();
    }

    @Override
    public void onProgress(StreamProgress progress) {
        result.setText("Listening ... " + progress.percent() + " %");
    }

    @Override
    public void onSilenced(boolean silenced) {
        result.setText(silenced ? "Another app has the microphone ..." : "Listening ...");
    }

    @Override
    public void onFingerprint(QueryDocument document) {
        result.setText(document.text());
        stop();
    }

    @Override
    public void onFailure(String reason) {
        result.setText(reason);
        stop();
    }
}
