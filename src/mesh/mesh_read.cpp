#include "mesh/mesh_read.hpp"

#include <algorithm>
#include <cctype>
#include <new>
#include <stdexcept>
#include <vector>

#include "data/xolfile.hpp"
#include "run/messages.hpp"

namespace {

constexpr int32_t kOpenEndCode = 2;

std::string LowerExtension(std::string_view path) {
    path = Trim(path);
    const size_t dot = path.find_last_of('.');
    const size_t slash = path.find_last_of("/\\");
    if (dot == std::string_view::npos || (slash != std::string_view::npos && dot < slash))
        return "";
    std::string ext(path.substr(dot + 1));
    std::ranges::transform(ext, ext.begin(), [](unsigned char c) { return std::tolower(c); });
    return ext;
}

}  // namespace

void ReadMesh(const std::string& path, Mesh& mesh) {
    const std::string ext = LowerExtension(path);
    if (ext == "xol1" || ext == "dt1") {
        ReadMeshBasicXol1(std::string(Trim(path)), mesh);
        return;
    }
    StopRun("ReadMesh: Unknown type of mesh file: " + std::string(Trim(path)));
}

void ReadMeshBasicXol1(const std::string& path, Mesh& mesh) {
    XolFile f = XolOpenRead(path);
    // A stop names the file and what was found in it behind the reader's text.
    if (f.dimension != 1)
        XolStopOnContent("ReadMeshBasicXol1: Wrong mesh file", f, XolAxesFound(f));
    const int32_t items = f.noDynamicItems;
    if (items != 1 && items != 2)
        XolStopOnContent("ReadMeshBasicXol1: Wrong number of items in file", f,
                         XolItemsFound(f, "1 or 2"));
    float dx = 0.0f;
    int32_t n = 0;
    int status = 0;
    XolGetAxis(f, 1, dx, n, nullptr, nullptr, &status);
    if (status != 0 || n < 1)
        XolStopOnContent("ReadMeshBasicXol1: Error Reading data file", f,
                         status != 0 ? f.lastErrorText : "it has no points");

    const int32_t elements = n - 1;
    mesh = Mesh{};
    AllocateMesh(mesh, n, elements, 2, "ReadMeshBasicXol1");
    std::vector<float> values;
    try {
        values.assign(std::max(XolItemValues(f), static_cast<size_t>(n)), 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("ReadMeshBasicXol1: Out of memory");
    } catch (const std::length_error&) {
        StopRun("ReadMeshBasicXol1: Out of memory");
    }

    // The item read last is z; with two the first is x.
    for (int32_t item = 1; item <= items; ++item) {
        XolReadDynamic(f, values.data(), &status);
        if (status != 0)
            XolStopOnContent("ReadMeshBasicXol1: Error Reading data file", f, f.lastErrorText);
        std::vector<double>& target = item == items ? mesh.z : mesh.x;
        for (int32_t i = 1; i <= n; ++i) target[i] = values[i - 1];
    }
    if (items == 1)
        for (int32_t i = 1; i <= n; ++i) mesh.x[i] = (i - 1) * static_cast<double>(dx);
    XolClose(f, &status);

    mesh.code[1] = kOpenEndCode;
    mesh.code[n] = kOpenEndCode;
    if (n >= 2) {
        if (mesh.z[1] > 0.0) mesh.z[1] = mesh.z[2];
        if (mesh.z[n] > 0.0) mesh.z[n] = mesh.z[n - 1];
    }
    mesh.projection = "NON-UTM";
    mesh.dimension = 1;
    MakeLineElements(mesh);
}
