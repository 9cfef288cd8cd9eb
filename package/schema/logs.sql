-- The working log database. syslog-ng creates the same table from the columns() of its sql() destination when it meets a
-- fresh file; keep the two alike.
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
