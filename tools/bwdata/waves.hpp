// Series that drive a model, computed from a wave height and period: the
// level or flux of an open boundary, or the source of a generation line, for
// regular waves or for a JONSWAP spectrum with directional spreading. The
// waves are those of the equations solved: their wave number follows the
// dispersion relation of the model, not linear Airy theory.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

// The acceleration of gravity of the model, m/s2.
constexpr double kWavesGravity = static_cast<double>(9.81f);

// omega^2 of the wave number k in depth d, B the dispersion factor (0
// without the deep-water terms):
//   omega^2 = g d k^2 (1 + B (kd)^2) / (1 + (B + 1/3) (kd)^2).
double WavesOmega2(double k, double depth, double B);
// The wave number of angular frequency omega, or 0 if the relation carries
// no wave of that frequency (without the deep-water terms omega^2 stays
// below 3 g / d).
double WavesNumber(double omega, double depth, double B);
// d omega / d k at the wave number k.
double WavesGroupVelocity(double k, double depth, double B);

// One component of the sea surface: a cos(omega t - kx x - ky y + phase),
// direction the angle of (kx, ky) from the x axis in radians.
struct WaveComponent {
    double amplitude = 0.0, omega = 0.0, k = 0.0, direction = 0.0, phase = 0.0;
};

// What the series drives and where the line lies.
enum class WaveDrive { kLevel, kFlux, kSource };
enum class WaveSide { kWest, kEast, kSouth, kNorth, kX, kY };

struct WavesOptions {
    WaveDrive drive = WaveDrive::kLevel;
    WaveSide side = WaveSide::kWest;
    double depth = 0.0;
    double B = 0.0;  // the dispersion factor with the deep-water terms
    bool deep = false;
    // Regular waves (irregular = false): height and period.
    bool irregular = false;
    double height = 0.0, period = 0.0;
    // Irregular waves: a JONSWAP spectrum of Hm0, Tp and gamma, cut to
    // bandLow..bandHigh times the peak frequency, in `components` bands;
    // spreading s of cos^2s((theta - mean) / 2), 0 for long-crested waves.
    double hm0 = 0.0, tp = 0.0, gamma = 3.3, spreading = 0.0;
    double bandLow = 0.5, bandHigh = 2.5;
    int32_t components = 200;
    uint64_t seed = 1;
    bool directionGiven = false;
    double direction = 0.0;  // degrees from the x axis, the way the waves travel
    // The file: records dt apart over duration from start, a half-cosine
    // ramp over the first `ramp` seconds.
    std::string start;
    double dt = 0.0, duration = 0.0, ramp = 0.0;
    // A line file of `points` points (0: a series); the model's spacings.
    int32_t points = 0;
    double dx = 0.0, dy = 0.0;
    bool gridGiven = false;
    std::string title;
};

// The components of the options' waves, or what is wrong with them.
std::string WaveComponents(const WavesOptions& options, std::vector<WaveComponent>& components);

// Writes the file of the options: a series (.xol0) of the main value and the
// deep-water value, or a line file (.xol1) of one value a point (a boundary)
// or of the two (a generation line). Empty on success, else what is wrong;
// no file is left behind on a failure.
std::string WriteWaves(const std::string& output, const WavesOptions& options);

// `bwdata waves ...`: the arguments after the command; prints what is
// wrong and returns the exit code.
int WavesCommand(const std::vector<std::string>& args);
