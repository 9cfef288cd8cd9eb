# shellcheck shell=bash
# Cockpit on loopback without systemd and without a login: one session of the calling user, whose program kelosyslog works below a
# folder of its own. For the demo in the browser and the tests of the page. Sourced by bash, not run.

# shellcheck disable=SC2034 # used by those who source this
cockpitPackages=(cockpit-ws cockpit-bridge cockpit-system)
cockpitServer=/usr/lib/cockpit/cockpit-ws
[[ -x $cockpitServer ]] || cockpitServer=/usr/libexec/cockpit-ws

# cockpit_home HOME PAGE PROGRAM ROOT: a home folder with the page installed and with a kelosyslog that works below ROOT.
cockpit_home() {
    mkdir -p "$1/.local/share/cockpit" "$1/bin" "$1/config/cockpit"
    ln -sfn "$(readlink -f "$2")" "$1/.local/share/cockpit/kelosyslog"
    printf '#!/bin/sh\nexec %q --root %q "$@"\n' "$3" "$4" >"$1/bin/kelosyslog"
    chmod 755 "$1/bin/kelosyslog"
    printf '[WebService]\nLoginTitle=kelosyslog\n' >"$1/config/cockpit/cockpit.conf"
}

# cockpit_serve HOME PORT: the server itself; it ends with its first browser.
cockpit_serve() {
    HOME=$1 XDG_DATA_HOME=$1/.local/share XDG_CONFIG_DIRS=$1/config XDG_CONFIG_HOME=$1/config PATH=$1/bin:$PATH \
        exec "$cockpitServer" --local-session=/usr/bin/cockpit-bridge --no-tls --address=127.0.0.1 --port="$2"
}
