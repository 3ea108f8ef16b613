#!/usr/bin/python3
"""Regular waves breaking on a plane beach, against the flume measurements of
Hansen and Svendsen (1979): builds a 2DH model of the flume, runs bw, and
compares wave height and mean water level along the flume with the
measured ones.

The flume: 0.36 m of still water over a flat bed, then a plane slope of
1:34.3 from the toe (x = 0) up past the still water line (x = 12.35 m).
The model is a channel of a few water rows between walls, waves from a
level boundary at the west end (a sine of the measured height at the toe,
ramped up over the warm-up), the flat part FLAT metres long, the slope
ending at a wall in 3 cm of water behind a sponge (--shore wall), or running
up past the waterline with the moving shoreline (--shore slot), the default
surface rollers. The surface and the
roller thickness along the middle row are written every step of the last
periods; wave height is the mean crest-to-trough height of those periods,
the mean level their time mean.

With --maker source (a grid model) the waves come from a generation line
near the west end instead, with a sponge of one and a half wavelengths
behind it, as in a profile; give FLAT room for both and for the flat bed
in front of the line (10.7 m leaves 6 m).

With --dims 1 the same flume is a profile of the 1DH model: the waves come
from a generation node FLAT metres before the toe (a series of the flux that
makes the measured height, from `bwdata waves --drive source`), with a
sponge of one and a half wavelengths behind it, and the surface and rollers
along the whole profile are written by a line output of the profile. The
sponge behind the source relaxes the level there towards the still water
level, and the wave's return flow and radiation stress in front of it then
lower the mean level of the whole flume by a few millimetres; the mean
level of a 1DH run is therefore given relative to its value at the toe
(the measured mean level there is 0.07 mm or less), and the offset is kept
in result.json.

    beach.py run 031041 [--dx 0.025] [--steps-per-period 128] [--periods 30] [--shore wall]
                        [--set WAVE_BREAKING.roller_factor=3 ...] [--out DIR]
    beach.py compare DIR ...   (the table of several finished runs)

`run` prints the figures of the comparison and writes them as JSON into the
run's folder (result.json), beside the model (beach.bw), its log and the
profile (profile.csv: x, height, mean level of the model).
"""
import argparse
import csv
import json
import math
import os
import subprocess
import sys

import numpy as np

HERE = os.path.dirname(os.path.abspath(__file__))
ROOT = os.path.abspath(os.path.join(HERE, "..", ".."))
LAB = os.environ.get("BW_LAB_DATA", "/work/shared/lab/hansen-svendsen-1979")

DEPTH = 0.36
SLOPE = 1.0 / 34.3
GRAVITY = 9.81
LAND = 1.0
TESTS = {  # period, height at the toe (first row of the measured table)
    "031041": {"period": 3.33, "file": "test_031041.csv"},
    "061071": {"period": 1.67, "file": "test_061071.csv"},
}


def measured(test):
    x, h, m = [], [], []
    with open(os.path.join(LAB, TESTS[test]["file"])) as f:
        for row in csv.DictReader(f):
            x.append(float(row["x_m"]))
            h.append(float(row["wave_height_m"]))
            m.append(float(row["mean_level_m"]))
    return np.array(x), np.array(h), np.array(m)


def write_grid(path, values, dx):
    ny, nx = len(values), len(values[0])
    with open(path, "w") as f:
        f.write(f"ncols {nx}\nnrows {ny}\nxllcorner 0\nyllcorner 0\ncellsize {dx}\n"
                "NODATA_value -9999\n")
        for k in reversed(range(ny)):  # the file's first row is the northernmost
            f.write(" ".join(f"{v:.6f}" for v in values[k]) + "\n")


def flume_sections(bathymetry, steps, dt, warm_up):
    """The sections both kinds of model share: the bed, the land level and
    the run's period."""
    return f"""    Bathymetry_Selection {{
        Hot_Start = false
        DATA_FILE {{
            File_name = file("{bathymetry}")
            Item_Count = 1
            Item_Numbers = 1
        }}
    }}
    Area_Description {{
        True_land_value = 0.5
        Reference_Level_Shift = 0
    }}
    Simulation_Period {{
        Time_step_count = {steps}
        Time_step_interval = {dt:.10f}
        Warm_up_period = {warm_up}
        Start_time = 2026, 1, 1, 12, 0, 0
    }}"""


