-- The functions of the extension kzmatch. The catalogue's client calls them; what their bytes mean
-- is between these two.
\echo Use "CREATE EXTENSION kzmatch" to load this file. \quit

-- The version, times 100. A condition that has it, with a column of a foreign table, is looked at by the server
-- which that table leads to: so a coordinator learns whether a shard has the extension.
CREATE FUNCTION kz_version(number bigint) RETURNS integer
    LANGUAGE c IMMUTABLE PARALLEL SAFE AS 'MODULE_PATHNAME';

CREATE FUNCTION kz_result(internal) RETURNS bytea
    LANGUAGE c IMMUTABLE PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE FUNCTION kz_save(internal) RETURNS bytea
    LANGUAGE c IMMUTABLE STRICT PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE FUNCTION kz_combine(internal, internal) RETURNS internal
    LANGUAGE c IMMUTABLE PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE FUNCTION kz_rank_load(bytea, internal) RETURNS internal
    LANGUAGE c IMMUTABLE STRICT PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE FUNCTION kz_scan_load(bytea, internal) RETURNS internal
    LANGUAGE c IMMUTABLE STRICT PARALLEL SAFE AS 'MODULE_PATHNAME';

-- Counts hits over rows of postings; gives the diagonals that have most, as looks.
CREATE FUNCTION kz_count_step(internal, segment integer, list integer, words bytea, query bytea)
    RETURNS internal LANGUAGE c IMMUTABLE PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE AGGREGATE kz_count(segment integer, list integer, words bytea, query bytea) (
    SFUNC = kz_count_step, STYPE = internal, FINALFUNC = kz_result, PARALLEL = SAFE);

-- Ranks the places of tracks at which the query says to look; gives the best ones.
CREATE FUNCTION kz_rank_step(internal, track bigint, codes bytea, query bytea)
    RETURNS internal LANGUAGE c IMMUTABLE PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE AGGREGATE kz_rank(track bigint, codes bytea, query bytea) (
    SFUNC = kz_rank_step, STYPE = internal, FINALFUNC = kz_result, PARALLEL = SAFE,
    COMBINEFUNC = kz_combine, SERIALFUNC = kz_save, DESERIALFUNC = kz_rank_load);

-- Looks at every place of tracks; gives the best ones.
CREATE FUNCTION kz_scan_step(internal, track bigint, codes bytea, query bytea)
    RETURNS internal LANGUAGE c IMMUTABLE PARALLEL SAFE COST 10000 AS 'MODULE_PATHNAME';
CREATE AGGREGATE kz_scan(track bigint, codes bytea, query bytea) (
    SFUNC = kz_scan_step, STYPE = internal, FINALFUNC = kz_result, PARALLEL = SAFE,
    COMBINEFUNC = kz_combine, SERIALFUNC = kz_save, DESERIALFUNC = kz_scan_load);

-- The lengths of a part's lists, summed over segments; from where the lists of each begin.
CREATE FUNCTION kz_lengths_step(internal, starts bytea) RETURNS internal
    LANGUAGE c IMMUTABLE PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE FUNCTION kz_lengths_load(bytea, internal) RETURNS internal
    LANGUAGE c IMMUTABLE STRICT PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE AGGREGATE kz_lengths(starts bytea) (
    SFUNC = kz_lengths_step, STYPE = internal, FINALFUNC = kz_result, PARALLEL = SAFE,
    COMBINEFUNC = kz_combine, SERIALFUNC = kz_save, DESERIALFUNC = kz_lengths_load);

-- The postings of one part, of tracks in the order of their ids; and these as rows.
CREATE FUNCTION kz_table_step(internal, part integer, codes bytea) RETURNS internal
    LANGUAGE c IMMUTABLE PARALLEL SAFE AS 'MODULE_PATHNAME';
CREATE AGGREGATE kz_table(part integer, codes bytea) (
    SFUNC = kz_table_step, STYPE = internal, FINALFUNC = kz_result);
CREATE FUNCTION kz_lists(part integer, built bytea)
    RETURNS TABLE (list integer, words bytea)
    LANGUAGE c IMMUTABLE STRICT PARALLEL SAFE AS 'MODULE_PATHNAME';
