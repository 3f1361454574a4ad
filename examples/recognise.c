/*
 * Recognises a piece of music: makes a catalogue of three tunes that the program plays to itself,
 * takes a clip out of the middle of one of them, adds noise, and looks it up.
 *
 *     cc recognise.c $(pkg-config --cflags --libs kzcat) -o recognise
 *     ./recognise
 */
#include <stdio.h>
#include <stdlib.h>

#include "kzcat.h"

enum { RATE = 22050, TUNES = 3, TUNE_SECONDS = 40, CLIP_START = 17, CLIP_SECONDS = 8 };

/* The low 32 bits of a product; in 64 bits, so that nothing overflows. */
static uint32_t product(uint32_t a, uint32_t b) { return (uint32_t)((uint64_t)a * b & UINT32_MAX); }

/* A note of the scale, scattered so that no tune repeats itself: a clip then has one place only. */
static uint32_t pitch_of(uint32_t tune, uint32_t note)
{
    static const uint32_t hertz[] = {262, 330, 392, 523, 440, 349, 294, 392, 330, 247, 494, 587};
    uint32_t scattered = product(note + 1000 * tune + 1, 2654435761U);
    scattered = product(scattered ^ scattered >> 15, 2246822519U);
    return hertz[(scattered ^ scattered >> 13) % 12];
}

/* One note every fifth of a second; a sawtooth, so that it has overtones. */
static int16_t tune_sample(uint32_t tune, uint32_t frame)
{
    const uint32_t pitch = pitch_of(tune, frame / (RATE / 5));
    const uint32_t position = frame * pitch % RATE;
    const uint32_t fading = RATE / 5 - frame % (RATE / 5);
    const int32_t saw = (int32_t)(position * 16384 / RATE) - 8192;
    return (int16_t)(saw * (int32_t)(fading / 4) / (RATE / 20));
}

/* The same numbers everywhere; about 12 dB below the music. */
static int16_t noise_sample(void)
{
    static uint32_t state = 1;
    state = (uint32_t)(((uint64_t)state * 1664525U + 1013904223U) & UINT32_MAX);
    return (int16_t)((int32_t)(state >> 20) - 2048);
}

/* Samples of a tune, which the caller frees. */
static int16_t* play(uint32_t tune, uint32_t start_seconds, uint32_t seconds, int noisy)
{
    const uint32_t count = seconds * RATE;
    int16_t* samples = (int16_t*)malloc(count * sizeof *samples); /* C++ needs the cast */
    uint32_t i = 0;
    for (i = 0; samples != NULL && i < count; ++i) {
        const int16_t noise = noisy ? noise_sample() : 0;
        samples[i] = (int16_t)(tune_sample(tune, start_seconds * RATE + i) + noise);
    }
    return samples;
}

static kzcat_status add_tune(kzcat_catalogue* catalogue, const kzcat_format* format, uint32_t tune)
{
    static const char* const names[TUNES] = {"First tune", "Second tune", "Third tune"};
    const kzcat_tag title = {"title", names[tune]};
    kzcat_new_track track = {NULL, {names[tune], -1, -1, NULL}, &title, 1};
    kzcat_builder* builder = NULL;
    kzcat_trail* trail = NULL;
    int16_t* samples = play(tune, 0, TUNE_SECONDS, 0);
    kzcat_status status =
        samples == NULL ? KZCAT_ERROR_MEMORY : kzcat_builder_create(format, NULL, &builder);
    if (status == KZCAT_OK) {
        status = kzcat_builder_feed(builder, samples, TUNE_SECONDS * RATE * sizeof *samples);
    }
    if (status == KZCAT_OK) {
        status = kzcat_builder_finish(builder, &trail);
    }
    if (status == KZCAT_OK) {
        track.trail = trail;
        status = kzcat_add(catalogue, &track, 1, NULL);
    }
    kzcat_trail_free(&trail);
    kzcat_builder_free(&builder);
    free(samples);
    return status;
}

static kzcat_status print_result(const kzcat_result* result)
{
    kzcat_summary summary;
    kzcat_match match;
    kzcat_status status = kzcat_result_get_summary(result, &summary);
    if (status == KZCAT_OK && summary.verdict == KZCAT_VERDICT_MATCH) {
        status = kzcat_result_get_match(result, 0, &match);
    } else if (status == KZCAT_OK) {
        puts(kzcat_verdict_text(summary.verdict));
        return status;
    }
    if (status == KZCAT_OK) {
        printf("%s, from second %.1f on\n", match.title, match.offset);
    }
    return status;
}

/* Looks up a noisy clip out of the middle of a tune. */
static kzcat_status recognise_clip(kzcat_catalogue* catalogue, const kzcat_format* format,
                                   uint32_t tune)
{
    kzcat_query* query = NULL;
    kzcat_result* result = NULL;
    int16_t* samples = play(tune, CLIP_START, CLIP_SECONDS, 1);
    kzcat_status status = samples == NULL ? KZCAT_ERROR_MEMORY : kzcat_query_create(format, &query);
    if (status == KZCAT_OK) {
        status = kzcat_query_feed(query, samples, CLIP_SECONDS * RATE * sizeof *samples);
    }
    if (status == KZCAT_OK) {
        status = kzcat_query_finish(query);
    }
    if (status == KZCAT_OK) {
        status = kzcat_recognise(catalogue, query, NULL, &result);
    }
    if (status == KZCAT_OK) {
        status = print_result(result);
    }
    kzcat_result_free(&result);
    kzcat_query_free(&query);
    free(samples);
    return status;
}

int main(void)
{
    const kzcat_format format = {KZ_STREAM_FORMAT_PCM16, RATE, 1, 0};
    kzcat_catalogue* catalogue = NULL;
    uint32_t tune = 0;
    kzcat_status status = kzcat_open(NULL, KZCAT_ACCESS_CREATE, NULL, &catalogue);
    for (tune = 0; status == KZCAT_OK && tune < TUNES; ++tune) {
        status = add_tune(catalogue, &format, tune);
    }
    if (status == KZCAT_OK) {
        status = recognise_clip(catalogue, &format, 1);
    }
    if (status != KZCAT_OK) {
        fprintf(stderr, "not recognised: %s\n", kzcat_get_error_text());
    }
    kzcat_close(&catalogue);
    return status == KZCAT_OK ? EXIT_SUCCESS : EXIT_FAILURE;
}
