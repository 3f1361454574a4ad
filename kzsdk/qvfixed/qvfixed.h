/**
 * @file
 * The fixed-point fingerprinter and its parts.
 *
 * Most users reach it through the extraction interface (kzsdk/fpx/fpx.h), as algorithm 1. Its parts
 * are public too: configuration, frame manager, signal detector and equaliser.
 *
 * The path of the samples: interleaved bytes -> mono Q29 or Q30 -> 11025 Hz -> leading silence
 * dropped -> frames of 32768 samples, one every 11264 -> equalised, decimated by two, transformed
 * -> 15 bands. Twelve frames make a fingerprint of 30 values.
 *
 * Order of two pieces. A frame comes in the order of time: `first` is the older piece, `second`
 * follows it. (The two runs of a dot product, in convolve.h, come newest first.)
 *
 * Threads: none of these objects may be used by two threads at once; different objects are
 * independent. Arithmetic: integer, modulo 2^32; results are bit-identical on every machine.
 */
#ifndef KZSDK_QVFIXED_QVFIXED_H
#define KZSDK_QVFIXED_QVFIXED_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"
#include "kzsdk/dsp/dct.h"
#include "kzsdk/dsp/fxp.h"
#include "kzsdk/dsp/resampler.h"
#include "kzsdk/xml/xml.h"

KZ_C_BEGIN

/* ---- Configuration --------------------------------------------------------------------------- */

/** Every tuning value of the algorithm. */
typedef struct kzqvfixed_config {
    uint8_t detect_signal;           /**< 1: skip leading silence */
    uint32_t detector_window;        /**< samples at the working rate; 128 */
    uint32_t detector_threshold;     /**< mean absolute deviation that counts as signal; 100 */
    uint32_t detector_max_deviation; /**< each deviation is clamped to this; 1000 */
    uint32_t histogram_levels;       /**< of the equaliser; 256; 0 switches it off */
    uint32_t sample_rate;            /**< working rate, hertz with 12 fraction bits; 11025 << 12 */
    uint32_t frame_length_log2;      /**< 15: frames of 32768 samples, 2.97 s */
    uint32_t frame_hop;              /**< samples from one frame start to the next; 11264, 1.02 s */
    uint32_t freq_table_count;       /**< entries of freq_table, two per band; 30 */
    int32_t* freq_table;             /**< owned; pairs of first and last bin, both inclusive */
    uint32_t frame_limit;            /**< frames of a complete fingerprint; 12; 0 for no limit */
    uint32_t skip_frames;            /**< frames dropped before the first that counts; 0 */
    uint32_t fingerprint_scale;      /**< full scale of a fingerprint value; 32768; not read */
} kzqvfixed_config;

/**
 * Makes a configuration with the defaults given at its fields.
 *
 * @param[out] out  The record, which the caller frees with kzqvfixed_config_destroy().
 * @return 0; KZ_QV_ERROR_INVALID_ARGUMENT when @p out is null; KZ_QV_ERROR_MEMORY when memory is
 *         short (*out is untouched).
 */
KZ_API kz_status kzqvfixed_config_create(kzqvfixed_config** out) KZ_NOEXCEPT;

/** Frees a configuration and its table; null is ignored. Returns 0. */
KZ_API kz_status kzqvfixed_config_destroy(kzqvfixed_config* config) KZ_NOEXCEPT;

/**
 * Copies the band table.
 *
 * @param[out] out_table  A new array, which the caller frees with _kzmem_free(). Null when memory
 *                        is short.
 * @param[out] out_count  Its number of entries; 0 when memory is short.
 * @return 0 in every case. Both outputs are untouched when the table or any pointer is null.
 */
KZ_API kz_status kzqvfixed_config_copy_freq_table(const kzqvfixed_config* config,
                                                  int32_t** out_table,
                                                  uint32_t* out_count) KZ_NOEXCEPT;

