# shellcheck shell=bash
# A message is one row, whatever its format and text, with each of its parts in the right column of the table that logs.sql creates.
# usage: delivery.sh database|spool
source "$(dirname "$0")/support.sh"
define "$root/kelosyslog.conf" kelo_store "$1"
syslog_ng_start "$root"

# Where syslog-ng stores it creates the table from its own configuration.
send_lines <(make_messages 1 old)
landed 1
describe() {
    sql "$1" "
        SELECT 'column', cid, name, type, \"notnull\", dflt_value, pk FROM pragma_table_xinfo('logs');
        SELECT 'autoincrement', sql LIKE '%PRIMARY KEY AUTOINCREMENT%' FROM sqlite_master WHERE name = 'logs';
        SELECT 'index', l.name, l.\"unique\", l.partial, x.seqno, x.name, x.desc, x.coll
            FROM pragma_index_list('logs') l, pragma_index_xinfo(l.name) x ORDER BY l.name, x.seqno;"
}
sqlite3 "$root/schema.db" <"$KELO_SOURCE_DIR/package/schema/logs.sql"
expect "table" "$(describe "$database")" "$(describe "$root/schema.db")"
expect "journal mode" "$(query 'PRAGMA journal_mode')" wal

# A name that is too long is cut between two characters.
printf '<13>Jan  1 00:00:00 nas %sü%s: long name\n' "$(printf 'p%.0s' {1..254})" "$(printf 'p%.0s' {1..50000})" >"$root/line"
send_lines "$root/line"
landed 2
expect "a long name" "$(query "SELECT host, length(CAST(prog AS BLOB)) FROM logs WHERE msg = 'long name'")" "nas|254"

# Hostile texts byte by byte, framed and, where they hold no line feed, as lines; as datagrams with their line feeds.
query 'DELETE FROM logs'
for text in "${hostileTexts[@]}"; do
    printf '<165>1 - lab hostile 7 - - %s' "$text" >"$root/message"
    add_frame "$root/hostile" <"$root/message"
    sed 's/hostile 7/datagram 7/' "$root/message" >"$root/datagram"
    send_datagram "$root/datagram"
    [[ $text == *$'\n'* ]] || printf '<165>Jan  2 03:04:05 lab line[7]: %s\n' "$text" >>"$root/old-lines"
done
send_frames "$root/hostile"
send_lines "$root/old-lines"
count=${#hostileTexts[@]}
landed $((3 * count - 1))
for text in "${hostileTexts[@]}"; do
    wanted=1
    [[ $text == *$'\n'* ]] && wanted=0
    found=$(query "SELECT count(*) FILTER (WHERE prog = 'hostile'), count(*) FILTER (WHERE prog = 'datagram'),
        count(*) FILTER (WHERE prog = 'line') FROM logs WHERE msg = '${text//\'/\'\'}'")
    expect "rows of ${text:0:30}" "$found" "1|1|$wanted"
done

# One message each: how it is sent, its text, and host, fac, prio, tag, prog, msg of its row.
query 'DELETE FROM logs'
cat >"$root/cases" <<'END'
lines	<34>Oct 11 22:14:15 mymachine su: 'su root' failed	mymachine|auth|crit|22|su|'su root' failed
lines	<0>Jan  2 03:04:05 h kernel: panic	h|kern|emerg|00|kernel|panic
lines	<191>1 2003-10-11T22:14:15.003Z h app 9 ID [a b="c\\]\\"d"] text	h|local7|debug|bf|app|text
lines	<13>1 - - - - - - nil values	127.0.0.1|user|notice|0d|-|nil values
lines	no priority: kept whole	127.0.0.1|user|notice|0d|-|no priority: kept whole
frames	<34>Oct 11 22:14:15 old framed[1]: old in a frame	old|auth|crit|22|framed|old in a frame
frames	<14>1 - h nul - - - before\0after	h|user|info|0e|nul|before\\x00after
datagram	<14>1 - h end - - - line feed at the end\n	h|user|info|0e|end|line feed at the end
END
total=0
while IFS=$'\t' read -r way text wanted; do
    printf '%b' "$text" >"$root/message"
    case $way in
    lines) echo >>"$root/message" ;;
    frames) rm -f "$root/frame"; add_frame "$root/frame" <"$root/message"; mv "$root/frame" "$root/message" ;;
    esac
    "send_$way" "$root/message"
    total=$((total + 1))
    landed $total
    expect "$text" "$(query "SELECT host, fac, prio, tag, prog, msg FROM logs ORDER BY id DESC LIMIT 1")" "$(printf '%b' "$wanted")"
done <"$root/cases"
expect "form of the times" "$(row_count "$database" "ip = '127.0.0.1' AND abs(utcsec - unixepoch()) < 300 AND
    tzoffset GLOB '[+-][0-9][0-9]:[0-9][0-9]' AND unixepoch(replace(ldate, '/', '-') || ' ' || ltime || tzoffset) = utcsec")" $total
