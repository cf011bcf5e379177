// SPDX-License-Identifier: Apache-2.0
// 3 x 3 windows of bytes, a few rows at a time, in blocks of columns whose sums stay in the first-level cache.
#pragma once
#include "frame/plan.h"
#include "frame/row_window.h"
#include "kernels/box/square.h"

namespace qori::filter {

/// Memory for the sums: two blocks, because in place the columns of a block are summed before those of the one before
/// it are written over.
class SquareRun {
public:
    static constexpr int32_t kRows = 4;  ///< Six are read for four.
    static constexpr int32_t kBlock = 1024;  ///< Elements.

    static WindowNeeds needs(Place place) {
        return {.reach = {1, 1, 1, 1}, .rowsAtOnce = kRows, .place = place};
    }
    /// For rows of so many pixels.
    static int64_t bytes(int64_t width, int n) {
        return 2 * kRows * rowElements(width, n) * static_cast<int64_t>(sizeof(uint16_t));
    }

    /// memory: bytes() of them.
    template <kernels::Square weights, Layout layout, class Rule>
    static void run(const BorderedImage& src, Image<uint8_t> dst, Rule rule, Place place, uint8_t* windowMemory,
                    uint8_t* memory) {
        RowWindow window(src, needs(place), windowMemory);
        auto* const sums = reinterpret_cast<uint16_t*>(memory);
        window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
            makeRows<weights, layout>(part, y, rows, dst, rule, sums, rowElements(src.size.width, channels(layout)));
        });
    }

private:
    static int64_t rowElements(int64_t width, int n) { return std::min<int64_t>(width * n, kBlock) + 2 * n; }

    template <kernels::Square weights, Layout layout, class Rule>
    static void makeRows(const WindowPart& part, int32_t y, int32_t rows, Image<uint8_t> dst, Rule rule, uint16_t* sums,
                         int64_t pitch) {
        constexpr int n = channels(layout);
        const ptrdiff_t elements = ptrdiff_t{part.width} * n;
        uint16_t* sum[2][kRows];
        for (int k = 0; k < 2 * kRows; ++k) sum[k / kRows][k % kRows] = sums + static_cast<ptrdiff_t>(k * pitch);
        const auto sizeOf = [=](ptrdiff_t from) { return std::min<ptrdiff_t>(kBlock, elements - from); };
        const auto sumBlock = [&](ptrdiff_t from) {
            const uint8_t* src[kRows + 2];
            for (int32_t k = 0; k < kRows + 2; ++k) src[k] = part.row(y - 1 + std::min(k, rows + 1)) + from;
            kernels::sumThreeRows<weights, kRows>(src, sum[from / kBlock % 2], sizeOf(from) + 2 * n);
        };
        sumBlock(0);
        for (ptrdiff_t from = 0; from < elements; from += kBlock) {
            if (from + kBlock < elements) sumBlock(from + kBlock);
            for (int32_t k = 0; k < rows; ++k)
                kernels::acrossThree<weights, n, layout == Layout::AC4>(
                    sum[from / kBlock % 2][k], dst.row(y + k) + ptrdiff_t{part.x} * n + from, sizeOf(from), rule);
        }
    }
};

}  // namespace qori::filter
