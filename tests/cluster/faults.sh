# shellcheck shell=bash
# Messages that syslog-ng sends to the servers of a cluster, through the destination of "kelosyslog cluster init", are rows there, each
# once, whatever breaks: a server or a replica is killed, ZooKeeper is, an answer is lost, a disk is full, the password is wrong.
# Without ZooKeeper there is one server, and what needs replicas is left out. Takes about a minute.
if [[ ! ${KELO_OWN_MOUNTS:-} ]]; then
    command -v clickhouse-server >/dev/null || { echo "SKIPPED: clickhouse-server is not installed"; exit 77; }
    mounts=(unshare --map-root-user --mount)
    "${mounts[@]}" mount -t tmpfs tmpfs /mnt || { echo "SKIPPED: may not mount"; exit 77; }
    KELO_OWN_MOUNTS=yes exec "${mounts[@]}" bash "$0" "$@"
fi
source "$(dirname "${BASH_SOURCE[0]}")/../system/support.sh"
source "$(dirname "${BASH_SOURCE[0]}")/servers.sh"
clean_up() {
    syslog_ng_stop "$root"
    cluster_stop
    [[ -z ${lossy:-} ]] || kill "$lossy" || true
    umount --lazy "$root/disk" || true
    rm -rf "$root"
}
mkdir "$root/disk"
mount -t tmpfs -o size=512m tmpfs "$root/disk"
first=${hosts[0]}
cluster_start "$root/disk"
lossyPort=$(free_port)
cp "$root/new/127.0.0.1/syslog-ng/cluster.conf" "$root/cluster.conf"
define "$root/kelosyslog.conf" kelo_store cluster
define "$root/kelosyslog.conf" kelo_cluster yes
define "$root/kelosyslog.conf" kelo_cluster_file "$root/cluster.conf"
syslog_ng_start "$root"

number=1
# send COUNT: that many messages, all different from those before.
send() {
    make_messages "$1" new "$number" | awk -v "n=$number" '{ print $0 " #" n++ }' >"$root/lines"
    number=$((number + $1))
    send_lines "$root/lines"
}
rows() { ask "${1:-$first}" "SELECT count(), uniqExact(id), uniqExact(msg) FROM kelo.logs_shard FORMAT CSV" || echo none; }
has_all() { [[ $(rows "${1:-$first}") == "$2,$2,$2" ]]; }
# all_there WHAT [HOST]: every message that was sent is a row.
all_there() {
    wait_until 40 has_all "${2:-$first}" $((number - 1 + hostile)) || fail "$1: $(rows "${2:-$first}") of $((number - 1 + hostile))"
    echo "$SECONDS s: $1: $((number - 1 + hostile)) sent = rows = different ones"
}

counted() { [[ $(sql "$root/var/log/kelolog/.KELOACCOUNTDB" 'SELECT sum(count) FROM histogram' 2>/dev/null) == "$1" ]]; }
counter() { syslog_ng_control "$root" stats | awk -F';' -v name="$1" '$2 ~ /^d_kelo_servers#/ && $5 == name { sum += $6 } END { print sum + 0 }'; }
has_buffered() { (($(counter processed) >= $1)); }
# Waits until `count` messages more than before are in the buffer of syslog-ng, or sent.
await_buffered() { wait_until 30 has_buffered "$1" || fail "only $(counter processed) of $1 messages were received"; }
is_kept() { (($(counter queued) > 0)); }

# Years that no calendar has, NUL, bytes that are not UTF-8, and the longest message.
printf '<163>1 9999-12-31T23:59:60Z lab hostile 7 - - NUL \0 in the text' | add_frame "$root/frames"
hostile=1
for text in "${hostileTexts[@]}" $'a surrogate: \xed\xa0\x80' "$(printf '%065000d' 7)"; do
    printf '<163>1 0000-01-01T00:00:00Z lab hostile 7 - - %s' "$text" | add_frame "$root/frames"
    hostile=$((hostile + 1))
