// Banded linear systems of the mesh solver, solved directly by Gaussian
// elimination with partial pivoting (LAPACK dgbtrf, dgbtrs). A matrix of
// order n with kl lower and ku upper diagonals is kept in LAPACK's band
// storage, column by column: entry (i, j), 1-based, stands in row
// kl + ku + 1 + i - j of column j. Rows 1 to kl of each column are the room
// the factorisation needs for its fill-in. The factors replace the values in
// place and serve every later right-hand side until the matrix is rebuilt.
//
// Index convention: matrix rows and columns are 1-based as above;
// BandIndex gives the 0-based position in Values. Pivots is LAPACK's IPIV,
// a 0-based array of 1-based row numbers. Right-hand sides and solutions are
// passed as pointers to their entry 1 (&v[1] of a vector with slot 0 unused,
// or the start of a block of the state vector), n values each.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

struct BandMatrix {
    int32_t Order = 0;
    int32_t LowerDiagonals = 0;
    int32_t UpperDiagonals = 0;
    int32_t LeadingDimension = 0;  // ku + 2 kl + 1 unless given
    std::vector<double> Values;    // LeadingDimension x Order, column-major
};

struct LinearSystem {
    BandMatrix Matrix;
    std::vector<int32_t> Pivots;  // LAPACK's IPIV
};

// Allocates a zero matrix; each bad argument stops the run with its message,
// as does a matrix that is allocated already.
void AllocateBandMatrix(BandMatrix& matrix, int32_t order, int32_t kl, int32_t ku,
                        std::optional<int32_t> leadingDimension = std::nullopt);
// Allocates the pivots of a system of the given order.
void SetupBGE(LinearSystem& system, int32_t order);

// Solves A x = rhs. A stage flag below 2 factors the values first (the
// matrix is new); 2 reuses the factors that stand. info is LAPACK's (that of
// the factorisation when it found a zero pivot, else that of the solve),
// handed back without a message: a singular matrix shows up in the state.
void SolveBGE(LinearSystem& system, int32_t order, int32_t kl, int32_t ku, int32_t leadingDimension,
              double* values, const double* rhs, double* x, int32_t stageFlag, int32_t& info);
// The same for the system's own matrix.
void SolveBGE(LinearSystem& system, const double* rhs, double* x, int32_t stageFlag, int32_t& info);

// Position in Values of entry (i, j), both 1-based and within the band.
inline size_t BandIndex(const BandMatrix& m, int32_t i, int32_t j) {
    return static_cast<size_t>(j - 1) * m.LeadingDimension +
           (m.LowerDiagonals + m.UpperDiagonals + i - j);
}
inline bool InBand(const BandMatrix& m, int32_t i, int32_t j) {
    return i - j <= m.LowerDiagonals && j - i <= m.UpperDiagonals;
}
inline void AddBandEntry(BandMatrix& m, int32_t i, int32_t j, double value) {
    m.Values[BandIndex(m, i, j)] += value;
}
inline double BandEntry(const BandMatrix& m, int32_t i, int32_t j) {
    return InBand(m, i, j) ? m.Values[BandIndex(m, i, j)] : 0.0;
}

// Sets every value, fill-in room included, to 0 before an assembly.
void ClearBandMatrix(BandMatrix& matrix);
// Makes row i an identity row: its entries within the band 0, the diagonal 1.
void SetIdentityRow(BandMatrix& matrix, int32_t i);
