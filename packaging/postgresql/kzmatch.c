/* The extension kzmatch: the search of the catalogue as functions of the server. Here values are
   taken from the server and given to it; core.h does the work. The server leaves functions by long
   jumps, which must not pass through C++: so nothing in the core calls it. */

#include "postgres.h"

#include "access/detoast.h"
#include "fmgr.h"
#include "funcapi.h"
#include "miscadmin.h"
#include "utils/builtins.h"
#include "utils/memutils.h"

#include "core.h"

PG_MODULE_MAGIC;

#define KZM_VERSION 100 /* that of kzmatch.control: 100 for each before the point */

#define KZM_FUNCTION(name)                                                                         \
    PGDLLEXPORT Datum name(PG_FUNCTION_ARGS);                                                      \
    PG_FUNCTION_INFO_V1(name)

KZM_FUNCTION(kz_count_step);
KZM_FUNCTION(kz_rank_step);
KZM_FUNCTION(kz_scan_step);
KZM_FUNCTION(kz_table_step);
KZM_FUNCTION(kz_lengths_step);
KZM_FUNCTION(kz_combine);
KZM_FUNCTION(kz_rank_load);
KZM_FUNCTION(kz_scan_load);
KZM_FUNCTION(kz_lengths_load);
KZM_FUNCTION(kz_save);
KZM_FUNCTION(kz_result);
KZM_FUNCTION(kz_lists);
KZM_FUNCTION(kz_version);

static pg_attribute_noreturn() void complain(const char* error)
{
    ereport(ERROR, (errcode(ERRCODE_INVALID_PARAMETER_VALUE), errmsg("kzmatch: %s", error),
                    errhint("The catalogue's client and this extension must be of one version.")));
}

static void free_state(void* state) { kzm_free((kzm_state*)state); }

/* The state goes with the memory of the aggregate, also when the query is given up. */
static kzm_state* keep(kzm_state* state, MemoryContext context, const char* error)
{
    MemoryContextCallback* callback;
    if (state == NULL)
        complain(error);
    callback = MemoryContextAllocExtended(context, sizeof *callback, MCXT_ALLOC_NO_OOM);
    if (callback == NULL) {
        kzm_free(state);
        complain("memory is short");
    }
    callback->func = free_state;
    callback->arg = state;
    MemoryContextRegisterResetCallback(context, callback);
    return state;
}

static MemoryContext aggregate_context(FunctionCallInfo fcinfo)
{
    MemoryContext context;
    if (!AggCheckCallContext(fcinfo, &context))
        complain("this is a step of an aggregate and cannot be called by itself");
    return context;
}

/* The state so far; made from the query, argument `query`, at the first row. */
static kzm_state* state_of(FunctionCallInfo fcinfo, enum kzm_kind kind, int query)
{
    char error[KZM_ERROR_BYTES];
    MemoryContext context = aggregate_context(fcinfo);
    bytea* bytes;
    if (!PG_ARGISNULL(0))
        return (kzm_state*)PG_GETARG_POINTER(0);
    if (PG_ARGISNULL(query))
        complain("the query is null");
    bytes = PG_GETARG_BYTEA_PP(query);
    return keep(kzm_create(kind, VARDATA_ANY(bytes), VARSIZE_ANY_EXHDR(bytes), error), context,
                error);
}

static bytea* to_bytea(const void* bytes, size_t count)
{
    bytea* result;
    if (count > MaxAllocSize - VARHDRSZ)
        complain("the result takes more than a value of the server can");
    result = palloc(VARHDRSZ + count);
    SET_VARSIZE(result, VARHDRSZ + count);
    memcpy(VARDATA(result), bytes, count);
    return result;
}

/* kz_count_step(state, segment, list, words, query) */
Datum kz_count_step(PG_FUNCTION_ARGS)
{
    char error[KZM_ERROR_BYTES];
    kzm_state* state = state_of(fcinfo, KZM_COUNT, 4);
    if (!PG_ARGISNULL(1) && !PG_ARGISNULL(2) && !PG_ARGISNULL(3)) {
        bytea* words = PG_GETARG_BYTEA_PP(3);
        if (!kzm_count(state, PG_GETARG_INT32(1), PG_GETARG_INT32(2), VARDATA_ANY(words),
                       VARSIZE_ANY_EXHDR(words), error))
            complain(error);
        PG_FREE_IF_COPY(words, 3);
    }
    PG_RETURN_POINTER(state);
}

