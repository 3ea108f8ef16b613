// Wave statistics: a monochromatic wave in a channel gives the height, the
// extremes, the mean level and the mass transport of linear theory; the
// on-line sums of an engine run agree with the statistics of the time series
// the same run stores; the rules of when a point starts, restarts and drops
// out; and every stop a model file can reach in the section.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <functional>
#include <numbers>
#include <sstream>

#include "data/xolfile.hpp"
#include "output/statistics.hpp"
#include "processes/sponge.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Records = std::vector<std::vector<std::vector<float>>>;  // [record][item][point]
constexpr float kDelete = -1.0e-30f;

// Every record of every dynamic item of a data file.
Records ReadRecords(const std::string& path) {
    XolFile f = XolOpenRead(path);
    size_t points = 1;
    for (int a = 0; a < f.dimension; ++a) points *= static_cast<size_t>(f.axes[a].count);
    std::vector<float> skip(points);
    for (int s = 0; s < f.noStaticItems; ++s) XolReadStatic(f, skip.data());
    Records records(static_cast<size_t>(std::max(f.noTimeSteps, 0)));
    for (auto& record : records) {
        record.assign(static_cast<size_t>(f.noDynamicItems), std::vector<float>(points));
        for (auto& item : record) XolReadDynamic(f, item.data());
    }
    XolClose(f);
    return records;
}

// An in-memory statistics record: a line along row k over all j, or the
// points (j[i], k) when points is not empty.
OutputRecord2D Record(const std::string& file, int32_t k, const std::vector<int32_t>& items,
                      const std::vector<int32_t>& points = {}) {
    OutputRecord2D r;
    r.fileName = file;
    r.title = "Statistics";
    r.itemNumbers = items;
    r.numberOfItems = static_cast<int32_t>(items.size());
    if (points.empty()) {
        r.type = 1, r.dimension = 1;
        r.xRange = {0, gGrid.J, 1}, r.yRange = {k, k, 1};
    } else {
        r.type = 0, r.dimension = 0, r.noOfPoints = static_cast<int32_t>(points.size());
        r.xRange = points, r.yRange.assign(points.size(), k);
    }
    return r;
}

// Statistics settings of one record.
void SetStatistics(int32_t type, int32_t mean, int32_t first, int32_t last, int32_t interval,
                   const OutputRecord2D& record, int32_t firstWave = 0) {
    StatisticSettings& s = gStatisticOutput;
    s = StatisticSettings{};
    s.type = type, s.meanCalculation = mean, s.firstStep = first, s.lastStep = last;
    s.stepInterval = interval, s.firstWave = firstWave;
    s.numberOfRecords = 1;
    s.records = {record};
}

// The statistics output driven as the time loop drives it.
void StartStatistics() {
    InitOutputStatistic();
    CreateOutputStatistic();
    WriteOutputStatistic(0);
}
void StatisticsOfStep(int32_t n) {
    UpdateOutputStatistic(n);
    WriteOutputStatistic(n);
}

// A sponge over the last `cells` of the channel, its coefficient rising with
// the square of the distance into it.
void SpongeAtTheEnd(int32_t cells) {
    gSponge.spongeType = true;
    const int32_t start = gGrid.J - cells;
    for (int32_t k = 0; k <= gGrid.K; ++k)
        for (int32_t j = start; j <= gGrid.J; ++j) {
            const double s = static_cast<double>(j - start) / cells;
            gSponge.sponge[gGrid.At(j, k)] = static_cast<float>(1.0 + 0.3 * s * s);
        }
}