def wave_maker(a, ny):
    """The sections that make the waves: a level boundary at the west end,
    or a generation line (a.source, the grid column) with a sponge behind it."""
    items = ("2", "1, 2") if a.deep else ("1", "1")
    if a.maker == "level":
        return f"""    Boundary_Location {{
        Number_Of_Boundaries = 1
        BOUNDARY_DATA_1 {{
            First_Point = 0, 1
            Last_Point = 0, {ny - 2}
            Formulation = 0
            Data_Specification = 0
            DATA_FILE {{
                File_name = file("waves.xol0")
                Item_Count = {items[0]}
                Item_Numbers = {items[1]}
            }}
        }}
    }}
    Internal_Generation {{ Number_Of_Records = 0 }}"""
    return f"""    Boundary_Location {{ Number_Of_Boundaries = 0 }}
    Internal_Generation {{
        Number_Of_Records = 1
        INTERNAL_GEN_DATA_1 {{
            First_Line_Pos = {a.source}, 1
            Last_Line_Pos = {a.source}, {ny - 2}
            Wave_Type = 0
            DATA_FILE {{
                File_name = file("waves.xol0")
                Item_Count = {items[0]}
                Item_Numbers = {items[1]}
            }}
        }}
    }}"""


def model_text(a, nx, steps, dt, record_from):
    """The model file; a holds the options of the run."""
    ny = a.rows + 2
    sections = {
        "WAVE_BREAKING": {"type": "1"},
        "Equation_Parameters": {"Deep_Water_Terms": "true" if a.deep else "false",
                                "Dispersion_Factor": "0.0667" if a.deep else "0"},
        "SOLUTION_PARAMETERS": {"Convective_terms_handle": "0",
                                "Grid_scale_filter": f"{a.filter:g}"},
        "MOVING_SHORELINE": {"type": "1", "depth": "-0.45"} if a.shore == "slot" else {"type": "0"},
    }
    if a.deep:
        sections["Equation_Parameters"]["Time_extrapolation_factor_lower"] = f"{a.extrapolation:g}"
    for s in a.set or []:
        key, value = s.split("=", 1)
        section, name = key.split(".", 1)
        sections.setdefault(section, {})[name] = value

    def body(name):
        return "\n".join(f"        {k} = {v}" for k, v in sections.get(name, {}).items())

    sponge = "        Sponge_Type = false"
    if a.shore == "wall" or a.maker == "source":
        sponge = """        Sponge_Type = true
        DATA_FILE {
            File_name = file("sponge.xol2")
            Item_Count = 1
            Item_Numbers = 1
        }"""

    return f"""# Hansen and Svendsen (1979), test {a.test}: regular waves of {a.period} s
# breaking on a 1:34.3 slope; written by tools/bwlab/beach.py.
TARNEL_BOUSSINESQ_WAVE {{
    BASIC_MODEL_PARAMETERS {{
        NUMBER_OF_DIMENSIONS = 2
    }}
{flume_sections("bathymetry.xol2", steps, dt, a.steps_per_period * 3)}
    Equation_Parameters {{
{body("Equation_Parameters")}
    }}
    SOLUTION_PARAMETERS {{
{body("SOLUTION_PARAMETERS")}
    }}
    MOVING_SHORELINE {{
{body("MOVING_SHORELINE")}
    }}
    Bottom_Friction {{ Resistance_Type = 0 }}
    WAVE_BREAKING {{
{body("WAVE_BREAKING")}
    }}
    EXPLICIT_FILTERING {{ type = 0 }}
    EDDY_VISCOSITY {{ Type = 0 }}
    Porosity {{ Porosity_Type = false }}
    Sponge {{
{sponge}
    }}
    SURFACE_ELEVATION {{
        SURFACE_TYPE = 0
        Constant_Value = 0
    }}
{wave_maker(a, ny)}
    Output_Deterministic_2D {{
        Number_Of_Records = 1
        Output_Spec_Data_1 {{
            File_Name = file("axis.xol1")
            X_Range_And_Interval = 0, {nx - 1}, 1
            Y_Range_And_Interval = {ny // 2}, {ny // 2}, 1
            First_Time_step = {record_from}
            Last_Time_step = {steps}
            Time_Step_Interval = 1
            Number_Of_Items = 2
            Item_Numbers = 1, 5
            Title = "Surface and rollers along the middle row"
        }}
    }}
    Output_Statistic_2D {{ Type = 0 }}
    Output_Disturbance_2D {{ Type = 0 }}
    Output_Hotstart_2D {{ Hot_Start = false }}
    OPTION_PARAMETERS {{
        HUD_update_2DH = 50
    }}
}}
"""


