/**
 * @file
 * The floating-point fingerprinter and its parts.
 *
 * The same algorithm as the fixed-point fingerprinter (kzsdk/qvfixed/qvfixed.h), in single
 * precision: the same frames, bands and statistics, and a fingerprint on the same scale. It takes
 * any sample rate, and the features of its frames can be exported and appended elsewhere. Most
 * users reach it through the extraction interface (kzsdk/fpx/fpx.h), as algorithm 2.
 *
 * The path of the samples: interleaved bytes -> mono floats, full scale +-32768 -> 11025 Hz ->
 * leading silence dropped -> frames of 32768 samples, one every 11264 -> equalised, transformed ->
 * 15 bands.
 *
 * Order of two pieces. A frame comes in the order of time: `first` is the older piece, `second`
 * follows it. (The two runs of a dot product, in convolve.h, come newest first.)
 *
 * Threads: none of these objects may be used by two threads at once; different objects are
 * independent. Arithmetic: sums accumulate in single precision in the stated order, without
 * contraction. Results are the same on every processor whose C library has the same sine and
 * cosine.
 */
#ifndef KZSDK_QVFLOAT_QVFLOAT_H
#define KZSDK_QVFLOAT_QVFLOAT_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"
#include "kzsdk/dsp/dct.h"
#include "kzsdk/dsp/resampler.h"
#include "kzsdk/xml/xml.h"

KZ_C_BEGIN

/* ---- Configuration --------------------------------------------------------------------------- */

/** Every tuning value of the algorithm; defaults as in kzqvfixed_config. */
typedef struct QVConfig {
    uint32_t detect_signal;          /**< 1: skip leading silence */
    uint32_t detector_window;        /**< samples at the working rate; 128 */
    uint32_t detector_threshold;     /**< mean absolute deviation that counts as signal; 100 */
    uint32_t detector_max_deviation; /**< each deviation is clamped to this; 1000 */
    uint32_t histogram_levels;       /**< of the equaliser; 256; 0 switches it off */
    float sample_rate;               /**< working rate in hertz; 11025 */
    uint32_t frame_length_log2;      /**< 15: frames of 32768 samples, 2.97 s */
    uint32_t frame_hop;              /**< samples from one frame start to the next; 11264, 1.02 s */
    uint32_t freq_table_count;       /**< entries of freq_table, two per band; 30 */
    float* freq_table;               /**< owned; pairs of band edges in hertz */
    uint32_t frame_limit;            /**< frames of a complete fingerprint; 12; 0 for no limit */
    uint32_t skip_frames;            /**< frames dropped before the first that counts; 0 */
    uint32_t fingerprint_scale;      /**< full scale of a fingerprint value; 32768 */
} QVConfig;

/**
 * Makes a configuration with the defaults given at its fields.
 *
 * @param[out] out  The record, which the caller frees with QVConfig_Destroy().
 * @return 0; KZ_QV_ERROR_INVALID_ARGUMENT when @p out is null; KZ_QV_ERROR_MEMORY when memory is
 *         short (*out is untouched).
 */
KZ_API kz_status QVConfig_Create(QVConfig** out) KZ_NOEXCEPT;

/** Frees a configuration and its table; null is ignored. Returns 0. */
KZ_API kz_status QVConfig_Destroy(QVConfig* config) KZ_NOEXCEPT;

/**
 * Copies the band table.
 *
 * @param[out] out_table  A new array, which the caller frees with _kzmem_free(). Null when memory
 *                        is short.
 * @param[out] out_count  Its number of entries; 0 when memory is short.
 * @return 0 in every case. Both outputs are untouched when the table or any pointer is null.
 */
KZ_API kz_status QVConfig_CopyFreqTable(const QVConfig* config, float** out_table,
                                        uint32_t* out_count) KZ_NOEXCEPT;

/**
 * Replaces the band table by a copy of @p table.
 *
 * @param table  @p count edges in hertz, in pairs; a last odd one is ignored. Null leaves no table.
 *               May be the record's own. Edges outside the spectrum are cut to it when a frame is
 *               analysed.
 * @return 0 in every case; when memory is short the record is left without a table.
 */
KZ_API kz_status QVConfig_SetFreqTable(QVConfig* config, const float* table,
                                       uint32_t count) KZ_NOEXCEPT;

/* ---- Signal detector ------------------------------------------------------------------------- */

/** Finds the end of leading silence: a moving mean, and a moving mean of the deviation from it. */
typedef struct QVSD {
    uint32_t window;       /**< W: length of both moving means, in samples */
    uint32_t threshold;    /**< of the mean deviation */
    int32_t max_deviation; /**< clamp of one deviation */
    uint32_t primed;       /**< 1 once the first block has filled the rings */
    int32_t level_sum;     /**< of `levels` */
    int32_t deviation_sum; /**< of `deviations` */
    uint32_t position;     /**< next slot of both rings */
    int32_t* levels;       /**< owned; W recent samples, truncated */
    int32_t* deviations;   /**< owned; W recent deviations, clamped */
} QVSD;

