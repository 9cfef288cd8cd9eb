# shellcheck shell=bash
# The folders of the package with real users, where syslog-ng stores, and with the protections that Debian's kernel has
# switched on: a service that was taken over can place nothing beside the working log, nobody's open files keep root or a
# service from working, and members of adm read in every state. Exit status 77: this is not root, or the kernel's settings
# cannot be changed.
source "$(dirname "$0")/support.sh"
define "$root/kelosyslog.conf" kelo_store database
skip() { echo "SKIPPED: $*"; exit 77; }
((EUID == 0)) || skip "needs root, to become other users"

serviceId=64203
as() { setpriv --reuid="$1" --regid="$2" --clear-groups --no-new-privs "${@:3}"; } # USER GROUP COMMAND...
service() { as $serviceId $serviceId "$@"; }
adm() { as 65534 "$(getent group adm | cut -d: -f3)" "$@"; }
export PATH=$KELO_BIN_DIR:$PATH
chmod 755 "$root"
service test -x "$KELO_BIN_DIR/kelosyslog" || skip "other users cannot run $KELO_BIN_DIR/kelosyslog"

# Debian's values; protected_regular and protected_fifos also in folders that a group can write.
declare -A settings=([protected_regular]=2 [protected_fifos]=2 [protected_symlinks]=1 [protected_hardlinks]=1) before
restore() { for name in "${!before[@]}"; do echo "${before[$name]}" >"/proc/sys/fs/$name"; done; }
trap 'kill $(jobs -p) 2>/dev/null || true; restore; clean_up' EXIT
for name in "${!settings[@]}"; do
    [[ $(<"/proc/sys/fs/$name") == "${settings[$name]}" ]] && continue
    value=$(<"/proc/sys/fs/$name")
    echo "${settings[$name]}" 2>/dev/null >"/proc/sys/fs/$name" || skip "cannot set fs.$name"
    before[$name]=$value
done

kelosyslog() { "${program[@]}" "$@"; }
program=("$KELO_BIN_DIR/kelosyslog" --root "$root")
logs=$root/var/log/kelosyslog
database=$logs/logs.db
events=$root/var/lib/kelosyslog/kelosyslog.db

# As the package installs them.
mkdir -p "$root/etc" "$root/run"
rm -rf "$logs" "$root/var/log/kelolog" "$root/usr/kelo/etc"
echo "kelosyslog:x:$serviceId:$serviceId::/:/bin/false" >"$root/etc/passwd"
{ echo "kelosyslog:x:$serviceId:"; getent group adm; echo root:x:0:; } >"$root/etc/group"
echo root:x:0:0::/:/bin/sh >>"$root/etc/passwd"
systemd-tmpfiles --create --root="$root" "$KELO_SOURCE_DIR/package/systemd/kelosyslog.tmpfiles"
chown root "$logs" # as where syslog-ng stores
ln -s ../../var/lib/kelosyslog "$root/usr/kelo/etc"
ln -s ../syslog-ng.pid "$root/run/syslog-ng.pid"
define "$root/kelosyslog.conf" kelo_db "$database"
define "$root/kelosyslog.conf" kelo_receive \
    "exec setpriv --reuid=$serviceId --regid=$serviceId --clear-groups --no-new-privs ${program[*]} receive"

sent=0
send() { # messages, and waits until they are stored
    make_messages 10 old $((sent + 1)) >"$root/lines"
    send_lines "$root/lines"
    sent=$((sent + 10))
    landed "$sent"
}
# Holds a database open, in a transaction, with the statement done; or not at all where the user may not.
hold() { # USER DATABASE STATEMENT
    mkfifo "$root/held"
    chmod 666 "$root/held"
    "$1" sqlite3 -batch "$2" <"$root/held" >"$root/holding" 2>&1 &
    holder=$!
    exec {held}<>"$root/held"
    printf '%s\n' '.timeout 2000' "BEGIN;" "$3" "SELECT 'settled';" >&"$held"
    wait_until 20 has_settled || fail "$1 does not get on: $(<"$root/holding")"
}
has_settled() { grep -qs settled "$root/holding" || ! kill -0 "$holder" 2>/dev/null; }
kill_holder() {
    kill -KILL "$holder" 2>/dev/null || true
    wait "$holder" 2>/dev/null || true
    exec {held}>&-
    rm "$root/held"
}
read_by_adm() { expect "$1: what adm reads" "$(adm "${program[@]}" count 2>&1)" "$sent"; }

