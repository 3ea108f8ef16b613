#!/usr/bin/python3
"""Stability and accuracy of the 2DH scheme on a flat bed, from scheme.py.

    tables.py FOLDER [--quick]

writes the tables as Markdown to stdout and the plots as PNG files into
FOLDER (docs/numerics for docs/numerics.md). --quick uses coarser grids of
Courant numbers and depths, for a look in a few seconds; the page is made
without it (some six minutes on two processors).

Everything depends only on dx/h, the Courant number Cr = sqrt(g h) dt / dx,
the wave's points per wavelength (or kh) and the settings, so the cases
below are set up with h = 1 m and dy = dx. The numbers are:
  growth per step   the largest |eigenvalue| of the amplification matrix
                    over the modes a = kx dx, b = ky dy in (0, pi]^2 (the
                    scheme is even in a and b and symmetric in a <-> b for
                    dx = dy, which the script checks); above 1 + 1e-9 a
                    setting counts as unstable;
  loss per period   1 - |lambda|^(T/dt) of the eigenvalue of the wave itself,
                    as a percentage of the wave height (negative: growth);
  phase per period  the lag of that eigenvalue against the equations' own
                    dispersion relation over one period, in degrees
                    (positive: the computed wave is slow).
"""

import os
import sys

import numpy as np

sys.path.insert(0, os.path.dirname(os.path.abspath(__file__)))
import scheme  # noqa: E402

G = scheme.G
TOL = 1e-9            # a spectral radius above 1 + TOL is growth
N_MODES = 64          # modes a, b of the scan, before the local refinement
FES = (0.0, 0.5, 0.75, 1.0)
PPWS = (10, 15, 20, 30, 40)
CRS = (0.2, 0.5, 1.0, 2.0)
QUICK = "--quick" in sys.argv


# ---------------------------------------------------------------- modes

def case(dxh, cr, fe, deep, eps=0.0):
    """The scheme at dx/h, Courant number cr, h = 1 m."""
    dx = float(dxh)
    return scheme.Scheme(1.0, dx, dx, cr * dx / np.sqrt(G), fe, deep, filt=eps)


def _grid(n):
    """Modes with a >= b over (0, pi]^2, the axis b -> 0 included."""
    t = np.concatenate([[1e-6], np.linspace(np.pi / n, np.pi, n)])
    a, b = np.meshgrid(t, t, indexing="ij")
    keep = a >= b
    return a[keep], b[keep], np.pi / n


def maximise(f, n=N_MODES, picks=3, rounds=3):
    """The largest f(a, b) over the modes: a scan of n x n, then a zoom of
    9 x 9 points around each of the best `picks` separate maxima, shrunk
    fourfold `rounds` times. Returns (value, a, b)."""
    a, b, h = _grid(n)
    v = f(a, b)
    order = np.argsort(v)[::-1]
    chosen = []
    for i in order:
        if all(max(abs(a[i] - a[j]), abs(b[i] - b[j])) > 2.5 * h for j in chosen):
            chosen.append(i)
        if len(chosen) == picks:
            break
    best = (float(v[order[0]]), float(a[order[0]]), float(b[order[0]]))
    for i in chosen:
        ca, cb, w = a[i], b[i], h
        for _ in range(rounds):
            ta = np.clip(ca + np.linspace(-w, w, 9), 1e-6, np.pi)
            tb = np.clip(cb + np.linspace(-w, w, 9), 1e-6, np.pi)
            A, B = np.meshgrid(ta, tb, indexing="ij")
            vv = f(A, B)
            j = np.unravel_index(np.argmax(vv), vv.shape)
            ca, cb = A[j], B[j]
            if vv[j] > best[0]:
                best = (float(vv[j]), float(ca), float(cb))
            w /= 4.0
    return best


def growth(s):
    """The growth per step of the setting (largest spectral radius) and its mode."""
    return maximise(lambda a, b: scheme.spectral_radius(s, a, b))


def stable(s):
    return growth(s)[0] <= 1.0 + TOL