TEST(StatisticsOfAWave, AProgressiveSineHasTheHeightExtremesLevelAndTransportOfTheory) {
    // Waves from a level boundary in 1 m of water, deep-water terms on, the
    // last two wavelengths of the channel sponge. Statistics over whole
    // periods long after the ramp of the boundary has passed the channel, at
    // every point of the middle row; checked over the open channel from one
    // wavelength in to one before the sponge.
    //  - A short, low wave (2 s, kd 1.2, H = 1 cm) is a sine: Hm0 = H sqrt 2,
    //    extremes +-H/2, no set-up, no skewness.
    //  - A long wave (6 s, kd 0.34, H = 1 cm) carries the mass transport of
    //    linear theory, g a^2 / 2c, once the long waves started by the ramp
    //    have settled (in deeper water the depth-averaged model settles with
    //    a mean flux nearer c a^2 / 2d: about 0.8 of it at kd 1.2).
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
        SpongeAtTheEnd(60);
        const int32_t from = c.from * 60, to = c.periods * 60;
        SetStatistics(2, 1, from, to, to - from,
                      Record(dir / "row.xol1", 2, {1, 2, 3, 4, 5, 6, 11}));
        StartStatistics();
        bwtest::RunSteps(ch.steps, StatisticsOfStep);
        CloseOutputStatistic();

        const Records rec = ReadRecords(dir / "row.xol1");
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

}  // namespace

// The engine run on a model file: a closed basin of 11 x 9 points whose
// surface starts tilted both ways and sloshes for 60 steps of 0.1 s.
class StatisticsRun : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::MapSpec grid;
    void SetUp() override {
        grid.J = 10, grid.K = 8, grid.dx = 1.0f, grid.dy = 2.0f;
        std::vector<float> bed = bwtest::Constant(grid, -1.0f), xi(bed.size());
        for (int k = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j) {
                const size_t p = static_cast<size_t>(k) * (grid.J + 1) + j;
                if (j == 0 || k == 0 || j == grid.J || k == grid.K) bed[p] = 1.0f;
                xi[p] = 0.02f * std::cos(3.14159f * j / 10) + 0.01f * std::cos(3.14159f * k / 8);
            }
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
        bwtest::MapSpec surface = grid;
        surface.itemName = "Surface";
        bwtest::WriteMapFile(dir / "xi.xol2", surface, xi);
    }
    bwtest::RunResult Run(const std::map<std::string, std::string>& sections) {
        std::map<std::string, std::string> all = sections;
        all["SURFACE_ELEVATION"] = "SURFACE_TYPE = 1\n" + bwtest::DataFileSection("xi.xol2");
        all["Simulation_Period"] =
            "Time_step_count = 60\nTime_step_interval = 0.1\nWarm_up_period = 0\n"
            "Start_time = 2004, 1, 1, 0, 0, 0\n";
        bwtest::WriteFile(dir / "m.bw", bwtest::ModelText("bed.xol2", all));
        return bwtest::RunProgram({bwtest::BuiltProgram("bw"), "m.bw"}, dir.path.string(),
                                  {{"TARN_PROGRESS", "NONE"}, {"OMP_NUM_THREADS", "1"}},
                                  {"BUILDMODE", "TRF"});
    }
};

// An Output_Spec_Data_% section of a statistics or deterministic record.
std::string Spec(int n, const std::string& file, const std::string& x, const std::string& y,
                 const std::string& items, const std::string& extra = "") {
    const int count = 1 + static_cast<int>(std::count(items.begin(), items.end(), ','));
    std::ostringstream s;
    s << "Output_Spec_Data_" << n << " {\nFile_Name = file(\"" << file << "\")\n"
      << "X_Range_And_Interval = " << x << "\nY_Range_And_Interval = " << y
      << "\nNumber_Of_Items = " << count << "\nItem_Numbers = " << items << "\nTitle = \"" << file
      << "\"\n"
      << extra << "}\n";
    return s.str();
}

// Statistics of a stored series, in 64 bits: the items 1 to 14 of the
// output for samples 1..n of x (x[0] the surface before the first step).
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
            central3(s) / std::pow(var, 1.5),
            c4 / (var * var) - 3.0,
            central3(r) / std::pow(rvar, 1.5),
            dt};
}

