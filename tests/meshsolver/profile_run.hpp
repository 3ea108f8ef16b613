// 1DH model files for the tests: the linear theory of the equations, the
// profile and the sections of a model file, the engine run on it, and the
// mesh solver run in the test's own process on the file the engine wrote,
// either whole (RunInProcess) or step by step (SetUpProfileRun and
// StepProfileRun), so that the test can look at every node after every step.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
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
#include "run/timing.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace bwtest {

using Sections = std::map<std::string, std::string>;
constexpr double kTwoPi = 6.283185307179586;

// Linear theory of the equations: omega^2 = g d k^2 (1 + B (kd)^2) / (1 + (B + 1/3)(kd)^2),
// the wave number of period T in depth d, and the group velocity.
inline double TheoryOmega(double k, double d, double B) {
    const double kd2 = (k * d) * (k * d);
    return std::sqrt(9.81 * d * k * k * (1.0 + B * kd2) / (1.0 + (B + 1.0 / 3.0) * kd2));
}
inline double WaveNumberOf(double T, double d, double B) {
    double k = kTwoPi / T / std::sqrt(9.81 * d);
    for (int i = 0; i < 100; ++i) k *= kTwoPi / T / TheoryOmega(k, d, B);  // fixed point
    return k;
}
inline double GroupVelocity(double T, double d, double B) {
    const double k = WaveNumberOf(T, d, B), dk = 1e-6 * k;
    return (TheoryOmega(k + dk, d, B) - TheoryOmega(k - dk, d, B)) / (2.0 * dk);
}

// The 1D data file of a profile: positions dx apart, one item.
inline void WriteProfile(const std::string& path, double dx, const std::vector<float>& values,
                         const std::string& name = "Bathymetry") {
    WriteLineFile(path, "2004-01-01 00:00:00", 1.0, static_cast<float>(dx), {{values}}, 0, {name});
}

// Sections of a model file: the run period, output records (a point
// series at the grid indices `where` in an .xol0 file, a line over them in
// an .xol1 file, the steps and items written), boundaries.
inline std::string Period(int steps, double dt, int warmUp = 0) {
    std::ostringstream s;
    s << "Time_step_count = " << steps << "\nTime_step_interval = " << dt
      << "\nWarm_up_period = " << warmUp << "\nStart_time = 2004, 1, 1, 0, 0, 0\n";
    return s.str();
}
inline std::string Record(int n, const std::string& body) {
    return "OUTPUT_SPEC_DATA_" + std::to_string(n) + " {\n" + body + "}\n";
}
inline std::string One(const std::string& body) {
    return "Number_Of_Records = 1\n" + Record(1, body);
}
inline std::string Places(const std::string& file, const std::string& where, int points) {
    const bool line = file.find(".xol1") != std::string::npos;
    return "File_Name = file(\"" + file + "\")\n" + (line ? "No_of_points = " : "NO_OF_POINTS = ") +
           std::to_string(points) + "\nX_Range_And_Interval = " + where + "\n";
}
inline std::string Span(int first, int last, int interval, const std::string& items) {
    const int count = static_cast<int>(std::count(items.begin(), items.end(), ',')) + 1;
    return "First_Time_step = " + std::to_string(first) +
           "\nLast_Time_step = " + std::to_string(last) +
           "\nTime_Step_Interval = " + std::to_string(interval) +
           "\nNumber_Of_Items = " + std::to_string(count) + "\nItem_Numbers = " + items + "\n";
}
// A boundary at grid point j of the formulation (0 level, 1 flux), items
// 1..items of the file.
inline std::string BoundaryRecord(int j, int formulation, const std::string& file, int items) {
    std::string numbers = "1";
    for (int i = 2; i <= items; ++i) numbers += ", " + std::to_string(i);
    const std::string point = std::to_string(j) + ", 0\n";
    return "Number_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\nFirst_Point = " + point +
           "Last_Point = " + point + "Formulation = " + std::to_string(formulation) +
           "\nData_Specification = 0\nDATA_FILE {\nFile_name = file(\"" + file +
           "\")\nItem_Count = " + std::to_string(items) + "\nItem_Numbers = " + numbers +
           "\n}\n}\n";
}
// At the first point: the translation gives it to code 2, both ends of the line.
inline std::string FluxAtBothEnds(const std::string& file) {
    return BoundaryRecord(0, 1, file, 1);
}

