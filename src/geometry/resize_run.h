// SPDX-License-Identifier: Apache-2.0
// Resizing one tile. Each way of doing it is a class that takes its memory from a work buffer in its constructor, so
// that the query for the buffer's size and the operation cannot disagree, and then runs.
#pragma once
#include "frame/border.h"
#include "kernels/resize/gather.h"
#include "kernels/resize/taps.h"
#include "resize_plan.h"
#include "tile.h"

namespace qori::geometry {

/// Indices that `count` positions are made of, within the source except on open sides. Every other index is as good as
/// the nearest of these.
inline Range tapRange(const ResizePlan& plan, const Axis& axis, int32_t position, int32_t count, bool openLow,
                      bool openHigh) {
    Range range{plan.firstTap(axis, position), plan.lastTap(axis, position + count - 1)};
    if (!openLow && range.first < 0) range.first = 0;
    if (!openHigh && range.last >= axis.sourceLength) range.last = axis.sourceLength - 1;
    return range;
}

/// What sums down the columns of a tile know of its source: the rows that may be read.
struct VerticalSource {
    const ResizePlan& plan;
    const Tile& tile;
    Range rows;
};

/// What the ways have in common: the tile, the source pixels that may be read, and access to rows by source index.
template <class T, int channels>
struct TileSource {
    const ResizePlan& plan;
    Tile tile;
    Range columns{}, rows{};
    Image<const T> image{};  ///< At pixel (0, 0) of the whole source.

    void open(Image<const T> src, Sides open) {
        columns = tapRange(plan, plan.horizontal, tile.x, tile.width, open.left, open.right);
        rows = tapRange(plan, plan.vertical, tile.y, tile.height, open.top, open.bottom);
        place(src);
    }
    /// For ways that read no pixel but those that the tile's own footprint covers.
    void place(Image<const T> src) {
        // Most tiles begin where the image does, and a division of 64 bits takes as long as a row of a small one.
        const ptrdiff_t x = tile.x == 0 ? 0 : sourceOffset(plan.horizontal, tile.x);
        const ptrdiff_t y = tile.y == 0 ? 0 : sourceOffset(plan.vertical, tile.y);
        image = {advance(src.data, -(y * src.step + x * ptrdiff_t{channels} * elementBytes<T>)), src.step};
    }
    VerticalSource vertical() const { return {plan, tile, rows}; }
    /// The row's pixel at a column.
    const T* at(int32_t row, int32_t column) const {
        return advance(image.row(row), ptrdiff_t{column} * channels * elementBytes<T>);
    }
};

/// The source columns that the taps of a strip reach.
struct Reached {
    int32_t from;         ///< The first that is legal.
    int32_t left, right;  ///< So many outside the legal ones, at either end.
    ptrdiff_t columns;    ///< Legal ones.

    Reached(const Range& legal, int32_t first, int32_t last)
        : from(legal.clamp(first)),
          left(from - first),
          right(last - legal.clamp(last)),
          columns(last - right - from + 1) {}
};

/// Lists the columns from `position` on with the first weights at `begin` of sets of `taps`, which repeat after
/// `period` columns, or never where that is 0. Super-sampling has sets of one period only.
inline void listColumns(const ResizePlan& plan, int32_t position, int32_t begin, int32_t taps, int32_t period,
                        int32_t width, kernels::PixelTaps* pixels) {
    const Axis& axis = plan.horizontal;
    const auto* indices = plan.table<int32_t>(axis.indexTable);
    if (plan.interpolation != interpSuper) {
        // Periods are powers of two where positions repeat exactly; else there are weights for every column.
        const int32_t before = plan.halfWidth - 1, mask = (period & (period - 1)) == 0 ? period - 1 : -1;
        for (int32_t x = 0; x < width; ++x) pixels[x] = {indices[position + x] - before, ((begin + x) & mask) * taps};
        return;
    }
    int32_t origin = position / axis.targetReduced * axis.sourceReduced, set = begin % axis.targetReduced;
    for (int32_t x = 0; x < width; ++x) {
        pixels[x] = {origin + indices[set], set * taps};
        if (++set == axis.targetReduced) set = 0, origin += axis.sourceReduced;
    }
}

/// Rows for the gathering kernels, which want 16 bytes at least: shorter ones are copied.
template <class T, int channels>
class GatherRows {
public:
    explicit GatherRows(WorkBuffer& buffer) : copy_(buffer.take<uint8_t>(kernels::Gather::kLane)) {}

