/**
 * @file
 * What every public header of libkzsdk needs: fixed-width types and the marks of an exported
 * function.
 */
#ifndef KZSDK_ABS_BASE_H
#define KZSDK_ABS_BASE_H

#include <stddef.h>
#include <stdint.h>

/** Marks an exported function. */
#define KZ_API __attribute__((visibility("default")))

#ifdef __cplusplus
/** No function of the library throws. */
#define KZ_NOEXCEPT noexcept
#define KZ_C_BEGIN extern "C" {
#define KZ_C_END }
#else
#define KZ_NOEXCEPT
#define KZ_C_BEGIN
#define KZ_C_END
#endif

#endif
