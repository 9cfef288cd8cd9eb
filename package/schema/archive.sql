-- An archived log database: the logs and the one row that describes them.
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
CREATE TABLE IF NOT EXISTS db_info (
    id INTEGER PRIMARY KEY,
    start_time INTEGER,
    end_time INTEGER,
    log_count INTEGER,
    device TEXT
);
INSERT OR IGNORE INTO db_info VALUES (1, 0, 0, 0, '');
