#include "input/model_setup.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "data/tsfunc.hpp"
#include "input/kvt_access.hpp"
#include "meshsolver/output_info.hpp"
#include "meshsolver/translation.hpp"
#include "output/deterministic.hpp"
#include "output/output_sections.hpp"
#include "processes/friction.hpp"
#include "processes/initial_surface.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "processes/sponge.hpp"
#include "run/datetime.hpp"
#include "run/memory.hpp"
#include "run/messages.hpp"
#include "run/progress.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/scheme_stability.hpp"

BasicSettings gBasic;
BathymetrySettings gBathymetry;
std::string gMeshSolverFileName;

namespace {

// A stop on a value of a section that is read: what the section holds and
// no setting read comes first, as the likely cause.
[[noreturn]] void StopSetting(KvtHandle section, const std::string& text) {
    KvtWarnUnread(section);
    StopRun(text);
}

void ReadBasicModelParameters(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "BASIC_MODEL_PARAMETERS");
    gBasic = BasicSettings{};
    KvtGetInteger(section, "NUMBER_OF_DIMENSIONS", gBasic.numberOfDimensions);
    if (gBasic.numberOfDimensions != 1 && gBasic.numberOfDimensions != 2)
        StopSetting(section, Filled("ReadModelSetup: NUMBER_OF_DIMENSIONS must be 1 or 2, not %",
                                    gBasic.numberOfDimensions));
    if (gBasic.numberOfDimensions == 1)
        KvtGetInteger(section, "DELETE_FEM_KVT_FILE", gBasic.deleteFemKvtFile);
    KvtGetInteger(section, "OPEN_LOG_FILE_AFTER_RUN", gBasic.openLogFileAfterRun);
}

// True_land_value and Reference_Level_Shift. The shift lowers the bed of the
// water points only: the land keeps its level, so that the land value still
// tells land from water.
void ReadAreaDescription(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Area_Description");
    GridState& g = gGrid;
    g.landValue = 0.0f;
    g.referenceLevelShift = 0.0f;
    KvtGetReal(section, "True_land_value", g.landValue);
    KvtGetReal(section, "Reference_Level_Shift", g.referenceLevelShift);
    if (gBasic.numberOfDimensions != 2) return;
    g.waterPoints = 0;
    for (float& b : g.bed) {
        if (b < g.landValue) {
            b -= g.referenceLevelShift;
            ++g.waterPoints;
        }
    }
}

void ReadSimulationPeriod(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Simulation_Period");
    GridState& g = gGrid;
    int32_t count = 0, warmUp = 0;
    double dt = 0.0;
    int32_t start[6] = {0, 0, 0, 0, 0, 0};
    KvtGetInteger(section, "Time_step_count", count);
    KvtGetDouble(section, "Time_step_interval", dt);
    KvtGetInteger(section, "Warm_up_period", warmUp);
    const bool startGiven = kvtKeywordByNameNum(section, "Start_time", 1) != 0;
    KvtGetIntegerList(section, "Start_time", start, 6);
    // Checks the reader adds to the plain reading: a run of no steps, a step
    // that is not a positive number, a start that no calendar has, and a
    // warm-up of negative length cannot be meant, and would otherwise run to
    // a normal end with empty or meaningless output.
    const std::string steps = "Time_step_count = " + std::to_string(count);
    if (count < 1 || count == INT32_MAX)
        StopSetting(section,
                    "ReadModelSetup: " + steps +
                        " in section Simulation_Period; the number of time steps must be from 1 to "
                        "2147483646");
    // A boundary series is held in memory as a table of four values a step
    // while it is resampled to the steps of the run.
    CheckMemory(steps, count + 1.0, 4.0 * sizeof(float));
    if (!(dt > 0.0) || !std::isfinite(dt))
        StopSetting(
            section,
            Filled("ReadModelSetup: Time_step_interval = % in section Simulation_Period; the "
                   "time step must be a number of seconds above 0",
                   dt));
    if (warmUp < 0)
        StopSetting(section,
                    Filled("ReadModelSetup: Warm_up_period = % in section Simulation_Period; the "
                           "warm-up must be 0 or more time steps",
                           warmUp));
    if (startGiven && !DateExists(start[0], start[1], start[2], start[3], start[4], start[5])) {
        char text[96];
        std::snprintf(text, sizeof text, "%d,%d,%d,%d,%d,%d", start[0], start[1], start[2],
                      start[3], start[4], start[5]);
        StopSetting(
            section,
            "ReadModelSetup: Start_time = " + std::string(text) +
                " in section Simulation_Period is not a date; year (0 to 9999), month, day, "
                "hour, minute and second of an existing date are expected");
    }
    g.timeStepCount = count;
    g.lastStep = count - 1;
    g.dt = dt;
    g.warmUpPeriod = warmUp;
    g.start = MakeDateTime(start[0], start[1], start[2], start[3], start[4], start[5]);
    gProgress.simulationStart = g.start;
    gProgress.timeStep = dt;
    // One row of every series for each step of the run, step 0 included.
    TsInit(count + 1);
}

