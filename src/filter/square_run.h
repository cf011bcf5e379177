// SPDX-License-Identifier: Apache-2.0
// 3 x 3 windows of bytes over a region, a few rows at a time.
#pragma once
#include "frame/row_window.h"
#include "kernels/box/square.h"
#include "square_rows.h"
#include "strips.h"

namespace qori::filter {

/// Rows made at a time, six being read for four.
inline constexpr int32_t kSquareRows = 4;

inline WindowNeeds squareNeeds(bool inPlace) {
    return {.reach = {1, 1, 1, 1}, .rowsAtOnce = kSquareRows, .place = inPlace ? Place::inOrder : Place::apart};
}

/// One group of rows of a part from column x on; rowOf(y) is a source row, where the part begins. Two or three are made
/// as four, the last of which give way: in place, none may be written before all of the group are made.
template <kernels::Square weights, Layout layout, bool delayed, class RowOf>
void makeSquares(RowOf rowOf, int32_t x, int32_t width, int32_t y, int32_t rows, Image<uint8_t> dst) {
    constexpr int n = channels(layout);
    const uint8_t* src[kSquareRows + 2];
    uint8_t* to[kSquareRows];
    for (int32_t k = 0; k < kSquareRows + 2; ++k) src[k] = rowOf(y - 1 + std::min(k, rows + 1));
    for (int32_t k = 0; k < kSquareRows; ++k) to[k] = dst.row(y + std::min(k, rows - 1)) + ptrdiff_t{x} * n;
    kernels::squareRows<weights, n, delayed, layout == Layout::AC4, kSquareRows>(src, to, ptrdiff_t{width} * n);
}

template <kernels::Square weights, Layout layout, bool delayed>
void runSquareWindow(const BorderedImage& src, Image<uint8_t> dst, uint8_t* memory) {
    RowWindow window(src, squareNeeds(delayed), memory);
    window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
        const auto rowOf = [&](int32_t row) { return part.row(row) + channels(layout); };
        makeSquares<weights, layout, delayed>(rowOf, part.x, part.width, y, rows, dst);
    });
}

/// memory: what the RowWindow takes for squareNeeds(), which is no less than the rows above take. Windows whose
/// neighbours are all read do without one: rows of 512 bytes take a tenth less time.
template <kernels::Square weights, Layout layout>
void runSquare(const BorderedImage& src, Image<uint8_t> dst, bool inPlace, uint8_t* memory) {
    constexpr int n = channels(layout);
    const int32_t width = src.size.width;
    if (inPlace && !(src.rule.open.all() && src.step == dst.step))
        return runSquareWindow<weights, layout, true>(src, dst, memory);
    if (inPlace)
        return forGroupsInPlace(dst, src.size.height, kSquareRows, (int64_t{width} + 2) * n, n, memory,
                                [=](auto rowOf, int32_t y, int32_t rows) {
                                    makeSquares<weights, layout, true>(rowOf, 0, width, y, rows, dst);
                                });
    forStrips(src, dst, [&](const BorderedImage& strip, Image<uint8_t> to) {
        if (!strip.rule.open.all()) return runSquareWindow<weights, layout, false>(strip, to, memory);
        const auto rowOf = [&](int32_t row) { return strip.pixel(0, row); };
        for (int32_t y = 0; y < strip.size.height; y += kSquareRows)
            makeSquares<weights, layout, false>(rowOf, 0, strip.size.width, y,
                                                std::min(kSquareRows, strip.size.height - y), to);
    });
}

}  // namespace qori::filter
