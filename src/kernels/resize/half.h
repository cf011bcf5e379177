// SPDX-License-Identifier: Apache-2.0
// Means of 2 x 2 pixels: linear and super-sampling resize to exactly half of both lengths, without tables.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

/// dst = a quarter of the sum of each four pixels of the rows a and b. Halves round up, or to even where `toEven`.
/// The rows `later` bytes on will be needed soon: their memory is asked for, not read.
template <int channels>
void halveRow8u(const uint8_t* a, const uint8_t* b, ptrdiff_t later, uint8_t* dst, ptrdiff_t pixels, bool toEven);

/// One channel: both directions weigh both pixels by `weight`, the result is multiplied by `scale`.
void halveRow32f(const float* a, const float* b, ptrdiff_t later, float* dst, ptrdiff_t pixels, float weight,
                 float scale);

}  // namespace qori::kernels
