// SPDX-License-Identifier: Apache-2.0
// Columns too narrow for a vector: their rows are worked on together where they lie apart, one by one where not.
#include <algorithm>

#include "harness/call.h"
#include "qori.h"

namespace qori::test {
namespace {

TEST(Columns, RowsThatCoincideAreAddedToOneAfterTheOther) {
    constexpr int rows = 9;
    for (int width = 1; width <= 8; ++width) {
        uint8_t same[8] = {0, 10, 20, 30, 40, 50, 60, 70};
        EXPECT_EQ(QOR_OK, call(&qoriAddC_8u_C1IRSfs, uint8_t{2}, &same[0], 0, QorImageSize{width, rows}, 0));
        for (int x = 0; x < 8; ++x) EXPECT_EQ(10 * x + (x < width ? 2 * rows : 0), same[x]);
        // Each row begins inside the one before.
        uint8_t folded[rows + 8] = {};
        EXPECT_EQ(QOR_OK, call(&qoriAddC_8u_C1IRSfs, uint8_t{1}, &folded[0], 1, QorImageSize{width, rows}, 0));
        for (int i = 0; i < rows + width - 1; ++i)
            EXPECT_EQ(std::min({i + 1, width, rows, rows + width - 1 - i}), folded[i]) << i;
    }
}

TEST(Columns, RowsOfEverySecondLineKeepTheLinesBetween) {
    constexpr int rows = 300, step = 16;
    for (int width = 1; width <= 7; ++width) {
        uint8_t picture[rows * step];
        for (int i = 0; i < rows * step; ++i) picture[i] = static_cast<uint8_t>(i % 251);
        EXPECT_EQ(QOR_OK, call(&qoriAddC_8u_C1IRSfs, uint8_t{100}, &picture[0], step, QorImageSize{width, rows}, 0));
        for (int i = 0; i < rows * step; ++i)
            EXPECT_EQ(i % step < width ? std::min(i % 251 + 100, 255) : i % 251, picture[i]) << i;
    }
}

}  // namespace
}  // namespace qori::test
