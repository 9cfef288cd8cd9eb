# shellcheck shell=bash
# While the disk is full, the senders over TCP wait, and status, an event and a notification report it. When there is room
# again, reception goes on by itself, and every message is a row, once. With the spool, status shows how many datagrams were dropped.
# Takes about 20 s, on a volume in memory.
# usage: full_disk.sh database|receiver|spool
if [[ ! ${KELO_OWN_MOUNTS:-} ]]; then
    mounts=(unshare --map-root-user --mount)
    "${mounts[@]}" mount -t tmpfs tmpfs /mnt || { echo "SKIPPED: may not mount"; exit 77; }
    KELO_OWN_MOUNTS=yes exec "${mounts[@]}" bash "$0" "$@"
fi
source "$(dirname "$0")/support.sh"
clean_up() {
    syslog_ng_stop "$root"
    umount --lazy "$root/var" || true
    rm -rf "$root"
}
mkdir -p "$root/var"
mount -t tmpfs -o size=320m tmpfs "$root/var"
mkdir -p "$root/var/log/kelosyslog" "$root/var/log/kelolog" "$root/var/buffer" "$root/var/ballast" "$root/var/etc" "$root/var/spool/kelonotify" "$root/var/spool/kelosyslog" "$root/run/kelosyslog"
rmdir "$root/usr/kelo/etc"
ln -s "$root/var/etc" "$root/usr/kelo/etc"
database=$root/var/log/kelosyslog/logs.db
define "$root/kelosyslog.conf" kelo_store "$1"
define "$root/kelosyslog.conf" kelo_db "$database"
define "$root/kelosyslog.conf" kelo_buffer_dir "$root/var/buffer"
define "$root/kelosyslog.conf" kelo_buffer_bytes 16777216
define "$root/kelosyslog.conf" kelo_buffer_window 8388608
define "$root/kelosyslog.conf" kelo_spool_spare 8388608
# A window and a buffer of datagrams that the end of this test can fill.
[[ $1 != spool ]] || sed -i '/^source s_kelo_datagrams/,/^}/ { s/log-iw-size(100000)/log-iw-size(1000)/; s/so-rcvbuf(4194304)/so-rcvbuf(65536)/ }' \
    "$root/kelosyslog.conf"

