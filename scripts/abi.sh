#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Checks the library's binary interface: its name, and that it exports what the public headers
# declare, nothing more, and nothing else than the last release did (src/kesbluetooth.symbols).
#   scripts/abi.sh [--update]    --update: writes the list anew, for a change that is meant
source "$(dirname "$0")/lib.sh"

kept=$root/src/kesbluetooth.symbols
case "${1:-}" in '' | --update) ;; *) echo "usage: abi.sh [--update]" >&2; exit 2 ;; esac
# The folder is shared with the tests, and configured for them unless it was otherwise before.
need_packages "${build_packages[@]}" "${test_packages[@]}" binutils castxml python3
build_target=kesbluetooth
build "$root/build"

library=$(echo "$root"/build/src/libkesbluetooth.so.*.*.*)
exported=$root/build/exported.symbols
nm -D --defined-only "$library" | sed -n 's/^[0-9a-f]* [^A] //p' | sed 's/@.*//' | LC_ALL=C sort >"$exported"

headers=$root/build/headers
for header in "$root"/include/bluetooth/*.h; do
    printf '#include <bluetooth/%s>\n' "$(basename "$header")"
done >"$headers.cpp"
# castxml's compiler takes the sizes of g++'s deletes for errors unless it is told of them.
# shellcheck disable=SC2046 # one word for each flag
castxml --castxml-output=1 --castxml-cc-gnu "(" g++ -std=c++17 ")" -fsized-deallocation -w -I "$root/include" \
    $(pkg-config --cflags dbus-1 dbus-glib-1) -o "$headers.xml" "$headers.cpp"
python3 "$root/scripts/abi.py" "$headers.xml" "$exported" "$root/include/bluetooth"

if [ "${1:-}" = --update ]; then
    cp "$exported" "$kept"
elif ! diff -u "$kept" "$exported" >"$root/build/abi.diff"; then
    c++filt <"$root/build/abi.diff" >&2
    die "the exported symbols are not those of src/kesbluetooth.symbols; if that is meant, run scripts/abi.sh --update (a symbol that goes needs a new major version)"
fi

version=$(sed -n 's/^project(kesbluetooth VERSION \([0-9.]*\).*/\1/p' "$root/CMakeLists.txt")
soname=$(objdump -p "$library" | sed -n 's/^ *SONAME *//p')
[ "$(basename "$library")" = "libkesbluetooth.so.$version" ] && [ "$soname" = "libkesbluetooth.so.${version%%.*}" ] ||
    die "$(basename "$library") with soname $soname does not fit version $version"
! objdump -p "$library" | grep -q 'NEEDED.*libdbus-glib' ||
    die "the library is linked with dbus-glib, and so are all programs: what is used of it is loaded (src/scanner/dbus_glib.cpp)"
echo "ABI: $soname exports $(wc -l <"$exported") symbols, as declared and as kept"
