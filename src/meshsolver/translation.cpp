#include "meshsolver/translation.hpp"

#include <algorithm>
#include <cmath>
#include <new>

#include "data/xolfile.hpp"
#include "input/model_setup.hpp"
#include "meshsolver/output_info.hpp"
#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "processes/sponge.hpp"
#include "run/datetime.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

namespace {

// The tolerances of the integrator are the 32-bit real 1.0E-6, widened.
constexpr double kTolerance = static_cast<double>(1.0e-6f);
// The depth below which the mesh solver counts a node as dry.
constexpr float kMinimumDepth = 0.03f;
// Code types of the boundary conditions: 3 a level, 4 a flux (or a closed
// wall with no data), 6 an internal generation line.
constexpr int32_t kCodeLevel = 3, kCodeFlux = 4, kCodeGeneration = 6;

// The writer's calls, each on the section or keyword opened last.
void Section(KvtHandle f, const char* name) {
    kvtAddSection(f, name);
}
void End(KvtHandle f) {
    kvtEndSection(f);
}
void Int(KvtHandle f, const char* key, int32_t value) {
    kvtAddKeyword(f, key);
    kvtAddInt(f, value);
}
void Ints(KvtHandle f, const char* key, const std::vector<int32_t>& values) {
    kvtAddKeyword(f, key);
    for (int32_t v : values) kvtAddInt(f, v);
}
void Real(KvtHandle f, const char* key, float value) {
    kvtAddKeyword(f, key);
    kvtAddFloat(f, value);
}
void Double(KvtHandle f, const char* key, double value) {
    kvtAddKeyword(f, key);
    kvtAddDouble(f, value);
}
void Text(KvtHandle f, const char* key, const std::string& value) {
    kvtAddKeyword(f, key);
    kvtAddString(f, value.c_str());
}

// The first boundary record and the first generation record are the only
// ones that take part: a line has two ends.
const BoundaryRecord* FirstBoundary() {
    return gBoundaries.records.empty() ? nullptr : &gBoundaries.records.front();
}
const InternalGenRecord* FirstGeneration() {
    return gGeneration.records.empty() ? nullptr : &gGeneration.records.front();
}

void WriteTime(KvtHandle f) {
    const GridState& g = gGrid;
    Section(f, "TIME");
    Int(f, "number_of_time_steps", g.timeStepCount);
    Double(f, "time_step_interval", g.dt);
    int year = 0, month = 0, day = 0;
    CalendarDate(g.start.day, year, month, day);
    const double s = g.start.seconds;
    const int32_t hour = static_cast<int32_t>(s / 3600.0);
    const int32_t minute = static_cast<int32_t>((s - hour * 3600.0) / 60.0);
    const int32_t second = static_cast<int32_t>(std::lround(s - hour * 3600.0 - minute * 60.0));
    Ints(f, "start_time", {year, month, day, hour, minute, second});
    End(f);
}

void WriteDomain(KvtHandle f) {
    Section(f, "DOMAIN");
    Int(f, "number_of_dimensions", 1);
    Int(f, "number_of_meshes", 1);
    Text(f, "file_name", gBathymetry.fileName);
    Int(f, "number_of_nodes", 2);
    const NodeCodes c = MeshNodeCodes();
    Ints(f, "node_number_of_code", {c.nodes[0], c.nodes[1]});
    Ints(f, "value_of_code", {c.codes[0], c.codes[1]});
    Int(f, "type_of_mesh", 2);
    Int(f, "type_of_gauss", 3);
    End(f);
}

void WriteEquation(KvtHandle f) {
    Section(f, "EQUATION");
    Int(f, "formulation", gEquation.deepWaterTerms ? 2 : 1);
    Real(f, "beta", gEquation.dispersionFactor);
    End(f);
    Section(f, "TIME");
    Int(f, "start_time_step", 0);
    Int(f, "time_step_factor", 1);
    End(f);
    // Mesh 1 is the line read (linear elements), mesh 2 its quadratic refinement.
    Section(f, "SPACE");
    Int(f, "number_of_mesh_geometry", 1);
    Int(f, "number_of_mesh_velocity", 2);
    Int(f, "number_of_mesh_elevation", 1);
    Int(f, "number_of_mesh_aux_var", 1);
    End(f);
    Section(f, "DEPTH");
    Int(f, "type", 0);
    Real(f, "minimum_value", kMinimumDepth);
    Real(f, "datum_level", gGrid.referenceLevelShift);
    End(f);
}

void WriteProcesses(KvtHandle f) {
    const FrictionSettings& r = gFriction;
    Section(f, "BED_RESISTANCE");
    int32_t type = 0;
    if (r.resistanceType != 0) type = r.formulation == 0 ? 3 : (r.formulation == 1 ? 2 : 0);
    Int(f, "type", type);
    Int(f, "format", r.resistanceType == 2 ? 2 : 0);
    Real(f, "constant_value", r.constantValue);
    Text(f, "file_name", r.fileName);
    Int(f, "item_number", r.itemNumbers[0]);
    End(f);

    // The mesh solver has no eddy viscosity: its type is always 0.
    const EddySettings& e = gEddy;
    Section(f, "EDDY_VISCOSITY");
    Int(f, "type", 0);
    Int(f, "format", e.type == 2 ? 2 : 0);
    Real(f, "constant_value", e.constantValue);
    Text(f, "file_name", e.fileName);
    Int(f, "item_number", e.itemNumbers[0]);
    End(f);

    const SpongeSettings& s = gSponge;
    Section(f, "SPONGE_LAYER");
    Int(f, "type", s.spongeType ? 1 : 0);
    Text(f, "file_name", s.fileName);
    Int(f, "item_number", s.itemNumbers[0]);
    Real(f, "reference_velocity", gOptions.spongeReferenceP);
    Real(f, "reference_elevation", gOptions.spongeReferenceS);
    End(f);

    const ShorelineSettings& m = gShoreline;
    Section(f, "SLOT");
    Int(f, "type", m.type > 0 ? 1 : 0);
    Double(f, "depth", m.slotDepth);
    Double(f, "max_depth", m.maxDepth);
    Double(f, "width", m.width);
    Double(f, "smoothing_parameter", m.lambda);
    Double(f, "friction_coefficient", m.frictionCoefficient);
    End(f);

    // The particle coefficients stay behind: the solver has its own.
    const PorositySettings& p = gPorosity;
    Section(f, "POROSITY_LAYER");
    Int(f, "type", p.porosityType ? 1 : 0);
    Text(f, "file_name", p.fileName);
    Int(f, "item_number", p.itemNumbers[0]);
    End(f);

    // The angles in degrees, as read.
    const RollerSettings& b = gRollers;
    Section(f, "WAVE_BREAKING");
    Int(f, "type", b.type);
    Double(f, "roller_factor", b.rollerFactor);
    Int(f, "velocity_type", b.velocityType);
    Double(f, "velocity_factor", b.velocityFactor);
    Double(f, "initial_breaking_angle", b.initialAngle);
    Double(f, "final_breaking_angle", b.finalAngle);
    Double(f, "half_time", b.halfTime);
    End(f);

    const FilterSettings& x = gFilter;
    // A constant coefficient (type 1) goes with its value; the mesh
    // solver spreads it over the profile.
    Section(f, "EXPLICIT_FILTERING");
    Int(f, "type", x.type);
    if (x.type == 1) Real(f, "filter_coeff", x.filterCoeff);
    Text(f, "file_name", x.fileName);
    Int(f, "item_number", x.itemNumbers[0]);
    End(f);

    // A 1DH run starts from rest.
    Section(f, "STARTING_CONDITIONS");
    Int(f, "type", 0);
    End(f);
}

// The file and items of a boundary or generation record that drives a code.
// A count of 0 still names the first item, which the record read.
void WriteCodeData(KvtHandle f, const std::string& fileName, int32_t count,
                   const int32_t* numbers) {
    Text(f, "file_name", fileName);
    std::vector<int32_t> items(numbers, numbers + std::max(count, 1));
    Ints(f, "item_numbers", items);
}

// The type a boundary's formulation gives: 3 a level, 4 a flux; any other
// formulation keeps the type carried so far.
int32_t BoundaryCodeType(const BoundaryRecord& r, int32_t carried) {
    if (r.formulation == 0) return kCodeLevel;
    if (r.formulation == 1) return kCodeFlux;
    return carried;
}

void WriteBoundaryConditions(KvtHandle f) {
    const double soft = gGrid.warmUpPeriod * gGrid.dt;
    const BoundaryRecord* boundary = FirstBoundary();
    const InternalGenRecord* generation = FirstGeneration();
    int32_t type = kCodeFlux;  // carried from code to code
    Section(f, "BOUNDARY_CONDITIONS");

    Section(f, "CODE_2");
    const bool left = boundary != nullptr && boundary->first[0] == 0;
    if (left) type = BoundaryCodeType(*boundary, type);
    Int(f, "type", type);
    Int(f, "format", left ? 1 : 0);
    Double(f, "soft_time_interval", soft);
    if (left) WriteCodeData(f, boundary->fileName, boundary->itemCount, boundary->itemNumbers);
    End(f);

    Section(f, "CODE_3");
    const bool right = boundary != nullptr && boundary->first[0] == gGrid.J;
    if (generation != nullptr) {
        type = kCodeGeneration;
    } else if (right) {
        type = BoundaryCodeType(*boundary, type);
    }
    Int(f, "type", type);
    Int(f, "format", generation != nullptr || right ? 1 : 0);
    Double(f, "soft_time_interval", soft);
    if (generation != nullptr)
        WriteCodeData(f, generation->fileName, generation->itemCount, generation->itemNumbers);
    else if (right)
        WriteCodeData(f, boundary->fileName, boundary->itemCount, boundary->itemNumbers);
    End(f);

    Section(f, "CODE_4");
    Int(f, "type", kCodeFlux);
    Int(f, "format", 0);
    Double(f, "soft_time_interval", soft);
    End(f);

    End(f);
}

void WriteOutputFile(KvtHandle f, int32_t number, const OutputRecord1D& r,
                     const LinePositions& line) {
    Section(f, Filled("OUTPUT_FILE_%", number).c_str());
    Text(f, "file_name", r.fileName);
    Text(f, "title", r.title);
    Int(f, "type", r.list);
    const bool field = r.list == kOutputListDeterministic || r.list == kOutputListStatistic;
    const int32_t format = field && r.kind != 0 ? 1 : 0;
    Int(f, "format", format);
    Int(f, "number_of_variables", r.numberOfItems);
    Ints(f, "type_of_variables", r.itemNumbers);
    Int(f, "first_time_step", r.firstStep);
    Int(f, "last_time_step", r.lastStep);
    Int(f, "time_step_frequency", r.stepInterval);
    Int(f, "interpolation_type", 2);
    if (field) {
        float x1 = 0.0f, x2 = 0.0f;
        if (line.equidistant) {
            x1 = line.At(r.first), x2 = line.At(r.last);
        } else if (format == 0) {
            x1 = line.At(r.first), x2 = line.At(r.last);
        } else {
            // On a line of its own positions a line record's range is
            // taken as it stands.
            x1 = static_cast<float>(r.first), x2 = static_cast<float>(r.last);
        }
        const float spacing = r.points > 1 ? (x2 - x1) / static_cast<float>(r.points - 1) : 1.0f;
        if (format == 0) {
            Int(f, "number_of_points", r.points);
            for (int32_t p = 0; p < r.points; ++p) {
                Section(f, Filled("POINT_%", p + 1).c_str());
                Real(f, "x", line.At(r.pointIndices[static_cast<size_t>(p)]));
                End(f);
            }
        } else {
            Section(f, "AREA");
            Real(f, "x_origo", x1);
            Real(f, "x_ds", spacing);
            Int(f, "x_npoints", r.points);
            End(f);
        }
    }
    End(f);
}

void WriteOutput(KvtHandle f) {
    const OutputInfo1D& o = gOutput1D;
    const LinePositions line = ReadLinePositions();
    Section(f, "OUTPUT");
    Int(f, "number_of_output_files",
        static_cast<int32_t>(o.deterministic.size() + o.statistic.size() + o.shoreline.size()));
    // The capitals of these keys are the solver's own.
    const WaveStatistic1D& s = o.statistics;
    Section(f, "WAVE_STATISTIC");
    Int(f, "Type_of_wave_statistic", s.type);
    Int(f, "Type_of_mean_calculation", s.meanCalculation);
    Int(f, "first_time_step", s.firstStep);
    Int(f, "Last_time_step", s.lastStep);
    Int(f, "time_step_frequency", s.stepInterval);
    Int(f, "Number_of_first_waves", s.firstWave);
    Real(f, "High_elevation_limit", s.epsHigh);
    Real(f, "Low_elevation_limit", s.epsLow);
    End(f);
    int32_t number = 0;
    for (const std::vector<OutputRecord1D>* list : {&o.deterministic, &o.statistic, &o.shoreline})
        for (const OutputRecord1D& r : *list) WriteOutputFile(f, ++number, r, line);
    End(f);
}

void WriteSolutionTechnique(KvtHandle f) {
    Section(f, "SOLUTION_TECHNIQUE");
    Int(f, "type_of_supg", gOptions.typeOfSupg);
    Double(f, "supg_coefficient", gOptions.supgCoefficient);
    Section(f, "DIFFERENTIAL_ALGEBRAIC_EQUATION_SYSTEM");
    Int(f, "method", gOptions.daesMethod);
    Int(f, "order", 4);
    Double(f, "absolute_tolerance", kTolerance);
    Double(f, "relative_tolerance", kTolerance);
    Int(f, "max_iterations", 20);
    Double(f, "relaxation_factor", 1.0);
    End(f);
    Section(f, "LINEAR_EQUATION_SYSTEM");
    Int(f, "method", 1);
    End(f);
    End(f);
}

}  // namespace

