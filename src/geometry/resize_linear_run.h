// SPDX-License-Identifier: Apache-2.0
// Tiles of linear 8u in fixed point.
#pragma once
#include "kernels/resize_linear.h"
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

    void run(Image<const uint8_t> src, Image<uint8_t> dst, OpenSides open) {
        source_.open(src, open);
        rows_.open(source_);
        const kernels::Gather gather = buildTables();
        const ResizePlan& plan = source_.plan;
        const Tile& tile = source_.tile;
        const auto* weights = plan.table<int32_t>(plan.vertical.weightTable);
        for (int32_t y = 0; y < tile.height; ++y) {
            const int32_t index = plan.index(plan.vertical, tile.y + y), w = weights[tile.y + y];
            // A row of weight 0 is not needed.
            const int32_t first = source_.rows.clamp(index), second = w == 0 ? first : source_.rows.clamp(index + 1);
            pair_.provide(first, second, [&](int32_t row, int16_t* out) {
                kernels::linearRow8u(gather, rows_.row(row), weights_, out);
            });
            kernels::linearColumn8u(pair_.first(), pair_.second(first == second), w, dst.row(y), elements_);
        }
    }

private:
    kernels::Gather buildTables() const {
        const ResizePlan& plan = source_.plan;
        const auto* pairs = plan.table<int32_t>(plan.horizontal.weightTable) + source_.tile.x;
        auto* offsets = reinterpret_cast<int32_t*>(tables_);
        const auto place = [&](ptrdiff_t i, int32_t first, int32_t second, int32_t w) {
            const ptrdiff_t at = kernels::linearOrder(i);
            offsets[2 * at] = first;
            offsets[2 * at + 1] = second;
            weights_[at] = static_cast<int16_t>(-2 * w);
        };
        const Range& legal = source_.columns;
        ptrdiff_t i = 0;
        int32_t first = 0, second = 0;
        for (int32_t x = 0; x < source_.tile.width; ++x) {
            const int32_t index = plan.index(plan.horizontal, source_.tile.x + x), w = pairs[x] >> 16;
            first = (legal.clamp(index) - legal.first) * channels;
            second = (legal.clamp(index + 1) - legal.first) * channels;
            for (int c = 0; c < channels; ++c, ++i) place(i, first + c, second + c, w);
        }
        for (; i < padded_; ++i) place(i, first, second, 0);
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
