// Bathymetry_Selection: the bathymetry file gives the grid (its axes), the
// map frame (its projection block) and the bed level. With a hot start the
// same file is the state of an earlier run, whose second item is the bed.
#include <algorithm>
#include <new>
#include <vector>

#include "data/geoframe.hpp"
#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "run/memory.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

namespace {

constexpr int32_t kHotStartDataType = 11;

// The file must open as a data file before the layer reads its record; the
// stop names the file and the reason.
void CheckOpens(const std::string& path) {
    const std::string stop = "XOL file can not be opened: " + std::string(Trim(path)) + ": ";
    XolHandle header = 0, file = 0;
    if (xolFileRead(path, &header, &file) != 0) StopRun(stop + xolLastErrorText());
    const bool items = xolGetNoOfItems(header) >= 1;
    xolFileClose(file);
    xolHeaderDestroy(header);
    if (!items) StopRun(stop + "the file holds no dynamic items");
}

// A bathymetry of the 2DH model has two spatial axes, one of the 1DH model one.
void CheckAxes(const XolFile& f, bool twoD) {
    const int32_t wanted = twoD ? 2 : 1;
    if (f.dimension == wanted) return;
    StopRun(std::string(twoD ? "XOL data is not 2D: " : "XOL data is not 1D: ") +
            std::string(Trim(f.path)) + ": it has " + std::to_string(f.dimension) +
            " spatial axes where a bathymetry" + (twoD ? "" : " of the 1DH model") + " has " +
            std::to_string(wanted));
}

// The map frame of the grid and the geographical position of its origin.
void OpenGridFrame(const XolFile& f) {
    GridState& g = gGrid;
    int status = 0;
    GeoFrameOpen(g.frame, g.projection, f.longitude, f.latitude, f.orientation, &status);
    double longitude = 0.0, latitude = 0.0;
    if (status == 0) GeoFrameXy2Geo(g.frame, 0.0, 0.0, longitude, latitude, &status);
    if (status != 0) StopRun("Unable to initialize the cartography module");
    g.longitude = longitude;
    g.latitude = latitude;
}

}  // namespace

void ReadBathymetry(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Bathymetry_Selection");
    BathymetrySettings& b = gBathymetry;
    b = BathymetrySettings{};
    KvtGetLogical(section, "Hot_Start", b.hotStart);
    const DataFileRef ref = ReadDataFile(section, 15);
    b.fileName = ref.fileName;
    b.itemCount = ref.itemCount;
    for (int i = 0; i < 15; ++i) b.itemNumbers[i] = ref.itemNumbers[i];

    // The library knows equidistant axes only, so a bathymetry is always a
    // grid file here, never a mesh file with a table of positions.
    CheckOpens(b.fileName);
    XolFile f = XolOpenRead(b.fileName);

    GridState& g = gGrid;
    const bool twoD = gBasic.numberOfDimensions == 2;
    CheckAxes(f, twoD);
    if (twoD) {
        g.projection = std::string(TrimRight(f.projection));
        g.orientation = static_cast<float>(f.orientation);
        if (Trim(g.projection).empty()) StopRun("XOL data does not contain projection information");
    }
    int32_t count = 0;
    XolGetAxis(f, 1, g.dx, count);
    g.J = count - 1;
    g.K = 0;
    g.dy = 0.0f;
    if (twoD) {
        XolGetAxis(f, 2, g.dy, count);
        g.K = count - 1;
        OpenGridFrame(f);
    }

    // The bed and the room to read an item into, which with one dimension
    // may be more than the model's line: read the whole item, keep the line.
    const size_t room = std::max(XolItemValues(f), g.Points());
    CheckMemory("the bathymetry of " + std::to_string(g.J + 1) + " x " + std::to_string(g.K + 1) +
                    " points in " + std::string(Trim(b.fileName)),
                static_cast<double>(g.Points() + room), sizeof(float));
    try {
        g.bed.assign(g.Points(), 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    std::vector<float> item;
    try {
        item.assign(room, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    if (!b.hotStart) {
        // Items 1 to the selected one, so that the selected item stays.
        XolCheckItemNumber(f, b.itemNumbers[0]);
        for (int32_t n = 1; n <= b.itemNumbers[0]; ++n) XolReadDynamic(f, item.data());
    } else {
        if (f.dataType != kHotStartDataType)
            StopRun("XOL data is not hot start data: " + std::string(Trim(b.fileName)) +
                    ": its data type is " + std::to_string(f.dataType) +
                    " where a state file has " + std::to_string(kHotStartDataType));
        // The scalars of the state file, then the bed over them.
        XolReadDynamic(f, item.data());
        XolReadDynamic(f, item.data());
    }
    XolCheckFinite(f, item.data());
    // The summary follows the reading, with the range of the bed read.
    XolNoteItemRange(f, b.hotStart ? 2 : b.itemNumbers[0], item.data());
    XolClose(f);
    XolPrintSummary(f);
    std::copy(item.begin(), item.begin() + static_cast<ptrdiff_t>(g.Points()), g.bed.begin());
}
