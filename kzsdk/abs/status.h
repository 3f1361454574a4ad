/**
 * @file
 * Status codes: 0 for success, else 0x90000000 | (module << 16) | reason.
 */
#ifndef KZSDK_ABS_STATUS_H
#define KZSDK_ABS_STATUS_H

#include "kzsdk/abs/base.h"

/** A status: 0 is success, everything else one of the failures below. */
typedef uint32_t kz_status;

#define KZ_OK UINT32_C(0)

/* Start-up arguments (module 0x00). */
#define KZ_ERROR_INVALID_ARGUMENT UINT32_C(0x90000004)

/* Tag library (module 0x02). */
#define KZ_XML_ERROR_MEMORY UINT32_C(0x90020001)
#define KZ_XML_ERROR_NOT_FOUND UINT32_C(0x90020002)
#define KZ_XML_ERROR_INVALID_ARGUMENT UINT32_C(0x90020004)

/* Dynamic buffer (module 0x03). */
#define KZ_DYN_BUF_ERROR_MEMORY UINT32_C(0x90030001)
#define KZ_DYN_BUF_ERROR_INVALID_ARGUMENT UINT32_C(0x90030004)

/* Memory manager (module 0x04). */
#define KZ_MEM_ALREADY_ON UINT32_C(0x90040005)
#define KZ_MEM_NOT_ON UINT32_C(0x90040006)

/* Library start-up (module 0x05). */
#define KZ_INIT_ERROR_NO_RECORD UINT32_C(0x90050990)

/* Disc helpers, both families (module 0x06). */
/** Also: a directory cannot be opened; a name does not fit. */
#define KZ_DISC_ERROR_MEMORY UINT32_C(0x90060001)
#define KZ_DISC_ERROR_INVALID_ARGUMENT UINT32_C(0x90060004)
#define KZ_DISC_ALREADY_ON UINT32_C(0x90060005)
#define KZ_DISC_NOT_ON UINT32_C(0x90060006)
/** Any failure of the system that has no code of its own below. */
#define KZ_DISC_ERROR_SYSTEM UINT32_C(0x90060009)
#define KZ_DISC_ERROR_ACCESS_DENIED UINT32_C(0x90060047)
#define KZ_DISC_ERROR_NOT_FOUND UINT32_C(0x90060048)
#define KZ_DISC_ERROR_NO_SPACE UINT32_C(0x9006004a)
#define KZ_DISC_ERROR_TOO_MANY_FILES UINT32_C(0x9006004b)
#define KZ_DISC_ERROR_BAD_DESCRIPTOR UINT32_C(0x9006004c)

/* Extraction interface (module 0x08). */
#define KZ_FPX_ERROR_MEMORY UINT32_C(0x90080001)
#define KZ_FPX_ERROR_INVALID_ARGUMENT UINT32_C(0x90080004)
#define KZ_FPX_ERROR_RENDER UINT32_C(0x9008000b)
/** The caller's array is too small for the values; their count has been reported. */
#define KZ_FPX_ERROR_ROOM UINT32_C(0x90080010)
#define KZ_FPX_ERROR_NO_ALGORITHM UINT32_C(0x90080606)

/* Fingerprinters, both algorithms (module 0x0F). */
#define KZ_QV_ERROR_MEMORY UINT32_C(0x900f0001)
#define KZ_QV_ERROR_INVALID_ARGUMENT UINT32_C(0x900f0004)
#define KZ_QV_ERROR_EMPTY UINT32_C(0x900f0009)
/** The frame limit is reached; internal, reported to callers as success with the flag set. */
#define KZ_QV_FRAME_LIMIT_REACHED UINT32_C(0x900f0960)
#define KZ_QV_ERROR_INCOMPLETE UINT32_C(0x900f0961)

#endif
