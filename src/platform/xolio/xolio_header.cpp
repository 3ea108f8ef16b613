// Headers and items of the data-file library: what a file holds besides its
// values, kept in memory from creation (or reading) to destruction.
#include <map>

#include "platform/xolio/xolio_record.hpp"

namespace {

enum class Kind { Header, File, Item };
std::map<const void*, Kind> gLive;
std::string gLastError;

template <typename T>
T* Lookup(XolHandle handle, Kind kind) {
    const void* p = reinterpret_cast<const void*>(static_cast<uintptr_t>(handle));
    auto it = gLive.find(p);
    if (handle == 0 || it == gLive.end() || it->second != kind) return nullptr;
    return static_cast<T*>(const_cast<void*>(p));
}

XolHandle HandleOf(const void* p) {
    return static_cast<XolHandle>(reinterpret_cast<uintptr_t>(p));
}

int SetAxes(XolHandle item, int unit, int dims, const int* counts, const float* origins,
            const float* spacings) {
    XolItemRec* it = XolItemOf(item);
    if (it == nullptr) return XolFail(kXolErrArgument, "not an item");
    static const int kTypes[] = {kXolAxisNone, kXolAxisEq1, kXolAxisEq2, kXolAxisEq3, kXolAxisEq4};
    it->axisType = kTypes[dims];
    it->axisUnit = unit;
    it->dims = dims;
    for (int d = 0; d < 4; ++d) {
        it->count[d] = d < dims ? counts[d] : 1;
        it->origin[d] = d < dims ? origins[d] : 0.0f;
        it->spacing[d] = d < dims ? spacings[d] : 0.0f;
        if (d < dims && counts[d] < 1) return XolFail(kXolErrArgument, "an axis needs a point");
    }
    return 0;
}

}  // namespace

XolHeaderRec* XolHeaderOf(XolHandle h) {
    return Lookup<XolHeaderRec>(h, Kind::Header);
}
XolFileRec* XolFileOf(XolHandle h) {
    return Lookup<XolFileRec>(h, Kind::File);
}
XolItemRec* XolItemOf(XolHandle h) {
    return Lookup<XolItemRec>(h, Kind::Item);
}
XolHandle XolRegister(XolHeaderRec* p) {
    return gLive[p] = Kind::Header, HandleOf(p);
}
XolHandle XolRegister(XolFileRec* p) {
    return gLive[p] = Kind::File, HandleOf(p);
}
XolHandle XolRegister(XolItemRec* p) {
    return gLive[p] = Kind::Item, HandleOf(p);
}
void XolForget(const void* p) {
    gLive.erase(p);
}

int XolFail(int code, const std::string& text) {
    gLastError = text;
    return code;
}

const char* xolLastErrorText() {
    return gLastError.c_str();
}

int xolHeaderCreate(int fileType, const std::string& title, const std::string& appTitle,
                    int version, int dynamicItems, int statisticsType, XolHandle* header) {
    *header = 0;
    if (dynamicItems < 0) return XolFail(kXolErrArgument, "negative item count");
    auto* h = new XolHeaderRec;
    h->fileType = fileType;
    h->title = title;
    h->appTitle = appTitle;
    h->version = version;
    h->statisticsType = statisticsType;
    h->items.resize(static_cast<size_t>(dynamicItems));
    for (auto& item : h->items) XolRegister(&item);
    *header = XolRegister(h);
    return 0;
}

int xolHeaderDestroy(XolHandle header) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    for (auto& item : h->items) XolForget(&item);
    for (auto& item : h->statics) XolForget(item.get());
    XolForget(h);
    delete h;
    return 0;
}

int xolSetDeleteValFloat(XolHandle header, float value) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    h->deleteValue = value;
    return 0;
}

int xolSetDataType(XolHandle header, int dataType) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    h->dataType = dataType;
    return 0;
}

int xolSetEqCalendarAxis(XolHandle header, const std::string& date, const std::string& time,
                         int timeUnit, double startOffset, double step, int startIndex) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    h->timeType = kXolTimeCalendar;
    h->date = date;
    h->time = time;
    h->timeUnit = timeUnit;
    h->startOffset = startOffset;
    h->step = step;
    h->startIndex = startIndex;
    return 0;
}