/**
 * Makes a detector.
 *
 * @param window  1 .. 2^30 - 1 samples.
 * @return The detector, which the caller frees with QVSD_Destroy(); null when the window is out of
 *         range or memory is short.
 */
KZ_API QVSD* QVSD_Create(uint32_t window, uint32_t threshold, int32_t max_deviation) KZ_NOEXCEPT;

/** Frees a detector; null is ignored. */
KZ_API void QVSD_Destroy(QVSD* detector) KZ_NOEXCEPT;

/** Forgets all samples: the next block primes the rings. Null is ignored. Returns 0. */
KZ_API kz_status QVSD_Reset(QVSD* detector) KZ_NOEXCEPT;

/**
 * Looks for the start of the signal in the next block of a stream, as
 * kzqvfixed_signal_detector_get_signal_offset() does.
 *
 * @param samples  @p count samples, judged by their whole parts; NaN counts as 0, and what does not
 *                 fit 32 bits as the nearest that does.
 * @return Half a window before the sample at which the mean deviation exceeds the threshold, 0 when
 *         that lies before the block; @p count when there is no signal, the detector is null, or
 *         @p samples is null.
 */
KZ_API uint32_t QVSD_GetSignalOffset(QVSD* detector, const float* samples,
                                     uint32_t count) KZ_NOEXCEPT;

/* ---- Histogram equalisation ------------------------------------------------------------------ */

/**
 * Replaces each sample of a frame by its rank in the frame's own distribution.
 *
 * Each sample is quantised to one of @p levels levels between the frame's minimum and maximum, and
 * each level becomes its cumulative share of the samples, less the mean over the frame: a signal
 * between -1 and 1, 2^30 times smaller than that of kzqvfixed_hist_eq2(). The range always reaches
 * down to 10^6 and up to -10^6, which matters only to frames that lie beyond as a whole. A constant
 * frame is all level 0, and so is a sample that is not a number. When memory is short the samples
 * are copied.
 *
 * @param input   @p count samples.
 * @param output  Room for @p count samples; @p input itself, or apart from it.
 * @param levels  K, 1 or more; 0, or a null array, does nothing.
 * @return 0.
 */
KZ_API kz_status hist_eq(const float* input, float* output, uint32_t count,
                         uint32_t levels) KZ_NOEXCEPT;

/**
 * The same with counters that the caller brings.
 *
 * @param histogram  @p levels counters, scratch.
 */
KZ_API kz_status hist_eq2(const float* input, float* output, uint32_t count, uint32_t* histogram,
                          uint32_t levels) KZ_NOEXCEPT;

/**
 * The same for the first @p output_length samples of two pieces laid end to end.
 *
 * A frame whose range is 1.0 or less counts as silent and is copied. The copy, which also serves
 * when memory is short, takes from @p second all samples that are missing, whatever @p second_count
 * says: unless @p second is null it must then hold @p output_length less those used of @p first.
 *
 * @param first, second  Pieces, the older one first. A null piece counts as no samples.
 * @param output         Room for @p output_length samples, apart from the pieces. Samples that
 *                       neither piece provides are not written.
 * @param histogram      @p levels counters. They hold the number of samples on each level
 *                       afterwards: 0 for a silent frame, what they held before when memory is
 *                       short.
 * @return 0.
 */
KZ_API kz_status hist_eq_dual(const float* first, uint32_t first_count, const float* second,
                              uint32_t second_count, float* output, uint32_t output_length,
                              uint32_t* histogram, uint32_t levels) KZ_NOEXCEPT;

/* ---- Frame manager --------------------------------------------------------------------------- */

/** What is kept of one frame. */
typedef struct QVFrameRecord {
    float* energy;    /**< per band: the sum of squares; in this record's block */
    float* amplitude; /**< per band: the root mean square; in this record's block */
    struct QVFrameRecord* next;
} QVFrameRecord;

/** Turns frames into band features and these into the fingerprint. Read it, do not change it. */
typedef struct QVFM {
    uint32_t skip_frames;         /**< as configured */
    uint32_t frame_limit;         /**< as configured; 0 for no limit */
    uint32_t fingerprint_scale;   /**< as configured */
    uint32_t skip_remaining;      /**< frames that are still to be dropped */
    uint32_t frame_count;         /**< records in the list */
    QVFrameRecord* records;       /**< owned list, oldest first */
    QVFrameRecord** records_tail; /**< the link that the next record goes into */
    uint32_t frame_length;        /**< N, in samples */
    float* frame_buffer;          /**< owned; N samples, then their transform */
    KZDSP_DCT* dct;               /**< owned; N points */
    float bin_width;              /**< hertz */
    uint32_t band_table_count;    /**< entries of band_table */
    float* band_table;            /**< owned; pairs of band edges in hertz */
    uint32_t band_count;          /**< pairs in band_table */
    uint32_t histogram_levels;    /**< K; 0 for no equalisation */
    uint32_t* histogram;          /**< owned; K counters, or null */
    int16_t* fingerprint;         /**< owned; two values per band */
    uint32_t fingerprint_ready;   /**< `fingerprint` matches the list */
} QVFM;

