// SPDX-License-Identifier: Apache-2.0
// Tiles of linear 64f.
#pragma once
#include "kernels/resize/doubles.h"
#include "resize_run.h"

namespace qori::geometry {

/// Linear 64f: the fractions are found again from the stored indices, as the plan holds them in single precision only.
template <int channels>
class DoubleLinearTile {
public:
    DoubleLinearTile(const ResizePlan& plan, Tile tile, WorkBuffer& buffer)
        : source_{plan, tile},
          elements_(ptrdiff_t{tile.width} * channels),
          padded_(static_cast<ptrdiff_t>(roundUp(elements_, kernels::kDoubles))),
          fractions_(buffer.take<double>(padded_)),
          places_{buffer.take<int32_t>(padded_), buffer.take<int32_t>(padded_)},
          pair_(buffer, padded_) {}

    void run(Image<const double> src, Image<double> dst, Sides open) {
        source_.open(src, open);
        listElements();
        const ResizePlan& plan = source_.plan;
        const Tile& tile = source_.tile;
        for (int32_t y = 0; y < tile.height; ++y) {
            const int32_t index = plan.index(plan.vertical, tile.y + y);
            const int32_t first = source_.rows.clamp(index), second = source_.rows.clamp(index + 1);
            pair_.provide(first, second, [&](int32_t row, double* out) {
                kernels::linearRow64f<channels>(source_.at(row, source_.columns.first), places_, fractions_, padded_,
                                                out);
            });
            kernels::linearColumn64f(pair_.first(), pair_.second(first == second), fraction(plan.vertical, tile.y + y),
                                     dst.row(y), elements_);
        }
    }

private:
    double fraction(const Axis& axis, int32_t position) const {
        return __builtin_fma(position + 0.5, axis.ratio(), -0.5) - source_.plan.index(axis, position);
    }

    /// Where each element's neighbours lie in a row, in bytes from its first legal column; those behind the last repeat
    /// it.
    void listElements() const {
        const Range& legal = source_.columns;
        const Axis& axis = source_.plan.horizontal;
        ptrdiff_t i = 0;
        for (int32_t x = 0; x < source_.tile.width; ++x) {
            const int32_t index = source_.plan.index(axis, source_.tile.x + x);
            const double f = fraction(axis, source_.tile.x + x);
            for (int c = 0; c < channels; ++c, ++i) {
                fractions_[i] = f;
                for (int k = 0; k < 2; ++k)
                    places_[k][i] = ((legal.clamp(index + k) - legal.first) * channels + c) * elementBytes<double>;
            }
        }
        for (; i < padded_; ++i) {
            fractions_[i] = fractions_[i - 1];
            for (int32_t* places : places_) places[i] = places[i - 1];
        }
    }

    TileSource<double, channels> source_;
    ptrdiff_t elements_, padded_;
    double* fractions_;
    int32_t* places_[2];
    RowPair<double> pair_;
};

}  // namespace qori::geometry
