// SPDX-License-Identifier: Apache-2.0
// Weighted sums along a row by permutation, for enlargements. The source row lies as a
// line of floats; the taps of eight neighbouring results come from one window of eight floats, or two side by side, in
// the same arrangement for every tap. The sums are those of resize_taps.h, bit for bit.
#pragma once
#include "resize_taps.h"

namespace qori::kernels {

/// Whether lines are the cheaper way. The taps of eight neighbouring results then lie in two windows: their indices
/// differ by 7 at most, or with three channels by 3 pixels and with four by 1.
constexpr bool suitsLines(double ratio) { return ratio <= 1; }

struct LineFilter {
    static constexpr int kOverrun = 16;  ///< Floats behind a line's last that may be read.

    int32_t taps = 0, channels = 0;
    ptrdiff_t groups = 0;  ///< Of eight results.
    bool twoWindows = false;
    int32_t* bases = nullptr;  ///< Per group: where the window of the first tap begins.
    int32_t* order = nullptr;  ///< Per result: place in the window; negative with the low bits' place in the second.
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
