-- Where each part of a code occurs, on the server that has the tracks; applied after the store's
-- schema, whose table trail (shard, track, codes) it extends, in schema kzcat. The functions kz_...
-- come with the extension kzmatch, in the same schema.

-- One row for each value of a part of codes and each segment, a segment being some thousand tracks
-- that were posted together. Their codes are counted in units of eight, each track beginning one.
CREATE TABLE kzcat.posting (
    shard integer NOT NULL,
    list integer NOT NULL,      -- 65536 * part + value; -1: the segment's tracks, each as its id
                                -- and its number of codes, 8 bytes each, the highest first;
                                -- -2 - part: where each value's words begin among all of the part
    segment integer NOT NULL,
    words bytea NOT NULL,       -- units that have the value: distances of 2 bytes, the lowest
                                -- first; 65535 goes that far without a unit there
    PRIMARY KEY (list, segment)
) WITH (toast_tuple_target = 8160);
ALTER TABLE kzcat.posting ALTER COLUMN words SET STORAGE EXTERNAL;

-- Which segment has a track; none yet: it is in the tail, which look-ups scan.
CREATE TABLE kzcat.posted (
    track bigint PRIMARY KEY REFERENCES kzcat.trail (track) ON DELETE CASCADE,
    codes bigint NOT NULL,
    segment integer
);
CREATE INDEX posted_tail ON kzcat.posted (track) WHERE segment IS NULL;
CREATE INDEX posted_segment ON kzcat.posted (segment) WHERE segment IS NOT NULL;

CREATE FUNCTION kzcat.note_tail() RETURNS trigger LANGUAGE plpgsql AS $$
BEGIN
    INSERT INTO kzcat.posted (track, codes) VALUES (NEW.track, octet_length(NEW.codes) / 8);
    RETURN NULL;
END $$;
CREATE TRIGGER trail_tail AFTER INSERT ON kzcat.trail
    FOR EACH ROW EXECUTE FUNCTION kzcat.note_tail();

CREATE VIEW kzcat.tail AS
    SELECT trail.shard, trail.track, trail.codes
    FROM kzcat.trail JOIN kzcat.posted USING (track)
    WHERE posted.segment IS NULL;

-- Writes the postings of some tracks as one segment. All its rows come from one statement, which
-- sees the tracks as they were at one moment: a track that is missing from some of them would move
-- the units of all behind it. No track is held meanwhile; one that is removed stays in the segment,
-- as any does that is removed later.
CREATE FUNCTION kzcat.write_segment(number integer, tracks bigint[]) RETURNS void
LANGUAGE plpgsql SET search_path = pg_catalog, pg_temp AS $$
BEGIN
    INSERT INTO kzcat.posting (shard, list, segment, words)
    SELECT min(shard), -1, number,
           string_agg(int8send(track) || int8send(octet_length(codes) / 8),
                      ''::pg_catalog.bytea ORDER BY track)
    FROM kzcat.trail WHERE track = ANY (tracks) HAVING count(*) > 0
    UNION ALL
    SELECT built.shard, lists.list, number, lists.words
    FROM generate_series(0, 3) AS parts (part)
    CROSS JOIN LATERAL (
        SELECT min(shard) AS shard, kzcat.kz_table(parts.part, codes ORDER BY track) AS words
        FROM kzcat.trail WHERE track = ANY (tracks) HAVING count(*) > 0) AS built
    CROSS JOIN LATERAL kzcat.kz_lists(parts.part, built.words) AS lists;
    UPDATE kzcat.posted SET segment = number WHERE track = ANY (tracks);
END $$;

-- Posts the tail when it has `threshold` codes or more, together with segments that are not much
-- larger than it: so few segments stay, and rows stay long. One call writes one segment, so that
-- nobody waits for more than that; of a longer tail the rest is left to the next call. Returns the
-- number of tracks of the segment, 0 when none was to be written.
CREATE FUNCTION kzcat.post(threshold bigint) RETURNS bigint LANGUAGE plpgsql
SET search_path = pg_catalog, pg_temp AS $$
DECLARE
    most CONSTANT bigint := 16777216; -- codes of a segment; a single track may have more
    waiting bigint;
    gone integer[];
    joined integer[];
    tracks bigint[];
    number integer; -- none of those that are joined
BEGIN
    IF NOT pg_try_advisory_xact_lock(hashtextextended('kzcat.post', 0)) THEN
        RETURN 0; -- another session is at it
    END IF;
    SELECT coalesce(sum(codes), 0) INTO waiting FROM kzcat.posted WHERE segment IS NULL;
    IF waiting < greatest(threshold, 1) THEN
        RETURN 0;
    END IF;
    SELECT array_agg(segment) INTO gone FROM kzcat.posting p
    WHERE list = -1 AND NOT EXISTS (
        SELECT FROM kzcat.posted WHERE posted.segment = p.segment); -- all its tracks were removed
    SELECT array_agg(segment) INTO joined FROM (
        SELECT segment, size, sum(size) OVER (ORDER BY size, segment) AS together
        FROM (SELECT segment, sum(codes) AS size FROM kzcat.posted
              WHERE segment IS NOT NULL GROUP BY segment) sizes) sums
    WHERE together + waiting <= most AND size <= 2 * (together - size + waiting);
    SELECT array_agg(track) INTO tracks FROM (
        SELECT track, codes, sum(codes) OVER (ORDER BY segment NULLS FIRST, track) AS together
        FROM kzcat.posted WHERE segment IS NULL OR segment = ANY (joined)) chosen
    WHERE together <= most OR together = codes;
    SELECT coalesce(max(segment), 0) + 1 INTO number FROM kzcat.posting WHERE list = -1;
    IF gone IS NOT NULL OR joined IS NOT NULL THEN -- by segment, all rows have to be read
        DELETE FROM kzcat.posting WHERE segment = ANY (gone || joined);
    END IF;
    PERFORM kzcat.write_segment(number, tracks);
    -- What was added between these statements may have left no room for all tracks of the segments
    -- that were joined.
    UPDATE kzcat.posted SET segment = NULL WHERE segment = ANY (joined);
    RETURN cardinality(tracks);
END $$;

-- A row that is put here asks for kzcat.post(least): so it can be asked for through a coordinator,
-- too, and by users who may not write to the other tables. Nothing is kept. The function runs with
-- the owner's rights: temporary types of whoever asks, which are searched first unless they are
-- named last, must not take the place of the server's own.
CREATE TABLE kzcat.posting_request (shard integer NOT NULL, least bigint NOT NULL);
CREATE FUNCTION kzcat.answer_request() RETURNS trigger LANGUAGE plpgsql
SECURITY DEFINER SET search_path = pg_catalog, pg_temp AS $$
BEGIN
    PERFORM kzcat.post(NEW.least);
    RETURN NULL;
END $$;
CREATE TRIGGER posting_requested BEFORE INSERT ON kzcat.posting_request
    FOR EACH ROW EXECUTE FUNCTION kzcat.answer_request();
