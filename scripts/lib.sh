# SPDX-License-Identifier: LGPL-2.1-or-later
# Shared by the scripts of this folder; sourced, not run.
set -euo pipefail
root=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)

die() {
    printf '%s: %s\n' "$(basename "$0")" "$*" >&2
    exit 1
}

build_packages=(g++ cmake ninja-build pkg-config dbus libdbus-1-dev libglib2.0-dev
    libdbus-glib-1-dev libbluetooth-dev libboost-dev libcli11-dev nlohmann-json3-dev scdoc)
test_packages=(libgtest-dev bubblewrap mandoc make)
lint_packages=(git clang-format-14 clang-tidy-14)
docs_packages=(doxygen scdoc)
bench_packages=(libbenchmark-dev libsdbus-c++-dev python3 util-linux)

# Installs the named Debian packages that are missing; quiet when none is.
need_packages() {
    local missing=() package
    for package in "$@"; do
        if ! dpkg-query -W -f '${db:Status-Status}' "$package" 2>/dev/null | grep -qx installed; then
            missing+=("$package")
        fi
    done
    [ ${#missing[@]} -eq 0 ] && return
    local sudo=()
    if [ "$(id -u)" -ne 0 ]; then
        command -v sudo >/dev/null || die "packages are missing, and installing them takes root: ${missing[*]}"
        sudo=(sudo)
    fi
    printf 'Installing: %s\n' "${missing[*]}"
    "${sudo[@]}" apt-get update -qq
    "${sudo[@]}" env DEBIAN_FRONTEND=noninteractive \
        apt-get install -y -qq --no-install-recommends "${missing[@]}" >/dev/null
}

build_target=all

# build FOLDER [cmake option...]: configures and builds, showing its output only when it fails.
build() {
    local folder=$1 log first=""
    shift
    [ -e "$folder/build.ninja" ] || first=" (the first time this takes minutes)"
    echo "Building in ${folder#"$root"/}$first ..."
    log=$(mktemp)
    # What was compiled in one build folder is not compiled again in another.
    local launcher=()
    export CCACHE_BASEDIR=$root CCACHE_NOHASHDIR=1
    command -v ccache >/dev/null && launcher=(-DCMAKE_CXX_COMPILER_LAUNCHER=ccache)
    if ! { cmake -S "$root" -B "$folder" -G Ninja "${launcher[@]}" "$@" && cmake --build "$folder" --target "$build_target"; } >"$log" 2>&1; then
        cat "$log" >&2
        rm -f "$log"
        die "the build in $folder failed; its output is above"
    fi
    rm -f "$log"
}
