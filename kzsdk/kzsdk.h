/**
 * @file
 * libkzsdk condenses 14.22 seconds of audio into 30 numbers, written as a short XML document
 * that a recognition service can be asked with. Eight calls do it:
 *
 *     kzconf_configuration configuration;
 *     kzconf_initialize_configuration(&configuration);      clears the start-up record
 *     kzinit_initialize_vesk(&configuration);               starts the library: memory is on
 *
 *     kz_fpx_handle* handle = NULL;
 *     uint8_t complete = 0;
 *     char* document = NULL;
 *     kz_fpx_fingerprint_create(KZ_FPX_ALGORITHM_FIXED, KZ_FPX_FORMAT_PCM16, 44100, 2, &handle);
 *     while (!complete && more audio is at hand) {
 *         kz_fpx_fingerprint_add_audio(handle, audio, byte_count, &complete);
 *     }
 *     if (complete) {
 *         kz_fpx_fingerprint_serialize(handle, &document);  the document, NUL-terminated
 *         ...
 *         kz_fpx_fingerprint_serialize_free(&document);
 *     }
 *     kz_fpx_fingerprint_free(&handle);
 *
 *     kzinit_shutdown_vesk();                               once, when everything is given back
 *
 * Every call returns a kz_status: 0 for success, else one of the codes in kzsdk/abs/status.h.
 * `examples/fingerprint_tune.c` is this page as a program.
 *
 * Start the library once, before any thread uses it, and shut it down once: there is no reference
 * count, and what is still out at shut-down can no longer be freed. In between, handles are
 * independent of each other; one handle belongs to one thread at a time.
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

/* The extraction interface: the door for most users. */
#include "kzsdk/fpx/fpx.h"

/* The files and labels of optical discs; works without start-up. */
#include "kzsdk/disc/disc.h"

#endif
