// Depth, slot and the settings of the processes of the 1DH model.
//
// The still water depth d stands on the nodes of the elevation mesh, d = -z.
// The total depth is h = d + eta, except under a slot: where the bed lies
// more than `depth` below the datum's slot level (L0 = -d - depth > 0) a
// narrow slot of relative width w and height L = min(max_depth, L0) below
// the bed keeps the node wet. A dry node (h <= 0, xi = -h / L) gets
//   h = L ((1 - w)(exp(-s xi) - exp(-s)) / s + w (1 - xi)),
// a wet one h + L (w + (1 - w)(1 - exp(-s)) / s), and the storage width
// b = w + (1 - w) exp(-s xi) below the bed, 1 above it.
#include "meshsolver/processes_bw.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "data/xolfile.hpp"
#include "input/kvt_current.hpp"
#include "run/messages.hpp"

namespace {

constexpr double kGravityBW = 9.81;
constexpr double kPi = 3.14159265358979323846;
constexpr double kMaxElevation = 50.0;

const Mesh& MeshOf(int32_t id) {
    return gMeshes.meshes[id];
}

// Sizes a node vector of a mesh to its nodes (slot 0 unused) with one value.
void NodeVector(std::vector<double>& v, const Mesh& mesh, double value) {
    v.assign(static_cast<size_t>(mesh.NodeCount) + 1, value);
}

// The map file and item the open section names.
struct MapKeys {
    std::string file;
    int32_t item = 1;
};
MapKeys ReadMapKeys() {
    MapKeys k;
    KvtGetFilename("file_name", k.file);
    KvtGetInteger("item_number", k.item);
    return k;
}

// The map the open section names, on the nodes of mesh.
std::vector<double> ReadSectionMap(const Mesh& mesh) {
    const MapKeys k = ReadMapKeys();
    return ReadNodeMapBW(k.file, k.item, mesh);
}

// "text: file: value at point j", j the grid index of the profile (without
// the file for a constant).
std::string OutOfRange(const std::string& text, const std::string& file, double value,
                       int32_t node) {
    char tail[64];
    std::snprintf(tail, sizeof tail, "%g at point %d", value, node - 1);
    return text + ": " + (file.empty() ? "" : file + ": ") + tail;
}

void SpecDepthBW(BwModel& model) {
    const Mesh& mesh = MeshOf(model.ElevationMesh);
    KvtOpenSection("DEPTH");
    model.depthType = 0;
    KvtGetInteger("type", model.depthType);
    if (model.depthType == 1) {
        // A map of the still water depth d (positive in water) on the nodes.
        model.StillDepth = ReadSectionMap(mesh);
    } else if (model.depthType == 0) {
        NodeVector(model.StillDepth, mesh, 0.0);
        for (int32_t i = 1; i <= mesh.NodeCount; ++i) model.StillDepth[i] = -mesh.z[i];
    }
    KvtCloseSection();
    if (model.depthType != 0 && model.depthType != 1) StopRun("Wrong depth type");
    NodeVector(model.TotalDepth, mesh, 0.0);
    WriteSimulationInformation(mesh, model.StillDepth, model.TimeStep);
}

// The water in the slot of a dry point carries waves at about
// sqrt(g (eta - depth)), without the dispersion that slows the shortest
// waves of the grid in the water: above a Courant number of about 0.6
// on the dry points it grows a wiggle from point to point (measured on a
// beach of 0.05 m elements). The user is told before the run.
void CheckSlotStep(const BwModel& model) {
    const SlotSettingsBW& s = model.Slot;
    const Mesh& mesh = MeshOf(model.ElevationMesh);
    const double slotDepth = std::min(-s.depth, s.maxDepth);
    if (slotDepth <= 0.0) return;
    double shortest = 0.0;
    for (int32_t e = 1; e <= mesh.ElementCount; ++e) {
        const int32_t a = GetElementNode(mesh, e, 1), b = GetElementNode(mesh, e, 2);
        if (model.StillDepth[a] < 0.0 && model.StillDepth[b] < 0.0 &&
            (shortest == 0.0 || mesh.ElementLength[e] < shortest))
            shortest = mesh.ElementLength[e];
    }
    if (shortest <= 0.0) return;  // no dry element at the start
    const double courant = std::sqrt(kGravityBW * slotDepth) * model.TimeStep / shortest;
    if (courant <= 0.6) return;
    char text[256];
    std::snprintf(text, sizeof text,
                  "SpecSlotBW: the slot water of the dry points carries waves at %.3g m/s, a "
                  "Courant number of %.2f; above about 0.6 it grows a wiggle from point to point "
                  "and stops the run: a slot depth nearer the still water or a shorter step",
                  std::sqrt(kGravityBW * slotDepth), courant);
    ReportUserWarning(text);
}

void SpecSlotBW(BwModel& model) {
    NodeVector(model.SlotWidth, MeshOf(model.ElevationMesh), 1.0);
    SlotSettingsBW& s = model.Slot;
    s = SlotSettingsBW{};
    KvtOpenSection("SLOT");
    KvtGetInteger("type", s.type);
    if (s.type > 0) {
        KvtGetDouble("depth", s.depth);
        KvtGetDouble("max_depth", s.maxDepth);
        KvtGetDouble("width", s.width);
        KvtGetDouble("smoothing_parameter", s.smoothing);
        KvtGetDouble("friction_coefficient", s.friction);
    }
    KvtCloseSection();
    if (s.type > 0) CheckSlotStep(model);
}

// r on the geometry mesh: 1 a friction factor (r = f / 2), 2 Chezy and
// 3 Manning (r = g / C^2, g / M^2: the depth power of Manning is added in
// the element loop).
void SpecResistanceBW(BwModel& model) {
    NodeVector(model.Resistance, MeshOf(model.GeometryMesh), 0.0);
    KvtOpenSection("BED_RESISTANCE");
    model.resistanceType = 0;
    KvtGetInteger("type", model.resistanceType);
    if (model.resistanceType > 0) {
        if (model.resistanceType > 3) StopRun("Type not supported for bed resistance");
        int32_t format = 0;
        KvtGetInteger("format", format);
        if (format != 0 && format != 2) StopRun("Format not supported for resistance coef.");
        std::vector<double> value(model.Resistance.size(), 0.0);
        if (format == 2) {
            value = ReadSectionMap(MeshOf(model.GeometryMesh));
        } else {
            double constant = 0.0;
            KvtGetDouble("constant_value", constant);
            std::fill(value.begin() + 1, value.end(), constant);
        }
        for (size_t i = 1; i < value.size(); ++i)
            model.Resistance[i] =
                model.resistanceType == 1 ? value[i] / 2.0 : kGravityBW / (value[i] * value[i]);
    }
    KvtCloseSection();
}

void SpecEddyBW(BwModel& model) {
    KvtOpenSection("EDDY_VISCOSITY");
    model.eddyType = 0;
    KvtGetInteger("type", model.eddyType);
    KvtCloseSection();
}

// The particle coefficients are not in the file that the model reader
// writes: their defaults stand, alpha = 0.035 and beta = 14.
void SpecPorosityBW(BwModel& model) {
    NodeVector(model.Porosity, MeshOf(model.ElevationMesh), 1.0);
    model.porosityAlpha = model.porosityBeta = 0.0;
    KvtOpenSection("POROSITY_LAYER");
    model.porosityType = 0;
    KvtGetInteger("type", model.porosityType);
    if (model.porosityType > 0) {
        model.Porosity = ReadSectionMap(MeshOf(model.ElevationMesh));
        double alpha = 1000.0, beta = 2.8, viscosity = 1.4e-6, diameter = 0.2;
        KvtGetDouble("particle_coef_alpha", alpha);
        KvtGetDouble("particle_coef_beta", beta);
        KvtGetDouble("kinematic_viscosty", viscosity);
        KvtGetDouble("particle_diameter", diameter);
        model.porosityAlpha = alpha * viscosity / (diameter * diameter);
        model.porosityBeta = beta / diameter;
    }
    KvtCloseSection();
}

void SetupSponge(BwModel& model) {
    KvtOpenSection("SPONGE_LAYER");
    model.spongeType = 0;
    KvtGetInteger("type", model.spongeType);
    if (model.spongeType > 0) {
        const MapKeys map = ReadMapKeys();
        // A line has two ends: a reference for each, of which the file gives the first.
        double velocity[2] = {0.0, 0.0};
        int status = 0;
        KvtGetDoubleList("reference_velocity", velocity, 2, &status);
        model.spongeReference[0] = model.spongeReference[1] = 0.0;
        KvtGetDoubleList("reference_elevation", model.spongeReference, 2, &status);
        const Mesh& geometry = MeshOf(model.GeometryMesh);
        std::vector<double> s = ReadNodeMapBW(map.file, map.item, geometry);
        for (double& v : s) v = std::fabs(v);
        // Below 1 the sponge would amplify the waves it should take out.
        for (int32_t i = 1; i <= geometry.NodeCount; ++i)
            if (s[i] < 1.0 || s[i] > 100.0)
                StopRun(OutOfRange("SetupSponge: sponge coefficient outside interval 1<=s<=100",
                                   map.file, s[i], i));
        model.spongeVelocity = SpreadByElementsBW(s, geometry, MeshOf(model.VelocityMesh));
        model.spongeElevation = SpreadByElementsBW(s, geometry, MeshOf(model.ElevationMesh));
        for (std::vector<double>* f : {&model.spongeVelocity, &model.spongeElevation})
            for (size_t i = 1; i < f->size(); ++i) (*f)[i] = 1.0 / (*f)[i];
    }
    KvtCloseSection();
}

void SpecBreakingBW(BwModel& model) {
    BreakingStateBW& b = model.Breaking;
    b = BreakingStateBW{};
    KvtOpenSection("WAVE_BREAKING");
    KvtGetInteger("type", b.type);
    if (b.type > 0) {
        double initial = 20.0, final = 10.0;
        KvtGetDouble("roller_factor", b.rollerFactor);
        KvtGetInteger("velocity_type", b.velocityType);
        KvtGetDouble("velocity_factor", b.velocityFactor);
        KvtGetDouble("initial_breaking_angle", initial);
        KvtGetDouble("final_breaking_angle", final);
        KvtGetDouble("half_time", b.halfTime);
        b.tanInitial = std::tan(initial * kPi / 180.0);
        b.tanFinal = std::tan(final * kPi / 180.0);
        const Mesh& mesh = MeshOf(model.GeometryMesh);
        const size_t n = static_cast<size_t>(mesh.NodeCount) + 1;
        for (std::vector<double>* v : {&b.delta, &b.deltaOld, &b.slope, &b.celerity})
            v->assign(n, 0.0);
        b.tanPhi.assign(n, b.tanInitial);
        b.tanPhiOld.assign(n, b.tanInitial);
        b.x = mesh.x;
        for (int32_t i = 1;
             i <= mesh.NodeCount && i < static_cast<int32_t>(model.StillDepth.size()); ++i) {
            const double d = model.StillDepth[i];
            if (d > 0.0) b.celerity[i] = std::sqrt(kGravityBW * d) * b.velocityFactor;
        }
    }
    KvtCloseSection();
}

void SetupFilter(BwModel& model) {
    KvtOpenSection("EXPLICIT_FILTERING");
    model.filterType = 0;
    KvtGetInteger("type", model.filterType);
    if (model.filterType > 0) {
        const Mesh& geometry = MeshOf(model.GeometryMesh);
        std::vector<double> c;
        std::string file;
        if (model.filterType == 1) {
            // One coefficient for the whole profile.
            double constant = 0.0;
            KvtGetDouble("filter_coeff", constant);
            c.assign(static_cast<size_t>(geometry.NodeCount) + 1, constant);
        } else {
            const MapKeys map = ReadMapKeys();
            file = map.file;
            c = ReadNodeMapBW(map.file, map.item, geometry);
        }
        // Outside 0..1 the filter would sharpen the surface instead.
        for (int32_t i = 1; i <= geometry.NodeCount; ++i)
            if (c[i] < 0.0 || c[i] > 1.0)
                StopRun(OutOfRange("SetupFilter: filter coefficient outside interval 0<=f<=1", file,
                                   c[i], i));
        model.filterVelocity = SpreadByElementsBW(c, geometry, MeshOf(model.VelocityMesh));
        model.filterElevation = SpreadByElementsBW(c, geometry, MeshOf(model.ElevationMesh));
    }
    KvtCloseSection();
}

// The report of the first node where the state has gone wrong.
void WriteBlowUp(const char* heading, int32_t node, double h, double eta, double d) {
    char line[128];
    WriteLine("");
    WriteLine("");
    WriteLine(std::string(15, '-') + heading + std::string(17, '-'));
    std::snprintf(line, sizeof line, " node number                             : %20d", node);
    WriteLine(line);
    WriteLine(" total water depth (h)                   : " + ExponentField(h, 20, 4));
    WriteLine(" surface elevation (s)                   : " + ExponentField(eta, 20, 4));
    WriteLine(" still water depth (d)                   : " + ExponentField(d, 20, 4));
    WriteLine(std::string(64, '-'));
}

}  // namespace

