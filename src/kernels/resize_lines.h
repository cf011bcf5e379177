// SPDX-License-Identifier: Apache-2.0
// Weighted sums along a row by permutation, for enlargements. The source row lies as a line of floats; the taps of
// eight neighbouring results come from one window of eight floats, in the same arrangement for every tap. The sums are
// those of resize_taps.h, bit for bit.
#pragma once
#include "resize_taps.h"

namespace qori::kernels {

/// Whether lines are the way. Indices of pixels n apart then differ by n at most, so those of the elements of eight
/// neighbouring results by 7: with three channels, results that begin with a pixel's last channel look 9 elements on
/// only where the next pixel is another one, and then none of them looks at the first two channels before.
constexpr bool suitsLines(double ratio) { return ratio <= 1; }

struct LineFilter {
    static constexpr int kOverrun = 8;  ///< Floats behind a line's last that may be read.

    int32_t taps = 0, channels = 0;
    ptrdiff_t groups = 0;      ///< Of eight results.
    int32_t* bases = nullptr;  ///< Per group: where the window of the first tap begins.
    int32_t* order = nullptr;  ///< Per result: place in the window.
    float* weights = nullptr;  ///< Per group and tap: eight weights.
};

/// Fills the filter's tables for `width` pixels; the line begins at source column `origin`. Results behind the last
/// repeat it.
void listLine(LineFilter& filter, const PixelTaps* pixels, int32_t width, const float* weights, int32_t origin);

void filterLine(const LineFilter& filter, const float* line, float* out);

/// Converts `elements` elements and repeats the first and the last pixel at the ends; asks for those of the next row.
template <class T, int channels>
void expandLine(const T* row, ptrdiff_t elements, int32_t left, int32_t right, const T* nextRow, float* line);

}  // namespace qori::kernels
