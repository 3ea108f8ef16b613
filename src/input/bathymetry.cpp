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
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

namespace {

constexpr int32_t kHotStartDataType = 11;

// The file must open as a data file before the layer reads its record.
void CheckOpens(const std::string& path) {
    XolHandle header = 0, file = 0;
    if (xolFileRead(path, &header, &file) != 0 || xolGetNoOfItems(header) < 1)
        StopRun("XOL file can not be opened");
    xolFileClose(file);
    xolHeaderDestroy(header);
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

size_t ItemSize(const XolFile& f) {
    size_t size = 1;
    for (int d = 0; d < f.dimension && d < 4; ++d)
        size *= static_cast<size_t>(std::max(f.axes[d].count, 1));
    return size;
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
    XolPrintSummary(f);

    GridState& g = gGrid;
    const bool twoD = gBasic.numberOfDimensions == 2;
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

    try {
        g.bed.assign(g.Points(), 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    // An item fills the file's whole grid, which with one dimension may be
    // more than the model's line: read into room for it, keep the line.
    std::vector<float> item;
    try {
        item.assign(std::max(ItemSize(f), g.Points()), 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    if (!b.hotStart) {
        // Items 1 to the selected one, so that the selected item stays.
        for (int32_t n = 1; n <= b.itemNumbers[0]; ++n) XolReadDynamic(f, item.data());
    } else {
        if (f.dataType != kHotStartDataType) StopRun("XOL data is not hot start data");
        // The scalars of the state file, then the bed over them.
        XolReadDynamic(f, item.data());
        XolReadDynamic(f, item.data());
    }
    XolClose(f);
    std::copy(item.begin(), item.begin() + static_cast<ptrdiff_t>(g.Points()), g.bed.begin());
}