std::string MeshSolverFileName(const std::string& modelName) {
    return std::string(Trim(modelName)) + "_FEM.kvt";
}

NodeCodes MeshNodeCodes() {
    const int32_t last = gGrid.J + 1;
    NodeCodes c{{1, last}, {2, 2}};
    const BoundaryRecord* boundary = FirstBoundary();
    if (boundary != nullptr && boundary->first[0] > 0)
        c = NodeCodes{{boundary->first[0], last}, {2, 3}};
    if (const InternalGenRecord* generation = FirstGeneration(); generation != nullptr)
        c = NodeCodes{{generation->pointJ.front(), last}, {3, 4}};
    return c;
}

LinePositions ReadLinePositions() {
    LinePositions line;
    line.dx = gGrid.dx;
    XolFile f = XolOpenRead(gBathymetry.fileName);
    if (f.noDynamicItems == 2) {
        line.equidistant = false;
        try {
            line.table.assign(std::max(XolItemValues(f), static_cast<size_t>(gGrid.J) + 1), 0.0f);
        } catch (const std::bad_alloc&) {
            StopRun("Unable to allocate memory");
        }
        XolReadDynamic(f, line.table.data());
    }
    XolClose(f);
    return line;
}

void WriteMeshSolverFile(const std::string& modelName, std::string& outPath) {
    outPath = MeshSolverFileName(modelName);
    KvtHandle f = 0;
    kvtCreate(&f);
    kvtAddTarget(f, kMeshSolverTarget);

    Section(f, "BASIC_MODEL_PARAMETERS");
    Int(f, "number_of_dimensions", 1);
    End(f);
    WriteTime(f);
    WriteDomain(f);

    Section(f, "BOUSSINESQ_WAVE_MODULE");
    WriteEquation(f);
    WriteProcesses(f);
    WriteBoundaryConditions(f);
    WriteOutput(f);
    WriteSolutionTechnique(f);
    End(f);

    End(f);  // the target
    // A file that can't be written is found missing by the solver, which
    // opens it; the log says why before that.
    if (kvtWrite(f, outPath.c_str()) != kKvtOk)
        ReportWarning("WriteMeshSolverFile: Unable to write " + outPath);
    kvtClose(&f);
    WriteLine("");
    WriteLine("  Mesh solver file: " + outPath);
}