def check_symmetry():
    """The scan covers a >= b > 0 only: the radius must be even in a and b
    and symmetric in a <-> b. Returns the largest difference found."""
    rng = np.random.default_rng(7)
    a, b = rng.uniform(0, np.pi, 300), rng.uniform(0, np.pi, 300)
    worst = 0.0
    for dxh, cr, fe, deep in [(0.1, 1.0, 1.0, True), (1.0, 1.5, 1.0, False),
                              (0.3, 0.8, 0.5, True), (0.5, 2.0, 0.0, True)]:
        s = case(dxh, cr, fe, deep)
        r = scheme.spectral_radius(s, a, b)
        for other in ((a, -b), (-a, b), (b, a)):
            worst = max(worst, float(np.abs(scheme.spectral_radius(s, *other) - r).max()))
    return worst


# ---------------------------------------------------------------- stability

CR_SCAN = np.geomspace(0.01, 4.0, 24 if QUICK else 44)
DXH = (0.05, 0.1, 0.2, 0.5, 1.0) if QUICK else (
    0.05, 0.075, 0.1, 0.15, 0.2, 0.3, 0.4, 0.5, 0.7, 1.0)


def stable_courant(dxh, fe, deep, eps=0.0, rel=3e-3):
    """The largest Cr with every smaller Cr stable, from a scan of CR_SCAN
    and a bisection in the first unstable interval. Also returns the
    stable scan points above it (empty if the stable set is one interval
    from 0 as far as the scan sees) and the mode of the first growth."""
    ok = np.array([stable(case(dxh, c, fe, deep, eps)) for c in CR_SCAN])
    if ok.all():
        return float(CR_SCAN[-1]), [], None
    first = int(np.argmin(ok))
    islands = [float(c) for c in CR_SCAN[first:][ok[first:]]]
    if first == 0:
        return 0.0, islands, None
    lo, hi = float(CR_SCAN[first - 1]), float(CR_SCAN[first])
    while hi - lo > rel * lo:
        mid = 0.5 * (lo + hi)
        if stable(case(dxh, mid, fe, deep, eps)):
            lo = mid
        else:
            hi = mid
    mode = growth(case(dxh, hi, fe, deep, eps))
    return lo, islands, mode


FIT_DXH = (0.0125, 0.025)  # finer grids for the rule of fe = 1 only


def _stable_courant(job):
    return stable_courant(*job)


def _growth_fe1(job):
    return growth(case(job[0], job[1], 1.0, True))[0]


def parallel(f, jobs):
    """f over the jobs on every processor (the order kept)."""
    import multiprocessing
    n = os.cpu_count() or 1
    if n == 1 or len(jobs) < 2:
        return [f(j) for j in jobs]
    with multiprocessing.get_context("fork").Pool(n) as pool:
        return pool.map(f, jobs, chunksize=1)