std::string ExponentField(double value, int width, int digits) {
    std::string text;
    if (std::isnan(value)) {
        text = "NaN";
    } else if (std::isinf(value)) {
        text = value < 0.0 ? "-Infinity" : "Infinity";
    } else {
        // printf rounds to the digits wanted; its exponent belongs to d.ddd,
        // one more than that of 0.dddd.
        char buffer[64];
        std::snprintf(buffer, sizeof buffer, "%.*E", digits - 1, std::fabs(value));
        std::string mantissa(1, buffer[0]);
        const char* e = std::strchr(buffer, 'E');
        if (digits > 1) mantissa.append(buffer + 2, static_cast<size_t>(e - (buffer + 2)));
        int exponent = value == 0.0 ? 0 : std::atoi(e + 1) + 1;
        char tail[16];
        if (std::abs(exponent) <= 99)
            std::snprintf(tail, sizeof tail, "E%c%02d", exponent < 0 ? '-' : '+',
                          std::abs(exponent));
        else
            std::snprintf(tail, sizeof tail, "%c%03d", exponent < 0 ? '-' : '+',
                          std::abs(exponent));
        text = std::string(value < 0.0 ? "-" : "") + "0." + mantissa + tail;
    }
    if (static_cast<int>(text.size()) > width) return std::string(width, '*');
    return std::string(width - text.size(), ' ') + text;
}

