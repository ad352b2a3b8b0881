PRAGMA journal_mode = WAL;
CREATE TABLE keys (id INTEGER PRIMARY KEY, name TEXT NOT NULL UNIQUE);
CREATE TABLE scalars (key_id INTEGER NOT NULL REFERENCES keys(id), day INTEGER NOT NULL, value INTEGER NOT NULL,
                      PRIMARY KEY (key_id, day)) WITHOUT ROWID;
CREATE TABLE distribution_values (key_id INTEGER NOT NULL REFERENCES keys(id), day INTEGER NOT NULL, seq INTEGER NOT NULL,
                      seconds INTEGER NOT NULL, value REAL, PRIMARY KEY (key_id, day, seq)) WITHOUT ROWID;
.mode tabs
.import keys.tsv keys
.import scalars.tsv scalars
.import values.tsv distribution_values
