#!/usr/bin/env bash
# Makes the data files of the flume example, runs it, and shows what it wrote.
#   ./run.sh [folder of the built programs]   (default: build/release of the project)
set -euo pipefail
. "$(dirname "$0")/../common.sh"

make_maps "Flume with a plane slope" "Sponge layer before the wall"
"$bwdata" import-csv waves.csv -o waves.xol0 --start "2026-01-01 12:00:00" \
    --types 100078 --units 1000 --title "Incoming wave" >/dev/null

echo "Running bw flume.bw (100 periods) ..."
run_bw flume.bw run.out
sed -n '/Scheme Stability/,/^=====/p' flume.log
grep -A6 "Run Statistics" flume.log | sed -n 2,6p

if [ -x "$bwplot" ] && /usr/bin/python3 -c "import matplotlib, netCDF4" 2>/dev/null; then
    mkdir -p pictures
    "$bwplot" gauges.xol0 --out pictures/gauges.png >/dev/null
    "$bwplot" axis.xol1 --out pictures/axis.png >/dev/null
    echo "Pictures: $here/pictures/{gauges,axis}.png"
fi
