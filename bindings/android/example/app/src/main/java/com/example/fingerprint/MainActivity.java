package com.example.fingerprint;

import android.Manifest;
import android.annotation.SuppressLint;
import android.app.Activity;
import android.content.pm.PackageManager;
import android.media.AudioFormat;
import android.media.AudioRecord;
import android.media.MediaRecorder;
import android.os.Bundle;
import android.widget.Button;
import android.widget.LinearLayout;
import android.widget.TextView;
import com.orvanta.android.kzsdk.AudioDescription;
import com.orvanta.android.kzsdk.Fingerprint;
import com.orvanta.android.kzsdk.FingerprintException;
import com.orvanta.android.kzsdk.QueryDocument;

/** Records 15 seconds and shows their fingerprint. */
public final class MainActivity extends Activity implements Fingerprint.Listener {
    private static final int RATE = 44100;
    private static final int SECONDS = 15;

    private Fingerprint fingerprint;
    private Button button;
    private TextView result;

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

        fingerprint = new Fingerprint();
        fingerprint.setListener(this, this::runOnUiThread);
    }

    @Override
    protected void onDestroy() {
        fingerprint.close();
        super.onDestroy();
    }

    private void listen() {
        if (checkSelfPermission(Manifest.permission.RECORD_AUDIO)
                != PackageManager.PERMISSION_GRANTED) {
            requestPermissions(new String[] {Manifest.permission.RECORD_AUDIO}, 1);
            return;
        }
        button.setEnabled(false);
        result.setText("Listening ...");
        new Thread(this::recordAndAsk, "recorder").start();
    }

    private void recordAndAsk() {
        try {
            byte[] audio = record();
            fingerprint.generate(AudioDescription.pcm16(RATE, 1), audio);
        } catch (IllegalStateException refused) { // closed meanwhile, or no microphone
            runOnUiThread(() -> show(refused.getMessage()));
        }
    }

    @SuppressLint("MissingPermission") // listen() has asked for it
    private static byte[] record() {
        byte[] audio = new byte[2 * RATE * SECONDS];
        int least = AudioRecord.getMinBufferSize(
                RATE, AudioFormat.CHANNEL_IN_MONO, AudioFormat.ENCODING_PCM_16BIT);
        AudioRecord recorder = new AudioRecord(MediaRecorder.AudioSource.MIC, RATE,
                AudioFormat.CHANNEL_IN_MONO, AudioFormat.ENCODING_PCM_16BIT, 4 * least);
        try {
            recorder.startRecording();
            int filled = 0;
            while (filled < audio.length) {
                int count = recorder.read(audio, filled, audio.length - filled);
                if (count <= 0) {
                    throw new IllegalStateException("The microphone failed (" + count + ")");
                }
                filled += count;
            }
        } finally {
            recorder.release();
        }
        return audio;
    }

    @Override
    public void onFingerprint(Fingerprint source, QueryDocument document) {
        show(document.text());
    }

    @Override
    public void onFailure(Fingerprint source, FingerprintException reason) {
        show(reason.getMessage());
    }

    private void show(String text) {
        button.setEnabled(true);
        result.setText(text);
    }
}
