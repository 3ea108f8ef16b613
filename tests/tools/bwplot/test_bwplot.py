#!/usr/bin/python3
"""Tests of bwplot: it writes small result files of each kind and draws them."""

import argparse
import concurrent.futures
import contextlib
import io
import os
import runpy
import shutil
import subprocess
import sys
import tempfile
import unittest

try:
    import matplotlib

    matplotlib.use("Agg")
    import matplotlib.image
    import matplotlib.pyplot
    import netCDF4
    import numpy as np
except ImportError as e:
    print(f"test_bwplot: skipped, {e.name} cannot be imported (python3-matplotlib, python3-netcdf4)")
    sys.exit(77)  # reported by ctest as skipped

BWPLOT = os.path.normpath(os.path.join(os.path.dirname(os.path.abspath(__file__)),
                                       "../../../tools/bwplot/bwplot"))
FILL = np.float32(-1e-30)


def write(path, title, nt, axes, items, units="seconds since 2026-01-01 12:00:00", first=0.0):
    """A result file; `items` holds (name, long name, dims, kind, values); its
    records lie 0.5 s apart from `first` seconds after the time axis's reference."""
    with netCDF4.Dataset(path, "w", format="NETCDF4") as ds:
        ds.setncatts({"title": title, "delete_value": FILL, "time_step": 0.5})
        ds.createDimension("time", None)
        t = ds.createVariable("time", "f8", ("time",))
        t.units = units
        t[:] = first + 0.5 * np.arange(nt)
        for name, n in axes.items():
            ds.createDimension(name, n)
            ds.createVariable(name, "f8", (name,))[:] = 10.0 + 2.0 * np.arange(n)
        for name, long_name, dims, kind, values in items:
            v = ds.createVariable(name, "f4", dims, fill_value=FILL)
            v.setncatts({"long_name": long_name, "units": "m", "item_kind": kind})
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


