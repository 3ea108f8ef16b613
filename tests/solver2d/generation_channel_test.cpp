// Waves born on a generation line in the middle of a channel, with a sponge
// layer in front of each end wall. A sine series of flux s on the line feeds
// both of the line's rows of points with s/dx in the continuity equation, so
// that the line gives 2 s of water per metre of line; linear theory of the
// equations (a Fourier integral over the forced continuity equation, with the
// dispersion terms taken of the surface's time derivative as the sweeps do)
// makes a wave of amplitude
//   a = s / (cg (1 + (B + 1/3) (kh)^2))
// on each side, cg the group velocity of the dispersion relation. Without the
// deep-water terms (B = 0) that is exactly a = s / c: half the water each way,
// carried at the celerity.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <complex>
#include <numbers>
#include <sstream>

#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "processes/internal_generation.hpp"
#include "processes/sponge.hpp"
#include "run/datetime.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"

namespace {

constexpr double kPi = std::numbers::pi;
using Complex = std::complex<double>;

// 30 cells a wavelength, 60 steps a period, in 1 m of water; 90 cells of
// open channel and 30 of sponge on each side of the line, which sits on the
// points `line` and `line` + 1 of the long axis.
constexpr int32_t kOpen = 90, kSponge = 30, kCells = 30, kSteps = 60;

struct GenChannel {
    double k = 0.0, c = 0.0, cg = 0.0, F = 0.0, omega = 0.0, dx = 0.0, dt = 0.0;
    int32_t n = 0;     // highest index along the channel
    int32_t line = 0;  // the line's own row along the channel
    int32_t steps = 0;
};

double WaveNumber(double omega, double B) {
    double lo = 1e-6, hi = 100.0;
    for (int i = 0; i < 200; ++i)
        (bwtest::Omega2(0.5 * (lo + hi), 1.0, B) < omega * omega ? lo : hi) = 0.5 * (lo + hi);
    return 0.5 * (lo + hi);
}

// How the line is fed: a series (Wave_Type 0) or a line file (Wave_Type 1),
// with or without the deep-water terms and their second item.
struct Feed {
    int32_t waveType = 0;
    bool deep = false;
    double s = 0.002;     // amplitude of the flux series, m2/s
    double deepItem = 0;  // amplitude of item 2, in phase with the flux
    int32_t handle = 0;   // Convective_terms_handle: 0 the central sweeps, else the upwind ones
};

// Builds the channel along x (axis 1, a kind 1 line across it) or along y
// (axis 2, a kind 2 line), writes the series or line file of the feed (a sine
// of period T after a cosine ramp of four periods, one record a step) and
// sets up internal generation from a model section, as the reader does.
GenChannel MakeGenerationChannel(const bwtest::TempDir& dir, int32_t axis, const Feed& feed,
                                 double T, int32_t periods) {
    const double B = feed.deep ? static_cast<double>(1.0f / 15.0f) : 0.0;
    GenChannel ch;
    ch.omega = 2.0 * kPi / T;
    ch.k = WaveNumber(ch.omega, B);
    ch.c = ch.omega / ch.k;
    const double e = 1e-6 * ch.k;
    ch.cg = (std::sqrt(bwtest::Omega2(ch.k + e, 1.0, B)) -
             std::sqrt(bwtest::Omega2(ch.k - e, 1.0, B))) /
            (2.0 * e);
    ch.F = 1.0 + (B + 1.0 / 3.0) * ch.k * ch.k;
    ch.dt = T / kSteps;
    ch.steps = kSteps * periods;
    ch.n = 2 * (kOpen + kSponge) + 3;
    ch.line = kSponge + kOpen + 1;

    bwtest::BasinSpec s;
    s.dx = s.dy = static_cast<float>(2.0 * kPi / ch.k / kCells);
    (axis == 1 ? s.J : s.K) = ch.n;
    (axis == 1 ? s.K : s.J) = 4;
    s.dt = ch.dt, s.steps = ch.steps, s.deepWater = feed.deep, s.convectiveHandle = feed.handle;
    bwtest::MakeBasin(s);
    ch.dx = s.dx;
    GridState& g = gGrid;
    g.start = MakeDateTime(2004, 1, 1, 0, 0, 0);
    g.lastStep = ch.steps - 1;

    // Sponges in front of both end walls, rising with the square of the
    // distance into them.
    gSponge.spongeType = true;
    for (int32_t a = 0; a <= ch.n; ++a) {
        const int32_t into = std::max(kSponge + 1 - a, a - (ch.n - kSponge - 1));
        if (into <= 0) continue;
        const double d = static_cast<double>(into) / kSponge;
        for (int32_t b = 0; b <= 4; ++b)
            gSponge.sponge[axis == 1 ? g.At(a, b) : g.At(b, a)] =
                static_cast<float>(1.0 + 0.3 * d * d);
    }

    std::vector<float> flux(ch.steps + 1), across(ch.steps + 1);
    const double ramp = 4.0 * T;
    for (int32_t n = 0; n <= ch.steps; ++n) {
        const double t = n * ch.dt, rise = t < ramp ? 0.5 * (1.0 - std::cos(kPi * t / ramp)) : 1.0;
        flux[n] = static_cast<float>(feed.s * rise * std::sin(ch.omega * t));
        across[n] = static_cast<float>(feed.deepItem * rise * std::sin(ch.omega * t));
    }
    const std::string name = feed.waveType == 0 ? "gen.xol0" : "gen.xol1";
    if (feed.waveType == 0) {
        bwtest::WriteSeriesFile(dir / name, "2004-01-01 00:00:00", ch.dt, {flux, across});
    } else {
        // The three points of the line, each the same value.
        std::vector<std::vector<std::vector<float>>> items(2);
        for (int32_t n = 0; n <= ch.steps; ++n) {
            items[0].push_back(std::vector<float>(3, flux[n]));
            items[1].push_back(std::vector<float>(3, across[n]));
        }
        bwtest::WriteLineFile(dir / name, "2004-01-01 00:00:00", ch.dt, s.dx, items);
    }
    const int32_t first[2] = {axis == 1 ? ch.line : 1, axis == 1 ? 1 : ch.line};
    const int32_t last[2] = {axis == 1 ? ch.line : 3, axis == 1 ? 3 : ch.line};
    std::ostringstream m;
    m << "TARNEL_BOUSSINESQ_WAVE {\nInternal_Generation {\nNumber_Of_Records = 1\n"
      << "INTERNAL_GEN_DATA_1 {\nFirst_Line_Pos = " << first[0] << ", " << first[1]
      << "\nLast_Line_Pos = " << last[0] << ", " << last[1] << "\nWave_Type = " << feed.waveType
      << "\nDATA_FILE {\nFile_name = file(\"" << name
      << "\")\nItem_Count = 2\nItem_Numbers = 1, 2\n}\n}\n}\n}\n";
    bwtest::WriteFile(dir / "m.bw", m.str());
    KvtHandle file = KvtOpenFile(dir / "m.bw", false);
    SetupInternalGeneration(KvtOpenTarget(file, "TARNEL_BOUSSINESQ_WAVE"));
    kvtClose(&file);
    return ch;
}

void CloseLineFiles() {
    for (InternalLineFile& l : gGeneration.lineFiles)
        if (l.file.mode == 1) XolClose(l.file);
    gGeneration = GenerationState{};
}

// The surface along the middle of the channel.
float SurfaceAt(int32_t axis, int32_t a) {
    return gGrid.xi[axis == 1 ? gGrid.At(a, 2) : gGrid.At(2, a)];
}

// One side of the line: the wave going away from it and the one coming back
// from the sponge, Z(x) = out e^(i k x) + back e^(-i k x) (x pointing away
// from the line), fitted to the complex amplitudes of the points by least
// squares, with the wave number the one of the best fit.
struct SideFit {
    double k = 0.0;
    Complex out, back;
};

SideFit FitSide(const std::vector<Complex>& z, const std::vector<double>& x, double k0) {
    auto solve = [&](double k, SideFit& f) {
        // Normal equations of the two unknowns.
        Complex a11, a12, a22, b1, b2;
        for (size_t i = 0; i < z.size(); ++i) {
            const Complex e1 = std::polar(1.0, k * x[i]), e2 = std::conj(e1);
            a11 += std::conj(e1) * e1, a12 += std::conj(e1) * e2, a22 += std::conj(e2) * e2;
            b1 += std::conj(e1) * z[i], b2 += std::conj(e2) * z[i];
        }
        const Complex det = a11 * a22 - a12 * std::conj(a12);
        f.k = k;
        f.out = (b1 * a22 - a12 * b2) / det;
        f.back = (a11 * b2 - std::conj(a12) * b1) / det;
        double r = 0.0;
        for (size_t i = 0; i < z.size(); ++i)
            r += std::norm(z[i] - f.out * std::polar(1.0, k * x[i]) -
                           f.back * std::polar(1.0, -k * x[i]));
        return r;
    };
    // Golden section over +-10 % of the expected wave number.
    double lo = 0.9 * k0, hi = 1.1 * k0;
    const double phi = (std::sqrt(5.0) - 1.0) / 2.0;
    SideFit f;
    for (int i = 0; i < 60; ++i) {
        const double k1 = hi - phi * (hi - lo), k2 = lo + phi * (hi - lo);
        if (solve(k1, f) < solve(k2, f))
            hi = k2;
        else
            lo = k1;
    }
    solve(0.5 * (lo + hi), f);
    return f;
}

struct Measured {
    SideFit side[2];  // 0 the low side, 1 the high side
};

// Runs the channel and fits both sides over the last four periods, on the
// open channel from one wavelength off the line to the sponge.
Measured RunAndFit(const GenChannel& ch, int32_t axis) {
    const int32_t from = ch.steps - 4 * kSteps;
    std::vector<Complex> z(ch.n + 1);
    bwtest::RunSteps(ch.steps, [&](int32_t n) {
        if (n <= from) return;
        const Complex w = std::polar(2.0 / (4 * kSteps), ch.omega * n * ch.dt);
        for (int32_t a = 0; a <= ch.n; ++a) z[a] += w * static_cast<double>(SurfaceAt(axis, a));
    });
    Measured m;
    const double centre = ch.line + 0.5;  // the line's two rows stand about this
    for (int side = 0; side < 2; ++side) {
        std::vector<Complex> zs;
        std::vector<double> xs;
        for (int32_t d = kCells; d <= kOpen - 1; ++d) {
            const int32_t a = side == 1 ? ch.line + 1 + d : ch.line - d;
            zs.push_back(z[a]);
            xs.push_back(std::fabs(a - centre) * ch.dx);
        }
        m.side[side] = FitSide(zs, xs, ch.k);
    }
    return m;
}

class GenerationChannel : public testing::Test {
protected:
    bwtest::LogCapture log;
    bwtest::TempDir dir;
    void TearDown() override { CloseLineFiles(); }
};

TEST_F(GenerationChannel, ASineOnTheLineSendsTheWaveOfTheRelationWithTheAmplitudeOfItsFlux) {
    // Lines across the channel along x and along y, the deep-water terms
    // with a second item of 0, and the upwind sweeps.
    const struct {
        int32_t axis;
        bool deep;
        int32_t handle;
    } cases[] = {{1, false, 0}, {2, false, 0}, {1, true, 0}, {2, true, 2}};
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message()
                     << "axis " << c.axis << " deep " << c.deep << " handle " << c.handle);
        Feed feed;
        feed.deep = c.deep;
        feed.handle = c.handle;
        const GenChannel ch = MakeGenerationChannel(dir, c.axis, feed, 2.0, 16);
        const Measured m = RunAndFit(ch, c.axis);
        const double a = feed.s / (ch.cg * ch.F);
        if (!c.deep) {
            EXPECT_NEAR(a * ch.c / feed.s, 1.0, 1e-6);  // the theory itself
        }
        for (int side = 0; side < 2; ++side) {
            const SideFit& f = m.side[side];
            const double R = std::norm(f.back) / std::norm(f.out);
            EXPECT_NEAR(ch.k / f.k, 1.0, 0.01) << "side " << side;
            EXPECT_NEAR(std::abs(f.out) / a, 1.0, 0.03) << "side " << side;
            EXPECT_LT(R, 0.05) << "side " << side;
        }
        CloseLineFiles();
    }
}

