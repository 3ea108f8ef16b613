// Waves from H and T: the pieces that can hide a fault (the wave number,
// the spectrum, the directions, the seed, the phase along a line), then the
// files as the engine reads them, driving a channel whose waves must have
// the height asked for.
#include "bwdata/waves.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <complex>
#include <filesystem>
#include <numbers>

#include "input/model_setup.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/sponge.hpp"
#include "run/datetime.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"
#include "tools/bwdata/tool_fixture.hpp"

namespace fs = std::filesystem;

namespace {

constexpr double kPi = std::numbers::pi;
const double kB = static_cast<double>(1.0f / 15.0f);  // the model's dispersion factor
const char* kStart = "2004-01-01 00:00:00";

// The wave number against a bisection of the relation written out apart,
// over kd from shallow to deep water, with and without the deep-water terms.
TEST(WavesPieces, TheWaveNumberSolvesTheRelationOfTheEquations) {
    for (double B : {0.0, kB, 0.2})
        for (double d : {0.3, 1.0, 12.0})
            for (double T : {1.2, 2.0, 5.0, 20.0}) {
                SCOPED_TRACE(testing::Message() << "B " << B << " d " << d << " T " << T);
                const double omega = 2.0 * kPi / T, k = WavesNumber(omega, d, B);
                if (B == 0.0 && omega * omega >= 3.0 * kWavesGravity / d) {
                    EXPECT_EQ(k, 0.0);  // beyond the highest frequency of the classical form
                    continue;
                }
                EXPECT_NEAR(k / bwtest::WaveNumber(omega, d, B), 1.0, 1e-9);
                EXPECT_NEAR(WavesOmega2(k, d, B) / (omega * omega), 1.0, 1e-12);
                // The group velocity against a central difference of omega(k).
                const double e = 1e-5 * k;
                const double cg = (std::sqrt(bwtest::Omega2(k + e, d, B)) -
                                   std::sqrt(bwtest::Omega2(k - e, d, B))) /
                                  (2.0 * e);
                EXPECT_NEAR(WavesGroupVelocity(k, d, B) / cg, 1.0, 1e-7);
            }
    // Long waves run at sqrt(g d), whatever B.
    EXPECT_NEAR(WavesNumber(2.0 * kPi / 600.0, 2.0, kB) * std::sqrt(kWavesGravity * 2.0) /
                    (2.0 * kPi / 600.0),
                1.0, 1e-4);
}

WavesOptions Irregular(double hm0, double tp) {
    WavesOptions o;
    o.irregular = true, o.hm0 = hm0, o.tp = tp, o.depth = 20.0, o.B = kB, o.deep = true;
    return o;
}

double M0(const std::vector<WaveComponent>& waves) {
    double m0 = 0.0;
    for (const WaveComponent& c : waves) m0 += 0.5 * c.amplitude * c.amplitude;
    return m0;
}

// The spectrum holds (Hm0/4)^2 whatever its discretisation, and has the
// shape of JONSWAP: the peak where asked and, over a wide band, the ratios
// of periods of the literature (Tp/Tm01 = 1.199 with gamma 3.3, 1.296 for
// the Pierson-Moskowitz form of gamma 1).
TEST(WavesPieces, TheSpectrumHoldsHm0AndHasTheShapeOfJonswap) {
    for (int32_t n : {7, 50, 400}) {
        WavesOptions o = Irregular(1.5, 8.0);
        o.components = n;
        std::vector<WaveComponent> waves;
        ASSERT_EQ(WaveComponents(o, waves), "");
        ASSERT_EQ(waves.size(), static_cast<size_t>(n));
        EXPECT_NEAR(M0(waves) / (1.5 * 1.5 / 16.0), 1.0, 1e-12) << n << " components";
        const auto peak =
            std::ranges::max_element(waves, {}, [](const WaveComponent& c) { return c.amplitude; });
        EXPECT_NEAR(peak->omega * 8.0 / (2.0 * kPi), 1.0, 2.0 / n + 1e-3) << n << " components";
    }
    for (const auto& [gamma, ratio] : {std::pair{3.3, 1.199}, std::pair{1.0, 1.296}}) {
        WavesOptions o = Irregular(1.0, 10.0);
        o.gamma = gamma, o.bandLow = 0.2, o.bandHigh = 8.0, o.components = 4000;
        std::vector<WaveComponent> waves;
        ASSERT_EQ(WaveComponents(o, waves), "");
        double m1 = 0.0;
        for (const WaveComponent& c : waves) m1 += 0.5 * c.amplitude * c.amplitude * c.omega;
        const double tm01 = 2.0 * kPi * M0(waves) / m1;
        EXPECT_NEAR(10.0 / tm01, ratio, 0.005) << "gamma " << gamma;
    }
}

// The seed alone fixes the phases and directions; the directions spread as
// cos^2s((theta - mean)/2) does, with a standard deviation of sqrt(2/(s+1)),
// and stay on the water's side of a boundary.
TEST(WavesPieces, TheSeedRepeatsTheSeaAndTheDirectionsSpreadAsAsked) {
    WavesOptions o = Irregular(1.0, 8.0);
    o.spreading = 10.0, o.directionGiven = true, o.direction = 20.0, o.seed = 7;
    std::vector<WaveComponent> a, b, c;
    ASSERT_EQ(WaveComponents(o, a), "");
    ASSERT_EQ(WaveComponents(o, b), "");
    o.seed = 8;
    ASSERT_EQ(WaveComponents(o, c), "");
    int32_t samePhase = 0, sameDirection = 0;
    for (size_t i = 0; i < a.size(); ++i) {
        EXPECT_EQ(a[i].phase, b[i].phase);
        EXPECT_EQ(a[i].direction, b[i].direction);
        samePhase += a[i].phase == c[i].phase;
        sameDirection += a[i].direction == c[i].direction;
    }
    EXPECT_LT(samePhase, 3);
    EXPECT_LT(sameDirection, 10);
    double mean = 0.0, var = 0.0;
    for (const WaveComponent& w : a) mean += w.direction / a.size();
    for (const WaveComponent& w : a) var += (w.direction - mean) * (w.direction - mean) / a.size();
    EXPECT_NEAR(mean * 180.0 / kPi, 20.0, 0.5);
    EXPECT_NEAR(std::sqrt(var) / std::sqrt(2.0 / 11.0), 1.0, 0.03);
    // A wide spreading at a south boundary: every direction travels north.
    o.side = WaveSide::kSouth, o.spreading = 1.0, o.direction = 60.0;
    ASSERT_EQ(WaveComponents(o, a), "");
    for (const WaveComponent& w : a) EXPECT_GT(std::sin(w.direction), 0.0);
    // A mean that leaves the water is refused.
    o.direction = 200.0;
    EXPECT_NE(WaveComponents(o, a), "");
}

class WavesFile : public DataTool {
protected:
    bwtest::LogCapture log;
    WavesOptions Regular(WaveDrive drive, double H, double T) const {
        WavesOptions o;
        o.drive = drive, o.height = H, o.period = T, o.depth = 1.0, o.B = kB, o.deep = true;
        o.start = kStart, o.dt = T / 40.0, o.duration = 4.0 * T, o.ramp = T;
        return o;
    }
};

// Along a line the crests of an oblique wave arrive later the further they
// have to travel: point s of a west boundary, for waves heading north of
// east, is point 0 delayed by s dy sin(theta) / c; the same for a
// generation line, whose file has the deep-water item as well.
TEST_F(WavesFile, TheCrestsRunAlongALineWithTheDirection) {
    for (WaveDrive drive : {WaveDrive::kLevel, WaveDrive::kSource}) {
        WavesOptions o = Regular(drive, 0.1, 2.0);
        o.side = drive == WaveDrive::kLevel ? WaveSide::kWest : WaveSide::kX;
        o.directionGiven = true, o.direction = 30.0, o.points = 9, o.gridGiven = true;
        o.dx = 0.5, o.dy = 0.25;
        const double k = WavesNumber(kPi, 1.0, kB), delay = 8 * 0.25 * 0.5 / (kPi / k);
        constexpr int32_t kLag = 40;  // the delay from point 0 to point 8 in steps
        o.dt = delay / kLag, o.duration = 8.0, o.ramp = 1.0;
        const std::string path = dir / "line.xol1";
        ASSERT_EQ(WriteWaves(path, o), "");
        const bwtest::DataFile f = bwtest::ReadDataFile(path);
        ASSERT_EQ(f.header.axes[0].count, 9);
        EXPECT_FLOAT_EQ(f.header.axes[0].spacing, 0.25f);
        ASSERT_EQ(f.header.noDynamicItems, drive == WaveDrive::kSource ? 2 : 1);
        ASSERT_GT(f.records.size(), 4u * kLag);
        for (float v : f.records[0][0]) EXPECT_EQ(v, 0.0f);  // a sine from the ramp's foot
        const size_t from = static_cast<size_t>(1.0 / o.dt) + kLag + 1;  // behind the ramp
        double largest = 0.0, worst = 0.0;
        for (size_t n = from; n < f.records.size(); ++n)
            for (size_t item = 0; item < f.records[n].size(); ++item) {
                const double late = f.records[n][item][8], early = f.records[n - kLag][item][0];
                largest = std::max(largest, std::fabs(early));
                worst = std::max(worst, std::fabs(late - early));
            }
        EXPECT_LT(worst, 1e-5 * largest);
        if (drive == WaveDrive::kLevel) {
            EXPECT_NEAR(largest, 0.05, 1e-4);
        }
    }
}

// The failures of the command: what is wrong, the exit code 1, no file.
TEST_F(WavesFile, BadInputIsRefusedAndLeavesNoFile) {
    const std::vector<std::string> base = {"waves", "-o",      "w.xol0", "--depth",
                                           "1",     "--dt",    "0.05",   "--duration",
                                           "10",    "--start", kStart};
    const struct {
        std::vector<std::string> extra;
        const char* says;
    } cases[] = {
        {{"--drive", "level", "--height", "0.1"}, "--period needs a positive period"},
        {{"--drive", "level", "--height", "0.1", "--period", "2", "--hm0", "1"}, "not both"},
        {{"--drive", "wave", "--height", "0.1", "--period", "2"}, "--drive needs level"},
        {{"--drive", "source", "--side", "west", "--height", "0.1", "--period", "2"},
         "--side of a generation line is x"},
        {{"--drive", "level", "--height", "0.1", "--period", "0.5"}, "has no wave in 1 m"},
        {{"--drive", "level", "--height", "0.1", "--period", "2", "--side", "east", "--direction",
          "10"},
         "does not point into the water"},
        {{"--drive", "flux", "--height", "0.1", "--period", "2", "--deep", "0.0667"},
         "needs --grid"},
        {{"--drive", "level", "--height", "0.1", "--period", "2", "--points", "5"},
         "a line file needs --grid"},
        {{"--drive", "level", "--hm0", "0.1", "--tp", "2", "--band", "1.2,3"}, "--band needs"},
        {{"--drive", "level", "--height", "x", "--period", "2"}, "--height does not take 'x'"},
    };
    for (const auto& c : cases) {
        std::vector<std::string> args = base;
        args.insert(args.end(), c.extra.begin(), c.extra.end());
        Refused(args, c.says);
    }
    // A good command writes the file; one into a missing folder leaves nothing.
    std::vector<std::string> good = base;
    for (const char* a : {"--drive", "level", "--height", "0.1", "--period", "2"})
        good.push_back(a);
    Ok(good);
    EXPECT_TRUE(fs::exists(dir / "w.xol0"));
    good[2] = "no/such/w.xol0";
    EXPECT_EQ(Run(good).exitCode, 1);
    EXPECT_FALSE(fs::exists(dir / "no"));
}

// A channel along x in 1 m of water with the deep-water terms, K = 4, the
// surface read along its middle row. A boundary channel has its level or
// flux boundary at j = 0, `open` cells of open water and a sponge at the
// east end; a generation channel has its line on the rows `line` and
// `line` + 1 with `open` cells and a sponge on each side.
constexpr int32_t kSponge = 30;

struct Flume {
    double dx = 0.0, dt = 0.0;
    int32_t n = 0, steps = 0, line = 0, open = 0;
    bool generation = false;
};

Flume MakeFlume(const bwtest::TempDir& dir, WavesOptions o, double dx, int32_t stepsPerPeriod,
                int32_t open, int32_t steps) {
    Flume f;
    f.generation = o.drive == WaveDrive::kSource;
    f.dx = dx, f.open = open, f.steps = steps;
    f.dt = (o.irregular ? o.tp : o.period) / stepsPerPeriod;
    f.n = f.generation ? 2 * (open + kSponge) + 3 : open + kSponge + 1;
    f.line = f.generation ? kSponge + open + 1 : 0;
    bwtest::BasinSpec b;
    b.dx = b.dy = static_cast<float>(dx);
    b.J = f.n, b.K = 4, b.dt = f.dt, b.steps = steps, b.deepWater = true;
    b.frameWest = f.generation;
    bwtest::MakeBasin(b);
    GridState& g = gGrid;
    g.start = MakeDateTime(2004, 1, 1, 0, 0, 0);
    g.lastStep = steps - 1;
    // The sponges rise with the square of the distance into them.
    gSponge.spongeType = true;
    for (int32_t j = 0; j <= f.n; ++j) {
        const int32_t into = std::max(f.generation ? kSponge + 1 - j : 0, j - (f.n - kSponge - 1));
        for (int32_t k = 0; k <= 4 && into > 0; ++k)
            gSponge.sponge[g.At(j, k)] =
                static_cast<float>(1.0 + 0.3 * into * into / (kSponge * kSponge));
    }
    // The file of the tool, as the model's setup reads it.
    o.depth = 1.0, o.B = kB, o.deep = true, o.start = kStart, o.dt = f.dt;
    o.duration = (steps + 2) * f.dt;
    o.gridGiven = true, o.dx = o.dy = static_cast<float>(dx);
    const std::string file = o.points > 0 ? "w.xol1" : "w.xol0";
    EXPECT_EQ(WriteWaves(dir / file, o), "");
    if (f.generation) {
        bwtest::SetupFromText(
            dir,
            "Internal_Generation {\nNumber_Of_Records = 1\n" +
                bwtest::GenerationRecord(1, f.line, 1, f.line, 3, o.points > 0, file) + "}\n",
            SetupInternalGeneration);
    } else {
        const std::string formulation = o.drive == WaveDrive::kFlux ? "1" : "0";
        bwtest::SetupFromText(
            dir,
            "Boundary_Location {\nNumber_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\n"
            "First_Point = 0, 1\nLast_Point = 0, 3\nFormulation = " +
                formulation +
                "\nData_Specification = 0\nDATA_FILE {\nFile_name = file(\"w.xol0\")\n"
                "Item_Count = 2\nItem_Numbers = 1, 2\n}\n}\n}\n",
            SetupOpenBoundaries);
    }
    return f;
}

// The open cells of the flume, from two cells off the boundary or the line.
std::vector<int32_t> OpenCells(const Flume& f) {
    std::vector<int32_t> cells;
    for (int32_t d = 2; d <= f.open - 2; ++d) {
        if (!f.generation) cells.push_back(d);
        if (f.generation) cells.insert(cells.end(), {f.line - d, f.line + 1 + d});
    }
    return cells;
}

float Surface(int32_t j) {
    return gGrid.xi[gGrid.At(j, 2)];
}

class WavesChannel : public WavesFile {
protected:
    void TearDown() override { bwtest::ClearGeneration(); }
};

// Regular waves of height H from a level boundary, a flux boundary and a
// generation line fed by a series or by a line file of its three points:
// the wave in the channel has the height asked for.
TEST_F(WavesChannel, RegularWavesHaveTheHeightAskedFor) {
    const std::pair<WaveDrive, int32_t> feeds[] = {{WaveDrive::kLevel, 0},
                                                   {WaveDrive::kFlux, 0},
                                                   {WaveDrive::kSource, 0},
                                                   {WaveDrive::kSource, 3}};
    // kd about 1.1 and 2.1.
    for (const double kT : {2.0, 1.4}) {
        for (const auto& [drive, points] : feeds) {
            SCOPED_TRACE(testing::Message() << "drive " << static_cast<int>(drive) << " points "
                                            << points << " T " << kT);
            constexpr double kH = 0.02;
            WavesOptions o = Regular(drive, kH, kT);
            o.ramp = 3.0 * kT, o.points = points;
            const double k = WavesNumber(2.0 * kPi / kT, 1.0, kB);
            const Flume f = MakeFlume(dir, o, 2.0 * kPi / k / 30.0, 60, 75, 14 * 60);
            // The complex amplitude at each point over the last four periods.
            const auto cells = OpenCells(f);
            std::vector<std::complex<double>> z(cells.size());
            const int32_t from = f.steps - 4 * 60;
            bwtest::RunSteps(f.steps, [&](int32_t n) {
                if (n <= from) return;
                const auto w = std::polar(2.0 / (4 * 60), -2.0 * kPi / kT * n * f.dt);
                for (size_t m = 0; m < cells.size(); ++m) z[m] += w * double(Surface(cells[m]));
            });
            // The root mean square of the amplitudes: a wave reflected by the
            // sponge with the fraction R adds R^2 to it, and its beat with the
            // outgoing wave averages out over the wavelengths of the channel.
            double sum = 0.0;
            for (const auto& v : z) sum += std::norm(v) / z.size();
            const double H = 2.0 * std::sqrt(sum);
            EXPECT_NEAR(H / kH, 1.0, 0.03);
            std::printf("regular drive %d, %d points, T %.1f: H %.5f of %.5f (%+.2f %%)\n",
                        static_cast<int>(drive), points, kT, H, kH, 100.0 * (H / kH - 1.0));
            bwtest::ClearGeneration();
        }
    }
}

// An irregular sea of a JONSWAP spectrum from a level boundary and from a
// generation line: 4 sqrt(m0) of the surface in the channel, over one
// period of the components' repetition, is the Hm0 asked for.
TEST_F(WavesChannel, AnIrregularSeaHasTheHm0AskedFor) {
    for (WaveDrive drive : {WaveDrive::kLevel, WaveDrive::kSource}) {
        SCOPED_TRACE(testing::Message() << "drive " << static_cast<int>(drive));
        constexpr double kHm0 = 0.04, kTp = 2.0;
        WavesOptions o;
        o.drive = drive, o.irregular = true, o.hm0 = kHm0, o.tp = kTp, o.seed = 11;
        o.bandLow = 0.6, o.bandHigh = 1.8, o.components = 60, o.ramp = 3.0 * kTp;
        // The components repeat after 1/df = 100 s = 2000 steps.
        const double k = WavesNumber(2.0 * kPi / kTp, 1.0, kB);
        constexpr int32_t kRecord = 2000, kSpinUp = 400;
        const Flume f = MakeFlume(dir, o, 2.0 * kPi / k / 30.0, 40, 60, kSpinUp + kRecord);
        const auto cells = OpenCells(f);
        std::vector<double> sum(cells.size()), sum2(cells.size());
        bwtest::RunSteps(f.steps, [&](int32_t n) {
            if (n <= kSpinUp) return;
            for (size_t m = 0; m < cells.size(); ++m) {
                const double v = Surface(cells[m]);
                sum[m] += v, sum2[m] += v * v;
            }
        });
        double m0 = 0.0;
        for (size_t m = 0; m < cells.size(); ++m)
            m0 += (sum2[m] / kRecord - std::pow(sum[m] / kRecord, 2)) / cells.size();
        const double hm0 = 4.0 * std::sqrt(m0);
        EXPECT_NEAR(hm0 / kHm0, 1.0, 0.05);
        std::printf("irregular drive %d: Hm0 %.5f of %.5f (%+.2f %%)\n", static_cast<int>(drive),
                    hm0, kHm0, 100.0 * (hm0 / kHm0 - 1.0));
        bwtest::ClearGeneration();
    }
}

}  // namespace
