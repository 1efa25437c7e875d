#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Runs each example against the simulated daemon and checks what it prints and does.
#   run.sh FOLDER     FOLDER holds the built examples; bluez4-sim and kesbt are in PATH
# It writes to /etc/bluetooth, and so wants a namespace of its own (tests/host/in_namespace.sh), or
# a root that is thrown away and KESBLUETOOTH_TEST_NAMESPACE=1 to say so.
set -euo pipefail

# Devices of sim/scenarios/default.conf.
headset=00:11:22:33:44:01
phone=00:11:22:33:44:03
receiver=00:11:22:33:44:04
speaker=00:11:22:33:44:05
mouse=00:11:22:33:44:06
laptop=00:11:22:33:44:07
silent=00:11:22:33:44:99 # in no scenario but this test's
list=/etc/bluetooth/autoconnect/00:1A:7D:DA:71:10

die() {
    printf 'run.sh: %s\n' "$*" >&2
    exit 1
}

# check STATUS PATTERN PROGRAM [ARGUMENT...]: the program exits with the status, and prints what the
# whole pattern matches: on standard output for success, in one line on standard error for failure.
check() {
    local status=$1 pattern=$2 output errors got=0
    shift 2
    errors=$(mktemp)
    output=$(timeout 30 "$@" 2>"$errors") || got=$?
    [ "$got" -eq "$status" ] || die "$* exits with $got: $output $(cat "$errors")"
    if [ "$status" -eq 0 ]; then
        [ ! -s "$errors" ] || die "$* succeeds and complains: $(cat "$errors")"
    else
        [ -z "$output" ] || die "$* fails and prints: $output"
        [ "$(wc -l <"$errors")" -eq 1 ] || die "$* fails with other than one line: $(cat "$errors")"
        output=$(cat "$errors")
    fi
    rm "$errors"
    [[ $output =~ ^($pattern)$ ]] || die "$* prints: $output"
}