done
send 20000
send_frames "$root/frames"
all_there "hostile texts among others"
for text in "${hostileTexts[@]}" 'NUL \x00 in the text' 'a surrogate: \xed\xa0\x80'; do
    text=${text//$'\xff\xfe'/'\xff\xfe'}
    hex=$(printf %s "$text" | od -An -v -tx1 | tr -d ' \n')
    expect "rows with a hostile text" "$(ask "$first" "SELECT count() FROM kelo.logs_shard WHERE msg = unhex('$hex')")" 1
done
wait_until 20 counted $((number - 1 + hostile)) || fail "the receiver has not counted all"
attends_to() {
    "$KELO_BIN_DIR/kelosyslog" status --root "$root" --control "$root/syslog-ng.ctl" >"$root/screen" || true
    grep -q "^! $1" "$root/screen"
}
! attends_to 'database logs' || fail "status misses a database: $(<"$root/screen")"

if [[ $isReplicated ]]; then
    send 40000 &
    sending=$!
    kill_now "${serverPids[$first]}"
    wait $sending
    number=$((number + 40000))
    all_there "a replica killed, on the other" "${hosts[1]}"
    server_start "$first"
    all_there "a replica killed, and started again"

    kill_now "$keeperPid"
    send 5000
    wait_until 20 is_kept || fail "rows without ZooKeeper"
    keeper_start
    all_there "ZooKeeper killed"
fi

for host in "${hosts[@]}"; do
    ask "$host" 'DETACH TABLE kelo.logs_shard'
done
send 30000 # more than are in the batches, which syslog-ng does not count as queued
wait_until 20 attends_to 'syslog-ng cannot write .* d_kelo_servers' || fail "status says nothing: $(<"$root/screen")"
for host in "${hosts[@]}"; do
    ask "$host" 'ATTACH TABLE kelo.logs_shard'
done
all_there "no table for a while"

# Twice, as a server may have needed some space while the first ran.
for file in 1 2; do
    fallocate --length "$(df --output=avail --block-size=1 "$root/disk" | tail -n 1)" "$root/disk/ballast$file" 2>/dev/null || true
done
send 20000
wait_until 20 is_kept || fail "rows on a full disk"
rm "$root"/disk/ballast*
all_there "a full disk"

for host in "${hosts[@]}"; do
    kill_now "${serverPids[$host]}"
done
received=$(counter processed)
send 40000
await_buffered $((received + 40000))
kill_now "$(<"$root/pid")"
wait_until 20 receiver_gone "$root" || true
syslog_ng_start "$root"
for host in "${hosts[@]}"; do
    server_start "$host"
done
all_there "all servers and then syslog-ng killed"

python3 "$(dirname "${BASH_SOURCE[0]}")/lossy.py" "$lossyPort" "$first" "$httpPort" >"$root/dropped" &
lossy=$!
wait_until 10 port_in_use "$lossyPort" || fail "no proxy"
sed -i "s|url(.*|url(\"http://127.0.0.1:$lossyPort/\")|" "$root/cluster.conf"
syslog_ng_control "$root" reload >/dev/null
send 40000
# A batch that comes again with further messages is no block that the server has had: its rows are there twice until they are merged.
# Only the replica that leads can do that, and after the kills this may be either; the others refuse.
merge() {
    local host
    for host in "${hosts[@]}"; do ask "$host" 'OPTIMIZE TABLE kelo.logs_shard FINAL' >/dev/null || true; done
}
merged() {
    merge
    has_all "$first" $((number - 1 + hostile))
}
wait_until 40 merged || fail "lost answers: $(rows)"
grep -q dropped "$root/dropped" || fail "no answer was lost"
all_there "$(wc -l <"$root/dropped") answers lost"

# What syslog-ng has taken into its buffer comes after a kill, once; what it had only read is lost.
before=$((number - 1 + hostile))
received=$(counter processed)
send 40000 2>/dev/null &
sending=$!
wait_until 20 has_buffered $((received + 10000)) || fail "nothing is received"
taken=$(($(counter processed) - received))
kill_now "$(<"$root/pid")"
wait $sending || true
wait_until 20 receiver_gone "$root" || true
syslog_ng_start "$root"
has_buffered_ones() {
    merge
    IFS=, read -r all ids texts < <(rows) && ((all >= before + taken))
}
wait_until 30 has_buffered_ones || fail "of $taken messages in the buffer of syslog-ng only $((all - before)) came after its kill"
expect "rows and different ones after a kill of syslog-ng" "$all,$ids,$texts" "$all,$all,$all"
echo "$SECONDS s: syslog-ng killed with at least $taken messages in its buffer: $((all - before)) came, once"
