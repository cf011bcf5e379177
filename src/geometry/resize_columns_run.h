// SPDX-License-Identifier: Apache-2.0
// Tiles of antialiasing plans that reduce the height and not the width: columns are summed first, of rows as they lie
// in the source, and only the few rows that are left are filtered along their length.
#pragma once
#include "resize_rows.h"

namespace qori::geometry {

template <class T, int channels>
class ColumnsFirstTile {
public:
    /// By the sums that a source row's height of one destination column takes in either order, where they differ by so
    /// much that it pays: 1.6 to 3.3 times from 1000x4000 to 2000x500, 90 times from 16x8000 to 8000x16.
    static bool suits(const ResizePlan& plan) {
        const Axis &x = plan.horizontal, &y = plan.vertical;
        if (plan.antialiasing == 0 || x.ratio() > 1 || y.ratio() <= 1) return false;
        const double rowsFirst = y.ratio() * plan.columnTaps + plan.rowTaps;
        const double columnsFirst = x.ratio() * plan.rowTaps + plan.columnTaps;
        return rowsFirst > 2 * columnsFirst;
    }

    ColumnsFirstTile(const ResizePlan& plan, Tile tile, WorkBuffer& buffer)
        : source_{plan, tile}, lines_(source_, buffer, kStripElements) {
        stripPixels_ = std::min(tile.width, lines_.stripPixels());
        const int64_t columns = lines_.columnsOf(stripPixels_) + kernels::LineFilter::kOverrun;
        const auto step = static_cast<ptrdiff_t>(roundUp(columns * channels, kernels::kTapBlock));
        ring_ = Ring(buffer, kernels::kTapsPerBlock, step);
        totals_ = RowTotals(plan, tile.height, step, buffer);
        sums_ = buffer.take<float>(step);
        filtered_ = buffer.take<float>(roundUp(int64_t{stripPixels_} * channels, kernels::kTapBlock));
    }
    ColumnsFirstTile(const ColumnsFirstTile&) = delete;
    ColumnsFirstTile& operator=(const ColumnsFirstTile&) = delete;

    void run(Image<const T> src, Image<T> dst, Sides open) {
        source_.open(src, open);
        lines_.begin();
        for (int32_t x = 0; x < source_.tile.width; x += stripPixels_)
            runStrip(dst, x, std::min(source_.tile.width - x, stripPixels_));
    }

private:
    /// All source rows pass for each strip, so that long ones pay although their tables fill the second-level cache.
    static constexpr int32_t kStripElements = 8192;

    void runStrip(Image<T> dst, int32_t x, int32_t width) {
        lines_.beginStrip(x, width);
        ring_.filtered = 0;
        RowSequence sequence(source_.plan, source_.tile, source_.rows);
        const ptrdiff_t at = ptrdiff_t{x} * channels * elementBytes<T>, elements = ptrdiff_t{width} * channels;
        const ptrdiff_t sums = lines_.lineElements();
        kernels::fillUpBlock(filtered_, elements);
        totals_.run(
            source_.vertical(), ring_, sums, [&] { lines_.expand(sequence.next(), ring_.next()); },
            [&](int32_t y, const double* totals) {
                kernels::finishTotals(totals, {1, true}, sums_, sums);
                lines_.filter(sums_, filtered_);
                constexpr float kOne = 1;
                const float* const row = filtered_;
                const kernels::PairedTaps taps{&kOne, nullptr, 1, 0};
                kernels::filterColumn<T>(&row, taps, {1, source_.plan.bounded != 0}, advance(dst.row(y), at), nullptr,
                                         elements);
            });
    }

    TileSource<T, channels> source_;
    LineRows<T, channels> lines_;
    int32_t stripPixels_;
    Ring ring_;
    RowTotals totals_;
    float *sums_, *filtered_;
};

}  // namespace qori::geometry
