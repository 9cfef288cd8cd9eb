-- An archived log database: the logs, as in logs.sql, and the one row that describes them.
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
CREATE INDEX IF NOT EXISTS logs_utcsec_idx ON logs (utcsec);
CREATE INDEX IF NOT EXISTS logs_ldate_idx ON logs (ldate);
CREATE INDEX IF NOT EXISTS logs_host_idx ON logs (host);
CREATE INDEX IF NOT EXISTS logs_prog_idx ON logs (prog);
CREATE TABLE IF NOT EXISTS db_info (
    id INTEGER PRIMARY KEY,
    start_time INTEGER,
    end_time INTEGER,
    log_count INTEGER,
    device TEXT
);
INSERT OR IGNORE INTO db_info VALUES (1, 0, 0, 0, '');
