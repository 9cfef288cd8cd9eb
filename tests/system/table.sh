# shellcheck shell=bash
# The table that syslog-ng creates in a fresh file is the one of logs.sql.
source "$(dirname "$0")/support.sh"

describe() {
    sql "$1" "
        SELECT 'column', cid, name, type, \"notnull\", dflt_value, pk FROM pragma_table_xinfo('logs');
        SELECT 'autoincrement', sql LIKE '%PRIMARY KEY AUTOINCREMENT%' FROM sqlite_master WHERE name = 'logs';
        SELECT 'index', l.name, l.\"unique\", l.partial, x.seqno, x.name, x.desc, x.coll
            FROM pragma_index_list('logs') l, pragma_index_xinfo(l.name) x ORDER BY l.name, x.seqno;"
}

sqlite3 "$root/schema.db" <"$KELO_SOURCE_DIR/package/schema/logs.sql"
wanted=$(describe "$root/schema.db")

syslog_ng_start "$root"
make_messages 1 old >"$root/line"
send_lines "$root/line"
landed 1
expect "table in a fresh file" "$(describe "$database")" "$wanted"
expect "journal mode" "$(query 'PRAGMA journal_mode')" wal
