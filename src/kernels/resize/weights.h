// SPDX-License-Identifier: Apache-2.0
// The weights of a plan's positions, eight positions at once.
#pragma once
#include "kernels/cubic.h"

namespace qori::kernels {

/// A filter as a function of the distance from the position, in pixels.
struct Filter {
    enum class Shape { linear, cubic, samples } shape;
    int32_t support;  ///< Pixels that it reaches to either side.
    Cubic cubic{};
    /// Interpolated linearly, `rate` of them a pixel from distance 0 on; the last is 0.
    const double* samples = nullptr;
    int32_t rate = 0;
};

constexpr int kPositions = 8;

/// What the taps of a position are: tap k lies at scale * (k - (taps / 2 - 1) - fraction).
struct Taps {
    int32_t count;
    double scale;
    bool normalises;  ///< Weights are to sum to 1. The largest takes what is left of the others' rounding.
};

/// Stores the weights of `count` positions. Returns the largest sum of the magnitudes of a position's, or NaN.
double makeWeights(const Filter& filter, const Taps& taps, const double (&fractions)[kPositions], int count,
                   float* out);

}  // namespace qori::kernels