// Writes dir/m.bw, a 1DH model over the line `bathymetry` with the sections
// `given`, and runs the engine on it there: -check if asked, the progress
// channel (and with it the kill file) only if asked.
inline RunResult RunProfileModel(const TempDir& dir, const Sections& given, bool check,
                                 const std::string& bathymetry = "line.xol1",
                                 bool progress = false) {
    WriteFile(dir / "m.bw", ModelText(bathymetry, ProfileSections(given)));
    std::vector<std::string> argv = {BuiltProgram("bw")};
    if (check) argv.push_back("-check");
    argv.push_back("m.bw");
    std::map<std::string, std::string> env = {{"OMP_NUM_THREADS", "1"}};
    if (!progress) env["TARN_PROGRESS"] = "NONE";
    return RunProgram(argv, dir.path.string(), env, {"BUILDMODE", "TRF", "TARN_PROGRESS"});
}

// The model `dir`/m.bw over the profile bed.xol1: the engine runs it for
// one step, which leaves the mesh solver's file, and the mesh solver is set
// up from that file here. Its log lines go to the captured output.
inline void SetUpProfileRun(const TempDir& dir, double dt, const Sections& sections) {
    Sections s = sections;
    s["Simulation_Period"] = Period(1, dt);
    const RunResult r = RunProfileModel(dir, s, false, "bed.xol1");
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;

    testing::internal::CaptureStdout();
    ResetMeshModel();
    ResetBwModel();
    KvtHandle file = SetupMeshSolver(dir / "m.bw_FEM.kvt");
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

// v(t) = R cos(omega t - phase) + C fitted by least squares to samples v[i]
// at t = origin + i step that span whole periods.
struct Harmonic {
    double amplitude = 0.0, phase = 0.0;
};
inline Harmonic FitHarmonic(const std::vector<double>& v, double origin, double step,
                            double omega) {
    const double n = static_cast<double>(v.size());
    double mean = 0.0, a = 0.0, b = 0.0;
    for (double x : v) mean += x / n;
    for (size_t i = 0; i < v.size(); ++i) {
        const double t = origin + static_cast<double>(i) * step;
        a += 2.0 / n * (v[i] - mean) * std::cos(omega * t);
        b += 2.0 / n * (v[i] - mean) * std::sin(omega * t);
    }
    return {std::hypot(a, b), std::atan2(b, a)};
}

// A flume of 21 nodes 2.5 m apart (grid points 0..20), 2 m deep unless Bed
// says otherwise, for whole runs of a model file: by the engine (Run) or by
// the mesh solver in this process on the solver file the engine wrote
// (RunInProcess, the log returned in out).
class ProfileModel : public testing::Test {
protected:
    static constexpr int kJ = 20;
    static constexpr float kDx = 2.5f;
    TempDir dir;
    std::string logName;

    void SetUp() override { Bed(std::vector<float>(kJ + 1, -2.0f)); }
    void Bed(const std::vector<float>& bed) { WriteProfile(dir / "line.xol1", kDx, bed); }
    // A constant flux q for 11 s.
    void Flux(float q) {
        WriteSeriesFile(dir / "q.xol0", "2004-01-01 00:00:00", 1.0, {std::vector<float>(12, q)});
    }
    RunResult Run(const Sections& given, bool check = false, bool progress = false) {
        return RunProfileModel(dir, given, check, "line.xol1", progress);
    }
    std::string Log() const { return ReadFile(dir / "m.log"); }
    DataFile Read(const std::string& name) const { return ReadDataFile(dir / name); }

    int32_t RunInProcess(const Sections& given, std::string& out) {
        const RunResult r = Run(given, true);
        EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
        const std::filesystem::path cwd = std::filesystem::current_path();
        std::filesystem::current_path(dir.path);
        ResetMeshModel();
        ResetBwModel();
        InitTiming(gOverallTiming, "Overall", 4);
        for (int task = 1; task <= 4; ++task) AddTiming(gOverallTiming, task, "task");
        logName = "m.bw";
        int32_t status = 0;
        testing::internal::CaptureStdout();
        RunMeshSolver("m.bw_FEM.kvt", logName, status);
        out = testing::internal::GetCapturedStdout();
        std::filesystem::current_path(cwd);
        return status;
    }
};

}  // namespace bwtest
