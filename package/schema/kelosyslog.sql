-- The server's own event log.
-- All or nothing, while readers wait; write-ahead logging last, as no transaction can include it.
PRAGMA busy_timeout = 10000;
BEGIN EXCLUSIVE;

CREATE TABLE IF NOT EXISTS log (
    id INTEGER PRIMARY KEY,
    level INTEGER NOT NULL,
    time INTEGER NOT NULL,
    user TEXT NOT NULL,
    event TEXT NOT NULL
);
-- Serves "ORDER BY time DESC" with and without an offset, the rotation's delete by time, and the count.
CREATE INDEX IF NOT EXISTS log_time ON log (time);

COMMIT;
PRAGMA journal_mode = WAL;