/**
 * Makes a frame manager.
 *
 * @param config  Only read during the call. frame_length_log2 may be 1 to 29.
 * @return The manager, which the caller frees with QVFM_Destroy(); null when @p config is null, any
 *         part cannot be made or memory is short.
 */
KZ_API QVFM* QVFM_Create(const QVConfig* config) KZ_NOEXCEPT;

/** Frees a manager with all it owns; null is ignored. Returns 0. */
KZ_API kz_status QVFM_Destroy(QVFM* manager) KZ_NOEXCEPT;

/**
 * Drops all records and starts over, with the configured frames to skip. Null is ignored.
 *
 * @return 0.
 */
KZ_API kz_status QVFM_Reset(QVFM* manager) KZ_NOEXCEPT;

/**
 * Analyses one frame, given in two pieces: the end of a ring buffer and its beginning.
 *
 * The frame is dropped while frames are to be skipped, when the limit is reached, and when memory
 * for its record is short. Pieces longer than a frame are cut. Pieces shorter than a frame leave
 * the rest of the buffer as it was.
 *
 * Precondition: with equalisation on, @p second holds all samples of a frame that @p first does
 * not, whatever @p second_count says (see hist_eq_dual()).
 *
 * @param first, second  Pieces, the older one first. A null piece counts as none; two null pieces
 *                       are no frame, but still use up a frame to skip.
 * @return 0 in every case.
 */
KZ_API kz_status QVFM_AppendDualPCMData(QVFM* manager, const float* first, uint32_t first_count,
                                        const float* second, uint32_t second_count) KZ_NOEXCEPT;

/**
 * Analyses one frame in one piece. Any other count than the frame's length is no frame.
 *
 * @return 0 in every case.
 */
KZ_API kz_status QVFM_AppendPCMData(QVFM* manager, const float* samples,
                                    uint32_t count) KZ_NOEXCEPT;

/** Number of frames kept; 0 for null. */
KZ_API uint32_t QVFM_GetFrameCount(const QVFM* manager) KZ_NOEXCEPT;

/** 1 when there is a limit and it is reached, else 0; 0 for null. */
KZ_API uint8_t QVFM_ReachedFrameLimit(const QVFM* manager) KZ_NOEXCEPT;

/** Frames kept in percent of the limit, 0 .. 100; 0 for null or without a limit. */
KZ_API uint32_t QVFM_GetPercentProgress(const QVFM* manager) KZ_NOEXCEPT;

/** Bytes of the fingerprint: four per band; 0 for null. */
KZ_API uint32_t QVFM_GetFingerprintSize(const QVFM* manager) KZ_NOEXCEPT;

/**
 * Condenses all frames into the fingerprint, as kzqvfixed_frame_manager_get_fingerprint() does.
 * Shares that are not numbers, as from silence, a single frame or foreign data, are 0.
 *
 * @param destination  Room for @p capacity bytes, at any address.
 * @return Bytes written: the size, or 0 when a pointer is null, @p capacity is below the size, or
 *         memory is short.
 */
KZ_API uint32_t QVFM_GetFingerprint(QVFM* manager, void* destination,
                                    uint32_t capacity) KZ_NOEXCEPT;

/*
 * Frame data, the exchange format: 32-bit words, little-endian on every machine.
 *
 *     word 0  1, the format's version
 *     word 1  B, the number of bands
 *     word 2  F, the number of frames
 *     then, for each band, and within it for each frame from the oldest, two words:
 *             energy and amplitude, IEEE single precision
 */

/**
 * Bytes that the frame data of the current frames take: B * F * 8 + 12.
 *
 * @return 0 for null, or where the number does not fit 32 bits.
 */
KZ_API uint32_t QVFM_GetFrameDataSize(const QVFM* manager) KZ_NOEXCEPT;

/**
 * Writes the frame data of the current frames.
 *
 * @param destination  Room for @p capacity bytes, at any address.
 * @return Bytes written; 0 when a pointer is null, @p capacity is below the size, or the size does
 *         not fit 32 bits.
 */
KZ_API uint32_t QVFM_GetFrameData(const QVFM* manager, void* destination,
                                  uint32_t capacity) KZ_NOEXCEPT;

