#!/usr/bin/env bash
# Makes the data files of the harbour example, runs it, draws the map of the
# wave disturbance and prints the area report of the last output.
#   ./run.sh [folder of the built programs]   (default: build/release of the project)
set -euo pipefail
. "$(dirname "$0")/../common.sh"

make_maps "Harbour behind a breakwater" "Sponge layer behind the generation line"
"$bwdata" import-asc codes.asc -o codes.xol2 --name "Area code" --type 999 --unit 99000 \
    --title "Areas of the disturbance report" >/dev/null
"$bwdata" import-csv waves.csv -o waves.xol0 --start "2026-01-01 12:00:00" \
    --types 999 --units 4700 --title "Source of the generation line" >/dev/null

echo "Running bw harbour.bw ..."
run_bw harbour.bw
grep -A6 "Run Statistics" harbour.log | sed -n 2,6p
echo
echo "Area report of the last output (disturbance.txt):"
awk '/^-+$/ { n++ } { block[n] = block[n] $0 "\n" } END { printf "%s%s", block[n - 1], block[n] }' \
    disturbance.txt

if [ -x "$bwplot" ] && /usr/bin/python3 -c "import matplotlib, netCDF4" 2>/dev/null; then
    mkdir -p pictures
    "$bwplot" disturbance.xol2 --item "Hm0/Hm0_incoming" --out pictures/disturbance.png \
        --title "Hm0 over the incoming Hm0, steps 1 to 1600" >/dev/null
    echo "Picture: $here/pictures/disturbance.png"
fi
