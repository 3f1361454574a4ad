/*
 * Prints the query document of a piece of music: of a headerless 16-bit stereo file at 44100 Hz
 * when one is named, else of a tune that the program plays to itself.
 *
 *     cc fingerprint_tune.c $(pkg-config --cflags --libs kzsdk) -o fingerprint_tune
 *     ./fingerprint_tune
 *     sox song.flac -t raw -e signed -b 16 -c 2 -r 44100 - | ./fingerprint_tune /dev/stdin
 */
#include <stdio.h>
#include <stdlib.h>

#include "kzsdk/kzsdk.h"

enum { RATE = 44100, CHANNELS = 2, FRAMES_AT_A_TIME = 4096, TUNE_SECONDS = 16 };

static FILE* file;
static uint32_t frames_played;

/* One note every quarter of a second, taken from a scale; a sawtooth, so that it has overtones. */
static int16_t tune_sample(uint32_t frame)
{
    static const uint32_t hertz[] = {262, 330, 392, 523, 440, 349, 294, 392, 330, 247, 494, 587};
    const uint32_t note = frame / (RATE / 4);
    const uint32_t position = frame * hertz[(note * 5 + note / 7) % 12] % RATE;
    const uint32_t fading = RATE / 4 - frame % (RATE / 4);
    const int32_t saw = (int32_t)(position * 16384 / RATE) - 8192;
    return (int16_t)(saw * (int32_t)(fading / 4) / (RATE / 16));
}

/* Fills `samples` and returns the number of bytes, 0 at the end. */
static size_t next_piece(int16_t* samples)
{
    size_t count = 0;
    if (file != NULL) {
        return fread(samples, 1, FRAMES_AT_A_TIME * CHANNELS * sizeof(int16_t), file);
    }
    while (count < FRAMES_AT_A_TIME && frames_played < TUNE_SECONDS * RATE) {
        samples[2 * count] = samples[2 * count + 1] = tune_sample(frames_played++);
        ++count;
    }
    return count * CHANNELS * sizeof(int16_t);
}

/* Feeds the stream until it is complete or the music ends. */
static kz_status feed(kz_stream* stream)
{
    static int16_t samples[FRAMES_AT_A_TIME * CHANNELS];
    uint8_t complete = 0;
    size_t bytes = 0;
    kz_status status = KZ_OK;
    while (status == KZ_OK && !complete && (bytes = next_piece(samples)) != 0) {
        status = kz_stream_feed(stream, samples, bytes, NULL, &complete);
    }
    return status == KZ_OK ? kz_stream_finish(stream, &complete) : status;
}

/* Prints the document, or what the music lacks. */
static kz_status print_document(kz_stream* stream)
{
    const char* document = NULL;
    kz_stream_state state;
    const kz_status status = kz_stream_get_document(stream, &document);
    if (status == KZ_OK) {
        fputs(document, stdout);
    } else if (status == KZ_QV_ERROR_INCOMPLETE && kz_stream_get_state(stream, &state) == KZ_OK) {
        fprintf(stderr, "%.1f s of silence, %.1f s of sound: %.1f s more are needed\n",
                (double)state.silence_milliseconds / 1000, (double)state.sound_milliseconds / 1000,
                (double)state.missing_milliseconds / 1000);
    }
    return status;
}

static kz_status fingerprint(void)
{
    kz_stream_settings settings;
    kz_stream* stream = NULL;
    kz_status status = kz_stream_initialize_settings(&settings);
    settings.format = KZ_STREAM_FORMAT_PCM16;
    settings.sample_rate = RATE;
    settings.channels = CHANNELS;
    if (status == KZ_OK) {
        status = kz_stream_create(&settings, &stream);
    }
    if (status == KZ_OK) {
        status = feed(stream);
    }
    if (status == KZ_OK) {
        status = print_document(stream);
    }
    kz_stream_free(&stream);
    return status;
}

int main(int argc, char** argv)
{
    kz_status status = KZ_OK;
    if (argc > 1 && (file = fopen(argv[1], "rb")) == NULL) {
        perror(argv[1]);
        return EXIT_FAILURE;
    }
    status = fingerprint();
    if (status != KZ_OK) {
        fprintf(stderr, "no fingerprint: %s\n", kz_status_text(status));
    }
    if (file != NULL) {
        fclose(file);
    }
    return status == KZ_OK ? EXIT_SUCCESS : EXIT_FAILURE;
}
