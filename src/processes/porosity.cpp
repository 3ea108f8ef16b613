// Porosity: reads the map of n and the grain constants of the resistance
//     alpha = 1.4e-06 Coef1 / Diameter^2   (linear term)
//     beta  = Coef2 / Diameter              (quadratic term)
// which the sweeps apply at faces of mean porosity below 1.
#include "processes/porosity.hpp"

#include <new>

#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

PorositySettings gPorosity;

void SetupPorosity(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Porosity");
    PorositySettings& p = gPorosity;
    p = PorositySettings{};
    const GridState& g = gGrid;
    const bool twoD = gBasic.numberOfDimensions == 2;
    if (twoD) {
        try {
            p.porosity.assign(g.Points(), 1.0f);
        } catch (const std::bad_alloc&) {
            StopRun("Unable to allocate memory");
        }
    }
    KvtGetLogical(section, "Porosity_Type", p.porosityType);
    if (!p.porosityType) return;

    KvtGetReal(section, "Particle_Coef1", p.particleCoef1);
    KvtGetReal(section, "Particle_Coef2", p.particleCoef2);
    KvtGetReal(section, "Particle_Diameter", p.particleDiameter);
    p.alpha = 1.4e-06f * p.particleCoef1 / (p.particleDiameter * p.particleDiameter);
    p.beta = p.particleCoef2 / p.particleDiameter;

    const DataFileRef ref = ReadDataFile(section, 3);
    p.fileName = ref.fileName;
    p.itemCount = ref.itemCount;
    for (int i = 0; i < 3; ++i) p.itemNumbers[i] = ref.itemNumbers[i];
    if (!twoD) return;

    ReadGridFile2D(p.fileName, ref.Item(), p.porosity.data(), GridShape{g.dx, g.dy, g.J, g.K});
    // Points at or above the datum are not checked: the map may hold
    // anything on land.
    for (size_t i = 0; i < g.Points(); ++i) {
        const float n = p.porosity[i];
        if ((n < 0.2f || n > 1.0f) && g.bed[i] < 0.0f)
            StopRun("_SetupPorosity: porosity value outside interval 0.2<=n<=1" +
                    MapValueAt(p.fileName, n, i, g.J));
    }
}
