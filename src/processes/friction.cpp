// Bottom friction and eddy viscosity: the settings and fields of the two
// closures. Friction keeps F = g/M^2 for a Chezy or Manning number M, one
// value or a map; the sweeps divide it by the squared face depth (Chezy) or
// by that and the approximated depth^(1/3) (Manning). Eddy viscosity keeps a
// prescribed field, or the coefficient of the Smagorinsky-type field.
#include "processes/friction.hpp"

#include <cmath>
#include <new>

#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

FrictionSettings gFriction;
EddySettings gEddy;

namespace {

void Allocate(std::vector<float>& field, float value) {
    try {
        field.assign(gGrid.Points(), value);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
}

template <size_t N>
void KeepDataFile(const DataFileRef& ref, std::string& fileName, int32_t& itemCount,
                  int32_t (&itemNumbers)[N]) {
    fileName = ref.fileName;
    itemCount = ref.itemCount;
    for (size_t i = 0; i < N; ++i) itemNumbers[i] = ref.itemNumbers[i];
}

GridShape ModelGrid() {
    return GridShape{gGrid.dx, gGrid.dy, gGrid.J, gGrid.K};
}

}  // namespace

void SetupBottomFriction(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Bottom_Friction");
    FrictionSettings& f = gFriction;
    f = FrictionSettings{};
    const bool twoD = gBasic.numberOfDimensions == 2;
    KvtGetInteger(section, "Resistance_Type", f.resistanceType);
    KvtGetInteger(section, "Formulation", f.formulation);
    switch (f.resistanceType) {
        case 0:
            return;
        case 1:
            KvtGetReal(section, "Constant_Value", f.constantValue);
            if (twoD) f.frictionConstant = kGravity / (f.constantValue * f.constantValue);
            return;
        case 2: {
            const DataFileRef ref = ReadDataFile(section, 3);
            KeepDataFile(ref, f.fileName, f.itemCount, f.itemNumbers);
            if (!twoD) return;
            Allocate(f.frictionCoef, 0.0f);
            ReadGridFile2D(f.fileName, ref.Item(), f.frictionCoef.data(), ModelGrid());
            for (float& v : f.frictionCoef) v = kGravity / (v * v);
            return;
        }
        default:
            StopRun("Bottom Friction: Wrong type of bottom friction formulation");
    }
}

void SetupEddyViscosity(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "EDDY_VISCOSITY");
    EddySettings& e = gEddy;
    e = EddySettings{};
    const bool twoD = gBasic.numberOfDimensions == 2;
    KvtGetInteger(section, "Type", e.type);
    if (e.type == 0) return;
    KvtGetInteger(section, "Formulation", e.formulation);
    KvtGetInteger(section, "Base", e.base);
    e.eddyType = e.formulation + 1;
    if (e.base == 0) e.eddyType = -e.eddyType;

    const int32_t kind = std::abs(e.eddyType);
    if (kind != 1 && kind != 2) StopRun("_EddyViscocity: Wrong type of eddy formulation");
    if (twoD) {
        Allocate(e.eddyViscosity, 0.0f);
        if (kind == 2) Allocate(e.smagorinskyCoef, 0.0f);
    }
    // A prescribed field holds the viscosity itself; the Smagorinsky type
    // holds its coefficient, from which the field is computed each step.
    std::vector<float>& field = kind == 1 ? e.eddyViscosity : e.smagorinskyCoef;
    if (e.type == 1) {
        KvtGetReal(section, "Constant_Value", e.constantValue);
        if (twoD) field.assign(gGrid.Points(), e.constantValue);
    } else if (e.type == 2) {
        const DataFileRef ref = ReadDataFile(section, 3);
        KeepDataFile(ref, e.fileName, e.itemCount, e.itemNumbers);
        if (twoD) ReadGridFile2D(e.fileName, ref.Item(), field.data(), ModelGrid());
    } else {
        StopRun("_EddyViscocity: Wrong type of format");
    }
}
