// SPDX-License-Identifier: Apache-2.0
// Two-dimensional transforms of one channel of float images.
#pragma once
#include "fourier_plan.h"

namespace qori::transform {

/// A channel: its first element, the step, and elements from one pixel to the next.
struct Channel {
    const float* src;
    int32_t srcStep;
    float* dst;
    int32_t dstStep;
    int channels;
};

/// Source and destination may be one image. `buffer` begins on a 64-byte boundary.
void forwardReal(const FourierPlan& plan, const Channel& channel, uint8_t* buffer);
void inverseReal(const FourierPlan& plan, const Channel& channel, uint8_t* buffer);

enum class Direction { forward, inverse };
void transformComplex(const FourierPlan& plan, const Channel& channel, uint8_t* buffer, Direction direction);

}  // namespace qori::transform
