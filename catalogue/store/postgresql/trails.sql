-- What every database has that keeps codes of a catalogue: each shard, or the one of the catalogue
-- itself when there are none. Codes do not shrink when compressed.

-- One row: which part of which catalogue this is.
CREATE TABLE node (
    only_row INTEGER PRIMARY KEY CHECK (only_row = 1),
    format INTEGER NOT NULL,
    catalogue TEXT NOT NULL,      -- its id
    shard INTEGER NOT NULL        -- 0: beside the catalogue
);

CREATE TABLE trail (
    shard INTEGER NOT NULL,       -- that of the node
    track BIGINT PRIMARY KEY,
    crc BIGINT NOT NULL,          -- of the codes alone
    codes BYTEA NOT NULL          -- 8 bytes each, the lowest first
);
ALTER TABLE trail ALTER codes SET STORAGE EXTERNAL;

CREATE TABLE document_bands (
    track BIGINT PRIMARY KEY,
    crc BIGINT NOT NULL,          -- of the bands alone
    bands BYTEA NOT NULL          -- frames of 15 energies of 2 bytes, the lowest first
);
ALTER TABLE document_bands ALTER bands SET STORAGE EXTERNAL;
