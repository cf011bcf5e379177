// SPDX-License-Identifier: Apache-2.0
// Two-dimensional transforms of float images.
#pragma once
#include "fourier_plan.h"

namespace qori::transform {

/// Source and destination, which may be one image; of a pixel's channels the first ones are processed.
struct Images {
    const float* src;
    int32_t srcStep;
    float* dst;
    int32_t dstStep;
    int channels, processed;
};

/// `buffer` begins on a 64-byte boundary.
void forwardReal(const FourierPlan& plan, const Images& images, uint8_t* buffer);
void inverseReal(const FourierPlan& plan, const Images& images, uint8_t* buffer);

enum class Direction { forward, inverse };
/// Of one channel.
void transformComplex(const FourierPlan& plan, const Images& images, uint8_t* buffer, Direction direction);

}  // namespace qori::transform
