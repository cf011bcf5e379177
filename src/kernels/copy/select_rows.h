// SPDX-License-Identifier: Apache-2.0
// Rows of which only selected bytes are replaced, by another row's bytes or by a constant pixel: alpha kept, one
// channel of interest, masks. Kept bytes inside a written vector are rewritten with their own value; masked rows leave
// vectors without a selected byte alone, and pixels whose selected bytes are 4-byte words to the word.
#pragma once
#include "kernels/copy_rows.h"

namespace qori::kernels {

/// Replaces the first selectedBytes of every pixel; the row ends with the last pixel's selected bytes.
template <int pixelBytes, int selectedBytes>
void selectRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels);
template <int pixelBytes, int selectedBytes>
void selectFillRow(uint8_t* dst, const Pattern& pattern, ptrdiff_t pixels);

/// Replaces the first selectedBytes of the pixels whose mask is not 0.
template <int pixelBytes, int selectedBytes>
void maskedRow(uint8_t* dst, const uint8_t* src, const uint8_t* mask, ptrdiff_t pixels);
template <int pixelBytes, int selectedBytes>
void maskedFillRow(uint8_t* dst, const Pattern& pattern, const uint8_t* mask, ptrdiff_t pixels);

}  // namespace qori::kernels
