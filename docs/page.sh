#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# What Doxygen reads in place of a page; runs in the project's folder.
#   docs/page.sh PAGE
classes=$(sed -n 's/^\(class\|struct\) KESBLUETOOTH_API \([A-Za-z]*\).*/\2/p' include/bluetooth/*.h |
    paste -sd'|')

# Programs and commands for Doxygen are in comments, which other readers of Markdown pass over. Classes
# and their operations become links. One that does not exist is a warning.
sed -E -e 's|^<!--! (.*) -->$|\1|' \
    -e "s/\`($classes)\`/@ref Bluetooth::\1 \"\1\"/g" \
    -e "s/\`($classes)::([A-Za-z]*)\(\)\`/@ref Bluetooth::\1::\2 \"\1::\2()\"/g" "$1"
