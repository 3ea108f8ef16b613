// Boundary data of the 1DH model.
//
// Each code on the geometry mesh has a section CODE_n with its `type`:
// 1 and 2 no data, 3 and 4 a flux boundary (P = -m Q, with the outward
// direction m of the node), 6 an internal generation line (a source of 2 Q
// in the flux equation). Types 3 to 6 have two values, Q for the flux and a
// second one for the surface slope term of the auxiliary equation, each a
// constant, a series of a 0-dimensional data file or a sine, ramped up from
// a reference value over the soft start interval.
#include "meshsolver/boundary_bw.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <string>

#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "platform/xolio/xolio.hpp"
#include "run/messages.hpp"

namespace {

constexpr double kPi = 3.14159265358979323846;

void SpecDataInput(DataInput& data) {
    data = DataInput{};
    KvtGetInteger("format", data.format);
    if (data.format == 0) {
        KvtGetDoubleList("constant_values", data.constantValues, 2);
    } else if (data.format == 1) {
        KvtGetFilename("file_name", data.fileName);
        // One item number is enough: the second value then stays at 0.
        const int given = KvtParamCount(gKvtAccess.currentNode, "item_numbers");
        data.itemNumbers[1] = 0;
        KvtGetIntegerList("item_numbers", data.itemNumbers, std::clamp(given, 1, 2));
    } else if (data.format == 5) {
        KvtGetDouble("reference_level", data.referenceLevel);
        KvtGetDouble("range", data.range);
        KvtGetDouble("period", data.period);
        KvtGetDouble("phase", data.phase);
    } else {
        StopRun("SpecDataInput: Wrong format");
    }
    KvtGetInteger("type_of_soft_start", data.softStartType);
    KvtGetDouble("soft_time_interval", data.softTimeInterval);
    KvtGetDoubleList("reference_values", data.referenceValues, 2);
    KvtGetInteger("type_of_time_interpolation", data.timeInterpolation);
}

// The series of a 0-dimensional data file, its times in seconds from the
// run's start; the file must cover the run.
void ReadSeriesBW(DataInput& data) {
    XolFile f = XolOpenRead(data.fileName);
    XolPrintSummary(f);
    if (f.dimension != 0) XolStopOnContent("XOL data is not 0D", f, XolAxesFound(f));
    for (int c = 0; c < 2; ++c) {
        const int32_t item = data.itemNumbers[c];
        if (item > f.noDynamicItems || item < (c == 0 ? 1 : 0))
            XolStopOnContent("XOL data does not contain the correct number of items", f,
                             "it holds " + std::to_string(f.noDynamicItems) + " items, and item " +
                                 std::to_string(item) + " is asked for");
    }
    double start = 0.0;
    if (f.timeAxisType == kXolTimeCalendar) {
        DateTime date;
        if (!ParseDateTime(f.startDateTime, date))
            XolStopOnContent("XOL data does not contain a calendar time axis", f,
                             "its start \"" + std::string(Trim(f.startDateTime)) + "\" is no date");
        start = (date.day - gMeshRun.StartDate.day) * 86400.0 +
                (date.seconds - gMeshRun.StartDate.seconds);
    }
    if (f.startOffset != static_cast<double>(kDeleteValue)) start += f.startOffset;
    const int32_t records = std::max(f.noTimeSteps, 0);
    const double runEnd = gMeshRun.LastStep * gMeshRun.TimeStepInterval;
    const double eps = 1e-6 * std::max(gMeshRun.TimeStepInterval, 1e-3);
    const double fileEnd = start + (records - 1) * f.timeStep;
    if (records < 2 || f.timeStep <= 0.0 || start > eps || fileEnd < runEnd - eps) {
        char detail[200];
        std::snprintf(detail, sizeof detail,
                      "it runs from %.6g s to %.6g s of the run in %d records, the run from 0 s "
                      "to %.6g s",
                      start, fileEnd, records, runEnd);
        XolStopOnContent("XOL data does not cover the simulation period", f, detail);
    }
    data.seriesTime.resize(records);
    data.seriesValue[0].assign(records, 0.0);
    data.seriesValue[1].assign(records, 0.0);
    for (int32_t m = 0; m < records; ++m) {
        data.seriesTime[m] = start + m * f.timeStep;
        for (int32_t i = 1; i <= f.noDynamicItems; ++i) {
            float value = 0.0f;
            XolReadDynamic(f, &value);
            for (int c = 0; c < 2; ++c) {
                if (data.itemNumbers[c] != i) continue;
                XolCheckFinite(f, &value);
                data.seriesValue[c][m] = value;
            }
        }
    }
    XolClose(f);
}

// The records of the codes of one kind on a set's mesh. Types: the code
// types that take part; nodeType: what their nodes become.
void AddRecords(BoundarySet& set, const Mesh& mesh, const std::vector<BoundaryCode>& codes,
                int32_t typeFrom, int32_t typeTo, int32_t nodeType) {
    for (const BoundaryCode& c : codes) {
        if (c.type < typeFrom || c.type > typeTo) continue;
        for (const CodeSection& section : mesh.CodeSections) {
            if (section.code != c.code) continue;
            for (int32_t node : section.nodes) {
                int32_t& r = set.recordOfNode[node];
                if (r == 0) {
                    set.records.push_back(BoundaryNode{});
                    r = static_cast<int32_t>(set.records.size());
                    set.records[r - 1].node = node;
                }
                set.records[r - 1].nodeType = nodeType;
            }
        }
    }
}

// m = -1 at the first node of an element, +1 at the second; the last
// element that touches a node decides.
void SetDirections(BoundarySet& set, const Mesh& mesh) {
    for (int32_t e = 1; e <= mesh.ElementCount; ++e)
        for (int32_t k = 1; k <= 2; ++k) {
            const int32_t r = set.recordOfNode[GetElementNode(mesh, e, k)];
            if (r > 0) set.records[r - 1].direction[0] = k == 1 ? -1.0 : 1.0;
        }
}

void StartSet(BoundarySet& set, const Mesh& mesh) {
    set = BoundarySet{};
    set.recordOfNode.assign(static_cast<size_t>(mesh.NodeCount) + 1, 0);
}

const BoundaryCode* CodeOfNode(const BwModel& model, const Mesh& mesh, int32_t node) {
    for (const BoundaryCode& c : model.BoundaryCodes)
        if (c.code == mesh.code[node]) return &c;
    return nullptr;
}

// Value[1] = Value[0], Value[0] = the value of the code's component c at t.
// The values are made per record, on the stack: a step allocates nothing.
void ShiftValues(BoundarySet& set, const Mesh& mesh, const BwModel& model, int component,
                 double t) {
    for (BoundaryNode& r : set.records) {
        const BoundaryCode* c = CodeOfNode(model, mesh, r.node);
        if (c == nullptr || c->type <= 2) continue;
        double values[2];
        DataInputValues(c->data, t, values);
        r.Value[1] = r.Value[0];
        r.Value[0] = values[component];
    }
    set.time = t;
}

}  // namespace

