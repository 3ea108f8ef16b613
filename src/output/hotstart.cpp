// Hot-start output. The state file holds one record of 18 items over the
// whole grid, x fastest like the model's fields:
//   1 scalars, 2 bed, 3 xi, 4 P, 5 Q, 6 xiPrev, 7 PPrev, 8 QPrev, 9 pxyt,
//   10 qxyt, 11 tanPhi, 12 delta, 13 cx, 14 cy, 15 sourceP, 16 sourceQ,
//   17 sourcePPrev, 18 sourceQPrev.
// Items 11 to 14 are maps of 0 without rollers and 15 to 18 without internal
// generation, so that a file always has 18 items. A source vector is laid
// into the first elements of its map, source number i at element i - 1.
//
// The data-type flag 11 marks the file as a state file; the bathymetry
// reader of the next run refuses any other. The scalars of item 1 describe
// the grid and the instant for a reader of the file; a hot start reads none
// of them.
#include "output/hotstart.hpp"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <new>

#include "data/xolfile.hpp"
#include "output/output_lock.hpp"
#include "processes/internal_generation.hpp"
#include "processes/rollers.hpp"
#include "run/datetime.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

HotstartOutputState gHotstartState;

const OutputItemInfo kHotstartItemInfo[kHotstartItems] = {{"Misc. scalars", 999, 0},
                                                          {"Z", 100079, 1000},
                                                          {"S", 100078, 1000},
                                                          {"P", 100080, 4700},
                                                          {"Q", 100080, 4700},
                                                          {"S (old).", 100078, 1000},
                                                          {"P (old)", 100080, 4700},
                                                          {"Q (old)", 100080, 4700},
                                                          {"pxyt (extrapolated)", 999, 0},
                                                          {"qxyt (extrapolated)", 999, 0},
                                                          {"tanphi", 999, 0},
                                                          {"delta", 999, 0},
                                                          {"cx", 999, 0},
                                                          {"cy", 999, 0},
                                                          {"sp", 100080, 4700},
                                                          {"sq", 100080, 4700},
                                                          {"sp (old)", 100080, 4700},
                                                          {"sq (old)", 100080, 4700}};

namespace {

constexpr int32_t kHotstartDataType = 11;

bool Due(const HotstartOutputSettings& h, int32_t step) {
    if (step < h.firstStep || step > h.lastStep) return false;
    if (h.stepInterval < 1) return step == h.firstStep;
    return (step - h.firstStep) % h.stepInterval == 0;
}

// Item 1: the delete value but for the grid, the step, the date and time of
// the record, the position of grid point (0,0) and the land value. A grid of
// fewer than 21 points keeps what fits.
void FillScalars(std::vector<float>& v, const DateTime& date, double latitude, double north) {
    const GridState& g = gGrid;
    std::fill(v.begin(), v.end(), kDeleteValue);
    const double hour = std::floor(date.seconds / 3600.0);
    const double minute = std::floor((date.seconds - hour * 3600.0) / 60.0);
    const double second = date.seconds - hour * 3600.0 - minute * 60.0;
    const std::pair<size_t, double> scalars[] = {
        {1, g.J},       {2, g.K},    {3, g.dx},         {4, g.dy},    {5, g.dt},
        {7, date.day},  {8, hour},   {9, minute},       {10, second}, {11, 0.0},
        {15, latitude}, {16, north}, {17, g.landValue}, {20, 1.0}};
    for (const auto& [at, value] : scalars)
        if (at < v.size()) v[at] = static_cast<float>(value);
}

// A map of 0 with a flat source vector (number i at index i) laid into its
// first elements; a map of 0 without generation.
void FillSources(std::vector<float>& v, const std::vector<float>& sources) {
    std::fill(v.begin(), v.end(), 0.0f);
    if (sources.size() < 2) return;
    const size_t count = std::min(sources.size() - 1, v.size());
    std::copy(sources.begin() + 1, sources.begin() + 1 + static_cast<ptrdiff_t>(count), v.begin());
}

// The data of a closed file handed to the disk, so that the rename cannot
// come before the data it names.
bool SyncToDisk(const std::string& path) {
    const int fd = open(path.c_str(), O_RDONLY);
    if (fd < 0) return false;
    const bool synced = fsync(fd) == 0;
    return close(fd) == 0 && synced;
}

// A failed write: the temporary file goes, the former file stays, and the
// run stops with the text.
[[noreturn]] void Abandon(XolFile& f, const std::string& temporary, const std::string& text) {
    if (f.mode == 2 && f.file != 0) XolClose(f);
    unlink(temporary.c_str());
    StopRun(text);
}

}  // namespace

