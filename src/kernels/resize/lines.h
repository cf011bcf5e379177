// SPDX-License-Identifier: Apache-2.0
// Weighted sums along a row by permutation, for enlargements. The source row lies as a line of
// floats; the taps of eight neighbouring results come from a window of eight floats, or of two times eight, in the same
// arrangement for every tap. The sums are those of resize_taps.h, bit for bit.
#pragma once
#include "taps.h"

namespace qori::kernels {

/// Whether lines are the way for whole tiles of one channel. They gain 1.1 to 1.26 over turned rows where one channel
/// is enlarged by few taps, and lose 0.84 to 0.95 with more taps or channels. Eight neighbouring results must look at
/// sixteen neighbouring floats in any case, as they do up to a ratio of 1: pixels n apart look ceil(n * ratio) apart at
/// most.
constexpr bool suitsLines(double ratio, int32_t taps) { return ratio <= 1 && taps <= 4; }

struct LineFilter {
    static constexpr int kOverrun = 16;  ///< Floats behind a line's last that may be read.

    enum class Windows {
        one,  ///< Eight floats.
        two   ///< Sixteen.
    };

    int32_t taps = 0, channels = 0;
    Windows windows = Windows::one;
    ptrdiff_t groups = 0;      ///< Of eight results.
    int32_t* bases = nullptr;  ///< Per group: where the window of the first tap begins.
    int32_t* order = nullptr;  ///< Per result: place in the windows.
    float* weights = nullptr;  ///< Per group and tap: eight weights.
    ptrdiff_t cycle = 0;       ///< Groups after which order and weights repeat, or 0. The last group may differ.
};

/// Fills the filter's tables for `width` pixels; the line begins at source column `origin`. Results behind the last
/// repeat it. Every `period` pixels weights repeat and columns go on by one step, unless it is 0; of tables that repeat
/// only the first and the last are made.
void listLine(LineFilter& filter, const PixelTaps* pixels, int32_t width, const float* weights, int32_t period,
              int32_t origin);

/// `later` is the memory of a row that will be needed soon, with `bytes` per float of the line; it is asked for, not
/// read.
void filterLine(const LineFilter& filter, const float* line, const uint8_t* later, int bytes, float* out);

/// Converts `elements` elements and repeats the first and the last pixel at the ends.
template <class T, int channels>
void expandLine(const T* row, ptrdiff_t elements, int32_t left, int32_t right, float* line);

}  // namespace qori::kernels
