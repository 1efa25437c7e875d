#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Installs everything to a fresh prefix and builds the installed examples with it, through CMake and
# through pkg-config:
#   build.sh BUILD_FOLDER LIBRARY_FOLDER WORK_FOLDER     LIBRARY_FOLDER as below the prefix: lib
# Makes prefix, cmake and pkg-config in WORK_FOLDER.
set -euo pipefail

prefix=$3/prefix
rm -rf "$3"
mkdir -p "$3"
env --unset=DESTDIR cmake --install "$1" --prefix "$prefix" >"$3/install.log"
examples=$prefix/share/doc/libkesbluetooth-doc/examples

export CXXFLAGS="-Wall -Wextra -Wpedantic -Wshadow -Wconversion -Werror"
cmake -S "$examples" -B "$3/cmake" -DCMAKE_PREFIX_PATH="$prefix"
cmake --build "$3/cmake"

cp -r "$examples" "$3/pkg-config"
PKG_CONFIG_PATH=$prefix/$2/pkgconfig make -C "$3/pkg-config"
