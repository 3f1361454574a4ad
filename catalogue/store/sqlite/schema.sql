-- What a catalogue file of format 1 contains. docs/catalogue_file.md explains it.
-- Every crc is a CRC-32C over the row's other values, as catalogue/store/row_sum.hpp states.

-- One row: what the catalogue is.
CREATE TABLE catalogue (
    only_row INTEGER PRIMARY KEY CHECK (only_row = 1),
    id TEXT NOT NULL,             -- 32 random hexadecimal digits
    profile INTEGER NOT NULL,     -- of all its codes
    crc INTEGER NOT NULL
) STRICT;

CREATE TABLE setting (
    name TEXT PRIMARY KEY NOT NULL,
    value TEXT NOT NULL,
    crc INTEGER NOT NULL
) STRICT, WITHOUT ROWID;

-- AUTOINCREMENT: an id is never given out twice, so that an old index cannot name another track.
CREATE TABLE track (
    id INTEGER PRIMARY KEY AUTOINCREMENT,
    key BLOB NOT NULL UNIQUE,     -- first 16 bytes of the SHA-256 of profile, samples and codes
    samples INTEGER NOT NULL,     -- at 11025 Hz
    codes INTEGER NOT NULL,       -- how many
    added INTEGER NOT NULL,       -- seconds since 1970
    crc INTEGER NOT NULL
) STRICT;

CREATE TABLE tag (
    track INTEGER NOT NULL REFERENCES track (id) ON DELETE CASCADE,
    place INTEGER NOT NULL,       -- 0, 1, ... in the order in which they were given
    name TEXT NOT NULL,
    value TEXT NOT NULL,
    crc INTEGER NOT NULL,
    PRIMARY KEY (track, place)
) STRICT, WITHOUT ROWID;

CREATE TABLE source (
    id INTEGER PRIMARY KEY,       -- rises in the order in which a track's sources were added
    uri TEXT NOT NULL UNIQUE,     -- the path as it was added
    track INTEGER NOT NULL REFERENCES track (id) ON DELETE CASCADE,
    size INTEGER,                 -- bytes
    mtime_ns INTEGER,             -- nanoseconds since 1970
    hash BLOB,                    -- SHA-256 of the file
    crc INTEGER NOT NULL
) STRICT;
CREATE INDEX source_track ON source (track);
CREATE INDEX source_hash ON source (hash) WHERE hash IS NOT NULL;

CREATE TABLE trail (
    track INTEGER PRIMARY KEY REFERENCES track (id) ON DELETE CASCADE,
    crc INTEGER NOT NULL,         -- of the codes alone
    codes BLOB NOT NULL           -- 8 bytes each, the lowest first
) STRICT;

CREATE TABLE document_bands (
    track INTEGER PRIMARY KEY REFERENCES track (id) ON DELETE CASCADE,
    crc INTEGER NOT NULL,         -- of the bands alone
    bands BLOB NOT NULL           -- frames of 15 energies of 2 bytes, the lowest first
) STRICT;

-- Which tracks came and went. Indexes take over what is new to them from here.
CREATE TABLE change (
    id INTEGER PRIMARY KEY AUTOINCREMENT,
    track INTEGER NOT NULL,
    kind INTEGER NOT NULL,        -- 1: added, 2: removed
    mark INTEGER NOT NULL DEFAULT (random() & 4294967295),
    total INTEGER NOT NULL DEFAULT 0 -- of track, kind and mark, for verification
) STRICT;
CREATE TRIGGER track_added AFTER INSERT ON track BEGIN
    INSERT INTO change (track, kind) VALUES (NEW.id, 1);
    UPDATE change SET total = track + kind + mark WHERE id = (SELECT max(id) FROM change);
END;
CREATE TRIGGER track_removed AFTER DELETE ON track BEGIN
    INSERT INTO change (track, kind) VALUES (OLD.id, 2);
    UPDATE change SET total = track + kind + mark WHERE id = (SELECT max(id) FROM change);
END;
