/* The work of the extension's functions, without the server: nothing here calls it, and nothing is
   thrown. A call that fails writes a sentence to `error`, which has KZM_ERROR_BYTES bytes. */
#ifndef KZM_CORE_H
#define KZM_CORE_H

#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

#define KZM_ERROR_BYTES 200

/* What an aggregate gathers. */
enum kzm_kind { KZM_COUNT, KZM_RANK, KZM_SCAN, KZM_TABLE, KZM_LENGTHS };
typedef struct kzm_state kzm_state;

/* Null on failure. The query is copied; that of KZM_TABLE is the part's number, one byte,
   that of KZM_LENGTHS is empty. */
kzm_state* kzm_create(enum kzm_kind kind, const void* query, size_t bytes, char* error);
void kzm_free(kzm_state* state);

/* KZM_COUNT: a row of postings. */
bool kzm_count(kzm_state* state, int32_t segment, int32_t list, const void* words, size_t bytes,
               char* error);

/* KZM_RANK: how many ranges of codes are needed of a track that has so many, and the n-th one. */
bool kzm_ranges(kzm_state* state, int64_t track, uint64_t codes, size_t* ranges, char* error);
void kzm_range(const kzm_state* state, size_t number, uint64_t* begin, uint64_t* end);

/* KZM_RANK, KZM_SCAN, KZM_TABLE: a track's codes, 8 bytes each. */
bool kzm_track(kzm_state* state, int64_t track, const void* codes, uint64_t count, char* error);

/* KZM_LENGTHS: the starts of a part's lists in one segment. */
bool kzm_starts(kzm_state* state, const void* starts, size_t bytes, char* error);

/* KZM_RANK, KZM_SCAN, KZM_LENGTHS: the state as bytes, which are those of kzm_result() with the
   query before them; and what another state has gathered. */
bool kzm_save(kzm_state* state, const void** bytes, size_t* count, char* error);
kzm_state* kzm_load(enum kzm_kind kind, const void* bytes, size_t count, char* error);
kzm_state* kzm_copy(kzm_state* state, char* error);
bool kzm_join(kzm_state* state, kzm_state* other, char* error);

/* What the aggregate gives; valid until the next call with the state. */
bool kzm_result(kzm_state* state, const void** bytes, size_t* count, char* error);

/* Where the words of a value lie in what KZM_TABLE gives, and the bytes of the starts before them;
   false when it is no table. */
bool kzm_list(const void* table, size_t bytes, uint32_t value, size_t* begin, size_t* end);
size_t kzm_starts_bytes(void);
bool kzm_is_table(const void* table, size_t bytes);

#ifdef __cplusplus
}
#endif

#endif
