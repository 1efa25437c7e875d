#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Builds the programs and shows what they do, against the simulated daemon on private buses.
source "$(dirname "$0")/lib.sh"

need_packages "${build_packages[@]}"
build "$root/build" -DKESBLUETOOTH_BUILD_TESTS=OFF

for program in kesbt scannerd autoconnectd; do
    PATH=$root/build/tools/$program:$PATH
done
export PATH=$root/build/sim:$PATH
export KES_TOUR_HCICONFIG=$root/sim/bin KES_TOUR_SERVICES=$root/build/tour-services
mkdir -p "$KES_TOUR_SERVICES"
printf '[D-BUS Service]\nName=com.kestrine.bluetooth\nExec=%s\n' \
    "$root/build/tools/scannerd/kesbt-scannerd" >"$KES_TOUR_SERVICES/com.kestrine.bluetooth.service"
exec "$root/scripts/tour.sh"