double SoftStartFactor(int32_t type, double T, double t) {
    if (T <= 0.0 || t > T || type == 0) return 1.0;
    if (type == 1) return t / T;
    return (1.0 + std::sin((t / T - 0.5) * kPi)) / 2.0;
}

double SeriesValueAt(const DataInput& data, int component, double t) {
    const std::vector<double>& time = data.seriesTime;
    const std::vector<double>& value = data.seriesValue[component];
    const auto n = static_cast<int32_t>(time.size());
    if (n == 0) return 0.0;
    if (n == 1) return value[0];
    const double step = time[1] - time[0];
    int32_t i = static_cast<int32_t>(std::floor((t - time[0]) / step + 1e-6));
    i = std::clamp(i, 0, n - 2);
    const double w = std::clamp((t - time[i]) / step, 0.0, 1.0);
    return value[i] * (1.0 - w) + value[i + 1] * w;
}

void DataInputValues(const DataInput& data, double t, double values[2]) {
    if (data.format == 5) {
        values[0] = data.referenceLevel +
                    std::sin(2.0 * kPi * (t + data.phase) / data.period) * data.range / 2.0;
        values[1] = 0.0;
        return;
    }
    const double f = SoftStartFactor(data.softStartType, data.softTimeInterval, t);
    for (int c = 0; c < 2; ++c) {
        double v = data.constantValues[c];
        if (data.format == 1) v = data.itemNumbers[c] > 0 ? SeriesValueAt(data, c, t) : 0.0;
        values[c] = data.referenceValues[c] + f * (v - data.referenceValues[c]);
    }
}

