// Boundary and generation series from H and T. Every component is a linear
// wave of the equations solved; a record at time t and point (x, y) is the
// sum over the components, multiplied by the warm-up ramp. All formulas run
// in 64-bit reals; only the values written are 32-bit.
#include "bwdata/waves.hpp"

#include <algorithm>
#include <cerrno>
#include <cfloat>
#include <climits>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <numbers>
#include <random>
#include <utility>

#include "data/xolfile.hpp"
#include "run/datetime.hpp"

namespace {

constexpr double kPi = std::numbers::pi;

// The direction of the line's normal into the water (a boundary) or of the
// flux it feeds (a generation line), radians from the x axis.
double NormalDirection(WaveSide side) {
    switch (side) {
        case WaveSide::kEast:
            return kPi;
        case WaveSide::kSouth:
        case WaveSide::kY:
            return 0.5 * kPi;
        case WaveSide::kNorth:
            return -0.5 * kPi;
        default:
            return 0.0;
    }
}

// The line runs along y (points along k) and its normal is x.
bool AcrossX(WaveSide side) {
    return side == WaveSide::kWest || side == WaveSide::kEast || side == WaveSide::kX;
}

// An angle brought into -pi..pi.
double Wrapped(double angle) {
    return std::remainder(angle, 2.0 * kPi);
}

// Uniform numbers in [0, 1) from the 64-bit Mersenne twister, whose output
// the C++ standard fixes: the same seed gives the same waves everywhere.
struct Uniform {
    std::mt19937_64 engine;
    explicit Uniform(uint64_t seed) : engine(seed) {}
    double operator()() { return static_cast<double>(engine() >> 11) * 0x1.0p-53; }
};

// JONSWAP shape of frequency f for peak fp (the scale is set later).
double Jonswap(double f, double fp, double gamma) {
    const double sigma = f <= fp ? 0.07 : 0.09;
    const double r = (f - fp) / (sigma * fp);
    return std::pow(f, -5.0) * std::exp(-1.25 * std::pow(fp / f, 4.0)) *
           std::pow(gamma, std::exp(-0.5 * r * r));
}

// n directions, the midpoints in probability of n equal parts of the
// spreading function cos^2s((theta - mean) / 2), taken where
// |theta - centre| < 90 degrees.
std::vector<double> SpreadDirections(double mean, double s, double centre, int32_t n) {
    constexpr int32_t kSteps = 7200;  // a twentieth of a degree
    std::vector<double> theta(kSteps + 1), cumulative(kSteps + 1, 0.0);
    auto density = [&](double t) {
        if (std::fabs(Wrapped(t - centre)) >= 0.5 * kPi) return 0.0;
        return std::pow(std::fabs(std::cos(0.5 * Wrapped(t - mean))), 2.0 * s);
    };
    for (int32_t i = 0; i <= kSteps; ++i) {
        theta[i] = mean - kPi + 2.0 * kPi * i / kSteps;
        if (i > 0)
            cumulative[i] = cumulative[i - 1] + 0.5 * (density(theta[i - 1]) + density(theta[i])) *
                                                    (theta[i] - theta[i - 1]);
    }
    std::vector<double> out(n);
    int32_t i = 1;
    for (int32_t m = 0; m < n; ++m) {
        const double p = (m + 0.5) / n * cumulative[kSteps];
        while (i < kSteps && cumulative[i] < p) ++i;
        const double step = cumulative[i] - cumulative[i - 1];
        const double w = step > 0.0 ? (p - cumulative[i - 1]) / step : 0.5;
        out[m] = theta[i - 1] + w * (theta[i] - theta[i - 1]);
    }
    return out;
}

std::string Number(double v) {
    char text[32];
    std::snprintf(text, sizeof text, "%g", v);
    return text;
}

}  // namespace

double WavesOmega2(double k, double depth, double B) {
    const double kd = k * depth;
    return kWavesGravity * depth * k * k * (1.0 + B * kd * kd) / (1.0 + (B + 1.0 / 3.0) * kd * kd);
}

