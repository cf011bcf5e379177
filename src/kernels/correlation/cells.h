// SPDX-License-Identifier: Apache-2.0
// What windows are correlated from: rows of one channel, padded, in cells that multiply exactly.
//
// Pairs: 32 bits that hold an 8-bit element and its right neighbour as 16 bits each, so that one instruction multiplies
// and adds two. Doubles: every other element. Rows of cells may be read by whole vectors.
#pragma once
#include <type_traits>

#include "kernels/vector_math.h"

namespace qori::kernels::correlation {

using Pair = int32_t;

template <class Cell>
inline constexpr bool isPair = std::is_same_v<Cell, Pair>;

/// Cells that fill a block: what kernels round widths up to.
template <class Cell>
inline constexpr int kBlockCells = 2 * Vec<Cell>::lanes;

/// Elements of a template's row that one cell of a tap covers.
template <class Cell>
inline constexpr int kTapElements = isPair<Cell> ? 2 : 1;

/// A row of cells: so many that lie before the image's row, of its elements, and behind it.
struct RowSpan {
    ptrdiff_t before, inside, behind;

    ptrdiff_t total() const { return before + inside + behind; }
};

/// Every channels-th element from `from` on, as doubles minus the offset; what lies outside the row counts as 0.
template <class T>
void readCells(const T* from, int channels, RowSpan span, double offset, double* cells);

/// `buffer` holds one element more than the row has cells.
template <class T>
void readCells(const T* from, int channels, RowSpan span, int16_t* buffer, Pair* cells);

/// Fewer products than this of pairs of 8-bit elements never leave 32 bits: 32,512 * 255^2 < 2^31.
inline constexpr int64_t kMostPairTaps = 32'512;

}  // namespace qori::kernels::correlation
