/**
 * @file
 * Texts, counted bytes, numbers in texts and character classes.
 *
 * A text is a NUL-terminated string of bytes. Most functions are the C library's of a similar
 * name; differences are stated. Three rules hold for all: a comparison returns exactly -1, 0 or
 * 1; character classes and case are those of plain ASCII, whatever the process's locale; null is
 * allowed only where a function says so.
 */
#ifndef KZSDK_ABS_TEXT_H
#define KZSDK_ABS_TEXT_H

#include "kzsdk/abs/base.h"

KZ_C_BEGIN

/** Bytes before the NUL. A text of 2^32 bytes or more counts as 2^32 - 1. */
KZ_API uint32_t kz_strlen(const char* text) KZ_NOEXCEPT;

/** Compares two texts byte by byte, as unsigned values. Returns -1, 0 or 1. */
KZ_API int16_t kz_strcmp(const char* a, const char* b) KZ_NOEXCEPT;

/** Compares at most @p count bytes of two texts. Returns -1, 0 or 1; 0 for a count of 0. */
KZ_API int16_t kz_strncmp(const char* a, const char* b, uint32_t count) KZ_NOEXCEPT;

/** kz_strcmp() with 'A' to 'Z' taken as 'a' to 'z'. */
KZ_API int16_t kz_stricmp(const char* a, const char* b) KZ_NOEXCEPT;

/** kz_strncmp() with 'A' to 'Z' taken as 'a' to 'z'. */
KZ_API int16_t kz_strnicmp(const char* a, const char* b, uint32_t count) KZ_NOEXCEPT;

/** `strchr`: the first place of a byte in a text (the NUL counts), or null. */
KZ_API char* kz_strchr(const char* text, int32_t byte) KZ_NOEXCEPT;

/** `strrchr`: the last place of a byte in a text (the NUL counts), or null. */
KZ_API char* kz_strrchr(const char* text, int32_t byte) KZ_NOEXCEPT;

/** `strstr`: the first place of @p part in @p text, or null. An empty part is found at once. */
KZ_API char* kz_strstr(const char* text, const char* part) KZ_NOEXCEPT;

/**
 * `strtok`: cuts a text into pieces, writing NULs into it.
 *
 * The place reached is kept in one hidden variable of the C library: not for use by two threads, or
 * for two texts, at a time.
 */
KZ_API char* kz_strtok(char* text, const char* delimiters) KZ_NOEXCEPT;

/** `strncat`: appends at most @p count bytes and a NUL. The areas must not overlap. */
KZ_API char* kz_strncat(char* destination, const char* source, uint32_t count) KZ_NOEXCEPT;

/** `strncpy`: fills @p count bytes; no NUL when the source is that long or longer. No overlap. */
KZ_API char* kz_strncpy(char* destination, const char* source, uint32_t count) KZ_NOEXCEPT;

/**
 * `strncpy` with a NUL in the last of the @p count bytes, so that the result is always a text.
 *
 * @param destination  Room for @p count bytes, and for one byte when @p count is 0: a NUL is
 *                     written there although the count allows none. Null: nothing is done.
 * @return @p destination.
 */
KZ_API char* kz_strncpy_term(char* destination, const char* source, uint32_t count) KZ_NOEXCEPT;

/**
 * Copies a text.
 *
 * @return The copy, which the caller frees with _kzmem_free(); null for null, when memory is short,
 *         or for a text of 2^32 - 1 bytes or more.
 */
KZ_API char* kz_strdup(const char* text) KZ_NOEXCEPT;

/**
 * Makes a text of counted bytes: all @p count bytes, NULs among them too, and a NUL behind them.
 *
 * @return The text, which the caller frees with _kzmem_free(); null when @p bytes is null, when
 *         memory is short, or for a count of 2^32 - 1.
 */
KZ_API char* kz_makestr(const void* bytes, uint32_t count) KZ_NOEXCEPT;

/**
 * Compares counted bytes as unsigned values. The first difference decides; where one is the
 * beginning of the other, the shorter is the smaller. A pointer may be null when its count is 0.
 *
 * @return -1, 0 or 1.
 */
KZ_API int16_t kz_bufcmp(const void* a, uint32_t a_count, const void* b,
                         uint32_t b_count) KZ_NOEXCEPT;

/**
 * `strtoul` as with a 32-bit `long` on every platform: a number whose magnitude passes 2^32 - 1
 * gives 2^32 - 1 and sets `errno` to ERANGE; a minus sign negates modulo 2^32.
 *
 * @param[out] end  Where the number ended; may be null.
 * @param base      0 or 2 .. 36.
 */
KZ_API uint32_t kz_strtoul(const char* text, char** end, int32_t base) KZ_NOEXCEPT;

/**
 * `strtol` as with a 32-bit `long` on every platform: a number out of range gives -2^31 or
 * 2^31 - 1 and sets `errno` to ERANGE.
 *
 * @param[out] end  Where the number ended; may be null.
 * @param base      0 or 2 .. 36.
 */
KZ_API int32_t kz_strtol(const char* text, char** end, int32_t base) KZ_NOEXCEPT;

/** kz_strtoul() of a decimal text. */
KZ_API uint32_t kz_atou32(const char* text) KZ_NOEXCEPT;

/** kz_strtol() of a decimal text. */
KZ_API int32_t kz_atoi32(const char* text) KZ_NOEXCEPT;

/*
 * Character classes. The low 8 bits of the argument are looked up, so 0x141 counts as 'A'; -1 (end
 * of file) is in no class. Returns a value other than 0 for a member. Bytes above 127 are in no
 * class.
 */

/** A letter or a digit. */
KZ_API int32_t kz_isalnum(int32_t character) KZ_NOEXCEPT;

/** A letter. */
KZ_API int32_t kz_isalpha(int32_t character) KZ_NOEXCEPT;

/** '0' to '9'. The whole argument counts here, not its low 8 bits: 0x131 is no digit. */
KZ_API int32_t kz_isdigit(int32_t character) KZ_NOEXCEPT;

/** A digit, 'a' to 'f' or 'A' to 'F'. */
KZ_API int32_t kz_isxdigit(int32_t character) KZ_NOEXCEPT;

/** 'a' to 'z'. */
KZ_API int32_t kz_islower(int32_t character) KZ_NOEXCEPT;

/** 'A' to 'Z'. */
KZ_API int32_t kz_isupper(int32_t character) KZ_NOEXCEPT;

/** Space, tab, new line, vertical tab, form feed or carriage return. */
KZ_API int32_t kz_isspace(int32_t character) KZ_NOEXCEPT;

/** 'A' to 'Z' as 'a' to 'z'; every other value, above 255 or below 0 too, as it is. */
KZ_API int32_t kz_tolower(int32_t character) KZ_NOEXCEPT;

/** 'a' to 'z' as 'A' to 'Z'; every other value, above 255 or below 0 too, as it is. */
KZ_API int32_t kz_toupper(int32_t character) KZ_NOEXCEPT;

/**
 * `snprintf`: writes at most @p size bytes, a NUL among them unless @p size is 0.
 *
 * @param buffer  Room for @p size bytes; may be null when @p size is 0.
 * @return The length that the whole text has without its NUL; negative when it cannot be made.
 */
#if defined(__GNUC__)
__attribute__((format(printf, 3, 4)))
#endif
KZ_API int32_t
kz_snprintf(char* buffer, uint32_t size, const char* format, ...) KZ_NOEXCEPT;

KZ_C_END

#endif
