-- What any place of the catalogue looks like, as chosen after some change: one row, on the server
-- that clients connect to. It is derived, and chosen again when much has changed since.
CREATE TABLE kzcat.population (
    only_row integer PRIMARY KEY CHECK (only_row = 1),
    change bigint NOT NULL,     -- the last change of the catalogue that it takes in
    tracks bigint NOT NULL,     -- how many there were
    codes bigint NOT NULL,      -- and how many codes
    runs bytea NOT NULL         -- each as its number of codes, 8 bytes, and the codes; lowest first
);
