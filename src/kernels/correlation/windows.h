// SPDX-License-Identifier: Apache-2.0
// Sums and sums of squares of windows, from rows of cells: down columns, then along the row.
#pragma once
#include "kernels/correlation/cells.h"

namespace qori::kernels::correlation {

/// Sums of elements and of their squares, column by column or window by window. Without `values` only the squares are
/// wanted. Of pairs they are 32-bit integers, as many elements as kMostPairTaps; doubles are exact for integers up to
/// 2^53.
template <class Cell>
struct Sums {
    Cell *values, *squares;
};

/// out = in + cells. `in` may be `out`; its squares are null for zeros.
template <class Cell>
void addRow(const Cell* cells, Sums<Cell> in, Sums<Cell> out, ptrdiff_t n);

/// sums += entering - leaving, of integers only.
template <class Cell>
void slideRow(const Cell* entering, const Cell* leaving, Sums<Cell> sums, ptrdiff_t n);

/// out = a + b.
template <class Cell>
void joinSums(Sums<Cell> a, Sums<Cell> b, Sums<Cell> out, ptrdiff_t n);

/// out[x] = columns[x] + ... + columns[x + width - 1] for x < n, by spans of 1, 2, 4, ... columns: a sum of the
/// window's own columns alone, of at most 2 log2(width) additions on the way of each. `spans` holds n + width and a
/// block more.
template <class Cell>
void sumAlong(const Cell* columns, ptrdiff_t width, Cell* spans, Cell* out, ptrdiff_t n);

}  // namespace qori::kernels::correlation