int xolSetEqTimeAxis(XolHandle header, int timeUnit, double startOffset, double step,
                     int startIndex) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    h->timeType = kXolTimeRelative;
    h->timeUnit = timeUnit;
    h->startOffset = startOffset;
    h->step = step;
    h->startIndex = startIndex;
    return 0;
}

int xolSetGeoInfoUTMProj(XolHandle header, const std::string& projection, double longitude,
                         double latitude, double orientation) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    h->geo = true;
    h->projection = projection;
    h->longitude = longitude;
    h->latitude = latitude;
    h->orientation = orientation;
    return 0;
}

XolHandle xolItemD(XolHandle header, int n) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr || n < 1 || n > static_cast<int>(h->items.size())) return 0;
    return HandleOf(&h->items[static_cast<size_t>(n - 1)]);
}

int xolSetItemInfo(XolHandle item, int type, const std::string& name, int unit, int dataType) {
    XolItemRec* it = XolItemOf(item);
    if (it == nullptr) return XolFail(kXolErrArgument, "not an item");
    if (dataType != 1) return XolFail(kXolErrArgument, "only 32-bit float items are kept");
    it->type = type;
    it->name = name;
    it->unit = unit;
    it->dataType = dataType;
    return 0;
}

int xolSetItemAttribute(XolHandle item, const XolAttribute& attribute) {
    XolItemRec* it = XolItemOf(item);
    if (it == nullptr || attribute.name.empty()) return XolFail(kXolErrArgument, "bad attribute");
    for (XolAttribute& a : it->attributes)
        if (a.name == attribute.name) {
            a = attribute;
            return 0;
        }
    it->attributes.push_back(attribute);
    return 0;
}

int xolSetItemUnitConversion(XolHandle item, int mode, int unit) {
    XolItemRec* it = XolItemOf(item);
    if (it == nullptr || mode != 3) return XolFail(kXolErrArgument, "bad unit conversion");
    it->passUnit = unit;
    return 0;
}

int xolSetItemAxisEqD0(XolHandle item, int unit) {
    return SetAxes(item, unit, 0, nullptr, nullptr, nullptr);
}

int xolSetItemAxisEqD1(XolHandle item, int unit, int nx, float x0, float dx) {
    return SetAxes(item, unit, 1, &nx, &x0, &dx);
}

int xolSetItemAxisEqD2(XolHandle item, int unit, int nx, int ny, float x0, float y0, float dx,
                       float dy) {
    const int counts[] = {nx, ny};
    const float origins[] = {x0, y0};
    const float spacings[] = {dx, dy};
    return SetAxes(item, unit, 2, counts, origins, spacings);
}

int xolSetItemAxisEqD3(XolHandle item, int unit, int nx, int ny, int nz, float x0, float y0,
                       float z0, float dx, float dy, float dz) {
    const int counts[] = {nx, ny, nz};
    const float origins[] = {x0, y0, z0};
    const float spacings[] = {dx, dy, dz};
    return SetAxes(item, unit, 3, counts, origins, spacings);
}

int xolAddCustomBlock(XolHandle header, int dataType, const std::string& name, int count,
                      const float* values) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr || count < 0) return XolFail(kXolErrArgument, "bad custom block");
    XolBlock block;
    block.dataType = dataType;
    block.name = name;
    block.values.assign(values, values + count);
    h->blocks.push_back(std::move(block));
    if (h->blocks.size() > 1) h->blocks[h->blocks.size() - 2].next = HandleOf(&h->blocks.back());
    return 0;
}

XolHandle xolStaticCreate(XolHandle header) {
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return 0;
    h->statics.push_back(std::make_unique<XolItemRec>());
    return XolRegister(h->statics.back().get());
}

XolHandle xolItemS(XolHandle staticItem) {
    return XolItemOf(staticItem) ? staticItem : 0;
}

int xolStaticDestroy(XolHandle staticItem) {
    // A static item keeps no values: they are read when asked for. The
    // handle stays valid with its header.
    if (XolItemOf(staticItem) == nullptr) return XolFail(kXolErrArgument, "not a static item");
    return 0;
}

