// SPDX-License-Identifier: Apache-2.0
// Tiles of the weighted forms in single precision: linear, cubic, Lanczos, super and antialiasing.
#pragma once
#include "kernels/resize/taps_columns.h"
#include "resize_rows.h"
#include "resize_totals.h"

namespace qori::geometry {

/// Filters rows by `Rows` and sums up what the columns ask for.
template <class T, int channels, class Rows>
class TapsTile {
public:
    TapsTile(const ResizePlan& plan, Tile tile, WorkBuffer& buffer) : source_{plan, tile}, rows_(source_, buffer) {
        stripPixels_ = std::min({tile.width, rows_.stripPixels(), hasLongRows(plan) ? longStripPixels() : INT32_MAX});
        ring_ = Ring(buffer, rowsInUse(plan) + Rows::kAtOnce - 1,
                     static_cast<ptrdiff_t>(roundUp(int64_t{stripPixels_} * channels, kBlock)));
        tapRows_ = buffer.take<const float*>(ring_.rows());
        if (hasLongRows(plan)) totals_ = RowTotals(plan, tile.height, ring_.step(), buffer);
    }
    TapsTile(const TapsTile&) = delete;
    TapsTile& operator=(const TapsTile&) = delete;

    void run(Image<const T> src, Image<T> dst, Sides open) {
        source_.open(src, open);
        rows_.begin();
        for (int32_t x = 0; x < source_.tile.width; x += stripPixels_) {
            const int32_t rest = source_.tile.width - x;
            runStrip(dst, x, rest < stripPixels_ ? rest : stripPixels_);
        }
    }

private:
    static constexpr int kBlock = std::max(kernels::kTapBlock, kernels::PhaseFilter::kBlock);

    /// Such that the totals of a strip stay in the second-level cache.
    int32_t longStripPixels() const {
        constexpr int32_t kTotals = 32768;
        return wholeChunks(kTotals / RowTotals::most(source_.plan) / channels);
    }

    void runStrip(Image<T> dst, int32_t x, int32_t width) {
        const ResizePlan& plan = source_.plan;
        rows_.beginStrip(x, width);
        const ptrdiff_t at = ptrdiff_t{x} * channels * elementBytes<T>, elements = ptrdiff_t{width} * channels;
        for (int32_t i = 0; i < ring_.rows(); ++i) kernels::fillUpBlock(ring_.row(i), elements);
        ring_.filtered = 0;
        RowSequence sequence(plan, source_.tile, source_.rows);
        const kernels::ColumnFinish finish{rowScale(plan), plan.bounded != 0};
        if (!hasLongRows(plan)) return sumRows(sequence, finish, {advance(dst.data, at), dst.step}, elements);
        totals_.run(
            source_, ring_, elements, [&] { rows_.filterNext(sequence, ring_); },
            [&](int32_t y, const double* totals) {
                kernels::finishTotals(totals, finish, advance(dst.row(y), at), elements);
            });
    }

    void sumRows(RowSequence& sequence, kernels::ColumnFinish finish, Image<T> dst, ptrdiff_t elements) {
        const ResizePlan& plan = source_.plan;
        const Tile& tile = source_.tile;
        const bool pairs = makesPairs(plan);
        Needed needed;
        for (int32_t y = 0; y < tile.height;) {
            const int32_t position = tile.y + y, tap = plan.firstTap(plan.vertical, position);
            const bool isPair = pairs && y + 1 < tile.height;
            const int32_t shift = isPair ? plan.firstTap(plan.vertical, position + 1) - tap : 0;
            const int32_t count = plan.tapsOfRow(position);
            const int32_t more = isPair ? plan.tapsOfRow(position + 1) - count : 0;
            const int32_t all = count + shift + more;
            const int32_t first = source_.rows.clamp(tap), last = source_.rows.clamp(tap + all - 1);
            needed.reach(first, last);
            while (ring_.filtered < needed.rows) rows_.filterNext(sequence, ring_);
            listTapRows(tap, all, first, (needed.rows - (last - first + 1)) % ring_.rows());
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
    void listTapRows(int32_t tap, int32_t count, int32_t first, int32_t place) const {
        for (int32_t k = 0; k < count; ++k) tapRows_[k] = ring_.row(place + source_.rows.clamp(tap + k) - first);
    }

    TileSource<T, channels> source_;
    Rows rows_;
    int32_t stripPixels_;
    Ring ring_;
    const float** tapRows_;
    RowTotals totals_;
};

}  // namespace qori::geometry