static void add_codes(kzm_state* state, int64 track, bytea* codes)
{
    char error[KZM_ERROR_BYTES];
    if (!kzm_track(state, track, VARDATA_ANY(codes), VARSIZE_ANY_EXHDR(codes) / 8, error))
        complain(error);
}

/* Reading a slice of a long value costs about as much as a third of it. */
#define KZM_MOST_SLICES 3

static void read_slices(const kzm_state* state, Datum stored, size_t ranges, bytea* codes)
{
    for (size_t i = 0; i < ranges; ++i) {
        uint64_t begin;
        uint64_t end;
        bytea* slice;
        kzm_range(state, i, &begin, &end);
        slice = DatumGetByteaPSlice(stored, (int32)(8 * begin), (int32)(8 * (end - begin)));
        memcpy(VARDATA(codes) + 8 * begin, VARDATA_ANY(slice), VARSIZE_ANY_EXHDR(slice));
        pfree(slice);
    }
}

/* kz_rank_step(state, track, codes, query) */
Datum kz_rank_step(PG_FUNCTION_ARGS)
{
    char error[KZM_ERROR_BYTES];
    kzm_state* state = state_of(fcinfo, KZM_RANK, 3);
    if (!PG_ARGISNULL(1) && !PG_ARGISNULL(2)) {
        int64 track = PG_GETARG_INT64(1);
        Size bytes = toast_raw_datum_size(PG_GETARG_DATUM(2)) - VARHDRSZ;
        size_t ranges;
        if (!kzm_ranges(state, track, bytes / 8, &ranges, error))
            complain(error);
        if (ranges > 0 && ranges <= KZM_MOST_SLICES) {
            bytea* codes = palloc0(VARHDRSZ + bytes);
            SET_VARSIZE(codes, VARHDRSZ + bytes);
            read_slices(state, PG_GETARG_DATUM(2), ranges, codes);
            add_codes(state, track, codes);
            pfree(codes);
        } else if (ranges > 0) {
            bytea* codes = PG_GETARG_BYTEA_PP(2);
            add_codes(state, track, codes);
            PG_FREE_IF_COPY(codes, 2);
        }
    }
    PG_RETURN_POINTER(state);
}

/* kz_scan_step(state, track, codes, query) */
Datum kz_scan_step(PG_FUNCTION_ARGS)
{
    kzm_state* state = state_of(fcinfo, KZM_SCAN, 3);
    if (!PG_ARGISNULL(1) && !PG_ARGISNULL(2)) {
        bytea* codes = PG_GETARG_BYTEA_PP(2);
        add_codes(state, PG_GETARG_INT64(1), codes);
        PG_FREE_IF_COPY(codes, 2);
    }
    PG_RETURN_POINTER(state);
}

/* kz_table_step(state, part, codes), in the order of the tracks */
Datum kz_table_step(PG_FUNCTION_ARGS)
{
    char error[KZM_ERROR_BYTES];
    MemoryContext context = aggregate_context(fcinfo);
    kzm_state* state = PG_ARGISNULL(0) ? NULL : (kzm_state*)PG_GETARG_POINTER(0);
    if (PG_ARGISNULL(1) || PG_ARGISNULL(2))
        complain("the part or the codes are null");
    if (state == NULL) {
        unsigned char part = (unsigned char)Min(Max(PG_GETARG_INT32(1), 0), 255);
        state = keep(kzm_create(KZM_TABLE, &part, 1, error), context, error);
    }
    add_codes(state, 0, PG_GETARG_BYTEA_PP(2));
    PG_RETURN_POINTER(state);
}

/* kz_lengths_step(state, starts) */
Datum kz_lengths_step(PG_FUNCTION_ARGS)
{
    char error[KZM_ERROR_BYTES];
    MemoryContext context = aggregate_context(fcinfo);
    kzm_state* state = PG_ARGISNULL(0) ? NULL : (kzm_state*)PG_GETARG_POINTER(0);
    if (state == NULL)
        state = keep(kzm_create(KZM_LENGTHS, "", 0, error), context, error);
    if (!PG_ARGISNULL(1)) {
        bytea* starts = PG_GETARG_BYTEA_PP(1);
        if (!kzm_starts(state, VARDATA_ANY(starts), VARSIZE_ANY_EXHDR(starts), error))
            complain(error);
        PG_FREE_IF_COPY(starts, 1);
    }
    PG_RETURN_POINTER(state);
}