def stability_maps(folder):
    import matplotlib
    matplotlib.use("Agg")
    import matplotlib.pyplot as plt

    configs = [(fe, True) for fe in FES] + [(1.0, False)]
    names = [f"deep, fe {fe:g}" for fe in FES] + ["no deep terms"]
    limits, islands, modes = {}, {}, {}
    jobs = [(d,) + cfg for cfg in configs for d in DXH + FIT_DXH if d in DXH or cfg == (1.0, True)]
    for (d, fe, deep), (lim, isl, mode) in zip(jobs, parallel(_stable_courant, jobs)):
        limits[(fe, deep), d], islands[(fe, deep), d], modes[(fe, deep), d] = lim, isl, mode

    top = CR_SCAN[-1]
    out = ["## Largest stable Courant number", "",
           "Cr = sqrt(g h) dt / dx below which no mode grows (`>= %.1f`: stable up to the "
           "end of the scan). h is the still water depth, dy = dx." % top, "",
           "| dx/h | " + " | ".join(names) + " |",
           "|---:|" + "---:|" * len(configs)]
    for d in DXH:
        cells = []
        for cfg in configs:
            lim = limits[cfg, d]
            cells.append(f">= {top:.1f}" if lim >= top else f"{lim:.3f}")
        out.append(f"| {d:g} | " + " | ".join(cells) + " |")
    out.append("")

    # The mode that grows first, and whether stability comes back above the limit.
    out += ["Mode (a, b)/pi that grows first just above the limit:", "",
            "| dx/h | " + " | ".join(names) + " |", "|---:|" + "---:|" * len(configs)]
    for d in DXH:
        cells = []
        for cfg in configs:
            m = modes[cfg, d]
            cells.append("-" if m is None else f"({m[1] / np.pi:.2f}, {m[2] / np.pi:.2f})")
        out.append(f"| {d:g} | " + " | ".join(cells) + " |")
    out.append("")
    back = [(names[configs.index(cfg)], d, isl) for (cfg, d), isl in islands.items() if isl]
    if back:
        out.append("Stable again above the first growth (Courant numbers of the scan):")
        out.append("")
        for name, d, isl in back:
            out.append(f"- {name}, dx/h {d:g}: " + ", ".join(f"{c:.3g}" for c in isl))
    else:
        out.append("The stable set in Cr is one interval from 0 in every case: no scanned "
                   f"Courant number up to {top:.1f} above the first growth is stable again.")
    out.append("")

    # The rule of fe = 1 with the deep-water terms on fine grids.
    fine = sorted(d for d in DXH + FIT_DXH if d <= 0.3)
    ratio = np.array([limits[(1.0, True), d] / d for d in fine])
    c = float(ratio.min())
    out += ["Deep-water terms with fe = 1: Cr_max / (dx/h) on the fine grids: " +
            ", ".join(f"{d:g}: {r:.3f}" for d, r in zip(fine, ratio)) + ".", "",
            f"Rule (dx/h <= 0.3): Cr <= {c:.2f} dx/h, that is "
            f"dt <= {c:.2f} dx^2 / (h sqrt(g h)).", ""]

    fig, ax = plt.subplots(figsize=(6.4, 4.4))
    for cfg, name in zip(configs, names):
        y = [min(limits[cfg, d], top) for d in DXH]
        ax.plot(DXH, y, "o-", ms=3, label=name)
    xs = np.linspace(0.04, 0.35, 20)
    ax.plot(xs, c * xs, "k:", label=f"Cr = {c:.2f} dx/h")
    ax.axhline(1.0, color="0.6", lw=0.7)
    ax.set_xscale("log")
    ax.set_yscale("log")
    ax.set_xlabel("dx / h")
    ax.set_ylabel("largest stable Courant number")
    ax.set_title("Stability limit of the 2DH scheme (flat bed)")
    ax.legend(fontsize=8)
    ax.grid(True, which="both", lw=0.3)
    fig.tight_layout()
    fig.savefig(os.path.join(folder, "stability-limit.png"), dpi=110)
    plt.close(fig)

    # Growth per step over (Cr, dx/h) for fe = 1 with the deep-water terms.
    ds = np.geomspace(0.05, 1.0, 8 if QUICK else 18)
    cs = np.linspace(0.05, 2.0, 10 if QUICK else 28)
    gmap = np.array(parallel(_growth_fe1, [(d, cr) for cr in cs for d in ds]))
    gmap = gmap.reshape(len(cs), len(ds))
    fig, ax = plt.subplots(figsize=(6.4, 4.4))
    levels = [1.0 + TOL, 1.001, 1.01, 1.03, 1.1, 1.3, 2.0, 5.0]
    cf = ax.contourf(ds, cs, np.clip(gmap, 0.9, 10.0), levels=[0.9] + levels + [10.0],
                     cmap="magma_r")
    cl = ax.contour(ds, cs, gmap, levels=levels, colors="k", linewidths=0.5)
    ax.clabel(cl, fmt=lambda v: "1" if v < 1.0001 else f"{v:g}", fontsize=7)
    ax.plot(ds[ds <= 0.4], c * ds[ds <= 0.4], "c--", lw=1, label=f"Cr = {c:.2f} dx/h")
    ax.set_xscale("log")
    ax.set_xlabel("dx / h")
    ax.set_ylabel("Courant number")
    ax.set_title("Growth per step, deep-water terms, fe = 1")
    fig.colorbar(cf, ax=ax, label="largest |eigenvalue|")
    ax.legend(fontsize=8, loc="upper left")
    fig.tight_layout()
    fig.savefig(os.path.join(folder, "growth-fe1.png"), dpi=110)
    plt.close(fig)
    return out, limits, c