void WriteSimulationInformation(const Mesh& mesh, const std::vector<double>& d, double timeStep) {
    double dMin = mesh.NodeCount > 0 ? d[1] : 0.0, dMax = dMin;
    for (int32_t i = 2; i <= mesh.NodeCount; ++i) {
        dMin = std::min(dMin, d[i]);
        dMax = std::max(dMax, d[i]);
    }
    double lMin = mesh.ElementCount > 0 ? mesh.ElementLength[1] : 0.0, lMax = lMin;
    double courant = 0.0;
    for (int32_t e = 1; e <= mesh.ElementCount; ++e) {
        const double length = mesh.ElementLength[e];
        lMin = std::min(lMin, length);
        lMax = std::max(lMax, length);
        double deepest = d[GetElementNode(mesh, e, 1)];
        for (int32_t k = 2; k <= GetElementNodeCount(mesh, e); ++k)
            deepest = std::max(deepest, d[GetElementNode(mesh, e, k)]);
        if (deepest > 0.0)
            courant = std::max(courant, std::sqrt(kGravityBW * deepest) / length * timeStep);
    }
    WriteBlockHeading("Simulation information");
    WriteLabelled("Min depth                  : %", dMin);
    WriteLabelled("Max depth                  : %", dMax);
    WriteLabelled("Min length                 : %", lMin);
    WriteLabelled("Max length                 : %", lMax);
    WriteLabelled("Max Courant number         : %", courant);
    WriteLine("");
}

