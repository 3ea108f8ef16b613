// The conversions of the bwdata tool between plain text and data files. Each
// returns an empty text on success, else what is wrong, naming the file and
// the line; on a failure no output file is left behind.
#pragma once

#include <string>
#include <vector>

struct AscOptions {
    std::string projection = "NON-UTM";
    bool originGiven = false;
    double longitude = 0.0, latitude = 0.0;
    double orientation = 0.0;
    std::string name = "Bathymetry";
    int type = 100079;
    int unit = 1000;
    std::string title;
};
// An ESRI ASCII grid becomes a one-step map; its first row is the northernmost.
std::string ImportAsc(const std::string& input, const std::string& output,
                      const AscOptions& options);

struct CsvOptions {
    std::string start;  // "YYYY-MM-DD hh:mm:ss"
    std::vector<int> types, units;
    std::string title;
    bool line = false;  // one item along a line of points dx apart
    float dx = 0.0f;
    std::string name = "Line";
};
// A table of series (a header of item names, then time and one value per item
// a row) or, with line set, one item along a line (time, then one value per point).
std::string ImportCsv(const std::string& input, const std::string& output,
                      const CsvOptions& options);

// A profile for the 1DH model from a CSV of x and bed level (a header line,
// then x, z a row, x rising): a line file of the bed with the points dx apart
// when they are, else of two items, the positions x and the bed.
std::string ImportProfile(const std::string& input, const std::string& output,
                          const std::string& title);

// A file as text: a series or line file as CSV, a map at a step as an ESRI
// ASCII grid (.asc) or as the columns j,k,value (.csv). step < 0: the last.
// staticItem > 0 exports that static item (from 1) instead: a map as above, a
// line as one CSV row under the positions of its points.
std::string ExportText(const std::string& input, const std::string& output, int item, int step,
                       int staticItem = 0);

// Writes what is left of a text on the given path atomically: to a scratch
// name first, renamed when complete.
bool WriteTextFile(const std::string& path, const std::string& text);
