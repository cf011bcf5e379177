// SPDX-License-Identifier: Apache-2.0
// Linear interpolation of bytes in words of 2^-7, which hold what two neighbours mix to with a rounding of 2^-8. Along
// rows neighbours a and b are mixed about their middle, 64 (a + b) + 64 (b - a) (2 f - 1), as then f keeps 16 bits in a
// signed word; down columns it keeps 15. Fractions are rounded down: with both roundings a result is off its own by
// 255 * (2^-16 + 2^-15) + 2^-7 < 0.0196 at most. Of noise 99.6 % of the results are the rounded ones, whatever the
// angle and scale. Sums are at most 128 * 255 < 2^15.
#pragma once
#include "places.h"

namespace qori::kernels {

enum class ByteReads {
    fixed,    ///< Inside the source, by fixed positions.
    inside,   ///< Inside the source.
    anywhere  ///< Moved into the source.
};

/// As WarpKernel, for 1, 3 and 4 channels.
template <int channels, ByteReads reads>
void linearBytes(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                 uint8_t* dst);

}  // namespace qori::kernels
