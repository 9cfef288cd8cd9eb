# shellcheck shell=bash
# What the program writes as HTML, in a real browser: it renders without an error, and no text acts on the report.
source "$(dirname "$0")/support.sh"
kelosyslog=("$KELO_BIN_DIR/kelosyslog" --root "$root")
events=$root/usr/kelo/etc/kelosyslog.db

sqlite3 "$database" <"$KELO_SOURCE_DIR/package/schema/logs.sql"
sqlite3 "$root/var/log/kelolog/.KELOACCOUNTDB" <"$KELO_SOURCE_DIR/package/schema/accinfo.sql"

# show PAGE: the page as the browser has built it, in $root/dom. A script could only change the title or complain.
show() {
    chromium --headless --no-sandbox --disable-gpu --disable-quic --no-first-run --disable-background-networking \
        --disable-component-update --disable-sync --user-data-dir="$root/profile" --enable-logging=stderr --dump-dom \
        "file://$1" >"$root/dom" 2>"$root/browser.err" || fail "the browser on $1: $(tail -n 3 "$root/browser.err")"
    ! grep CONSOLE "$root/browser.err" || fail "console errors of $1"
}
in_page() { grep -Fq -- "$1" "$root/dom" || fail "not in the page: $1"; }
elements() { { grep -oE "<$1[ >]" "$root/dom" || true; } | wc -l; }

"${kelosyslog[@]}" events add server-start 1.0
"${kelosyslog[@]}" events add volume-full
"${kelosyslog[@]}" events export "$root/events.html"
show "$root/events.html"
in_page '<title>Syslog Server Log</title>'
in_page '<td align="left">Server was started [1.0].</td>'
expect "rows of the exported page" "$(elements tr)" 3

script="<script>document.title='pwned'</script>"
image="\"><img src=x onerror=\"document.title='pwned'\">"
control=$'\x1b[31m \x07 \xff '$'\u202e\u200f'
"${kelosyslog[@]}" events add keyword "$script" "$image$control"
quoted() { printf "'%s'" "${1//\'/\'\'}"; }
sqlite3 "$events" "UPDATE log SET user = $(quoted "$image") WHERE id = (SELECT max(id) FROM log)"
"${kelosyslog[@]}" events export "$root/events.html"
show "$root/events.html"
in_page '&lt;script&gt;document.title='
in_page '\x1b[31m \x07 \xff \u202e'
expect "elements from texts of events" "$(elements script)$(elements img)" 00
expect "title of the exported page" "$(grep -o '<title>.*</title>' "$root/dom")" '<title>Syslog Server Log</title>'
now=$(date +%s)
for host in "$script" "$image" "$control" nas; do
    sqlite3 "$database" "INSERT INTO logs (host, prio, llevel, utcsec, msg)
        VALUES ($(quoted "$host"), $(quoted "${host/nas/err}"), 'err', $now, 'm')"
    sqlite3 "$root/var/log/kelolog/.KELOACCOUNTDB" "INSERT INTO histogram (device, count) VALUES ($(quoted "$host"), 7);
        INSERT INTO eps (stamp, eps, device) VALUES ($now, 3, $(quoted "$host"))"
done
"${kelosyslog[@]}" report "$root/report.html" --since 1h
show "$root/report.html"
in_page '<title>Log report, '
in_page '&lt;script&gt;document.title='
in_page '"&gt;&lt;img src=x onerror='
in_page '\x1b[31m \x07 \xff \u202e'
expect "elements from texts" "$(elements script)$(elements img)" 00
expect "lines with the image: a device, an accounted device, an event" "$(grep -c 'img src=x onerror=' "$root/dom")" 3
expect "charts" "$(elements 'svg class="plot"')" 2
expect "bars: an error is no severity here, the rest neither; and the accounted second" "$(grep -c '<rect class="[a-z]*" x=' "$root/dom")" 3