# start PROGRAM [ARGUMENT...]: runs it beside us. A shell's background jobs ignore Ctrl-C.
start() {
    exec {lines}< <(exec env --default-signal=INT "$@" 2>&1)
    started=$!
}
# expect PATTERN...: waits until what was started has printed a line for each, in any order.
expect() {
    local line pattern left
    while [ $# -gt 0 ]; do
        IFS= read -r -t 30 -u "$lines" line || die "no line matches: $*"
        left=()
        for pattern; do
            [[ $line =~ ^($pattern)$ ]] || left+=("$pattern")
        done
        set -- "${left[@]}"
    done
}
# stop STATUS: Ctrl-C for what was started. It exits with the status.
stop() {
    kill -INT "$started"
    ends "$1"
}
ends() {
    local got=0
    wait "$started" || got=$?
    [ "$got" -eq "$1" ] || die "exits with $got after: $(cat <&"$lines")"
}

# called TIMES METHOD: the simulated daemon was asked for it so often. What a program sent that has
# ended may be on its way.
called() {
    local end=$((SECONDS + 30)) times
    while [ "$SECONDS" -lt "$end" ]; do
        times=$(dbus-send --system --print-reply --dest=com.kestrine.bluetooth.Sim \
            /com/kestrine/bluetooth/Sim com.kestrine.bluetooth.Sim.GetCalls |
            grep -c "string \"$2\"" || true)
        [ "$times" -ne "$1" ] || return 0
    done
    die "$2 was called $times times"
}

part_adapters() {
    check 0 $'00:1A:7D:DA:71:10  on   kestrine-0\n00:1A:7D:DA:71:11  on   kestrine-1' list_adapters
    kesbt adapter set Powered off >/dev/null
    check 0 '00:1A:7D:DA:71:10  off  .*' list_adapters
    check 1 'cannot search: Resource Not Ready; .*' find_devices 1
}

part_discovery() {
    start find_devices 1000
    expect "found $headset  -[0-9]+ dBm  Kestrine Headset" "found $phone  -[0-9]+ dBm  Phone" \
        "gone  $speaker"
    stop 0
    called 1 StopDiscovery
    check 0 "found .*" find_devices 1 # ends by itself
    called 2 StopDiscovery
    check 2 'usage: .*' find_devices soon
}

part_pairing() {
    check 1 "cannot pair with $receiver \(Authentication Failed\); .*" pair "$receiver" 4321
    check 0 "paired with $receiver  GPS Receiver" pair "$receiver" 1234
    check 0 "paired with $phone  Phone" pair "$phone"
    check 1 "cannot pair with $phone \(Already Exists\); .*" pair "$phone"
}

# asks LOOP DEVICE QUESTION ANSWER LAST: the program asks, and after the answer, or after the adapter was
# switched off in its place, prints the last line.
asks() {
    start pair_asking "$1" "$2" <"$typed"
    expect "$3"
    if [ "$4" = off ]; then
        kesbt adapter set Powered off >/dev/null
        expect 'the question was withdrawn'
        kesbt adapter set Powered on >/dev/null
    else
        echo "$4" >"$typed"
    fi
    expect "$5"
    ends "$([[ $5 == paired* ]]; echo $?)"
}
part_questions() {
    local compare='does it show [0-9]{6}\? y or n' held loop
    typed=$(mktemp -u)
    mkfifo "$typed"
    exec {held}<>"$typed" # so that it does not end
    for loop in glib queue; do
        asks "$loop" "$phone" "$compare" off "cannot pair with $phone .*"
        asks "$loop" "$phone" "$compare" n "cannot pair with $phone \(Authentication Failed\); .*"
    done
    asks glib "$phone" "$compare" y "paired with $phone"
    asks queue "$receiver" 'which PIN code\?' $'\xff' "cannot pair with $receiver .*" # not UTF-8
    asks queue "$receiver" 'which PIN code\?' 1234 "paired with $receiver"
    rm "$typed"
}

part_interruption() {
    start pair "$silent"
    kesbt wait connected "$silent" >/dev/null
    stop 1
    expect 'the pairing was interrupted; try again'
    called 1 CancelDeviceCreation
}

part_scan() {
    start share_scan 1000
    expect "$phone  -[0-9]+ dBm  Phone"
    check 0 ".*$phone  -[0-9]+ dBm  Phone.*" share_scan 1 # with the first question
    called 1 StartDiscovery
    stop $((128 + 2))
}

part_lists() {
    rm -rf "${list%/*}" # of a run before, where there is no namespace
    mkdir -p "${list%/*/*}"
    check 1 "$phone is not known .*" auto_connect "$phone"
    check 0 "to be connected: $mouse" auto_connect "$mouse"
    check 0 'paired .*' pair "$phone"
    check 0 "to be connected: $mouse,$phone" auto_connect "$phone"
    check 0 "to be connected: $phone,$mouse" auto_connect "$mouse"
    [ "$(cat "$list")" = "1,$phone,$mouse" ] || die "$list holds: $(cat "$list")"
}

part_audio() {
    start watch_headset "$headset"
    expect 'org.bluez.Audio State=connecting' 'org.bluez.AudioSink Connected=1' \
        'org.bluez.Audio State=connected'
    stop 0
    called 1 Disconnect
    check 1 'cannot reach the headset \(Host is down\); .*' watch_headset "$laptop"
}

part_absence() {
    local program
    for program in list_adapters find_devices share_scan; do
        check 1 'bluetoothd is not running; .*' "$program"
    done
    check 1 '.*bluetoothd.*start it.*' pair_asking queue "$headset"
    for program in pair auto_connect watch_headset; do
        check 1 '.*bluetoothd.*start it.*' "$program" "$headset"
        check 2 "usage: $program .*" "$program"
    done
}

# simulate PART [OPTION...]
simulate() {
    local part=$1
    shift
    echo "$part"
    bluez4-sim --time-scale 0.05 "$@" -- "${BASH_SOURCE[0]}" "$folder" "$part"
}

[ $# -ge 1 ] && [ -x "$1/list_adapters" ] || die "usage: run.sh FOLDER_OF_BUILT_EXAMPLES"
[ -n "${KESBLUETOOTH_TEST_NAMESPACE:-}" ] || die "see the first lines of this script"
folder=$(realpath "$1")
if [ $# -eq 2 ]; then
    PATH=$folder:$PATH
    "part_$2"
    exit
fi
scenario=$(mktemp)
printf '%s\n' '[Times]' 'Connect=20000' '[Adapter hci0]' 'Address=00:1A:7D:DA:71:10' \
    "[Device $silent]" 'Behaviour=NeverAnswers' >"$scenario"
for part in adapters discovery pairing questions scan lists audio; do
    simulate "$part"
done
simulate interruption --scenario "$scenario"
simulate absence --no-daemon
rm "$scenario"
echo "All examples do what they are for."
