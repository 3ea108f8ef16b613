#!/usr/bin/env bash
# Makes the data files of the profile example (a 1DH flume), runs it, and
# draws what it wrote.
#   ./run.sh [folder of the built programs]   (default: build/release of the project)
set -euo pipefail
. "$(dirname "$0")/../common.sh"

# The bed, the sponge layer and the filter along the flume as line files.
/usr/bin/python3 make_inputs.py
"$bwdata" import-profile bathymetry.csv -o bathymetry.xol1 --title "Flume with a 1:20 beach" >/dev/null
"$bwdata" import-profile sponge.csv -o sponge.xol1 --title "Sponge layer" >/dev/null
"$bwdata" import-profile filter.csv -o filter.xol1 --title "Filter coefficients" >/dev/null
# Regular waves of 6 cm and 1.6 s from the generation node, 0.4 m deep,
# ramped up over three periods; the series reaches past the run's 64 s.
"$bwdata" waves -o waves.xol0 --drive source --depth 0.4 --height 0.06 --period 1.6 \
    --ramp 4.8 --dt 0.01 --duration 64.1 --start "2026-01-01 12:00:00" \
    --title "Source of the generation node" >/dev/null

echo "Running bw profile.bw ..."
start=$(date +%s.%N)
run_bw profile.bw
end=$(date +%s.%N)
printf "Done in %.1f s. The log is %s/profile.log\n\n" "$(echo "$end - $start" | bc)" "$here"
grep -A6 "Run Statistics" profile.log | sed -n 2,4p
echo
for f in surface.xol1 statistics.xol1 runup.xol0; do
    "$bwdata" info "$f" | sed -n '3p;/Item name/,/^---/p'
done

if /usr/bin/python3 -c "import netCDF4" 2>/dev/null; then
    echo
    /usr/bin/python3 - <<'PY'
import netCDF4
import numpy as np

def values(ds, name):
    v = np.ma.masked_invalid(np.ma.asarray(ds.variables[name][:], dtype=float))
    return np.ma.masked_where(np.abs(v.filled(0.0) + 1e-30) < 1e-36, v)  # no statistic there

with netCDF4.Dataset("statistics.xol1") as ds:
    x = np.asarray(ds.variables["x"][:])
    height = values(ds, "Max_Wave_Height")[-1]
    mean = values(ds, "Mean_Elevation")[-1]
peak = int(np.ma.argmax(height))
print(f"Wave height over the last 10 periods: {100 * height[np.searchsorted(x, 6.0)]:.1f} cm "
      f"on the flat bed (x = 6 m), {100 * height[peak]:.1f} cm at the most, at x = {x[peak]:.2f} m")
print(f"Mean level: {1000 * mean[np.searchsorted(x, 6.0)]:+.1f} mm at x = 6 m, "
      f"{1000 * mean.min():+.1f} mm at the lowest (x = {x[np.ma.argmin(mean)]:.2f} m), "
      f"{1000 * mean.max():+.1f} mm at the highest (x = {x[np.ma.argmax(mean)]:.2f} m)")
with netCDF4.Dataset("runup.xol0") as ds:
    t = np.asarray(ds.variables["time"][:])
    last = t >= t[-1] - 16.0
    reach = values(ds, "Horizontal_runup")[last]
    rise = values(ds, "Vertical_runup")[last]
print(f"Runup over the last 10 periods: the shoreline between x = {reach.min():.2f} and "
      f"{reach.max():.2f} m, {1000 * rise.min():+.0f} to {1000 * rise.max():+.0f} mm "
      f"above the still water level")
PY
fi

if [ -x "$bwplot" ] && /usr/bin/python3 -c "import matplotlib, netCDF4" 2>/dev/null; then
    mkdir -p pictures
    # The pictures side by side, each bwplot a process of its own: the
    # surface at four moments of one period late in the run, over the bed,
    # along the flume and in the surf zone; the surface and the rollers over
    # the last five periods; the gauges over the last three; heights and mean
    # level along the flume; the runup.
    pids=()
    draw() { "$bwplot" "$@" >/dev/null & pids+=($!); }
    draw surface.xol1 --times 60.8,61.2,61.6,62 --bed bathymetry.xol1 --out pictures/profiles.png
    draw surface.xol1 --times 60.8,61.2,61.6,62 --bed bathymetry.xol1 --x-range 12,17 \
        --out pictures/surf.png
    draw surface.xol1 --xt --time-range 56,64 --bed bathymetry.xol1 --out pictures/surface_xt.png
    draw surface.xol1 --xt --item "Roller thickness" --time-range 56,64 --x-range 13,17 \
        --out pictures/rollers_xt.png
    draw gauges.xol0 --time-range 59.2,64 --out pictures/gauges.png
    draw statistics.xol1 --item "Max. Wave Height" --item "Sign. Wave Height" \
        --item "Mean Elevation" --out pictures/heights.png
    draw runup.xol0 --out pictures/runup.png
    for pid in "${pids[@]}"; do wait "$pid"; done
    echo
    echo "Pictures: $here/pictures/{profiles,surf,surface_xt,rollers_xt,gauges,heights,runup}.png"
fi
cat <<TEXT

Look further:
  $bwdata info gauges.xol0            what a result file holds
  $bwplot surface.xol1 --times 30,30.4 --bed bathymetry.xol1 --out early.png
  $bwplot gauges.xol0 --item "U velocity" --out velocity.png
TEXT
