// Shape functions and Gauss rules of the elements. The reference line is the
// interval -1 <= r <= 1 with its local nodes in the order left, right, middle:
//   2 nodes: N1 = (1 - r) / 2, N2 = (1 + r) / 2
//   3 nodes: N1 = r (r - 1) / 2, N2 = r (r + 1) / 2, N3 = 1 - r^2
// An element maps linearly onto its reference, so det J = L / 2 and
// dN/dx = dN/dr / J. Every shape of the table uses the same Gauss points,
// so that integrals over an element may mix the linear and the quadratic
// functions.
//
// Indices: shapes[1..count]; N[k][q], dN[k][q], dNdx[k][q] for local node
// k = 1..nodeCount at Gauss point q = 1..gaussCount; gaussPoint[q],
// gaussWeight[q], det[q]. Slot 0 is unused throughout.
#pragma once

#include <cstdint>
#include <vector>

constexpr int32_t kMaxShapes = 4;

struct Shape {
    int32_t elementType = 0;
    int32_t dimension = 0, kind = 0, order = 0, nodeCount = 0;
    int32_t gaussCount = 0;
    std::vector<double> gaussPoint, gaussWeight;
    std::vector<std::vector<double>> N, dN;  // values and reference derivatives
    std::vector<std::vector<double>> dNdx;   // derivatives in x for the element in hand
    std::vector<double> det;                 // determinant at each point, same element
};

struct ShapeTable {
    int32_t count = 0;
    Shape shapes[kMaxShapes + 1];
};
extern ShapeTable gShapes;

// The index of the shape of an element type, registering it on first use.
// A fifth distinct shape stops the run.
int32_t SetupShapeData(int32_t elementType);

// Gauss-Legendre points and weights of an n-point rule on -1..1, in
// ascending order of the points, 1-based.
void GaussLegendre(int32_t n, std::vector<double>& points, std::vector<double>& weights);

// Fills the Gauss values and the shape functions of every shape of the
// table for a rule of gaussPoints points (type_of_gauss).
void FillShapeFunctions(int32_t gaussPoints);

// Values of the line's shape functions and their reference derivatives at
// r, into N[1..nodeCount] and dN[1..nodeCount].
void LineShape(int32_t nodeCount, double r, double* N, double* dN);

// The work arrays of a shape for a line element of the given length.
void EvaluateLineElement(Shape& shape, double length);
