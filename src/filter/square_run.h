// SPDX-License-Identifier: Apache-2.0
// 3 x 3 windows of bytes over a region, a few rows at a time.
#pragma once
#include "frame/row_window.h"
#include "kernels/box/square.h"
#include "strips.h"

namespace qori::filter {

/// Rows made at a time, six being read for four.
inline constexpr int32_t kSquareRows = 4;

inline WindowNeeds squareNeeds(bool inPlace) {
    return {.reach = {1, 1, 1, 1}, .rowsAtOnce = kSquareRows, .place = inPlace ? Place::inOrder : Place::apart};
}

/// One group of rows. Two or three are made as four, the last of which give way: in place, none may be written before
/// all of the group are made.
template <kernels::Square weights, Layout layout, bool delayed>
void makeSquares(const WindowPart& part, int32_t y, int32_t rows, Image<uint8_t> dst) {
    constexpr int n = channels(layout);
    const uint8_t* src[kSquareRows + 2];
    uint8_t* to[kSquareRows];
    for (int32_t k = 0; k < kSquareRows + 2; ++k) src[k] = part.row(y - 1 + std::min(k, rows + 1)) + n;
    for (int32_t k = 0; k < kSquareRows; ++k) to[k] = dst.row(y + std::min(k, rows - 1)) + ptrdiff_t{part.x} * n;
    kernels::squareRows<weights, n, delayed, layout == Layout::AC4, kSquareRows>(src, to, ptrdiff_t{part.width} * n);
}

/// memory: what the RowWindow takes for squareNeeds().
template <kernels::Square weights, Layout layout>
void runSquare(const BorderedImage& src, Image<uint8_t> dst, bool inPlace, uint8_t* memory) {
    if (inPlace) {
        RowWindow window(src, squareNeeds(true), memory);
        return window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
            makeSquares<weights, layout, true>(part, y, rows, dst);
        });
    }
    forStrips(src, dst, [&](const BorderedImage& strip, Image<uint8_t> to) {
        RowWindow window(strip, squareNeeds(false), memory);
        window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
            makeSquares<weights, layout, false>(part, y, rows, to);
        });
    });
}

}  // namespace qori::filter
