#!/usr/bin/env bash
# Makes the data files of the beach example, runs it in two parts (the
# second hot-started from the first), and shows what it wrote.
#   ./run.sh [folder of the built programs]   (default: build/release of the project)
set -euo pipefail
. "$(dirname "$0")/../common.sh"

make_maps "Beach with a mound" "Sponge layer behind the generation line"
"$bwdata" import-csv waves.csv -o waves.xol0 --start "2026-01-01 12:00:00" \
    --types 999 --units 4700 --title "Source of the generation line" >/dev/null

run() {
    echo "Running bw $1 ..."
    run_bw "$1"
    grep -A6 "Run Statistics" "${1%.bw}.log" | sed -n 2,6p
}
run beach.bw
run beach_continued.bw

if [ -x "$bwplot" ] && /usr/bin/python3 -c "import matplotlib, netCDF4" 2>/dev/null; then
    mkdir -p pictures
    "$bwplot" surface.xol2 --mark-line 70,1,70,119 --out pictures/surface.png >/dev/null
    "$bwplot" surface.xol2 --item "Roller thickness" --out pictures/rollers.png >/dev/null
    /usr/bin/python3 plot_beach.py pictures/profiles.png | head -2
    echo "Pictures: $here/pictures/{surface,rollers,profiles}.png"
fi
