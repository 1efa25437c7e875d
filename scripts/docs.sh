#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Writes the documentation of the classes and the pages to build/docs/html. Any warning is a failure,
# and so is an operation that does not name its D-Bus method or signal, and a place in CONTRIBUTING.md
# that is not there. Installs the Debian package that is missing.
source "$(dirname "$0")/lib.sh"

need_packages doxygen
cd "$root"
KESBLUETOOTH_VERSION=$(sed -n 's/^project(kesbluetooth VERSION \([0-9.]*\).*/\1/p' CMakeLists.txt)
[ -n "$KESBLUETOOTH_VERSION" ] || die "CMakeLists.txt tells no version"
KESBLUETOOTH_DOCS=$root/build/docs
export KESBLUETOOTH_VERSION KESBLUETOOTH_DOCS
rm -rf "$KESBLUETOOTH_DOCS"/{html,examples}
mkdir -p "$KESBLUETOOTH_DOCS"
doxygen docs/Doxyfile
cp -r examples "$KESBLUETOOTH_DOCS/" # the pages link to them

# What CONTRIBUTING.md names is there.
grep -oE '`[a-zA-Z.][a-zA-Z0-9_./-]*/[a-zA-Z0-9_./-]*`' CONTRIBUTING.md | tr -d '`' | while read -r place; do
    [ -n "$(find . -path "*/${place%/}" -not -path './build*' -print -quit)" ] ||
        die "CONTRIBUTING.md names $place, which is not there"
done

for header in include/bluetooth/*.h; do
    source=$(echo src/*/"$(basename "$header" .h).cpp")
    [ -e "$source" ] || continue
    for name in $(tr -s '\n ' ' ' <"$source" |
        grep -oE '(\*this, |setSignalHandler[A-Za-z]*\( ?)"[A-Z][A-Za-z]*"' | cut -d'"' -f2); do
        grep -qE "@dbus .*\b$name\(" "$header" || die "$header lacks '@dbus $name(...)'"
    done
done
echo "Written: build/docs/html/index.html"
