// Fuzz target of the data-file readers. Any input, written to a file in a
// private folder, must open with the status form of the data-file layer or
// be refused with a code and the text of the failure, never crash, stop the
// run or take memory that the file cannot need. A file that opens is read
// the way the model reads: every static item, then every item of every step,
// with the status forms, into a buffer sized from the record; a failure of a
// read must give its code and its text. Then the file is closed.
//
// The buffer is capped, and so is the number of reads, so that the fuzzer's
// memory and time limits hold for a file that declares a large grid or many
// steps without holding them: such a file must still open or be refused at
// once, and the reader itself must refuse sizes beyond the machine. Every
// input must leave as many open file descriptors as it found: a file the
// readers forget to close shows there, whatever the leak checker is told of
// the NetCDF and HDF5 libraries (make fuzz gives it tests/asan.supp, as
// those libraries leak on some broken NetCDF-4 files).
#include <dirent.h>
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "data/xolfile.hpp"

namespace {

constexpr size_t kMaxValues = size_t{1} << 22;  // 16 MB of values
constexpr int64_t kMaxReads = int64_t{1} << 14;

void Check(bool ok, const char* what) {
    if (!ok) {
        std::fprintf(stderr, "xol_fuzz: %s\n", what);
        std::abort();
    }
}

std::string gFolder;

void RemoveFolder() {
    if (gFolder.empty()) return;
    unlink((gFolder + "/input.xol").c_str());
    rmdir(gFolder.c_str());
}

// The file of the input, in a folder of its own: in memory where /dev/shm is.
std::string InputPath() {
    if (gFolder.empty()) {
        for (const char* base : {"/dev/shm", "/tmp"}) {
            std::string pattern = std::string(base) + "/xol_fuzz_XXXXXX";
            if (mkdtemp(pattern.data()) != nullptr) {
                gFolder = pattern;
                break;
            }
        }
        Check(!gFolder.empty(), "no private folder");
        std::atexit(RemoveFolder);
    }
    return gFolder + "/input.xol";
}

int OpenDescriptors() {
    DIR* dir = opendir("/proc/self/fd");
    if (dir == nullptr) return -1;
    int count = 0;
    while (readdir(dir) != nullptr) ++count;
    closedir(dir);
    return count;
}

// A failure of a status form: a code, the whole text in the record.
void CheckFailure(const XolFile& f, int status) {
    Check(status != 0 && f.lastError == status, "a failure without its code");
    Check(!f.lastErrorText.empty(), "a failure without its text");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string path = InputPath();
    FILE* out = std::fopen(path.c_str(), "wb");
    Check(out != nullptr, "the input file can't be written");
    Check(std::fwrite(data, 1, size, out) == size && std::fclose(out) == 0,
          "the input file can't be written");

    const int descriptors = OpenDescriptors();
    int status = -1;
    XolFile f = XolOpenRead(path, &status);
    if (status != 0) {
        CheckFailure(f, status);
        Check(f.mode != 1 && f.header == 0 && f.file == 0, "a refused file left open");
        Check(OpenDescriptors() == descriptors, "a refused file keeps a descriptor");
        return 0;
    }
    Check(f.mode == 1 && f.noDynamicItems >= 1 && f.dimension >= 0 && f.dimension <= 4,
          "an opened file without its record");
    const size_t values = XolItemValues(f);
    if (values <= kMaxValues) {
        std::vector<float> buffer(values);
        int64_t reads = 0;
        for (int32_t s = 0; s < f.noStaticItems && reads < kMaxReads; ++s, ++reads) {
            XolReadStatic(f, buffer.data(), &status);
            if (status != 0) {
                CheckFailure(f, status);
                break;
            }
        }
        bool failed = false;
        for (int32_t step = 0; step < f.noTimeSteps && !failed; ++step) {
            for (int32_t n = 0; n < f.noDynamicItems && reads < kMaxReads; ++n, ++reads) {
                XolReadDynamic(f, buffer.data(), &status);
                if (status != 0) {
                    CheckFailure(f, status);
                    failed = true;
                    break;
                }
            }
            if (reads >= kMaxReads) break;
        }
        // Past the last step a read fails with its code.
        if (!failed && reads < kMaxReads) {
            XolReadDynamic(f, buffer.data(), &status);
            CheckFailure(f, status);
        }
    }
    XolClose(f, &status);
    Check(status == 0 && f.mode == 3, "a file read fails to close");
    Check(OpenDescriptors() == descriptors, "a closed file keeps a descriptor");
    return 0;
}
