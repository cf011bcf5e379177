// SPDX-License-Identifier: Apache-2.0
// Cubic filtering of 4 x 4 pixels: columns are summed first, then the row. Weights are computed in double precision;
// sums are of doubles for floats and doubles, of floats for integers.
#pragma once
#include "kernels/cubic.h"
#include "places.h"

namespace qori::kernels {

CubicWeights weightsOf(Cubic cubic);

/// For uint8_t, uint16_t, int16_t, float and double, 1, 3 and 4 channels.
template <class T, int channels>
WarpKernels cubicKernels();

}  // namespace qori::kernels
