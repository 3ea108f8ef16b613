#include "solver2d/chains.hpp"

#include <algorithm>
#include <cstdio>
#include <new>
#include <string>

#include "processes/open_boundaries.hpp"
#include "processes/shoreline.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

namespace {

bool IsWater(size_t p) {
    if (gShoreline.type > 0) return gGrid.landValue > gGrid.bed[p];
    return gGrid.depth[p] > 0.0f;
}

// True when some chain of the list has the given end.
bool ChainEndsAt(const ChainPair* chains, int32_t count, int32_t value, bool atFirst) {
    for (int32_t n = 0; n < count; ++n)
        if ((atFirst ? chains[n].first : chains[n].last) == value) return true;
    return false;
}

void MarkBoundaries() {
    GridState& g = gGrid;
    ChainTables& t = gChains;
    for (const BoundaryRecord& b : gBoundaries.records) {
        const int32_t mark = b.formulation != 0 ? kCodeFluxBoundary : kCodeLevelBoundary;
        const int32_t j1 = b.first[0], k1 = b.first[1];
        if (b.orientation == 1 || b.orientation == 3) {
            for (int32_t k = k1; k <= b.last[1]; ++k) {
                const size_t p = g.At(j1, k);
                if (!IsWater(p)) continue;
                const ChainPair* row = &t.chainX[static_cast<size_t>(k) * t.maxChainsX];
                if (ChainEndsAt(row, t.chainCountX[k], j1, b.orientation == 1)) t.codeY[p] = mark;
            }
        } else {
            for (int32_t j = j1; j <= b.last[0]; ++j) {
                const size_t p = g.At(j, k1);
                if (!IsWater(p)) continue;
                const ChainPair* column = &t.chainY[static_cast<size_t>(j) * t.maxChainsY];
                if (ChainEndsAt(column, t.chainCountY[j], k1, b.orientation == 4)) t.codeX[p] = mark;
            }
        }
    }
}

void WriteCodes(const std::vector<int32_t>& code) {
    for (int32_t k = gGrid.K; k >= 0; --k) {
        std::string line;
        char cell[16];
        std::snprintf(cell, sizeof cell, "%5d :", k);
        line = cell;
        for (int32_t j = 0; j <= gGrid.J; ++j) {
            std::snprintf(cell, sizeof cell, "%3d", code[gGrid.At(j, k)]);
            line += cell;
        }
        WriteLine(line);
    }
}

void WriteChains(const std::vector<int32_t>& counts, const std::vector<ChainPair>& chains,
                 int32_t width, bool downwards) {
    const int32_t lines = static_cast<int32_t>(counts.size());
    for (int32_t i = 0; i < lines; ++i) {
        const int32_t l = downwards ? lines - 1 - i : i;
        char cell[40];
        std::snprintf(cell, sizeof cell, "%5d %3d :", l, counts[l]);
        std::string line = cell;
        for (int32_t n = 0; n < counts[l]; ++n) {
            const ChainPair& c = chains[static_cast<size_t>(l) * width + n];
            std::snprintf(cell, sizeof cell, " (%d,%d)", c.first, c.last);
            line += cell;
        }
        WriteLine(line);
    }
}

// The points of the surface estimate along one axis's chains: the inner
// points of a chain, with its ends where the code across lets the flux in
// (2 at the first, 3 at the last), all of a chain of one point; none of a
// chain whose end lies on a level or flux boundary of the other axis.
void MarkSurfacePoints(bool columns, std::vector<uint8_t>& mark) {
    const GridState& g = gGrid;
    const ChainTables& t = gChains;
    const std::vector<int32_t>& codeAlong = columns ? t.codeX : t.codeY;
    const std::vector<int32_t>& codeEnds = columns ? t.codeY : t.codeX;
    mark.assign(g.Points(), 0);
    const int32_t lines = columns ? g.J : g.K;
    for (int32_t l = 0; l <= lines; ++l) {
        const int32_t count = columns ? t.chainCountY[l] : t.chainCountX[l];
        auto at = [&](int32_t i) { return columns ? g.At(l, i) : g.At(i, l); };
        for (int32_t c = 1; c <= count; ++c) {
            const ChainPair& ch = columns ? t.Y(l, c) : t.X(l, c);
            if (codeEnds[columns ? at(ch.first) : at(ch.last)] >= kCodeLevelBoundary) continue;
            if (ch.first == ch.last) {
                mark[at(ch.first)] = 2;
                continue;
            }
            const int32_t from = codeAlong[at(ch.first)] == 2 ? ch.first : ch.first + 1;
            const int32_t to = codeAlong[at(ch.last)] == 3 ? ch.last : ch.last - 1;
            for (int32_t i = from; i <= to; ++i) mark[at(i)] = 1;
        }
    }
}

}  // namespace

