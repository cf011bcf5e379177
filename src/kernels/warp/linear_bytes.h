// SPDX-License-Identifier: Apache-2.0
// Linear interpolation of bytes: one sum of four pixels in integers. Fractions are odd multiples of 2^-15, off by 2^-15
// at most; weights are rounded to 2^-15 such that the two of a column sum to the column's and all four to 1. A result
// is therefore off its rounding by 255 * 3 * 2^-15 < 0.024 at most. Sums are at most 255 * 2^15 + 2^14 < 2^23.
#pragma once
#include "places.h"

namespace qori::kernels {

/// As WarpKernel, for 1, 3 and 4 channels.
template <int channels, bool anywhere>
void linearBytes(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                 uint8_t* dst);

}  // namespace qori::kernels
