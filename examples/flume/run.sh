#!/usr/bin/env bash
# Makes the data files of the flume example, runs it, and shows what it wrote.
#   ./run.sh [folder of the built programs]   (default: build/release of the project)
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
root=$(cd "$here/../.." && pwd)
bin=${1:-$root/build/release}
bw=$bin/src/bw
bwdata=$bin/tools/bwdata/bwdata
bwplot=$root/tools/bwplot/bwplot
cd "$here"

/usr/bin/python3 make_inputs.py
"$bwdata" import-asc bathymetry.asc -o bathymetry.xol2 --title "Flume with a plane slope" >/dev/null
"$bwdata" import-asc sponge.asc -o sponge.xol2 --name "Sponge" --type 999 --unit 1000 \
    --title "Sponge layer before the wall" >/dev/null
"$bwdata" import-csv waves.csv -o waves.xol0 --start "2026-01-01 12:00:00" \
    --types 100078 --units 1000 --title "Incoming wave" >/dev/null

echo "Running bw flume.bw (100 periods) ..."
status=0
"$bw" flume.bw >run.out 2>&1 || status=$?
if [ "$status" -ne 0 ]; then
    echo "bw ended with exit code $status:"
    tail -20 run.out
    exit "$status"
fi
sed -n '/Scheme Stability/,/^=====/p' flume.log
grep -A6 "Run Statistics" flume.log | sed -n 2,6p

if [ -x "$bwplot" ] && /usr/bin/python3 -c "import matplotlib, netCDF4" 2>/dev/null; then
    mkdir -p pictures
    "$bwplot" gauges.xol0 --out pictures/gauges.png >/dev/null
    "$bwplot" axis.xol1 --out pictures/axis.png >/dev/null
    echo "Pictures: $here/pictures/{gauges,axis}.png"
fi