double WavesNumber(double omega, double depth, double B) {
    // The relation is a quadratic in X = k^2:
    //   g B d^3 X^2 + (g d - omega^2 (B + 1/3) d^2) X - omega^2 = 0,
    // whose positive root is taken in the form free of cancellation.
    const double g = kWavesGravity, w2 = omega * omega;
    const double a = g * B * depth * depth * depth;
    const double b = g * depth - w2 * (B + 1.0 / 3.0) * depth * depth;
    const double root = std::sqrt(b * b + 4.0 * a * w2);
    if (!(b + root > 0.0) || !std::isfinite(root)) return 0.0;
    return std::sqrt(2.0 * w2 / (b + root));
}

double WavesGroupVelocity(double k, double depth, double B) {
    // d(omega^2)/dk = 2 omega cg, with omega^2 = g d k^2 N / D.
    const double kd2 = k * k * depth * depth, B3 = B + 1.0 / 3.0;
    const double N = 1.0 + B * kd2, D = 1.0 + B3 * kd2;
    const double dw2 =
        kWavesGravity * depth *
        (2.0 * k * N / D + k * k * 2.0 * k * depth * depth * (B * D - B3 * N) / (D * D));
    return dw2 / (2.0 * std::sqrt(WavesOmega2(k, depth, B)));
}

std::string WaveComponents(const WavesOptions& o, std::vector<WaveComponent>& out) {
    out.clear();
    if (!(o.depth > 0.0) || !std::isfinite(o.depth)) return "--depth needs a positive depth";
    if (!(o.B >= 0.0) || !std::isfinite(o.B)) return "--deep needs a dispersion factor from 0";
    const double normal = NormalDirection(o.side);
    const double mean = o.directionGiven ? o.direction * kPi / 180.0 : normal;
    const bool source = o.drive == WaveDrive::kSource;
    const double towards = std::cos(Wrapped(mean - normal));
    if (!source && !(towards > 1e-6))
        return "--direction " + Number(o.direction) + " does not point into the water";
    if (source && !(std::fabs(towards) > 1e-6))
        return "--direction " + Number(o.direction) + " runs along the line";
    auto wave = [&](double omega, double amplitude, double direction, double phase) {
        WaveComponent c;
        c.omega = omega, c.amplitude = amplitude, c.direction = direction, c.phase = phase;
        c.k = WavesNumber(omega, o.depth, o.B);
        if (!(c.k > 0.0))
            return "a period of " + Number(2.0 * kPi / omega) + " s has no wave in " +
                   Number(o.depth) +
                   " m of water without the deep-water terms (omega^2 < 3 g / d)" +
                   (o.irregular ? ": narrow --band" : "");
        out.push_back(c);
        return std::string();
    };
    if (!o.irregular) {
        if (!(o.height > 0.0) || !std::isfinite(o.height))
            return "--height needs a positive height";
        if (!(o.period > 0.0) || !std::isfinite(o.period))
            return "--period needs a positive period";
        // A sine at the origin: the surface starts from rest at t = 0.
        return wave(2.0 * kPi / o.period, 0.5 * o.height, mean, -0.5 * kPi);
    }
    if (!(o.hm0 > 0.0) || !std::isfinite(o.hm0)) return "--hm0 needs a positive height";
    if (!(o.tp > 0.0) || !std::isfinite(o.tp)) return "--tp needs a positive period";
    if (!(o.gamma >= 1.0) || !std::isfinite(o.gamma)) return "--gamma needs a value from 1";
    if (!(o.spreading >= 0.0) || !std::isfinite(o.spreading))
        return "--spreading needs an exponent from 0";
    if (o.components < 1 || o.components > 100000)
        return "--components needs a number from 1 to 100000";
    if (!(o.bandLow > 0.0 && o.bandLow < 1.0 && o.bandHigh > 1.0 && std::isfinite(o.bandHigh)))
        return "--band needs LOW,HIGH around the peak: 0 < LOW < 1 < HIGH";

    // Equal bands of frequency; each band's energy S(f) df at its middle,
    // scaled so that the sum of a^2/2 is m0 = (Hm0/4)^2 exactly.
    const int32_t n = o.components;
    const double fp = 1.0 / o.tp, df = (o.bandHigh - o.bandLow) * fp / n;
    std::vector<double> energy(n);
    double sum = 0.0;
    for (int32_t i = 0; i < n; ++i) {
        energy[i] = Jonswap(fp * o.bandLow + (i + 0.5) * df, fp, o.gamma) * df;
        sum += energy[i];
    }
    const double m0 = o.hm0 * o.hm0 / 16.0;
    Uniform uniform(o.seed);
    std::vector<double> phases(n);
    for (double& p : phases) p = 2.0 * kPi * uniform();
    // Directions (none spread: all the mean), one for each frequency, given
    // out by a random permutation so that no direction sticks to a frequency.
    std::vector<double> directions(n, mean);
    if (o.spreading > 0.0) {
        const double centre = source ? (towards > 0.0 ? normal : normal + kPi) : normal;
        directions = SpreadDirections(mean, o.spreading, centre, n);
        for (int32_t i = n - 1; i > 0; --i) {
            const auto j = static_cast<int32_t>(uniform() * (i + 1));
            std::swap(directions[i], directions[std::min(j, i)]);
        }
    }
    for (int32_t i = 0; i < n; ++i) {
        const double f = fp * o.bandLow + (i + 0.5) * df;
        const std::string e =
            wave(2.0 * kPi * f, std::sqrt(2.0 * m0 * energy[i] / sum), directions[i], phases[i]);
        if (!e.empty()) return e;
    }
    return "";
}