void MakeChains() {
    GridState& g = gGrid;
    ChainTables& t = gChains;
    const int32_t J = g.J, K = g.K;
    const size_t n = g.Points();
    t.maxChainsX = J / 2 + 1;
    t.maxChainsY = K / 2 + 1;
    try {
        t.codeX.assign(n, 4);
        t.codeY.assign(n, 4);
        t.chainX.assign(static_cast<size_t>(K + 1) * t.maxChainsX, ChainPair{});
        t.chainY.assign(static_cast<size_t>(J + 1) * t.maxChainsY, ChainPair{});
        t.chainCountX.assign(K + 1, 0);
        t.chainCountY.assign(J + 1, 0);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }

    // Rows: x chains, codeX, and the fluxes cut at land.
    for (int32_t k = 0; k <= K; ++k) {
        int32_t count = 0;
        bool open = false;
        ChainPair* row = &t.chainX[static_cast<size_t>(k) * t.maxChainsX];
        for (int32_t j = 0; j <= J; ++j) {
            const size_t p = g.At(j, k);
            if (!IsWater(p)) {
                t.codeX[p] = -1;
                g.P[p] = g.Q[p] = g.PPrev[p] = g.QPrev[p] = 0.0f;
                if (k >= 1) {
                    const size_t s = g.At(j, k - 1);
                    t.codeX[s] -= 1;
                    g.Q[s] = g.QPrev[s] = 0.0f;
                }
                if (k < K) t.codeX[g.At(j, k + 1)] = 2;
                if (j >= 1) g.P[p - 1] = g.PPrev[p - 1] = 0.0f;
                if (open) row[count - 1].last = j - 1;
                open = false;
            } else if (!open) {
                row[count++].first = j;
                open = true;
            }
        }
        if (open) row[count - 1].last = J;
        t.chainCountX[k] = count;
    }

    // Columns: y chains, codeY; land points fall just dry without the slot.
    for (int32_t j = 0; j <= J; ++j) {
        int32_t count = 0;
        bool open = false;
        ChainPair* column = &t.chainY[static_cast<size_t>(j) * t.maxChainsY];
        for (int32_t k = 0; k <= K; ++k) {
            const size_t p = g.At(j, k);
            if (!IsWater(p)) {
                t.codeY[p] = -1;
                if (j >= 1) t.codeY[p - 1] -= 1;
                if (j < J) t.codeY[p + 1] = 2;
                if (gShoreline.type <= 0) {
                    g.xi[p] = g.bed[p] - 0.0001f;
                    g.depth[p] = -0.0001f;
                }
                if (open) column[count - 1].last = k - 1;
                open = false;
            } else if (!open) {
                column[count++].first = k;
                open = true;
            }
        }
        if (open) column[count - 1].last = K;
        t.chainCountY[j] = count;
    }

    MarkBoundaries();
    try {
        MarkSurfacePoints(true, t.surfaceX);
        MarkSurfacePoints(false, t.surfaceY);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
}

void CountWaterPoints(int32_t& count) {
    count = static_cast<int32_t>(
        std::count_if(gChains.codeX.begin(), gChains.codeX.end(), [](int32_t c) { return c >= 1; }));
}

void WriteChainTables() {
    WriteLine("Grid codes (x-dir.)");
    WriteCodes(gChains.codeX);
    WriteLine("Grid codes (y-dir.)");
    WriteCodes(gChains.codeY);
    WriteLine("Chains (x-dir.)");
    WriteLine("   k  no : (first,last) ...");
    WriteChains(gChains.chainCountX, gChains.chainX, gChains.maxChainsX, true);
    WriteLine("Chains (y-dir.)");
    WriteLine("   j  no : (first,last) ...");
    WriteChains(gChains.chainCountY, gChains.chainY, gChains.maxChainsY, false);
}

int32_t FindBoundary(int32_t j, int32_t k, int32_t axis) {
    const auto& records = gBoundaries.records;
    for (size_t b = 0; b < records.size(); ++b) {
        const BoundaryRecord& r = records[b];
        if (axis == 1 && (r.orientation == 1 || r.orientation == 3)) {
            if (j == r.first[0] && r.first[1] <= k && k <= r.last[1])
                return static_cast<int32_t>(b) + 1;
        } else if (axis == 2 && (r.orientation == 2 || r.orientation == 4)) {
            if (k == r.first[1] && r.first[0] <= j && j <= r.last[0])
                return static_cast<int32_t>(b) + 1;
        }
    }
    return 0;
}