void SetupProcessesBW(BwModel& model) {
    SpecDepthBW(model);
    SpecSlotBW(model);
    SpecResistanceBW(model);
    SpecEddyBW(model);
    SpecPorosityBW(model);
    SetupSponge(model);
    SpecBreakingBW(model);
    SetupFilter(model);
}

std::vector<double> ReadNodeMapBW(const std::string& path, int32_t item, const Mesh& mesh) {
    int status = 0;
    XolFile f = XolOpenRead(path, &status);
    if (status != 0) StopRun("Illegal data file");
    XolPrintSummary(f);
    if (f.dimension != 1) StopRun("Wrong dimension");
    if (XolItemValues(f) != static_cast<size_t>(mesh.NodeCount) || item < 1 ||
        item > f.noDynamicItems)
        StopRun("Wrong data file");
    std::vector<float> values(static_cast<size_t>(mesh.NodeCount));
    for (int32_t i = 1; i <= item; ++i) {
        XolReadDynamic(f, values.data(), &status);
        if (status != 0) StopRun("Error Reading data file");
    }
    XolClose(f, &status);
    std::vector<double> map(values.size() + 1, 0.0);
    for (size_t i = 0; i < values.size(); ++i) map[i + 1] = values[i];
    return map;
}

std::vector<double> SpreadByElementsBW(const std::vector<double>& s, const Mesh& geometry,
                                       const Mesh& target) {
    std::vector<double> sum(static_cast<size_t>(target.NodeCount) + 1, 0.0);
    std::vector<int32_t> count(sum.size(), 0);
    for (int32_t e = 1; e <= geometry.ElementCount; ++e) {
        const int32_t nodes = GetElementNodeCount(geometry, e);
        double mean = 0.0;
        for (int32_t k = 1; k <= nodes; ++k) mean += s[GetElementNode(geometry, e, k)];
        mean /= nodes;
        for (int32_t k = 1; k <= GetElementNodeCount(target, e); ++k) {
            const int32_t node = GetElementNode(target, e, k);
            sum[node] += mean;
            count[node] += 1;
        }
    }
    for (size_t i = 1; i < sum.size(); ++i)
        if (count[i] > 0) sum[i] /= count[i];
    return sum;
}