TEST_F(StatisticsRun, OnlineSumsAgreeWithTheStoredSeriesOfTheSameRun) {
    // Statistics every 20 steps from step 0 at three gauges (items 1 to 14)
    // and over the area; the surface, depth and fluxes of the gauges at
    // every step from step 0 in a deterministic file.
    const std::string gauges = "2, 5, 8", rows = "3, 4, 5", points = "NO_OF_POINTS = 3\n";
    const std::string stat =
        "Type = 2\nType_of_mean_calculation = 1\nFirst_Time_step = 0\nLast_Time_step = 60\n"
        "Time_Step_Interval = 20\nNumber_of_First_Wave = 1\nNumber_Of_Records = 2\n" +
        Spec(1, "stat.xol0", gauges, rows,
             "1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14", points) +
        Spec(2, "stat.xol2", "0, 10, 1", "0, 8, 1", "1, 5, 15");
    const std::string det = "Number_Of_Records = 1\n" +
                            Spec(1, "series.xol0", gauges, rows, "1, 2, 3, 4",
                                 points + "First_Time_step = 0\nLast_Time_step = 60\n"
                                          "Time_Step_Interval = 1\n");
    const bwtest::RunResult run =
        Run({{"Output_Statistic_2D", stat}, {"Output_Deterministic_2D", det}});
    ASSERT_EQ(run.exitCode, 0) << run.out;

    // The statistics file: the first record at step 20 (nothing at step 0),
    // 2 s a record; items named by their gauge; the area with its bathymetry.
    XolFile f = XolOpenRead(dir / "stat.xol0");
    EXPECT_EQ(f.noTimeSteps, 3);
    EXPECT_DOUBLE_EQ(f.timeStep, 2.0);
    EXPECT_EQ(f.startDateTime, "2004-01-01 00:00:02");
    ASSERT_EQ(f.noDynamicItems, 42);
    EXPECT_EQ(f.dynamicItems[0].name, "P(2,3): Significant wave height");
    EXPECT_EQ(f.dynamicItems[41].name, "P(8,5): Time of first wave");
    XolClose(f);
    f = XolOpenRead(dir / "stat.xol2");
    EXPECT_EQ(f.noStaticItems, 1);
    EXPECT_EQ(f.dynamicItems[2].name, "Filt. elevation");
    XolClose(f);
    const std::string log = bwtest::ReadFile(dir / "m.log");
    EXPECT_NE(log.find("  Title  : stat.xol0\n"), std::string::npos);
    EXPECT_NE(log.find("  Title  : stat.xol2\n"), std::string::npos);

    const Records stats = ReadRecords(dir / "stat.xol0"), area = ReadRecords(dir / "stat.xol2");
    const Records series = ReadRecords(dir / "series.xol0");
    ASSERT_EQ(series.size(), 61u);
    ASSERT_EQ(stats.size(), 3u);
    double largestSkewness = 0.0;
    for (int g = 0; g < 3; ++g) {
        std::vector<double> x, depth, P, Q;
        for (const auto& record : series) {
            x.push_back(record[4 * g][0]), depth.push_back(record[4 * g + 1][0]);
            P.push_back(record[4 * g + 2][0]), Q.push_back(record[4 * g + 3][0]);
        }
        double scale = 0.0;  // of the fluxes and velocities, for the means near 0
        for (size_t i = 0; i < P.size(); ++i)
            scale = std::max({scale, std::fabs(P[i]), std::fabs(Q[i]), std::fabs(P[i] / depth[i])});
        for (size_t out = 0; out < 3; ++out) {
            const std::vector<double> expected =
                OfflineStatistics(x, P, Q, depth, 20 * (out + 1), 0.1);
            for (int item = 1; item <= 14; ++item) {
                const double e = expected[item - 1], got = stats[out][14 * g + item - 1][0];
                const double tolerance = item >= 5 && item <= 10 ? 1e-5 * (item == 5 ? 0.03 : scale)
                                                                 : 1e-5 * std::max(1.0, std::fabs(e));
                EXPECT_NEAR(got, e, item <= 4 ? 1e-5 * std::fabs(e) : tolerance)
                    << "gauge " << g << " output " << out << " item " << item;
            }
            largestSkewness = std::max(largestSkewness, std::fabs(expected[10]));
        }
        // The area holds the same numbers at the gauge.
        const size_t at = static_cast<size_t>(std::stoi(rows.substr(3 * g, 1))) * 11 +
                          std::stoi(gauges.substr(3 * g, 1));
        EXPECT_EQ(area[2][0][at], stats[2][14 * g][0]);
        EXPECT_EQ(area[2][1][at], stats[2][14 * g + 4][0]);
    }
    EXPECT_GT(largestSkewness, 0.01);  // the moments are not trivially 0
    // Land has no samples; "Filt. elevation" has no value anywhere.
    EXPECT_EQ(area[0][0][0], kDelete);
    EXPECT_TRUE(std::ranges::all_of(area[1][2], [](float v) { return v == kDelete; }));
}