# ---------------------------------------------------------------- accuracy

def wave_modes(ppw):
    """(a, b) of a wave of ppw points per wavelength along x and along the diagonal."""
    k = 2.0 * np.pi / ppw
    return (k, 0.0), (k / np.sqrt(2.0), k / np.sqrt(2.0))


def fmt_growth(gr):
    return f"1 + {gr - 1.0:.1e}" if gr < 1.001 else f"{gr:.4g}"


def wave_errors(dxh, cr, fe, deep, ppw, eps=0.0):
    """(stable, growth, [(loss %, phase deg) along x, diagonal])."""
    s = case(dxh, cr, fe, deep, eps)
    gr = growth(s)[0]
    errs = []
    for a, b in wave_modes(ppw):
        amp, ph = scheme.errors_per_period(s, np.array(a), np.array(b))
        errs.append((100.0 * float(amp), float(ph)))
    return gr <= 1.0 + TOL, gr, errs


def _wave_errors(job):
    return wave_errors(*job)


def cell_eps(eps, eps_c, dxh, cr):
    """The filter coefficient of a cell: fixed, or by the rule when eps_c is given."""
    return filter_rule(eps_c, dxh, cr) if eps_c else eps


def accuracy_table(title, fe, deep, kh, eps=0.0, eps_c=None):
    out = [f"### {title}", "",
           "loss % / phase deg per period; x: wave along x, diag: along the diagonal" +
           ("; [filter coefficient of the rule]" if eps_c else "") + ".", "",
           "| points/L | dx/h | " + " | ".join(f"Cr {c:g} x | Cr {c:g} diag" for c in CRS) + " |",
           "|---:|---:|" + "---:|---:|" * len(CRS)]
    jobs = []
    for ppw in PPWS:
        dxh = 2.0 * np.pi / (kh * ppw)
        jobs += [(dxh, cr, fe, deep, ppw, cell_eps(eps, eps_c, dxh, cr)) for cr in CRS]
    res = dict(zip(jobs, parallel(_wave_errors, jobs)))
    for ppw in PPWS:
        dxh = 2.0 * np.pi / (kh * ppw)
        cells = []
        for cr in CRS:
            e = cell_eps(eps, eps_c, dxh, cr)
            ok, gr, errs = res[dxh, cr, fe, deep, ppw, e]
            if not ok:
                cells += [f"unstable ({fmt_growth(gr)}/step)", "unstable"]
            else:
                cells += [f"{l:.2f} / {p:.2f}" for l, p in errs]
            if eps_c:
                cells[-2] += f" [{e:.3g}]"
        out.append(f"| {ppw} | {dxh:.3g} | " + " | ".join(cells) + " |")
    out.append("")
    return out


def accuracy_tables():
    out = []
    for fe in (0.0, 0.5, 1.0):
        for kh in (0.3, 1.0, 3.0):
            out += accuracy_table(f"Deep-water terms, fe {fe:g}, kh {kh:g}", fe, True, kh)
    for kh in (0.3, 1.0):
        out += accuracy_table(f"No deep-water terms (fe 1), kh {kh:g}", 1.0, False, kh)
    return out


