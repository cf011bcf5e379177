// SPDX-License-Identifier: Apache-2.0
// Linear interpolation of bytes: along rows with weights of 15 bits, which sum to 32767, down columns in single
// precision with fractions of 23. Sums of a row are at most 255 * 32767 < 2^23, so floats hold them exactly; what is
// lost before the last rounding are 2^-16 of the difference between neighbours at most.
#pragma once
#include "places.h"

namespace qori::kernels {

/// As WarpKernel, for 1, 3 and 4 channels.
template <int channels, bool anywhere>
void linearBytes(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                 uint8_t* dst);

}  // namespace qori::kernels
