# shellcheck shell=bash
# The page for Cockpit on a log of two days, for scripts/demo. Sourced by bash, not run. Needs scripts/lib/messages.sh and
# scripts/lib/syslog-ng.sh.
. scripts/lib/demo-log.sh
. scripts/lib/cockpit.sh

# web_demo ROOT PORT: serves the page on loopback until it is interrupted. PORT may be "free".
web_demo() {
    local root=$1 port=$2 program=$1/usr/bin/kelosyslog
    [[ $port != free ]] || port=$(free_port)
    [[ $port =~ ^[0-9]+$ ]] || fail "$port is no port"
    ! port_in_use "$port" || fail "port $port is in use"
    [[ -x $cockpitServer ]] || fail "Cockpit is missing (${cockpitPackages[*]})"
    echo "Making a log of two days ..."
    demo_log "$root" "$program" 60000
    cockpit_home "$root/home" console/page "$program" "$root"
    cat <<END

    http://127.0.0.1:$port/kelosyslog

Open this address in a browser on this machine. The page belongs to whoever opens it first, and to anybody on this machine: it
works as $(id -un), without a login. A device sends a log each second; Ctrl-C ends the demo and removes everything.
END
    web_demo_arrivals "$root" "$program" &
    local arrivals=$! server
    # A session without a login ends with its browser: the next one begins.
    trap 'kill "$arrivals" ${server:+"$server"} 2>/dev/null || true; clean_up' EXIT
    while true; do
        (cockpit_serve "$root/home" "$port") >>"$root/cockpit.log" 2>&1 &
        server=$!
        wait "$server" || true
        [[ -d $root ]] || break
        sleep 0.2
    done
}

# A log each second, while the demo runs.
web_demo_arrivals() {
    local number=1
    while [[ -d $1 ]]; do
        demo_lines $((number % 97 + 1)) | tail -n 1 | LC_ALL=C awk -v now="$(date +%s)" -v day="$(date '+%Y/%m/%d %T')" -v number="$number" '{
            split(day, part, " "); $3 = part[1]; $4 = part[2]; $5 = now; print $0 " (" number ")" }' |
            "$2" parse --db "$1/var/log/kelosyslog/logs.db" - >/dev/null 2>&1 || true
        number=$((number + 1))
        sleep 1
    done
}
