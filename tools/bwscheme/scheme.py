"""The linearised 2DH scheme of bw as an amplification matrix of one Fourier mode.

Flat bed of still water depth h, porosity 1, no slot, no convection, friction,
rollers, eddy viscosity or sources, and a surface small against h: the sweeps
are then linear with constant coefficients, and a mode
    f(j, k) = f^ exp(i (a j + b k)),  a = kx dx,  b = ky dy
of every field is carried into the same mode by one time step. The step below
follows the time loop and the assembly of the sweeps term by term (the
extrapolated surface, the shift of the levels, the momentum and continuity rows
of both sweeps, the time differences of the flux across and their
extrapolation); the line systems of a sweep reduce to a 2 x 2 system for the
new surface and flux of the mode.

Linearised, the two sweep families are one scheme: the convective and side
terms in which they differ vanish about a state at rest, and the elimination
of the neighbouring fluxes in the central double sweep is the same algebra as
the reduction of the upwind sweeps.

The state at the start of step n (m = n - 1) has seven components:
    0 xi t(m)   1 xiPrev t(m-1/2)   2 P t(m)   3 PPrev t(m-1)
    4 Q t(m+1/2)   5 QPrev t(m-1/2)   6 qxyt = Q t(m-1/2) - Q t(m-3/2)
(pxyt at the start of a step is overwritten before it is read.)
"""

import numpy as np

G = float(np.float32(9.81))
THIRD_F32 = float(np.float32(0.33333334))
NSTATE = 7


class Scheme:
    """The settings of a case in the model's own terms."""

    def __init__(self, h, dx, dy, dt, fe, deep, B=None, filt=0.0):
        self.h, self.dx, self.dy, self.dt = float(h), float(dx), float(dy), float(dt)
        self.filt = float(filt)  # Grid_scale_filter
        self.fe = float(fe)
        self.deep = bool(deep)
        if B is None:
            B = float(np.float32(1.0 / 15.0)) if deep else 0.0
        self.B = float(B) if deep else 0.0
        self.B3 = self.B + 1.0 / 3.0 if deep else THIRD_F32
        if not deep:
            self.fe = 1.0  # the setup forces the factor without the deep-water terms


def _sweep(s, X, P, Pp, Pold_other, Pnew_other, diff_other, Xext, ex, ey, ds, dn):
    """One sweep along its own axis (x: ex = exp(ia); for the y-sweep the
    roles are exchanged by the caller). X is the surface before the sweep,
    P the flux of the sweep's axis at the old level; Pnew_other, Pold_other
    and diff_other are the newer and older flux across and the older time
    difference of it; Xext the extrapolated surface. Returns the new surface
    and flux."""
    h, dt, g = s.h, s.dt, G
    E1, E2 = 1.0 + s.fe * 0.5, s.fe * 0.5
    Gd = g * dt * h / (6.0 * ds * ds) + 1.0 / (12.0 * dt) - s.B3 * h * h / (ds * ds * dt)
    cross = -g * dt * h / (6.0 * ds * dn) + h * h * s.B3 / (ds * dn * dt)
    # Momentum row of face j: a P(j-1) + b P(j) + c P(j+1) + e X(j) + f X(j+1) = r
    f0 = h * g / ds
    a, b, c, e, f = Gd, 1.0 / dt - 2.0 * Gd, Gd, -f0, f0
    # t1 - t2 - t3 + t4 of the corners of the face: the extrapolated time
    # difference of the flux across, differenced along and across.
    T = (Pnew_other - Pold_other) * E1 - diff_other * E2
    corners = T * (ex - 1.0) * (1.0 - 1.0 / ey)
    second = ex - 2.0 + 1.0 / ex  # P(j+1) - 2P(j) + P(j-1)
    r = P / dt + Gd * second * P + cross * corners
    if s.deep:
        xx0 = (ex - 2.0 + 1.0 / ex) / ds**2
        yy0 = (ey - 2.0 + 1.0 / ey) / dn**2
        xxx = (ex - 1.0) * xx0 / ds
        xyy = (ex - 1.0) * yy0 / ds
        r = r + s.B * g * h**3 * (xxx + xyy) * Xext
    # Continuity row of point j: P(j) - P(j-1) + Bc X(j) = Rc, over dt/2, times 2 ds.
    Bc = 4.0 * ds / dt
    Rc = Bc * X - (1.0 - 1.0 / ex) * P - (Pnew_other + Pold_other) * (1.0 - 1.0 / ey) * ds / dn
    # Solve [[1 - 1/ex, Bc], [a/ex + b + c ex, e + f ex]] [P', X'] = [Rc, r].
    m11, m12 = 1.0 - 1.0 / ex, Bc
    m21, m22 = a / ex + b + c * ex, e + f * ex
    det = m11 * m22 - m12 * m21
    Pn = (Rc * m22 - m12 * r) / det
    Xn = (m11 * r - m21 * Rc) / det
    return Xn, Pn


