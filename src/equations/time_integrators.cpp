#include "equations/time_integrators.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <new>
#include <stdexcept>
#include <string>

#include "input/kvt_current.hpp"
#include "meshsolver/boundary_bw.hpp"
#include "meshsolver/equations_bw.hpp"
#include "meshsolver/processes_bw.hpp"
#include "run/messages.hpp"

namespace {

// The coefficient tables of ABM are kept as 32-bit values, widened.
constexpr double kAb2[3] = {1.9166666269302368, -1.3333333730697632, 0.4166666567325592};
constexpr double kAm2Newest = 0.375;
constexpr double kAm2[3] = {0.7916666865348816, -0.2083333283662796, 0.0416666679084301};
// The rate of the predicted state from backward differences.
constexpr double kBdf2[4] = {11.0 / 6.0, 3.0, 1.5, 1.0 / 3.0};

void Allocate(std::vector<double>& v, size_t n, const char* message) {
    try {
        v.assign(n, 0.0);
    } catch (const std::bad_alloc&) {
        StopRun(message);
    } catch (const std::length_error&) {
        StopRun(message);
    }
}

void StartTask(BwModel& model, int task) {
    if (model.Timing.taskCount >= task) StartTiming(model.Timing, task);
}
void StopTask(BwModel& model, int task) {
    if (model.Timing.taskCount >= task) StopTiming(model.Timing, task);
}

// "t = ", t in F12.2, " ni = ", k in I4, " : ", the error in E12.4
// (0.dddd and a signed two-digit exponent).
void PrintIteration(double t, int32_t k, double error) {
    char mantissa[32];
    int exponent = 0;
    double m = 0.0;
    if (error != 0.0) {
        exponent = static_cast<int>(std::floor(std::log10(std::abs(error)))) + 1;
        m = error / std::pow(10.0, exponent);
        if (std::abs(m) >= 0.99995) {  // rounding to four digits reached 1
            m /= 10.0;
            ++exponent;
        }
    }
    std::snprintf(mantissa, sizeof mantissa, "%.4f", m);
    const std::string digits = mantissa;
    char exp[16];
    std::snprintf(exp, sizeof exp, "E%c%02d", exponent < 0 ? '-' : '+', std::abs(exponent));
    std::string field = digits + exp;
    if (field.size() < 12) field.insert(0, 12 - field.size(), ' ');
    char line[96];
    std::snprintf(line, sizeof line, "t = %12.2f ni = %4d : %s", t, k, field.c_str());
    WriteLine(line);
}

}  // namespace

void SetupDaesBW(BwModel& model) {
    DaeState& dae = model.Dae;
    dae.StateSize = model.StateSize;
    const size_t n = static_cast<size_t>(model.StateSize) + 1;
    Allocate(dae.y, n, "SetupDaesBW: Out of memory");
    Allocate(dae.ydot, n, "SetupDaesBW: Out of memory");
    const int32_t nu = model.ElevationStart - 1;
    const int32_t ne = model.StateSize - nu;
    if (static_cast<int32_t>(model.Flux.size()) > nu)
        std::copy(model.Flux.begin() + 1, model.Flux.begin() + 1 + nu, dae.y.begin() + 1);
    if (static_cast<int32_t>(model.Elevation.size()) > ne)
        std::copy(model.Elevation.begin() + 1, model.Elevation.begin() + 1 + ne,
                  dae.y.begin() + model.ElevationStart);

    KvtOpenSection("DIFFERENTIAL_ALGEBRAIC_EQUATION_SYSTEM");
    dae.DaeMethod = 2;
    KvtGetInteger("method", dae.DaeMethod);
    SetupDaes(model);
    KvtCloseSection();
}

void SetupDaes(BwModel& model) {
    switch (model.Dae.DaeMethod) {
        case 1:
            SetupTG3(model);
            break;
        case 2:
            SetupABM(model);
            break;
        default:
            StopRun("SetupDaes: wrong time integration method");
    }
}

void SetupTG3(BwModel& model) {
    model.Dae.Tg3 = Tg3State{};
    Allocate(model.Dae.Tg3.y0, static_cast<size_t>(model.Dae.StateSize) + 1,
             "SetupTG3: Out of memory");
}

void SetupABM(BwModel& model) {
    AbmState& abm = model.Dae.Abm;
    abm = AbmState{};
    abm.PrintUnit = gMessages.logUnit;
    KvtGetInteger("max_iterations", abm.MaxIterations);
    KvtGetDouble("absolute_tolerance", abm.Tolerance);
    KvtGetDouble("relaxation_factor", abm.Relaxation);
    KvtGetInteger("type_of_print", abm.PrintType);
    KvtGetInteger("print_unit", abm.PrintUnit);
    const size_t n = static_cast<size_t>(model.Dae.StateSize) + 1;
    for (int c = 0; c < 4; ++c) {
        Allocate(abm.YHistory[c], n, "SetupABM: Out of memory");
        Allocate(abm.YdotHistory[c], n, "SetupABM: Out of memory");
    }
    Allocate(abm.YWork, n, "SetupABM: Out of memory");
}