/* Of kz_rank, kz_scan and kz_lengths: joins what two processes have found. */
Datum kz_combine(PG_FUNCTION_ARGS)
{
    char error[KZM_ERROR_BYTES];
    MemoryContext context = aggregate_context(fcinfo);
    kzm_state* one = PG_ARGISNULL(0) ? NULL : (kzm_state*)PG_GETARG_POINTER(0);
    kzm_state* other = PG_ARGISNULL(1) ? NULL : (kzm_state*)PG_GETARG_POINTER(1);
    if (other == NULL) {
        if (one == NULL)
            PG_RETURN_NULL();
        PG_RETURN_POINTER(one);
    }
    if (one == NULL)
        PG_RETURN_POINTER(keep(kzm_copy(other, error), context, error));
    if (!kzm_join(one, other, error))
        complain(error);
    PG_RETURN_POINTER(one);
}

static Datum load(FunctionCallInfo fcinfo, enum kzm_kind kind)
{
    char error[KZM_ERROR_BYTES];
    MemoryContext context = aggregate_context(fcinfo);
    bytea* bytes = PG_GETARG_BYTEA_PP(0);
    PG_RETURN_POINTER(
        keep(kzm_load(kind, VARDATA_ANY(bytes), VARSIZE_ANY_EXHDR(bytes), error), context, error));
}

Datum kz_rank_load(PG_FUNCTION_ARGS) { return load(fcinfo, KZM_RANK); }

Datum kz_scan_load(PG_FUNCTION_ARGS) { return load(fcinfo, KZM_SCAN); }

Datum kz_lengths_load(PG_FUNCTION_ARGS) { return load(fcinfo, KZM_LENGTHS); }

Datum kz_save(PG_FUNCTION_ARGS)
{
    char error[KZM_ERROR_BYTES];
    const void* bytes;
    size_t count;
    aggregate_context(fcinfo);
    if (!kzm_save((kzm_state*)PG_GETARG_POINTER(0), &bytes, &count, error))
        complain(error);
    PG_RETURN_BYTEA_P(to_bytea(bytes, count));
}

Datum kz_result(PG_FUNCTION_ARGS)
{
    char error[KZM_ERROR_BYTES];
    const void* bytes;
    size_t count;
    aggregate_context(fcinfo);
    if (PG_ARGISNULL(0))
        PG_RETURN_NULL();
    if (!kzm_result((kzm_state*)PG_GETARG_POINTER(0), &bytes, &count, error))
        complain(error);
    PG_RETURN_BYTEA_P(to_bytea(bytes, count));
}

/* kz_version(number): the extension's version, whatever the number is. */
Datum kz_version(PG_FUNCTION_ARGS)
{
    (void)fcinfo;
    PG_RETURN_INT32(KZM_VERSION);
}

static void put_list(ReturnSetInfo* result, int32 list, const char* words, size_t bytes)
{
    bool nulls[2] = {false, false};
    bytea* value = to_bytea(words, bytes);
    Datum values[2];
    values[0] = Int32GetDatum(list);
    values[1] = PointerGetDatum(value);
    tuplestore_putvalues(result->setResult, result->setDesc, values, nulls);
    pfree(value);
}

/* kz_lists(part, table): the rows of postings that a table gives. */
Datum kz_lists(PG_FUNCTION_ARGS)
{
    int32 part = PG_GETARG_INT32(0);
    bytea* table = PG_GETARG_BYTEA_PP(1);
    const char* bytes = VARDATA_ANY(table);
    size_t count = VARSIZE_ANY_EXHDR(table);
    size_t begin;
    size_t end;
    if (part < 0 || part > 3 || !kzm_is_table(bytes, count))
        complain("these are not the lists of a part");
    InitMaterializedSRF(fcinfo, 0);
    put_list((ReturnSetInfo*)fcinfo->resultinfo, -2 - part, bytes, kzm_starts_bytes());
    for (uint32_t value = 0; kzm_list(bytes, count, value, &begin, &end); ++value) {
        CHECK_FOR_INTERRUPTS();
        if (end > begin)
            put_list((ReturnSetInfo*)fcinfo->resultinfo, part * 65536 + (int32)value, bytes + begin,
                     end - begin);
    }
    return (Datum)0;
}
