#!/usr/bin/python3
"""The Fourier analysis of scheme.py against the engine: a table of the
predicted and the measured amplification of waves in a closed flat basin.

Each wave case runs bwbasin on a standing wave (two progressive waves of the
same eigenvalue) and compares |lambda| per step, the amplitude error and the
phase error per period with those of the physical eigenvalue of the mode; the
noise cases compare the measured growth per step of the largest surface of a
basin at rest with the largest spectral radius over the modes the basin holds
and at (pi, pi).

The engine computes in 32 bits: the rows of its momentum systems carry terms
of (1 + 2 (B + 1/3) (h/dx)^2) / dt times the flux while a step changes the
flux by w dt of it, so a rounding of the coefficients moves the frequency by
that ratio in units of 2^-24, most at small steps and fine grids. Each wave
case is therefore also run at steps 0.1 % longer and shorter (see JITTER).

    compare.py [path to bwbasin]
"""

import os
import subprocess
import sys

import numpy as np

sys.path.insert(0, os.path.dirname(os.path.abspath(__file__)))
import scheme  # noqa: E402

ROOT = os.path.dirname(os.path.dirname(os.path.dirname(os.path.abspath(__file__))))
BWBASIN = os.path.join(ROOT, "build", "release", "tools", "bwscheme", "bwbasin")

# h = 0.45 m; dx = 0.05 m (dx/h 0.11, kh 2.8 at 20 points a wavelength) or
# dx = 0.225 m (dx/h 0.5, kh 0.63); 10 periods of a wave of 1 mm (32-bit
# rounding weighs less on a larger surface). The convective terms of the
# upwind sweeps damp a wave in proportion to its height, so those cases run
# at 1 and 2 mm and the measured errors are taken to a vanishing height,
# 2 e(1 mm) - e(2 mm).
WAVE = ["--depth", "0.45", "--ppw", "20", "--periods", "10"]
CASES = [  # label, Courant number, further options
    ("x    deep fe=1", 0.2, ["--mode", "1,0", "--fe", "1"]),
    ("diag deep fe=1", 0.2, ["--mode", "1,1", "--fe", "1"]),
    ("x    deep fe=0", 0.5, ["--mode", "1,0", "--fe", "0"]),
    ("x    deep fe=0.5", 0.5, ["--mode", "1,0", "--fe", "0.5"]),
    ("x    deep fe=1", 0.5, ["--mode", "1,0", "--fe", "1"]),
    ("diag deep fe=1", 0.84, ["--mode", "1,1", "--fe", "1"]),
    ("x    plain", 0.84, ["--mode", "1,0", "--deep", "0"]),
    ("diag plain", 0.5, ["--mode", "1,1", "--deep", "0"]),
    ("x    plain", 1.0, ["--mode", "1,0", "--deep", "0"]),
    ("x    deep fe=1   dx/h=.5", 0.5, ["--mode", "1,0", "--dx", "0.225"]),
    ("diag deep fe=0.5 dx/h=.5", 1.0, ["--mode", "1,1", "--dx", "0.225", "--fe", "0.5"]),
    ("diag plain       dx/h=.5", 1.0, ["--mode", "1,1", "--dx", "0.225", "--deep", "0"]),
    ("x    deep fe=1   upwind", 0.5, ["--mode", "1,0", "--family", "1"]),
    ("diag plain       upwind", 0.84, ["--mode", "1,1", "--deep", "0", "--family", "1"]),
    ("diag deep fe=1   dx/h=.5 upwind", 0.84, ["--mode", "1,1", "--dx", "0.225", "--family", "1"]),
]
# The step is also changed by one part in a thousand either way: the analysis
# moves smoothly with it, the rounding of the 32-bit coefficients does not, so
# the spread of measured less predicted over the three runs shows what
# rounding alone does to a case. A row is flagged when its difference stands
# out of that spread (three times it, and more than 2e-6 in amplitude and
# 0.002 degrees in phase).
JITTER = (1.0, 1.001, 0.999)

# The basin at rest, 40 x 40 points, h = 0.45 m, dx = 0.05 m, with the deep-water terms.
REST = ["--depth", "0.45", "--dx", "0.05", "--deep", "1", "--cells", "40,40"]
REST_CASES = [  # label, dt, steps, further options
    ("deep fe=1", 0.02, 400, ["--fe", "1"]),
    ("deep fe=1 upwind", 0.02, 400, ["--fe", "1", "--family", "1"]),
    ("deep fe=1", 0.003, 3000, ["--fe", "1"]),
    ("deep fe=0", 0.02, 400, ["--fe", "0"]),
]


def run(binary, args):
    out = subprocess.run([binary, "--header"] + args, capture_output=True, text=True, check=True)
    names, values = out.stdout.splitlines()[:2]
    return dict(zip(names.split(), values.split()))


def settings(r):
    return scheme.Scheme(float(r["depth"]), float(r["dx"]), float(r["dy"]), float(r["dt"]),
                         float(r["fe"]), r["deep"] == "1")


def modes(r):
    """The wave numbers (a, b) of the run's mode on the grid."""
    return int(r["mx"]) * np.pi / int(r["nx"]), int(r["my"]) * np.pi / int(r["ny"])


def num(text):
    try:
        return float(text)
    except ValueError:
        return float("nan")


def upwind(options):
    return "--family" in options and options[options.index("--family") + 1] == "1"