def accuracy_plots(folder, eps_c):
    import matplotlib
    matplotlib.use("Agg")
    import matplotlib.pyplot as plt

    kh = 1.0
    settings = [(f"fe {fe:g}", fe, True, False) for fe in (0.0, 0.5, 0.75, 1.0)]
    settings += [("fe 1, filter by the rule", 1.0, True, True),
                 ("no deep terms", 1.0, False, False)]

    def panel(name, xs, points, xlabel, title):
        """points(x) -> (dxh, cr, ppw); one figure of two panels (x, diagonal)."""
        jobs, keys = [], []
        for _, fe, deep, filt in settings:
            for x in xs:
                dxh, cr, ppw = points(x)
                e = filter_rule(eps_c, dxh, cr) if filt else 0.0
                jobs.append((dxh, cr, fe, deep, ppw, e))
        res = parallel(_wave_errors, jobs)
        fig, axes = plt.subplots(1, 2, figsize=(10, 4.2), sharey=True)
        for ax, idx, what in zip(axes, (0, 1), ("along x", "diagonal")):
            for m, (label, *_) in enumerate(settings):
                chunk = res[m * len(xs):(m + 1) * len(xs)]
                loss = np.array([max(r[2][idx][0], 1e-4) for r in chunk])
                bad = np.array([not r[0] for r in chunk])
                line, = ax.plot(xs, loss, "o-", ms=3, label=label)
                if bad.any():
                    ax.plot(np.asarray(xs)[bad], loss[bad], "x", color=line.get_color(), ms=9)
            ax.set_xscale("log")
            ax.set_yscale("log")
            ax.set_xlabel(xlabel)
            ax.set_title(f"wave {what}, {title}")
            ax.grid(True, which="both", lw=0.3)
            ax.axhline(1.0, color="k", lw=0.7)
        axes[0].set_ylabel("amplitude loss per period, %")
        axes[1].legend(fontsize=8)
        fig.text(0.5, 0.005, "x: setting unstable (some mode grows)", ha="center", fontsize=8)
        fig.tight_layout()
        fig.savefig(os.path.join(folder, name), dpi=110)
        plt.close(fig)

    ppws = [8, 10, 12, 15, 20, 25, 30, 40, 50, 60]
    panel("loss-vs-ppw.png", ppws, lambda p: (2 * np.pi / (kh * p), 0.5, p),
          "points per wavelength", "kh 1, Cr 0.5")
    crs = [0.1, 0.2, 0.3, 0.5, 0.7, 1.0, 1.5, 2.0]
    panel("loss-vs-courant.png", crs, lambda c: (2 * np.pi / (kh * 20), c, 20),
          "Courant number", "kh 1, 20 points per wavelength")


# ---------------------------------------------------------------- the filter

def filter_range(dxh, cr, fe=1.0, deep=True):
    """The filter coefficients that make the setting stable, as (lowest,
    highest). All levels are filtered alike, so the filter multiplies the
    amplification matrix of a mode by f = 1 - eps S, S = sin^4(a/2) +
    sin^4(b/2); a mode of radius r stays bounded for (1 - 1/r)/S <= eps <=
    (1 + 1/r)/S."""
    s = case(dxh, cr, fe, deep)

    def S(a, b):
        return np.sin(a / 2) ** 4 + np.sin(b / 2) ** 4

    def need(a, b):
        r = scheme.spectral_radius(s, a, b)
        return np.where(r > 1.0 + TOL, (1.0 - 1.0 / r) / np.maximum(S(a, b), 1e-300), 0.0)

    def room(a, b):
        r = scheme.spectral_radius(s, a, b)
        return -(1.0 + 1.0 / r) / S(a, b)

    lo = maximise(need)[0]
    hi = -maximise(room)[0]
    return lo, hi


FILTER_DXH = (0.05, 0.1, 0.2, 0.3, 0.5, 0.7, 1.0) if not QUICK else (0.05, 0.2, 1.0)
FILTER_CR = (0.25, 0.5, 0.75, 1.0, 1.25, 1.5)
MARGIN = 1.25  # the rule's coefficient over the smallest stable one


def _filter_range(job):
    return filter_range(*job)