// A row of four water points in 1 m, whose surface the test sets at every
// step: surface(point, n), n = 0 the start. Runs the statistics of the
// settings made before over steps 1..steps and gives the records of items
// 1, 3, 4, 5, 11, 14 (in this order) at the four points.
Records RunRow(int32_t steps, const std::function<double(int32_t, int32_t)>& surface) {
    bwtest::LogCapture log;
    bwtest::TempDir dir;
    ResetModelState();
    GridState& g = gGrid;
    g.J = 3, g.K = 0, g.dx = g.dy = 1.0f, g.dt = 0.1, g.timeStepCount = steps;
    g.bed.assign(g.Points(), -1.0f);
    AllocateModelState();
    auto set = [&](int32_t n) {
        for (int32_t j = 0; j <= g.J; ++j) {
            g.xiPrev2[j] = g.xi[j];
            g.xi[j] = static_cast<float>(surface(j, n));
            g.depth[j] = g.xi[j] - g.bed[j];
        }
    };
    set(0);
    gStatisticOutput.records = {Record(dir / "row.xol1", 0, {1, 3, 4, 5, 11, 14})};
    gStatisticOutput.numberOfRecords = 1;
    StartStatistics();
    for (int32_t n = 1; n <= steps; ++n) {
        set(n);
        StatisticsOfStep(n);
    }
    CloseOutputStatistic();
    return ReadRecords(dir / "row.xol1");
}