/**
 * Replaces the band table by a copy of @p table.
 *
 * @param table  @p count bins, in pairs; a last odd one is ignored. Null leaves no table. May be
 *               the record's own. Bins outside the spectrum are cut to it when a frame is analysed.
 *               Amplitudes are weighted by a band's number, for the default widths; those beyond
 *               the fifteenth are 0.
 * @return 0 in every case; when memory is short the record is left without a table.
 */
KZ_API kz_status kzqvfixed_config_set_freq_table(kzqvfixed_config* config, const int32_t* table,
                                                 uint32_t count) KZ_NOEXCEPT;

/* ---- Signal detector ------------------------------------------------------------------------- */

/** Finds the end of leading silence: a moving mean, and a moving mean of the deviation from it. */
typedef struct kzqvfixed_signal_detector {
    uint32_t window;       /**< W: length of both moving means, in samples */
    uint32_t threshold;    /**< of the mean deviation */
    int32_t max_deviation; /**< clamp of one deviation */
    uint32_t primed;       /**< 1 once the first block has filled the rings */
    int32_t level_sum;     /**< of `levels` */
    int32_t deviation_sum; /**< of `deviations` */
    uint32_t position;     /**< next slot of both rings */
    int32_t* levels;       /**< owned; W recent samples, scaled */
    int32_t* deviations;   /**< owned; W recent deviations, clamped */
} kzqvfixed_signal_detector;

/**
 * Makes a detector.
 *
 * @param window         1 .. 2^30 - 1 samples.
 * @param threshold      Of the mean deviation, in units of the shifted samples, compared unsigned.
 * @param max_deviation  Clamp of one deviation, in the same units, compared signed.
 * @return The detector, which the caller frees with kzqvfixed_signal_detector_destroy(); null when
 *         the window is out of range or memory is short.
 */
KZ_API kzqvfixed_signal_detector*
kzqvfixed_signal_detector_create(uint32_t window, uint32_t threshold,
                                 int32_t max_deviation) KZ_NOEXCEPT;

/** Frees a detector; null is ignored. */
KZ_API void kzqvfixed_signal_detector_destroy(kzqvfixed_signal_detector* detector) KZ_NOEXCEPT;

/** Forgets all samples: the next block primes the rings. Null is ignored. Returns 0. */
KZ_API kz_status kzqvfixed_signal_detector_reset(kzqvfixed_signal_detector* detector) KZ_NOEXCEPT;

/**
 * Looks for the start of the signal in the next block of a stream.
 *
 * What counts as signal depends on the level that conversion and resampling have left: stereo
 * counts twice what mono does, 22050 and 44100 Hz half of what other rates do.
 *
 * The first block after a reset serves twice: its first W samples fill the rings (zeros where it is
 * shorter), and are then scanned like all others.
 *
 * @param samples  @p count samples.
 * @param shift    Samples are shifted right by this, towards zero, before they are judged; 13 is
 *                 what the fingerprinter uses. 32 or more makes every sample 0, and so does a
 *                 negative shift.
 * @return Half a window before the sample at which the mean deviation exceeds the threshold, 0 when
 *         that lies before the block; @p count when there is no signal, the detector is null, or
 *         @p samples is null.
 */
KZ_API uint32_t kzqvfixed_signal_detector_get_signal_offset(kzqvfixed_signal_detector* detector,
                                                            const FxpType* samples, uint32_t count,
                                                            int32_t shift) KZ_NOEXCEPT;

/* ---- Histogram equalisation ------------------------------------------------------------------ */

/**
 * Replaces each sample of a frame by its rank in the frame's own distribution.
 *
 * The samples are the first @p output_length of the two pieces laid end to end. Each is quantised
 * to one of @p levels levels between the frame's minimum and maximum, and each level becomes 32768
 * times its cumulative count, less the mean over the frame. A frame of 32768 samples comes out as a
 * zero-mean signal of roughly +-2^29; the factor 32768 does not follow the frame's length, so
 * longer frames wrap.
 *
 * A frame whose halved range is 8192 or less counts as silent and is copied. The copy, which also
 * serves when memory is short, takes from @p second all samples that are missing, whatever
 * @p second_count says: unless @p second is null it must then hold @p output_length less those used
 * of @p first.
 *
 * @param first, second  Pieces, the older one first. A null piece counts as no samples.
 * @param output         Room for @p output_length samples, apart from the pieces. Samples that
 *                       neither piece provides are not written.
 * @param histogram      @p levels + 1 counters. The first @p levels hold the number of samples on
 *                       each level afterwards: 0 for a silent frame, what they held before when
 *                       memory is short.
 * @param levels         K, 1 or more; 0, or a null output or histogram, does nothing. Only 129 to
 *                       256 levels are spread evenly: with fewer the last takes most of the
 *                       samples, with more the upper ones stay unused.
 * @return 0.
 */
