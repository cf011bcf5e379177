// SPDX-License-Identifier: Apache-2.0
// Sums of a window's columns from row to row, per part of a region, and the memory that they take.
//
// Integers: what enters is added, what leaves is taken away, exactly. Floats: rows are added up in blocks as high as
// the window. A window is the end of one block, summed from below when the block was entered, and the beginning of the
// next, summed from above as its rows enter (M. van Herk, A fast algorithm for local minimum and maximum filters on
// rectangular and octagonal kernels, Pattern Recognition Letters 13, 1992, here with sums): two additions per row, each
// sum of at most `height` elements and of the window's own alone.
#pragma once
#include "frame/plan.h"
#include "frame/row_window.h"
#include "kernels/box/columns.h"

namespace qori::filter {

/// Element sums of type S of the columns of windows over pixels of n elements of T.
template <class S, class T, int n>
class ColumnSums {
public:
    static constexpr bool isFloat = std::is_floating_point_v<T>;

    /// Rows that a RowWindow has to keep above the windows. Few rows are added up each time.
    static int32_t rowsLeft(Reach reach) { return isFloat || reach.rows() < kAddedRows ? 0 : 1; }

    ColumnSums(const RowWindow& window, Reach reach, BlockLayout& layout)
        : reach_(reach), height_(reach.rows() + 1), columns_(reach.columns()) {
        for (int32_t i = 0; i < window.parts(); ++i) {
            const int64_t elements = (int64_t{window.part(i).width} + columns_) * n;
            const int64_t bytes = elements * static_cast<int64_t>(sizeof(S));
            // Running windows read zeros in the pixel before the first.
            constexpr int64_t kPixel = std::is_floating_point_v<S> ? 0 : n * static_cast<int64_t>(sizeof(S));
            sums_[i] = layout.add(bytes + kPixel) + kPixel;
            if (!inBlocks()) continue;
            entered_[i] = layout.add(bytes);
            ends_[i] = layout.add(bytes * (height_ - 1));
        }
    }
    void bind(uint8_t* memory) { memory_ = memory; }

    /// Sums of the columns that the part's windows of row y see; of integers, zeros in the pixel before them. Rows come
    /// in order.
    S* makeRow(const WindowPart& part, int32_t y) {
        S* const sums = at(sums_[part.index]);
        const ptrdiff_t elements = (ptrdiff_t{part.width} + columns_) * n;
        if constexpr (!std::is_floating_point_v<S>)
            if (y == 0)
                for (int i = 1; i <= n; ++i) sums[-i] = 0;
        if constexpr (isFloat) {
            if (inBlocks())
                addBlock(part, y, sums, elements);
            else
                addRows(part, y, sums, elements);
        } else if (y == 0 || rowsLeft(reach_) == 0) {
            addRows(part, y, sums, elements);
        } else {
            kernels::slideRow(sums, part.row<T>(y + reach_.bottom), part.row<T>(y - reach_.top - 1), elements);
        }
        return sums;
    }

private:
    static constexpr int32_t kAddedRows = 3;

    bool inBlocks() const { return isFloat && height_ > kernels::kMostTerms; }
    S* at(int64_t offset) const { return reinterpret_cast<S*>(memory_ + static_cast<ptrdiff_t>(offset)); }

    void addRows(const WindowPart& part, int32_t y, S* sums, ptrdiff_t elements) {
        const T* row[kernels::kMostTerms];
        const int32_t atOnce = std::min<int32_t>(height_, kernels::kMostTerms);
        for (int32_t k = 0; k < atOnce; ++k) row[k] = part.row<T>(y - reach_.top + k);
        kernels::sumTerms<S>(row, atOnce, sums, elements);
        for (int32_t k = atOnce; k < height_; ++k) kernels::addRow(sums, part.row<T>(y - reach_.top + k), elements);
    }

    void addBlock(const WindowPart& part, int32_t y, S* sums, ptrdiff_t elements) {
        const int32_t inBlock = y % height_;
        S* const ends = at(ends_[part.index]);  // of 1 row less than the block, of 2 less, ...
        const T* const last = part.row<T>(y + reach_.bottom);
        if (inBlock > 0) {
            const auto address = [](const T* row) { return reinterpret_cast<intptr_t>(row); };
            const auto step = (address(last) - address(part.row<T>(y + reach_.bottom - 1))) / elementBytes<T>;
            return kernels::addRowTo(at(entered_[part.index]), last, ends + (inBlock - 1) * elements, sums,
                                     inBlock == 1, elements, static_cast<ptrdiff_t>(step));
        }
        kernels::sumTerms<S>(&last, 1, ends + (height_ - 2) * elements, elements);
        for (int32_t k = height_ - 2; k >= 0; --k) {
            const T* const row[] = {ends + k * elements, part.row<T>(y - reach_.top + k)};
            kernels::sumTerms<S>(row, 2, k > 0 ? ends + (k - 1) * elements : sums, elements);
        }
    }

    Reach reach_;
    int32_t height_, columns_;
    uint8_t* memory_ = nullptr;
    int64_t sums_[RowWindow::kMostParts], entered_[RowWindow::kMostParts], ends_[RowWindow::kMostParts];
};

}  // namespace qori::filter
