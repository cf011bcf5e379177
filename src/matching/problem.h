// SPDX-License-Identifier: Apache-2.0
// What a cross-correlation has to do: placements of a template over a source, and which of them have results.
#pragma once
#include <algorithm>
#include <cstdint>

#include "frame/plan.h"
#include "image/image.h"
#include "kernels/correlation/finish.h"

namespace qori::matching {

using kernels::correlation::Kind;

/// Placements that overlap the source, that lie inside it, or whose template centre does.
enum class Shape { full, valid, same };

/// Who chooses between direct sums and transforms.
enum class Hint { none, transform, direct };

struct Problem {
    QorImageSize src, tpl;
    Shape shape;
    Kind kind;
    Hint hint = Hint::none;

    int64_t area() const { return int64_t{tpl.width} * tpl.height; }
    int64_t width() const { return extent(src.width, tpl.width); }
    int64_t height() const { return extent(src.height, tpl.height); }
    /// Results (x, y) are those of the placement at (x - left(), y - top()) of the source.
    int64_t left() const { return margin(tpl.width); }
    int64_t top() const { return margin(tpl.height); }

private:
    int64_t extent(int64_t source, int64_t length) const {
        return shape == Shape::full ? source + length - 1 : shape == Shape::same ? source : source - length + 1;
    }
    int64_t margin(int64_t length) const {
        return shape == Shape::full ? length - 1 : shape == Shape::same ? length / 2 : 0;
    }
};

/// Some results together, and the patch of the source that their windows cover.
struct Tile {
    int64_t x, y, width, height;
};

/// One channel of the images of a call.
template <class T, class D>
struct Channel {
    const Problem& problem;
    Image<const T> src, tpl;
    Image<D> dst;
    int channels;
    int32_t scale;

    kernels::correlation::RowSpan span(const Tile& tile, int64_t total) const {
        const int64_t first = tile.x - problem.left(), width = problem.src.width;
        const int64_t before = std::clamp<int64_t>(-first, 0, total);
        const int64_t inside = std::clamp<int64_t>(width - std::max<int64_t>(first, 0), 0, total - before);
        return {static_cast<ptrdiff_t>(before), static_cast<ptrdiff_t>(inside),
                static_cast<ptrdiff_t>(total - before - inside)};
    }
    /// The first element of a patch's row that is inside the source; null, and an empty span, above and below it.
    const T* patchRow(const Tile& tile, int64_t row, kernels::correlation::RowSpan& span) const {
        const int64_t y = tile.y + row - problem.top(), x = std::max<int64_t>(tile.x - problem.left(), 0);
        if (y >= 0 && y < problem.src.height && span.inside > 0)
            return src.row(static_cast<int32_t>(y)) + static_cast<ptrdiff_t>(x) * channels;
        span = {span.total(), 0, 0};
        return nullptr;
    }
    void store(const Tile& tile, int64_t row, const double* results) const {
        D* const to = dst.row(static_cast<int32_t>(tile.y + row)) + static_cast<ptrdiff_t>(tile.x) * channels;
        kernels::correlation::storeRow(results, scale, to, channels, static_cast<ptrdiff_t>(tile.width));
    }
};

}  // namespace qori::matching
