// SPDX-License-Identifier: Apache-2.0
// Smallest and largest elements of 3 x 3 pixels around each of a region, whose neighbours are read from memory.
#pragma once
#include "image/image.h"
#include "kernels/filter/morphology.h"

namespace qori::filter {

inline constexpr int kSquareReach = 1;

// Order: kernels::Erosion or Dilation of 8u, 16u, 16s, 32f; one channel of 64f. Arguments are as they must be.

/// Returns QOR_OK or QOR_ERR_NO_MEMORY, with nothing written then.
template <class Order, class T>
QorResult squareExtremeInPlace(Image<T> image, QorImageSize roi, Layout layout);

/// The images share no memory.
template <class Order, class T>
void squareExtreme(Image<const T> src, Image<T> dst, QorImageSize roi, Layout layout);

}  // namespace qori::filter
