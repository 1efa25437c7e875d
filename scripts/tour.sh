#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# A tour of what the programs do, against the simulated daemon on private buses. It expects the
# programs in PATH and needs no Bluetooth. Where that is possible it runs in a mount namespace of its
# own: what it writes to /etc, /run and /tmp is then seen by nobody else.
set -euo pipefail

case "${1:-}" in
'')
    enter=(unshare --mount)
    [ "$(id -u)" -eq 0 ] || enter=(unshare --user --map-root-user --mount)
    # A container may have the namespace and not the mounts.
    "${enter[@]}" sh -ec 'mount -t tmpfs tmpfs /run
        mkdir /run/upper /run/work
        mount -t overlay overlay -o lowerdir=/etc,upperdir=/run/upper,workdir=/run/work /etc' 2>/dev/null &&
        exec "${enter[@]}" "$0" isolated
    echo "Without namespaces: no HCI versions, and no auto-connect, which writes to /etc."
    ;;
isolated) # The simulated adapters' hciconfig stands in /usr/bin, and /etc can be written.
    hciconfig=${KES_TOUR_HCICONFIG:-$(dirname "$(realpath "$0")")/host}
    mount -t tmpfs tmpfs /run # for the PID file, and what is laid over the other folders
    layer=/run/tour
    mkdir -p "$layer"/{etc,etc-work,tmp}
    chmod 1777 "$layer/tmp"
    # A /tmp of its own: what others have left there is in the way, a pipe for instance. The programs
    # stay, should they be there.
    IFS=: read -ra places <<<"$PWD:$(realpath "$0"):$hciconfig:${KES_TOUR_SERVICES:-}:$PATH"
    for place in "${places[@]}"; do
        [[ $place =~ ^/tmp/[^/]+ ]] && place=${BASH_REMATCH[0]} && [ -d "$place" ] && [ ! -e "$layer$place" ] || continue
        mkdir "$layer$place"
        mount --rbind "$place" "$layer$place"
    done
    mount -t overlay overlay -o "lowerdir=$hciconfig:/usr/bin" /usr/bin
    mount -t overlay overlay -o "lowerdir=/etc,upperdir=$layer/etc,workdir=$layer/etc-work" /etc
    mount --rbind "$layer/tmp" /tmp
    cd "$PWD"
    mkdir -p /etc/bluetooth
    mount -t tmpfs tmpfs /etc/bluetooth # one that was there belongs to somebody else
    export KES_TOUR_ISOLATED=1
    ;;
esac
if [ "${1:-}" != inside ]; then
    exec bluez4-sim ${KES_TOUR_SERVICES:+--session-services="$KES_TOUR_SERVICES"} -- "$0" inside
fi

headset=00:11:22:33:44:01
phone=00:11:22:33:44:03
receiver=00:11:22:33:44:04
bold='' plain=''
[ -t 1 ] && bold=$'\033[1m' plain=$'\033[0m'

say() { printf '\n%s# %s%s\n' "$bold" "$*" "$plain"; }
show() { printf '%s$ %s%s\n' "$bold" "$*" "$plain"; }
run() {
    show "$@"
    "$@"
}
background=()
stop_all() {
    for pid in "${background[@]}"; do kill -INT "$pid" 2>/dev/null || true; done
    for pid in "${background[@]}"; do wait "$pid" || true; done
    background=()
}
trap stop_all EXIT
# start PROGRAM...: runs it beside the tour, until stop_all. A shell's background jobs ignore Ctrl-C.
start() {
    show "$* &"
    env --default-signal=INT "$@" &
    background+=($!)
}
sink_connected() {
    local try
    for try in {1..50}; do
        kesbt audio status "$headset" | grep -q '^Sink .*State=connected' && return
        sleep 0.2
    done
    return 1
}
scannerd_pid() {
    gdbus call --session --dest org.freedesktop.DBus --object-path /org/freedesktop/DBus \
        --method org.freedesktop.DBus.GetConnectionUnixProcessID com.kestrine.bluetooth |
        sed 's/[^ ]* \([0-9]*\).*/\1/'
}
headset_in_range() {
    gdbus call --address "$DBUS_SYSTEM_BUS_ADDRESS" --dest com.kestrine.bluetooth.Sim \
        --object-path /com/kestrine/bluetooth/Sim \
        --method com.kestrine.bluetooth.Sim.SetDevice "$headset" "{'Present': <$1>}" >/dev/null
}

say "The adapters of this host"
run kesbt adapters
run kesbt adapter

say "What is in reach"
run kesbt discover --seconds 3
run kesbt devices

say "A headset becomes known, and tells its services"
run kesbt create "$headset"
run kesbt services "$headset"

say "Its audio is connected; the signals are shown as they come"
start kesbt monitor
run kesbt audio connect "$headset"
run kesbt volume up "$headset"
run kesbt audio disconnect "$headset"
stop_all

say "Pairing: an old device wants a PIN, a phone shows a passkey to confirm"
run kesbt pair "$receiver" --pin 1234
run kesbt pair "$phone" --yes
run kesbt devices

say "Two programs share one scan; the first question starts the scanner daemon"
start kesbt scan watch
run kesbt scan list
run kesbt wait found 00:11:22:33:44:08
run kesbt scan list
stop_all
run kesbt scan stop
scannerd=$(scannerd_pid)
kill "$scannerd" # it would end by itself half a minute after its last new scan
while [ -n "$(tr -d '\0' 2>/dev/null <"/proc/$scannerd/cmdline")" ]; do sleep 0.1; done

if [ -n "${KES_TOUR_ISOLATED:-}" ]; then
    say "The headset is to be connected by itself whenever it appears"
    headset_in_range false
    run kesbt autoconnect add "$headset"
    run kesbt autoconnect enable
    run kesbt autoconnect show
    start kesbt-autoconnectd --foreground --pid-file /run/autoconnectd.pid --interval 1
    printf '... the headset is switched on\n'
    headset_in_range true
    sink_connected
    run kesbt audio status "$headset"
    stop_all
fi

say "That was the tour; kesbt --help and the documentation tell more"
