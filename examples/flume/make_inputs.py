#!/usr/bin/python3
"""Writes the text inputs of the flume example: the bathymetry and the sponge
map as ASCII grids and the boundary series as CSV; bwdata turns them into
data files (see run.sh).

The flume of the plane-slope breaking tests (0.36 m of water, a slope of
1:34.3 beginning 6 m from the wave maker), three water rows between walls.
The example shows the shoaling only: the flume ends at a wall where the
still water is 0.12 m deep, and a sponge layer over the last 3 m takes the
steepening waves out before they break (tools/bwlab/beach.py breaks them)."""
import math

DX = 0.025               # grid spacing, m (dx/h 0.07)
ROWS = 3                 # water rows between the walls
DEPTH = 0.36             # still water depth of the flat part, m
FLAT = 6.0               # m of flat bed before the toe of the slope
SLOPE = 1.0 / 34.3
END_DEPTH = 0.12         # still water depth at the wall, m
PERIOD = 3.33            # wave period, s
HEIGHT = 0.041           # wave height, m
STEPS_A_PERIOD = 128     # the model's time step is PERIOD / 128 (Courant number 1.96)
PERIODS = 100            # of the run
SPONGE = 3.0             # m of sponge layer before the wall
SPONGE_END = 1.5         # its coefficient at the wall
LAND = 1.0


def profile():
    """The bed along the flume, the wall last."""
    beds, j = [], 0
    while True:
        x = j * DX
        b = -DEPTH if x <= FLAT else -DEPTH + (x - FLAT) * SLOPE
        if b > -END_DEPTH + 1e-9:
            break
        beds.append(b)
        j += 1
    return beds + [LAND]


def write_grid(path, values, ny):
    nx = len(values[0])
    with open(path, "w") as f:
        f.write(f"ncols {nx}\nnrows {ny}\nxllcorner 0\nyllcorner 0\ncellsize {DX}\n"
                "NODATA_value -9999\n")
        for k in reversed(range(ny)):  # the first row of the file is the northernmost
            f.write(" ".join(f"{v:.6f}" for v in values[k]) + "\n")


def main():
    beds = profile()
    nx, ny = len(beds), ROWS + 2
    wall = nx - 2  # the last water point
    bathymetry = [[LAND if k in (0, ny - 1) else beds[j] for j in range(nx)] for k in range(ny)]
    write_grid("bathymetry.asc", bathymetry, ny)

    def sponge(j, k):
        s = (j - wall) * DX + SPONGE
        if s <= 0.0 or bathymetry[k][j] >= 0.5:
            return 1.0
        return 1.0 + (SPONGE_END - 1.0) * (s / SPONGE) ** 2
    write_grid("sponge.asc", [[sponge(j, k) for j in range(nx)] for k in range(ny)], ny)

    dt = PERIOD / STEPS_A_PERIOD
    omega = 2.0 * math.pi / PERIOD
    with open("waves.csv", "w") as f:
        f.write("time,Level\n")
        for n in range(PERIODS * STEPS_A_PERIOD + 8):
            f.write(f"{n * dt:.10f},{0.5 * HEIGHT * math.sin(omega * n * dt):.8f}\n")
    print(f"{nx} x {ny} points, the wall at j = {nx - 1}, dt = {dt:.10f} s")


if __name__ == "__main__":
    main()