def build(a):
    """Writes the inputs of the run into a.out; gives the grid and step facts."""
    os.makedirs(a.out, exist_ok=True)
    dx = a.dx
    top = a.beach_top if a.shore == "slot" else -a.end_depth
    beach_end = (DEPTH + top) / SLOPE  # x of the top of the beach from the toe
    nx = int(round((a.flat + beach_end) / dx)) + 2  # the last column a wall
    ny = a.rows + 2

    def bed(j):
        x = j * dx - a.flat
        return -DEPTH if x <= 0 else -DEPTH + x * SLOPE

    rows = [[LAND if k in (0, ny - 1) or j == nx - 1 else bed(j) for j in range(nx)]
            for k in range(ny)]
    write_grid(os.path.join(a.out, "bathymetry.asc"), rows, dx)
    # A generation line makes its waves both ways: a sponge of one and a half
    # wavelengths behind it, rising to 1.5 at the west wall.
    back = 1.5 * 2.0 * math.pi / wave_number(a.period, DEPTH, 1.0 / 15.0 if a.deep else 0.0)
    a.source = int(round((back + 0.3) / dx))
    if a.shore == "wall" or a.maker == "source":
        # A sponge over the last metres before the wall, its coefficient
        # rising with the square of the distance into it to 1.5.
        def sponge(j, k):
            if rows[k][j] >= 0.5:
                return 1.0
            if a.maker == "source" and j * dx < back:
                return 1.0 + 0.5 * (1.0 - j * dx / back) ** 2
            s = (j - (nx - 2)) * dx + a.sponge
            if s <= 0.0 or a.shore != "wall":
                return 1.0
            return 1.0 + 0.5 * (s / a.sponge) ** 2
        write_grid(os.path.join(a.out, "sponge.asc"),
                   [[sponge(j, k) for j in range(nx)] for k in range(ny)], dx)
    dt = a.period / a.steps_per_period
    steps = a.periods * a.steps_per_period
    omega = 2.0 * math.pi / a.period
    # With the deep-water terms the boundary also takes the curvature of the
    # surface across it, -k^2 times the level, k of the equations' relation.
    B = 1.0 / 15.0 if a.deep else 0.0
    k = omega / math.sqrt(GRAVITY * DEPTH)
    for _ in range(100):
        kd = k * DEPTH
        k = omega / math.sqrt(GRAVITY * DEPTH * (1 + B * kd * kd) / (1 + (B + 1 / 3) * kd * kd))
    with open(os.path.join(a.out, "waves.csv"), "w") as f:
        f.write("time,Level,Curvature\n")
        for n in range(steps + 8):
            level = 0.5 * a.height * math.sin(omega * n * dt)
            f.write(f"{n * dt:.10f},{level:.8f},{-k * k * level:.8f}\n")
    record_from = steps - a.record_periods * a.steps_per_period
    with open(os.path.join(a.out, "beach.bw"), "w") as f:
        f.write(model_text(a, nx, steps, dt, record_from))
    bwdata = os.path.join(a.bin, "tools", "bwdata", "bwdata")
    waves = [bwdata, "import-csv", "waves.csv", "-o", "waves.xol0", "--start",
             "2026-01-01 12:00:00", "--types", "100078,999", "--units", "1000,1000",
             "--title", "Incoming wave"]
    if a.maker == "source":
        waves = [bwdata, "waves", "-o", "waves.xol0", "--drive", "source", "--depth",
                 f"{DEPTH}", "--dt", f"{dt:.10f}", "--duration", f"{(steps + 8) * dt:.6f}",
                 "--start", "2026-01-01 12:00:00", "--height", f"{a.height}",
                 "--period", f"{a.period}", "--ramp", f"{3 * a.period}"]
        if a.deep:
            waves += ["--deep", f"{B}"]
    for cmd in ([bwdata, "import-asc", "bathymetry.asc", "-o", "bathymetry.xol2",
                 "--title", "Plane beach 1:34.3"], waves) + (
                ([bwdata, "import-asc", "sponge.asc", "-o", "sponge.xol2", "--name", "Sponge",
                  "--type", "999", "--unit", "1000", "--title", "Sponge layers"],)
                if a.shore == "wall" or a.maker == "source" else ()):
        subprocess.run(cmd, cwd=a.out, check=True, stdout=subprocess.DEVNULL)
    return nx, dt, steps


