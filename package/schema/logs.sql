-- The working log database. syslog-ng creates the same table and indexes from the columns() and indexes() of its sql()
-- destination when it meets a fresh file, and chooses these names for the indexes; keep the two alike.
-- All or nothing, while readers wait; write-ahead logging last, as no transaction can include it.
PRAGMA busy_timeout = 10000;
BEGIN EXCLUSIVE;

CREATE TABLE IF NOT EXISTS logs (
    id INTEGER PRIMARY KEY AUTOINCREMENT,
    host TEXT,
    ip TEXT,
    fac TEXT,
    prio TEXT,
    llevel TEXT,
    tag TEXT,
    utcsec INTEGER,
    tzoffset TEXT,
    ldate TEXT,
    ltime TEXT,
    prog TEXT,
    msg TEXT
);
-- Indexes for the searches and counts that the library sends; docs/schema.md has the plans and the figures.
CREATE INDEX IF NOT EXISTS logs_utcsec_idx ON logs (utcsec);
CREATE INDEX IF NOT EXISTS logs_ldate_idx ON logs (ldate);
CREATE INDEX IF NOT EXISTS logs_host_idx ON logs (host);
CREATE INDEX IF NOT EXISTS logs_prog_idx ON logs (prog);

COMMIT;
PRAGMA journal_mode = WAL;