// Items 1, 3, 4, 5 of the samples from..to of a series s(n): Hm0, the
// extremes (which start from 0) and the mean.
std::vector<double> Expected(const std::function<double(int32_t)>& s, int32_t from, int32_t to,
                             int32_t skip = -1) {
    double sum = 0, sum2 = 0, hi = 0, lo = 0, N = 0;
    for (int32_t n = from; n <= to; ++n) {
        if (n == skip) continue;
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

// A surface of pseudo-random steps between -0.2 and 0.2.
double Jumpy(int32_t n) { return 0.1 * ((n * 7) % 5 - 2); }

TEST(StatisticsRules, RestartsDryPointsAndPointsWithoutVariance) {
    // Point 0 moves; point 1 moves the same but is dry at step 6; point 2 is
    // still at 0.25; point 3 is wet only at step 1.
    auto surface = [](int32_t j, int32_t n) {
        if ((j == 1 && n == 6) || (j == 3 && n > 1)) return -1.5;
        return j == 2 ? 0.25 : Jumpy(n);
    };
    // Type 3, every 4 steps: each output covers its own four steps; the dry
    // point drops out of the output that holds step 6 and is back after the
    // restart; the time of first wave is the step of the restart.
    SetStatistics(3, 1, 0, 12, 4, OutputRecord2D{});
    Records r = RunRow(12, surface);
    ASSERT_EQ(r.size(), 3u);
    for (int32_t out = 0; out < 3; ++out) {
        const int32_t from = 4 * out + 1, to = from + 3;
        ExpectItems(r[out], 0, Expected(Jumpy, from, to), "type 3, moving point");
        EXPECT_FLOAT_EQ(r[out][5][0], 0.1f * from);
        if (out == 1) {
            for (int i = 0; i < 5; ++i) EXPECT_EQ(r[out][i][1], kDelete) << "dry point, item column " << i;
        } else {
            ExpectItems(r[out], 1, Expected(Jumpy, from, to), "type 3, point dry at step 6");
        }
        // A still point: the smallest height, its level, no skewness.
        ExpectItems(r[out], 2, {1e-4, 0.25, 0.25, 0.25}, "type 3, still point");
        EXPECT_EQ(r[out][4][2], kDelete);
    }
    // Type 2 from step 0: with Type_of_mean_calculation 1 a point that fell
    // dry has no value from then on; with 2 it keeps the statistics of its
    // wet steps, and a point of one sample has the smallest height.
    SetStatistics(2, 1, 0, 12, 4, OutputRecord2D{});
    r = RunRow(12, surface);
    ASSERT_EQ(r.size(), 3u);
    ExpectItems(r[0], 1, Expected(Jumpy, 1, 4), "type 2, before drying");
    EXPECT_EQ(r[1][3][1], kDelete);
    EXPECT_EQ(r[2][3][1], kDelete);
    EXPECT_EQ(r[2][5][1], 0.1f);  // the time of first wave stays
    ExpectItems(r[2], 0, Expected(Jumpy, 1, 12), "type 2, moving point");
    SetStatistics(2, 2, 0, 12, 4, OutputRecord2D{});
    r = RunRow(12, surface);
    ExpectItems(r[2], 1, Expected(Jumpy, 1, 12, 6), "type 2, mean calculation 2");
    EXPECT_FLOAT_EQ(r[2][0][3], 1e-4f);
    EXPECT_FLOAT_EQ(r[2][3][3], static_cast<float>(Jumpy(1)));
}

TEST(StatisticsRules, TypeOneStartsEachPointAfterItsFirstWave) {
    // Waves of 8 steps and 0.1 m: at point 0 from the start, at point 1 from
    // step 10; point 2 stays still, point 3 moves by less than Eps_High.
    // With one first wave a point starts when the surface falls after its
    // first rise: at step 3 and step 13.
    auto wave = [](int32_t n) { return 0.1 * std::sin(std::numbers::pi * n / 4.0); };
    auto surface = [&](int32_t j, int32_t n) {
        switch (j) {
            case 0: return wave(n);
            case 1: return n > 10 ? wave(n - 10) : 0.0;
            case 2: return 0.0;
            default: return 1e-5 * wave(n);
        }
    };
    SetStatistics(1, 1, 0, 24, 24, OutputRecord2D{}, 1);
    const Records r = RunRow(24, surface);
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
    const struct {
        std::string record, message;
    } cases[] = {
        {Spec(1, "stat.dt3", "0, 10, 1", "0, 8, 1", "1"),
         "SetupOutputDeterministic2D: Wrong file extension"},
        {Spec(1, "stat.xol2", "0, 10, 1", "0, 8, 1", "1, 18"),
         "WriteOutputStatistic: Wrong type of item"},
    };
    for (const auto& c : cases) {
        const bwtest::RunResult r = Run({{"Output_Statistic_2D", head + c.record}});
        EXPECT_EQ(r.exitCode, 1) << c.message;
        EXPECT_EQ(r.out, c.message + "\n");
    }
    // A Type of 0 writes nothing, whatever records follow.
    const bwtest::RunResult r =
        Run({{"Output_Statistic_2D",
              "Type = 0\nNumber_Of_Records = 1\n" + Spec(1, "none.xol2", "0, 10, 1", "0, 8, 1", "1")}});
    EXPECT_EQ(r.exitCode, 0) << r.out;
    EXPECT_FALSE(std::filesystem::exists(dir / "none.xol2"));
}
