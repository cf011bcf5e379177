// SPDX-License-Identifier: Apache-2.0
// Images of whole pixels turned so that rows become columns. Pixels take 1, 2, 3, 4, 6, 8, 12 or 16 bytes.
#pragma once
#include <cstddef>
#include <cstdint>

#include "qori.h"

namespace qori::kernels {

/// Pixel (x, y) of the source, of the given size, becomes pixel (y, x) of the destination. The images do not overlap;
/// steps may be negative. With keepAlpha (4, 8 and 16 bytes) the last quarter of each destination pixel stays.
template <int pixelBytes, bool keepAlpha>
void transposeImage(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, QorImageSize size,
                    bool streaming);

}  // namespace qori::kernels
