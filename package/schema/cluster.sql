-- The tables of a cluster, for each of its servers; docs/cluster.md explains them. {cluster} is the name of the cluster in
-- remote_servers; {shard} and {replica} are macros of the server's own configuration.
CREATE DATABASE IF NOT EXISTS kelo;

-- The rows of the server's shard. The id is made of the second of receipt (33 bits), the number of the log server (8 bits) and the
-- number of the message (22 bits): it is unique and in the order of receipt, and the same when a batch is sent again.
CREATE TABLE IF NOT EXISTS kelo.logs_shard (
    id UInt64 MATERIALIZED bitShiftLeft(toUInt64(greatest(least(utcsec, 8589934591), 0)), 30)
        + bitShiftLeft(toUInt64(node), 22) + rcptid % 4194304,
    host String,
    ip String,
    fac String,
    prio String,
    llevel String,
    tag String,
    utcsec Int64,
    tzoffset String,
    ldate String,
    ltime String,
    prog String,
    msg String,
    node UInt8,
    rcptid UInt64
) ENGINE = ReplicatedReplacingMergeTree('/kelo/{shard}/logs', '{replica}')
PARTITION BY toYYYYMMDD(toDateTime(utcsec))
ORDER BY id
SETTINGS index_granularity = 8192, replicated_deduplication_window = 1000;

-- What is searched: the rows of all shards.
CREATE TABLE IF NOT EXISTS kelo.logs (
    id UInt64,
    host String,
    ip String,
    fac String,
    prio String,
    llevel String,
    tag String,
    utcsec Int64,
    tzoffset String,
    ldate String,
    ltime String,
    prog String,
    msg String,
    node UInt8,
    rcptid UInt64
) ENGINE = Distributed({cluster}, kelo, logs_shard);
