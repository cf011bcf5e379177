// SPDX-License-Identifier: Apache-2.0
#pragma once
#include "harness/image.h"

namespace qori::test {

/// Masks in turn all clear, all set (with any non-zero value), random, and set in runs.
inline void fillMask(const TestImage& mask, const Shape& shape) {
    const int style = (shape.width + shape.padding + shape.atBegin) % 4;
    bool run = false;
    mask.fill<uint8_t>(1, [&]() -> uint8_t {
        if (random().oneIn(40)) run = !run;
        const bool set = style == 1 || (style == 2 && random().oneIn(2)) || (style == 3 && run);
        return set ? static_cast<uint8_t>(1 + random().below(255)) : uint8_t{0};
    });
}

}  // namespace qori::test
