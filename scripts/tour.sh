#!/usr/bin/env bash
# The tour that try.sh shows. It expects the programs in PATH.
set -euo pipefail

if [ "${1:-}" != inside ]; then
    if [ -n "${KES_TOUR_HCICONFIG:-}" ]; then
        mount -t overlay overlay -o "lowerdir=$KES_TOUR_HCICONFIG:/usr/bin" /usr/bin 2>/dev/null || true
    fi
    exec bluez4-sim -- "$0" inside
fi

headset=00:11:22:33:44:01
bold='' plain=''
[ -t 1 ] && bold=$'\033[1m' plain=$'\033[0m'

say() { printf '\n%s# %s%s\n' "$bold" "$*" "$plain"; }
run() {
    printf '%s$ %s%s\n' "$bold" "$*" "$plain"
    "$@"
}

say "The adapters of this host"
run kesbt adapters
run kesbt adapter

say "What is in reach"
run kesbt discover --seconds 5
run kesbt devices

say "A headset becomes known, and tells its services"
run kesbt create "$headset"
run kesbt services "$headset"

say "Its audio is connected; the signals are shown as they come"
kesbt monitor &
monitor=$!
trap 'kill -INT $monitor 2>/dev/null || true' EXIT
run kesbt audio connect "$headset"
run kesbt audio status "$headset"
run kesbt volume up "$headset"
kill -INT "$monitor"
wait "$monitor" || true

say "That was the tour; docs/ tells more"