KZ_API kz_status kzqvfixed_hist_eq_dual(const FxpType* first, uint32_t first_count,
                                        const FxpType* second, uint32_t second_count,
                                        FxpType* output, uint32_t output_length,
                                        uint32_t* histogram, uint32_t levels) KZ_NOEXCEPT;

/**
 * The same for one piece, without the test for silence: a constant frame is all level 0. When
 * memory is short the samples are copied.
 *
 * @param input      @p count samples.
 * @param output     Room for @p count samples; @p input itself, or apart from it.
 * @param histogram  @p levels + 1 counters, scratch.
 * @param levels     K, 1 or more; 0, or a null array, does nothing.
 * @return 0.
 */
KZ_API kz_status kzqvfixed_hist_eq2(const FxpType* input, FxpType* output, uint32_t count,
                                    uint32_t* histogram, uint32_t levels) KZ_NOEXCEPT;

/* ---- Frame manager --------------------------------------------------------------------------- */

/**
 * Square root of a Q30 value or any other: floor(sqrt(value * 2^30)) for a value up to 2^30. Above,
 * the remainder can wrap and the result be one less.
 */
KZ_API uint32_t sq_root(uint32_t value) KZ_NOEXCEPT;

/** What is kept of one frame. */
typedef struct kzqvfixed_frame_record {
    int32_t* energy;     /**< per band, in this record's block */
    uint32_t* amplitude; /**< per band, weighted, in this record's block */
    struct kzqvfixed_frame_record* next;
} kzqvfixed_frame_record;

/** Turns frames into band features and these into the fingerprint. Read it, do not change it. */
typedef struct kzqvfixed_frame_manager {
    uint32_t skip_frames;                  /**< as configured */
    uint32_t frame_limit;                  /**< as configured; 0 for no limit */
    uint32_t fingerprint_scale;            /**< as configured; not read */
    uint32_t skip_remaining;               /**< frames that are still to be dropped */
    uint32_t frame_count;                  /**< records in the list */
    kzqvfixed_frame_record* records;       /**< owned list, oldest first */
    kzqvfixed_frame_record** records_tail; /**< the link that the next record goes into */
    uint32_t frame_length;                 /**< N, in samples */
    FxpType* frame_buffer;                 /**< owned; N samples */
    KZDSP_resampler_fixed* decimator;      /**< owned; halves the rate */
    uint32_t half_length;                  /**< N / 2 */
    FxpType* spectrum;                     /**< owned; N / 2 words */
    KZDSP_DCT_fixed* dct;                  /**< owned; N / 2 points */
    uint32_t band_table_count;             /**< entries of band_table */
    int32_t* band_table;                   /**< owned; pairs of first and last bin */
    uint32_t band_count;                   /**< pairs in band_table */
    uint32_t histogram_levels;             /**< K; 0 for no equalisation */
    uint32_t* histogram;                   /**< owned; K + 1 counters, or null */
    int16_t* fingerprint;                  /**< owned; two values per band */
    uint8_t fingerprint_ready;             /**< `fingerprint` matches the list */
} kzqvfixed_frame_manager;

/**
 * Makes a frame manager.
 *
 * @param config  Only read during the call. The order of the transform, frame_length_log2 less 1,
 *                must be 14 or 15.
 * @return The manager, which the caller frees with kzqvfixed_frame_manager_destroy(); null when
 *         @p config is null, any part cannot be made or memory is short.
 */
