#include "data/tsfunc.hpp"

#include <cstdlib>
#include <filesystem>
#include <new>
#include <string>

#include "run/messages.hpp"
#include "run/process.hpp"

TsState gTs;

namespace {

// A scratch file in the system's temporary folder, named for this process
// (its number under a launcher) and made unique by mkstemp. The name is
// removed at once: the open file vanishes with the process however the
// process ends (a stop, a signal, even SIGKILL), which no cleanup routine
// could promise, and nothing is left for others to trip over.
FILE* OpenScratch(const char* which) {
    const std::string stem = ProcessFileStem(std::string("bw_series_") + which);
    std::error_code error;
    const std::filesystem::path folder = std::filesystem::temp_directory_path(error);
    if (error) StopRun("tsfunc: Unable to open scratch file");
    std::string name = (folder / (stem + "_XXXXXX")).string();
    const int fd = mkstemp(name.data());
    if (fd < 0) StopRun("tsfunc: Unable to open scratch file");
    std::remove(name.c_str());
    FILE* file = fdopen(fd, "w+b");
    if (file == nullptr) StopRun("tsfunc: Unable to open scratch file");
    return file;
}

void Close(FILE*& file) {
    if (file != nullptr) std::fclose(file);
    file = nullptr;
}

void WriteRecord(FILE* file, const float* values, size_t count) {
    if (std::fwrite(values, sizeof(float), count, file) != count)
        StopRun("tsfunc: Unable to write scratch file");
}

// A full disk shows only when the buffer goes out.
void Flush(FILE* file) {
    if (std::fflush(file) != 0) StopRun("tsfunc: Unable to write scratch file");
}

void Allocate(std::vector<float>& row, size_t count) {
    try {
        row.assign(count, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("tsfunc: Unable to allocate memory");
    }
}

void ReadRecord(FILE* file, float* values, size_t count) {
    if (std::fread(values, sizeof(float), count, file) != count)
        StopRun("tsfunc: Unable to read scratch file");
}

}  // namespace

void TsInit(int32_t rows) {
    gTs.tsSteps = rows;
}

void TsAddSeries(int32_t& id, const float* values) {
    if (gTs.tsPosition != -1) StopRun("tsfunc: Reading has already started");
    const size_t columns = static_cast<size_t>(gTs.tsNextId);
    std::vector<float> row;
    Allocate(row, columns);

    if (gTs.tsNextId == 1) {
        // One record of one value for each step: the series as it stands.
        gTs.tsFileA = OpenScratch("A");
        WriteRecord(gTs.tsFileA, values, static_cast<size_t>(gTs.tsSteps));
        Flush(gTs.tsFileA);
    } else {
        // An even id moves the store from A to B, an odd one back from B to A.
        const bool even = gTs.tsNextId % 2 == 0;
        if (even && gTs.tsFileB == nullptr) gTs.tsFileB = OpenScratch("B");
        FILE* source = even ? gTs.tsFileA : gTs.tsFileB;
        FILE* target = even ? gTs.tsFileB : gTs.tsFileA;
        std::rewind(source);
        std::rewind(target);
        for (int32_t s = 0; s < gTs.tsSteps; ++s) {
            ReadRecord(source, row.data(), columns - 1);
            row[columns - 1] = values[s];
            WriteRecord(target, row.data(), columns);
        }
        Flush(target);
    }
    id = gTs.tsNextId++;
}

void TsReadStep(int32_t step) {
    if (gTs.tsNextId == 1) return;
    const size_t columns = static_cast<size_t>(gTs.tsNextId - 1);
    if (gTs.tsPosition == -1) {
        Allocate(gTs.tsRow, columns);
        if (gTs.tsNextId % 2 == 0) {
            Close(gTs.tsFileB);
            gTs.tsFile = gTs.tsFileA;
        } else {
            Close(gTs.tsFileA);
            gTs.tsFile = gTs.tsFileB;
        }
        // Records are of equal length: pass over the steps before this one at once.
        if (std::fseek(gTs.tsFile,
                       static_cast<long>(step) * static_cast<long>(columns * sizeof(float)),
                       SEEK_SET) != 0)
            StopRun("tsfunc: Unable to read scratch file");
        gTs.tsPosition = step - 1;
    }
    if (step - 1 != gTs.tsPosition) StopRun("tsfunc: internal error(6)");
    ReadRecord(gTs.tsFile, gTs.tsRow.data(), columns);
    gTs.tsPosition = step;
}

float TsValue(int32_t id) {
    // Before the first row is read no value may be asked for; should one be,
    // it gets the no-value rather than memory that isn't there.
    if (id > 0 && id < gTs.tsNextId && static_cast<size_t>(id) <= gTs.tsRow.size())
        return gTs.tsRow[static_cast<size_t>(id - 1)];
    return kTsNoValue;
}

void TsReset() {
    Close(gTs.tsFileA);
    Close(gTs.tsFileB);
    gTs = TsState{};
}
