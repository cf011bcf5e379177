// SPDX-License-Identifier: Apache-2.0
// Cross sums by definition: each row of the source is multiplied by the rows of the template that meet it in some rows
// of results at once.
#pragma once
#include "kernels/correlation/cells.h"

namespace qori::kernels::correlation {

/// Rows of results that share the loads of a source row; their accumulators of two vectors each and what is multiplied
/// fill the registers: 8 of them with 32-bit pointers, else 16.
inline constexpr int kCrossRows = sizeof(void*) == 8 ? 4 : 2;

/// sums[k][x] += sum over i of cells[x + i * kTapElements] * taps[-k][i], for `rows` (1 to kCrossRows) rows k and whole
/// blocks of x up to `width`. Rows of sums lie sumPitch apart, those of taps tapPitch. Pairs: the sums fit 32 bits.
template <class Cell>
void addCrosses(Cell* sums, ptrdiff_t sumPitch, int rows, const Cell* cells, const Cell* taps, ptrdiff_t tapPitch,
                ptrdiff_t tapCells, ptrdiff_t width);

}  // namespace qori::kernels::correlation
