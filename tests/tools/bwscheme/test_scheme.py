#!/usr/bin/python3
"""The linear analysis of tools/bwscheme/scheme.py against the engine's own
time loop (bwbasin): the eigenvalue that carries a standing mode of a closed
basin, measured, is the one the analysis gives for that mode. A change of the
sweeps or of the analysis that parts them shows here."""

import os
import subprocess
import sys
import unittest

try:
    import numpy as np
except ImportError as e:
    print(f"test_scheme: skipped, {e.name} cannot be imported (python3-numpy)")
    sys.exit(77)  # reported by ctest as skipped

HERE = os.path.dirname(os.path.abspath(__file__))
sys.path.insert(0, os.path.normpath(os.path.join(HERE, "../../../tools/bwscheme")))
import scheme  # noqa: E402

BWBASIN = os.path.join(os.environ.get("BW_BINARY_DIR", ""), "tools", "bwscheme", "bwbasin")


def measured(*options):
    """|lambda| per step fitted by bwbasin."""
    out = subprocess.run([BWBASIN, "--header", *options], check=True, capture_output=True,
                         text=True).stdout.split("\n")
    row = dict(zip(out[0].split(), out[1].split()))
    return float(row["|lam|"])


class AnalysisAgainstEngine(unittest.TestCase):
    def test_modes_of_the_basin_follow_their_eigenvalue(self):
        # The grid-scale mode (39, 39) of a 40 x 40 basin, 0.45 m deep, dx
        # 0.05 m, dt 0.02 s, deep-water terms and factor 1: it grows 14 % a
        # step; with the grid-scale filter of 0.15 it decays. A long
        # diagonal wave on a grid of half the depth with factor 0.5 at a
        # Courant number of 1 loses a little every step.
        # The grid-scale mode (39, 39) of a 40 x 40 basin, 0.45 m deep, dx
        # 0.05 m, dt 0.02 s, deep-water terms and factor 1, grows 14 % a step;
        # the fit follows the largest of the mode's seven eigenvalues.
        a = 39 * np.pi / 40
        s = scheme.Scheme(0.45, 0.05, 0.05, 0.02, 1.0, True)
        predicted = np.abs(np.linalg.eigvals(scheme.amplification(s, a, a))).max()
        got = measured("--depth", "0.45", "--cells", "40,40", "--mode", "39,39", "--dt", "0.02",
                       "--steps", "80", "--amplitude", "1e-7")
        self.assertGreater(predicted, 1.1)
        self.assertAlmostEqual(got, predicted, delta=1e-4)
        # With the grid-scale filter of 0.15 the same basin is stable, and the
        # wave of mode (4, 4), 21 points a wavelength, loses what the
        # analysis of the filtered scheme says (three times the loss without it).
        a = 4 * np.pi / 40
        lam, _ = scheme.physical_mode(scheme.Scheme(0.45, 0.05, 0.05, 0.02, 1.0, True, filt=0.15),
                                      a, a)
        got = measured("--depth", "0.45", "--cells", "40,40", "--mode", "4,4", "--dt", "0.02",
                       "--periods", "20", "--amplitude", "1e-3", "--filter", "0.15")
        self.assertLess(abs(lam), 0.9998)
        self.assertAlmostEqual(got, abs(lam), delta=1e-6)
        # The wave itself: mode (4, 4) of the basin, about 14 points a wavelength.
        dx = 0.225
        s = scheme.Scheme(0.45, dx, dx, dx / np.sqrt(scheme.G * 0.45), 0.5, True)
        a = 4 * np.pi / 40
        lam, _ = scheme.physical_mode(s, a, a)
        got = measured("--depth", "0.45", "--dx", str(dx), "--cells", "40,40", "--mode", "4,4",
                       "--periods", "10", "--fe", "0.5", "--courant", "1", "--amplitude", "1e-3")
        self.assertLess(abs(lam), 0.9995)
        self.assertAlmostEqual(got, abs(lam), delta=1e-6)


if __name__ == "__main__":
    unittest.main()
