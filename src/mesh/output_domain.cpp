#include "mesh/output_domain.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "input/kvt_current.hpp"
#include "output/output_lock.hpp"
#include "run/messages.hpp"
#include "run/process.hpp"

namespace {

// A number in Fortran's E16.8 form, 0.dddddddd E+xx, the form of the
// columns of the point table.
std::string E16(double value) {
    char buffer[48];
    std::snprintf(buffer, sizeof buffer, "%.7E", std::fabs(value));  // d.dddddddE+xx
    const std::string digits = std::string(1, buffer[0]) + std::string(buffer + 2, 7);
    const int exponent = value == 0.0 ? 0 : std::atoi(std::strchr(buffer, 'E') + 1) + 1;
    char field[48];
    std::snprintf(field, sizeof field, "%s0.%sE%c%02d", value < 0.0 ? "-" : "", digits.c_str(),
                  exponent < 0 ? '-' : '+', std::abs(exponent));
    std::snprintf(buffer, sizeof buffer, "%16s", field);
    return buffer;
}

// Positions of the two ends of element e.
void ElementEnds(const Mesh& mesh, int32_t e, int32_t& left, int32_t& right) {
    left = GetElementNode(mesh, e, 1);
    right = GetElementNode(mesh, e, 2);
}

void Allocate(std::vector<OutputPlace>& places, size_t count) {
    try {
        places.assign(count, OutputPlace{});
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
}

// A place this close to a node, as a share of the element's length, is the
// node: a line's spacing and origin pass through 32-bit reals in the files,
// and a place meant for a node would otherwise lie a few 1e-7 m beside it,
// take a trace of the neighbour's value, or fall off the mesh's end.
constexpr double kOnNode = 1.0e-6;

// y and z of a place held by an element, by the two-node rule on the mesh;
// a place on one of the element's ends is moved onto it.
void PlaceOnMesh(OutputPlace& p, const Mesh& mesh, double deleteValue) {
    int32_t a = 0, b = 0;
    ElementEnds(mesh, p.element, a, b);
    const double near = kOnNode * std::fabs(mesh.x[b] - mesh.x[a]);
    if (std::fabs(p.x - mesh.x[a]) <= near) p.x = mesh.x[a];
    if (std::fabs(p.x - mesh.x[b]) <= near) p.x = mesh.x[b];
    p.y = TwoNodeValue(p.x, mesh.x[a], mesh.x[b], mesh.y[a], mesh.y[b], deleteValue);
    p.z = TwoNodeValue(p.x, mesh.x[a], mesh.x[b], mesh.z[a], mesh.z[b], deleteValue);
}

const Mesh& RecordMesh(const OutputFile& r) {
    return gMeshes.meshes[r.items.empty() ? 1 : r.items.front().mesh];
}

void WritePointTable(const std::vector<OutputPlace>& places) {
    WriteBlockHeading("Point Output Information");
    WriteLine("  Element" + std::string(11, ' ') + "x (m)" + std::string(11, ' ') + "y (m)" +
              std::string(11, ' ') + "z (m)  code");
    WriteLine("");
    for (const OutputPlace& p : places) {
        char element[16];
        std::snprintf(element, sizeof element, " %8d", p.element);
        WriteLine(element + E16(p.x) + E16(p.y) + E16(p.z) + "     0");
    }
}

bool IsOurFile(const std::string& extension) {
    return extension == "xol0" || extension == "xol1" || extension == "xol2" || extension == "xol3";
}

void CreateOutputFile(OutputFile& r) {
    const int32_t dimension = r.x_npoints > 0 ? 1 : 0;
    XolHeaderOptions options;
    options.deleteValue = static_cast<float>(r.delete_value);
    r.file = XolCreateHeader(r.title, FileItemCount(r), dimension, options);
    // Under message passing the points of a point file are marked, so that
    // the files of the processes can be merged.
    const bool points = r.type != 3 && dimension == 0 && r.pointCount > 0;
    XolSetDataType(r.file, gProcess.mpiActive && points ? 1 : 0);
    int32_t n = 1;
    const int32_t copies = r.format == 0 && r.x_npoints == 0 ? r.pointCount : 1;
    for (const OutputItemBW& item : r.items)
        for (int32_t p = 0; p < copies; ++p, ++n) {
            XolSetItem(r.file, n, item.type, item.name, item.unit);
            if (item.standardName != nullptr)
                XolSetItemAttribute(r.file, n, {"standard_name", item.standardName, {}});
            if (r.type != 3 && dimension == 0 && p < static_cast<int32_t>(r.places.size())) {
                XolSetItemAttribute(r.file, n, {"position", "", {r.places[p].x}});
                if (p < static_cast<int32_t>(r.pointNames.size()))
                    XolSetItemAttribute(r.file, n, {"point_name", r.pointNames[p], {}});
            }
        }
    XolSetProjection(r.file, r.projection, 0.0, 0.0, 0.0);
    // The text of the start holds whole seconds; a start between them goes
    // into the offset.
    const DateTime start = AddSeconds(r.startDate, r.first_time_step * r.timeStepInterval);
    const double fraction = start.seconds - std::floor(start.seconds);
    XolSetCalendarAxis(r.file, r.time_step_frequency * r.timeStepInterval, DateTimeText(start),
                       1400, fraction);
    if (dimension == 1) {
        for (int index = 1; index <= 3; ++index) XolSetMisc(r.file, index, 0.0f);
        XolSetMisc(r.file, 4, static_cast<float>(r.land_value));
        XolSetAxis(r.file, 1, static_cast<float>(r.x_ds), static_cast<float>(r.x_origo),
                   r.x_npoints, r.projection == "LONG/LAT" ? 2401 : 1000);
    }
    for (int index = 5; index <= 7; ++index) XolSetMisc(r.file, index, 0.0f);
    LockOutputFile("OpenOutputFiles", r.file_name);
    XolCreateFile(r.file, r.file_name);
}

}  // namespace

std::string FileExtension(const std::string& name) {
    const size_t dot = name.rfind('.');
    const size_t slash = name.find_last_of("/\\");
    if (dot == std::string::npos || (slash != std::string::npos && slash > dot)) return "";
    return name.substr(dot + 1);
}

void SpecOutputDomain(OutputFile& r, int32_t valueLocation) {
    r.valueLocation = valueLocation;
    KvtGetString("file_name", r.file_name);
    r.file_name = std::string(TrimRight(r.file_name));
    KvtGetString("title", r.title);
    if (r.title.size() > 40) r.title.resize(40);
    r.title = std::string(TrimRight(r.title));
    KvtGetInteger("type", r.type);
    KvtGetInteger("format", r.format);
    KvtGetDouble("delete_value", r.delete_value);
    const std::string extension = FileExtension(r.file_name);
    if (extension == "xol2" || extension == "xol3") KvtGetDouble("land_value", r.land_value);
    KvtGetInteger("flood_and_dry", r.flood_and_dry);
    KvtGetInteger("precision", r.precision);
    KvtGetInteger("first_time_step", r.first_time_step);
    KvtGetInteger("last_time_step", r.last_time_step);
    KvtGetInteger("time_step_frequency", r.time_step_frequency);
    // The frequency divides the distance from the first step.
    if (r.time_step_frequency < 1)
        StopRun("SpecOutputDomain: time_step_frequency must be at least 1, file: " + r.file_name);
    KvtGetInteger("number_of_variables", r.number_of_variables);
    if (r.number_of_variables < 0) r.number_of_variables = 0;
    try {
        r.type_of_variables.assign(static_cast<size_t>(r.number_of_variables), 0);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    if (r.number_of_variables > 0)
        KvtGetIntegerList("type_of_variables", r.type_of_variables.data(), r.number_of_variables);
    KvtGetInteger("interpolation_type", r.interpolation_type);
    if (r.interpolation_type != 1) KvtGetInteger("interpolation_subtype", r.interpolation_subtype);
    if (gProcess.processId >= 0) {
        const size_t dot = r.file_name.size() - extension.size() - (extension.empty() ? 0 : 1);
        r.file_name = r.file_name.substr(0, dot) + "_p" + std::to_string(gProcess.processId) +
                      (extension.empty() ? "" : "." + extension);
    }
}

void SetupOutputDomain(OutputFile& r) {
    if (r.format == 0)
        SetupPointDomain(r);
    else if (r.format == 1)
        SetupAreaDomain(r);
    else
        StopRun("SpecOutputDomain: Output format not supported");
    const size_t places = r.places.size();
    try {
        r.extracted.assign(places, 0.0);
        r.values.assign(places, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
}

void FindLineElement(int32_t& element, double x, const Mesh& mesh) {
    element = 0;
    for (int32_t e = 1; e <= mesh.ElementCount; ++e) {
        int32_t a = 0, b = 0;
        ElementEnds(mesh, e, a, b);
        const double xa = mesh.x[a], xb = mesh.x[b];
        const double near = kOnNode * std::fabs(xb - xa);
        if (x >= std::min(xa, xb) - near && x <= std::max(xa, xb) + near) {
            element = e;
            return;
        }
    }
}

double TwoNodeValue(double x, double a, double b, double va, double vb, double deleteValue) {
    if (va == deleteValue || vb == deleteValue) return deleteValue;
    // On an end the end's own value, free of the rounding of the line.
    if (x == a) return va;
    if (x == b) return vb;
    return ((va - vb) / (a - b)) * x + (a * vb - b * va) / (a - b);
}

void SetupPointDomain(OutputFile& r) {
    const std::string extension = FileExtension(r.file_name);
    if (extension != "xol0" && extension != "xolu") StopRun("SetupPointDomain: Wrong file type");
    const Mesh& mesh = RecordMesh(r);
    r.projection = mesh.projection;
    int32_t inputFormat = 1, count = 0;
    KvtGetInteger("input_format", inputFormat);
    KvtGetInteger("number_of_points", count);
    std::vector<OutputPlace> places;
    std::vector<std::string> names;
    Allocate(places, static_cast<size_t>(count > 0 ? count : 0));
    for (int32_t p = 1; p <= count; ++p) {
        KvtOpenSection("POINT", p);
        std::string name = "Point " + std::to_string(p);
        KvtGetString("name", name);
        OutputPlace& place = places[p - 1];
        KvtGetDouble("x", place.x);
        KvtCloseSection();
        FindLineElement(place.element, place.x, mesh);
        if (place.element > 0) {
            PlaceOnMesh(place, mesh, r.delete_value);
            names.push_back(std::string(TrimRight(name)));
        } else {
            place.y = place.z = r.delete_value;
        }
    }
    r.places.clear();
    for (const OutputPlace& place : places)
        if (place.element > 0) r.places.push_back(place);
    r.pointNames = names;
    r.pointCount = static_cast<int32_t>(r.places.size());
    r.x_npoints = 0;
    if (r.places.empty()) {
        ReportWarning("SetupPointDomain: No points inside domain");
        r.active = false;
        return;
    }
    if (r.pointCount < count)
        ReportWarning(Filled("SetupPointDomain: Only % points inside domain", r.pointCount));
    WritePointTable(r.places);
}

void SetupAreaDomain(OutputFile& r) {
    const std::string extension = FileExtension(r.file_name);
    if (r.interpolation_type == 2 && extension != "xol1" && extension != "xolu")
        StopRun("SetupAreaDomain: Wrong file type");
    const Mesh& mesh = RecordMesh(r);
    r.projection = mesh.projection;
    double lowest = 0.0, highest = 0.0;
    for (int32_t i = 1; i <= mesh.NodeCount; ++i) {
        if (i == 1 || mesh.x[i] < lowest) lowest = mesh.x[i];
        if (i == 1 || mesh.x[i] > highest) highest = mesh.x[i];
    }
    KvtOpenSection("AREA");
    r.x_npoints = 20;
    r.x_origo = lowest;
    r.x_ds = (highest - lowest) / 19.0;
    KvtGetDouble("x_origo", r.x_origo);
    KvtGetDouble("x_ds", r.x_ds);
    KvtGetInteger("x_npoints", r.x_npoints);
    if (r.x_ds <= 0.0) StopRun("SetupAreaDomain: Grid spacing must be larger than zero");
    if (r.x_npoints < 1) StopRun("SetupAreaDomain: Number of points must be larger than one");
    KvtCloseSection();
    r.pointCount = 1;
    Allocate(r.places, static_cast<size_t>(r.x_npoints));
    for (int32_t k = 1; k <= r.x_npoints; ++k) {
        OutputPlace& place = r.places[k - 1];
        place.x = r.x_origo + (k - 1) * r.x_ds;
        FindLineElement(place.element, place.x, mesh);
        if (place.element > 0) {
            PlaceOnMesh(place, mesh, r.delete_value);
        } else {
            place.y = r.delete_value;
            place.z = extension == "xol1" ? r.land_value : r.delete_value;
        }
    }
}

void ExtractData(int32_t /*interpolationType*/, int32_t valueLocation,
                 const std::vector<OutputPlace>& places, const Mesh& mesh,
                 const std::vector<double>& vector, double* values, double deleteValue) {
    // Every interpolation type reads a line mesh the same way: a 1DH run
    // writes type 2 for all its files.
    if (valueLocation == 2 && mesh.dimension <= 1)
        StopRun("ExtractData: Interpolation is not implemented");
    for (size_t p = 0; p < places.size(); ++p) {
        const OutputPlace& place = places[p];
        if (place.element < 1) {
            values[p] = deleteValue;
            continue;
        }
        int32_t a = 0, b = 0;
        ElementEnds(mesh, place.element, a, b);
        values[p] = TwoNodeValue(place.x, mesh.x[a], mesh.x[b], vector[a], vector[b], deleteValue);
    }
}

int32_t FileItemCount(const OutputFile& r) {
    const int32_t items = static_cast<int32_t>(r.items.size());
    if (r.type != 3 && r.format == 0 && r.x_npoints == 0) return items * r.pointCount;
    return items;
}

void OpenOutputFiles(int32_t count, std::vector<OutputFile>& records) {
    for (int32_t n = 0; n < count; ++n) {
        OutputFile& r = records[n];
        if (!r.active) continue;
        if (r.format >= 5) StopRun("OpenOutputFiles: Output format not supported");
        if (IsOurFile(FileExtension(r.file_name))) CreateOutputFile(r);
    }
}

void CloseOutputFiles(int32_t count, std::vector<OutputFile>& records) {
    if (count > 0) WriteBlockHeading("Output Statistics");
    for (int32_t n = 0; n < count; ++n) {
        OutputFile& r = records[n];
        if (!r.active) continue;
        if (r.format >= 5) StopRun("Output format not supported, file: " + r.file_name);
        if (r.file.mode != 2 || r.file.file == 0) continue;
        XolClose(r.file);
        UnlockOutputFile(r.file_name);
        XolPrintSummary(r.file);
    }
}