std::string WriteWaves(const std::string& output, const WavesOptions& o) {
    std::vector<WaveComponent> waves;
    if (std::string e = WaveComponents(o, waves); !e.empty()) return e;
    DateTime start;
    if (!ParseDateTime(o.start, start))
        return "--start needs a date and time as \"YYYY-MM-DD hh:mm:ss\", not \"" + o.start + "\"";
    if (!(o.dt > 0.0) || !std::isfinite(o.dt)) return "--dt needs a positive time step";
    if (!(o.duration >= o.dt) || !std::isfinite(o.duration))
        return "--duration needs a length of at least one --dt";
    if (!(o.ramp >= 0.0) || !std::isfinite(o.ramp)) return "--ramp needs a time from 0";
    const double steps = std::ceil(o.duration / o.dt - 1e-9);
    if (steps > 1e8) return "--duration / --dt gives more than 10^8 records";
    const bool line = o.points > 0, source = o.drive == WaveDrive::kSource;
    const bool acrossX = AcrossX(o.side);
    if (line && !o.gridGiven)
        return "a line file needs --grid DX[,DY] for the spacing of its points";
    if (o.drive == WaveDrive::kFlux && o.deep && !line && !o.gridGiven)
        return "a flux boundary with the deep-water terms needs --grid DX[,DY]: its slope lies "
               "half a cell inside";
    // A boundary's line file has the main value only; a generation line's
    // and every series have the deep-water value as well.
    const int32_t items = line && !source ? 1 : 2;
    const int32_t points = line ? o.points : 1;
    const double spacing = acrossX ? o.dy : o.dx;

    // The points of the line from its low end, and the point of the slope
    // of a flux boundary, half a cell into the water.
    const double inward = o.side == WaveSide::kEast || o.side == WaveSide::kNorth ? -0.5 : 0.5;
    const double half = o.drive == WaveDrive::kFlux ? inward * (acrossX ? o.dx : o.dy) : 0.0;
    const double B3 = o.B + 1.0 / 3.0;
    struct Term {  // a component along the line's axes
        double amplitude, omega, kAcross, kAlong, main, phase;
    };
    std::vector<Term> terms;
    for (const WaveComponent& c : waves) {
        const double kx = c.k * std::cos(c.direction), ky = c.k * std::sin(c.direction);
        Term t{c.amplitude, c.omega, acrossX ? kx : ky, acrossX ? ky : kx, 1.0, c.phase};
        if (o.drive == WaveDrive::kFlux)
            t.main = c.omega / c.k * (t.kAcross / c.k);  // P = c eta along the direction
        else if (source) {
            // The flux a line needs for a wave of amplitude a on each side.
            const double kd = c.k * o.depth;
            t.main = WavesGroupVelocity(c.k, o.depth, o.B) * (1.0 + B3 * kd * kd) *
                     std::fabs(t.kAcross) / c.k;
        }
        terms.push_back(t);
    }

    std::vector<float> mainValues(static_cast<size_t>(points)),
        deepValues(static_cast<size_t>(points));
    auto record = [&](int64_t n) {
        const double time = n * o.dt;
        const double rise = time < o.ramp ? 0.5 * (1.0 - std::cos(kPi * time / o.ramp)) : 1.0;
        for (int32_t s = 0; s < points; ++s) {
            const double along = s * spacing;
            double m = 0.0, d = 0.0;
            for (const Term& t : terms) {
                const double psi = t.omega * time - t.kAlong * along + t.phase;
                m += t.main * t.amplitude * std::cos(psi);
                // A generation line's deep-water item stays 0: its source
                // flux gives the height asked for with that item at 0.
                if (o.drive == WaveDrive::kLevel)  // the curvature across the line
                    d -= t.kAcross * t.kAcross * t.amplitude * std::cos(psi);
                else if (o.drive == WaveDrive::kFlux)  // the slope half a cell inside
                    d += t.kAcross * t.amplitude * std::sin(psi - t.kAcross * half);
            }
            mainValues[s] = static_cast<float>(rise * m);
            deepValues[s] = static_cast<float>(rise * d);
        }
    };

    static const struct {
        int32_t type, unit;
        const char* name;
    } kItems[3][2] = {{{100078, 1000, "Surface elevation"}, {999, 1050, "Curvature across"}},
                      {{100080, 4700, "Flux"}, {999, 99000, "Slope across"}},
                      {{100080, 4700, "Source flux"}, {999, 99000, "Deep water item"}}};
    const auto& kind = kItems[static_cast<int>(o.drive)];
    const std::string part = output + ".part";
    int status = 0;
    XolFile f = XolCreateHeader(o.title.empty() ? "Waves" : o.title, items, line ? 1 : 0,
                                {.appTitle = "bwdata"}, &status);
    for (int32_t i = 0; i < items && status == 0; ++i)
        XolSetItem(f, i + 1, kind[i].type, kind[i].name, kind[i].unit, &status);
    if (status == 0) {
        if (line) XolSetAxis(f, 1, static_cast<float>(spacing), 0.0f, points);
        XolSetCalendarAxis(f, o.dt, DateTimeText(start));
        XolCreateFile(f, part, &status);
    }
    for (int64_t n = 0; n <= static_cast<int64_t>(steps) && status == 0; ++n) {
        record(n);
        XolWriteDynamic(f, mainValues.data(), &status);
        if (items == 2 && status == 0) XolWriteDynamic(f, deepValues.data(), &status);
    }
    XolClose(f);
    if (status != 0) {
        std::remove(part.c_str());
        return output + ": " + XolErrorText(status);
    }
    if (std::rename(part.c_str(), output.c_str()) != 0) {
        std::remove(part.c_str());
        return output + ": can't be written";
    }
    return "";
}

