#!/usr/bin/python3
"""Writes the text inputs of the shoal example: the bathymetry and the sponge
map as ASCII grids. bwdata turns them into data files and makes the boundary
series from the wave height and period (see run.sh)."""
import math

DX = 0.2                 # grid spacing, m
NX, NY = 151, 101        # points along x and y (j = 0..150, k = 0..100)
DEPTH = 0.6              # still water depth away from the shoal, m
SPONGE_FROM = 24.0       # x where the sponge layer begins, m
LAND = 1.0               # bed level of land, above the still water


def bed(j, k):
    """A channel with walls north and south and a round shoal in the middle."""
    if k == 0 or k == NY - 1 or j == NX - 1:
        return LAND
    x, y = j * DX, k * DX
    r2 = (x - 12.0) ** 2 + (y - 10.0) ** 2
    return -DEPTH + 0.45 * math.exp(-r2 / (2.0 * 2.0 ** 2))


def sponge(j, k):
    """1 (no damping) up to the layer, then rising smoothly towards the east wall."""
    x = j * DX
    if x < SPONGE_FROM:
        return 1.0
    s = (x - SPONGE_FROM) / ((NX - 1) * DX - SPONGE_FROM)
    return 1.0 + 0.25 * s * s


def write_grid(path, value):
    with open(path, "w") as f:
        f.write(f"ncols {NX}\nnrows {NY}\nxllcorner 0\nyllcorner 0\ncellsize {DX}\n"
                f"NODATA_value -9999\n")
        for k in reversed(range(NY)):  # the first row of the file is the northernmost
            f.write(" ".join(f"{value(j, k):.5f}" for j in range(NX)) + "\n")


if __name__ == "__main__":
    write_grid("bathymetry.asc", bed)
    write_grid("sponge.asc", sponge)