def wave_number(period, depth, B):
    omega = 2.0 * math.pi / period
    k = omega / math.sqrt(GRAVITY * depth)
    for _ in range(100):
        kd = k * depth
        k = omega / math.sqrt(GRAVITY * depth * (1 + B * kd * kd) / (1 + (B + 1 / 3) * kd * kd))
    return k


def write_profile(path, x, values):
    with open(path, "w") as f:
        f.write("x,z\n")
        for p, v in zip(x, values):
            f.write(f"{p:.6f},{v:.6f}\n")


def model_text_1d(a, nx, steps, dt, record_from, source):
    """The model file of the profile; a holds the options of the run."""
    deep = a.deep
    sections = {
        "WAVE_BREAKING": {"type": "1"},
        "Equation_Parameters": {"Deep_Water_Terms": "true" if deep else "false",
                                "Dispersion_Factor": "0.0666667" if deep else "0"},
        "MOVING_SHORELINE": {"type": "1", "depth": "-0.45", "width": "0.01",
                             "smoothing_parameter": "100", "friction_coefficient": "0.1"}
        if a.shore == "slot" else {"type": "0"},
    }
    for s in a.set or []:
        key, value = s.split("=", 1)
        section, name = key.split(".", 1)
        sections.setdefault(section, {})[name] = value

    def body(name):
        return "\n".join(f"        {k} = {v}" for k, v in sections.get(name, {}).items())

    return f"""# Hansen and Svendsen (1979), test {a.test}: regular waves of {a.period} s
# breaking on a 1:34.3 slope, as a profile; written by tools/bwlab/beach.py.
TARNEL_BOUSSINESQ_WAVE {{
    BASIC_MODEL_PARAMETERS {{
        NUMBER_OF_DIMENSIONS = 1
        DELETE_FEM_KVT_FILE = 0
    }}
{flume_sections("bathymetry.xol1", steps, dt, 0)}
    Equation_Parameters {{
{body("Equation_Parameters")}
    }}
    SOLUTION_PARAMETERS {{ Convective_terms_handle = 0 }}
    MOVING_SHORELINE {{
{body("MOVING_SHORELINE")}
    }}
    Bottom_Friction {{ Resistance_Type = 0 }}
    WAVE_BREAKING {{
{body("WAVE_BREAKING")}
    }}
    EXPLICIT_FILTERING {{
        type = 2
        DATA_FILE {{
            File_name = file("filter.xol1")
            Item_Count = 1
            Item_Numbers = 1
        }}
    }}
    EDDY_VISCOSITY {{ Type = 0 }}
    Porosity {{ Porosity_Type = false }}
    Sponge {{
        Sponge_Type = true
        DATA_FILE {{
            File_name = file("sponge.xol1")
            Item_Count = 1
            Item_Numbers = 1
        }}
    }}
    Boundary_Location {{ Number_Of_Boundaries = 0 }}
    Internal_Generation {{
        Number_Of_Records = 1
        INTERNAL_GEN_DATA_1 {{
            First_Line_Pos = {source}, 0
            Last_Line_Pos = {source}, 0
            Wave_Type = 0
            DATA_FILE {{
                File_name = file("waves.xol0")
                Item_Count = 2
                Item_Numbers = 1, 2
            }}
        }}
    }}
    OUTPUT_DETERMINISTIC_1D {{
        Number_Of_Records = 1
        OUTPUT_SPEC_DATA_1 {{
            File_Name = file("axis.xol1")
            type = 1
            X_Range_And_Interval = 0, {nx - 1}
            No_of_points = {nx}
            First_Time_step = {record_from}
            Last_Time_step = {steps}
            Time_Step_Interval = 1
            Number_Of_Items = 2
            Item_Numbers = 3, 6
            Title = "Surface and rollers along the profile"
        }}
    }}
    OUTPUT_STATISTIC_1D {{ Number_Of_Records = 0 }}
    OUTPUT_MOVING_SHORELINE_1D {{ INCLUDE_CALCULATION = false }}
    OPTION_PARAMETERS {{
        HUD_update_2DH = 50
    }}
}}
"""


