// SPDX-License-Identifier: Apache-2.0
// Weighted sums down columns of filtered rows.
#pragma once
#include "taps.h"

namespace qori::kernels {

struct ColumnFinish {
    double scale;    ///< Factor of the sums.
    bool isBounded;  ///< Sums stay below 2^31.
};

/// Zeros behind the last whole vector of a row of `elements`, up to a whole block of kTapBlock: sums are of blocks, and
/// what nobody wrote may be slow to compute on.
void fillUpBlock(float* row, ptrdiff_t elements);

/// dst, and `second` unless it is null, become sums of a chain of rows, which hold whole blocks, scaled; integers are
/// rounded and saturated.
template <class T>
void filterColumn(const float* const* rows, const PairedTaps& taps, ColumnFinish finish, T* dst, T* second,
                  ptrdiff_t elements);

/// Adds a block of taps (1 to kTapsPerBlock) to totals, which hold whole vectors as the rows do; the first block
/// overwrites them.
void addToTotals(const float* const* rows, const float* weights, int32_t taps, bool isFirst, double* totals,
                 ptrdiff_t elements);

/// dst becomes the totals, scaled; integers are rounded and saturated.
template <class T>
void finishTotals(const double* totals, ColumnFinish finish, T* dst, ptrdiff_t elements);

}  // namespace qori::kernels
