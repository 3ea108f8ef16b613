#include "equations/band_matrix.hpp"

#include <algorithm>
#include <new>
#include <stdexcept>

#include "run/messages.hpp"

extern "C" {
void dgbtrf_(const int* m, const int* n, const int* kl, const int* ku, double* ab, const int* ldab,
             int* ipiv, int* info);
void dgbtrs_(const char* trans, const int* n, const int* kl, const int* ku, const int* nrhs,
             const double* ab, const int* ldab, const int* ipiv, double* b, const int* ldb,
             int* info, size_t transLength);
}

void AllocateBandMatrix(BandMatrix& matrix, int32_t order, int32_t kl, int32_t ku,
                        std::optional<int32_t> leadingDimension) {
    if (!matrix.Values.empty()) StopRun("AllocateBandMatrix: Matrix already allocated");
    if (order <= 0) StopRun("AllocateBandMatrix: Order of matrix must be positive");
    if (kl <= 0) StopRun("AllocateBandMatrix: Number of diagonals must be positive");
    if (ku <= 0) StopRun("AllocateBandMatrix: Number of diagonals must be positive");
    const int32_t ld = leadingDimension.value_or(ku + 2 * kl + 1);
    if (ld <= 0) StopRun("AllocateBandMatrix: Leading dimension must be positive");
    try {
        matrix.Values.assign(static_cast<size_t>(ld) * static_cast<size_t>(order), 0.0);
    } catch (const std::bad_alloc&) {
        StopRun("AllocateBandMatrix: Can't allocate memory");
    } catch (const std::length_error&) {
        StopRun("AllocateBandMatrix: Can't allocate memory");
    }
    matrix.Order = order;
    matrix.LowerDiagonals = kl;
    matrix.UpperDiagonals = ku;
    matrix.LeadingDimension = ld;
}

void SetupBGE(LinearSystem& system, int32_t order) {
    try {
        system.Pivots.assign(static_cast<size_t>(std::max(order, 0)), 0);
    } catch (const std::bad_alloc&) {
        StopRun("SetupBGE: Out of memory");
    } catch (const std::length_error&) {
        StopRun("SetupBGE: Out of memory");
    }
}

void SolveBGE(LinearSystem& system, int32_t order, int32_t kl, int32_t ku, int32_t leadingDimension,
              double* values, const double* rhs, double* x, int32_t stageFlag, int32_t& info) {
    info = 0;
    if (stageFlag < 2)
        dgbtrf_(&order, &order, &kl, &ku, values, &leadingDimension, system.Pivots.data(), &info);
    const int32_t factored = info;
    std::copy(rhs, rhs + order, x);
    const int one = 1;
    dgbtrs_("N", &order, &kl, &ku, &one, values, &leadingDimension, system.Pivots.data(), x, &order,
            &info, 1);
    // A zero pivot of the factorisation is what the caller would want to know.
    if (factored != 0) info = factored;
}

void SolveBGE(LinearSystem& system, const double* rhs, double* x, int32_t stageFlag,
              int32_t& info) {
    BandMatrix& m = system.Matrix;
    SolveBGE(system, m.Order, m.LowerDiagonals, m.UpperDiagonals, m.LeadingDimension,
             m.Values.data(), rhs, x, stageFlag, info);
}

void ClearBandMatrix(BandMatrix& matrix) {
    std::fill(matrix.Values.begin(), matrix.Values.end(), 0.0);
}

void SetIdentityRow(BandMatrix& matrix, int32_t i) {
    const int32_t first = std::max(1, i - matrix.LowerDiagonals);
    const int32_t last = std::min(matrix.Order, i + matrix.UpperDiagonals);
    for (int32_t j = first; j <= last; ++j) matrix.Values[BandIndex(matrix, i, j)] = 0.0;
    matrix.Values[BandIndex(matrix, i, i)] = 1.0;
}