def build1d(a):
    """The inputs of a 1DH run; gives the point count, step and steps, and the
    x of the profile's first point from the toe."""
    os.makedirs(a.out, exist_ok=True)
    dx = a.dx
    B = 1.0 / 15.0 if a.deep else 0.0
    L = 2.0 * math.pi / wave_number(a.period, DEPTH, B)
    back = 1.5 * L  # sponge behind the source
    source = int(round((back + 0.3) / dx))
    start = -(source * dx + a.flat)  # x of the first point from the toe
    top = a.beach_top if a.shore == "slot" else -a.end_depth
    nx = int(round((-start + (DEPTH + top) / SLOPE) / dx)) + 1
    x = [start + j * dx for j in range(nx)]
    bed = [-DEPTH if p <= 0 else -DEPTH + p * SLOPE for p in x]
    end = x[-1]
    sponge = []
    for p in x:
        s = 1.0
        into_back = (back - (p - start)) / back
        if into_back > 0:
            s = 1.0 + 0.5 * into_back ** 2
        if a.shore == "wall":
            into_end = (p - (end - a.sponge)) / a.sponge
            if into_end > 0:
                s = 1.0 + 0.5 * into_end ** 2
        sponge.append(s)
    write_profile(os.path.join(a.out, "bathymetry.csv"), [p - start for p in x], bed)
    write_profile(os.path.join(a.out, "sponge.csv"), [p - start for p in x], sponge)
    # The explicit filter from --filter-from metres past the toe on: the
    # rollers need it where they stand (without it the surf zone grows a
    # zigzag at the grid scale and the run stops, see docs/validation.md),
    # and it would take height from the shoaling waves elsewhere.
    write_profile(os.path.join(a.out, "filter.csv"), [p - start for p in x],
                  [a.filter if p >= a.filter_from else 0.0 for p in x])
    dt = a.period / a.steps_per_period
    steps = a.periods * a.steps_per_period
    record_from = steps - a.record_periods * a.steps_per_period
    with open(os.path.join(a.out, "beach.bw"), "w") as f:
        f.write(model_text_1d(a, nx, steps, dt, record_from, source))
    bwdata = os.path.join(a.bin, "tools", "bwdata", "bwdata")
    waves = [bwdata, "waves", "-o", "waves.xol0", "--drive", "source", "--depth", f"{DEPTH}",
             "--dt", f"{dt:.10f}", "--duration", f"{(steps + 8) * dt:.6f}",
             "--start", "2026-01-01 12:00:00", "--height", f"{a.height}",
             "--period", f"{a.period}", "--ramp", f"{3 * a.period}"]
    if a.deep:
        waves += ["--deep", f"{B}"]
    for cmd in ([bwdata, "import-profile", "bathymetry.csv", "-o", "bathymetry.xol1",
                 "--title", "Plane beach 1:34.3"],
                [bwdata, "import-profile", "sponge.csv", "-o", "sponge.xol1",
                 "--title", "Sponge layers"],
                [bwdata, "import-profile", "filter.csv", "-o", "filter.xol1",
                 "--title", "Filter coefficients"], waves):
        subprocess.run(cmd, cwd=a.out, check=True, stdout=subprocess.DEVNULL)
    return nx, dt, steps, start


