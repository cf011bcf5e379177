// SPDX-License-Identifier: Apache-2.0
// The scalar truth of border copies and reflections: where a pixel of the result comes from.
#pragma once
#include <algorithm>

#include "qori.h"

namespace qori::test::reference {

/// The source pixel that destination pixel (x, y) shows, of a source of the given size.
inline QorPoint2D reflected(int32_t x, int32_t y, QorImageSize size, int32_t axis) {
    switch (axis) {
        case flipHorizontalAxis: return {x, size.height - 1 - y};
        case flipVerticalAxis: return {size.width - 1 - x, y};
        case flipBothAxes: return {size.width - 1 - x, size.height - 1 - y};
        case flipDiagonal: return {y, x};
        default: return {size.width - 1 - y, size.height - 1 - x};
    }
}

/// The source pixel nearest to (x, y), counted from the source's first.
inline QorPoint2D nearest(int32_t x, int32_t y, QorImageSize size) {
    return {std::clamp(x, 0, size.width - 1), std::clamp(y, 0, size.height - 1)};
}

}  // namespace qori::test::reference
