#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Measures which lines and branches the tests reach, folder by folder.
#   scripts/coverage.sh [ctest option...]      build-coverage/coverage.txt then has every file
source "$(dirname "$0")/lib.sh"

folder=$root/build-coverage
need_packages "${build_packages[@]}" "${test_packages[@]}" gcovr
build "$folder" -DCMAKE_BUILD_TYPE=Debug -DCMAKE_CXX_FLAGS="--coverage -fprofile-update=atomic"
find "$folder" -name '*.gcda' -delete # of a run before
echo "Testing ..."
# The tests in namespaces write their counts too.
KESBLUETOOTH_BUILD_BIND=--bind ctest --test-dir "$folder" --output-on-failure -j "$(nproc)" "$@" >"$folder/ctest.log" ||
    die "the tests failed; see ${folder#"$root"/}/ctest.log"

# Branches that only an exception takes are not counted: nearly every call has one. CMake's own
# trial programs, compiled with the same flags, are none of ours.
gcovr --root "$root" --object-directory "$folder" --filter "$root/(include|src|tools|serving|sim)/" \
    --exclude-throw-branches --exclude-unreachable-branches \
    --exclude-directories '.*/CMakeFiles/[0-9.]+/.*' \
    --json-summary "$folder/coverage.json" --txt "$folder/coverage.txt" "$folder"
python3 - "$folder/coverage.json" <<'PYTHON'
import collections, json, os, sys

folders = collections.defaultdict(lambda: [0, 0, 0, 0])
for file in json.load(open(sys.argv[1]))["files"]:
    parts = os.path.dirname(file["filename"]).split("/")
    counts = (file["line_covered"], file["line_total"], file["branch_covered"], file["branch_total"])
    for name in {"/".join(parts[:2]), "all"}:
        folders[name] = [a + b for a, b in zip(folders[name], counts)]

def share(part, whole):
    return f"{100 * part / whole:6.1f} %" if whole else "       -"

print(f"{'folder':24}{'lines':>8}{'reached':>10}{'branches':>10}{'reached':>10}")
for name, (lines, all_lines, branches, all_branches) in sorted(folders.items(), key=lambda f: (f[0] == "all", f[0])):
    print(f"{name:24}{all_lines:8}{share(lines, all_lines):>10}{all_branches:10}{share(branches, all_branches):>10}")
PYTHON
