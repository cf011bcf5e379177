// SPDX-License-Identifier: Apache-2.0
#pragma once
#include "frame/plan.h"

namespace qori::filter {

/// What medians of any mask look at and make: the first window's first element, `apart` elements between neighbours,
/// and destinations `apart` elements from each other too. Sources may not be destinations.
template <class T>
struct MedianJob {
    Image<const T> windows;
    Image<T> dst;
    QorImageSize size, mask;
    int32_t apart, channels;

    int32_t below() const { return static_cast<int32_t>(int64_t{mask.width} * mask.height / 2); }
};

}  // namespace qori::filter