TEST_F(GenerationChannel, ALineFileGivesTheSameWavesAsTheSeriesOfItsValues) {
    // One record a step: the file's value in the middle of a step is the
    // mean of two records, as the series's is; with the deep-water terms and
    // a second item that is not 0, so that both items pass through the file.
    std::vector<float> surfaces[2];
    for (int32_t waveType : {0, 1}) {
        Feed feed;
        feed.waveType = waveType, feed.deep = true, feed.deepItem = 0.0005;
        const GenChannel ch = MakeGenerationChannel(dir, 1, feed, 2.0, 6);
        bwtest::RunSteps(ch.steps);
        for (int32_t j = 1; j < ch.n; ++j) surfaces[waveType].push_back(SurfaceAt(1, j));
        CloseLineFiles();
    }
    double largest = 0.0, difference = 0.0;
    for (size_t j = 0; j < surfaces[0].size(); ++j) {
        largest = std::max(largest, std::fabs(static_cast<double>(surfaces[0][j])));
        difference =
            std::max(difference, std::fabs(static_cast<double>(surfaces[1][j]) - surfaces[0][j]));
    }
    // The wave is some 0.8 mm high; the two runs differ by rounding only,
    // while a second item left out changes the surface by a twentieth of it.
    EXPECT_GT(largest, 5e-4);
    EXPECT_LT(difference, 1e-3 * largest);
}

}  // namespace