// ---- what a header answers ----------------------------------------------------

int xolGetFileType(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h ? h->fileType : 0;
}
std::string xolGetFileTitle(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h ? h->title : "";
}
float xolGetDeleteValFloat(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h ? h->deleteValue : -1.0e-30f;
}
int xolGetDataType(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h ? h->dataType : 0;
}
std::string xolGetAppTitle(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h ? h->appTitle : "";
}
int xolGetAppVersionNo(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h ? h->version : 0;
}

XolHandle xolGetCustomBlockRef(XolHandle header) {
    XolHeaderRec* h = XolHeaderOf(header);
    return h == nullptr || h->blocks.empty() ? 0 : HandleOf(&h->blocks.front());
}

int xolGetCustomBlock(XolHandle block, int* dataType, std::string* name, int* count,
                      const float** values, XolHandle* next) {
    if (block == 0) return XolFail(kXolErrArgument, "no block");
    const auto* b = reinterpret_cast<const XolBlock*>(static_cast<uintptr_t>(block));
    *dataType = b->dataType;
    *name = b->name;
    *count = static_cast<int>(b->values.size());
    *values = b->values.data();
    *next = b->next;
    return 0;
}

int xolGetGeoInfoType(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h && h->geo ? 1 : 0;
}

int xolGetGeoInfoUTMProj(XolHandle header, std::string* projection, double* longitude,
                         double* latitude, double* orientation) {
    const XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr || !h->geo) return XolFail(kXolErrArgument, "no projection");
    *projection = h->projection;
    *longitude = h->longitude;
    *latitude = h->latitude;
    *orientation = h->orientation;
    return 0;
}

int xolGetNoOfItems(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h ? static_cast<int>(h->items.size()) : 0;
}

int xolGetItemInfo(XolHandle item, int* type, std::string* name, int* unit, int* dataType) {
    const XolItemRec* it = XolItemOf(item);
    if (it == nullptr) return XolFail(kXolErrArgument, "not an item");
    *type = it->type;
    *name = it->name;
    *unit = it->unit;
    *dataType = it->dataType;
    return 0;
}

int xolGetItemDim(XolHandle item) {
    const XolItemRec* it = XolItemOf(item);
    return it ? it->dims : -1;
}

int xolGetItemAxisType(XolHandle item) {
    const XolItemRec* it = XolItemOf(item);
    return it ? it->axisType : 0;
}

int xolGetItemAxisEq(XolHandle item, int* unit, int counts[4], float origins[4],
                     float spacings[4]) {
    const XolItemRec* it = XolItemOf(item);
    if (it == nullptr) return XolFail(kXolErrArgument, "not an item");
    *unit = it->axisUnit;
    for (int d = 0; d < 4; ++d) {
        counts[d] = it->count[d];
        origins[d] = it->origin[d];
        spacings[d] = it->spacing[d];
    }
    return 0;
}

int xolGetTimeAxisType(XolHandle header) {
    const XolHeaderRec* h = XolHeaderOf(header);
    return h ? h->timeType : 0;
}

int xolGetEqTimeAxis(XolHandle header, int* timeUnit, double* startOffset, double* step, int* steps,
                     int* startIndex) {
    const XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    *timeUnit = h->timeUnit;
    *startOffset = h->startOffset;
    *step = h->step;
    *steps = h->steps;
    *startIndex = h->startIndex;
    return 0;
}

int xolGetEqCalendarAxis(XolHandle header, std::string* date, std::string* time, int* timeUnit,
                         double* startOffset, double* step, int* steps, int* startIndex) {
    const XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr || h->timeType != kXolTimeCalendar)
        return XolFail(kXolErrArgument, "no calendar axis");
    *date = h->date;
    *time = h->time;
    return xolGetEqTimeAxis(header, timeUnit, startOffset, step, steps, startIndex);
}

int xolGetItemStatsGlobal(XolHandle item, double* minimum, double* maximum, long* missing) {
    const XolItemRec* it = XolItemOf(item);
    if (it == nullptr) return XolFail(kXolErrArgument, "not an item");
    *minimum = it->minimum;
    *maximum = it->maximum;
    *missing = it->missing;
    return 0;
}
