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
        sed -i '1i block log kelo_pass_on_file() { };' "$root/file/kelosyslog.conf"
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
