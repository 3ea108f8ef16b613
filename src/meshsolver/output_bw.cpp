#include "meshsolver/output_bw.hpp"

#include <cmath>
#include <new>

#include "input/kvt_current.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "meshsolver/statistics_bw.hpp"
#include "run/messages.hpp"

OutputListBW gOutputBW;

namespace {

constexpr const char* kSurfaceHeight = "sea_surface_height_above_geopotential_datum";

}  // namespace

const OutputItemInfo kStandardItemsBW[14] = {
    {"P flux", 100080, 4700},
    {"Q flux", 100080, 4700},
    {"Surf. elevation", 100078, 1000, kSurfaceHeight},
    {"Total W. depth", 100000, 1000, "sea_floor_depth_below_sea_surface"},
    {"Still W. depth", 100000, 1000},
    {"Roller thickness", 100299, 1000},
    {"Cx, Roller celerity", 999, 2000},
    {"Cy, Roller celerity", 999, 2000},
    {"U velocity", 100016, 2000},
    {"V velocity", 100016, 2000},
    {"Aux. variable", 100298, 5000},
    {"Sponge coefficient", 100298, 5000},
    {"Filtering coefficient", 100298, 5000},
    {"Surf. elevation below roller", 100078, 1000}};

const OutputItemInfo kPhaseAverageItemsBW[19] = {
    {"Sign. Wave Height", 100097, 1000, "sea_surface_wave_significant_height"},
    {"Max. Wave Height", 100078, 1000, "sea_surface_wave_maximum_height"},
    {"Max. Elevation", 100078, 1000},
    {"Min. Elevation", 100078, 1000},
    {"Mean Elevation", 100078, 1000},
    {"Mean P-flux", 100016, 2000},
    {"Mean Q-flux", 100016, 2000},
    {"Mean U0-velocity", 100016, 2000},
    {"Mean V0-velocity", 100016, 2000},
    {"Mean Roller Thickness", 100299, 1000},
    {"Skewness", 100294, 99000},
    {"Kurtosis", 100297, 99000},
    {"Atiltness", 100296, 99000},
    {"Rad. stress, Sxx", 100109, 5100},
    {"Rad. stress, Sxy", 100109, 5100},
    {"Rad. stress, Syy", 100109, 5100},
    {"Filt. Elevation", 100078, 1000},
    {"Filt. P-flux", 100016, 2000},
    {"Filt. Q-flux", 100016, 2000}};

const OutputItemInfo kRunupItemsBW[3] = {
    {"Horizontal runup", 999, 1000}, {"Vertical runup", 999, 1000}, {"Total runup", 999, 1000}};

namespace {

OutputItemBW MakeItem(const OutputItemInfo& info, int32_t number, int32_t mesh) {
    OutputItemBW item;
    item.number = number;
    item.name = info.name;
    item.type = info.type;
    item.unit = info.unit;
    item.standardName = info.standardName;
    item.mesh = mesh;
    return item;
}

// Where a field item reads its values. The second flux, the second
// celerity and the V velocity are not fed in one horizontal dimension and
// show 0; a process that is off shows what leaves the state alone (a
// sponge factor of 1, no roller, no filtering).
void SetStandardSource(OutputItemBW& item, BwModel& m) {
    const struct {
        const std::vector<double>* vector;
        int32_t mesh;
        double fallback;
    } sources[14] = {{&m.NodalFlux, m.ElevationMesh, 0.0},
                     {&m.NodalFluxQ, m.ElevationMesh, 0.0},
                     {&m.Elevation, m.ElevationMesh, 0.0},
                     {&m.TotalDepth, m.ElevationMesh, 0.0},
                     {&m.BedLevel, m.ElevationMesh, 0.0},
                     {&m.Breaking.delta, m.ElevationMesh, 0.0},
                     {&m.Breaking.celerity, m.ElevationMesh, 0.0},
                     {nullptr, m.ElevationMesh, 0.0},
                     {&m.Flux, m.VelocityMesh, 0.0},
                     {nullptr, m.VelocityMesh, 0.0},
                     {&m.AuxVariable, m.AuxMesh, 0.0},
                     {&m.spongeElevation, m.ElevationMesh, 1.0},
                     {&m.filterElevation, m.ElevationMesh, 0.0},
                     {&m.ElevationBelowRoller, m.ElevationMesh, 0.0}};
    const auto& source = sources[item.number - 1];
    item.vector = source.vector;
    item.mesh = source.mesh;
    item.fallback = source.fallback;
}

// Room for the items of a record, taken before they are listed.
void ReserveItems(OutputFile& r) {
    r.items.clear();
    try {
        r.items.reserve(r.type_of_variables.size());
    } catch (const std::bad_alloc&) {
        StopRun("SetupOutputBW: Out of memory");
    }
}

bool Due(const OutputFile& r, int32_t step) {
    if (step == -1) return true;
    return r.first_time_step <= step && step <= r.last_time_step &&
           (step - r.first_time_step) % r.time_step_frequency == 0;
}

// One item at all places of the record into the file: one dynamic item of
// the whole line, or one of each point.
void WriteItem(OutputFile& r, const OutputItemBW& item) {
    const Mesh& mesh = gMeshes.meshes[item.mesh];
    const size_t places = r.places.size();
    if (item.vector == nullptr || item.vector->empty()) {
        for (size_t p = 0; p < places; ++p)
            r.extracted[p] = r.places[p].element > 0 ? item.fallback : r.delete_value;
    } else {
        ExtractData(r.interpolation_type, r.valueLocation, r.places, mesh, *item.vector,
                    r.extracted.data(), r.delete_value);
    }
    for (size_t p = 0; p < places; ++p) r.values[p] = static_cast<float>(r.extracted[p]);
    if (r.format != 0) {
        XolWriteDynamic(r.file, r.values.data());
    } else {
        for (size_t p = 0; p < places; ++p) XolWriteDynamic(r.file, &r.values[p]);
    }
}

void SizeWork(std::vector<double>& v, size_t n) {
    try {
        v.assign(n, 0.0);
    } catch (const std::bad_alloc&) {
        StopRun("SetupOutputBW: Out of memory");
    }
}

}  // namespace

