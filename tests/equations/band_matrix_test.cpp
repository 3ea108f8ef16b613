// The banded solver against a dense elimination of the same matrix: random
// non-symmetric systems of the bands the mesh solver uses, with and without
// diagonal dominance, the full band of a single quadratic element, identity
// rows, factors reused for a second right-hand side, and a zero pivot.
#include "equations/band_matrix.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <random>
#include <string>
#include <vector>

namespace {

using Dense = std::vector<std::vector<double>>;

// x of A x = b by elimination with partial pivoting, 0-based.
std::vector<double> DenseSolve(Dense a, std::vector<double> b) {
    const size_t n = b.size();
    for (size_t k = 0; k < n; ++k) {
        size_t p = k;
        for (size_t i = k + 1; i < n; ++i)
            if (std::abs(a[i][k]) > std::abs(a[p][k])) p = i;
        std::swap(a[k], a[p]);
        std::swap(b[k], b[p]);
        for (size_t i = k + 1; i < n; ++i) {
            const double f = a[i][k] / a[k][k];
            for (size_t j = k; j < n; ++j) a[i][j] -= f * a[k][j];
            b[i] -= f * b[k];
        }
    }
    std::vector<double> x(n);
    for (size_t k = n; k-- > 0;) {
        double s = b[k];
        for (size_t j = k + 1; j < n; ++j) s -= a[k][j] * x[j];
        x[k] = s / a[k][k];
    }
    return x;
}

// A random banded matrix, assembled into band storage entry by entry and
// kept densely beside it; with dominant, each row's diagonal outweighs the rest.
struct Pair {
    LinearSystem system;
    Dense dense;
};
Pair RandomSystem(int32_t n, int32_t kl, int32_t ku, std::mt19937& rng, bool dominant) {
    std::uniform_real_distribution<double> u(-1.0, 1.0);
    Pair p;
    AllocateBandMatrix(p.system.Matrix, n, kl, ku);
    SetupBGE(p.system, n);
    p.dense.assign(n, std::vector<double>(n, 0.0));
    for (int32_t i = 1; i <= n; ++i) {
        double row = 0.0;
        for (int32_t j = std::max(1, i - kl); j <= std::min(n, i + ku); ++j) {
            if (j == i) continue;
            const double v = u(rng);
            row += std::abs(v);
            p.dense[i - 1][j - 1] = v;
            AddBandEntry(p.system.Matrix, i, j, v);
        }
        const double d = (dominant ? row + 0.5 : 0.0) + u(rng);
        p.dense[i - 1][i - 1] = d;
        // Two additions into one entry sum up, as an assembly over elements needs.
        AddBandEntry(p.system.Matrix, i, i, 0.25 * d);
        AddBandEntry(p.system.Matrix, i, i, 0.75 * d);
    }
    return p;
}

std::vector<double> RandomVector(int32_t n, std::mt19937& rng) {
    std::uniform_real_distribution<double> u(-10.0, 10.0);
    std::vector<double> v(n);
    for (double& x : v) x = u(rng);
    return v;
}

void ExpectNear(const std::vector<double>& a, const std::vector<double>& b, double tol) {
    ASSERT_EQ(a.size(), b.size());
    for (size_t i = 0; i < a.size(); ++i) EXPECT_NEAR(a[i], b[i], tol) << "entry " << i + 1;
}

TEST(BandSolver, MatchesDenseEliminationAndReusesItsFactors) {
    std::mt19937 rng(20260);
    // The bands of the flux and the elevation system, a single quadratic
    // element (order 3, the band full), bands without dominance, where the
    // solve must pivot, and boundary rows set to identity, which return
    // their right-hand side unchanged.
    struct Case {
        int32_t n, kl, ku;
        bool dominant;
        std::vector<int32_t> identityRows;
    };
    for (const Case& c :
         {Case{41, 2, 2, true, {}}, Case{20, 1, 1, true, {}}, Case{3, 2, 2, true, {}},
          Case{30, 2, 2, false, {}}, Case{12, 1, 3, false, {}}, Case{9, 2, 2, true, {1, 5, 9}}}) {
        SCOPED_TRACE("n " + std::to_string(c.n) + " kl " + std::to_string(c.kl) + " ku " +
                     std::to_string(c.ku));
        Pair p = RandomSystem(c.n, c.kl, c.ku, rng, c.dominant);
        for (int32_t i : c.identityRows) {
            SetIdentityRow(p.system.Matrix, i);
            for (int32_t j = 1; j <= c.n; ++j) p.dense[i - 1][j - 1] = i == j ? 1.0 : 0.0;
        }
        const std::vector<double> before = p.system.Matrix.Values;
        const std::vector<double> b1 = RandomVector(c.n, rng), b2 = RandomVector(c.n, rng);
        std::vector<double> x(c.n, 0.0);
        int32_t info = -7;
        SolveBGE(p.system, b1.data(), x.data(), 1, info);
        EXPECT_EQ(info, 0);
        ExpectNear(x, DenseSolve(p.dense, b1), 1.0e-9);
        for (int32_t i : c.identityRows) EXPECT_DOUBLE_EQ(x[i - 1], b1[i - 1]);
        // The factors stand in place of the values, and serve the next right-hand side.
        EXPECT_NE(p.system.Matrix.Values, before);
        const std::vector<double> factors = p.system.Matrix.Values;
        SolveBGE(p.system, b2.data(), x.data(), 2, info);
        EXPECT_EQ(info, 0);
        ExpectNear(x, DenseSolve(p.dense, b2), 1.0e-9);
        EXPECT_EQ(p.system.Matrix.Values, factors);
        // Clearing empties the fill-in room too, for the next assembly.
        ClearBandMatrix(p.system.Matrix);
        for (double v : p.system.Matrix.Values) ASSERT_EQ(v, 0.0);
    }
}

// A zero pivot is handed back through info, not stopped on.
TEST(BandSolver, SingularMatrixReportsItsPivot) {
    LinearSystem s;
    AllocateBandMatrix(s.Matrix, 3, 1, 1);
    SetupBGE(s, 3);
    AddBandEntry(s.Matrix, 1, 1, 1.0);
    AddBandEntry(s.Matrix, 3, 3, 1.0);
    const double b[3] = {1.0, 1.0, 1.0};
    double x[3];
    int32_t info = 0;
    SolveBGE(s, b, x, 1, info);
    EXPECT_EQ(info, 2);
}

}  // namespace
