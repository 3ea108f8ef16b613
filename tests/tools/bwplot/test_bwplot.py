#!/usr/bin/python3
"""Tests of bwplot: it writes small result files of each kind and draws them."""

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


def write(path, title, nt, axes, items, units="seconds since 2026-01-01 12:00:00", first=0.0,
          step=0.5, delete=FILL):
    """A result file; `items` holds (name, long name, dims, kind, values[, attributes]);
    its records lie `step` s apart from `first` seconds after the time axis's reference,
    the places of an axis 2 m apart from 10 m."""
    with netCDF4.Dataset(path, "w", format="NETCDF4") as ds:
        ds.setncatts({"title": title, "delete_value": delete, "time_step": step})
        ds.createDimension("time", None)
        t = ds.createVariable("time", "f8", ("time",))
        t.units = units
        t[:] = first + step * np.arange(nt)
        for name, n in axes.items():
            ds.createDimension(name, n)
            ds.createVariable(name, "f8", (name,))[:] = 10.0 + 2.0 * np.arange(n)
        for name, long_name, dims, kind, values, *more in items:
            v = ds.createVariable(name, "f4", dims, fill_value=delete)
            v.setncatts({"long_name": long_name, "units": "m", "item_kind": kind, **(more or [{}])[0]})
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
                0.02 * np.sin(0.3 * np.arange(40) + j), {"position": [10.0 + 2 * j, 18.0]})
               for j in (3, 12)])

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
        # The gauges of a grid, named by their grid points, share a panel of their quantity.
        with netCDF4.Dataset(os.path.join(self.dir, "gauges.xol0")) as ds:
            fig, ax = matplotlib.pyplot.subplots()
            self.bw["draw_points"](ds, self.bw["parser"]().parse_args(["-"]), fig, ax)
            self.assertEqual([t.get_text() for t in ax.get_legend().get_texts()], ["P(3,4)", "P(12,4)"])
            self.assertEqual(ax.get_ylabel(), "Surface elevation (m)")
            matplotlib.pyplot.close(fig)
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
        args = self.bw["parser"]().parse_args(["-", "--steps", "0,2"])
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


