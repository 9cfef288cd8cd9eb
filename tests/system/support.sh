# shellcheck shell=bash
# What the system tests share: an own root that disappears, a private syslog-ng with the shipped configuration, and
# checks. Sourced by each test, which ctest runs in parallel with others.
set -euo pipefail
: "${KELO_SOURCE_DIR:=$(readlink -f "$(dirname "${BASH_SOURCE[0]}")/../..")}" "${KELO_BIN_DIR:=$KELO_SOURCE_DIR/build/dev/bin}"
source "$KELO_SOURCE_DIR/scripts/lib/syslog-ng.sh"
source "$KELO_SOURCE_DIR/scripts/lib/messages.sh"

root=$(mktemp -d)
database=$root/var/log/kelosyslog/logs.db
clean_up() {
    syslog_ng_stop "$root"
    rm -rf "$root"
}
trap clean_up EXIT
trap 'exit 1' INT TERM HUP

fail() {
    echo "FAILED: $*" >&2
    tail -n 20 "$root/syslog-ng.err" "$root/syslog-ng.log" >&2 || true
    exit 1
}
expect() { [[ $2 == "$3" ]] || fail "$1: found \"$2\", expected \"$3\""; } # WHAT FOUND WANTED
query() { sql "$database" "$1"; }

# A writer of its own keeps the database locked until it is unlocked.
lock_database() {
    mkfifo "$root/commands"
    sqlite3 -batch "$database" <"$root/commands" >"$root/locked" &
    locker=$!
    exec {commands}>"$root/commands"
    printf '%s\n' '.timeout 5000' 'BEGIN IMMEDIATE;' "SELECT 'locked';" >&"$commands"
    wait_until 20 grep -q locked "$root/locked" || fail "no lock"
}
unlock_database() {
    exec {commands}>&-
    wait "$locker"
}

landed() { wait_until 60 has_rows "$database" "$1" || fail "only $(row_count "$database") of $1 messages arrived"; }

syslog_ng_configure "$root" "$KELO_SOURCE_DIR/package/syslog-ng/kelosyslog.conf" "$KELO_BIN_DIR/kelosyslog"
define "$root/kelosyslog.conf" kelo_db "$database"
# Disk space of this size is reserved.
define "$root/kelosyslog.conf" kelo_buffer_bytes 67108864
define "$root/kelosyslog.conf" kelo_buffer_window 33554432
