// SPDX-License-Identifier: Apache-2.0
// Tiles of the weighted forms in single precision: linear, cubic, Lanczos, super and antialiasing.
#pragma once
#include "resize_row_sums.h"

namespace qori::geometry {

/// Filters rows by `Rows` and sums up what the columns ask for.
template <class T, int channels, class Rows>
class TapsTile {
public:
    TapsTile(const ResizePlan& plan, Tile tile, WorkBuffer& buffer) : source_{plan, tile}, rows_(source_, buffer) {
        stripPixels_ = std::min({tile.width, rows_.stripPixels(), hasLongRows(plan) ? longStripPixels() : INT32_MAX});
        sums_ = RowSums<T>(plan, tile.height, Rows::kAtOnce, int64_t{stripPixels_} * channels, buffer);
    }
    TapsTile(const TapsTile&) = delete;
    TapsTile& operator=(const TapsTile&) = delete;

    void run(Image<const T> src, Image<T> dst, Sides open) {
        source_.open(src, open);
        rows_.begin();
        for (int32_t x = 0; x < source_.tile.width; x += stripPixels_) {
            const int32_t rest = source_.tile.width - x, width = rest < stripPixels_ ? rest : stripPixels_;
            rows_.beginStrip(x, width);
            const ptrdiff_t at = ptrdiff_t{x} * channels * elementBytes<T>;
            sums_.run(source_.vertical(), nextRows(), {advance(dst.data, at), dst.step}, ptrdiff_t{width} * channels);
        }
    }

private:
    /// Such that the totals of a strip stay in the second-level cache.
    int32_t longStripPixels() const {
        constexpr int32_t kTotals = 32768;
        return wholeChunks(kTotals / RowTotals::most(source_.plan) / channels);
    }
    NextRows nextRows() {
        const auto filter = [](void* rows, RowSequence& sequence, Ring& ring) {
            static_cast<Rows*>(rows)->filterNext(sequence, ring);
        };
        return {filter, &rows_};
    }

    TileSource<T, channels> source_;
    Rows rows_;
    int32_t stripPixels_;
    RowSums<T> sums_;
};

}  // namespace qori::geometry
