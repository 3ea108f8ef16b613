// The time integrators on a model-free problem y' = lambda y driven through
// their two callbacks: the stage pattern of TG3 and its order, the end of a
// step at a failed stage, the start of ABM with the trapezoid rule and its
// order once the history stands; and the reading of the integrator's and
// the equations' sections of the solver file.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <vector>

#include "equations/time_integrators.hpp"
#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "mesh/mesh.hpp"
#include "meshsolver/equations_bw.hpp"
#include "support/test_support.hpp"

namespace {

struct Recorder {
    double lambda = -0.7;
    int32_t failAtStage = 0;  // the g call that reports a failure, 0 none
    std::vector<double> fTime, fStep, gTime, gStep;
};
Recorder gRec;

void LinearRate(double t, double c, const std::vector<double>& y, std::vector<double>& ydot,
                BwModel& model, int32_t& status) {
    gRec.fTime.push_back(t);
    gRec.fStep.push_back(c);
    for (int32_t i = 1; i <= model.Dae.StateSize; ++i) ydot[i] = gRec.lambda * y[i];
    status = 0;
}

void RecordStage(double t, double c, std::vector<double>&, BwModel&, int32_t& status) {
    gRec.gTime.push_back(t);
    gRec.gStep.push_back(c);
    status = static_cast<int32_t>(gRec.gTime.size()) == gRec.failAtStage ? -1 : 0;
}

BwModel& LinearModel(int32_t method) {
    ResetBwModel();
    gRec = Recorder{};
    BwModel& m = gBwModel;
    m.StateSize = 2;
    m.Dae.StateSize = 2;
    m.Dae.DaeMethod = method;
    m.Dae.y = {0.0, 1.0, -2.0};
    m.Dae.ydot.assign(3, 0.0);
    if (method == 1) {
        SetupTG3(m);
    } else {
        m.Dae.Abm.YWork.assign(3, 0.0);
        for (int c = 0; c < 4; ++c) {
            m.Dae.Abm.YHistory[c].assign(3, 0.0);
            m.Dae.Abm.YdotHistory[c].assign(3, 0.0);
        }
        m.Dae.Abm.Tolerance = 1.0e-14;
        m.Dae.Abm.MaxIterations = 40;
    }
    return m;
}

// y(1) of y' = lambda y, y(0) = 1, in steps of h by ABM.
double Integrate(double h) {
    BwModel& m = LinearModel(2);
    int32_t status = 0;
    const int32_t steps = static_cast<int32_t>(std::lround(1.0 / h));
    for (int32_t s = 1; s <= steps; ++s)
        ABM(m, s * h, h, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
    EXPECT_EQ(status, 0);
    return m.Dae.y[1];
}

TEST(Tg3, ThreeStagesFromTheStartOfTheStep) {
    BwModel& m = LinearModel(1);
    const double h = 0.3, t = 1.2, t0 = t - h;
    int32_t status = 5;
    TG3(m, t, h, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
    EXPECT_EQ(status, 0);
    ASSERT_EQ(gRec.fTime.size(), 3u);
    ASSERT_EQ(gRec.gTime.size(), 3u);
    const double fTime[3] = {t0, t0 + h / 3.0, t0 + h / 2.0};
    const double step[3] = {h / 3.0, h / 2.0, h};
    for (int s = 0; s < 3; ++s) {
        EXPECT_DOUBLE_EQ(gRec.fTime[s], fTime[s]);
        EXPECT_DOUBLE_EQ(gRec.fStep[s], step[s]);
        EXPECT_DOUBLE_EQ(gRec.gStep[s], step[s]);
        EXPECT_DOUBLE_EQ(gRec.gTime[s], t0 + step[s]);
    }
    // Each stage restarts from y0: the step is the cubic Taylor polynomial
    // of exp(z) for a linear rate, third order.
    const double z = gRec.lambda * h, growth = 1.0 + z + z * z / 2.0 + z * z * z / 6.0;
    EXPECT_NEAR(m.Dae.y[1], growth, 1e-15);
    EXPECT_NEAR(m.Dae.y[2], -2.0 * growth, 1e-15);
    EXPECT_EQ(m.Dae.Tg3.stepCount, 1);
    EXPECT_DOUBLE_EQ(m.Dae.Tg3.lastStageTime, t);
}

TEST(Tg3, FailureInTheSecondStageEndsTheStep) {
    BwModel& m = LinearModel(1);
    gRec.failAtStage = 2;
    int32_t status = 0;
    TG3(m, 1.0, 0.1, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
    EXPECT_EQ(status, -1);
    EXPECT_EQ(gRec.fTime.size(), 2u);
    EXPECT_EQ(gRec.gTime.size(), 2u);
    // The next step starts sound again.
    gRec.failAtStage = 0;
    TG3(m, 1.1, 0.1, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(m.Dae.Tg3.stepCount, 2);
}

TEST(Abm, TrapezoidStartAndRelaxation) {
    // The first steps are explicit Euler predictions corrected to the
    // trapezoid rule; a relaxation factor below 1 reaches the same point.
    const double h = 0.2, z = -0.7 * h, trapezoid = (1.0 + z / 2.0) / (1.0 - z / 2.0);
    for (const double relaxation : {1.0, 0.6}) {
        BwModel& m = LinearModel(2);
        m.Dae.Abm.Relaxation = relaxation;
        int32_t status = 0;
        ABM(m, h, h, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
        EXPECT_EQ(status, 0);
        EXPECT_EQ(m.Dae.Abm.Order, 1);
        EXPECT_NEAR(m.Dae.y[1], trapezoid, 1e-13) << relaxation;
        EXPECT_NEAR(m.Dae.y[2], -2.0 * trapezoid, 1e-13) << relaxation;
        EXPECT_EQ(m.Dae.Abm.FailedSteps, 0);
        // The history holds the new state and its rate.
        EXPECT_EQ(m.Dae.Abm.YHistory[0][1], m.Dae.y[1]);
        EXPECT_NEAR(m.Dae.Abm.YdotHistory[0][1], -0.7 * m.Dae.y[1], 1e-15);
    }
    // A failed stage update ends the step at once.
    BwModel& m = LinearModel(2);
    gRec.failAtStage = 2;  // the first correction
    int32_t status = 0;
    ABM(m, h, h, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
    EXPECT_EQ(status, -1);
    EXPECT_EQ(gRec.gTime.size(), 2u);
}

TEST(Abm, HigherOrderOnceTheHistoryStands) {
    const double exact = std::exp(-0.7);
    const double e1 = std::abs(Integrate(0.05) - exact);
    const double e2 = std::abs(Integrate(0.025) - exact);
    // Three trapezoid steps at the start leave a third-order part.
    EXPECT_GT(std::log2(e1 / e2), 2.8);
    EXPECT_LT(e2, 1.0e-6);
}

// The sections of the solver file that the equations and the integrator read.
class Sections : public testing::Test {
protected:
    bwtest::TempDir dir;
    KvtHandle file = 0;
    void SetUp() override { setenv("TRF", "HUD", 1); }
    void TearDown() override {
        unsetenv("TRF");
        if (file != 0) kvtClose(&file);
        gKvtAccess = KvtAccessState{};
        ResetMeshModel();
        ResetBwModel();
    }
    // A line of 4 linear elements and its refinement, and the module's
    // section with the given body current.
    void Use(const std::string& body) {
        ResetMeshModel();
        ResetBwModel();
        Mesh& line = gMeshes.meshes[1];
        AllocateMesh(line, 5, 4, 2, "test");
        for (int32_t e = 1; e <= 4; ++e) {
            line.x[e + 1] = e;
            line.ElementType[e] = kLinearLine;
            line.ElementNodes[line.ElementStart[e]] = e;
            line.ElementNodes[line.ElementStart[e] + 1] = e + 1;
        }
        RefineMesh(line, gMeshes.meshes[2]);
        gMeshes.number_of_meshes = 2;
        bwtest::WriteFile(dir / "m_FEM.kvt",
                          "MeshSolverBW {\nBOUSSINESQ_WAVE_MODULE {\n" + body + "}\n}\n");
        file = KvtOpenFile(dir / "m_FEM.kvt", false);
        KvtUseFile(file);
        KvtOpenTarget("MeshSolverBW");
        KvtOpenSection("BOUSSINESQ_WAVE_MODULE");
    }
};
using SectionsDeathTest = Sections;

TEST_F(Sections, EquationsTimeSpaceAndSolution) {
    Use("EQUATION {\nformulation = 2\n}\nTIME {\ntime_step_factor = 3\n}\n"
        "SPACE {\nnumber_of_mesh_velocity = 2\n}\n"
        "SOLUTION_TECHNIQUE {\ntype_of_supg = -1\n"
        "DIFFERENTIAL_ALGEBRAIC_EQUATION_SYSTEM {\nmethod = 2\nmax_iterations = 7\n}\n}\n");
    BwModel& m = gBwModel;
    m.timeStepInterval = 0.05;
    SetupEquationBW(1, m);
    EXPECT_EQ(m.Formulation, 2);
    EXPECT_EQ(m.Beta, static_cast<double>(0.067f));  // the default, a 32-bit real
    EXPECT_DOUBLE_EQ(m.TimeStep, 0.15);
    EXPECT_EQ(m.Discretization, 2);
    EXPECT_EQ(m.ElevationStart, 10);
    EXPECT_EQ(m.StateSize, 14);
    EXPECT_EQ(m.Flux.size(), 10u);
    EXPECT_EQ(m.AuxVariable.size(), 6u);
    m.Flux[4] = 0.25;
    m.Elevation[2] = -0.5;
    SetupSolutionBW(m);
    EXPECT_EQ(m.typeOfSupg, -1);
    EXPECT_EQ(m.Dae.DaeMethod, 2);
    EXPECT_EQ(m.Dae.Abm.MaxIterations, 7);
    EXPECT_EQ(m.Dae.Abm.Tolerance, 1.0e-6);
    EXPECT_EQ(m.Dae.Abm.YHistory[3].size(), 15u);
    EXPECT_EQ(m.Dae.y[4], 0.25);
    EXPECT_EQ(m.Dae.y[11], -0.5);
    EXPECT_EQ(m.Les.FluxMatrix.Matrix.Order, 9);
    EXPECT_EQ(m.Les.ElevationMatrix.Matrix.Order, 5);
}

TEST_F(SectionsDeathTest, UnknownMethodStops) {
    // Classical equations take no beta; the time step is the run's.
    Use("EQUATION {\nformulation = 1\nbeta = 0.2\n}\nTIME {\n}\nSPACE {\n}\n"
        "SOLUTION_TECHNIQUE {\nDIFFERENTIAL_ALGEBRAIC_EQUATION_SYSTEM {\nmethod = 3\n}\n}\n");
    gBwModel.timeStepInterval = 0.05;
    SetupEquationBW(1, gBwModel);
    EXPECT_EQ(gBwModel.Beta, 0.0);
    EXPECT_EQ(gBwModel.TimeStep, 0.05);
    EXPECT_EXIT(SetupSolutionBW(gBwModel), testing::ExitedWithCode(1),
                "SetupDaes: wrong time integration method");
}

}  // namespace