KZ_API kzqvfixed_frame_manager*
kzqvfixed_frame_manager_create(const kzqvfixed_config* config) KZ_NOEXCEPT;

/** Frees a manager with all it owns; null is ignored. Returns 0. */
KZ_API kz_status kzqvfixed_frame_manager_destroy(kzqvfixed_frame_manager* manager) KZ_NOEXCEPT;

/**
 * Drops all records and starts over, with the configured frames to skip. Null is ignored.
 *
 * @return 0.
 */
KZ_API kz_status kzqvfixed_frame_manager_reset(kzqvfixed_frame_manager* manager) KZ_NOEXCEPT;

/**
 * Analyses one frame, given in two pieces: the end of a ring buffer and its beginning.
 *
 * The frame is dropped while frames are to be skipped, when the limit is reached, and when memory
 * for its record is short. Pieces longer than a frame are cut. Pieces shorter than a frame leave
 * the rest of the frame as the previous one left it (zeros at first).
 *
 * Precondition: with equalisation on, @p second holds all samples of a frame that @p first does
 * not, whatever @p second_count says (see kzqvfixed_hist_eq_dual()).
 *
 * @param first   Oldest samples; null drops the frame.
 * @param second  The samples that follow; null counts as none.
 * @return 0 in every case.
 */
KZ_API kz_status kzqvfixed_frame_manager_append_dual_PCM_data(kzqvfixed_frame_manager* manager,
                                                              const FxpType* first,
                                                              uint32_t first_count,
                                                              const FxpType* second,
                                                              uint32_t second_count) KZ_NOEXCEPT;

/** Number of frames kept; 0 for null. */
KZ_API uint32_t kzqvfixed_frame_manager_get_frame_count(const kzqvfixed_frame_manager* manager)
    KZ_NOEXCEPT;

/** 1 when there is a limit and it is reached, else 0; 0 for null. */
KZ_API uint8_t kzqvfixed_frame_manager_reached_frame_limit(const kzqvfixed_frame_manager* manager)
    KZ_NOEXCEPT;

/** Frames kept in percent of the limit, 0 .. 100; 0 for null or without a limit. */
KZ_API uint32_t kzqvfixed_frame_manager_get_percent_progress(const kzqvfixed_frame_manager* manager)
    KZ_NOEXCEPT;

/** Bytes of the fingerprint: four per band; 0 for null. */
KZ_API uint32_t kzqvfixed_frame_manager_get_fingerprint_size(const kzqvfixed_frame_manager* manager)
    KZ_NOEXCEPT;

/**
 * Condenses all frames into the fingerprint: per band the root of the mean energy, then per band
 * the standard deviation of the amplitude, each set as shares of its own total in units of 1 /
 * 32768, truncated, in 16 bits. (A share of the whole, 32768, is therefore stored as -32768.) A set
 * whose total is too small to divide by, as from silence or a single frame, is all 0.
 *
 * The deviations are from the average for 8 to 15 frames. For other numbers of frames they are
 * from a point that a power of two lies between it and the average, and from 16 on their sums can
 * wrap.
 *
 * @param destination  Room for @p capacity bytes, at any address.
 * @return Bytes written: the size, or 0 when a pointer is null, @p capacity is below the size, or
 *         memory is short.
 */
KZ_API uint32_t kzqvfixed_frame_manager_get_fingerprint(kzqvfixed_frame_manager* manager,
                                                        void* destination,
                                                        uint32_t capacity) KZ_NOEXCEPT;

/* ---- Fingerprinter --------------------------------------------------------------------------- */

/** Samples that are converted at a time. */
#define KZQVFIXED_CONVERSION_SAMPLES 4096

