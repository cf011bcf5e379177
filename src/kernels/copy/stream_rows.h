// SPDX-License-Identifier: Apache-2.0
// Rows copied past the cache, a piece of some of them in turn.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

/// Of rows that overlap in the destination the last stays.
void copyRowsStreaming(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t bytes,
                       int32_t rows);

}  // namespace qori::kernels