void ResetOutputBW() {
    gOutputBW = OutputListBW{};
}

void SetupOutputBW(BwModel& model) {
    OutputListBW& o = gOutputBW;
    o = OutputListBW{};
    KvtOpenSection("OUTPUT");
    int32_t count = 0;
    KvtGetInteger("number_of_output_files", count);
    o.count = count > 0 ? count : 0;
    OutputFile defaults;
    defaults.first_time_step = gMeshRun.FirstStep;
    defaults.last_time_step = gMeshRun.LastStep;
    defaults.startDate = gMeshRun.StartDate;
    defaults.timeStepInterval = gMeshRun.TimeStepInterval;
    try {
        o.files.assign(static_cast<size_t>(o.count), defaults);
    } catch (const std::bad_alloc&) {
        StopRun("SetupOutputBW: Out of memory");
    }
    const size_t nodes = static_cast<size_t>(gMeshes.meshes[model.ElevationMesh].NodeCount) + 1;
    for (std::vector<double>* v :
         {&model.BedLevel, &model.NodalFlux, &model.NodalFluxQ, &model.ElevationBelowRoller})
        SizeWork(*v, nodes);

    SetupWaveStatisticBW(model);
    for (int32_t n = 1; n <= o.count; ++n) {
        OutputFile& r = o.files[n - 1];
        KvtOpenSection("OUTPUT_FILE", n);
        SpecOutputDomain(r);
        switch (r.type) {
            case 1:
                SpecStandardBW(r, model);
                break;
            case 2:
                SpecPhaseAverageBW(r, model);
                break;
            case 3:
                SpecRunupBW(r, model);
                break;
            default:
                StopRun("SetupOutputBW: Output type not supported");
        }
        KvtCloseSection();
    }
    KvtCloseSection();
}

void SpecStandardBW(OutputFile& r, BwModel& model) {
    ReserveItems(r);
    for (int32_t number : r.type_of_variables) {
        if (number < 1 || number > 14) StopRun("SpecStandardBW: Item type not supported");
        r.items.push_back(MakeItem(kStandardItemsBW[number - 1], number, model.ElevationMesh));
        SetStandardSource(r.items.back(), model);
    }
    r.pointCount = 1;
    SetupOutputDomain(r);
}

void SpecPhaseAverageBW(OutputFile& r, BwModel& model) {
    ReserveItems(r);
    for (int32_t number : r.type_of_variables) {
        if (number < 1 || number > 19) StopRun("SpecPhaseAverageBW: Item type not supported");
        r.items.push_back(MakeItem(kPhaseAverageItemsBW[number - 1], number, model.ElevationMesh));
        r.items.back().vector = &r.statWork;
    }
    SizeWork(r.statWork, static_cast<size_t>(gMeshes.meshes[model.ElevationMesh].NodeCount) + 1);
    r.pointCount = 1;
    SetupOutputDomain(r);
}