/** A fingerprint context: row 1 of the extraction interface. Read it, do not change it. */
typedef struct kzqvfixed_fingerprinter {
    uint32_t channel_count;                 /**< 1 or 2 */
    uint32_t input_rate;                    /**< hertz */
    uint32_t input_format;                  /**< 1 8-bit PCM, 2 16-bit PCM, 3 A-law, 4 mu-law */
    uint32_t frame_bytes;                   /**< of one sample of every channel */
    uint32_t working_rate;                  /**< hertz with 12 fraction bits */
    KZDSP_resampler_fixed* resampler;       /**< owned */
    kzqvfixed_frame_manager* frame_manager; /**< owned */
    uint32_t frame_limit;          /**< while not 0, only a complete fingerprint is given out */
    uint8_t searching_for_signal;  /**< 1 while leading silence is being skipped */
    uint8_t signal_search_enabled; /**< as configured */
    uint32_t signal_offset;        /**< working-rate samples dropped as leading silence */
    kzqvfixed_signal_detector* signal_detector;              /**< owned */
    FxpType conversion_buffer[KZQVFIXED_CONVERSION_SAMPLES]; /**< one chunk, mono */
    uint32_t frame_length;                                   /**< in samples */
    uint32_t frame_start;    /**< ring index of the next frame's first sample */
    uint32_t write_position; /**< ring index of the next sample to store */
    FxpType* ring;           /**< owned; frame_length samples */
    uint32_t hop;            /**< samples from one frame start to the next */
} kzqvfixed_fingerprinter;

/**
 * Makes a fingerprinter.
 *
 * @param algorithm    Not used.
 * @param sample_rate  Hertz: 8000, 11025, 16000, 22050, 24000, 32000, 44100 or 48000.
 * @param format       1 8-bit PCM, 2 16-bit PCM, 3 A-law, 4 mu-law.
 * @param channels     1 or 2.
 * @param[out] out_object  The fingerprinter, which the caller frees with kzqvfixed_destructor();
 *                     untouched on failure.
 * @return 0; KZ_QV_ERROR_INVALID_ARGUMENT for a rate of 0, a bad format or channel count, or a null
 *         pointer; KZ_QV_ERROR_MEMORY for an unsupported rate or when memory is short.
 */
KZ_API kz_status kzqvfixed_constructor(uint32_t algorithm, uint32_t sample_rate, uint32_t format,
                                       uint32_t channels,
                                       kzqvfixed_fingerprinter** out_object) KZ_NOEXCEPT;

/** Frees a fingerprinter. Returns 0, or KZ_QV_ERROR_INVALID_ARGUMENT for null. */
KZ_API kz_status kzqvfixed_destructor(kzqvfixed_fingerprinter* object) KZ_NOEXCEPT;

/**
 * Feeds interleaved audio; see kz_fpx_fingerprint_add_audio().
 *
 * @param bytes       At any address; read only during the call.
 * @param byte_count  A whole number of frames, not 0.
 * @param[out] out_complete  Set to 1 once the frame limit is reached, else to 0.
 * @return 0; KZ_QV_ERROR_INVALID_ARGUMENT for a null pointer or a bad byte count (nothing is
 *         consumed then).
 */
KZ_API kz_status kzqvfixed_add_samples(kzqvfixed_fingerprinter* object, const void* bytes,
                                       uint32_t byte_count, uint8_t* out_complete) KZ_NOEXCEPT;

/**
 * Builds the query document of a complete fingerprint.
 *
 * @param[out] out_tree  The document's root, which the caller frees with DisposeXMLTag(); untouched
 *                       on failure.
 * @return 0; KZ_QV_ERROR_INVALID_ARGUMENT for a null pointer; KZ_QV_ERROR_INCOMPLETE when the
 *         fingerprint is not complete; KZ_QV_ERROR_MEMORY when memory is short.
 */
KZ_API kz_status kzqvfixed_get_result(kzqvfixed_fingerprinter* object,
                                      XMLTag** out_tree) KZ_NOEXCEPT;

/**
 * Reports how far the fingerprint is.
 *
 * @param[out] out_percent  0 .. 100.
 * @return 0, or KZ_QV_ERROR_INVALID_ARGUMENT for a null pointer.
 */
KZ_API kz_status kzqvfixed_get_percent_progress(const kzqvfixed_fingerprinter* object,
                                                uint32_t* out_percent) KZ_NOEXCEPT;

KZ_C_END

#endif
