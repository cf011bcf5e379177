// SPDX-License-Identifier: Apache-2.0
#include "warp_run.h"

namespace qori::geometry {
namespace {

using kernels::WarpBox;

/// Rows that are made strip by strip.
constexpr int32_t kBandRows = 32;

class TileRun {
public:
    TileRun(const WarpPlan& plan, bool isNearest, const kernels::WarpKernels& kernels, const WarpImages& images,
            Tile tile)
        : plan_(plan),
          geometry_(plan, isNearest),
          kernels_(kernels),
          images_(images),
          tile_(tile),
          inside_(kernels.inside) {
        const int32_t width = plan.src.width, height = plan.src.height;
        const bool isCubic = !isNearest && plan.interpolation == interpCubic;
        const bool readsAround = isCubic && plan.border == WarpBorder::none;
        source_ = {images.src, images.srcStep, 0, 0, width - 1, height - 1, &plan.cubic, ahead()};
        rectangle_ = geometry_.rectangle();
        const double unit = kernels::unitOfBias(geometry_.bias());
        fast_ = {static_cast<double>(kernels.left), static_cast<double>(kernels.top), width - kernels.right - unit,
                 height - kernels.bottom - unit};
        if (readsAround) {
            source_ = {images.src, images.srcStep, -1, -1, width + 1, height + 1, &plan.cubic, ahead()};
            fast_ = rectangle_;
        }
        isNear_ = geometry_.bias() == kernels::kFineBias &&
                  int64_t{width} * images.pixelBytes >= kernels::kNearRowBytes && isWithin32Bits();
        if (geometry_.isFixed() && isNear_ && kernels.fixed != nullptr && -kernels::kFixedLength < images.srcStep &&
            images.srcStep < kernels::kFixedLength) {
            inside_ = kernels.fixed;
            fast_.left += kernels::kFixedMargin;
            fast_.top += kernels::kFixedMargin;
            fast_.right -= kernels::kFixedMargin;
            fast_.bottom -= kernels::kFixedMargin;
        }
        if (isCubic)
            any_ = {-3, -3, width + 2.0, height + 2.0};
        else if (isNearest)
            any_ = {0, 0, width - unit, height - unit};
        else if (isNear_ && plan.dataType != qor64f)
            any_ = {0, 0, width - 1 - unit, height - 1 - unit};
        else
            any_ = {0, 0, width - 1.0, height - 1.0};
    }

    void run() {
        for (int32_t y = 0; y < tile_.height; y += kBandRows) {
            const int32_t rows = tile_.height - y < kBandRows ? tile_.height - y : kBandRows;
            for (int32_t i = 0; i < rows; ++i) prepare(rows_[i], y + i);
            const int64_t end = int64_t{tile_.x} + tile_.width, width = stripWidth();
            for (int64_t x = tile_.x; x < end; x += width) {
                const int64_t next = x + width < end ? x + width : end;
                for (int32_t i = 0; i < rows; ++i)
                    make(rows_[i], {static_cast<int32_t>(x), static_cast<int32_t>(next)});
            }
        }
    }

private:
    struct Row {
        kernels::WarpLine line;
        WarpSpan written, fast;  ///< Pixels that the source gives, and those whose windows lie inside it.
        uint8_t* dst;            ///< Column 0 of the destination, were it in the tile.
    };

    /// The offsets of all pixels, and of those around the source that may be read.
    bool isWithin32Bits() const {
        const int64_t step = images_.srcStep < 0 ? -int64_t{images_.srcStep} : images_.srcStep;
        return step * (int64_t{plan_.src.height} + 2) + (int64_t{plan_.src.width} + 3) * images_.pixelBytes <=
               INT32_MAX;
    }