void ApplySpongeBW(const BwModel& model, std::vector<double>& y) {
    const int32_t nu = model.ElevationStart - 1;
    for (int32_t i = 1; i <= nu; ++i) y[i] *= model.spongeVelocity[i];
    const int32_t ne = static_cast<int32_t>(model.spongeElevation.size()) - 1;
    double* eta = y.data() + nu;
    for (int32_t i = 1; i <= ne; ++i) {
        const double ref = i <= ne / 2 ? model.spongeReference[0] : model.spongeReference[1];
        eta[i] = (eta[i] - ref) * model.spongeElevation[i] + ref;
    }
}

namespace {

// f(i) = (v(i - 1) + v(i + 1)) / 4 + v(i) / 2 inside, v at the ends; v = (1 - c) v + c f.
void FilterBlock(double* v, const std::vector<double>& c) {
    const auto n = static_cast<int32_t>(c.size()) - 1;
    if (n < 3) return;
    double previous = v[1];  // v(i - 1) before it was filtered
    for (int32_t i = 2; i < n; ++i) {
        const double f = (previous + v[i + 1]) / 4.0 + v[i] / 2.0;
        previous = v[i];
        v[i] = (1.0 - c[i]) * v[i] + c[i] * f;
    }
}

}  // namespace

void ApplyFilterBW(const BwModel& model, std::vector<double>& y) {
    FilterBlock(y.data(), model.filterVelocity);
    FilterBlock(y.data() + model.ElevationStart - 1, model.filterElevation);
}

void CalcBreakingBW(BreakingStateBW& b, const Mesh& mesh, double stageStep, const double* eta,
                    const double* /*etaRate*/, const std::vector<double>& d,
                    const std::vector<double>& /*h*/) {
    const int32_t n = mesh.NodeCount;
    const std::vector<double>& x = mesh.x;
    std::fill(b.delta.begin(), b.delta.end(), 0.0);
    std::fill(b.celerity.begin(), b.celerity.end(), 0.0);
    // Falling i: a node with a roller hands its angle on to its right neighbour.
    const double relax = stageStep * std::log(2.0) / b.halfTime;
    for (int32_t i = n - 1; i >= 1; --i) {
        if (b.deltaOld[i] <= 0.0) {
            b.tanPhi[i] = b.tanInitial;
        } else {
            const double v = b.tanPhiOld[i] + (b.tanFinal - b.tanPhiOld[i]) * relax;
            b.tanPhi[i] = b.tanPhi[i + 1] = v;
        }
    }
    for (int32_t i = 1; i <= n - 1; ++i) b.slope[i] = (eta[i + 1] - eta[i]) / (x[i + 1] - x[i]);
    if (n <= 100) return;
    const std::vector<double>& slope = b.slope;
    for (int32_t i = n - 1; i >= 100; --i) {
        if (d[i - 1] + eta[i - 1] < 0.0 || d[i] + eta[i] < 0.0 || d[i + 1] + eta[i + 1] < 0.0)
            continue;
        const double t = b.tanPhi[i];
        if (!(slope[i - 1] < -t && -t <= slope[i]) || b.delta[i] > 0.0) continue;
        // The parabola through nodes i - 1, i, i + 1 and its point of slope -t: the toe.
        const double dr = x[i + 1] - x[i], dl = x[i] - x[i - 1], S = dr + dl;
        const double A = (slope[i] - slope[i - 1]) / S;
        const double B = (dl * slope[i] + dr * slope[i - 1]) / S;
        const double r = (t + B) / (2.0 * A);
        const double x0 = x[i] - r, eta0 = (-A * r + B) * (-r) + eta[i];
        const int32_t j0 = r > 0.0 ? i - 1 : i;
        // The roller reaches up the front face while the surface stands
        // above the line of slope t through the toe.
        int32_t j = j0;
        while (j > 1 && eta[j] - eta0 - (x0 - x[j]) * t > 0.0) --j;
        for (int32_t k = j + 1; k <= j0; ++k) {
            const double e = eta[k] - eta0;
            b.delta[k] = std::min(e, (e - (x0 - x[k]) * t) * b.rollerFactor);
        }
        const double c0 = std::abs(b.velocityType) == 1 && d[i] > 0.0
                              ? b.velocityFactor * std::sqrt(kGravityBW * d[i])
                              : 0.0;
        for (int32_t k = j; k <= j0 + 1; ++k) b.celerity[k] = c0;
    }
}