def filter_rule(eps_c, dxh, cr):
    """The coefficient of the rule: MARGIN times the fitted need, eps_c Cr^3 h/dx."""
    return MARGIN * eps_c * cr ** 3 / dxh


def filter_tables():
    out = []
    need = {}
    for deep, title in ((True, "fe 1 with the deep-water terms"),
                        (False, "no deep-water terms (fe 1)")):
        jobs = [(d, cr, 1.0, deep) for d in FILTER_DXH for cr in FILTER_CR]
        res = dict(zip(jobs, parallel(_filter_range, jobs)))
        out += [f"## Grid-scale filter: the smallest coefficient, {title}", "",
                "`-`: stable without it; `none`: no coefficient is; in brackets the "
                "largest coefficient that is still stable.", "",
                "| dx/h | " + " | ".join(f"Cr {c:g}" for c in FILTER_CR) + " |",
                "|---:|" + "---:|" * len(FILTER_CR)]
        for d in FILTER_DXH:
            cells = []
            for cr in FILTER_CR:
                lo, hi = res[d, cr, 1.0, deep]
                need[deep, d, cr] = (max(lo, 0.0), hi)
                if lo <= 0.0:
                    cells.append("-")
                elif lo > hi:
                    cells.append("none")
                else:
                    cells.append(f"{lo:.3g} ({hi:.2f})")
            out.append(f"| {d:g} | " + " | ".join(cells) + " |")
        out.append("")
    # The need of fe = 1 with the deep-water terms against Cr^3 h/dx.
    ratios = [lo * d / cr ** 3 for (deep, d, cr), (lo, hi) in need.items()
              if deep and cr <= 1.0 and lo > 0.0 and lo <= hi]
    eps_c = float(np.max(ratios))
    out += [f"With the deep-water terms and Cr <= 1 the smallest coefficient follows "
            f"eps = c Cr^3 h/dx, c from {np.min(ratios):.4f} to {eps_c:.4f} over the table "
            f"(it grows faster above Cr 1 on coarse grids); the rule takes "
            f"eps = {MARGIN:g} x {eps_c:.4f} Cr^3 h/dx = {MARGIN * eps_c:.3f} Cr^3 h/dx.", ""]
    nodeep = [(d, cr) for (deep, d, cr), (lo, hi) in need.items()
              if not deep and lo > 0.0 and filter_rule(eps_c, d, cr) < lo]
    out += ["Without the deep-water terms the same rule is " +
            ("enough everywhere in the table." if not nodeep else
             "too small at (dx/h, Cr) " + ", ".join(f"({d:g}, {cr:g})" for d, cr in nodeep) + "."),
            ""]
    worst = max(lo for (deep, d, cr), (lo, hi) in need.items() if deep and cr <= 1.0)
    out += [f"A single coefficient for every dx/h >= {min(FILTER_DXH):g} at Cr <= 1: "
            f"{worst:.3f} or more.", ""]

    # The cost: the loss a period of a wave from the filter and the scheme together.
    out += ["### Loss per period with a fixed filter coefficient (fe 1, deep-water terms)", "",
            "loss % / phase deg per period of a wave along x and along the diagonal.", "",
            "| filter | kh | points/L | dx/h | " +
            " | ".join(f"Cr {c:g} x | Cr {c:g} diag" for c in (0.25, 0.5, 1.0)) + " |",
            "|---:|---:|---:|---:|" + "---:|---:|" * 3]
    for e in (0.05, 0.1, 0.2, 0.4):
        for kh in (1.0, 3.0):
            for ppw in (20, 40):
                dxh = 2.0 * np.pi / (kh * ppw)
                cells = []
                for cr in (0.25, 0.5, 1.0):
                    ok, gr, errs = wave_errors(dxh, cr, 1.0, True, ppw, e)
                    if not ok:
                        cells += [f"unstable ({fmt_growth(gr)}/step)", "unstable"]
                    else:
                        cells += [f"{l:.2f} / {p:.2f}" for l, p in errs]
                out.append(f"| {e:g} | {kh:g} | {ppw} | {dxh:.3g} | " + " | ".join(cells) + " |")
    out.append("")
    return out, eps_c


