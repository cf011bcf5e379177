// SPDX-License-Identifier: Apache-2.0
// Runs one export over many shapes against its scalar reference.
#pragma once
#include "call.h"
#include "image.h"

namespace qori::test {

/// What a sweep does with each shape; stops a member's sweep at its first failure, which is the one worth reading.
template <class Check>
void forShapes(const std::vector<Shape>& shapes, Check check) {
    for (const Shape& shape : shapes) {
        SCOPED_TRACE(describe(shape));
        check(shape);
        if (testing::Test::HasFailure()) return;
    }
}

#define QORI_EXPECT_UNCHANGED(image, snapshot) EXPECT_EQ("", (image).difference(snapshot))

/// A status expected of a call that must leave `output` alone.
#define QORI_EXPECT_STATUS(expected, output, callExpression)      \
    do {                                                          \
        const auto before_ = (output).snapshot();                 \
        EXPECT_EQ(expected, callExpression) << #callExpression;   \
        EXPECT_EQ("", (output).difference(before_));              \
    } while (false)

}  // namespace qori::test
