// What the map-frame library's own files share: PROJ's context of this
// library and the projected part of a CRS.
#pragma once

#include <proj.h>

PJ_CONTEXT* GeoContext();
// The projected part of a CRS: a CRS with a datum shift to WGS 84 without the
// shift, a horizontal CRS with a height without the height. A new object.
PJ* GeoHorizontal(const PJ* crs);