void ReadOptionParameters(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "OPTION_PARAMETERS");
    OptionSettings& o = gOptions;
    // The sponge setup has put the references to 0; every other option
    // starts from its default here.
    const float s = o.spongeReferenceS, p = o.spongeReferenceP, q = o.spongeReferenceQ;
    o = OptionSettings{};
    o.spongeReferenceS = s, o.spongeReferenceP = p, o.spongeReferenceQ = q;
    KvtGetReal(section, "Sponge_Reference_s", o.spongeReferenceS);
    KvtGetReal(section, "Sponge_Reference_p", o.spongeReferenceP);
    KvtGetReal(section, "Sponge_Reference_q", o.spongeReferenceQ);
    KvtGetInteger(section, "DAES_method", o.daesMethod);
    KvtGetInteger(section, "type_of_supg", o.typeOfSupg);
    KvtGetDouble(section, "supg_coefficient", o.supgCoefficient);
    KvtGetDouble(section, "interpolation_type", o.interpolationType);
    o.nameOfTextEditor = KvtTrimmedString(section, "Name_of_Text_Editor", 256, o.nameOfTextEditor);
    KvtGetInteger(section, "HUD_update_2DH", o.hudUpdate2DH);
    KvtGetInteger(section, "HUD_update_1DH", o.hudUpdate1DH);
    KvtGetDouble(section, "minimum_depth", o.minimumDepth);
    gProgress.updateInterval = o.hudUpdate2DH;
}

}  // namespace

DataFileRef ReadDataFile(KvtHandle parent, int32_t maxItems) {
    const KvtHandle section = KvtOpenSection(parent, "DATA_FILE");
    DataFileRef ref;
    ref.fileName = KvtTrimmedFilename(section, "File_name", 256);
    KvtGetInteger(section, "Item_Count", ref.itemCount);
    ref.itemCount = std::clamp(ref.itemCount, 0, std::min(maxItems, 15));
    // The first number selects the item, so it is read even for a count of 0.
    KvtGetIntegerList(section, "Item_Numbers", ref.itemNumbers, std::max(ref.itemCount, 1));
    return ref;
}

void ReadModelSetup(KvtHandle file, const std::string& fileName) {
    const KvtHandle target = KvtOpenTarget(file, kModelTarget);
    gMeshSolverFileName.clear();
    ReadBasicModelParameters(target);
    const bool twoD = gBasic.numberOfDimensions == 2;
    ReadBathymetry(target);
    ReadAreaDescription(target);
    ReadSimulationPeriod(target);
    SetupEquation(target);
    ReadSolutionParameters(target);
    SetupMovingShoreline(target);

    SetupBottomFriction(target);
    SetupWaveBreaking(target);
    SetupExplicitFilter(target);
    SetupEddyViscosity(target);
    SetupPorosity(target);
    SetupSpongeLayer(target);
    SetupInitialSurface(target);

    SetupOpenBoundaries(target);
    SetupInternalGeneration(target);

    if (twoD) {
        SetupOutputDeterministic2D(target);
        SetupOutputStatistic2D(target);
        SetupOutputDisturbance2D(target);
        SetupOutputHotstart2D(target);
    } else {
        SetupOutputInfo1D(target);
    }

    ReadOptionParameters(target);
    if (twoD) {
        ReportSchemeStability();
        return;
    }
    // The mesh solver reads nothing of the model file but the second file
    // written here: what the model file holds and no setting read is told
    // now, before its tree is closed.
    KvtWarnUnread(file);
    WriteMeshSolverFile(fileName, gMeshSolverFileName);
    kvtClose(&file);
}
