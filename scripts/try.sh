#!/usr/bin/env bash
# Builds the programs and shows what they do, against the simulated daemon on private buses.
source "$(dirname "$0")/lib.sh"

need_packages "${build_packages[@]}"
echo "Building in build ..."
build "$root/build" -DKESBLUETOOTH_BUILD_TESTS=OFF

for program in kesbt scannerd autoconnectd; do
    PATH=$root/build/tools/$program:$PATH
done
export PATH=$root/build/sim:$PATH
export KES_TOUR_HCICONFIG=$root/sim/bin KES_TOUR_SERVICES=$root/build/tour-services
mkdir -p "$KES_TOUR_SERVICES"
printf '[D-BUS Service]\nName=com.kestrine.bluetooth\nExec=%s\n' \
    "$root/build/tools/scannerd/kesbt-scannerd" >"$KES_TOUR_SERVICES/com.kestrine.bluetooth.service"

enter=(unshare --mount)
[ "$(id -u)" -eq 0 ] || enter=(unshare --user --map-root-user --mount)
if "${enter[@]}" true 2>/dev/null; then
    exec "${enter[@]}" "$root/scripts/tour.sh" isolated
fi
echo "Without namespaces: no HCI versions, and no auto-connect, which writes to /etc."
exec "$root/scripts/tour.sh"
