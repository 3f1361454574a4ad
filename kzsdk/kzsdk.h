/**
 * @file
 * libkzsdk condenses 14.22 seconds of audio into 30 numbers, which can be written as a short XML
 * document, the query that a recognition service is sent. A stream takes sound in any format, cut
 * anywhere (kzsdk/stream/stream.h):
 *
 *     kz_stream_settings settings;
 *     kz_stream* stream = NULL;
 *     uint8_t complete = 0;
 *     int16_t values[30];
 *     uint32_t count = 0;
 *     const char* document = NULL;
 *
 *     kz_stream_initialize_settings(&settings);             16 bits, 44100 Hz, stereo
 *     if (kz_stream_create(&settings, &stream) != KZ_OK) {
 *         return;                                           kz_status_text() says why
 *     }
 *     while (!complete && more audio is at hand) {
 *         kz_stream_feed(stream, audio, byte_count, NULL, &complete);
 *     }
 *     kz_stream_finish(stream, &complete);
 *     if (complete) {
 *         kz_stream_get_values(stream, values, 30, &count);
 *         kz_stream_get_document(stream, &document);        the stream's, NUL-terminated
 *     }                                                     else kz_stream_get_state() says why
 *     kz_stream_free(&stream);
 *
 * Every call returns a kz_status: 0 for success, else one of the codes in kzsdk/abs/status.h, for
 * each of which kz_status_text() has a sentence. `examples/fingerprint_tune.c` is this page as a
 * program.
 *
 * Below a stream lies the extraction interface (kzsdk/fpx/fpx.h), and below that every part of the
 * fingerprinters can be called alone. Their callers start the library first: with kzinit_acquire()
 * and kzinit_release(), which count, or with kzinit_initialize_vesk() and kzinit_shutdown_vesk(),
 * of which one shut-down ends the library for all (kzsdk/abs/startup.h). Streams, handles and
 * objects are independent of each other; each belongs to one thread at a time.
 *
 * The headers below are the library's families, lowest first. Each can be included alone.
 */
#ifndef KZSDK_KZSDK_H
#define KZSDK_KZSDK_H

/* Platform layer: status codes, start-up, memory, text, mathematics, a growable buffer. */
#include "kzsdk/abs/base.h"
#include "kzsdk/abs/dyn_buf.h"
#include "kzsdk/abs/mathfn.h"
#include "kzsdk/abs/memory.h"
#include "kzsdk/abs/startup.h"
#include "kzsdk/abs/status.h"
#include "kzsdk/abs/text.h"
#include "kzsdk/abs/version.h"

/* Trees of XML tags and their text. */
#include "kzsdk/xml/xml.h"

/* Signal processing: fixed-point arithmetic, sample conversion, transform, resampling. */
#include "kzsdk/dsp/convert.h"
#include "kzsdk/dsp/convolve.h"
#include "kzsdk/dsp/dct.h"
#include "kzsdk/dsp/fxp.h"
#include "kzsdk/dsp/resampler.h"

/* The fixed-point fingerprinter and its parts. */
#include "kzsdk/qvfixed/qvfixed.h"
#include "kzsdk/qvfloat/qvfloat.h"

/* The extraction interface: one algorithm or the other, in the formats that they take. */
#include "kzsdk/fpx/fpx.h"

/* Streams: sound in any format, cut anywhere. The entry point for most users. */
#include "kzsdk/stream/stream.h"

/* The files and labels of optical discs; works without start-up. */
#include "kzsdk/disc/disc.h"

#endif