namespace {

bool Real(const std::string& text, double& out) {
    char* end = nullptr;
    out = std::strtod(text.c_str(), &end);
    return end != text.c_str() && *end == '\0' && std::isfinite(out);
}

bool Pair(const std::string& text, double& a, double& b, bool secondOptional) {
    const size_t comma = text.find(',');
    if (comma == std::string::npos) {
        if (!secondOptional || !Real(text, a)) return false;
        b = a;
        return true;
    }
    return Real(text.substr(0, comma), a) && Real(text.substr(comma + 1), b);
}

}  // namespace

int WavesCommand(const std::vector<std::string>& args) {
    auto fail = [](const std::string& text) {
        std::fprintf(stderr, "bwdata: %s\n", text.c_str());
        return 1;
    };
    WavesOptions o;
    std::string output, drive;
    bool sideGiven = false, regular = false;
    std::string side = "west";
    for (size_t i = 0; i < args.size(); ++i) {
        const std::string& arg = args[i];
        if (i + 1 >= args.size()) return fail("option " + arg + " needs a value");
        const std::string& value = args[++i];
        double v = 0.0;
        auto real = [&](double& into) {
            if (!Real(value, v)) return false;
            into = v;
            return true;
        };
        bool ok = true;
        if (arg == "-o")
            output = value;
        else if (arg == "--drive")
            drive = value;
        else if (arg == "--side")
            side = value, sideGiven = true;
        else if (arg == "--depth")
            ok = real(o.depth);
        else if (arg == "--deep")
            ok = real(o.B), o.deep = true;
        else if (arg == "--height")
            ok = real(o.height), regular = true;
        else if (arg == "--period")
            ok = real(o.period), regular = true;
        else if (arg == "--hm0")
            ok = real(o.hm0), o.irregular = true;
        else if (arg == "--tp")
            ok = real(o.tp), o.irregular = true;
        else if (arg == "--gamma")
            ok = real(o.gamma), o.irregular = true;
        else if (arg == "--spreading")
            ok = real(o.spreading), o.irregular = true;
        else if (arg == "--band")
            ok = Pair(value, o.bandLow, o.bandHigh, false), o.irregular = true;
        else if (arg == "--components" || arg == "--seed" || arg == "--points") {
            char* end = nullptr;
            errno = 0;
            const long long n = std::strtoll(value.c_str(), &end, 10);
            ok = end != value.c_str() && *end == '\0' && errno == 0 && n >= 0 && n <= INT_MAX;
            if (arg == "--components") o.components = static_cast<int32_t>(n), o.irregular = true;
            if (arg == "--seed") o.seed = static_cast<uint64_t>(n), o.irregular = true;
            if (arg == "--points") {
                o.points = static_cast<int32_t>(n);
                ok = ok && n >= 1;
            }
        } else if (arg == "--direction")
            ok = real(o.direction), o.directionGiven = true;
        else if (arg == "--start")
            o.start = value;
        else if (arg == "--dt")
            ok = real(o.dt);
        else if (arg == "--duration")
            ok = real(o.duration);
        else if (arg == "--ramp")
            ok = real(o.ramp);
        else if (arg == "--grid") {
            ok = Pair(value, o.dx, o.dy, true) && o.dx > 0.0 && o.dy > 0.0;
            o.gridGiven = true;
        } else if (arg == "--title")
            o.title = value;
        else
            return fail("unknown option " + arg);
        if (!ok) return fail(arg + " does not take '" + value + "'");
    }
    if (output.empty()) return fail("-o OUTPUT is missing");
    if (drive == "level")
        o.drive = WaveDrive::kLevel;
    else if (drive == "flux")
        o.drive = WaveDrive::kFlux;
    else if (drive == "source")
        o.drive = WaveDrive::kSource;
    else
        return fail("--drive needs level, flux or source");
    const bool source = o.drive == WaveDrive::kSource;
    if (!sideGiven && source) side = "x";
    if (side == "west" && !source)
        o.side = WaveSide::kWest;
    else if (side == "east" && !source)
        o.side = WaveSide::kEast;
    else if (side == "south" && !source)
        o.side = WaveSide::kSouth;
    else if (side == "north" && !source)
        o.side = WaveSide::kNorth;
    else if (side == "x" && source)
        o.side = WaveSide::kX;
    else if (side == "y" && source)
        o.side = WaveSide::kY;
    else
        return fail(source ? "--side of a generation line is x (a line along k) or y (along j)"
                           : "--side of a boundary is west, east, south or north");
    if (regular && o.irregular)
        return fail(
            "--height and --period make regular waves, --hm0 and --tp irregular ones: "
            "not both");
    if (!regular && !o.irregular) return fail("give --height and --period, or --hm0 and --tp");
    if (o.depth == 0.0) return fail("--depth D is missing");
    if (o.dt == 0.0 || o.duration == 0.0) return fail("--dt and --duration are missing");
    if (o.start.empty()) return fail("--start \"YYYY-MM-DD hh:mm:ss\" is missing");
    if (const std::string e = WriteWaves(output, o); !e.empty()) return fail(e);
    std::printf("%s written\n", output.c_str());
    // What the model will see: the wave length of the (peak) period at the
    // depth and, for a spectrum, how long its record runs before it repeats.
    std::vector<WaveComponent> waves;
    WaveComponents(o, waves);
    const double peak = 2.0 * std::numbers::pi / (o.irregular ? o.tp : o.period);
    const double k = WavesNumber(peak, o.depth, o.B);
    if (k > 0.0)
        std::printf("  wave length %s m at the %speriod, kd %s\n",
                    Number(2.0 * std::numbers::pi / k).c_str(), o.irregular ? "peak " : "",
                    Number(k * o.depth).c_str());
    if (o.irregular)
        std::printf("  %d components; the sea repeats itself, upside down, after %s s\n",
                    o.components, Number(o.tp * o.components / (o.bandHigh - o.bandLow)).c_str());
    return 0;
}