# ---------------------------------------------------------------- a case

def user_case(h, dx, dt, periods, eps_c):
    """The settings of one model: growth and the errors of waves of the periods."""
    dxh, cr = dx / h, np.sqrt(G * h) * dt / dx
    out = [f"## Case h {h:g} m, dx {dx:g} m, dt {dt:g} s (dx/h {dxh:.3f}, Cr {cr:.3f})", "",
           "| setting | dt s | Cr | growth/step | T s | points/L | kh | "
           "loss % x | loss % diag | phase deg diag |", "|---|---:|---:|---:|---:|---:|---:|---:|---:|---:|"]
    lim1 = stable_courant(dxh, 1.0, True)[0]
    dt1 = 0.98 * lim1 * dx / np.sqrt(G * h)

    def rule(step):  # the rule's coefficient, up to the next 0.05
        return float(np.ceil(filter_rule(eps_c, dxh, np.sqrt(G * h) * step / dx) * 20) / 20)

    for name, fe, e, step in [("fe 1", 1.0, 0.0, dt), ("fe 0", 0.0, 0.0, dt),
                              ("fe 0.5", 0.5, 0.0, dt), ("fe 0.75", 0.75, 0.0, dt),
                              (f"fe 1, filter {rule(dt):g}", 1.0, rule(dt), dt),
                              (f"fe 1, filter {rule(dt / 2):g}", 1.0, rule(dt / 2), dt / 2),
                              ("fe 1, short step", 1.0, 0.0, dt1)]:
        c = np.sqrt(G * h) * step / dx
        for T in periods:
            # the wavelength of the equations' dispersion relation, B = 1/15
            s = case(dxh, c, fe, True, e)
            k = 2 * np.pi / (T * np.sqrt(G * h))
            for _ in range(60):
                k = 2 * np.pi / T / (scheme.omega_equations(k, h, s.B) / k)
            ppw = 2 * np.pi / (k * dx)
            ok, gr, errs = wave_errors(dxh, c, fe, True, ppw, e)
            cells = ([f"{errs[0][0]:.2f}", f"{errs[1][0]:.2f}", f"{errs[1][1]:.2f}"]
                     if ok else ["unstable"] * 3)
            out.append(f"| {name} | {step:.4g} | {c:.3f} | {gr:.4f} | {T:g} | {ppw:.1f} | "
                       f"{k * h:.2f} | " + " | ".join(cells) + " |")
    out.append("")
    return out


def main():
    args = [a for a in sys.argv[1:] if not a.startswith("--")]
    if len(args) != 1:
        sys.exit(__doc__)
    folder = args[0]
    os.makedirs(folder, exist_ok=True)
    sym = check_symmetry()
    if sym > 1e-10:
        sys.exit(f"the spectral radius is not symmetric in the modes ({sym:g}): "
                 "the scan over a >= b > 0 does not cover the grid")
    out = [f"<!-- tables.py: modes {N_MODES} x {N_MODES} with local refinement; "
           f"symmetry of the radius checked to {sym:.1e} -->", ""]
    lines, limits, c = stability_maps(folder)
    out += lines
    flines, eps_c = filter_tables()
    out += flines
    out += ["## Accuracy without the filter", ""] + accuracy_tables()
    out += ["## Accuracy with the filter of the rule", ""]
    for kh in (1.0, 3.0):
        out += accuracy_table(f"Deep-water terms, fe 1, kh {kh:g}, filter by the rule",
                              1.0, True, kh, eps_c=eps_c)
    for kh in (0.3, 1.0):
        out += accuracy_table(f"No deep-water terms, kh {kh:g}, filter by the rule",
                              1.0, False, kh, eps_c=eps_c)
    accuracy_plots(folder, eps_c)
    out += user_case(0.45, 0.05, 0.02, (0.8, 1.2, 2.0), eps_c)
    print("\n".join(out))


if __name__ == "__main__":
    main()