/**
 * Appends frames given as frame data. Frames are skipped and limited as if they had been analysed
 * here; their numbers are taken as they are, whatever they are.
 *
 * Note that 1 is success here, against the other functions.
 *
 * @param data  @p size bytes, at any address.
 * @return 1 when the data was accepted, even if every frame was then dropped: the next
 *         QVFM_GetFingerprint() computes the fingerprint again. 0, and nothing appended, when a
 *         pointer is null, the data is not exactly one such block for this number of bands, it has
 *         frames without bands, or memory is short.
 */
KZ_API uint32_t QVFM_AppendFrameData(QVFM* manager, const void* data, uint32_t size) KZ_NOEXCEPT;

/* ---- Fingerprinter --------------------------------------------------------------------------- */

/** Samples that are converted at a time. */
#define QVFP_CONVERSION_SAMPLES 4096

/** A fingerprint context: row 2 of the extraction interface. Read it, do not change it. */
typedef struct QVFP {
    uint32_t channel_count;         /**< 1 or 2 */
    uint32_t input_rate;            /**< hertz */
    uint32_t input_format;          /**< 1 8-bit PCM, 2 16-bit PCM, 3 A-law, 4 mu-law */
    uint32_t frame_bytes;           /**< of one sample of every channel */
    float working_rate;             /**< hertz */
    KZDSP_resampler* resampler;     /**< owned */
    QVFM* frame_manager;            /**< owned */
    uint32_t frame_limit;           /**< while not 0, only a complete fingerprint is given out */
    uint8_t searching_for_signal;   /**< 1 while leading silence is being skipped */
    uint32_t signal_search_enabled; /**< as configured */
    uint32_t signal_offset;         /**< working-rate samples dropped as leading silence */
    QVSD* signal_detector;          /**< owned */
    float conversion_buffer[QVFP_CONVERSION_SAMPLES]; /**< one chunk, mono */
    uint32_t frame_length;                            /**< in samples */
    uint32_t frame_start;    /**< ring index of the next frame's first sample */
    uint32_t write_position; /**< ring index of the next sample to store */
    float* ring;             /**< owned; frame_length samples */
    uint32_t hop;            /**< samples from one frame start to the next */
} QVFP;

/**
 * Makes a fingerprinter.
 *
 * @param algorithm    Not used.
 * @param sample_rate  Hertz: any whose ratio to 11025 KZDSP_CreateResampler() takes.
 * @param format       1 8-bit PCM, 2 16-bit PCM, 3 A-law, 4 mu-law.
 * @param channels     1 or 2.
 * @param[out] out_object  The fingerprinter, which the caller frees with QVFP_Destructor();
 *                         untouched on failure.
 * @return 0; KZ_QV_ERROR_INVALID_ARGUMENT for a rate of 0, a bad format or channel count, or a null
 *         pointer; KZ_QV_ERROR_MEMORY for a rate that the resampler refuses or when memory is
 *         short.
 */
KZ_API kz_status QVFP_Constructor(uint32_t algorithm, uint32_t sample_rate, uint32_t format,
                                  uint32_t channels, QVFP** out_object) KZ_NOEXCEPT;

/** Frees a fingerprinter. Returns 0, or KZ_QV_ERROR_INVALID_ARGUMENT for null. */
KZ_API kz_status QVFP_Destructor(QVFP* object) KZ_NOEXCEPT;

/**
 * Feeds interleaved audio; see kz_fpx_fingerprint_add_audio().
 *
 * @param bytes       At any address; read only during the call.
 * @param byte_count  A whole number of frames, not 0.
 * @param[out] out_complete  Set to 1 once the frame limit is reached, else to 0.
 * @return 0; KZ_QV_ERROR_INVALID_ARGUMENT for a null pointer or a bad byte count (nothing is
 *         consumed then).
 */
KZ_API kz_status QVFP_AddSamples(QVFP* object, const void* bytes, uint32_t byte_count,
                                 uint8_t* out_complete) KZ_NOEXCEPT;

/**
 * Builds the query document of a complete fingerprint.
 *
 * @param[out] out_tree  The document's root, which the caller frees with DisposeXMLTag(); untouched
 *                       on failure.
 * @return 0; KZ_QV_ERROR_INVALID_ARGUMENT for a null pointer; KZ_QV_ERROR_INCOMPLETE when the
 *         fingerprint is not complete; KZ_QV_ERROR_MEMORY when memory is short.
 */
KZ_API kz_status QVFP_GetResult(QVFP* object, XMLTag** out_tree) KZ_NOEXCEPT;

/**
 * Reports how far the fingerprint is.
 *
 * @param[out] out_percent  0 .. 100.
 * @return 0, or KZ_QV_ERROR_INVALID_ARGUMENT for a null pointer.
 */
KZ_API kz_status QVFP_GetPercentProgress(const QVFP* object, uint32_t* out_percent) KZ_NOEXCEPT;

KZ_C_END

#endif
