#!/usr/bin/python3
"""Tests of bwplot: it writes small result files of each kind and draws them."""

import concurrent.futures
import contextlib
import importlib.machinery
import importlib.util
import io
import os
import subprocess
import sys
import tempfile
import unittest

try:
    import matplotlib

    matplotlib.use("Agg")
    import matplotlib.image
    import netCDF4
    import numpy as np
except ImportError as e:
    print(f"test_bwplot: skipped, {e.name} cannot be imported (python3-matplotlib, python3-netcdf4)")
    sys.exit(0)

BWPLOT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "bwplot")
FILL = np.float32(-1e-30)
LAND_GREY = 0.75


def load_bwplot():
    loader = importlib.machinery.SourceFileLoader("bwplot", BWPLOT)
    module = importlib.util.module_from_spec(importlib.util.spec_from_loader("bwplot", loader))
    loader.exec_module(module)
    return module


def write(path, title, nt, axes, items):
    """A result file: `axes` maps x/y to their sizes, `items` holds
    (name, long name, dims, kind, values)."""
    with netCDF4.Dataset(path, "w", format="NETCDF4") as ds:
        ds.setncatts({"Conventions": "CF-1.8", "title": title, "delete_value": FILL,
                      "time_step": 0.5, "time_start": "2026-01-01 12:00:00", "projection": "NON-UTM"})
        ds.createDimension("time", None)
        t = ds.createVariable("time", "f8", ("time",))
        t.setncatts({"units": "seconds since 2026-01-01 12:00:00", "calendar": "proleptic_gregorian"})
        t[:] = 0.5 * np.arange(nt)
        for name, n in axes.items():
            ds.createDimension(name, n)
            c = ds.createVariable(name, "f8", (name,))
            c.units = "m"
            c[:] = 10.0 + 2.0 * np.arange(n)
        for number, (name, long_name, dims, kind, values) in enumerate(items, start=1):
            v = ds.createVariable(name, "f4", dims, fill_value=FILL)
            v.setncatts({"long_name": long_name, "units": "m", "item_kind": kind,
                         "item_number": number if kind == "dynamic" else -1})
            v[:] = values


def write_area(path, dry=False, nt=5, nx=30, ny=20):
    """A basin with a land patch in one corner: the fill in the surface, 1.0 in the bed."""
    wave = 0.1 * np.sin(0.4 * np.arange(nx) + np.arange(nt)[:, None])
    surface = np.repeat(wave[:, None, :], ny, axis=1).astype("f4")
    surface[:, :5, :5] = FILL
    if dry:
        surface[:] = FILL
    bed = np.repeat(-np.linspace(0.2, 1.0, nx, dtype="f4")[None, :], ny, axis=0)
    bed[:5, :5] = 1.0
    write(path, "Test basin", nt, {"x": nx, "y": ny},
          [("Surface_elevation", "Surface elevation", ("time", "y", "x"), "dynamic", surface),
           ("Bathymetry", "Bathymetry", ("y", "x"), "static", bed)])


def write_line(path, nt=6, ny=25):
    values = (0.05 * np.cos(0.3 * np.arange(ny) - np.arange(nt)[:, None])).astype("f4")
    values[:, -3:] = FILL
    write(path, "Test section", nt, {"y": ny},
          [("Surface_elevation", "Surface elevation", ("time", "y"), "dynamic", values)])


def write_points(path, nt=40):
    write(path, "Test gauges", nt, {},
          [(f"P_{j}_4_Surface_elevation", f"P({j},4): Surface elevation", ("time",), "dynamic",
            0.02 * np.sin(0.3 * np.arange(nt) + j)) for j in (3, 12)])


