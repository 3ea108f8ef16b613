// Small models of the 2DH solver built in memory, without a model file: a
// rectangular basin with a frame of land, a surface given by a formula, and
// the time loop driven step by step.
#pragma once

#include <cstdint>
#include <functional>
#include <vector>

namespace bwtest {

struct BasinSpec {
    int32_t J = 20, K = 4;   // highest indices; j = 0, J and k = 0, K are land
    float dx = 1.0f, dy = 1.0f;
    float depth = 1.0f;
    double dt = 0.1;
    int32_t steps = 100;     // rows of the series store
    bool deepWater = false;
    float dispersionFactor = 0.0f;
    int32_t convectiveHandle = 0;
    int32_t threads = 1;
    float extrapolation = 0.0f;  // Time_extrapolation_factor_lower with the deep-water terms
    bool frameWest = true;   // land at j = 0 (the east, south and north frames are always land)
};

// Resets the model state and builds the basin; bed of water points is -depth.
void MakeBasin(const BasinSpec& spec);
// Sets the cold-start surface at every point (land keeps its own).
void SetSurface(const std::function<float(float x, float y)>& surface);
// Chains and buffers, then steps 1..steps, calling after(n) behind each.
void RunSteps(int32_t steps, const std::function<void(int32_t)>& after = {});
// Sum of xi over the water points times the cell area, and of the total depth.
double WaterVolume();
double TotalVolume();
// The projection of the surface on a shape over the water points.
double Project(const std::function<double(float x, float y)>& shape);
// Times of the zero crossings of a sampled signal (linear interpolation).
std::vector<double> ZeroCrossings(const std::vector<double>& values, double dt);

}  // namespace bwtest