class ProfileTest(unittest.TestCase):
    """The files of a profile (1DH) run: the surface along a flume whose
    beach runs dry, gauges whose series share a name and differ by their
    position, the runup, and a line of statistics."""

    NX, NT = 20, 8                    # places at x = 10, 12, ..., 48; records 0.4 s apart
    X = 10.0 + 2.0 * np.arange(NX)
    BED = -1.0 + np.maximum(X - 30.0, 0.0) / 9.0  # the still water line at x = 39
    WET = BED < 0.0

    @classmethod
    def setUpClass(cls):
        cls.dir = tempfile.mkdtemp()
        cls.addClassCleanup(shutil.rmtree, cls.dir)
        path = lambda name: os.path.join(cls.dir, name)
        # Dry places carry the water of the slot, under the bed.
        eta = 0.1 * np.sin(0.5 * cls.X[None, :] - np.arange(cls.NT)[:, None])
        eta = np.where(cls.WET, eta, cls.BED - 0.3).astype("f4")
        write(path("flume.xol1"), "Flume", cls.NT, {"x": cls.NX},
              [("Surf_elevation", "Surf. elevation", ("time", "x"), "dynamic", eta),
               ("Roller_thickness", "Roller thickness", ("time", "x"), "dynamic",
                np.abs(eta) * cls.WET)], first=60.0, step=0.4)
        write(path("bed.xol1"), "Bed", 1, {"x": cls.NX},
              [("Bathymetry", "Bathymetry", ("time", "x"), "dynamic", cls.BED[None, :])], units="s")
        series = lambda j: 0.02 * np.sin(0.3 * np.arange(40) + j)
        write(path("gauges.xol0"), "Gauges", 40,  {},
              [(f"{name}{suffix}", long_name, ("time",), "dynamic", series(j), {"position": x})
               for name, long_name in (("Surf_elevation", "Surf. elevation"),
                                       ("U_velocity", "U velocity"))
               for j, (suffix, x) in enumerate((("", 12.0), ("_1", 20.0)))])
        write(path("runup.xol0"), "Runup", 40, {},
              [(n.replace(" ", "_"), n, ("time",), "dynamic", series(j))
               for j, n in enumerate(("Horizontal runup", "Vertical runup", "Total runup"))])
        # One record; the statistics of places that were dry hold -1e-30 in a
        # file of the delete value 1e-35.
        stat = lambda v: np.where(cls.WET, v, -1e-30)[None, :].astype("f4")
        write(path("stat.xol1"), "Statistics", 1, {"x": cls.NX},
              [("Max_Wave_Height", "Max. Wave Height", ("time", "x"), "dynamic", stat(0.2)),
               ("Mean_Elevation", "Mean Elevation", ("time", "x"), "dynamic", stat(0.01))],
              units="seconds since 2026-01-01 12:01:04", delete=np.float32(1e-35))
        cls.bw = runpy.run_path(BWPLOT)

    def draw(self, *argv):
        """Draws a file as bwplot would, in the test folder; returns the figure,
        its panels (colour bars left out) and the head of the title."""
        args = self.bw["parser"]().parse_args(list(argv))
        fig, ax = matplotlib.pyplot.subplots()
        self.addCleanup(matplotlib.pyplot.close, fig)
        draw = self.bw["draw_line"] if args.file.endswith(".xol1") else self.bw["draw_points"]
        with contextlib.chdir(self.dir), netCDF4.Dataset(args.file) as ds:
            head = draw(ds, args, fig, ax)
        panels = [a for a in fig.axes if a.get_label() != "<colorbar>"]
        return fig, panels, head

    def refused(self, *argv):
        err = io.StringIO()
        with contextlib.redirect_stderr(err), contextlib.chdir(self.dir):
            self.assertEqual(self.bw["main"](list(argv)), 2, argv)
        return err.getvalue()

    def test_profiles_over_the_bed(self):
        _, (ax,), head = self.draw("flume.xol1", "--times", "60.8,61.3", "--bed", "bed.xol1")
        self.assertEqual(head, "Surf. elevation")
        # The nearest records, labelled with their tenths of a second.
        self.assertEqual([t.get_text() for t in ax.get_legend().get_texts()],
                         ["2026-01-01 12:01:00.8", "2026-01-01 12:01:01.2"])
        for line in ax.get_lines()[:2]:
            wet = ~np.ma.getmaskarray(line.get_ydata())
            np.testing.assert_array_equal(wet, self.WET)  # the slot's water is not drawn
        # The bed is filled in, but the waves keep the picture: the flat bed at
        # -1 m lies below its lower edge.
        self.assertEqual(len(ax.collections), 1)
        self.assertGreater(ax.get_ylim()[0], -0.5)
        # A part of the line; two items, one panel each, one above the other.
        _, (ax,), _ = self.draw("flume.xol1", "--step", "0", "--x-range", "20,30")
        np.testing.assert_array_equal(ax.get_lines()[0].get_xdata(), [20, 22, 24, 26, 28, 30])
        _, panels, head = self.draw("flume.xol1", "--item", "Surf. elevation",
                                    "--item", "Roller thickness", "--step", "-1")
        self.assertEqual([a.get_ylabel() for a in panels],
                         ["Surf. elevation (m)", "Roller thickness (m)"])
        self.assertEqual(head, "2026-01-01 12:01:02.8")
        # Half a step past the last record is still the last; more is refused.
        _, (ax,), _ = self.draw("flume.xol1", "--times", "63")
        self.assertEqual(ax.get_title(), "")
        for argv, words in ((["--times", "63.1"], "time 63.1 s out of range"),
                            (["--times", "61", "--steps", "1"], "one of --steps"),
                            (["--x-range", "49,60"], "fewer than two places"),
                            (["--bed", "missing.xol1"], "no such file")):
            with self.subTest(argv):
                self.assertIn(words, self.refused("flume.xol1", *argv))

    def test_item_over_the_line_and_time(self):
        fig, (ax,), head = self.draw("flume.xol1", "--xt", "--time-range", "60.4,61.6",
                                     "--bed", "bed.xol1")
        self.assertEqual(head, "Surf. elevation")
        mesh = ax.collections[0]
        field = mesh.get_array().reshape(4, self.NX)  # the records of 60.4 to 61.6 s
        self.assertTrue(np.all(np.ma.getmaskarray(field) == ~self.WET[None, :]))
        self.assertEqual(ax.get_ylim(), (60.2, 61.8))
        self.assertEqual(len(fig.axes), 2)  # with its colour bar
        for argv, words in ((["--steps", "1"], "--xt draws the records"),
                            (["--item", "Surf. elevation", "--item", "Roller thickness"], "one --item"),
                            (["--time-range", "70,80"], "no record within")):
            with self.subTest(argv):
                self.assertIn(words, self.refused("flume.xol1", "--xt", *argv))

    def test_series_of_a_profile(self):
        # The gauges: a panel for each quantity, a curve for each place.
        _, panels, head = self.draw("gauges.xol0")
        self.assertIsNone(head)
        self.assertEqual([a.get_ylabel() for a in panels], ["Surf. elevation (m)", "U velocity (m)"])
        for a in panels:
            self.assertEqual([t.get_text() for t in a.get_legend().get_texts()],
                             ["x = 12 m", "x = 20 m"])
        # A name picks the series of all places; a time range cuts them.
        _, (ax,), _ = self.draw("gauges.xol0", "--item", "Surf. elevation", "--time-range", "5,7")
        self.assertEqual(len(ax.get_lines()), 2)
        np.testing.assert_array_equal(ax.get_lines()[0].get_xdata(), [5.0, 5.5, 6.0, 6.5, 7.0])
        # The runup: three quantities, three panels, no legend for a lone curve.
        _, panels, _ = self.draw("runup.xol0")
        self.assertEqual([a.get_ylabel() for a in panels],
                         ["Horizontal runup (m)", "Vertical runup (m)", "Total runup (m)"])
        self.assertTrue(all(a.get_legend() is None for a in panels))
        with contextlib.redirect_stdout(io.StringIO()), contextlib.chdir(self.dir):
            self.assertEqual(self.bw["main"](["runup.xol0"]), 0)
        image = matplotlib.image.imread(os.path.join(self.dir, "runup.png"))
        self.assertEqual(image.shape[:2], (780, 960))  # 1.5 inches more for the third panel
        self.assertIn("--x-range apply to line files", self.refused("runup.xol0", "--x-range", "1,2"))

    def test_statistics_along_the_profile(self):
        # One record: its time in the title, no legend; the places without a
        # statistic are not drawn though their -1e-30 is not the file's delete value.
        _, panels, head = self.draw("stat.xol1", "--item", "Max. Wave Height",
                                    "--item", "Mean Elevation")
        self.assertEqual(head, "2026-01-01 12:01:04")
        for a in panels:
            self.assertIsNone(a.get_legend())
            np.testing.assert_array_equal(~np.ma.getmaskarray(a.get_lines()[0].get_ydata()), self.WET)


if __name__ == "__main__":
    unittest.main()