    /// Strips touch some cache lines of each source row that they cross, for as many rows of the band as share them:
    /// they are as narrow as keeps these lines in the first-level cache and in reach of the address cache.
    int64_t stripWidth() const {
        constexpr int32_t kBlock = 16, kLeast = 64, kMost = 1 << 20;
        constexpr double kLines = 256, kLineBytes = 64, kFewRows = 64, kManyRows = 128;
        const double rows = kLines / (1 + kBandRows * images_.pixelBytes / kLineBytes);
        const double most = rows < kFewRows ? kFewRows : rows < kManyRows ? rows : kManyRows;
        const double slope = __builtin_fabs(plan_.backward.yx);
        return slope * kMost <= most    ? kMost
               : slope * kLeast >= most ? kLeast
                                        : static_cast<int32_t>(most / slope) / kBlock * kBlock;
    }

    /// Kernels prefetch for a row this far below; 0 where that is not worth an address.
    ptrdiff_t ahead() const {
        constexpr double kRows = 8, kMost = 1 << 28;
        const double down = __builtin_rint(kRows * plan_.backward.yy),
                     across = __builtin_rint(kRows * plan_.backward.xy);
        const double bytes = down * images_.srcStep + across * images_.pixelBytes;
        return __builtin_fabs(bytes) <= kMost ? static_cast<ptrdiff_t>(bytes) : 0;
    }

    void prepare(Row& row, int32_t y) {
        const WarpSpan columns{tile_.x, tile_.x + tile_.width};
        row.line = geometry_.line(tile_.y + y);
        row.written = plan_.border == WarpBorder::replicate ? columns : geometry_.within(row.line, rectangle_, columns);
        const bool hasFast = isNear_ && inside_ != kernels_.anywhere;
        row.fast = hasFast ? geometry_.within(row.line, fast_, row.written) : WarpSpan{columns.first, columns.first};
        row.dst = images_.dst + ptrdiff_t{y} * images_.dstStep - ptrdiff_t{tile_.x} * images_.pixelBytes;
        if (plan_.border != WarpBorder::constant) return;
        if (row.written.isEmpty()) row.written = {columns.end, columns.end};
        fill(row, {columns.first, row.written.first});
        fill(row, {row.written.end, columns.end});
    }

    uint8_t* pixel(const Row& row, int32_t x) const { return row.dst + ptrdiff_t{x} * images_.pixelBytes; }

    void fill(const Row& row, WarpSpan span) const {
        if (!span.isEmpty())
            kernels::fillRow(pixel(row, span.first), plan_.fill,
                             (ptrdiff_t{span.end} - span.first) * images_.pixelBytes);
    }

    void make(const Row& row, WarpSpan strip) const {
        const auto cut = [](WarpSpan span, WarpSpan by) {
            return WarpSpan{span.first > by.first ? span.first : by.first, span.end < by.end ? span.end : by.end};
        };
        const auto run = [&](kernels::WarpKernel kernel, const WarpBox& box, WarpSpan span) {
            if (!span.isEmpty())
                kernel(source_, row.line, box, span.first, span.end - span.first, pixel(row, span.first));
        };
        const WarpSpan written = cut(row.written, strip), fast = cut(row.fast, written);
        const kernels::WarpKernel anywhere = isNear_ ? kernels_.anywhere : kernels_.far;
        if (fast.isEmpty()) return run(anywhere, any_, written);
        run(anywhere, any_, {written.first, fast.first});
        run(inside_, fast_, fast);
        run(anywhere, any_, {fast.end, written.end});
    }

    const WarpPlan& plan_;
    WarpGeometry geometry_;
    const kernels::WarpKernels& kernels_;
    const WarpImages& images_;
    Tile tile_;
    kernels::WarpSource source_;
    WarpBox rectangle_, fast_, any_;
    bool isNear_;
    kernels::WarpKernel inside_;
    Row rows_[kBandRows];
};

}  // namespace

void runWarpTile(const WarpPlan& plan, bool isNearest, const kernels::WarpKernels& kernels, const WarpImages& images,
                 Tile tile) {
    TileRun(plan, isNearest, kernels, images, tile).run();
}

}  // namespace qori::geometry