# send NAME OPTIONS...: sends for a while; `sent` tells how many messages that were.
send() { loggen --inet --quiet --interval=10 "${@:2}" >"$root/$1" 2>&1 & }
sent() { sed -n 's/.*count=\([0-9]*\).*/\1/p' "$root/$1"; }
received() {
    syslog_ng_control "$root" stats | awk -F';' '$1 == "source" && $2 ~ /^s_kelo_(lines|frames)$/ && $5 == "processed" { sum += $6 }
        END { print sum + 0 }'
}
reserved() { (($(stat -c %b "$root"/var/buffer/*.rqf) * 512 > 16777216)); }
# Takes all free space but BYTES; again what has become free since. What is written meanwhile makes room for the writers only.
fill() {
    local free spare
    for spare in 0 1048576 8388608 33554432; do
        free=$(df --output=avail --block-size=1 "$root/var" | tail -n 1)
        ! fallocate --length $((free - ${1:-0} - spare)) "$root/var/ballast/$((++fillers))" 2>/dev/null || return 0
    done
}
notified() { grep -qs KELOSYSLOG_VOL_FULL "$root"/var/spool/kelonotify/new/*.json; }
# Nothing may have been received while status looked, which takes a second and a half.
reported() {
    fill
    stopped=$(received)
    status=0
    "$KELO_BIN_DIR/kelosyslog" status --root "$root" --control "$root/syslog-ng.ctl" >"$root/screen" || status=$?
    ((status == 1)) && grep -qE '^! syslog-ng cannot write [0-9,]+ messages for d_kelo' "$root/screen" &&
        grep -q "^! the volume of $root/var/log/kelosyslog is full: " "$root/screen" && (($(received) == stopped))
}
fillers=0
goes_on() { (($(received) > stopped)); }

# Two recipients: what each of them got must be recorded, so that nothing is sent unless that works.
mkdir -p "$root/etc"
printf '%s\n' 'smtp_mail_enabled="yes"' 'smtp_from="a@x"' 'smtp_to="b@x, c@x"' 'smtp_server="127.0.0.1"' 'smtp_port="1"' \
    'desktop_enabled="no"' >"$root/etc/keloinfo.conf"
syslog_ng_start "$root"
[[ $1 == spool ]] || wait_until 20 reserved || fail "no disk space is reserved for the buffer: $(ls -ls "$root/var/buffer")"
wait_until 20 test -s "$root/var/spool/kelonotify/.reserve" || fail "no disk space is reserved for notifications"
send lines --stream --rate=5000 --size=200 --active-connections=3 127.0.0.1 "$syslogPort"
lines=$!
send frames --stream --syslog-proto --rate=5000 --size=220 127.0.0.1 "$framePort"
frames=$!
send datagrams --dgram --rate=50 --size=240 127.0.0.1 "$syslogPort"
datagrams=$!
wait_until 20 has_rows "$database" 10000 || fail "nothing arrives"

# With room for nothing but what the receiver has reserved. In the other way syslog-ng might take that.
declare -A left=([database]=8388608 [receiver]=0 [spool]=0)
fill_partly() { fill "${left[$1]}" && notified; }
filled=$EPOCHSECONDS
wait_until 20 fill_partly "$1" || fail "no notification of a full volume"
wait_until 20 reported || fail "status does not report it, or the senders do not wait: $(<"$root/screen")"
status=0
"$KELO_BIN_DIR/kelonotify" --root "$root" 2>"$root/kelonotify" || status=$?
expect "kelonotify that tries to deliver" "$status" 1

rm "$root"/var/ballast/*
freed=$EPOCHSECONDS
wait_until 10 goes_on || fail "nothing is received when there is room again"
wait $lines $frames $datagrams
total=$(($(sent lines) + $(sent frames) + $(sent datagrams)))
sentOnes="prog != 'kelosyslog'" # keep-spool reports a full spool
wait_until 60 has_rows "$database" $total "$sentOnes" || fail "not all $total messages arrived"
expect "rows, and different ones" "$(query "SELECT count(*), count(DISTINCT msg) FROM logs WHERE $sentOnes")" "$total|$total"
expect "events while it lasted" "$(sql "$root/usr/kelo/etc/kelosyslog.db" \
    "SELECT count(*), sum(time BETWEEN $filled AND $freed) FROM log WHERE event = 'Volume space is not enough.'")" "1|1"

[[ $1 == spool ]] || exit 0
# Of datagrams that come while the spool is full, each is stored or among those that status says the kernel has dropped.
is_spool_closed() { [[ ! $(find /proc/"$(<"$root/pid")"/fd -lname "$root/var/spool/kelosyslog/*" 2>/dev/null) ]]; }
mkdir -p "$root/etc/kelosyslog/syslog-ng" "$root/etc/syslog-ng/conf.d" "$root/var/lib/syslog-ng" # where status looks for the ports
ln -s "$root/syslog-ng.ctl" "$root/var/lib/syslog-ng"
cp "$root/kelosyslog.conf" "$root/etc/kelosyslog/syslog-ng"
ln -s "$root/kelosyslog.conf" "$root/etc/syslog-ng/conf.d"
keeper=$(pgrep -P "$(<"$root/pid")" keep-spool)
kill -STOP "$keeper" # else it finds room and opens the spool again
rm "$root/var/spool/kelosyslog/in"
wait_until 20 is_spool_closed || { kill -CONT "$keeper"; fail "syslog-ng does not close its file"; }
send more --dgram --number=4000 --rate=20000 --size=240 127.0.0.1 "$syslogPort"
wait $!
"$KELO_BIN_DIR/kelosyslog" status -o json --root "$root" >"$root/status.json" || true
dropped=$(grep -oP '"kernel_drops": *\K[0-9]+' "$root/status.json" | awk '{ sum += $1 } END { print sum + 0 }')
kill -CONT "$keeper"
((dropped > 0 && dropped < 4000)) || fail "status shows $dropped dropped datagrams of 4000: $(<"$root/status.json")"
wait_until 60 has_rows "$database" $((total + 4000 - dropped)) "$sentOnes" || fail "$dropped of 4000 were dropped, and others are lost"
syslog_ng_stop "$root"
expect "rows with the datagrams" "$(query "SELECT count(*) FROM logs WHERE $sentOnes")" $((total + 4000 - dropped))
