// The explicit filter: after each sweep a five-point smoothing of the flux of
// the sweep's direction and of the surface, along the chains of that sweep,
//     F(j,k) := (1 - 4a) F(j,k) + a (F(W) + F(E) + F(S) + F(N)),  a = f/8,
// with f the coefficient of the point. A neighbour beyond the chain's end or
// on land is replaced by the point itself, so a constant field stays
// constant. Neighbours are read from F and the result written to a buffer
// (a Jacobi step), then copied back: the order of the points does not matter.
// Points below a coefficient of 0.01, and points at or next to an internal
// generation source, are left as they are.
#include <new>

#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "processes/internal_generation.hpp"
#include "processes/sponge.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

FilterSettings gFilter;

namespace {

// Along one line of the grid: the field and the buffer step by `along`
// between points of the line and by `across` between lines.
struct FilterLine {
    float* field;
    float* buffer;
    const float* coef;
    const int32_t* code;  // codeX for the x filter, codeY for the y filter
    ptrdiff_t along, across;
    bool sources;
};

// Loop A of a round over the points first..last of one chain.
// hasLow, hasHigh: whether the line has a neighbouring line below and above
// it; a grid all of water has code 4 in its edge lines too.
void FilterChain(const FilterLine& l, size_t base, int32_t first, int32_t last, int32_t end,
                 bool hasLow, bool hasHigh) {
    for (int32_t i = first; i <= last; ++i) {
        const size_t p = base + i * l.along;
        l.buffer[p] = l.field[p];
        if (l.coef[p] < 0.01f) continue;
        const float a = l.coef[p] / 8.0f;
        const size_t pm = i == first ? p : p - l.along;
        const size_t pp = i == end ? p : p + l.along;
        // Across the line by the code: 4 both sides water, 2 land on the low
        // side, 3 land on the high side, anything else no neighbour at all.
        size_t high = p, low = p;
        const int32_t code = l.code[p];
        if ((code == 4 || code == 2) && hasHigh) high = p + l.across;
        if ((code == 4 || code == 3) && hasLow) low = p - l.across;
        if (l.sources && (SourceAt(p) > 0 || SourceAt(pm) > 0 || SourceAt(pp) > 0 ||
                          SourceAt(low) > 0 || SourceAt(high) > 0))
            continue;
        l.buffer[p] = (1.0f - 4.0f * a) * l.field[p] +
                      a * (l.field[pm] + l.field[pp] + l.field[low] + l.field[high]);
    }
}

// One round over all lines: loop A into the buffer, loop B back into the
// field. shortEnd leaves out the last point of each chain (the flux beyond
// it lies on land).
void FilterRound(Field& field, int axis, bool shortEnd) {
    GridState& g = gGrid;
    const ChainTables& c = gChains;
    const ptrdiff_t stride = static_cast<ptrdiff_t>(g.Stride());
    FilterLine l{field.data(),
                 g.filterBuffer.data(),
                 gFilter.filterCoef.data(),
                 axis == 1 ? c.codeX.data() : c.codeY.data(),
                 axis == 1 ? 1 : stride,
                 axis == 1 ? stride : 1,
                 gGeneration.numberOfRecords > 0};
    const int32_t lines = axis == 1 ? g.K + 1 : g.J + 1;
#pragma omp parallel for schedule(static)
    for (int32_t m = 0; m < lines; ++m) {
        const size_t base = axis == 1 ? static_cast<size_t>(m) * stride : static_cast<size_t>(m);
        const int32_t count = axis == 1 ? c.chainCountX[m] : c.chainCountY[m];
        for (int32_t n = 1; n <= count; ++n) {
            const ChainPair& ch = axis == 1 ? c.X(m, n) : c.Y(m, n);
            FilterChain(l, base, ch.first, shortEnd ? ch.last - 1 : ch.last, ch.last, m > 0,
                        m < lines - 1);
        }
    }
#pragma omp parallel for schedule(static)
    for (int32_t m = 0; m < lines; ++m) {
        const size_t base = axis == 1 ? static_cast<size_t>(m) * stride : static_cast<size_t>(m);
        const int32_t count = axis == 1 ? c.chainCountX[m] : c.chainCountY[m];
        for (int32_t n = 1; n <= count; ++n) {
            const ChainPair& ch = axis == 1 ? c.X(m, n) : c.Y(m, n);
            const int32_t last = shortEnd ? ch.last - 1 : ch.last;
            for (int32_t i = ch.first; i <= last; ++i) {
                const size_t p = base + i * l.along;
                field[p] = l.buffer[p];
            }
        }
    }
}

}  // namespace

void SetupExplicitFilter(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "EXPLICIT_FILTERING");
    FilterSettings& f = gFilter;
    f = FilterSettings{};
    KvtGetInteger(section, "type", f.type);
    if (f.type <= 0) return;
    const GridState& g = gGrid;
    const bool twoD = gBasic.numberOfDimensions == 2;
    if (twoD) {
        try {
            f.filterCoef.assign(g.Points(), 0.0f);
        } catch (const std::bad_alloc&) {
            StopRun("Unable to allocate memory");
        }
    }
    if (f.type == 1) {
        KvtGetReal(section, "filter_coeff", f.filterCoeff);
        // The constant is held to the range of the map's values.
        if (f.filterCoeff < 0.0f || f.filterCoeff > 1.0f)
            StopRun(
                Filled("_SetupExplicitFilter: filter coefficient outside interval 0<=f<=1: "
                       "filter_coeff = %",
                       f.filterCoeff));
        if (twoD) f.filterCoef.assign(g.Points(), f.filterCoeff);
    } else if (f.type == 2) {
        const DataFileRef ref = ReadDataFile(section, 3);
        f.fileName = ref.fileName;
        f.itemCount = ref.itemCount;
        for (int i = 0; i < 3; ++i) f.itemNumbers[i] = ref.itemNumbers[i];
        if (!twoD) return;
        ReadGridFile2D(f.fileName, ref.Item(), f.filterCoef.data(),
                       GridShape{g.dx, g.dy, g.J, g.K});
        for (size_t i = 0; i < g.Points(); ++i) {
            const float v = f.filterCoef[i];
            if ((v < 0.0f || v > 1.0f) && g.bed[i] < 0.0f)
                StopRun("_SetupExplicitFilter: filter coefficient outside interval 0<=f<=1" +
                        MapValueAt(f.fileName, v, i, g.J));
        }
    } else {
        StopRun("_SetupExplicitFilter: Wrong type of filter");
    }
}

void CalcFilterX() {
    FilterRound(gGrid.P, 1, true);
    FilterRound(gGrid.xi, 1, false);
}

void CalcFilterY() {
    FilterRound(gGrid.Q, 2, true);
    FilterRound(gGrid.xi, 2, false);
}
