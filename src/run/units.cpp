#include "run/units.hpp"

namespace {

struct UnitEntry {
    bool taken = false;
    FILE* file = nullptr;
    std::string path;
};

UnitEntry gUnits[kUnitCount + 1];  // entry 0 unused: units count from 1
bool gReservedDone = false;

void ReserveStandardUnits() {
    if (gReservedDone) return;
    gReservedDone = true;
    gUnits[5].taken = true;
    gUnits[6].taken = true;
}

}  // namespace

int GetFreeUnit() {
    ReserveStandardUnits();
    for (int unit = 1; unit <= kUnitCount; ++unit) {
        if (!gUnits[unit].taken) {
            gUnits[unit].taken = true;
            return unit;
        }
    }
    return -1;
}

void ReleaseUnit(int unit) {
    if (unit < 0) {
        for (int u = 1; u <= kUnitCount; ++u) {
            if (gUnits[u].file != nullptr) std::fclose(gUnits[u].file);
            gUnits[u] = UnitEntry{};
        }
        gReservedDone = false;
        return;
    }
    if (unit == 0 || unit > kUnitCount) return;
    if (gUnits[unit].file != nullptr) std::fclose(gUnits[unit].file);
    gUnits[unit] = UnitEntry{};
}

bool OpenUnit(int unit, const std::string& path, const char* mode) {
    if (unit <= 0 || unit > kUnitCount) return false;
    if (gUnits[unit].file != nullptr) std::fclose(gUnits[unit].file);
    gUnits[unit].file = std::fopen(path.c_str(), mode);
    gUnits[unit].path = path;
    gUnits[unit].taken = true;
    return gUnits[unit].file != nullptr;
}

FILE* UnitFile(int unit) {
    if (unit <= 0 || unit > kUnitCount) return nullptr;
    return gUnits[unit].file;
}

void CloseUnit(int unit, bool remove) {
    if (unit <= 0 || unit > kUnitCount || gUnits[unit].file == nullptr) return;
    std::fclose(gUnits[unit].file);
    gUnits[unit].file = nullptr;
    if (remove) std::remove(gUnits[unit].path.c_str());
}

void FlushUnits() {
    for (int u = 1; u <= kUnitCount; ++u)
        if (gUnits[u].file != nullptr) std::fflush(gUnits[u].file);
}