void SaveBreakingBW(BreakingStateBW& b) {
    std::copy(b.delta.begin(), b.delta.end(), b.deltaOld.begin());
    std::copy(b.tanPhi.begin(), b.tanPhi.end(), b.tanPhiOld.begin());
}

void SetDepthBW(int32_t n, std::vector<double>& h, const std::vector<double>& d, const double* eta,
                std::vector<double>& b, const SlotSettingsBW& slot, int32_t& status) {
    for (int32_t i = 1; i <= n; ++i) h[i] = d[i] + eta[i];
    if (slot.type > 0) {
        const double w = slot.width, s = slot.smoothing;
        const double wetShift = w + (1.0 - w) * (1.0 - std::exp(-s)) / s;
#pragma omp parallel for schedule(static)
        for (int32_t i = 1; i <= n; ++i) {
            const double bedLevel = -d[i];
            const double l0 = bedLevel - slot.depth;
            if (l0 <= 0.0) {
                b[i] = 1.0;
                continue;
            }
            const double L = std::min(slot.maxDepth, l0);
            if (h[i] <= 0.0) {
                const double xi = -h[i] / L;
                h[i] = L * ((1.0 - w) * (std::exp(-s * xi) - std::exp(-s)) / s + w * (1.0 - xi));
            } else {
                h[i] += L * wetShift;
            }
            if (eta[i] < bedLevel) {
                const double xi = -(eta[i] + d[i]) / L;
                b[i] = w + (1.0 - w) * std::exp(-s * xi);
            } else {
                b[i] = 1.0;
            }
        }
    } else {
        std::fill(b.begin() + 1, b.begin() + 1 + n, 1.0);
    }

    status = 0;
    for (int32_t i = 1; i <= n; ++i) {
        if (h[i] < 0.0) {
            WriteBlowUp(" BLOW-UP - Negative water depth ", i, h[i], eta[i], d[i]);
            status = -1;
            return;
        }
        // A surface that is no number any more has grown without bound too.
        if (!(std::fabs(eta[i]) <= kMaxElevation)) {
            WriteBlowUp(" BLOW-UP - Elevation too large ", i, h[i], eta[i], d[i]);
            status = -1;
            return;
        }
    }
}

void SetupInitCondBW(BwModel& model) {
    // SpecInitCondBW: a start from constant values of P and eta.
    KvtOpenSection("STARTING_CONDITIONS");
    model.startType = 0;
    model.startValues[0] = model.startValues[1] = 0.0;
    KvtGetInteger("type", model.startType);
    if (model.startType == 0) KvtGetDoubleList("constant_values", model.startValues, 2);
    KvtCloseSection();
    // The model reader starts every 1DH run from rest; a start from maps
    // has no way into the mesh solver's file.
    if (model.startType != 0) StopRun("SpecInitCondBW: Type of starting conditions not supported");

    NodeVector(model.Flux, MeshOf(model.VelocityMesh), model.startValues[0]);
    NodeVector(model.Elevation, MeshOf(model.ElevationMesh), model.startValues[1]);
    NodeVector(model.AuxVariable, MeshOf(model.AuxMesh), 0.0);
    const int32_t n = MeshOf(model.ElevationMesh).NodeCount;
    if (static_cast<int32_t>(model.TotalDepth.size()) != n + 1)
        NodeVector(model.TotalDepth, MeshOf(model.ElevationMesh), 0.0);
    if (static_cast<int32_t>(model.SlotWidth.size()) != n + 1)
        NodeVector(model.SlotWidth, MeshOf(model.ElevationMesh), 1.0);
    int32_t status = 0;
    SetDepthBW(n, model.TotalDepth, model.StillDepth, model.Elevation.data(), model.SlotWidth,
               model.Slot, status);
    if (status != 0) StopRun("Negative water depth detected");
}
