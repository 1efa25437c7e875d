#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Checks the layout with clang-format, that every source says what its licence is, and the code with
# clang-tidy; --fix lays the files out, --layout leaves clang-tidy out.
source "$(dirname "$0")/lib.sh"

case "${1:-}" in '' | --fix | --layout) ;; *) echo "usage: lint.sh [--fix | --layout]" >&2; exit 2 ;; esac
need_packages "${lint_packages[@]}"
cd "$root"
mapfile -t files < <(git ls-files '*.cpp' '*.h')
[ ${#files[@]} -gt 0 ] || die "git lists no files here; run it in a clone that is yours"
if [ "${1:-}" = --fix ]; then
    clang-format-14 -i "${files[@]}"
    exit
fi
clang-format-14 --dry-run --Werror "${files[@]}"
echo "clang-format: ${#files[@]} files are clean"
licence='SPDX-License-Identifier: LGPL-2.1-or-later'
without=$(git grep -L "^\(//\|#\) $licence\$" -- '*.cpp' '*.h' '*.cpp.in' '*.h.in' '*CMakeLists.txt' '*.cmake' \
    '*.cmake.in' '*Makefile' '*.py' '*.sh' .ci/run packaging/completions packaging/debian/autoconnectd sim/bin || true)
[ -z "$without" ] || die "these lack the line \"$licence\":"$'\n'"$without"
[ "${1:-}" != --layout ] || exit 0

need_packages "${build_packages[@]}" "${test_packages[@]}"
build "$root/build" -DKESBLUETOOTH_BUILD_TESTS=ON
# The benchmarks need libraries that nothing else does.
mapfile -t sources < <(git ls-files '*.cpp' ':!bench/')
printf '%s\n' "${sources[@]}" |
    xargs -P "$(nproc)" -n 4 clang-tidy-14 -p "$root/build" --quiet 2>/dev/null
echo "clang-tidy: ${#sources[@]} files are clean"
