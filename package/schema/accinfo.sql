-- The accounting database: samples of logs per second and device, and the count of logs per device.
-- All or nothing, while readers wait; write-ahead logging last, as no transaction can include it.
PRAGMA busy_timeout = 10000;
BEGIN EXCLUSIVE;

CREATE TABLE IF NOT EXISTS eps (
    id INTEGER PRIMARY KEY,
    stamp INTEGER NOT NULL,
    device TEXT NOT NULL,
    eps INTEGER NOT NULL
);
-- Samples are read and trimmed by ranges of stamps.
CREATE INDEX IF NOT EXISTS eps_stamp ON eps (stamp);

CREATE TABLE IF NOT EXISTS histogram (
    id INTEGER PRIMARY KEY,
    device TEXT NOT NULL UNIQUE,
    count INTEGER NOT NULL
);
-- The devices with the most logs are read by count.
CREATE INDEX IF NOT EXISTS histogram_count ON histogram (count);

COMMIT;
PRAGMA journal_mode = WAL;