class BwplotTest(unittest.TestCase):
    """What needs a process of its own (the default name, the exit code, no traceback) runs
    bwplot as a command, side by side; the rest calls main(), saving matplotlib's start-up."""

    COMMANDS = {"basin.png": ["basin.xol2"], "dry.png": ["dry.xol2", "--out", "dry.png"],
                "section.png": ["section.xol1"], "gauges.png": ["gauges.xol0"],
                "Salinity": ["basin.xol2", "--item", "Salinity"]}

    @classmethod
    def setUpClass(cls):
        cls.dir = tempfile.mkdtemp()
        cls.addClassCleanup(shutil.rmtree, cls.dir)
        write_area(os.path.join(cls.dir, "basin.xol2"))
        write_area(os.path.join(cls.dir, "dry.xol2"), dry=True)
        line = (0.05 * np.cos(0.3 * np.arange(25) - np.arange(6)[:, None])).astype("f4")
        line[:, -3:] = FILL
        write(os.path.join(cls.dir, "section.xol1"), "Test section", 6, {"y": 25},
              [("Surface_elevation", "Surface elevation", ("time", "y"), "dynamic", line)])
        write(os.path.join(cls.dir, "gauges.xol0"), "Test gauges", 40, {},
              [(f"P_{j}_4_Surface_elevation", f"P({j},4): Surface elevation", ("time",), "dynamic",
                0.02 * np.sin(0.3 * np.arange(40) + j)) for j in (3, 12)])

        def run(args):
            return subprocess.run([sys.executable, BWPLOT, *args], cwd=cls.dir,
                                  capture_output=True, text=True, timeout=60)

        with concurrent.futures.ThreadPoolExecutor(max_workers=os.cpu_count() or 2) as pool:
            cls.results = dict(zip(cls.COMMANDS, pool.map(run, cls.COMMANDS.values())))
        cls.bw = runpy.run_path(BWPLOT)

    def grey_share(self, out):
        """Checks that `out` is a PNG of 8 x 5 in at 120 dpi and returns the
        share of it in the grey of masked points."""
        path = os.path.join(self.dir, out)
        with open(path, "rb") as f:
            self.assertEqual(f.read(8), b"\x89PNG\r\n\x1a\n")
        image = matplotlib.image.imread(path)
        self.assertEqual(image.shape[:2], (600, 960))
        return np.mean(np.all(np.abs(image[:, :, :3] - 0.75) < 0.02, axis=2))

    def call(self, *args):
        """Calls main() in the test folder; returns the exit code, stdout and stderr."""
        out, err = io.StringIO(), io.StringIO()
        with contextlib.redirect_stdout(out), contextlib.redirect_stderr(err), \
                contextlib.chdir(self.dir):
            code = self.bw["main"](list(args))
        return code, out.getvalue().strip(), err.getvalue()

    def test_commands(self):
        # The default picture is named after the file, in the current folder.
        grey = {}
        for name in ("basin.png", "dry.png", "section.png", "gauges.png"):
            r = self.results[name]
            self.assertEqual((r.returncode, r.stdout.strip()), (0, name), r.stderr)
            grey[name] = self.grey_share(name)
        # The land patch (a 25th of the map) is grey, a dry map is grey all
        # over; elsewhere only specks of antialiased text come near that grey.
        self.assertGreater(grey["basin.png"], 0.01)
        self.assertGreater(grey["dry.png"], 0.2)
        r = self.results["Salinity"]
        self.assertEqual((r.returncode, len(r.stderr.strip().splitlines())), (2, 1), r.stderr)
        self.assertIn("no item 'Salinity'", r.stderr)

    def test_options_and_refusals(self):
        code, out, err = self.call("basin.xol2", "--item", "Bathymetry", "--mark-line", "0,1,0,18",
                                   "--mark-points", "3,4;12,4", "--out", "bed.png")
        self.assertEqual(code, 0, err)
        # Land in the bed has the land value (1.0), not the fill: grey all the same.
        self.assertGreater(self.grey_share(out), 0.01)
        for args in (["section.xol1", "--steps", "0,2,5", "--out", "steps.png"],
                     ["gauges.xol0", "--item", "P(12,4): Surface elevation", "--out", "one.png"]):
            code, out, err = self.call(*args)
            self.assertEqual(code, 0, err)
            self.grey_share(out)
        for args, words in ((["basin.xol2", "--step", "5"], "step 5 out of range"),
                            (["basin.xol2", "--mark-points", "3,20"], "k = 20"),
                            (["missing.xol2"], "no such file: missing.xol2"),
                            (["gauges.xol0", "--step", "1"], "point-series")):
            with self.subTest(args):
                code, _, err = self.call(*args)
                self.assertEqual((code, len(err.strip().splitlines())), (2, 1), err)
                self.assertIn(words, err)
        # The bare delete value is masked even when netCDF4 has not masked it.
        m = self.bw["masked"](np.array([0.5, -1e-30, -2e-30, 0.0], dtype="f4"), -1e-30)
        self.assertEqual(list(np.ma.getmaskarray(m)), [False, True, False, False])

    def test_times_count_from_the_reference_time(self):
        # bw writes a line file's first record at the reference time of its axis (12:00:01
        # here), a map's and a series' one step after it: the labels are the times the file
        # holds, from the reference time, never from the first record.
        line = np.zeros((3, 4), dtype="f4")
        points = [("P_Surface_elevation", "P(1,1): Surface elevation", ("time",), "dynamic",
                   np.zeros(3, dtype="f4"))]
        write(os.path.join(self.dir, "late.xol1"), "Late line", 3, {"x": 4},
              [("Surface_elevation", "Surface elevation", ("time", "x"), "dynamic", line)],
              units="seconds since 2026-01-01 12:00:01")
        write(os.path.join(self.dir, "relative.xol1"), "Relative line", 3, {"x": 4},
              [("Surface_elevation", "Surface elevation", ("time", "x"), "dynamic", line)],
              units="s", first=1.0)
        write(os.path.join(self.dir, "late.xol0"), "Late gauges", 3, {}, points, first=1.0)
        write(os.path.join(self.dir, "relative.xol0"), "Relative gauges", 3, {}, points,
              units="s", first=1.0)
        args = argparse.Namespace(
            item=None, step=None, steps="0,2", mark_points=None, mark_line=None)
        for name, labels in (("late.xol1", ["2026-01-01 12:00:01", "2026-01-01 12:00:02"]),
                             ("relative.xol1", ["t = 1 s", "t = 2 s"])):
            with self.subTest(name), netCDF4.Dataset(os.path.join(self.dir, name)) as ds:
                fig, ax = matplotlib.pyplot.subplots()
                self.bw["draw_line"](ds, args, fig, ax)
                self.assertEqual([t.get_text() for t in ax.get_legend().get_texts()], labels)
                matplotlib.pyplot.close(fig)
        args.steps = None
        for name, label in (("late.xol0", "time (s since 2026-01-01 12:00:00)"),
                            ("relative.xol0", "time (s)")):
            with self.subTest(name), netCDF4.Dataset(os.path.join(self.dir, name)) as ds:
                fig, ax = matplotlib.pyplot.subplots()
                self.bw["draw_points"](ds, args, fig, ax)
                self.assertEqual(ax.get_xlabel(), label)
                self.assertEqual(list(ax.get_lines()[0].get_xdata()), [1.0, 1.5, 2.0])
                matplotlib.pyplot.close(fig)
        # A map's title: its last record, 2 s after the reference.
        with netCDF4.Dataset(os.path.join(self.dir, "basin.xol2")) as ds:
            fig, ax = matplotlib.pyplot.subplots()
            args.step, args.steps = -1, None
            self.assertEqual(self.bw["draw_area"](ds, args, fig, ax),
                             "Surface elevation, 2026-01-01 12:00:02")
            matplotlib.pyplot.close(fig)


if __name__ == "__main__":
    unittest.main()
