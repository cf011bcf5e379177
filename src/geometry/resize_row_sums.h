// SPDX-License-Identifier: Apache-2.0
// The destination rows of a strip from filtered source rows, whatever way filters them.
#pragma once
#include "kernels/resize/taps_columns.h"
#include "resize_rows.h"
#include "resize_totals.h"

namespace qori::geometry {

/// Filters one or more rows of a sequence into the ring.
struct NextRows {
    void (*filter)(void* rows, RowSequence& sequence, Ring& ring);
    void* rows;
};

template <class T>
class RowSums {
public:
    RowSums() = default;
    RowSums(const ResizePlan& plan, int32_t height, int32_t rowsAtOnce, int64_t elements, WorkBuffer& buffer)
        : ring_(buffer, rowsInUse(plan) + rowsAtOnce - 1, static_cast<ptrdiff_t>(roundUp(elements, kBlock))),
          tapRows_(buffer.take<const float*>(ring_.rows())) {
        if (hasLongRows(plan)) totals_ = RowTotals(plan, height, ring_.step(), buffer);
    }

    void run(const VerticalSource& source, NextRows next, Image<T> dst, ptrdiff_t elements) {
        for (int32_t i = 0; i < ring_.rows(); ++i) kernels::fillUpBlock(ring_.row(i), elements);
        ring_.filtered = 0;
        RowSequence sequence(source.plan, source.tile, source.rows);
        const kernels::ColumnFinish finish{rowScale(source.plan), source.plan.bounded != 0};
        const auto filterNext = [&] { next.filter(next.rows, sequence, ring_); };
        if (!hasLongRows(source.plan)) return sumRows(source, filterNext, finish, dst, elements);
        totals_.run(source, ring_, elements, filterNext, [&](int32_t y, const double* totals) {
            kernels::finishTotals(totals, finish, dst.row(y), elements);
        });
    }

private:
    static constexpr int kBlock = std::max(kernels::kTapBlock, kernels::PhaseFilter::kBlock);

    template <class FilterNext>
    void sumRows(const VerticalSource& source, FilterNext filterNext, kernels::ColumnFinish finish, Image<T> dst,
                 ptrdiff_t elements) {
        const auto& [plan, tile, legal] = source;
        const bool pairs = makesPairs(plan);
        Needed needed;
        for (int32_t y = 0; y < tile.height;) {
            const int32_t position = tile.y + y, tap = plan.firstTap(plan.vertical, position);
            const bool isPair = pairs && y + 1 < tile.height;
            const int32_t shift = isPair ? plan.firstTap(plan.vertical, position + 1) - tap : 0;
            const int32_t count = plan.tapsOfRow(position);
            const int32_t more = isPair ? plan.tapsOfRow(position + 1) - count : 0;
            const int32_t all = count + shift + more;
            const int32_t first = legal.clamp(tap), last = legal.clamp(tap + all - 1);
            needed.reach(first, last);
            while (ring_.filtered < needed.rows) filterNext();
            listTapRows(legal, tap, all, first, (needed.rows - (last - first + 1)) % ring_.rows());
            float fractions[2][2];
            const kernels::PairedTaps taps{plan.weights(plan.vertical, position, fractions[0]),
                                           isPair ? plan.weights(plan.vertical, position + 1, fractions[1]) : nullptr,
                                           count, shift, more};
            kernels::filterColumn<T>(tapRows_, taps, finish, dst.row(y), isPair ? dst.row(y + 1) : nullptr, elements);
            y += isPair ? 2 : 1;
        }
    }

    /// The rows that have been needed so far, counted like those in the ring.
    struct Needed {
        int32_t rows = 0, last = INT32_MIN;

        /// Source rows first to last, neither before those of earlier calls.
        void reach(int32_t first, int32_t upTo) {
            rows += upTo - (first > last ? first - 1 : last);
            last = upTo;
        }
    };

    /// Points taps at the ring's rows, of which source row `first` lies in `place`.
    void listTapRows(Range legal, int32_t tap, int32_t count, int32_t first, int32_t place) const {
        for (int32_t k = 0; k < count; ++k) tapRows_[k] = ring_.row(place + legal.clamp(tap + k) - first);
    }

    Ring ring_;
    const float** tapRows_ = nullptr;
    RowTotals totals_;
};

}  // namespace qori::geometry
