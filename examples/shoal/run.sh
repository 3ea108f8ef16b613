#!/usr/bin/env bash
# Makes the data files of the shoal example, runs it, and draws what it wrote.
#   ./run.sh [folder of the built programs]   (default: build/release of the project)
set -euo pipefail
. "$(dirname "$0")/../common.sh"

make_maps "Flume with a shoal" "Sponge layer"
# Regular waves of 4 cm and 1.5 s at the west boundary, 0.6 m deep: the surface
# elevation and its curvature across the boundary, which the deep-water terms
# of the model (Dispersion_Factor 1/15) take.
"$bwdata" waves -o waves.xol0 --drive level --depth 0.6 --height 0.04 --period 1.5 \
    --deep 0.0666667 --dt 0.05 --duration 45 --start "2026-01-01 12:00:00" \
    --title "Incoming wave" >/dev/null

echo "Running bw shoal.bw ..."
start=$(date +%s.%N)
run_bw shoal.bw
end=$(date +%s.%N)
printf "Done in %.1f s. The log is %s/shoal.log\n\n" "$(echo "$end - $start" | bc)" "$here"
grep -A6 "Run Statistics" shoal.log | sed -n 2,6p
echo
for f in surface.xol2 gauges.xol0 axis.xol1 waves.xol2; do
    "$bwdata" info "$f" | sed -n '1,3p;/Item name/,/^---/p'
done

if [ -x "$bwplot" ] && /usr/bin/python3 -c "import matplotlib, netCDF4" 2>/dev/null; then
    mkdir -p pictures
    "$bwplot" surface.xol2 --item Bathymetry --mark-line 0,1,0,99 \
        --mark-points "25,50;60,50;80,50;110,50" --out pictures/bathymetry.png >/dev/null
    "$bwplot" surface.xol2 --out pictures/surface.png >/dev/null
    "$bwplot" gauges.xol0 --out pictures/gauges.png >/dev/null
    "$bwplot" axis.xol1 --out pictures/axis.png >/dev/null
    "$bwplot" waves.xol2 --item "Significant wave height" --out pictures/height.png >/dev/null
    echo
    echo "Pictures: $here/pictures/{bathymetry,surface,gauges,axis,height}.png"
fi
cat <<TEXT

Look further:
  $bwdata info surface.xol2          what a result file holds
  ncdump -h surface.xol2             the NetCDF header (items, units, time axis)
  /usr/bin/python3 -c "import netCDF4; print(netCDF4.Dataset('gauges.xol0'))"   (or xarray.open_dataset)
  $bwplot surface.xol2 --step 40 --out map.png
TEXT
