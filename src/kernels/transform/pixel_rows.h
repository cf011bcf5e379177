// SPDX-License-Identifier: Apache-2.0
// Rows of four channels and an even length, two at a time, between images and lines whose lanes are the channels of
// both. The same as their namesakes of move_lines.h, but that there is one line for all channels.
#pragma once
#include "move_lines.h"

namespace qori::kernels {

inline constexpr int kPixelRows = 2;

void pixelsToLines(const LineRows& rows, ptrdiff_t n, float scale, float* lines);
void linesToPixels(const float* lines, const int32_t* positions, ptrdiff_t n, Parts parts, const LineRows& rows);
void halvesToPixels(const float* lines, int32_t n, const int32_t* positions, const float* roots, const LineRows& rows);
void pixelsToHalves(const LineRows& rows, int32_t n, float scale, const float* roots, float* lines);

}  // namespace qori::kernels
