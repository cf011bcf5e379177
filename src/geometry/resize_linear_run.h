// SPDX-License-Identifier: Apache-2.0
// Tiles of linear 8u in fixed point.
#pragma once
#include "kernels/resize/linear.h"
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
          tables_(buffer.take<uint8_t>(int64_t{padded_} / 8 * kernels::Gather::kLaneBytes)),
          weights_(buffer.take<int16_t>(padded_)),
          pair_(buffer, padded_) {}

    void run(Image<const uint8_t> src, Image<uint8_t> dst, Sides open) {
        source_.open(src, open);
        rows_.open(source_);
        const kernels::Gather gather = buildTables();
        const bool coarse = kernels::makeCoarse(weights_, padded_);
        const ResizePlan& plan = source_.plan;
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

    /// A row of weight 0 is not needed.
    Between between(int32_t y) const {
        const ResizePlan& plan = source_.plan;
        const int32_t position = source_.tile.y + y, index = plan.index(plan.vertical, position);
        const bool needsSecond = plan.table<int32_t>(plan.vertical.weightTable)[position] != 0;
        return {source_.rows.clamp(index), source_.rows.clamp(index + needsSecond)};
    }

    kernels::Gather buildTables() const {
        const ResizePlan& plan = source_.plan;
        const auto* pairs = plan.table<int32_t>(plan.horizontal.weightTable) + source_.tile.x;
        auto* offsets = reinterpret_cast<int32_t*>(tables_);
        const auto place = [&](ptrdiff_t i, int32_t first, int32_t second, int16_t weight) {
            const ptrdiff_t at = kernels::linearOrder(i);
            offsets[2 * at] = first;
            offsets[2 * at + 1] = second;
            weights_[at] = weight;
        };
        const Range& legal = source_.columns;
        ptrdiff_t i = 0;
        int32_t first = 0, second = 0;
        int16_t weight = 0;
        for (int32_t x = 0; x < source_.tile.width; ++x) {
            const int32_t index = plan.index(plan.horizontal, source_.tile.x + x);
            first = (legal.clamp(index) - legal.first) * channels;
            second = (legal.clamp(index + 1) - legal.first) * channels;
            weight = static_cast<int16_t>(-2 * (pairs[x] >> 16));
            for (int c = 0; c < channels; ++c, ++i) place(i, first + c, second + c, weight);
        }
        for (; i < padded_; ++i) place(i, first, second, weight);
        kernels::Gather gather = kernels::buildGather(tables_, padded_ / 16, rows_.bytes());
        kernels::compareWeights(gather, weights_);
        return gather;
    }

    TileSource<uint8_t, channels> source_;
    GatherRows<uint8_t, channels> rows_;
    ptrdiff_t elements_, padded_;
    uint8_t* tables_;
    int16_t* weights_;
    RowPair<int16_t> pair_;
};

}  // namespace qori::geometry
