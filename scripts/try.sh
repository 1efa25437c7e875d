#!/usr/bin/env bash
# Builds the programs and shows what they do, against the simulated daemon on private buses.
source "$(dirname "$0")/lib.sh"

need_packages "${build_packages[@]}"
echo "Building in build ..."
build "$root/build"

# The tour runs where the simulated adapters' hciconfig stands in /usr/bin; only it sees that.
enter=(unshare --mount)
[ "$(id -u)" -eq 0 ] || enter=(unshare --user --map-root-user --mount)
export PATH=$root/build/tools/kesbt:$root/build/tools/scannerd:$root/build/tools/autoconnectd:$root/build/sim:$PATH
export KES_TOUR_HCICONFIG=$root/sim/bin
if "${enter[@]}" true 2>/dev/null; then
    exec "${enter[@]}" "$root/scripts/tour.sh"
fi
exec "$root/scripts/tour.sh" # without namespaces: the HCI version stays empty
