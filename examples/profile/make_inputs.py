#!/usr/bin/python3
"""Writes the text inputs of the profile example: the bed, the sponge layer
and the filter coefficients along the flume as CSV profiles (x, value);
bwdata turns them into line files and makes the series of the generation
node (see run.sh).

A flume 19 m long, 0.4 m deep. Waves of 1.6 s are born at a node 4.8 m
from the wave maker's end; the sponge layer behind it takes the waves that
leave towards x = 0. In front of the node the bed is flat to 8 m, then rises
at 1:20 to the still water line at 16 m and on to 0.15 m above it at the
end, where the waves break and run up and down the beach. The grid indices
of the node and the gauges in profile.bw follow from DX and the positions
below."""

DX = 0.05                # grid spacing, m
LENGTH = 19.0            # m
DEPTH = 0.4              # still water depth on the flat bed, m
TOE = 8.0                # x of the toe of the slope, m
SLOPE = 1.0 / 20.0
SOURCE = 4.8             # x of the generation node, m
SPONGE = 4.5             # m of sponge from the wave maker's end
SPONGE_END = 1.5         # its coefficient at x = 0
FILTER_FROM = 12.0       # the explicit filter from here on (0.2 m deep), m
FILTER = 0.1             # its coefficient there
GAUGES = (6.0, 12.0, 14.0, 15.0)  # x of the gauges, m


def bed(x):
    return -DEPTH if x <= TOE else -DEPTH + (x - TOE) * SLOPE


def sponge(x):
    s = SPONGE - x
    return 1.0 if s <= 0.0 else 1.0 + (SPONGE_END - 1.0) * (s / SPONGE) ** 2


def write_profile(path, nx, value):
    with open(path, "w") as f:
        f.write("x,z\n")
        for j in range(nx):
            f.write(f"{j * DX:.4f},{value(j * DX):.6f}\n")


def main():
    nx = round(LENGTH / DX) + 1
    write_profile("bathymetry.csv", nx, bed)
    write_profile("sponge.csv", nx, sponge)
    # Rollers need the filter where they stand: without it the surf zone grows
    # a zigzag at the grid scale; offshore it would take height from the waves.
    write_profile("filter.csv", nx, lambda x: FILTER if x >= FILTER_FROM - 1e-9 else 0.0)
    index = lambda x: round(x / DX)
    # The generation record names a node, counted from 1: the point at x has
    # number x / DX + 1. Output points are grid indices, counted from 0.
    print(f"{nx} points, generation node {index(SOURCE) + 1}, gauges "
          + ", ".join(f"{index(x)} ({-bed(x):.2f} m deep)" for x in GAUGES))


if __name__ == "__main__":
    main()
