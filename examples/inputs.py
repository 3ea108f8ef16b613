"""What the make_inputs.py of the examples share: ASCII grids for bwdata,
the wave number of the model's equations, and the series of a generation
line that sends out waves of a given height."""
import math

GRAVITY = 9.81


def write_grid(path, values, dx):
    """An ASCII grid of values[k][j], row k = 0 the southernmost."""
    ny, nx = len(values), len(values[0])
    with open(path, "w") as f:
        f.write(f"ncols {nx}\nnrows {ny}\nxllcorner 0\nyllcorner 0\ncellsize {dx}\n"
                "NODATA_value -9999\n")
        for k in reversed(range(ny)):  # the first row of the file is the northernmost
            f.write(" ".join(f"{v:g}" for v in values[k]) + "\n")


def wave_number(period, depth, b=0.0):
    """k of the linear dispersion relation of the model's equations,
    w^2 = g h k^2 (1 + B (kh)^2) / (1 + (B + 1/3) (kh)^2), by bisection;
    B is the Dispersion_Factor, 0 without the deep-water terms."""
    omega2 = (2.0 * math.pi / period) ** 2
    lo, hi = 1e-9, 1e3
    for _ in range(200):
        k = 0.5 * (lo + hi)
        kh2 = (k * depth) ** 2
        w2 = GRAVITY * depth * k * k * (1.0 + b * kh2) / (1.0 + (b + 1.0 / 3.0) * kh2)
        lo, hi = (k, hi) if w2 < omega2 else (lo, k)
    return 0.5 * (lo + hi)


def write_line_series(path, period, height, depth, dt, steps, ramp_periods):
    """The series of a generation line without the deep-water terms: the line
    feeds both of its rows with the value, so each of the two waves it sends
    out carries that flux, and c H/2 makes a wave of height H (c the
    celerity of the model's equations). It rises over ramp_periods by a
    cosine. Returns the wave number and the celerity."""
    k = wave_number(period, depth)
    omega = 2.0 * math.pi / period
    c = omega / k
    ramp = ramp_periods * period
    with open(path, "w") as f:
        f.write("time,Source\n")
        for n in range(steps + 1):
            t = n * dt
            rise = 0.5 * (1.0 - math.cos(math.pi * t / ramp)) if t < ramp else 1.0
            f.write(f"{t:.10f},{rise * c * 0.5 * height * math.sin(omega * t):.8f}\n")
    return k, c
