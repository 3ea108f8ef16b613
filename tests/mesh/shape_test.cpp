// Shape functions and Gauss rules: the rules integrate polynomials up to
// degree 2n - 1 exactly, the shape functions are nodal and sum to one, and
// the element matrices of a quadratic and a linear element of any length
// come out as their exact integrals.
#include "mesh/shape.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "mesh/mesh.hpp"

namespace {

TEST(GaussRules, IntegratePolynomialsExactly) {
    for (int32_t n = 1; n <= 6; ++n) {
        std::vector<double> r, w;
        GaussLegendre(n, r, w);
        ASSERT_EQ(r.size(), static_cast<size_t>(n + 1));
        for (int32_t q = 2; q <= n; ++q) EXPECT_LT(r[q - 1], r[q]) << "n " << n;
        for (int32_t degree = 0; degree <= 2 * n - 1; ++degree) {
            double sum = 0.0;
            for (int32_t q = 1; q <= n; ++q) sum += w[q] * std::pow(r[q], degree);
            const double exact = degree % 2 == 1 ? 0.0 : 2.0 / (degree + 1);
            EXPECT_NEAR(sum, exact, 1.0e-14) << "n " << n << " degree " << degree;
        }
    }
    std::vector<double> r, w;
    GaussLegendre(3, r, w);
    EXPECT_EQ(r, std::vector<double>({0.0, -0.7745966692414834, 0.0, 0.7745966692414834}));
    EXPECT_EQ(w, std::vector<double>({0.0, 5.0 / 9.0, 8.0 / 9.0, 5.0 / 9.0}));
}

TEST(LineShapes, NodalAndPartitionOfUnity) {
    // Local nodes: left at -1, right at 1, middle at 0.
    const double at[] = {0.0, -1.0, 1.0, 0.0};
    for (int32_t nodes : {2, 3}) {
        double N[4], dN[4];
        for (int32_t j = 1; j <= nodes; ++j) {
            LineShape(nodes, at[j], N, dN);
            for (int32_t k = 1; k <= nodes; ++k) EXPECT_EQ(N[k], k == j ? 1.0 : 0.0);
        }
        for (double r : {-0.9, -0.3, 0.2, 0.77}) {
            LineShape(nodes, r, N, dN);
            double sum = 0.0, dsum = 0.0, x = 0.0, dx = 0.0;
            for (int32_t k = 1; k <= nodes; ++k)
                sum += N[k], dsum += dN[k], x += N[k] * at[k], dx += dN[k] * at[k];
            EXPECT_NEAR(sum, 1.0, 1e-15);
            EXPECT_NEAR(dsum, 0.0, 1e-15);
            // Both reproduce r itself, and its derivative.
            EXPECT_NEAR(x, r, 1e-15);
            EXPECT_NEAR(dx, 1.0, 1e-15);
        }
    }
}

// Element matrices by the three-point rule against their exact values, for
// an element of length L: the quadratic mass and stiffness matrices and the
// mixed matrix of quadratic against linear functions.
TEST(LineShapes, ElementMatricesOfTheThreePointRule) {
    gShapes = ShapeTable{};
    const int32_t quad = SetupShapeData(kQuadraticLine);
    const int32_t lin = SetupShapeData(kLinearLine);
    EXPECT_EQ(SetupShapeData(kQuadraticLine), quad);
    FillShapeFunctions(3);
    Shape& Q = gShapes.shapes[quad];
    Shape& M = gShapes.shapes[lin];
    const double L = 2.7;
    EvaluateLineElement(Q, L);
    EvaluateLineElement(M, L);
    // Order left, right, middle.
    const double mass[3][3] = {{4, -1, 2}, {-1, 4, 2}, {2, 2, 16}};     // x L / 30
    const double stiff[3][3] = {{7, 1, -8}, {1, 7, -8}, {-8, -8, 16}};  // x 1 / (3 L)
    const double mixed[3][2] = {{1, 0}, {0, 1}, {2, 2}};                // x L / 6
    for (int32_t a = 1; a <= 3; ++a)
        for (int32_t b = 1; b <= 3; ++b) {
            double m = 0.0, k = 0.0, x = 0.0;
            for (int32_t q = 1; q <= 3; ++q) {
                const double W = Q.gaussWeight[q] * Q.det[q];
                m += W * Q.N[a][q] * Q.N[b][q];
                k += W * Q.dNdx[a][q] * Q.dNdx[b][q];
                if (b <= 2) x += W * Q.N[a][q] * M.N[b][q];
            }
            EXPECT_NEAR(m, mass[a - 1][b - 1] * L / 30.0, 1e-14) << a << "," << b;
            EXPECT_NEAR(k, stiff[a - 1][b - 1] / (3.0 * L), 1e-14) << a << "," << b;
            if (b <= 2) {
                EXPECT_NEAR(x, mixed[a - 1][b - 1] * L / 6.0, 1e-14) << a << "," << b;
            }
        }
    // The derivatives of the linear functions are the constants -1/L and 1/L.
    for (int32_t q = 1; q <= 3; ++q) {
        EXPECT_NEAR(M.dNdx[1][q], -1.0 / L, 1e-15);
        EXPECT_NEAR(M.dNdx[2][q], 1.0 / L, 1e-15);
    }
    gShapes = ShapeTable{};
}

}  // namespace