def analyse(a, nx):
    import netCDF4
    ds = netCDF4.Dataset(os.path.join(a.out, "axis.xol1"))
    names = [v for v in ds.variables if v not in ("x", "y", "time")]
    dyn = [ds.variables[n] for n in names if "time" in ds.variables[n].dimensions]
    xi = np.ma.masked_invalid(np.ma.asarray(dyn[0][:], dtype=float))
    xi = np.ma.masked_where(np.abs(xi.filled(0.0) + 1e-30) < 1e-36, xi)
    delta = np.ma.asarray(dyn[1][:], dtype=float)
    ds.close()
    n = a.steps_per_period
    periods = xi.shape[0] // n
    xi = xi[-periods * n:]
    # The height of each period, crest to trough, averaged over the periods.
    heights = np.ma.stack([xi[p * n:(p + 1) * n].max(axis=0) - xi[p * n:(p + 1) * n].min(axis=0)
                           for p in range(periods)])
    x = np.arange(nx) * a.dx + a.start
    height = heights.mean(axis=0)
    mean = xi.mean(axis=0)
    return x, height, mean, np.ma.filled(delta[-periods * n:].max(axis=0), 0.0)


def compare(a, x, height, mean):
    xm, hm, mm = measured(a.test)
    imax = int(np.argmax(hm))
    xb_meas = xm[imax]
    # The model's breaking point: where its height, on the beach, peaks.
    on = (x > 0.0) & (x < xm[-1] + 0.5)
    hb = np.ma.masked_array(height, mask=~on | np.ma.getmaskarray(height))
    ib = int(np.ma.argmax(hb))
    xb_model = float(x[ib])
    h_at = np.interp(xm, x, np.ma.filled(height, np.nan))
    m_at = np.interp(xm, x, np.ma.filled(mean, np.nan))
    surf = xm > xb_meas
    shoal = xm <= xb_meas
    rel_h = (h_at - hm) / hm
    # Set-up against the local measured value, where it is at least 1 mm
    # (around the turn from set-down to set-up the local value is near 0).
    up = surf & (np.abs(mm) >= 1e-3)
    rel_m = (m_at - mm) / np.abs(mm)
    result = {
        "test": a.test, "dx": a.dx, "dt": a.period / a.steps_per_period,
        "steps_per_period": a.steps_per_period, "periods": a.periods,
        "courant": math.sqrt(GRAVITY * DEPTH) * a.period / a.steps_per_period / a.dx,
        "deep": a.deep, "filter": a.filter, "set": a.set or [],
        "height_at_toe_model": float(h_at[0]), "height_at_toe_measured": float(hm[0]),
        "break_x_measured": float(xb_meas), "break_x_model": xb_model,
        "break_error": (xb_model - xb_meas) / xb_meas,
        "break_height_measured": float(hm[imax]), "break_height_model": float(height[ib]),
        "shoaling_height_error_mean": float(np.mean(np.abs(rel_h[shoal]))),
        "surf_height_error_mean": float(np.mean(np.abs(rel_h[surf]))),
        "surf_height_error_max": float(np.max(np.abs(rel_h[surf]))),
        "surf_height_points": [[float(p), float(q), float(r)]
                               for p, q, r in zip(xm[surf], hm[surf], h_at[surf])],
        "setdown_measured": float(mm.min()), "setdown_model": float(np.nanmin(m_at[xm < 10.0])),
        "setup_error_mean": float(np.mean(np.abs(rel_m[up]))) if up.any() else None,
        "setup_error_max": float(np.max(np.abs(rel_m[up]))) if up.any() else None,
        "setup_points": [[float(p), float(q), float(r)]
                         for p, q, r in zip(xm[surf], mm[surf], m_at[surf])],
    }
    return result


