// Sponge layers: a map of coefficients s >= 1. After each sweep every water
// point with s other than 1 has its deviation from the rest state (rs, rp,
// rq of OPTION_PARAMETERS) divided by s:
//     F := (F - r)/s + r   for F = xi, P, Q, PPrev, QPrev.
// The damping works on each point's own values, so the order of the points
// does not matter; xiPrev and xiPrev2 are left as they are.
#include "processes/sponge.hpp"

#include <new>

#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

SpongeSettings gSponge;

void SetupSpongeLayer(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Sponge");
    SpongeSettings& s = gSponge;
    s = SpongeSettings{};
    const GridState& g = gGrid;
    const bool twoD = gBasic.numberOfDimensions == 2;
    if (twoD) {
        try {
            s.sponge.assign(g.Points(), 1.0f);
        } catch (const std::bad_alloc&) {
            StopRun("Unable to allocate memory");
        }
    }
    KvtGetLogical(section, "Sponge_Type", s.spongeType);
    if (s.spongeType) {
        const DataFileRef ref = ReadDataFile(section, 3);
        s.fileName = ref.fileName;
        s.itemCount = ref.itemCount;
        for (int i = 0; i < 3; ++i) s.itemNumbers[i] = ref.itemNumbers[i];
        if (twoD) {
            ReadGridFile2D(s.fileName, ref.Item(), s.sponge.data(),
                           GridShape{g.dx, g.dy, g.J, g.K});
            for (size_t i = 0; i < g.Points(); ++i) {
                const float v = s.sponge[i];
                if ((v < 1.0f || v > 100.0f) && g.bed[i] < 0.0f)
                    StopRun("_SetupSpongeLayer: sponge coefficient outside interval 1<=s<=100" +
                            MapValueAt(s.fileName, v, i, g.J));
            }
        }
    }
    // The rest state defaults to 0; OPTION_PARAMETERS, read later, may move it.
    gOptions.spongeReferenceS = 0.0f;
    gOptions.spongeReferenceP = 0.0f;
    gOptions.spongeReferenceQ = 0.0f;
}

void AbsorpWaveEnergy() {
    GridState& g = gGrid;
    const float* sponge = gSponge.sponge.data();
    const float* bed = g.bed.data();
    const float rs = gOptions.spongeReferenceS;
    const float rp = gOptions.spongeReferenceP;
    const float rq = gOptions.spongeReferenceQ;
    float* xi = g.xi.data();
    float* P = g.P.data();
    float* Q = g.Q.data();
    float* PPrev = g.PPrev.data();
    float* QPrev = g.QPrev.data();
    const float land = g.landValue;
    const int32_t J = g.J, K = g.K;
    const size_t stride = g.Stride();
#pragma omp parallel for schedule(static)
    for (int32_t j = 0; j <= J; ++j) {
        for (int32_t k = 0; k <= K; ++k) {
            const size_t p = static_cast<size_t>(k) * stride + j;
            if (!(bed[p] < land) || sponge[p] == 1.0f) continue;
            const float f = 1.0f / sponge[p];
            xi[p] = (xi[p] - rs) * f + rs;
            P[p] = (P[p] - rp) * f + rp;
            Q[p] = (Q[p] - rq) * f + rq;
            PPrev[p] = (PPrev[p] - rp) * f + rp;
            QPrev[p] = (QPrev[p] - rq) * f + rq;
        }
    }
}
