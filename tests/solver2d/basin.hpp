// Small models of the 2DH solver built in memory, without a model file: a
// rectangular basin with a frame of land, a surface given by a formula, and
// the time loop driven step by step.
#pragma once

#include <cstdint>
#include <functional>
#include <vector>

namespace bwtest {

struct BasinSpec {
    int32_t J = 20, K = 4;  // highest indices; j = 0, J and k = 0, K are land
    float dx = 1.0f, dy = 1.0f;
    double dt = 0.1;
    int32_t steps = 100;     // rows of the series store
    bool deepWater = false;  // the deep-water terms, with a dispersion factor of 1/15
    int32_t convectiveHandle = 0;
    int32_t threads = 1;
    float extrapolation = 0.0f;  // Time_extrapolation_factor_lower with the deep-water terms
    bool frameWest = true;       // land at j = 0 (the east, south and north frames are always land)
};

// Resets the model state and builds the basin in 1 m of water.
void MakeBasin(const BasinSpec& basin);
// Sets the cold-start surface at every point (land keeps its own).
void SetSurface(const std::function<float(float x, float y)>& surface);
// Chains and buffers, then steps 1..steps, calling after(n) behind each.
void RunSteps(int32_t steps, const std::function<void(int32_t)>& after = {});
// The total depth summed over the water points times the cell area.
double TotalVolume();
// The projection of the surface on a shape over the water points.
double Project(const std::function<double(float x, float y)>& shape);
// Times of the zero crossings of a sampled signal (linear interpolation).
std::vector<double> ZeroCrossings(const std::vector<double>& values, double dt);

// w^2 of the wave number k in depth d by the linear dispersion relation of
// the equations solved, B the dispersion factor (0 without the deep-water terms):
//   w^2 = g d k^2 (1 + B (kd)^2) / (1 + (B + 1/3) (kd)^2).
double Omega2(double k, double d, double B);
// The wave number of angular frequency omega in depth d, by bisection.
double WaveNumber(double omega, double d, double B);

// An open boundary of the formulation (0 level, 1 flux) along the west end,
// j = 0 and k = 1..K-1, driven by series and, if not empty, by deep.
void AddWestBoundary(int32_t formulation, const std::vector<float>& series,
                     const std::vector<float>& deep = {});
// Closes the line files of internal generation and clears its state.
void ClearGeneration();

// A channel along x in 1 m of water, K = 4, `waves` wavelengths long at 30
// cells a wavelength and run for `periods` periods at 60 steps a period. Its
// west end (j = 0) is an open boundary of the formulation (0 level, 1 flux)
// driven by a sine of period T and amplitude a (a flux carries a*c*d) after
// a cosine ramp of four periods. With the deep-water terms the boundary also
// gives the curvature of the surface across a level boundary, the slope
// across a flux boundary.
struct Channel {
    double k = 0.0, c = 0.0, dx = 0.0, dt = 0.0;
    int32_t J = 0, steps = 0;
};
Channel MakeChannel(int32_t formulation, bool deep, double T, double a, int32_t waves,
                    int32_t periods);

// A row of points (K = 0) 1 m apart with the given beds, time step dt, on
// a plain local frame; the model state reset.
void MakeRow(const std::vector<float>& bed, double dt);
// Sets the row's surface to surface(j, n) (0 on land), its depth with it,
// for n = 0..steps, and calls output(n) after each: the outputs' start at
// n = 0, their step after.
void DriveRow(int32_t steps, const std::function<double(int32_t j, int32_t n)>& surface,
              const std::function<void(int32_t n)>& output);

}  // namespace bwtest
