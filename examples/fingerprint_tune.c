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

/* Fills `samples` and returns the number of frames, 0 at the end. */
static uint32_t next_piece(int16_t* samples)
{
    uint32_t count = 0;
    if (file != NULL) {
        return (uint32_t)fread(samples, CHANNELS * sizeof(int16_t), FRAMES_AT_A_TIME, file);
    }
    while (count < FRAMES_AT_A_TIME && frames_played < TUNE_SECONDS * RATE) {
        samples[2 * count] = samples[2 * count + 1] = tune_sample(frames_played++);
        ++count;
    }
    return count;
}

static kz_status print_document(kz_fpx_handle* handle)
{
    char* document = NULL;
    const kz_status status = kz_fpx_fingerprint_serialize(handle, &document);
    if (status == KZ_OK) {
        fputs(document, stdout);
        kz_fpx_fingerprint_serialize_free(&document);
    }
    return status;
}

static kz_status fingerprint(void)
{
    static int16_t samples[FRAMES_AT_A_TIME * CHANNELS];
    kz_fpx_handle* handle = NULL;
    uint8_t complete = 0;
    uint32_t count = 0;
    kz_status status = kz_fpx_fingerprint_create(KZ_FPX_ALGORITHM_FIXED, KZ_FPX_FORMAT_PCM16, RATE,
                                                 CHANNELS, &handle);
    while (status == KZ_OK && !complete && (count = next_piece(samples)) != 0) {
        const uint32_t bytes = count * CHANNELS * (uint32_t)sizeof(int16_t);
        status = kz_fpx_fingerprint_add_audio(handle, samples, bytes, &complete);
    }
    if (status == KZ_OK) {
        status = print_document(handle); /* refused when the music was too short */
    }
    kz_fpx_fingerprint_free(&handle);
    return status;
}

int main(int argc, char** argv)
{
    kzconf_configuration configuration;
    kz_status status = KZ_OK;
    if (argc > 1 && (file = fopen(argv[1], "rb")) == NULL) {
        perror(argv[1]);
        return EXIT_FAILURE;
    }
    kzconf_initialize_configuration(&configuration);
    status = kzinit_initialize_vesk(&configuration);
    if (status == KZ_OK) {
        status = fingerprint();
    }
    if (status != KZ_OK) {
        fprintf(stderr, "no fingerprint: status %08lX\n", (unsigned long)status);
    }
    kzinit_shutdown_vesk();
    if (file != NULL) {
        fclose(file);
    }
    return status == KZ_OK ? EXIT_SUCCESS : EXIT_FAILURE;
}
