// SPDX-License-Identifier: Apache-2.0
// From sums to results.
#pragma once
#include "kernels/correlation/windows.h"

namespace qori::kernels::correlation {

enum class Kind { plain, norm, normLevel };

/// What is known of the template. With A its area, T1 the sum of its taps and n their norm (normLevel: around their
/// mean), a window with cross sum C, sum S1 and sum of squares S2 becomes
///     plain      C
///     norm       C / sqrt(S2 * n^2), 0 where S2 or n is 0
///     normLevel  N / (sqrt(V) * n) with V = S2 - S1^2 / A, N = C - S1 * T1 / A; 0 where n * 2^-23 > V or V is not
///                above its rounding error.
struct Finish {
    Kind kind;
    double area, tapSum, norm;
    double roundings;  ///< The rounding error of V in units of S2; 0 where the sums are exact.
    bool isFloat;      ///< Results will be rounded to float.
};

/// n is rounded up to whole vectors of doubles. Sums that the kind does not need may be null; with squares, plain
/// results of windows of zeros become 0.
template <class Cell>
void finishRow(const Finish& finish, const Cell* crosses, Sums<Cell> sums, ptrdiff_t n, double* results);

/// The first of the windows from x on, or n, whose energy (V, or S2 where the kind is not normLevel) is below
/// `faintest` or not a number, though the result needs its cross sum. n is as in finishRow.
ptrdiff_t nextFaint(const Finish& finish, Sums<double> sums, double faintest, ptrdiff_t x, ptrdiff_t n);

/// Every channels-th element of the row. 8u: the float result times 2^-scale, to nearest, ties to even, saturated.
template <class D>
void storeRow(const double* results, int32_t scale, D* row, int channels, ptrdiff_t n);

}  // namespace qori::kernels::correlation
