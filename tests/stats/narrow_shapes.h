// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <vector>

#include "harness/image.h"

namespace qori::test {

/// Columns of rows with padding, whose rows are brought together: from one byte a row to more than that is done for, in
/// one go and in several.
inline std::vector<Shape> narrowShapes() {
    std::vector<Shape> shapes;
    for (int width : {1, 2, 3, 5, 8, 11, 16, 31, 43, 129}) {
        shapes.push_back({.width = width, .height = 9, .padding = 7, .atBegin = width % 2 == 0});
        shapes.push_back({.width = width, .height = 130, .padding = 1, .atBegin = width % 2 == 1});
    }
    shapes.push_back({.width = 1, .height = 4'200, .padding = 3});
    return shapes;
}

}  // namespace qori::test
