#!/bin/sh
# SPDX-License-Identifier: LGPL-2.1-or-later
# Every test that a document names is there:
#   names_test.sh BUILD_FOLDER DOCUMENT
set -fu
tests=$(ctest --test-dir "$1" -N)
status=0
for name in $(grep -o '`[A-Z][A-Za-z]*\.[A-Z*][^`]*`' "$2" | tr -d '`' | sed 's/\*/.*/'); do
    echo "$tests" | grep -Eq ": $name\$" || {
        echo "no test is called $name"
        status=1
    }
done
exit $status
