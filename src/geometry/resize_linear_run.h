// SPDX-License-Identifier: Apache-2.0
// Tiles of linear 8u in fixed point.
#pragma once
#include "kernels/resize/linear.h"
#include "kernels/resize/narrow.h"
#include "resize_run.h"

namespace qori::geometry {

template <int channels>
class FixedLinearTile {
public:
    FixedLinearTile(const ResizePlan& plan, Tile tile, WorkBuffer& buffer)
        : source_{plan, tile},
          rows_(buffer),
          elements_(ptrdiff_t{tile.width} * channels),
          padded_(static_cast<ptrdiff_t>(roundUp(elements_, 32))),
          tables_(buffer.take<uint8_t>(padded_ / 8 * int64_t{kernels::Gather::kLaneBytes})),
          weights_(buffer.take<int16_t>(padded_)),
          pair_(buffer, padded_) {}

    void run(Image<const uint8_t> src, Image<uint8_t> dst, Sides open) {
        source_.open(src, open);
        if constexpr (channels == 1)
            if (isNarrow()) return runNarrow(dst);
        rows_.open(source_);
        const ResizePlan& plan = source_.plan;
        kernels::Gather gather = kernels::buildPairs(tables_, columnPicks(source_), channels);
        const auto* pairs = plan.table<int32_t>(plan.horizontal.weightTable) + source_.tile.x;
        const bool coarse = kernels::listLinearWeights(gather, pairs, weights_);
        const auto* weights = plan.table<int32_t>(plan.vertical.weightTable) + source_.tile.y;
        const int32_t height = source_.tile.height;
        const bool enlarges = plan.vertical.ratio() < 1;
        for (int32_t y = 0; y < height; ++y) {
            const Between rows = between(y);
            pair_.provide(rows.first, rows.second, [&](int32_t row, int16_t* out) {
                const uint8_t* later = asBytes(source_.at(source_.rows.clamp(row + 1), source_.columns.first));
                kernels::linearRow8u(gather, {rows_.row(row), later}, weights_, coarse, out);
            });
            const int16_t *h0 = pair_.first(), *h1 = pair_.second(rows.first == rows.second);
            if (enlarges && y + 1 < height && between(y + 1) == rows) {
                kernels::linearColumns8u(h0, h1, weights + y, dst.row(y), dst.row(y + 1), elements_);
                ++y;
            } else {
                kernels::linearColumn8u(h0, h1, weights[y], dst.row(y), elements_);
            }
        }
    }

private:
    /// The source rows that a destination row lies between.
    struct Between {
        int32_t first, second;

        bool operator==(const Between&) const = default;
    };

    bool isNarrow() const {
        const Range& columns = source_.columns;
        return source_.tile.width <= kernels::kNarrowTarget && columns.last - columns.first < kernels::kNarrowSource;
    }

    void runNarrow(Image<uint8_t> dst) const {
        const ResizePlan& plan = source_.plan;
        const Tile& tile = source_.tile;
        const kernels::NarrowRows rows{plan.table<int32_t>(plan.vertical.indexTable) + tile.y,
                                       plan.table<int32_t>(plan.vertical.weightTable) + tile.y, tile.height,
                                       source_.rows.first, source_.rows.last};
        kernels::resizeNarrow8u(columnPicks(source_), plan.table<int32_t>(plan.horizontal.weightTable) + tile.x, rows,
                                {source_.at(0, source_.columns.first), source_.image.step}, dst);
    }

    /// A row of weight 0 is not needed.
    Between between(int32_t y) const {
        const ResizePlan& plan = source_.plan;
        const int32_t position = source_.tile.y + y, index = plan.index(plan.vertical, position);
        const bool needsSecond = plan.table<int32_t>(plan.vertical.weightTable)[position] != 0;
        return {source_.rows.clamp(index), source_.rows.clamp(index + needsSecond)};
    }

    TileSource<uint8_t, channels> source_;
    GatherRows<uint8_t, channels> rows_;
    ptrdiff_t elements_, padded_;
    uint8_t* tables_;
    int16_t* weights_;
    RowPair<int16_t> pair_;
};

}  // namespace qori::geometry