void SolveTimeStepBW(double t, BwModel& model, int32_t& status) {
    StartTask(model, 6);
    StartTask(model, 1);
    UpdateForcingsBW(t, model);
    StopTask(model, 1);

    DaeState& dae = model.Dae;
    switch (dae.DaeMethod) {
        case 1:
            TG3(model, t, model.TimeStep, dae.y, dae.ydot, CalcRhsBW, UpdateStageBW, status);
            break;
        case 2:
            ABM(model, t, model.TimeStep, dae.y, dae.ydot, CalcRhsBW, UpdateStageBW, status);
            break;
        default:
            StopRun("SetupDaes: wrong time integration method");
    }
    // The rollers of the finished step become the old ones: the next step's
    // angles relax from them.
    if (model.Breaking.type > 0) SaveBreakingBW(model.Breaking);
    StopTask(model, 6);
}

void TG3(BwModel& model, double t, double h, std::vector<double>& y, std::vector<double>& ydot,
         DaeRhsFunction f, DaeStageFunction g, int32_t& status) {
    Tg3State& s = model.Dae.Tg3;
    const size_t n = static_cast<size_t>(model.Dae.StateSize) + 1;
    const double t0 = t - h;
    s.stepCount += 1;
    s.status = 0;
    std::copy(y.begin(), y.begin() + n, s.y0.begin());

    // Each stage starts again from y0 with the rate of the stage before.
    const double stageStep[3] = {h / 3.0, h / 2.0, h};
    const double rateTime[3] = {t0, t0 + h / 3.0, t0 + h / 2.0};
    for (int stage = 0; stage < 3; ++stage) {
        const double c = stageStep[stage];
        f(rateTime[stage], c, y, ydot, model, s.status);
        if (s.status != 0) break;
        for (size_t i = 1; i < n; ++i) y[i] = s.y0[i] + c * ydot[i];
        g(t0 + c, c, y, model, s.status);
        s.lastStageTime = t0 + c;
        if (s.status != 0) break;
    }
    status = s.status != 0 ? -1 : 0;
}

void ABM(BwModel& model, double t, double h, std::vector<double>& y, std::vector<double>& ydot,
         DaeRhsFunction f, DaeStageFunction g, int32_t& status) {
    AbmState& a = model.Dae.Abm;
    const size_t n = static_cast<size_t>(model.Dae.StateSize) + 1;
    std::vector<double>* Y = a.YHistory;
    std::vector<double>* D = a.YdotHistory;
    a.StepCount += 1;
    a.Order = a.StepCount < 4 ? 1 : 2;
    status = 0;
    int32_t st = 0;

    if (a.StepCount == 1) {
        f(t - h, h, y, ydot, model, st);
        std::copy(y.begin(), y.begin() + n, Y[0].begin());
        std::copy(ydot.begin(), ydot.begin() + n, D[0].begin());
    }
    // One column back: the oldest column becomes the free one.
    for (int c = 3; c > 0; --c) {
        Y[c].swap(Y[c - 1]);
        D[c].swap(D[c - 1]);
    }
    // Predictor.
    if (a.Order == 1) {
        for (size_t i = 1; i < n; ++i) y[i] = Y[1][i] + h * D[1][i];
        for (size_t i = 1; i < n; ++i) ydot[i] = (y[i] - Y[1][i]) / h;
    } else {
        for (size_t i = 1; i < n; ++i)
            y[i] = Y[1][i] + h * (kAb2[0] * D[1][i] + kAb2[1] * D[2][i] + kAb2[2] * D[3][i]);
        for (size_t i = 1; i < n; ++i)
            ydot[i] =
                (kBdf2[0] * y[i] - kBdf2[1] * Y[1][i] + kBdf2[2] * Y[2][i] - kBdf2[3] * Y[3][i]) /
                h;
    }
    g(t, h, y, model, st);
    if (st < 0) {
        status = -1;
        return;
    }

    double error = 0.0, previous = 0.0;
    int32_t k = 1;
    for (; k <= a.MaxIterations; ++k) {
        f(t, h, y, ydot, model, st);
        std::copy(y.begin(), y.begin() + n, a.YWork.begin());
        if (a.Order == 1) {
            for (size_t i = 1; i < n; ++i) y[i] = Y[1][i] + h * (0.5 * ydot[i] + 0.5 * D[1][i]);
        } else {
            for (size_t i = 1; i < n; ++i)
                y[i] = Y[1][i] + h * (kAm2Newest * ydot[i] + kAm2[0] * D[1][i] + kAm2[1] * D[2][i] +
                                      kAm2[2] * D[3][i]);
        }
        if (a.Relaxation < 1.0)
            for (size_t i = 1; i < n; ++i)
                y[i] = a.Relaxation * y[i] + (1.0 - a.Relaxation) * a.YWork[i];
        g(t, h, y, model, st);
        if (st < 0) {
            status = -1;
            return;
        }
        double sum = 0.0;
        for (size_t i = 1; i < n; ++i) sum += std::abs(y[i] - a.YWork[i]);
        error = n > 1 ? sum / static_cast<double>(n - 1) : 0.0;
        if (a.PrintType > 1) PrintIteration(t, k, error);
        if (error < a.Tolerance) break;
        if (k > 1 && error > previous) a.Divergences += 1;
        if (k == a.MaxIterations) a.FailedSteps += 1;
        previous = error;
    }
    const int32_t last = std::min(k, a.MaxIterations);
    if (a.PrintType > 0 || 2 * last >= a.MaxIterations) PrintIteration(t, last, error);

    f(t, h, y, ydot, model, st);
    std::copy(y.begin(), y.begin() + n, Y[0].begin());
    std::copy(ydot.begin(), ydot.begin() + n, D[0].begin());
}
