// Bottom friction and eddy viscosity: the settings and fields of the two
// closures. Friction keeps F = g/M^2 for a Chezy or Manning number M, one
// value or a map; the sweeps divide it by the squared face depth (Chezy) or
// by that and the approximated depth^(1/3) (Manning). Eddy viscosity keeps a
// prescribed field, or the coefficient of the Smagorinsky-type field.
#include "processes/friction.hpp"

#include <algorithm>
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

// The Smagorinsky field nu/h = sqrt(S12^2/2 + Sxx^2 + Syy^2) dx^2 C^2 / h at
// the inner points of the x chains, from the velocities the fluxes give. A
// neighbour row or column on land is replaced by the point's own, so the
// strain across a wall is taken as one-sided. The edges copy their inner
// neighbours. Only dx enters the length scale.
void CalcEddyViscosity() {
    const GridState& g = gGrid;
    const ChainTables& c = gChains;
    EddySettings& e = gEddy;
    const size_t stride = g.Stride();
    const float* P = g.P.data();
    const float* Q = g.Q.data();
    const float* h = g.depth.data();
    const float* C = e.smagorinskyCoef.data();
    float* nu = e.eddyViscosity.data();
    const float dx = g.dx, dy = g.dy;
    for (int32_t k = 1; k <= g.K - 1; ++k) {
        for (int32_t n = 1; n <= c.chainCountX[k]; ++n) {
            const ChainPair& chain = c.X(k, n);
            const int32_t j1 = std::max(chain.first, 1), j2 = std::min(chain.last, g.J - 1);
            for (int32_t j = j1; j <= j2; ++j) {
                const size_t p = g.At(j, k);
                const float sxx = (P[p] - P[p - 1]) / (dx * h[p]);
                const float syy = (Q[p] - Q[p - stride]) / (dy * h[p]);
                const int32_t code = c.codeX[p];
                const size_t pn = code == 4 || code == 2 ? p + stride : p;
                const size_t ps = code == 4 || code == 3 ? p - stride : p;
                const float pN = (P[pn - 1] + P[pn]) / h[pn];
                const float pS = (P[ps - 1] + P[ps]) / h[ps];
                const size_t pe = c.codeY[p + 1] < 0 ? p : p + 1;
                const size_t pw = c.codeY[p - 1] < 0 ? p : p - 1;
                const float qE = (Q[pe] + Q[pe - stride]) / h[pe];
                const float qW = (Q[pw] + Q[pw - stride]) / h[pw];
                const float s12 = (pN - pS) / (4.0f * dy) + (qE - qW) / (4.0f * dx);
                nu[p] = std::sqrt(0.5f * s12 * s12 + sxx * sxx + syy * syy) * dx * dx * C[p] *
                        C[p] / h[p];
            }
        }
    }
    if (g.J < 1 || g.K < 1) return;
    for (int32_t j = 1; j <= g.J - 1; ++j) {
        nu[g.At(j, 0)] = nu[g.At(j, 1)];
        nu[g.At(j, g.K)] = nu[g.At(j, g.K - 1)];
    }
    for (int32_t k = 0; k <= g.K; ++k) {
        nu[g.At(0, k)] = nu[g.At(1, k)];
        nu[g.At(g.J, k)] = nu[g.At(g.J - 1, k)];
    }
}