    void open(const TileSource<T, channels>& source) {
        source_ = &source;
        bytes_ = (source.columns.last - source.columns.first + 1) * channels * elementBytes<T>;
    }
    const uint8_t* row(int32_t index) const {
        const uint8_t* row = asBytes(source_->at(index, source_->columns.first));
        if (bytes_ >= kernels::Gather::kLane) return row;
        storePartial(copy_, loadPartial(row, bytes_), bytes_);
        return copy_;
    }

private:
    uint8_t* copy_;
    const TileSource<T, channels>* source_ = nullptr;
    int32_t bytes_ = 0;
};

/// Where the columns of a tile come from in the rows of GatherRows.
template <class T, int channels>
kernels::Picks columnPicks(const TileSource<T, channels>& source) {
    const Axis& axis = source.plan.horizontal;
    const int32_t period = axis.targetReduced;  // of positions exactly where it is a power of two
    return {source.plan.template table<int32_t>(axis.indexTable) + source.tile.x, source.tile.width,
            source.columns.first, source.columns.last, (period & (period - 1)) == 0 ? period : 0};
}

template <class T, int channels>
class NearestTile {
public:
    NearestTile(const ResizePlan& plan, Tile tile, WorkBuffer& buffer)
        : source_{plan, tile},
          rows_(buffer),
          rowBytes_(ptrdiff_t{tile.width} * kPixel),
          tables_(buffer.take<uint8_t>(kernels::gatherTableBytes(tile.width, kPixel))) {}

    void run(Image<const T> src, Image<T> dst, Sides) {
        source_.open(src, {});
        rows_.open(source_);
        const Axis& axis = source_.plan.vertical;
        const Tile& tile = source_.tile;
        const kernels::Gather gather = kernels::buildGather(tables_, columnPicks(source_), kPixel, tile.height);
        const bool rowsApart = dst.step >= rowBytes_ || dst.step <= -rowBytes_;
        for (int32_t y = 0; y < tile.height; ++y) {
            const int32_t index = source_.plan.index(axis, tile.y + y);
            const int32_t later = source_.plan.index(axis, tile.y + (y + 1 < tile.height ? y + 1 : y));
            uint8_t* to = asBytes(dst.row(y));
            if (y > 0 && rowsApart && index == source_.plan.index(axis, tile.y + y - 1))
                repeatRow(to, asBytes(dst.row(y - 1)));
            else
                kernels::gatherRow(gather, rows_.row(index), asBytes(source_.at(later, source_.columns.first)), to);
        }
    }

private:
    static constexpr int kPixel = channels * elementBytes<T>;

    void repeatRow(uint8_t* to, const uint8_t* from) const {
        for (ptrdiff_t i = 0; i < rowBytes_; i += 32)
            storeUpTo(to + i, loadUpTo(from + i, rowBytes_ - i), rowBytes_ - i);
    }

    TileSource<T, channels> source_;
    GatherRows<T, channels> rows_;
    ptrdiff_t rowBytes_;
    uint8_t* tables_;
};

/// The two filtered rows that a destination row lies between. Neighbouring destination rows share them, so a row is
/// filtered once as long as it is in use.
template <class H>
class RowPair {
public:
    RowPair(WorkBuffer& buffer, int64_t elements) : rows_{buffer.take<H>(elements), buffer.take<H>(elements)} {}

    /// Provides rows `first` and `second`, calling filter(index, row) for those that are not there.
    template <class FilterRow>
    void provide(int32_t first, int32_t second, FilterRow filter) {
        if (indices_[1] == first || indices_[0] == second) swap();
        provideOne(0, first, filter);
        if (second == first) return;
        provideOne(1, second, filter);
    }
    const H* first() const { return rows_[0]; }
    const H* second(bool same) const { return rows_[same ? 0 : 1]; }

private:
    static constexpr int32_t kNone = INT32_MIN;

    void swap() {
        H* const row = rows_[0];
        rows_[0] = rows_[1];
        rows_[1] = row;
        const int32_t index = indices_[0];
        indices_[0] = indices_[1];
        indices_[1] = index;
    }
    template <class FilterRow>
    void provideOne(int place, int32_t index, FilterRow filter) {
        if (indices_[place] == index) return;
        filter(index, rows_[place]);
        indices_[place] = index;
    }

    H* rows_[2];
    int32_t indices_[2] = {kNone, kNone};
};

}  // namespace qori::geometry
