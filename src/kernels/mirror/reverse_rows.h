// SPDX-License-Identifier: Apache-2.0
// Rows of pixels reversed or exchanged without looking at their bytes. Pixels take 1, 2, 3, 4, 6, 8, 12 or 16 bytes. Of
// 4, 8 and 16 the last quarter may be kept: the row that is written then keeps those bytes of its own.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

/// In each of some rows, dst pixel x becomes src pixel pixels - 1 - x. The images do not overlap. Streaming stores go
/// past the cache in rows some pixel of which begins with a cache line.
template <int pixelBytes, bool keepAlpha>
void reverseRows(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t pixels, int32_t rows,
                 bool streaming);

/// The same in place.
template <int pixelBytes, bool keepAlpha>
void reverseRowsInPlace(uint8_t* image, ptrdiff_t step, ptrdiff_t pixels, int32_t rows);

/// Exchanges pixel x at `left` with pixel x counted backwards from `rightEnd`. The two runs do not overlap.
template <int pixelBytes, bool keepAlpha>
void swapReversed(uint8_t* left, uint8_t* rightEnd, ptrdiff_t pixels);

/// Exchanges two rows that do not overlap.
template <int pixelBytes, bool keepAlpha>
void swapRows(uint8_t* a, uint8_t* b, ptrdiff_t pixels);

}  // namespace qori::kernels