void SetupBoundCondBW(BwModel& model) {
    const Mesh& geometry = gMeshes.meshes[model.GeometryMesh];
    model.BoundaryCodes.clear();
    KvtOpenSection("BOUNDARY_CONDITIONS");
    for (const CodeSection& section : geometry.CodeSections) {
        if (section.nodes.empty()) continue;
        BoundaryCode c;
        c.code = section.code;
        KvtOpenSection("CODE", section.code);
        KvtGetInteger("type", c.type);
        if (c.type >= 3 && c.type <= 6) SpecDataInput(c.data);
        KvtCloseSection();
        if (c.data.format == 1 && c.type >= 3 && c.type <= 6) ReadSeriesBW(c.data);
        model.BoundaryCodes.push_back(std::move(c));
    }
    KvtCloseSection();

    const Mesh& velocity = gMeshes.meshes[model.VelocityMesh];
    const Mesh& elevation = gMeshes.meshes[model.ElevationMesh];
    const Mesh& aux = gMeshes.meshes[model.AuxMesh];
    StartSet(model.VelocitySet, velocity);
    StartSet(model.ElevationSet, elevation);
    StartSet(model.AuxSet, aux);
    // Later passes override the node type of a node recorded before.
    AddRecords(model.VelocitySet, velocity, model.BoundaryCodes, 1, 1, kNodeWallFlux);
    AddRecords(model.VelocitySet, velocity, model.BoundaryCodes, 2, 2, kNodeNoData);
    AddRecords(model.VelocitySet, velocity, model.BoundaryCodes, 3, 5, kNodeFlux);
    AddRecords(model.VelocitySet, velocity, model.BoundaryCodes, 6, 6, kNodeGeneration);
    AddRecords(model.AuxSet, aux, model.BoundaryCodes, 3, 6, kNodeNoData);
    SetDirections(model.VelocitySet, velocity);
    SetDirections(model.ElevationSet, elevation);
    SetDirections(model.AuxSet, aux);

    // A generation node inside a sponge layer feeds water that the sponge
    // damps at once: the surface piles up at the node and the waves leave
    // weak. The run goes on; the user is told where.
    if (model.spongeType > 0)
        for (const BoundaryNode& r : model.VelocitySet.records)
            if (r.nodeType == kNodeGeneration && model.spongeVelocity[r.node] < 1.0) {
                char text[160];
                std::snprintf(text, sizeof text,
                              "SetupBoundCondBW: the generation node at x = %g m lies in the "
                              "sponge layer (coefficient %g); put the sponge behind it",
                              velocity.x[r.node], 1.0 / model.spongeVelocity[r.node]);
                ReportUserWarning(text);
            }
}

void UpdateForcingsBW(double t, BwModel& model) {
    ShiftValues(model.VelocitySet, gMeshes.meshes[model.VelocityMesh], model, 0, t);
    ShiftValues(model.ElevationSet, gMeshes.meshes[model.ElevationMesh], model, 0, t);
    ShiftValues(model.AuxSet, gMeshes.meshes[model.AuxMesh], model, 1, t);
}
