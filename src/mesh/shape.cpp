#include "mesh/shape.hpp"

#include <cmath>
#include <numbers>

#include "mesh/mesh.hpp"
#include "run/messages.hpp"

ShapeTable gShapes;

namespace {

// Dimension, kind and order of the shape of an element type.
struct ShapeKind {
    int32_t dimension, kind, order, nodeCount;
};

bool KindOf(int32_t elementType, ShapeKind& kind) {
    switch (elementType) {
        case kLinearLine:
            kind = {1, 1, 1, 2};
            return true;
        case kQuadraticLine:
            kind = {1, 1, 2, 3};
            return true;
        default:
            return false;
    }
}

}  // namespace

int32_t SetupShapeData(int32_t elementType) {
    ShapeTable& t = gShapes;
    for (int32_t s = 1; s <= t.count; ++s)
        if (t.shapes[s].elementType == elementType) return s;
    ShapeKind kind{};
    // Lines are all a mesh of the solver file can hold.
    if (!KindOf(elementType, kind))
        StopRun("SetupShapeData: Unknown element type " + std::to_string(elementType));
    if (t.count >= kMaxShapes) StopRun("SetupShapeData:Too many shapes");
    Shape& s = t.shapes[++t.count];
    s = Shape{};
    s.elementType = elementType;
    s.dimension = kind.dimension;
    s.kind = kind.kind;
    s.order = kind.order;
    s.nodeCount = kind.nodeCount;
    return t.count;
}

void GaussLegendre(int32_t n, std::vector<double>& points, std::vector<double>& weights) {
    points.assign(n + 1, 0.0);
    weights.assign(n + 1, 0.0);
    if (n == 3) {
        // The rule of every solver file, in the digits it is known by.
        points[1] = -0.7745966692414834;
        points[3] = 0.7745966692414834;
        weights[1] = weights[3] = 5.0 / 9.0;
        weights[2] = 8.0 / 9.0;
        return;
    }
    if (n == 1) {
        weights[1] = 2.0;
        return;
    }
    // Newton's iteration on the Legendre polynomial P_n from the Chebyshev
    // estimate of each root; the roots lie symmetric about 0.
    for (int32_t i = 1; i <= (n + 1) / 2; ++i) {
        double r = std::cos(std::numbers::pi * (i - 0.25) / (n + 0.5));
        double dp = 1.0;
        for (int iter = 0; iter < 100; ++iter) {
            double p0 = 1.0, p1 = r;  // P_{k-1}, P_k
            for (int32_t k = 2; k <= n; ++k) {
                const double p2 = ((2.0 * k - 1.0) * r * p1 - (k - 1.0) * p0) / k;
                p0 = p1;
                p1 = p2;
            }
            dp = n * (r * p1 - p0) / (r * r - 1.0);
            const double step = p1 / dp;
            r -= step;
            if (std::abs(step) < 1.0e-16) break;
        }
        const double w = 2.0 / ((1.0 - r * r) * dp * dp);
        points[i] = -r;
        points[n + 1 - i] = r;
        weights[i] = weights[n + 1 - i] = w;
    }
}

void LineShape(int32_t nodeCount, double r, double* N, double* dN) {
    if (nodeCount == 2) {
        N[1] = 0.5 * (1.0 - r);
        N[2] = 0.5 * (1.0 + r);
        dN[1] = -0.5;
        dN[2] = 0.5;
    } else {
        N[1] = 0.5 * r * (r - 1.0);
        N[2] = 0.5 * r * (r + 1.0);
        N[3] = 1.0 - r * r;
        dN[1] = r - 0.5;
        dN[2] = r + 0.5;
        dN[3] = -2.0 * r;
    }
}

void FillShapeFunctions(int32_t gaussPoints) {
    if (gaussPoints < 1) StopRun("SetupShapeData: Number of Gauss points must be positive");
    std::vector<double> points, weights;
    GaussLegendre(gaussPoints, points, weights);
    for (int32_t s = 1; s <= gShapes.count; ++s) {
        Shape& shape = gShapes.shapes[s];
        const int32_t nodes = shape.nodeCount;
        shape.gaussCount = gaussPoints;
        shape.gaussPoint = points;
        shape.gaussWeight = weights;
        shape.N.assign(nodes + 1, std::vector<double>(gaussPoints + 1, 0.0));
        shape.dN = shape.N;
        shape.dNdx = shape.N;
        shape.det.assign(gaussPoints + 1, 0.0);
        double N[4], dN[4];
        for (int32_t q = 1; q <= gaussPoints; ++q) {
            LineShape(nodes, points[q], N, dN);
            for (int32_t k = 1; k <= nodes; ++k) {
                shape.N[k][q] = N[k];
                shape.dN[k][q] = dN[k];
            }
        }
    }
}

void EvaluateLineElement(Shape& shape, double length) {
    const double J = 0.5 * length;
    for (int32_t q = 1; q <= shape.gaussCount; ++q) {
        shape.det[q] = J;
        for (int32_t k = 1; k <= shape.nodeCount; ++k) shape.dNdx[k][q] = shape.dN[k][q] / J;
    }
}
