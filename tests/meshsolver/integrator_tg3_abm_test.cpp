// The time integrators on a model-free problem y' = lambda y driven through
// their two callbacks: the stage pattern of TG3 and its order, the end of a
// step at a failed stage, the start of ABM with the trapezoid rule and its
// order once the history stands. (The integrator a model file asks for is
// run end to end with the 1DH runs.)
#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "equations/time_integrators.hpp"
#include "meshsolver/bw_model.hpp"

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

TEST(Tg3, ThreeStagesFromTheStartOfTheStepAndAFailedStageEndsIt) {
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

    // A failure in the second stage ends the step; the next starts sound.
    LinearModel(1);
    gRec.failAtStage = 2;
    TG3(m, 1.0, 0.1, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
    EXPECT_EQ(status, -1);
    EXPECT_EQ(gRec.fTime.size(), 2u);
    EXPECT_EQ(gRec.gTime.size(), 2u);
    gRec.failAtStage = 0;
    TG3(m, 1.1, 0.1, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(m.Dae.Tg3.stepCount, 2);
}

TEST(Abm, TrapezoidStartFailureAndHigherOrderOnceTheHistoryStands) {
    // The first steps are explicit Euler predictions corrected to the
    // trapezoid rule (no relaxation, as a model file has it); the history
    // holds the new state and its rate.
    const double h = 0.2, z = -0.7 * h, trapezoid = (1.0 + z / 2.0) / (1.0 - z / 2.0);
    {
        BwModel& m = LinearModel(2);
        m.Dae.Abm.Relaxation = 1.0;
        int32_t status = 0;
        ABM(m, h, h, m.Dae.y, m.Dae.ydot, LinearRate, RecordStage, status);
        EXPECT_EQ(status, 0);
        EXPECT_NEAR(m.Dae.y[1], trapezoid, 1e-13);
        EXPECT_NEAR(m.Dae.y[2], -2.0 * trapezoid, 1e-13);
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

    // Three trapezoid steps at the start leave a third-order part.
    const double exact = std::exp(-0.7);
    const double e1 = std::abs(Integrate(0.05) - exact), e2 = std::abs(Integrate(0.025) - exact);
    EXPECT_GT(std::log2(e1 / e2), 2.8);
    EXPECT_LT(e2, 1.0e-6);
}

}  // namespace