std::string HotstartTemporaryName(const std::string& fileName) {
    return fileName + ".tmp";
}

void WriteOutputHotstart(int32_t step) {
    const HotstartOutputSettings& h = gHotstartOutput;
    if (!Due(h, step)) return;
    const GridState& g = gGrid;
    std::vector<float>& v = gHotstartState.item;
    if (v.size() != g.Points()) {
        try {
            v.assign(g.Points(), 0.0f);
        } catch (const std::bad_alloc&) {
            StopRun("Unable to allocate memory");
        }
    }

    // The header: the grid, the items, the land value, the flag of a state
    // file, the frame at grid point (0,0) and the instant of the step.
    XolFile f = XolCreateHeader(h.title, kHotstartItems, 2);
    XolSetAxis(f, 1, g.dx, 0.0f, g.J + 1, 1000);
    XolSetAxis(f, 2, g.dy, 0.0f, g.K + 1, 1000);
    for (int32_t n = 1; n <= kHotstartItems; ++n) {
        const OutputItemInfo& info = kHotstartItemInfo[n - 1];
        XolSetItem(f, n, info.type, info.name, info.unit);
    }
    XolSetMisc(f, 4, g.landValue);
    XolSetDataType(f, kHotstartDataType);
    const GridPlace origin = SetGridProjection(f, 0.0, 0.0);
    SetStepTimeAxis(f, step, 1);
    const DateTime date = AddSeconds(g.start, step * g.dt);

    if (!gHotstartState.locked) {
        LockOutputFile("WriteOutputHotstart", h.fileName);
        gHotstartState.locked = true;
    }
    const std::string temporary = HotstartTemporaryName(h.fileName);
    // A stop names File_Name, which the user knows, with the reason the data
    // layer gave for the temporary file behind it.
    auto stop = [&](const std::string& text, const std::string& reason) {
        Abandon(f, temporary, text + (reason.empty() ? "" : ": " + reason));
    };
    auto layerReason = [&]() {
        const std::string named = temporary + ": ";
        const size_t at = f.lastErrorText.find(named);
        return at == std::string::npos ? std::string() : f.lastErrorText.substr(at + named.size());
    };
    int status = 0;
    XolCreateFile(f, temporary, &status);
    if (status != 0) stop(XolErrorText(status) + " for " + h.fileName, layerReason());
    auto write = [&](const float* values) {
        XolWriteDynamic(f, values, &status);
        if (status != 0)
            stop("TRNXOL Error: " + XolErrorText(status) + ": " + h.fileName, layerReason());
    };

    FillScalars(v, date, origin.latitude, origin.north);
    write(v.data());
    for (const Field* field :
         {&g.bed, &g.xi, &g.P, &g.Q, &g.xiPrev, &g.PPrev, &g.QPrev, &g.pxyt, &g.qxyt})
        write(field->data());
    const RollerSettings& r = gRollers;
    if (!r.delta.empty()) {
        for (const std::vector<float>* field : {&r.tanPhi, &r.delta, &r.cx, &r.cy})
            write(field->data());
    } else {
        std::fill(v.begin(), v.end(), 0.0f);
        for (int i = 0; i < 4; ++i) write(v.data());
    }
    const GenerationState& s = gGeneration;
    for (const std::vector<float>* sources :
         {&s.sourceP, &s.sourceQ, &s.sourcePPrev, &s.sourceQPrev}) {
        FillSources(v, *sources);
        write(v.data());
    }

    XolFlush(f, &status);
    const std::string flushError = "Flush error: " + h.fileName;
    if (status != 0) stop(flushError, layerReason());
    XolClose(f, &status);
    if (status != 0) stop(flushError, layerReason());
    if (!SyncToDisk(temporary)) stop(flushError, std::strerror(errno));
    if (std::rename(temporary.c_str(), h.fileName.c_str()) != 0)
        stop(XolErrorText(kXolCreateFile) + " for " + h.fileName, std::strerror(errno));
    XolPrintSummary(f);
}
