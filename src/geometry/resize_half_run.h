// SPDX-License-Identifier: Apache-2.0
// Tiles of linear and super-sampling resizes that halve both lengths: every pixel is the mean of four, no border is met
// and no table is needed. The results are those of the general ways, bit for bit, at 2.0 to 2.4 times their rate.
#pragma once
#include "kernels/resize/half.h"
#include "resize_run.h"

namespace qori::geometry {

template <class T, int channels>
class HalfTile {
public:
    static constexpr bool exists = std::is_same_v<T, uint8_t> || (std::is_same_v<T, float> && channels == 1);

    static bool suits(const ResizePlan& plan) {
        const auto halves = [](const Axis& axis) { return axis.sourceReduced == 2 && axis.targetReduced == 1; };
        const bool kind = plan.interpolation == interpSuper || plan.interpolation == interpLinear;
        return kind && plan.antialiasing == 0 && halves(plan.horizontal) && halves(plan.vertical);
    }

    HalfTile(const ResizePlan& plan, Tile tile, WorkBuffer&) : source_{plan, tile} {}

    void run(Image<const T> src, Image<T> dst, Sides) {
        source_.place(src);
        const Tile& tile = source_.tile;
        const bool isSuper = source_.plan.interpolation == interpSuper;
        for (int32_t y = 0; y < tile.height; ++y) {
            const T* upper = source_.at(2 * (tile.y + y), 2 * tile.x);
            const T* lower = source_.at(2 * (tile.y + y) + 1, 2 * tile.x);
            const ptrdiff_t later = y + 1 < tile.height ? 2 * source_.image.step : 0;
            if constexpr (std::is_same_v<T, float>)
                kernels::halveRow32f(upper, lower, later, dst.row(y), tile.width, isSuper ? 1.0f : 0.5f,
                                     isSuper ? 0.25f : 1.0f);
            else
                kernels::halveRow8u<channels>(upper, lower, later, dst.row(y), tile.width, isSuper);
        }
    }

private:
    TileSource<T, channels> source_;
};

}  // namespace qori::geometry
