#!/usr/bin/python3
"""Writes the text inputs of the beach example: the bathymetry and the sponge
map as ASCII grids and the series of the generation line as CSV; bwdata
turns them into data files (see run.sh).

A basin 16 m long and 6 m wide, 0.4 m deep offshore. Waves of 1.5 s are born
on a line across the basin 3.5 m from its west end; the sponge layer behind
the line takes the waves that leave westwards. East of the line the bed is
flat to 6 m, then rises at 1:20 to the still water line at 14 m and above
it to 0.1 m at the east wall. A low mound on the slope, south of the middle,
makes the waves break earlier there and bends the breaker line."""
import math
import os
import sys

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), ".."))
from inputs import write_grid, write_line_series  # noqa: E402

DX = 0.05                # grid spacing, m
LENGTH, WIDTH = 16.0, 6.0
DEPTH = 0.4              # still water depth offshore, m
TOE = 6.0                # x of the toe of the slope, m
SLOPE = 1.0 / 20.0
TOP = 0.1                # highest bed, at the east wall, m
MOUND = (10.0, 2.0, 0.12, 1.0)  # x, y of its top, height, radius (m)
PERIOD = 1.5             # wave period, s
HEIGHT = 0.08            # wave height at the line, m
STEPS_A_PERIOD = 80      # the model's time step is PERIOD / 80 (Courant number 0.75 offshore)
PERIODS = 24             # the series covers both runs
RAMP = 3                 # periods of the cosine ramp at the start
SPONGE = 3.0             # m of sponge at the west end
SPONGE_END = 1.5         # its coefficient at the west wall
LAND = 1.0


def bed(x, y):
    b = -DEPTH if x <= TOE else min(-DEPTH + (x - TOE) * SLOPE, TOP)
    mx, my, height, radius = MOUND
    r2 = ((x - mx) ** 2 + (y - my) ** 2) / radius ** 2
    return min(b + height * math.exp(-r2), TOP)


def main():
    nx, ny = round(LENGTH / DX) + 1, round(WIDTH / DX) + 1
    wall = lambda j, k: j in (0, nx - 1) or k in (0, ny - 1)
    write_grid("bathymetry.asc",
               [[LAND if wall(j, k) else bed(j * DX, k * DX) for j in range(nx)] for k in range(ny)], DX)

    def sponge(j):
        s = SPONGE - j * DX
        return 1.0 if s <= 0.0 else 1.0 + (SPONGE_END - 1.0) * (s / SPONGE) ** 2
    write_grid("sponge.asc", [[sponge(j) for j in range(nx)] for k in range(ny)], DX)

    dt = PERIOD / STEPS_A_PERIOD
    k, c = write_line_series("waves.csv", PERIOD, HEIGHT, DEPTH, dt,
                             PERIODS * STEPS_A_PERIOD + 7, RAMP)
    print(f"{nx} x {ny} points, dt = {dt:.10f} s, wavelength {2 * math.pi / k:.3f} m, "
          f"celerity {c:.3f} m/s")


if __name__ == "__main__":
    main()