echo "== Every start of syslog-ng"
syslog_ng_start "$root"
send
read_by_adm "while syslog-ng runs"
! as 65534 65534 "${program[@]}" count 2>/dev/null || fail "everybody may read"
hold adm "$database" "SELECT count(*) FROM logs;"
syslog_ng_stop "$root" KILL # the write-ahead log stays
kill_holder
read_by_adm "after a kill"
mv "$database-shm" "$root"
adm "${program[@]}" count 2>"$root/out" || true
grep -q "without $database-shm, which is missing" "$root/out" || fail "what adm is told: $(<"$root/out")"
mv "$root/logs.db-shm" "$logs"
hold service "$database" "SELECT count(*) FROM logs;"
kill_holder
syslog_ng_start "$root"
send
syslog_ng_stop "$root"
read_by_adm "at rest"
hold service "$database" "INSERT INTO logs (msg) VALUES ('forged');" # opens it while syslog-ng is down, and is killed
kill_holder
syslog_ng_start "$root"
send
expect "forged records" "$(query "SELECT count(*) FROM logs WHERE msg = 'forged'")" 0

echo "== What a service cannot do"
for name in logs.db-journal logs.db-wal2 archive/x; do
    ! service touch "$logs/$name" 2>/dev/null || fail "a service may place $name"
done
! service bash -c ": >>'$database'" 2>/dev/null || fail "a service may write the working log"
expect "what others can write" "$(find "$logs" -perm /022 ! -type l)" ""
expect "attention" "$(kelosyslog status --control "$root/syslog-ng.ctl" | grep -c 'can write' || true)" 0
chown $serviceId "$logs"
kelosyslog status --control "$root/syslog-ng.ctl" >"$root/screen" || true
grep -q "syslog-ng stores into $database, and user .* can write $logs" "$root/screen" || fail "$(<"$root/screen")"
chown root "$logs"

echo "== Events of root and of a service"
hold service "$events" "SELECT count(*) FROM log; INSERT INTO log (level, time, user, event) VALUES (1, 1, 'u', 'held'); COMMIT; BEGIN; SELECT count(*) FROM log;"
kelosyslog events add server-start by-root || fail "root cannot add an event"
kill_holder
kelosyslog events add server-start by-root || fail "root cannot add an event after a kill"
syslog_ng_stop "$root"
rm "$events"*
kelosyslog events add server-start first # creates the database
service "${program[@]}" events add server-start by-service || fail "a service cannot write what root created"
expect "events" "$(adm "${program[@]}" events -o csv --no-header | wc -l)" 2

echo "== A fresh working log"
syslog_ng_start "$root"
kelosyslog db quarantine --yes --force >"$root/out" || fail "$(<"$root/out")"
sent=0
send
read_by_adm "after a quarantine"
kelosyslog archive --yes --remove-archived >/dev/null || fail "no archive after a quarantine"
expect "archived" "$(adm "${program[@]}" count --log "$(basename "$logs"/archive/*.db)")" 10
expect "left" "$(kelosyslog count || true)" 0

echo "== The receiver stores"
syslog_ng_stop "$root"
define "$root/kelosyslog.conf" kelo_store receiver
chown $serviceId "$logs" "$database"*
syslog_ng_start "$root"
sent=0
send
read_by_adm "while the receiver stores"
kelosyslog archive --yes --remove-archived >/dev/null || fail "root cannot archive what the receiver stores"
sent=0
send
expect "owners" "$(stat -c %u "$database"* | sort -u)" $serviceId
expect "attention" "$(kelosyslog status --control "$root/syslog-ng.ctl" | grep -c 'cannot write' || true)" 0
chown root "$logs"
kelosyslog status --control "$root/syslog-ng.ctl" >"$root/screen" || true
grep -q "the receiver stores into $database, and its user .* cannot write $logs" "$root/screen" || fail "$(<"$root/screen")"
