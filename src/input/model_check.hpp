// The check of a model without a run (bw -check): the whole model file and
// every data file it names are read and checked as for a run, and the log
// gains a block on how finely the grid resolves the waves that the open
// boundaries and generation lines bring. No time step is computed and no
// output file is created.
#pragma once

#include <string>
#include <vector>

// One line of the block: what feeds waves in, the mean period of its series
// (zero up-crossings), the still depth at the middle of its line, the
// wavelength by the dispersion relation of the equations solved and the grid
// points per wavelength along the direction the waves travel.
struct WaveResolution {
    std::string source;       // "Boundary 1 (west, level)", "Generation line 2"
    double period = 0.0;      // s; 0 when the series gives none
    double depth = 0.0;       // m
    double wavelength = 0.0;  // m; 0 where the line is dry
    double spacing = 0.0;     // m, dx or dy
    double stepsPerPeriod = 0.0;
};

// The mean period of a series sampled dt apart: the time between its first
// and last zero up-crossing (about its mean) over the crossings between; 0
// with fewer than two crossings.
double MeanZeroCrossingPeriod(const std::vector<float>& series, double dt);
// The wave number of period T in depth h by
//   w^2 = g h k^2 (1 + B (kh)^2) / (1 + (B + 1/3) (kh)^2),
// or 0 for a period shorter than the equations carry in that depth.
double ModelWaveNumber(double period, double depth, double B);
// What the series of the boundaries and generation lines give; reads the
// store of series from its first row to its last.
std::vector<WaveResolution> FindWaveResolution();
// The block "Model Check" in the log, its lines also on the screen.
void WriteModelCheck();
