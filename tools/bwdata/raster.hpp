// Map grids placed on a map projection: the one writer of one-step map files
// that every grid import shares, and rasters (GeoTIFF, NetCDF grids and the
// other formats GDAL reads) in and out.
#pragma once

#include <string>
#include <vector>

#include "bwdata/bwdata.hpp"

// A grid of square cells that lies on its map as read: row k = 0 is the
// southernmost, values row by row, the delete value where there is none.
struct MapGrid {
    long columns = 0, rows = 0;
    double cell = 0.0;
    std::vector<float> values;
    // The centre of the lower-left cell in the map's coordinates (metres).
    double x0 = 0.0, y0 = 0.0;
};

// Writes `grid` as a one-step map file of one item. The projection, the item
// and the title come from `options`; without --origin the grid's origin is
// the geographic position of (x0, y0) on a real projection, 0, 0 on none. The
// orientation recorded is that of a grid turned options.orientation degrees
// clockwise from its map's north (from true north where there is no map).
std::string WriteMapFile(const MapGrid& grid, const std::string& input, const std::string& output,
                         const AscOptions& options);

struct RasterOptions {
    AscOptions map;                 // projection ("" for the raster's own), origin, item, title
    int band = 1;                   // from 1
    bool orientationGiven = false;  // a raster's geotransform alone turns it
};
// Band `options.band` of a raster GDAL opens becomes a one-step map: north-up
// and bottom-up rasters alike, nodata and NaN as the delete value, the CRS as
// the projection (none: "NON-UTM"). A turned grid, cells that are not square
// and a geographic CRS are refused.
std::string ImportRaster(const std::string& input, const std::string& output,
                         const RasterOptions& options);

// A map item at a step (static item `staticItem` when > 0) as a north-up
// Float32 GeoTIFF whose nodata is the delete value and whose CRS is the
// file's projection. A grid turned on its map is refused. step < 0: the last.
std::string ExportRaster(const std::string& input, const std::string& output, int item, int step,
                         int staticItem = 0);

// Whether an output name asks for a GeoTIFF (.tif, .tiff).
bool IsRasterOutput(const std::string& output);
