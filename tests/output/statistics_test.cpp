// Wave statistics: a wave in a channel against linear theory; the on-line
// sums of an engine run against the series the same run stores; when points
// start, restart and drop out; and the stops of the section.
#include "output/statistics.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <functional>
#include <numbers>
#include <sstream>
#include <tuple>

#include "processes/sponge.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"

namespace {

using Records = std::vector<std::vector<std::vector<float>>>;  // [record][item][point]
constexpr float kDelete = -1.0e-30f;

// Settings of one in-memory record along row k, all j (or the points j, k).
void SetStatistics(int32_t type, int32_t mean, int32_t first, int32_t last, int32_t interval,
                   const std::string& file, int32_t k, const std::vector<int32_t>& items,
                   int32_t firstWave = 0) {
    StatisticSettings& s = gStatisticOutput;
    s = StatisticSettings{};
    s.type = type, s.meanCalculation = mean, s.firstStep = first, s.lastStep = last;
    s.stepInterval = interval, s.firstWave = firstWave, s.numberOfRecords = 1;
    OutputRecord2D r;
    r.fileName = file, r.title = "Statistics", r.itemNumbers = items;
    r.numberOfItems = static_cast<int32_t>(items.size());
    r.type = 1, r.dimension = 1, r.xRange = {0, gGrid.J, 1}, r.yRange = {k, k, 1};
    s.records = {r};
}

// The output as the time loop drives it, n = 0 its start.
void StatisticsOfStep(int32_t n) {
    if (n == 0)
        InitOutputStatistic(), CreateOutputStatistic();
    else
        UpdateOutputStatistic(n);
    WriteOutputStatistic(n);
}

TEST(StatisticsOfAWave, AProgressiveSineHasTheHeightExtremesLevelAndTransportOfTheory) {
    // Waves of H = 1 cm from a level boundary in 1 m, deep-water terms on, a
    // sponge over the last 60 cells; whole periods long after the ramp.
    //  - 2 s (kd 1.2) is a sine: Hm0 = H sqrt 2, extremes +-H/2, no set-up,
    //    no skewness.
    //  - 6 s (kd 0.34) carries the mass transport of linear theory, g a^2 / 2c.
    struct Case {
        double T;
        int32_t waves, periods, from;
        bool linear;
    };
    for (const Case& c : {Case{2.0, 10, 32, 16, true}, Case{6.0, 8, 40, 24, false}}) {
        SCOPED_TRACE(testing::Message() << "period " << c.T);
        bwtest::LogCapture log;
        bwtest::TempDir dir;
        const double a = 0.005, H = 2.0 * a;
        const bwtest::Channel ch = bwtest::MakeChannel(0, true, c.T, a, c.waves, c.periods);
        gSponge.spongeType = true;
        for (int32_t k = 0, start = ch.J - 60; k <= gGrid.K; ++k)
            for (int32_t j = start; j <= ch.J; ++j)
                gSponge.sponge[gGrid.At(j, k)] =
                    static_cast<float>(1.0 + 0.3 * std::pow((j - start) / 60.0, 2));
        const int32_t from = c.from * 60, to = c.periods * 60;
        SetStatistics(2, 1, from, to, to - from, dir / "row.xol1", 2, {1, 2, 3, 4, 5, 6, 11});
        StatisticsOfStep(0);
        bwtest::RunSteps(ch.steps, StatisticsOfStep);
        CloseOutputStatistic();

        const Records rec = bwtest::ReadDataFile(dir / "row.xol1").records;
        ASSERT_EQ(rec.size(), 1u);
        const auto& v = rec[0];
        const double transport = kGravity * a * a / (2.0 * ch.c);
        double meanFlux = 0.0;
        const int32_t j0 = 30, j1 = ch.J - 90;
        for (int32_t j = j0; j <= j1; ++j) {
            EXPECT_NEAR(v[0][j] / (H * std::sqrt(2.0)), 1.0, 0.02) << j;
            EXPECT_NEAR(v[4][j] / H, 0.0, 1e-3) << j;
            meanFlux += v[5][j] / transport / (j1 - j0 + 1);
            if (c.linear) {
                EXPECT_NEAR(v[2][j] / (H / 2), 1.0, 0.02) << j;
                EXPECT_NEAR(v[3][j] / (H / 2), -1.0, 0.02) << j;
                EXPECT_NEAR(v[1][j] / H, 1.0, 0.02) << j;
                EXPECT_NEAR(v[6][j], 0.0, 0.03) << j;
            } else {
                EXPECT_NEAR(v[5][j] / transport, 1.0, 0.1) << j;
            }
        }
        if (!c.linear) {
            EXPECT_NEAR(meanFlux, 1.0, 0.05);
        }
    }
}

// The section of output record n: its file, ranges and items.
std::string RecordSection(int n, const std::string& file, const std::string& x,
                          const std::string& y, const std::string& items,
                          const std::string& extra = "") {
    std::ostringstream s;
    s << "Output_Spec_Data_" << n << " {\nFile_Name = file(\"" << file
      << "\")\nX_Range_And_Interval = " << x << "\nY_Range_And_Interval = " << y
      << "\nNumber_Of_Items = " << 1 + std::ranges::count(items, ',')
      << "\nItem_Numbers = " << items << "\nTitle = \"" << file << "\"\n"
      << extra << "}\n";
    return s.str();
}

// The engine on a closed basin of 11 x 9 points whose surface starts tilted
// both ways and sloshes for 60 steps of 0.1 s.
class StatisticsRun : public testing::Test {
protected:
    bwtest::TempDir dir;
    void SetUp() override {
        bwtest::MapSpec grid;
        grid.J = 10, grid.K = 8, grid.dy = 2.0f;
        std::vector<float> bed = bwtest::Constant(grid, -1.0f), xi(bed.size());
        for (int k = 0, p = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j, ++p) {
                if (j == 0 || k == 0 || j == grid.J || k == grid.K) bed[p] = 1.0f;
                xi[p] = 0.02f * std::cos(3.14159f * j / 10) + 0.01f * std::cos(3.14159f * k / 8);
            }
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
        grid.itemName = "Surface";
        bwtest::WriteMapFile(dir / "xi.xol2", grid, xi);
    }
    bwtest::RunResult Run(std::map<std::string, std::string> sections) {
        sections["SURFACE_ELEVATION"] = "SURFACE_TYPE = 1\n" + bwtest::DataFileSection("xi.xol2");
        return bwtest::RunModel(dir, 60, 0.1, sections);
    }
};

// Items 1 to 14 of the output from samples 1..n of a stored series, in 64
// bits (x[0] the surface before the first step).
std::vector<double> OfflineStatistics(const std::vector<double>& x, const std::vector<double>& P,
                                      const std::vector<double>& Q,
                                      const std::vector<double>& depth, size_t n, double dt) {
    double s[4] = {}, r[3] = {}, sP = 0, sQ = 0, sU = 0, sV = 0, hi = 0, lo = 0;
    for (size_t i = 1; i <= n; ++i) {
        const double rate = (x[i] - x[i - 1]) / dt;
        for (int m = 0; m < 4; ++m) s[m] += std::pow(x[i], m + 1);
        for (int m = 0; m < 3; ++m) r[m] += std::pow(rate, m + 1);
        sP += P[i], sQ += Q[i], sU += P[i] / depth[i], sV += Q[i] / depth[i];
        hi = std::max(hi, x[i]), lo = std::min(lo, x[i]);
    }
    const double N = static_cast<double>(n), m1 = s[0] / N, var = s[1] / N - m1 * m1;
    auto central3 = [&](const double* S) {
        const double a = S[0] / N;
        return S[2] / N - 3 * a * S[1] / N + 2 * a * a * a;
    };
    const double rm = r[0] / N, rvar = r[1] / N - rm * rm;
    const double c4 = s[3] / N - 4 * m1 * s[2] / N + 6 * m1 * m1 * s[1] / N - 3 * std::pow(m1, 4);
    const double skew = central3(s) / std::pow(var, 1.5), kurtosis = c4 / (var * var) - 3.0;
    const double rateSkew = central3(r) / std::pow(rvar, 1.5);
    return {4 * std::sqrt(var * N / (N - 1)),
            hi - lo,
            hi,
            lo,
            m1,
            sP / N,
            sQ / N,
            sU / N,
            sV / N,
            0.0,
            skew,
            kurtosis,
            rateSkew,
            dt};
}

TEST_F(StatisticsRun, OnlineSumsAgreeWithTheStoredSeriesOfTheSameRun) {
    // Statistics every 20 steps from step 0 at three gauges and over the
    // area; surface, depth and fluxes of the gauges every step.
    const int gj[] = {2, 5, 8}, gk[] = {3, 4, 5};
    const std::string gauges = "2, 5, 8", rows = "3, 4, 5", points = "NO_OF_POINTS = 3\n";
    const std::string stat =
        "Type = 2\nType_of_mean_calculation = 1\nFirst_Time_step = 0\nLast_Time_step = 60\n"
        "Time_Step_Interval = 20\nNumber_of_First_Wave = 1\nNumber_Of_Records = 2\n" +
        RecordSection(1, "stat.xol0", gauges, rows, "1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14",
                      points) +
        RecordSection(2, "stat.xol2", "0, 10, 1", "0, 8, 1", "1, 5, 15");
    const std::string det =
        "Number_Of_Records = 1\n" +
        RecordSection(
            1, "series.xol0", gauges, rows, "1, 2, 3, 4",
            points + "First_Time_step = 0\nLast_Time_step = 60\nTime_Step_Interval = 1\n");
    const bwtest::RunResult run =
        Run({{"Output_Statistic_2D", stat}, {"Output_Deterministic_2D", det}});
    ASSERT_EQ(run.exitCode, 0) << run.out;

    // Records at steps 20, 40, 60 (none at 0); items named by their gauge;
    // the area with its bathymetry.
    const bwtest::DataFile statFile = bwtest::ReadDataFile(dir / "stat.xol0");
    const bwtest::DataFile areaFile = bwtest::ReadDataFile(dir / "stat.xol2");
    const XolFile& f = statFile.header;
    EXPECT_DOUBLE_EQ(f.timeStep, 2.0);
    EXPECT_EQ(f.startDateTime, "2004-01-01 00:00:02");
    ASSERT_EQ(f.noDynamicItems, 42);
    EXPECT_EQ(f.dynamicItems[0].name, "P(2,3): Significant wave height");
    EXPECT_EQ(f.dynamicItems[41].name, "P(8,5): Time of first wave");
    EXPECT_EQ(areaFile.header.noStaticItems, 1);
    EXPECT_EQ(areaFile.header.dynamicItems[2].name, "Filt. elevation");
    EXPECT_NE(bwtest::ReadFile(dir / "m.log").find("  Title  : stat.xol2\n"), std::string::npos);

    const Records &stats = statFile.records, &area = areaFile.records;
    const Records series = bwtest::ReadDataFile(dir / "series.xol0").records;
    ASSERT_EQ(series.size(), 61u);
    ASSERT_EQ(stats.size(), 3u);
    double largestSkewness = 0.0;
    for (int g = 0; g < 3; ++g) {
        std::vector<double> x, depth, P, Q;
        double scale = 0.0;  // of the fluxes and velocities, for the means near 0
        for (const auto& record : series) {
            x.push_back(record[4 * g][0]), depth.push_back(record[4 * g + 1][0]);
            P.push_back(record[4 * g + 2][0]), Q.push_back(record[4 * g + 3][0]);
            scale = std::max({scale, std::fabs(P.back()), std::fabs(Q.back()),
                              std::fabs(P.back() / depth.back())});
        }
        for (size_t out = 0; out < 3; ++out) {
            const std::vector<double> expected =
                OfflineStatistics(x, P, Q, depth, 20 * (out + 1), 0.1);
            for (int item = 1; item <= 14; ++item) {
                const double e = expected[item - 1], got = stats[out][14 * g + item - 1][0];
                const double tolerance = item <= 4    ? 1e-5 * std::fabs(e)
                                         : item <= 10 ? 1e-5 * (item == 5 ? 0.03 : scale)
                                                      : 1e-5 * std::max(1.0, std::fabs(e));
                EXPECT_NEAR(got, e, tolerance)
                    << "gauge " << g << " output " << out << " item " << item;
            }
            largestSkewness = std::max(largestSkewness, std::fabs(expected[10]));
        }
        // The area holds the same numbers at the gauge.
        const size_t at = static_cast<size_t>(gk[g]) * 11 + gj[g];
        EXPECT_EQ(area[2][0][at], stats[2][14 * g][0]);
        EXPECT_EQ(area[2][1][at], stats[2][14 * g + 4][0]);
    }
    EXPECT_GT(largestSkewness, 0.01);  // the moments are not trivially 0
    // Land has no samples; "Filt. elevation" has no value anywhere.
    EXPECT_EQ(area[0][0][0], kDelete);
    EXPECT_TRUE(std::ranges::all_of(area[1][2], [](float v) { return v == kDelete; }));
}

// Four water points in 1 m, surface(point, n) at step n: statistics from
// step 0 to `steps` every `interval`; items 1, 3, 4, 5, 11, 14.
Records RunRow(int32_t type, int32_t mean, int32_t interval, int32_t firstWave, int32_t steps,
               const std::function<double(int32_t, int32_t)>& surface) {
    bwtest::LogCapture log;
    bwtest::TempDir dir;
    bwtest::MakeRow(std::vector<float>(4, -1.0f), 0.1);
    SetStatistics(type, mean, 0, steps, interval, dir / "row.xol1", 0, {1, 3, 4, 5, 11, 14},
                  firstWave);
    bwtest::DriveRow(steps, surface, StatisticsOfStep);
    CloseOutputStatistic();
    return bwtest::ReadDataFile(dir / "row.xol1").records;
}

// Items 1, 3, 4, 5 of samples from..to of s(n) but skip: Hm0, the extremes
// (from 0) and the mean.
std::vector<double> Expected(const std::function<double(int32_t)>& s, int32_t from, int32_t to,
                             int32_t skip = -1) {
    double sum = 0, sum2 = 0, hi = 0, lo = 0, N = 0;
    for (int32_t n = from; n <= to; ++n)
        if (n != skip) {
            const double x = s(n);
            sum += x, sum2 += x * x, N += 1, hi = std::max(hi, x), lo = std::min(lo, x);
        }
    return {4.0 * std::sqrt((sum2 - sum * sum / N) / (N - 1)), hi, lo, sum / N};
}

void ExpectItems(const std::vector<std::vector<float>>& record, int32_t point,
                 const std::vector<double>& expected, const char* what) {
    for (size_t i = 0; i < expected.size(); ++i)
        EXPECT_NEAR(record[i][point], expected[i], 1e-5 * (1.0 + std::fabs(expected[i])))
            << what << ", item column " << i;
}

double Jumpy(int32_t n) {
    return 0.1 * ((n * 7) % 5 - 2);
}  // steps in -0.2..0.2

TEST(StatisticsRules, RestartsDryPointsAndPointsWithoutVariance) {
    // Point 0 moves; point 1 moves the same but is dry at step 6; point 2 is
    // still at 0.25; point 3 is wet only at step 1.
    auto surface = [](int32_t j, int32_t n) {
        if ((j == 1 && n == 6) || (j == 3 && n > 1)) return -1.5;
        return j == 2 ? 0.25 : Jumpy(n);
    };
    // Type 3 every 4 steps: each output covers its own steps; the dry point
    // drops out of the output holding step 6 and is back after the restart,
    // whose step is the time of first wave.
    Records r = RunRow(3, 1, 4, 0, 12, surface);
    ASSERT_EQ(r.size(), 3u);
    for (int32_t out = 0; out < 3; ++out) {
        const int32_t from = 4 * out + 1, to = from + 3;
        ExpectItems(r[out], 0, Expected(Jumpy, from, to), "type 3, moving point");
        EXPECT_FLOAT_EQ(r[out][5][0], 0.1f * from);
        if (out == 1)
            for (int i = 0; i < 5; ++i)
                EXPECT_EQ(r[out][i][1], kDelete) << "dry point, column " << i;
        else
            ExpectItems(r[out], 1, Expected(Jumpy, from, to), "type 3, point dry at step 6");
        // A still point: the smallest height, its level, no skewness.
        ExpectItems(r[out], 2, {1e-4, 0.25, 0.25, 0.25}, "type 3, still point");
        EXPECT_EQ(r[out][4][2], kDelete);
    }
    // Type 2 from step 0: with mean calculation 1 a point that fell dry has
    // no value from then on; with 2 it keeps the statistics of its wet
    // steps, and a point of one sample has the smallest height.
    r = RunRow(2, 1, 4, 0, 12, surface);
    ASSERT_EQ(r.size(), 3u);
    ExpectItems(r[0], 1, Expected(Jumpy, 1, 4), "type 2, before drying");
    EXPECT_EQ(r[1][3][1], kDelete);
    EXPECT_EQ(r[2][3][1], kDelete);
    EXPECT_EQ(r[2][5][1], 0.1f);  // the time of first wave stays
    r = RunRow(2, 2, 4, 0, 12, surface);
    ExpectItems(r[2], 1, Expected(Jumpy, 1, 12, 6), "type 2, mean calculation 2");
    EXPECT_FLOAT_EQ(r[2][0][3], 1e-4f);
    EXPECT_FLOAT_EQ(r[2][3][3], static_cast<float>(Jumpy(1)));
}

TEST(StatisticsRules, TypeOneStartsEachPointAfterItsFirstWave) {
    // Waves of 8 steps and 0.1 m at point 0 from the start, at point 1 from
    // step 10; point 2 still, point 3 moving by less than Eps_High. With one
    // first wave a point starts when the surface falls after its first rise.
    auto wave = [](int32_t n) { return 0.1 * std::sin(std::numbers::pi * n / 4.0); };
    auto surface = [&](int32_t j, int32_t n) {
        return j == 0   ? wave(n)
               : j == 1 ? (n > 10 ? wave(n - 10) : 0.0)
               : j == 2 ? 0.0
                        : 1e-5 * wave(n);
    };
    const Records r = RunRow(1, 1, 24, 1, 24, surface);
    ASSERT_EQ(r.size(), 1u);
    ExpectItems(r[0], 0, Expected(wave, 3, 24), "point 0");
    ExpectItems(r[0], 1, Expected([&](int32_t n) { return wave(n - 10); }, 13, 24), "point 1");
    EXPECT_FLOAT_EQ(r[0][5][0], 0.3f);
    EXPECT_FLOAT_EQ(r[0][5][1], 1.3f);
    for (int point : {2, 3})
        for (int i = 0; i < 6; ++i) EXPECT_EQ(r[0][i][point], kDelete) << point << ", " << i;
}

TEST_F(StatisticsRun, WrongRecordsStopWithTheirMessages) {
    const std::string head =
        "Type = 1\nFirst_Time_step = 0\nLast_Time_step = 60\nTime_Step_Interval = 20\n"
        "Number_of_First_Wave = 1\nNumber_Of_Records = 1\n";
    for (const auto& [file, items, message] :
         {std::tuple{"stat.dt3", "1", "SetupOutputDeterministic2D: Wrong file extension"},
          std::tuple{"stat.xol2", "1, 18", "WriteOutputStatistic: Wrong type of item"}}) {
        const bwtest::RunResult r = Run(
            {{"Output_Statistic_2D", head + RecordSection(1, file, "0, 10, 1", "0, 8, 1", items)}});
        EXPECT_EQ(r.exitCode, 1) << message;
        EXPECT_EQ(r.out, std::string(message) + "\n");
    }
    // A Type of 0 writes nothing, whatever records follow.
    const bwtest::RunResult r = Run(
        {{"Output_Statistic_2D", "Type = 0\nNumber_Of_Records = 1\n" +
                                     RecordSection(1, "none.xol2", "0, 10, 1", "0, 8, 1", "1")}});
    EXPECT_EQ(r.exitCode, 0) << r.out;
    EXPECT_FALSE(std::filesystem::exists(dir / "none.xol2"));
}

}  // namespace
