// SPDX-License-Identifier: Apache-2.0
// Cosine transforms of all rows and of all columns of an image of floats, under the default control register.
#pragma once
#include "cosine_table.h"
#include "image/image.h"

namespace qori::kernels {

/// Channels of a pixel; alpha, the fourth of AC4, is neither read nor written.
struct CosineChannels {
    int inPixel, processed;
};

/// Memory of a pass over sequences of length n, a multiple of 64 at a multiple of 64.
int64_t cosineRowsWork(int32_t n, int channels);
int64_t cosineColumnsWork(int32_t n);

/// dst may be src.
void cosineRows(const CosineTable& table, Image<const float> src, Image<float> dst, int32_t height,
                CosineChannels channels, bool isInverse, float* work);
/// In place; `width` pixels of each row.
void cosineColumns(const CosineTable& table, Image<float> image, int32_t width, CosineChannels channels, bool isInverse,
                   float* work);

}  // namespace qori::kernels
