// SPDX-License-Identifier: Apache-2.0
// Sums of the windows of one row of results after the other.
//
// Integers: the row that enters is added, the row that leaves is taken away, exactly. Floats: rows are added up in
// blocks as high as the template. A window is the end of one block, summed from below when the block was entered, and
// the beginning of the next, summed from above as its rows enter (M. van Herk, A fast algorithm for local minimum and
// maximum filters on rectangular and octagonal kernels, Pattern Recognition Letters 13, 1992, here with sums), so that
// what an element does to results ends where its windows end.
#pragma once
#include "problem.h"

namespace qori::matching {

template <class Cell>
class WindowSums {
public:
    using Sums = kernels::correlation::Sums<Cell>;

    /// What results of the kind need, for tiles of so many columns and rows.
    WindowSums(const Problem& problem, Kind kind, int64_t tileWidth, int64_t tileHeight, bool isExact,
               WorkBuffer& memory)
        : kind_(kind),
          height_(problem.tpl.height),
          span_(problem.tpl.width),
          kept_(std::min<int64_t>(height_, tileHeight)),
          isExact_(isExact) {
        if (kind_ == Kind::plain) return;
        pitch_ = roundUp(tileWidth + span_, kernels::correlation::kBlockCells<Cell>) +
                 kernels::correlation::kBlockCells<Cell>;
        columns_ = take(memory, 1);
        windows_ = take(memory, 1);
        spans_ = memory.take<Cell>(pitch_);
        if (isExact_) return;
        entered_ = take(memory, 1);
        ends_ = take(memory, kept_ + 1);
    }

    /// Those of the next row of a tile, beginning with row 0. rowOf(i, slot) gives row i of the tile's patch; rows of
    /// different slots are wanted at a time.
    template <class RowOf>
    Sums makeRow(int64_t y, int64_t width, RowOf rowOf) {
        if (kind_ == Kind::plain) return {};
        const auto columns = static_cast<ptrdiff_t>(width + span_ - 1);
        const Sums sums = isExact_ ? slide(y, columns, rowOf) : addBlock(y, columns, rowOf);
        const auto along = [&](const Cell* from, Cell* to) {
            kernels::correlation::sumAlong(from, static_cast<ptrdiff_t>(span_), spans_, to,
                                           static_cast<ptrdiff_t>(width));
        };
        if (sums.values != nullptr) along(sums.values, windows_.values);
        along(sums.squares, windows_.squares);
        return windows_;
    }

private:
    Sums take(WorkBuffer& memory, int64_t rows) const {
        Cell* const values = kind_ == Kind::normLevel ? memory.take<Cell>(rows * pitch_) : nullptr;
        return {values, memory.take<Cell>(rows * pitch_)};
    }
    Sums row(Sums rows, int64_t i) const {
        const auto offset = static_cast<ptrdiff_t>(i * pitch_);
        return {rows.values == nullptr ? nullptr : rows.values + offset, rows.squares + offset};
    }

    template <class RowOf>
    Sums slide(int64_t y, ptrdiff_t columns, RowOf rowOf) {
        if (y > 0) {
            const Cell* const entering = rowOf(y + height_ - 1, 0);
            kernels::correlation::slideRow(entering, rowOf(y - 1, 1), columns_, columns);
            return columns_;
        }
        for (int64_t i = 0; i < height_; ++i)
            kernels::correlation::addRow(rowOf(i, 0), i == 0 ? Sums{} : columns_, columns_, columns);
        return columns_;
    }

    template <class RowOf>
    Sums addBlock(int64_t y, ptrdiff_t columns, RowOf rowOf) {
        const int64_t inBlock = y % height_;
        if (inBlock == 0) {
            // Of those that begin below the tile only the last is kept.
            for (int64_t i = height_ - 1; i >= 0; --i)
                kernels::correlation::addRow(rowOf(y + i, 0),
                                             i == height_ - 1 ? Sums{} : row(ends_, std::min(i + 1, kept_)),
                                             row(ends_, std::min(i, kept_)), columns);
            return ends_;
        }
        kernels::correlation::addRow(rowOf(y + height_ - 1, 0), inBlock == 1 ? Sums{} : entered_, entered_, columns);
        kernels::correlation::joinSums(row(ends_, inBlock), entered_, columns_, columns);
        return columns_;
    }

    Kind kind_;
    int64_t height_, span_, kept_, pitch_ = 0;
    bool isExact_;
    Sums columns_{}, windows_{}, entered_{}, ends_{};
    Cell* spans_ = nullptr;
};

}  // namespace qori::matching
