#!/usr/bin/python3
"""Writes the text inputs of the shoal example: the bathymetry as an ASCII
grid, the sponge map as an ASCII grid, and the boundary series as CSV.
bwdata turns them into data files (see run.sh)."""
import math

DX = 0.2                 # grid spacing, m
NX, NY = 151, 101        # points along x and y (j = 0..150, k = 0..100)
DEPTH = 0.6              # still water depth away from the shoal, m
PERIOD = 1.5             # wave period, s
AMPLITUDE = 0.02         # of the incoming wave, m
DT = 0.05                # the model's time step, s
DURATION = 45.0          # s of boundary data (the run is 40 s)
B = 1.0 / 15.0           # dispersion factor of the model
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


def wave_number(omega, d):
    """k of the model's dispersion relation, by bisection."""
    lo, hi = 1e-6, 100.0
    for _ in range(200):
        k = 0.5 * (lo + hi)
        kd = k * d
        w2 = 9.81 * d * k * k * (1 + B * kd * kd) / (1 + (B + 1 / 3) * kd * kd)
        lo, hi = (k, hi) if w2 < omega * omega else (lo, k)
    return 0.5 * (lo + hi)


def write_series(path):
    omega = 2 * math.pi / PERIOD
    k = wave_number(omega, DEPTH)
    with open(path, "w") as f:
        f.write("time,Level,Curvature\n")
        steps = int(round(DURATION / DT))
        for n in range(steps + 1):
            t = n * DT
            level = AMPLITUDE * math.sin(omega * t)
            # The deep-water terms want the curvature of the surface across the boundary.
            f.write(f"{t:.2f},{level:.6f},{-k * k * level:.6f}\n")


if __name__ == "__main__":
    write_grid("bathymetry.asc", bed)
    write_grid("sponge.asc", sponge)
    write_series("waves.csv")
