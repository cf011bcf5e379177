// SPDX-License-Identifier: Apache-2.0
// Linear interpolation of the 2 x 2 pixels around a position: in double precision for doubles, else in single precision
// with fractions of 24 bits. A mix is a - f * a + f * b in two fused steps, which is exactly a at 0 and exactly b at 1.
#pragma once
#include "places.h"

namespace qori::kernels {

/// For uint8_t, uint16_t, int16_t, float and double, 1, 3 and 4 channels.
template <class T, int channels>
WarpKernels linearKernels();

}  // namespace qori::kernels
