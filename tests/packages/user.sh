#!/bin/bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# What a new user does with the packages beside this file, in a Debian system that has nothing else:
# installs them, takes the tour, reads a manual page, builds the examples, removes everything.
set -euo pipefail
cd /packages
export DEBIAN_FRONTEND=noninteractive

say() { printf '%s\n' "-- $*"; }
fail() { printf '%s\n' "$*" >&2; exit 1; }
install() { apt-get install -y -qq --no-install-recommends "$@" >install.log 2>&1 || { cat install.log >&2; fail "$* cannot be installed"; }; }
package() { find /packages -name "$1_*.deb"; }

apt-get update -qq
install man-db
say "The programs"
install "$(package libkesbluetooth1)" "$(package kesbt)" "$(package kesbt-scannerd)" \
    "$(package kesbt-autoconnectd)" "$(package bluez4-sim)"
for program in kesbt kesbt-scannerd kesbt-autoconnectd bluez4-sim; do
    "$program" --version | grep -q '[0-9]\.[0-9]' || fail "$program prints no version"
    ! ldd "$(command -v "$program")" | grep 'not found' || fail "$program lacks a library"
    man "$program" | grep -q 'EXIT STATUS' || fail "$program has no manual page"
done
[ -e /usr/share/dbus-1/services/com.kestrine.bluetooth.service ] || fail "no bus can start the scanner"
grep -q '^ExecStart=/usr/bin/kesbt-autoconnectd ' /usr/lib/systemd/system/kesbt-autoconnectd.service ||
    fail "systemd cannot start kesbt-autoconnectd"
# Enabled, as systemctl does it; there is none here.
mkdir -p /etc/systemd/system/multi-user.target.wants
ln -s /lib/systemd/system/kesbt-autoconnectd.service /etc/systemd/system/multi-user.target.wants/

say "The tour"
/usr/share/kesbluetooth/tour.sh >tour.log 2>&1 || { cat tour.log >&2; fail "the tour fails"; }
for shown in 'HCIVersion *4' 'State=connected' ' 00:11:22:33:44:01 connected' 'That was the tour'; do
    grep -q "$shown" tour.log || { cat tour.log >&2; fail "the tour does not show $shown"; }
done

say "The examples"
# libbluetooth-dev has headers in the same folder.
install "$(package libkesbluetooth-dev)" "$(package libkesbluetooth-doc)" libbluetooth-dev \
    g++ make cmake pkg-config
man kesbluetooth | grep -q Manager || fail "no manual page of the library"
[ -s /usr/share/doc/libkesbluetooth-doc/html/index.html ] || fail "no reference"
cp -r /usr/share/doc/libkesbluetooth-doc/examples /tmp/examples
cmake -S /tmp/examples -B /tmp/by-cmake >make.log && cmake --build /tmp/by-cmake >>make.log ||
    { cat make.log >&2; fail "the examples cannot be built with CMake"; }
make -C /tmp/examples >make.log || fail "the examples cannot be built with pkg-config"
for folder in /tmp/by-cmake /tmp/examples; do
    KESBLUETOOTH_TEST_NAMESPACE=1 ./run.sh "$folder" >/dev/null
done

say "The first program"
sed -n '/^```cpp$/,/^```$/{/^```/!p}' README.md >first.cpp
# shellcheck disable=SC2046 # one word for each flag
g++ -std=c++17 first.cpp -o first $(pkg-config --cflags --libs kesbluetooth)
bluez4-sim -- ./first | grep -q '^/org/bluez/[0-9]*/hci0$' || fail "the first program does not list hci0"

say "All of it goes again"
apt-get purge -y -qq 'libkesbluetooth*' 'kesbt*' bluez4-sim >/dev/null 2>&1
left=$(find / -xdev -path /packages -prune -o -path /var -prune -o -name '*kesb*' -print -o -name 'bluez4-sim*' -print)
[ -z "$left" ] || fail "these are left behind: $left"
