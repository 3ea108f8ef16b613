#!/bin/sh
# Makes the seed corpus of the data-file fuzz target (tests/fuzz/xol_corpus):
# a map, a series and a line file in the 64-bit data format, small, with the
# header, the items and the axes the way the engine writes them. Run once;
# the files are kept in the repository.
set -e
cd "$(dirname "$0")"
mkdir -p xol_corpus
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT

cat > "$tmp/map.cdl" <<'CDL'
netcdf map {
dimensions:
    time = UNLIMITED ;
    x = 3 ;
    y = 2 ;
variables:
    double time(time) ;
        time:units = "seconds since 2004-01-01 00:00:00" ;
    double x(x) ;
        x:units = "m" ; x:origin = 0.f ; x:spacing = 10.f ; x:unit_code = 1000 ;
    double y(y) ;
        y:units = "m" ; y:origin = 5.f ; y:spacing = 10.f ; y:unit_code = 1000 ;
    float Bathymetry(time, y, x) ;
        Bathymetry:long_name = "Bathymetry" ; Bathymetry:units = "m" ;
        Bathymetry:item_type = 100079 ; Bathymetry:item_unit = 1000 ;
        Bathymetry:_FillValue = -1.e-30f ;
    float Depth(y, x) ;
        Depth:long_name = "Depth" ; Depth:item_type = 100079 ; Depth:item_unit = 1000 ;
        Depth:_FillValue = -1.e-30f ;
// global attributes:
    :title = "Bay" ; :application_title = "bw" ; :application_version = 1 ;
    :file_type = 1 ; :data_type = 0 ; :delete_value = -1.e-30f ;
    :time_axis_type = 3 ; :time_unit = 1400 ; :time_start_offset = 0. ;
    :time_step = 1. ; :time_start_index = 0 ; :time_start = "2004-01-01 00:00:00" ;
    :projection = "NON-UTM" ; :longitude = 0. ; :latitude = 0. ; :orientation = 0. ;
    :custom_block_count = 1 ; :custom_block_1_name = "TRN_Misc" ;
    :custom_block_1_data_type = 1 ; :custom_block_1 = 0.f, 0.f, 0.f, 0.f, 0.f, 0.f, 0.f ;
data:
    time = 0 ;
    x = 0, 10, 20 ;
    y = 5, 15 ;
    Bathymetry = -5, -4, -3, -2, -1, -1.e-30 ;
    Depth = 5, 4, 3, 2, 1, 0 ;
}
CDL

cat > "$tmp/series.cdl" <<'CDL'
netcdf series {
dimensions:
    time = UNLIMITED ;
variables:
    double time(time) ;
        time:units = "seconds since 2004-01-01 00:00:00" ;
    float Level(time) ;
        Level:long_name = "Level" ; Level:units = "m" ; Level:item_type = 100078 ;
        Level:item_unit = 1000 ; Level:_FillValue = -1.e-30f ;
    float Deep(time) ;
        Deep:long_name = "Deep" ; Deep:units = "m" ; Deep:_FillValue = -1.e-30f ;
// global attributes:
    :title = "Series" ; :file_type = 1 ; :time_axis_type = 3 ; :time_unit = 1400 ;
    :time_step = 0.5 ; :time_start = "2004-01-01 00:00:00" ; :custom_block_count = 0 ;
data:
    time = 0, 0.5, 1, 1.5 ;
    Level = 0, 0.1, 0.2, 0.1 ;
    Deep = 0, 1, 2, 1 ;
}
CDL

cat > "$tmp/line.cdl" <<'CDL'
netcdf line {
dimensions:
    time = UNLIMITED ;
    x = 4 ;
variables:
    double time(time) ;
        time:units = "s" ;
    float x(x) ;
        x:units = "m" ;
    float Level(time, x) ;
        Level:long_name = "Level" ; Level:units = "m" ; Level:_FillValue = -1.e-30f ;
data:
    time = 0, 2, 4 ;
    x = 100, 102, 104, 106 ;
    Level = 0, 1, 2, 3, 1, 2, 3, 4, 2, 3, 4, 5 ;
}
CDL

for name in map series line; do
    ncgen -k cdf5 -o "xol_corpus/$name.xol" "$tmp/$name.cdl"
done
ls -l xol_corpus