void SpecRunupBW(OutputFile& r, BwModel& model) {
    ReserveItems(r);
    for (int32_t number : r.type_of_variables) {
        if (number < 1 || number > 3) StopRun("SpecRunupBW: Item type not supported");
        r.items.push_back(MakeItem(kRunupItemsBW[number - 1], number, model.ElevationMesh));
    }
    // A series of plain values: no places and no spatial axis.
    r.pointCount = 1;
    r.x_npoints = 0;
    r.projection = gMeshes.meshes[model.ElevationMesh].projection;
    try {
        r.values.assign(1, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("SetupOutputBW: Out of memory");
    }
}

void RefreshWorkVectorsBW(BwModel& m) {
    const Mesh& elevation = gMeshes.meshes[m.ElevationMesh];
    const Mesh& velocity = gMeshes.meshes[m.VelocityMesh];
    const int32_t n = elevation.NodeCount;
    if (static_cast<int32_t>(m.BedLevel.size()) <= n) return;
    for (int32_t i = 1; i <= n; ++i) m.BedLevel[i] = -m.StillDepth[i];
    // The ends of velocity element e are its local nodes 1 and 2, as are
    // those of elevation element e.
    for (int32_t e = 1; e <= elevation.ElementCount; ++e)
        for (int32_t k = 1; k <= 2; ++k)
            m.NodalFlux[GetElementNode(elevation, e, k)] = m.Flux[GetElementNode(velocity, e, k)];
    const std::vector<double>& delta = m.Breaking.delta;
    for (int32_t i = 1; i <= n; ++i)
        m.ElevationBelowRoller[i] = m.Elevation[i] - (delta.empty() ? 0.0 : delta[i]);
}

void WriteOutputHD3D(int32_t step, int32_t count, std::vector<OutputFile>& records,
                     BwModel& model) {
    RefreshWorkVectorsBW(model);
    static const std::vector<double> kNone;
    UpdateWaveStatisticBW(step, model.TimeStep, model.Dimensions,
                          gMeshes.meshes[model.ElevationMesh].NodeCount, model.StillDepth,
                          model.Elevation, model.ElevationRate, model.TotalDepth, model.NodalFlux,
                          model.NodalFluxQ, model.Breaking.type, model.Breaking.delta,
                          model.Breaking.celerity, kNone);
    for (int32_t n = 0; n < count; ++n) {
        OutputFile& r = records[n];
        if (!r.active || !Due(r, step)) continue;
        // A file of another kind was not created: nothing to write to.
        if (r.file.mode != 2) continue;
        switch (r.type) {
            case 1:
                WriteStandardBW(r);
                break;
            case 2:
                WritePhaseAverageBW(step, r, model);
                break;
            case 3:
                WriteRunupBW(r, model);
                break;
            default:
                StopRun("WriteOutputHD3D: Output type not supported");
        }
        XolFlush(r.file);
    }
}

void WriteStandardBW(OutputFile& r) {
    for (const OutputItemBW& item : r.items) WriteItem(r, item);
}

void WritePhaseAverageBW(int32_t step, OutputFile& r, BwModel& /*model*/) {
    for (const OutputItemBW& item : r.items) {
        CalcPhaseAverageBW(step, item.number, r.statWork);
        WriteItem(r, item);
    }
}

bool FindRunupCrossing(const Mesh& mesh, const std::vector<double>& eta,
                       const std::vector<double>& d, double& xr, double& zr) {
    const int32_t n = mesh.NodeCount;
    if (n < 2) return false;
    for (int32_t i = 1; i < n; ++i) {
        const double h1 = eta[i] + d[i], h2 = eta[i + 1] + d[i + 1];
        if (h1 * h2 > 0.0) continue;
        const double x1 = mesh.x[i], x2 = mesh.x[i + 1], delta = x2 - x1;
        const double a = (h2 - h1) / delta, b = (h1 * x2 - h2 * x1) / delta;
        // Two dry nodes at zero depth: the water line stands at the first.
        xr = a != 0.0 ? -b / a : x1;
        const double c = (d[i + 1] - d[i]) / delta, e = (x2 * d[i] - x1 * d[i + 1]) / delta;
        zr = -(e + c * xr);
        return true;
    }
    return false;
}

void WriteRunupBW(OutputFile& r, BwModel& model) {
    OutputListBW& o = gOutputBW;
    double values[3] = {r.delete_value, r.delete_value, r.delete_value};
    double xr = 0.0, zr = 0.0;
    if (FindRunupCrossing(gMeshes.meshes[model.ElevationMesh], model.Elevation, model.StillDepth,
                          xr, zr)) {
        if (!o.runupReferenceSet) {
            o.runupReferenceSet = true;
            o.runupX0 = xr, o.runupZ0 = zr;
        }
        const double dx = xr - o.runupX0, dz = zr - o.runupZ0;
        const double total = std::sqrt(dx * dx + dz * dz);
        values[0] = xr;
        values[1] = zr;
        values[2] = zr < o.runupZ0 ? -total : total;
    }
    // The k-th item takes the k-th value; items beyond three have none.
    for (size_t k = 0; k < r.items.size(); ++k) {
        r.values[0] = static_cast<float>(k < 3 ? values[k] : r.delete_value);
        XolWriteDynamic(r.file, r.values.data());
    }
}