def wave_case(binary, courant, options):
    """Predicted and measured of the case at the three steps: the row of the
    run, |lambda| predicted, amplitude and phase error predicted, measured."""
    rows = []
    for f in JITTER:
        base = WAVE + options + ["--courant", repr(courant * f)]
        r = run(binary, base + ["--amplitude", "1e-3"])
        ml, ma, mp = num(r["|lam|"]), num(r["amp/T"]), num(r["phase/T"])
        if upwind(options):
            r2 = run(binary, base + ["--amplitude", "2e-3"])
            ml, ma, mp = (2.0 * ml - num(r2["|lam|"]), 2.0 * ma - num(r2["amp/T"]),
                          2.0 * mp - num(r2["phase/T"]))
        s = settings(r)
        a, b = modes(r)
        lam, _ = scheme.physical_mode(s, a, b)
        amp, phase = scheme.errors_per_period(s, a, b)
        rows.append((r, abs(lam), float(amp), float(phase), ml, ma, mp))
    return rows


def rest_case(binary, dt, steps, options):
    """The noise run, the run of the seeded mode (n-1, n-1) and the predictions."""
    r = run(binary, REST + options + ["--dt", repr(dt), "--steps", str(steps), "--noise", "1e-9"])
    s = settings(r)
    nx, ny = int(r["nx"]), int(r["ny"])
    a, b = np.meshgrid(np.arange(nx) * np.pi / nx, np.arange(ny) * np.pi / ny, indexing="ij")
    a, b = a.ravel()[1:], b.ravel()[1:]  # all but the mode (0, 0) of the volume
    a = np.where(a == 0.0, 1e-9, a)  # as scheme.py takes modes along one axis
    b = np.where(b == 0.0, 1e-9, b)
    basin = float(scheme.spectral_radius(s, a, b).max())
    corner = float(scheme.spectral_radius(s, np.pi, np.pi))
    m = f"{nx - 1},{ny - 1}"
    seeded = run(binary, REST + options + ["--dt", repr(dt), "--steps", str(min(steps, 1000)),
                                           "--mode", m, "--amplitude", "1e-7", "--skip", "30"])
    # The largest of the waves (the complex pairs) of the mode; the fit takes
    # the level that stays (the real eigenvalue 1) apart.
    lam = np.linalg.eigvals(scheme.amplification(s, (nx - 1) * np.pi / nx, (ny - 1) * np.pi / ny))
    last = float(np.abs(lam[np.abs(lam.imag) > 1e-9]).max())
    return r, basin, corner, last, num(seeded["|lam|"])


def main():
    binary = sys.argv[1] if len(sys.argv) > 1 else BWBASIN
    if not os.path.exists(binary):
        sys.exit(f"compare.py: no {binary}; build with make")
    print("Standing waves, h = 0.45 m, 20 points a wavelength: |lambda| per step; per period the")
    print("amplitude error (1 - |lambda|^(T/dt), negative = growth) and the phase error (degrees,")
    print("positive = slow); predicted (scheme.py), measured (bwbasin), and the spread of")
    print("measured less predicted over steps changed by 0.1 % (32-bit rounding).")
    head = (f"{'case':32s} {'C':>5s} {'kh':>5s} {'a':>6s} {'fit':>4s} {'|lam| pred':>11s} "
            f"{'|lam| meas':>11s} {'amp pred':>10s} {'amp meas':>10s} {'spread':>8s} "
            f"{'ph pred':>8s} {'ph meas':>8s} {'spread':>7s}")
    print(head)
    print("-" * len(head))
    for label, courant, options in CASES:
        rows = wave_case(binary, courant, options)
        r, lam, amp, phase, ml, ma, mp = rows[0]
        da = [m - p for (_, _, p, _, _, m, _) in rows]
        dp = [m - p for (_, _, _, p, _, _, m) in rows]
        sa, sp = max(da) - min(da), max(dp) - min(dp)
        flag = "" if abs(da[0]) <= max(3 * sa, 2e-6) and abs(dp[0]) <= max(3 * sp, 2e-3) else "DIFF"
        print(f"{label:32s} {courant:5.2f} {float(r['kh']):5.2f} {'a->0' if upwind(options) else '1e-3':>6s} {r['fit']:>4s} "
              f"{lam:11.8f} {ml:11.8f} {amp:10.3e} {ma:10.3e} {sa:8.1e} "
              f"{phase:8.4f} {mp:8.4f} {sp:7.4f}  {flag}")
    print()
    print("The basin at rest, 40 x 40 points, h = 0.45 m, dx = 0.05 m, deep-water terms. Predicted:")
    print("the largest spectral radius over the modes the basin holds (m pi/40, n pi/40) and at")
    print("(pi, pi), and the largest |lambda| of a wave of the mode (39 pi/40, 39 pi/40).")
    print("Measured: the growth per step of the largest surface from noise of 1e-9 m (many")
    print("modes near the largest grow together, which lowers the apparent rate by about 1/n")
    print("per step at step n), the step at which it passed 1e-3 h, and |lambda| of the")
    print("mode (39, 39) seeded alone.")
    head = (f"{'case':20s} {'dt':>6s} {'C':>5s} {'basin max':>10s} {'(pi,pi)':>9s} {'noise':>9s} "
            f"{'1e-3 h at':>10s} {'steps':>6s} {'(39,39) pred':>13s} {'meas':>10s}")
    print(head)
    print("-" * len(head))
    for label, dt, steps, options in REST_CASES:
        r, basin, corner, last, seeded = rest_case(binary, dt, steps, options)
        print(f"{label:20s} {dt:6.3f} {float(r['courant']):5.2f} {basin:10.5f} {corner:9.5f} "
              f"{num(r['growth']):9.5f} {r['n(1e-3h)']:>10s} {r['done']:>6s} {last:13.6f} {seeded:10.6f}")


if __name__ == "__main__":
    main()
