# shellcheck shell=bash
# A private syslog-ng on loopback for the demo, the system tests and the benchmark. Sourced by bash, not run.
#
# Everything is below ROOT: ROOT/kelosyslog.conf, ROOT/logs.db, ROOT/syslog-ng.{conf,persist,pid,ctl,log}. The
# daemon runs as the calling user and is stopped by its process id alone.

PATH=$PATH:/usr/sbin # where Debian puts syslog-ng, and users do not look

# wait_until SECONDS COMMAND...: runs the command until it succeeds; fails when the time is over.
wait_until() {
    local deadline=$((SECONDS + $1))
    shift
    until "$@"; do
        ((SECONDS < deadline)) || return 1
        sleep 0.05
    done
}

# sql DATABASE STATEMENT: the statement's output; waits for a writer.
sql() { sqlite3 -batch -cmd '.timeout 5000' "$1" "$2"; }

# row_count DATABASE [CONDITION]: the number of rows; 0 while syslog-ng has not created the table yet.
row_count() {
    local count
    count=$(sql "$1" "SELECT count(*) FROM logs WHERE ${2:-1}" 2>/dev/null) || count=0
    echo "${count:-0}"
}
has_rows() { (($(row_count "$1" "${3:-1}") >= $2)); } # DATABASE COUNT [CONDITION]

port_in_use() {
    grep -qhiE "^ *[0-9]+: [0-9A-F]+:$(printf '%04X' "$1") " /proc/net/tcp /proc/net/tcp6 /proc/net/udp /proc/net/udp6 \
        2>/dev/null
}

# Prints a port that is free at the moment, below the range from which the kernel assigns ports.
free_port() {
    local port
    for _ in {1..200}; do
        port=$((20000 + (RANDOM * 32768 + RANDOM) % 12000))
        port_in_use "$port" || { echo "$port"; return; }
    done
    echo "no free port between 20000 and 32000" >&2
    return 1
}

# define FILE NAME VALUE: sets one of the @define lines at the head of a configuration.
define() {
    grep -q "^@define $2 " "$1" || { echo "$1: no \"@define $2\"" >&2; return 1; }
    sed -i "s|^@define $2 .*|@define $2 \"$3\"|" "$1"
}

# syslog_ng_configure ROOT SHIPPED PROGRAM: a private copy of the shipped configuration, with all of its paths below ROOT
# and PROGRAM as kelosyslog.
syslog_ng_configure() {
    local root=$1 keeper
    cp "$2" "$root/kelosyslog.conf"
    mkdir -p "$root/var/spool/kelosyslog/files" "$root/usr/kelo/syslog" "$root/usr/kelo/etc" "$root/var/log/kelosyslog" "$root/var/log/kelolog"
    ln -sfn "$(readlink -f "$(dirname "$2")/../schema")" "$root/usr/kelo/syslog/schema"
    define "$root/kelosyslog.conf" kelo_receive "exec $3 receive --root $root"
    define "$root/kelosyslog.conf" kelo_db "$root/logs.db"
    define "$root/kelosyslog.conf" kelo_buffer_dir "$root"
    define "$root/kelosyslog.conf" kelo_reserve "$(readlink -f "$(dirname "${BASH_SOURCE[0]}")/../../package/syslog-ng/reserve-buffer")"
    define "$root/kelosyslog.conf" kelo_spool "$root/var/spool/kelosyslog"
    define "$root/kelosyslog.conf" kelo_spool_done "$root/run/kelosyslog"
    keeper=$(dirname "$3")/keep-spool # in a build, or as it is installed
    [[ -x $keeper ]] || keeper=$(dirname "$3")/../libexec/kelosyslog/keep-spool
    define "$root/kelosyslog.conf" kelo_keep_spool "$keeper"
    define "$root/kelosyslog.conf" kelo_address 127.0.0.1
    define "$root/kelosyslog.conf" kelo_listen "$root/listen.con[f]"
    define "$root/kelosyslog.conf" kelo_tls_dir "$root/tls"
    cat >"$root/syslog-ng.conf" <<END
@version: 3.38
options { stats-level(1); stats-freq(0); time-reopen(1); };
source s_internal { internal(); };
destination d_internal { file("$root/syslog-ng.log"); };
log { source(s_internal); destination(d_internal); };
@include "$root/kelosyslog.conf"
END
}

defined() { sed -n "s|^@define $2  *\"\([^\"]*\)\".*|\1|p" "$1"; } # FILE NAME

