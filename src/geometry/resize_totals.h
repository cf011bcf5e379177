// SPDX-License-Identifier: Apache-2.0
// Destination rows of many taps: filtered source rows are added to the totals of the destination rows that need them,
// a block of taps at a time, and forgotten. Blocks are counted from a destination row's own first tap, so that tiles
// agree.
#pragma once
#include <algorithm>

#include "frame/row_window.h"
#include "kernels/resize/taps_columns.h"
#include "resize_run.h"

namespace qori::geometry {

/// Filtered rows, the last few of them, counted from the strip's first.
class Ring {
public:
    Ring() = default;
    Ring(WorkBuffer& buffer, int32_t rows, ptrdiff_t step)
        : ring_{asBytes(buffer.take<float>(int64_t{rows} * step)), step * elementBytes<float>, rows}, step_(step) {}

    int32_t rows() const { return ring_.rows; }
    ptrdiff_t step() const { return step_; }
    float* row(int32_t place) const { return reinterpret_cast<float*>(ring_.row(place % ring_.rows)); }
    float* next() { return row(filtered++); }

    int32_t filtered = 0;

private:
    RowRing ring_{};
    ptrdiff_t step_ = 0;
};

class RowTotals {
public:
    RowTotals() = default;
    RowTotals(const ResizePlan& plan, int32_t height, ptrdiff_t step, WorkBuffer& buffer)
        : slots_(std::min(most(plan), height)),
          step_(step),
          totals_(buffer.take<double>(slots_ * int64_t{step})),
          next_(buffer.take<int32_t>(slots_)) {}

    /// Destination rows that are begun and not done: of two that are m apart, the later begins before the earlier ends
    /// only if m * ratio < taps.
    static int32_t most(const ResizePlan& plan) {
        return static_cast<int32_t>(plan.rowTaps / plan.vertical.ratio()) + 2;
    }

    /// Makes a strip of the tile. Calls filterNext() for rows in the ring, from the tile's first on, and
    /// finish(y, totals) for each destination row.
    template <class FilterNext, class Finish>
    void run(const VerticalSource& source, Ring& ring, ptrdiff_t elements, FilterNext filterNext, Finish finish) {
        const ResizePlan& plan = source.plan;
        const Tile& tile = source.tile;
        const int32_t begin = source.rows.clamp(plan.firstTap(plan.vertical, tile.y));
        int32_t started = 0, due = begin;  // no block ends before source row `due`
        for (int32_t y = 0; y < tile.height;) {
            filterNext();
            const int32_t last = begin + ring.filtered - 1;
            if (last < due) continue;
            due = INT32_MAX;
            for (int32_t i = y; i < tile.height; ++i) {
                int32_t& next = next_[i % slots_];
                if (i == started) next = 0, ++started;
                const int32_t count = plan.tapsOfRow(tile.y + i);
                const int32_t wanted = begin + addBlocks(source, ring, i, count, last - begin, next, elements);
                if (next < count) due = std::min(due, wanted);
                if (next == 0) break;  // nor has any later one begun
                if (next < count) continue;
                finish(i, totals_ + i % slots_ * step_);
                y = i + 1;
            }
        }
    }

private:
    /// Adds the blocks from tap `next` on of which all rows are there, up to `last` rows behind the ring's first.
    /// Returns the row that the next one waits for.
    int32_t addBlocks(const VerticalSource& source, const Ring& ring, int32_t y, int32_t count, int32_t last,
                      int32_t& next, ptrdiff_t elements) {
        const ResizePlan& plan = source.plan;
        const int32_t position = source.tile.y + y, tap = plan.firstTap(plan.vertical, position);
        const int32_t begin = source.rows.clamp(plan.firstTap(plan.vertical, source.tile.y));
        const auto place = [&](int32_t k) { return source.rows.clamp(tap + k) - begin; };
        float pair[2];
        const float* const weights = plan.weights(plan.vertical, position, pair);
        while (next < count) {
            const int32_t rest = count - next, taps = std::min(rest, kernels::kTapsPerBlock);
            const int32_t wanted = place(next + taps - 1);
            if (wanted > last) return wanted;
            const float* rows[kernels::kTapsPerBlock];
            for (int32_t k = 0; k < taps; ++k) rows[k] = ring.row(place(next + k));
            kernels::addToTotals(rows, weights + next, taps, next == 0, totals_ + y % slots_ * step_, elements);
            next += taps;
        }
        return last;
    }

    int32_t slots_ = 0;
    ptrdiff_t step_ = 0;
    double* totals_ = nullptr;
    int32_t* next_ = nullptr;
};

}  // namespace qori::geometry