class BwplotTest(unittest.TestCase):
    """The cases that need a process of their own (the picture's default name,
    the exit code, no traceback) run bwplot as a command, side by side; the
    others call its main() here, which saves the start-up of matplotlib."""

    COMMANDS = {
        "area": ["basin.xol2"],
        "dry": ["dry.xol2", "--out", "dry.png"],
        "line": ["section.xol1"],
        "points": ["gauges.xol0"],
        "unknown item": ["basin.xol2", "--item", "Salinity"],
    }

    @classmethod
    def setUpClass(cls):
        cls.tmp = tempfile.TemporaryDirectory()
        cls.dir = cls.tmp.name
        write_area(os.path.join(cls.dir, "basin.xol2"))
        write_area(os.path.join(cls.dir, "dry.xol2"), dry=True)
        write_line(os.path.join(cls.dir, "section.xol1"))
        write_points(os.path.join(cls.dir, "gauges.xol0"))

        def run(args):
            return subprocess.run([sys.executable, BWPLOT, *args], cwd=cls.dir,
                                  capture_output=True, text=True, timeout=60)

        with concurrent.futures.ThreadPoolExecutor(max_workers=os.cpu_count() or 2) as pool:
            cls.results = dict(zip(cls.COMMANDS, pool.map(run, cls.COMMANDS.values())))
        cls.bw = load_bwplot()

    @classmethod
    def tearDownClass(cls):
        cls.tmp.cleanup()

    def picture(self, out):
        """Checks that `out` is a PNG of 8 x 5 in at 120 dpi and returns its pixels."""
        path = os.path.join(self.dir, out)
        with open(path, "rb") as f:
            self.assertEqual(f.read(8), b"\x89PNG\r\n\x1a\n")
        image = matplotlib.image.imread(path)
        self.assertEqual(image.shape[:2], (600, 960))
        return image

    def call(self, *args):
        """Calls main() on a file (and --out) in the test folder; returns the
        exit code, stdout and stderr."""
        args = [os.path.join(self.dir, a) if a.endswith((".xol0", ".xol1", ".xol2", ".png")) else a
                for a in args]
        out, err = io.StringIO(), io.StringIO()
        with contextlib.redirect_stdout(out), contextlib.redirect_stderr(err):
            code = self.bw.main(args)
        return code, out.getvalue().strip(), err.getvalue()

    def grey_share(self, image):
        """The share of the picture in the grey of masked points."""
        return np.mean(np.all(np.abs(image[:, :, :3] - LAND_GREY) < 0.02, axis=2))

    def test_commands_draw_each_kind(self):
        # The default picture is named after the file, in the current folder.
        for key, name in (("area", "basin.png"), ("line", "section.png"), ("points", "gauges.png")):
            with self.subTest(key):
                r = self.results[key]
                self.assertEqual((r.returncode, r.stdout.strip()), (0, name), r.stderr)
                self.picture(name)
        # The land patch (a 25th of the map) is grey; without it only specks
        # of antialiased text come near that grey.
        self.assertGreater(self.grey_share(self.picture("basin.png")), 0.01)

    def test_all_masked_surface_still_draws(self):
        self.assertEqual(self.results["dry"].returncode, 0, self.results["dry"].stderr)
        # The whole map is grey: a large part of the picture, not a thin frame.
        self.assertGreater(self.grey_share(self.picture("dry.png")), 0.2)

    def test_unknown_item_command_fails_cleanly(self):
        r = self.results["unknown item"]
        self.assertEqual(r.returncode, 2)
        self.assertNotIn("Traceback", r.stderr)
        self.assertEqual(len(r.stderr.strip().splitlines()), 1, r.stderr)
        self.assertIn("Salinity", r.stderr)

    def test_options(self):
        code, out, err = self.call("basin.xol2", "--item", "Bathymetry", "--mark-line", "0,1,0,18",
                                   "--mark-points", "3,4;12,4", "--out", "bed.png")
        self.assertEqual(code, 0, err)
        # Land in the bed has the land value (1.0), not the fill: grey all the same.
        self.assertGreater(self.grey_share(self.picture(out)), 0.01)
        for args in (["section.xol1", "--steps", "0,2,5", "--out", "steps.png"],
                     ["gauges.xol0", "--item", "P(12,4): Surface elevation", "--out", "one.png"]):
            with self.subTest(args[0]):
                code, out, err = self.call(*args)
                self.assertEqual(code, 0, err)
                self.picture(out)

    def test_refusals(self):
        for args, words in ((["basin.xol2", "--step", "5"], "step 5 out of range"),
                            (["basin.xol2", "--step", "-6"], "step -6 out of range"),
                            (["section.xol1", "--steps", "0,9"], "step 9 out of range"),
                            (["basin.xol2", "--mark-points", "3,20"], "k = 20"),
                            (["missing.xol2"], "missing.xol2"),
                            (["gauges.xol0", "--step", "1"], "point-series")):
            with self.subTest(args):
                code, _, err = self.call(*args)
                self.assertEqual(code, 2)
                self.assertEqual(len(err.strip().splitlines()), 1, err)
                self.assertIn(words, err)

    def test_helpers(self):
        self.assertEqual(self.bw.spread_steps(10), [0, 3, 6, 9])
        self.assertEqual(self.bw.spread_steps(2), [0, 1])
        self.assertEqual(self.bw.check_step(-1, 5), 4)
        # The bare delete value is masked even when netCDF4 has not masked it.
        m = self.bw.masked(np.array([0.5, -1e-30, -2e-30, 0.0], dtype="f4"), -1e-30)
        self.assertEqual(list(np.ma.getmaskarray(m)), [False, True, False, False])


if __name__ == "__main__":
    unittest.main()
