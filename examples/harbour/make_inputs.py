#!/usr/bin/python3
"""Writes the text inputs of the harbour example: the bathymetry, the sponge
map and the area codes as ASCII grids and the series of the generation line
as CSV; bwdata turns them into data files (see run.sh).

A basin 20 m wide (x) and 14 m long (y), 0.4 m deep. Regular waves of 1.2 s
are born on a line across it at y = 2.5 m and run north; a sponge layer
south of the line takes the waves that leave southwards, those reflected by
the breakwater among them. The breakwater runs along x at y = 7 m with a
mouth 2.4 m wide (1.3 wavelengths) at x = 12 m. Behind it lies the
harbour, with a jetty 4 m long from its north quay at x = 6 m that shelters
an inner basin. Its west, north and east sides are rubble slopes, drawn as
sponge layers 1.5 m wide; the breakwater and the jetty are vertical walls.

Area codes (Type_of_Area_Statistic): 1 the sea in front of the breakwater,
2 the harbour east of x = 10 m (behind the mouth), 3 the harbour west of it,
4 the inner basin west of the jetty; 0 in the sponges, on the slopes and
around the line."""
import math
import os
import sys

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), ".."))
from inputs import write_grid, write_line_series  # noqa: E402

DX = 0.1                 # grid spacing, m
LENGTH_X, LENGTH_Y = 20.0, 14.0
DEPTH = 0.4              # still water depth, m
PERIOD = 1.2             # wave period, s
HEIGHT = 0.04            # height of the generated wave, m
STEPS_A_PERIOD = 40      # the model's time step is PERIOD / 40
PERIODS = 40             # length of the run
RAMP = 3                 # periods of the cosine ramp at the start
LINE_Y = 2.5             # the generation line
SPONGE = 2.0             # m of sponge at the south end
SPONGE_END = 1.5         # its coefficient at the south wall
SHORE = 1.5              # m of sponge along the harbour's west, north and east sides
BREAKWATER_Y = 7.0       # its south face; it is two cells thick
MOUTH = (12.0, 14.4)     # x from .. to of the mouth
JETTY_X, JETTY_Y = 6.0, 10.0  # the jetty runs from the quay south to JETTY_Y
LAND = 1.0


def main():
    nx, ny = round(LENGTH_X / DX) + 1, round(LENGTH_Y / DX) + 1
    kb = round(BREAKWATER_Y / DX)
    j_mouth = (round(MOUTH[0] / DX), round(MOUTH[1] / DX) - 1)
    j_jetty, k_jetty = round(JETTY_X / DX), round(JETTY_Y / DX)

    def land(j, k):
        if j in (0, nx - 1) or k in (0, ny - 1):
            return True
        if k in (kb, kb + 1) and not j_mouth[0] <= j <= j_mouth[1]:
            return True
        return j in (j_jetty, j_jetty + 1) and k >= k_jetty

    def code(j, k):
        x, y = j * DX, k * DX
        if y <= LINE_Y + 0.5:
            return 0
        if k < kb:
            return 1
        if min(x, LENGTH_X - x, LENGTH_Y - y) < SHORE:  # the slopes
            return 0
        if x >= 10.0:
            return 2
        return 4 if (j < j_jetty and k >= k_jetty) else 3

    write_grid("bathymetry.asc",
               [[LAND if land(j, k) else -DEPTH for j in range(nx)] for k in range(ny)], DX)
    write_grid("codes.asc", [[code(j, k) for j in range(nx)] for k in range(ny)], DX)

    # Sponges rise with the square of the distance into them: at the south
    # end, and in the harbour along its sides, which stand for rubble slopes
    # that take most of the waves' energy.
    def sponge(j, k):
        x, y = j * DX, k * DX
        s = SPONGE - y
        if k > kb + 1:
            s = max(s, SHORE - x, SHORE - (LENGTH_X - x), SHORE - (LENGTH_Y - y)) * SPONGE / SHORE
        return 1.0 if s <= 0.0 else 1.0 + (SPONGE_END - 1.0) * (s / SPONGE) ** 2
    write_grid("sponge.asc", [[round(sponge(j, k), 6) for j in range(nx)] for k in range(ny)], DX)

    dt = PERIOD / STEPS_A_PERIOD
    k, c = write_line_series("waves.csv", PERIOD, HEIGHT, DEPTH, dt,
                             PERIODS * STEPS_A_PERIOD + 7, RAMP)
    print(f"{nx} x {ny} points, dt = {dt:g} s, wavelength {2 * math.pi / k:.3f} m, "
          f"celerity {c:.3f} m/s, Hm0 of the incoming wave {math.sqrt(2.0) * HEIGHT:.4f} m")


if __name__ == "__main__":
    main()
