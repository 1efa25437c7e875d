#!/bin/sh
# SPDX-License-Identifier: LGPL-2.1-or-later
# Runs a command in a mount and PID namespace of its own, where the library's fixed paths are free
# to be written:
#   in_namespace.sh BUILD_FOLDER COMMAND [ARGUMENT...]
# /etc, /tmp, /run and /usr/sbin are empty there, /usr/bin can be added to, /usr/bin/hciconfig is
# missing, /small holds 64 KiB. The build folder is there, read-only. Works for root and for plain
# users. /etc is on a disk where KESBLUETOOTH_ETC names an empty folder there. Fails when the command
# fails, or when it changed anything of the real machine. Where namespaces are not allowed, as in many
# containers, it exits with 77, which ctest counts as skipped, and says why in one line;
#   in_namespace.sh --check
# tells only that.
set -eu

unavailable=77
check_namespaces() {
    problem=$(bwrap --unshare-pid --ro-bind / / --proc /proc --dev /dev --tmpfs /tmp true 2>&1) ||
        { echo "$problem" | head -n 1 >&2; exit "$unavailable"; }
}
[ "$1" != --check ] || { check_namespaces; exit 0; }

build=$1
shift
case "$*" in *--gtest_list_tests*) exec "$@" ;; esac # which ctest asks for, and touches nothing

# What the library would touch if it ran outside: names, owners, sizes, times.
fingerprint() {
    for path in /etc/bluetooth /etc/bluetooth/autoconnect /etc/bluetooth/autoconnect/* \
        /tmp/kes_bluetooth_autoconnect /tmp/bluetooth.info_* /run/kesbt* \
        /usr/sbin/bluetoothd /usr/bin/hciconfig; do
        stat -c '%n %f %u %s %y %z' "$path" 2>/dev/null || echo "no $path"
    done
}

set -- --unshare-pid --die-with-parent \
    --ro-bind /usr /usr --ro-bind /usr/bin /real-bin --tmpfs /usr/bin --tmpfs /usr/sbin \
    --proc /proc --dev /dev --perms 1777 --tmpfs /tmp --dir /var/tmp --dir /run \
    --size 65536 --tmpfs /small "${KESBLUETOOTH_BUILD_BIND:---ro-bind}" "$build" "$build" \
    --unsetenv DBUS_SYSTEM_BUS_ADDRESS --unsetenv DBUS_SESSION_BUS_ADDRESS \
    --setenv HOME /tmp --setenv KESBLUETOOTH_TEST_NAMESPACE 1 --chdir / \
    /real-bin/sh -c '
        /real-bin/ln -s /real-bin/* /usr/bin/
        /real-bin/rm -f /usr/bin/hciconfig
        build=$1 # other users may run what was built
        while build=$(/real-bin/dirname "$build") && [ "$build" != / ]; do
            /real-bin/chmod go+rx "$build"
        done
        shift
        exec "$@"' sh "$build" "$@"
for path in /etc/passwd /etc/group /etc/nsswitch.conf /etc/ld.so.cache /etc/machine-id \
    /etc/alternatives; do
    [ ! -e "$path" ] || set -- --ro-bind "$path" "$path" "$@"
done
for path in /bin /sbin /lib /lib32 /lib64 /libx32; do
    if [ -L "$path" ]; then
        set -- --symlink "usr$path" "$path" "$@"
    elif [ -d "$path" ]; then
        set -- --ro-bind "$path" "$path" "$@"
    fi
done
if [ "${KESBLUETOOTH_ETC:-}" ]; then
    set -- --bind "$KESBLUETOOTH_ETC" /etc "$@"
else
    set -- --perms 0755 --dir /etc "$@"
fi

before=$(fingerprint)
status=0
bwrap "$@" || status=$?
if [ "$before" != "$(fingerprint)" ]; then
    echo "in_namespace.sh: the command changed files of the real machine" >&2
    exit 1
fi
[ "$status" -eq 0 ] || check_namespaces
exit "$status"