def step(s, state, ex, ey):
    """One time step of the linearised scheme on the mode (ex, ey) = (e^ia, e^ib)."""
    X, Xp, P, Pp, Q, Qp, qd = (state[..., i] for i in range(NSTATE))
    dt, dx, dy = s.dt, s.dx, s.dy
    # The x half: surface at t(m+1/2) from xiPrev and the fluxes at t(m-1/8).
    dPx = (P * 0.875 + Pp * 0.125) * (1.0 - 1.0 / ex)
    dQy = (Q * 0.375 + Qp * 0.625) * (1.0 - 1.0 / ey)
    XextX = Xp - dt * (dPx / dx + dQy / dy)
    # The shift: xiPrev := xi. The x-sweep: pxyt := P - PPrev, PPrev := P.
    pd = P - Pp
    X1, P1 = _sweep(s, X, P, Pp, Qp, Q, qd, XextX, ex, ey, dx, dy)
    # The y half: surface at t(m+1) from xiPrev = xi t(m).
    dQy = (Q * 0.875 + Qp * 0.125) * (1.0 - 1.0 / ey)
    dPx = (P1 * 0.375 + P * 0.625) * (1.0 - 1.0 / ex)
    XextY = X - dt * (dPx / dx + dQy / dy)
    # The y-sweep: qxyt := Q - QPrev, QPrev := Q; the flux across is P
    # (new P1, old P, difference pd).
    sy = Scheme.__new__(Scheme)
    sy.__dict__.update(s.__dict__)
    X2, Q2 = _sweep(sy, X1, Q, Qp, P, P1, pd, XextY, ey, ex, dy, dx)
    out = np.stack([X2, X1, P1, P, Q2, Q, Q - Qp], axis=-1)
    if s.filt > 0.0:
        # The grid-scale filter at the end of the step: every stored level
        # minus filt/16 times its fourth differences along x and along y.
        fx, fy = (ex - 2.0 + 1.0 / ex) ** 2, (ey - 2.0 + 1.0 / ey) ** 2
        out = out * (1.0 - s.filt / 16.0 * (fx + fy))[..., None]
    return out


def amplification(s, a, b):
    """The amplification matrices of the modes (a, b), shape a.shape + (7, 7)."""
    a = np.asarray(a, dtype=float)
    b = np.asarray(b, dtype=float)
    ex, ey = np.exp(1j * a), np.exp(1j * b)
    shape = np.broadcast(ex, ey).shape
    ex = np.broadcast_to(ex, shape)[..., None]
    ey = np.broadcast_to(ey, shape)[..., None]
    eye = np.broadcast_to(np.eye(NSTATE, dtype=complex), shape + (NSTATE, NSTATE))
    # Column i of the matrix is the step of unit state i.
    cols = step(s, eye, ex, ey)  # (..., i, out)
    return np.swapaxes(cols, -1, -2)


def spectral_radius(s, a, b):
    return np.abs(np.linalg.eigvals(amplification(s, a, b))).max(axis=-1)


def omega_equations(k, h, B):
    """w of the equations' own dispersion relation, B = 0 without the deep-water terms."""
    kh = k * h
    return np.sqrt(G * h * k * k * (1.0 + B * kh * kh) / (1.0 + (B + 1.0 / 3.0) * kh * kh))


def physical_mode(s, a, b):
    """The eigenvalue of the wave itself for the mode (a, b): the one nearest
    exp(-i w dt) of the equations. Returns (lambda, w exact)."""
    k = np.hypot(a / s.dx, b / s.dy)
    w = omega_equations(k, s.h, s.B)
    lam = np.linalg.eigvals(amplification(s, a, b))
    target = np.exp(-1j * w * s.dt)
    pick = np.argmin(np.abs(lam - target[..., None]), axis=-1)
    return np.take_along_axis(lam, pick[..., None], axis=-1)[..., 0], w


def errors_per_period(s, a, b):
    """Amplitude error (fraction lost, negative = growth) and phase error
    (degrees, positive = the numerical wave is slow) over one period of the
    equations' wave of the mode (a, b)."""
    lam, w = physical_mode(s, a, b)
    steps = 2.0 * np.pi / (w * s.dt)
    amp = 1.0 - np.abs(lam) ** steps
    wn = -np.angle(lam) / s.dt
    phase = 360.0 * (1.0 - wn / w)
    return amp, phase


def max_growth(s, n=48, axes="both"):
    """The largest spectral radius over modes a, b in (0, pi], and the mode.
    axes "x": modes along x only (b -> a vanishing), as in a channel of one row."""
    t = np.linspace(np.pi / n, np.pi, n)
    if axes == "x":
        a, b = t, np.full_like(t, 1e-9)
    else:
        a, b = np.meshgrid(t, t, indexing="ij")
    r = spectral_radius(s, a, b)
    i = np.unravel_index(np.argmax(r), r.shape)
    return float(r[i]), float(np.atleast_1d(a)[i] if axes == "x" else a[i]), float(
        np.atleast_1d(b)[i] if axes == "x" else b[i])


def stable_dt(h, dx, fe, deep, dt_hi, tol=1e-9, n=48):
    """The largest step with no mode growing, by bisection below dt_hi
    (the region in dt is taken as one interval from 0)."""
    lo, hi = 0.0, dt_hi
    if max_growth(Scheme(h, dx, dx, dt_hi, fe, deep), n)[0] <= 1.0 + tol:
        return dt_hi
    for _ in range(40):
        mid = 0.5 * (lo + hi)
        if max_growth(Scheme(h, dx, dx, mid, fe, deep), n)[0] <= 1.0 + tol:
            lo = mid
        else:
            hi = mid
    return lo
