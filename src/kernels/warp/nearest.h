// SPDX-License-Identifier: Apache-2.0
// The nearest pixel, moved whatever its elements are. Positions come with half a pixel added.
#pragma once
#include "places.h"

namespace qori::kernels {

/// For pixels of 1, 2, 3, 4, 6, 8, 12, 16, 24 and 32 bytes.
template <int pixelBytes>
WarpKernels nearestKernels();

}  // namespace qori::kernels