# With the store "spool" the receiver is a service of its own, which starts again when it ended: as long as ROOT/pid exists.
# Its messages go to ROOT/receiver.err.
spool_receiver_start() {
    local root=$1 conf=$1/kelosyslog.conf
    [[ $(defined "$conf" kelo_store) == spool ]] || return 0
    (
        while [[ -e $root/pid ]]; do
            # shellcheck disable=SC2046 # words
            $(defined "$conf" kelo_receive | sed 's/^exec //') --verbose --spool "$(defined "$conf" kelo_spool)" \
                --db "$(defined "$conf" kelo_db)" </dev/null >>"$root/receiver.err" 2>&1
        done
    ) 2>/dev/null &
    disown
}

syslog_ng_alive() { [[ -s $1/pid ]] && kill -0 "$(<"$1/pid")" 2>/dev/null; }

syslog_ng_ready() {
    syslog_ng_alive "$1" && syslog_ng_control "$1" stats >/dev/null && port_in_use "$syslogPort" &&
        port_in_use "$framePort"
}

syslog_ng_control() { syslog-ng-ctl "${@:2}" --control="$1/syslog-ng.ctl" 2>/dev/null; }

# The daemon alone, also in place of one that was killed.
syslog_ng_run() {
    local root=$1
    syslog-ng --foreground --no-caps --cfgfile="$root/syslog-ng.conf" --persist-file="$root/syslog-ng.persist" \
        --pidfile="$root/syslog-ng.pid" --control="$root/syslog-ng.ctl" </dev/null >>"$root/syslog-ng.err" 2>&1 &
    echo $! >"$root/pid"
    disown # no notice of the shell when the daemon is killed
}

# syslog_ng_launch ROOT: starts the daemon with the ports that the configuration names and waits until it listens.
syslog_ng_launch() {
    local root=$1
    syslog_ng_run "$root"
    spool_receiver_start "$root"
    wait_until 30 syslog_ng_settled "$root" && syslog_ng_ready "$root"
}
syslog_ng_gone() { ! syslog_ng_alive "$1"; }
syslog_ng_settled() { syslog_ng_gone "$1" || syslog_ng_ready "$1"; }

# syslog_ng_start ROOT: chooses free ports (variables syslogPort and framePort) and starts the daemon; again with other
# ports when somebody took one in between.
syslog_ng_start() {
    local root=$1
    for _ in {1..5}; do
        syslogPort=$(free_port) && framePort=$(free_port) || return 1
        ((syslogPort != framePort)) || continue
        define "$root/kelosyslog.conf" kelo_port "$syslogPort"
        define "$root/kelosyslog.conf" kelo_frame_port "$framePort"
        if syslog_ng_launch "$root"; then return; fi
        syslog_ng_stop "$root"
        grep -qi 'error binding socket' "$root/syslog-ng.err" "$root/syslog-ng.log" 2>/dev/null || break
    done
    echo "syslog-ng did not start:" >&2
    tail -n 20 "$root/syslog-ng.err" >&2
    return 1
}

receiver_pid() { sed 's/.*"pid":\([0-9]*\).*/\1/' "$1/run/kelosyslog/receive.json"; }
# The receiver ends a moment after the daemon whose child it is.
receiver_gone() { [[ ! -e $1/run/kelosyslog/receive.json ]] || ! kill -0 "$(receiver_pid "$1")" 2>/dev/null; }

# syslog_ng_stop ROOT [SIGNAL]: ends the daemon and waits until it and the receiver are gone; after 20 s it is killed.
syslog_ng_stop() {
    if syslog_ng_alive "$1"; then
        kill -s "${2:-TERM}" "$(<"$1/pid")" || true
        wait_until 20 syslog_ng_gone "$1" || { kill -s KILL "$(<"$1/pid")" && wait_until 5 syslog_ng_gone "$1"; } || true
    fi
    rm -f "$1/pid"
    receiver_gone "$1" || ! grep -q '"spool"' "$1/run/kelosyslog/receive.json" || kill "$(receiver_pid "$1")" || true
    wait_until 60 receiver_gone "$1" || true
}

# One file is sent unchanged: as lines over TCP, as frames that are already counted, as one datagram.
send_lines() { cat "$1" >"/dev/tcp/127.0.0.1/$syslogPort"; }
send_frames() { cat "$1" >"/dev/tcp/127.0.0.1/$framePort"; }
send_datagram() { cat "$1" >"/dev/udp/127.0.0.1/$syslogPort"; }

# add_frame FILE: the message on standard input, appended to FILE as one octet-counted frame.
add_frame() {
    local message
    message=$(mktemp "$1.XXXXXX")
    cat >"$message"
    { printf '%s ' "$(stat -c %s "$message")"; cat "$message"; } >>"$1"
    rm -f "$message"
}