def run(a):
    a.period = TESTS[a.test]["period"]
    if a.height is None:
        a.height = float(measured(a.test)[1][0])
    if a.out is None:
        a.out = os.path.join(os.getcwd(), f"run-{a.test}")
    if a.reanalyse:  # the files of an earlier run
        text = open(os.path.join(a.out, "beach.bw")).read()
        nx = int(text.split("X_Range_And_Interval = 0, ")[1].split(",")[0].split()[0]) + 1
        a.start = -a.flat
        if a.dims == 1:
            with open(os.path.join(a.out, "result.json")) as f:
                a.start = json.load(f)["profile_start"]
        r = subprocess.CompletedProcess([], 0)
    elif a.dims == 1:
        a.maker = "source"
        nx, dt, steps, a.start = build1d(a)
        bw = os.path.join(a.bin, "src", "bw")
        r = subprocess.run([bw, "beach.bw"], cwd=a.out, capture_output=True, text=True)
    else:
        a.start = -a.flat
        nx, dt, steps = build(a)
        bw = os.path.join(a.bin, "src", "bw")
        env = dict(os.environ, OMP_NUM_THREADS=str(a.threads))
        r = subprocess.run([bw, "beach.bw"], cwd=a.out, env=env, capture_output=True, text=True)
    if r.returncode != 0:
        tail = "\n".join((r.stdout + r.stderr).splitlines()[-5:])
        result = {"test": a.test, "dx": a.dx, "steps_per_period": a.steps_per_period,
                  "set": a.set or [], "deep": a.deep, "filter": a.filter,
                  "failed": f"exit code {r.returncode}: {tail}"}
        print(json.dumps(result, indent=1))
        with open(os.path.join(a.out, "result.json"), "w") as f:
            json.dump(result, f, indent=1)
        return 1
    x, height, mean, dmax = analyse(a, nx)
    offset = 0.0
    if a.dims == 1 or a.maker == "source":  # the mean level from the toe, see above
        offset = float(np.interp(0.0, x, np.ma.filled(mean, np.nan)))
        mean = mean - offset
    # Where breaking starts: the first point on the slope whose roller grows
    # thicker than 1 mm in the periods kept.
    onset = x[(x > 0.0) & (dmax > 1e-3)]
    with open(os.path.join(a.out, "profile.csv"), "w") as f:
        f.write("x_m,wave_height_m,mean_level_m\n")
        for p, h, m in zip(x, np.ma.filled(height, np.nan), np.ma.filled(mean, np.nan)):
            f.write(f"{p:.4f},{h:.6f},{m:.6f}\n")
    result = compare(a, x, height, mean)
    result["roller_thickness_max"] = float(dmax.max())
    result["dims"] = a.dims
    result["profile_start"] = a.start
    result["mean_level_offset"] = offset
    if onset.size:
        result["onset_x_model"] = float(onset[0])
        result["onset_error"] = (float(onset[0]) - result["break_x_measured"]) / result["break_x_measured"]
    with open(os.path.join(a.out, "result.json"), "w") as f:
        json.dump(result, f, indent=1)
    short = {k: v for k, v in result.items() if not k.endswith("_points")}
    print(json.dumps(short, indent=1))
    return 0


def table(dirs):
    print("| run | dx (m) | T/dt | Cr | rollers from x (m) | error | H peak at x (m) | "
          "H surf zone, mean / max error | set-up, mean / max error |")
    print("|---|---|---|---|---|---|---|---|---|")
    for d in dirs:
        with open(os.path.join(d, "result.json")) as f:
            r = json.load(f)
        name = os.path.basename(os.path.normpath(d))
        if "failed" in r:
            print(f"| {name} | {r['dx']} | {r['steps_per_period']} | | "
                  f"{r['failed'].splitlines()[-1][:60]} |||||")
            continue
        su = (f"{100 * r['setup_error_mean']:.0f} / {100 * r['setup_error_max']:.0f} %"
              if r["setup_error_mean"] is not None else "-")
        print(f"| {name} | {r['dx']} | {r['steps_per_period']} | {r['courant']:.2f} | "
              f"{r.get('onset_x_model', float('nan')):.2f} | "
              f"{100 * r.get('onset_error', float('nan')):+.1f} % | "
              f"{r['break_x_model']:.2f} | "
              f"{100 * r['surf_height_error_mean']:.0f} / {100 * r['surf_height_error_max']:.0f} % | "
              f"{su} |")


def read_profile(d):
    data = np.genfromtxt(os.path.join(d, "profile.csv"), delimiter=",", names=True)
    return data["x_m"], data["wave_height_m"], data["mean_level_m"]


