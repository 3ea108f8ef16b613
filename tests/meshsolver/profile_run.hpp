// A 1DH model run in the test's own process: the engine writes the mesh
// solver's file of a model file (a run of one step), and the test sets the
// mesh solver up from that file and steps it itself, so that it can look at
// the surface of every node after every step.
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "equations/time_integrators.hpp"
#include "input/kvt_current.hpp"
#include "mesh/mesh.hpp"
#include "mesh/space_discretization.hpp"
#include "meshsolver/boundary_bw.hpp"
#include "meshsolver/bw_model.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "platform/kvt/kvt.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace bwtest {

constexpr double kTwoPi = 6.283185307179586;

// Linear theory of the equations: the wave number of period T in depth d.
inline double WaveNumberOf(double T, double d, double B) {
    const double omega = kTwoPi / T;
    double k = omega / std::sqrt(9.81 * d);
    for (int i = 0; i < 100; ++i) {  // fixed point on k = omega / c(k)
        const double kd2 = k * d * k * d;
        k = omega / std::sqrt(9.81 * d * (1.0 + B * kd2) / (1.0 + (B + 1.0 / 3.0) * kd2));
    }
    return k;
}

// The 1D data file of a profile: positions dx apart, one item of bed levels.
inline void WriteProfile(const std::string& path, double dx, const std::vector<float>& values,
                         const std::string& name = "Bathymetry") {
    WriteLineFile(path, "2004-01-01 00:00:00", 1.0, static_cast<float>(dx), {{values}}, 0, {name});
}

// The model `dir`/m.bw over the profile bed.xol1: the engine runs it for
// one step, which leaves the mesh solver's file, and the mesh solver is set
// up from that file here. Its log lines go to the captured output.
inline void SetUpProfileRun(const TempDir& dir, double dt,
                            const std::map<std::string, std::string>& sections) {
    std::map<std::string, std::string> s = ProfileSections(sections);
    std::ostringstream period;
    period << "Time_step_count = 1\nTime_step_interval = " << dt
           << "\nWarm_up_period = 0\nStart_time = 2004, 1, 1, 0, 0, 0\n";
    s["Simulation_Period"] = period.str();
    WriteFile(dir / "m.bw", ModelText("bed.xol1", s));
    const RunResult r = RunProgram({BuiltProgram("bw"), "m.bw"}, dir.path.string());
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;

    testing::internal::CaptureStdout();
    KvtHandle file = KvtOpenFile(dir / "m.bw_FEM.kvt", false);
    KvtUseFile(file);
    KvtOpenTarget("MeshSolverBW");
    int32_t dimensions = 1;
    KvtOpenSection("BASIC_MODEL_PARAMETERS");
    KvtGetInteger("number_of_dimensions", dimensions);
    KvtCloseSection();
    gMeshRun = MeshRunState{};
    ResetMeshModel();
    ResetBwModel();
    SetupTimeAxis();
    SetupSpaceDiscretization(dimensions);
    SetupBW(dimensions);
    kvtClose(&file);
    testing::internal::GetCapturedStdout();
    UpdateForcingsBW(0.0, gBwModel);
}

// Steps from..to of the set-up run; after each step see(step). False at a
// blow-up.
template <class See>
bool StepProfileRun(int32_t from, int32_t to, double dt, See see) {
    for (int32_t s = from; s <= to; ++s) {
        int32_t status = 0;
        SolveTimeStepBW(s * dt, gBwModel, status);
        if (status != 0) return false;
        see(s);
    }
    return true;
}

// Amplitude and phase of A cos(w t) + B sin(w t) + C fitted by least squares
// to a series over whole periods (the mean taken out first).
struct Fit {
    double amplitude = 0.0, mean = 0.0;
};
inline Fit FitSine(const std::vector<double>& v, double dt, double omega) {
    Fit f;
    for (double x : v) f.mean += x;
    f.mean /= static_cast<double>(v.size());
    double a = 0.0, b = 0.0;
    for (size_t n = 0; n < v.size(); ++n) {
        a += (v[n] - f.mean) * std::cos(omega * n * dt);
        b += (v[n] - f.mean) * std::sin(omega * n * dt);
    }
    f.amplitude = 2.0 * std::hypot(a, b) / static_cast<double>(v.size());
    return f;
}

}  // namespace bwtest
