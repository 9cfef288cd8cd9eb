# shellcheck shell=bash
# What the benchmarks of the whole chain share. Sourced by bash, not run.
cd "$(dirname "$(readlink -f "${BASH_SOURCE[0]}")")/.." || exit
. scripts/lib/syslog-ng.sh

programs=${KELO_BIN_DIR:-$PWD/build/release/bin}
root=$(mktemp -d)
clean_up() {
    local kind
    for kind in "$root"/*/; do
        syslog_ng_stop "${kind%/}"
    done
    rm -rf "$root"
}
trap clean_up EXIT
trap 'exit 1' INT TERM HUP

# configure KIND: the shipped configuration in $root/KIND, which is empty before. KIND is "database", "receiver" or "spool",
# the way of storing, or "file": a flat file that gets what the columns get, and nothing else is done.
configure() {
    local kind=$1
    rm -rf "${root:?}/$kind"
    mkdir "$root/$kind"
    syslog_ng_configure "$root/$kind" package/syslog-ng/kelosyslog.conf "$programs/kelosyslog"
    if [[ $kind == file ]]; then
        sed -i '1i block log kelo_pass_on_file() { };\nblock log kelo_parsed_file() { };' "$root/file/kelosyslog.conf"
        cat >>"$root/file/kelosyslog.conf" <<END
source s_kelo_keeper_file { };
destination d_kelo_file {
  file("$root/file/logs.txt" template("\${HOST} \${SOURCEIP} \${FACILITY} \${LEVEL} \${LEVEL} \${TAG} \${R_UNIXTIME} \
\${R_TZOFFSET} \${R_YEAR}/\${R_MONTH}/\${R_DAY} \${R_HOUR}:\${R_MIN}:\${R_SEC} \${PROGRAM} \${MESSAGE}\n"));
};
END
    fi
    define "$root/$kind/kelosyslog.conf" kelo_store "$kind"
}

# where_they_wait ROOT: of a run that has not stored everything: what syslog-ng has received, written and queued, and what it and its
# children do. A queue behind which nothing is written names the program that does not read or store.
where_they_wait() {
    local process
    syslog_ng_control "$1" stats | grep -E '^(source;s_kelo|dst\.).*;(processed|written|queued|dropped);[1-9]' | sort
    for process in $(<"$1/pid") $(pgrep -P "$(<"$1/pid")"); do
        echo "$process $(tr '\0' ' ' <"/proc/$process/cmdline"): $(sed -n 's/^State:\t//p' "/proc/$process/status"), $(<"/proc/$process/wchan")"
    done
    cat "$1/run/kelosyslog/receive.json" "$1/receiver.err"
    tail -n 10 "$1/syslog-ng.err" "$1/syslog-ng.log"
} 2>/dev/null

# rsyslog, out of its packages. Fails where they cannot be had.
rsyslog_unpack() {
    mkdir "$root/packages"
    (
        cd "$root/packages" || exit
        apt-get download -o APT::Sandbox::User=root rsyslog libestr0 libfastjson4 liblognorm5 >/dev/null 2>&1 &&
            for package in *.deb; do dpkg-deb -x "$package" unpacked || exit 1; done
    )
}

# rsyslog_start FOLDER: it writes the columns to FOLDER/logs.txt; is ended by syslog_ng_stop.
rsyslog_start() {
    local libraries
    libraries=$(dirname "$root"/packages/unpacked/usr/lib/*/rsyslog)
    rm -rf "$1"
    mkdir "$1"
    syslogPort=$(free_port)
    cat >"$1/rsyslog.conf" <<END
module(load="imtcp")
input(type="imtcp" address="127.0.0.1" port="$syslogPort")
template(name="columns" type="string" string="%HOSTNAME% %fromhost-ip% %syslogfacility-text% %syslogseverity-text% \
%syslogseverity-text% %pri% %timegenerated:::date-unixtimestamp% %timegenerated:::date-tzoffshour% \
%timegenerated:::date-year%/%timegenerated:::date-month%/%timegenerated:::date-day% \
%timegenerated:::date-hour%:%timegenerated:::date-minute%:%timegenerated:::date-second% %programname%%msg%\n")
action(type="omfile" file="$1/logs.txt" template="columns" ioBufferSize="64k")
END
    LD_LIBRARY_PATH=$libraries "$root/packages/unpacked/usr/sbin/rsyslogd" -n -f "$1/rsyslog.conf" -i NONE \
        -M "$libraries/rsyslog" </dev/null >"$1/rsyslog.err" 2>&1 &
    echo $! >"$1/pid"
    disown
    wait_until 20 port_in_use "$syslogPort" || { cat "$1/rsyslog.err" >&2; return 1; }
}