def plot(dirs, labels, out, test):
    """Height and mean level of the runs in dirs against the measurements."""
    import matplotlib
    matplotlib.use("Agg")
    import matplotlib.pyplot as plt
    xm, hm, mm = measured(test)
    fig, (ax1, ax2) = plt.subplots(2, 1, figsize=(7.5, 6.5), sharex=True)
    ax1.plot(xm, 100 * hm, "ko", ms=4, label="measured")
    ax2.plot(xm, 1000 * mm, "ko", ms=4, label="measured")
    for d, label in zip(dirs, labels):
        x, h, m = read_profile(d)
        keep = (x >= -0.5) & (x <= 12.0)
        ax1.plot(x[keep], 100 * h[keep], label=label)
        ax2.plot(x[keep], 1000 * m[keep], label=label)
    ax1.set_ylabel("wave height (cm)")
    ax2.set_ylabel("mean water level (mm)")
    ax2.set_xlabel("distance from the toe of the slope (m)")
    for ax in (ax1, ax2):
        ax.grid(True, alpha=0.3)
        ax.axhline(0.0, color="0.8", linewidth=0.8, zorder=0)
    ax1.legend(fontsize=8)
    ax1.set_title(f"Hansen and Svendsen (1979), test {test} (T = {TESTS[test]['period']} s)")
    fig.tight_layout()
    fig.savefig(out, dpi=110)


def main(argv=None):
    p = argparse.ArgumentParser(description=__doc__.split("\n")[0])
    sub = p.add_subparsers(dest="command", required=True)
    r = sub.add_parser("run")
    r.add_argument("test", choices=sorted(TESTS))
    r.add_argument("--dims", type=int, choices=[1, 2], default=2,
                   help="1: the profile model; 2: a channel of the grid model")
    r.add_argument("--maker", choices=["level", "source"], default="level",
                   help="--dims 2: a level boundary at the west end, or a generation line "
                        "with a sponge behind it (the profile's wave maker; give a --flat of "
                        "10 m or more)")
    r.add_argument("--dx", type=float, default=0.025)
    r.add_argument("--steps-per-period", type=int, default=128)
    r.add_argument("--periods", type=int, default=30)
    r.add_argument("--record-periods", type=int, default=6)
    r.add_argument("--rows", type=int, default=3)
    r.add_argument("--flat", type=float, default=6.0, help="m of flat bed before the toe")
    r.add_argument("--shore", choices=["slot", "wall"], default="wall",
                   help="slot: the moving shoreline up the beach; wall: a wall in shallow water")
    r.add_argument("--beach-top", type=float, default=0.08, help="slot: bed level at the end, m")
    r.add_argument("--end-depth", type=float, default=0.03, help="wall: still water depth there, m")
    r.add_argument("--sponge", type=float, default=0.5, help="wall: m of sponge before it")
    r.add_argument("--height", type=float, help="wave height at the boundary (default: measured at the toe)")
    r.add_argument("--deep", action="store_true", help="the deep-water terms, B = 1/15")
    r.add_argument("--extrapolation", type=float, default=1.0)
    r.add_argument("--filter", type=float, default=0.1,
                   help="Grid_scale_filter; with --dims 1 the explicit filter's coefficient")
    r.add_argument("--filter-from", type=float, default=-100.0,
                   help="--dims 1: the filter acts from this x (m from the toe) on")
    r.add_argument("--set", action="append", help="SECTION.key=value in the model file")
    r.add_argument("--threads", type=int, default=1)
    r.add_argument("--bin", default=os.path.join(ROOT, "build", "release"))
    r.add_argument("--out")
    r.add_argument("--reanalyse", action="store_true", help="compare the files of a run again")
    c = sub.add_parser("compare")
    c.add_argument("dirs", nargs="+")
    g = sub.add_parser("plot")
    g.add_argument("test", choices=sorted(TESTS))
    g.add_argument("out", help="PNG file")
    g.add_argument("runs", nargs="+", help="DIR=label")
    a = p.parse_args(argv)
    if a.command == "run":
        return run(a)
    if a.command == "plot":
        pairs = [r.split("=", 1) if "=" in r else (r, os.path.basename(r)) for r in a.runs]
        plot([d for d, _ in pairs], [l for _, l in pairs], a.out, a.test)
        return 0
    table(a.dirs)
    return 0


if __name__ == "__main__":
    sys.exit(main())
