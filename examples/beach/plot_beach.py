#!/usr/bin/python3
"""Draws the wave height, the mean level and a snapshot of the surface and
the rollers along the two rows that beach_continued.bw wrote (middle.xol1,
mound.xol1), over the bed of bathymetry.asc, into pictures/profiles.png, and
prints where the waves break.

The wave height at a point is the highest less the lowest surface over the
last 4 periods, the surface taken at the bed while the point is dry; the
mean level is drawn where the point stays wet, and the highest point the
water reaches (the run-up) is marked."""
import sys

import matplotlib
matplotlib.use("Agg")
import matplotlib.pyplot as plt
import netCDF4
import numpy as np


def read_grid(path):
    with open(path) as f:
        head = [next(f).split() for _ in range(6)]
        rows = np.array([[float(v) for v in line.split()] for line in f])
    return rows[::-1], float(head[4][1])  # row k = 0 first, and the spacing


def row(path, bed):
    with netCDF4.Dataset(path) as d:
        x = d["x"][:]
        # Dry points are written as missing values.
        s = np.ma.filled(d["Surface_elevation"][:], np.nan)
        roller = np.ma.filled(d["Roller_thickness"][:], 0.0)
    wet = s > bed[None, :]
    always = wet.all(axis=0) & (bed < 0.5)
    s = np.where(wet, s, bed[None, :])
    height = s.max(axis=0) - s.min(axis=0)
    mean = np.where(always, s.mean(axis=0), np.nan)
    reached = np.nonzero(wet.any(axis=0) & (bed < 0.5))[0]
    runup = reached[-1] if len(reached) else 0
    return x, height, mean, s[-1], roller[-1], runup


def main():
    bed, dx = read_grid("bathymetry.asc")
    fig, axes = plt.subplots(3, 1, figsize=(9, 8), sharex=True)
    for path, k, colour in (("middle.xol1", 60, "tab:blue"), ("mound.xol1", 40, "tab:red")):
        x, height, mean, last, roller, runup = row(path, bed[k])
        water = bed[k] < 0.5
        label = f"y = {k * dx:g} m"
        axes[0].plot(x[water], height[water], color=colour, label=label)
        axes[1].plot(x[water], 1000.0 * mean[water], color=colour, label=label)
        axes[2].plot(x, bed[k], color=colour, lw=0.8, ls=":")
        axes[2].plot(x[water], last[water], color=colour, label=f"surface, {label}")
        axes[2].fill_between(x[water], last[water], last[water] - roller[water], color=colour,
                             alpha=0.35, lw=0, label=f"roller, {label}")
        axes[2].plot([x[runup]], [bed[k][runup]], marker="^", color=colour, ls="none",
                     label=f"run-up, {label}")
        peak = int(np.argmax(np.where(x > 6.0, height, 0.0)))
        shore = int(np.nonzero(~np.isnan(mean))[0][-1])
        print(f"{label}: the highest wave {height[peak]:.3f} m at x = {x[peak]:.2f} m "
              f"(still depth {-bed[k][peak]:.3f} m); mean level {1000.0 * mean[shore]:.1f} mm "
              f"at x = {x[shore]:.2f} m, the last point always wet; run-up to "
              f"{1000.0 * bed[k][runup]:.0f} mm at x = {x[runup]:.2f} m")
    axes[0].set_ylabel("wave height (m)")
    axes[1].set_ylabel("mean level (mm)")
    axes[2].set_ylabel("level (m)")
    axes[2].set_xlabel("x (m)")
    axes[2].set_ylim(-0.45, 0.2)
    for a in axes:
        a.grid(alpha=0.3)
        a.legend(fontsize=8, loc="upper left")
    axes[0].set_title("Waves breaking on the beach: height, mean level, surface and rollers")
    fig.tight_layout()
    out = sys.argv[1] if len(sys.argv) > 1 else "pictures/profiles.png"
    fig.savefig(out, dpi=110)


if __name__ == "__main__":
    main()
