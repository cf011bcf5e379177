// SPDX-License-Identifier: Apache-2.0
// Filtering the rows of a tile, strip by strip, into rows of floats: three ways that give the same bits. Each is a
// class that TapsTile is made with:
//     suits(plan)                     whether it can do the plan; TurnedRows does any
//     Rows(source, buffer)            takes its memory
//     stripPixels()                   width of a strip
//     kAtOnce                         rows that it filters at once
//     begin()                         the source is open
//     beginStrip(x, width)            a strip of the tile begins
//     filterNext(sequence, ring)      filters one or more rows
#pragma once
#include <algorithm>

#include "kernels/resize/lines.h"
#include "kernels/resize/phases.h"
#include "resize_run.h"
#include "resize_totals.h"

namespace qori::geometry {

/// The source rows that a tile is made of, each once, in ascending order. Destination row y is made of consecutive
/// ones.
class RowSequence {
public:
    RowSequence(const ResizePlan& plan, Tile tile, Range legal) : plan_(plan), tile_(tile), legal_(legal) { enter(0); }

    bool done() const { return y_ == tile_.height; }
    int32_t next() {
        const int32_t row = next_++;
        while (!done() && next_ > last_) enter(y_ + 1);
        return row;
    }

private:
    /// Goes on with the rows of destination row y that are still to come.
    void enter(int32_t y) {
        y_ = y;
        if (done()) return;
        const int32_t position = tile_.y + y, tap = plan_.firstTap(plan_.vertical, position);
        const int32_t first = legal_.clamp(tap);
        last_ = legal_.clamp(tap + plan_.tapsOfRow(position) - 1);
        if (y == 0 || first > next_) next_ = first;
    }

    const ResizePlan& plan_;
    Tile tile_;
    Range legal_;
    int32_t y_ = 0, next_ = 0, last_ = 0;
};

/// Whether destination rows have more taps than a chain holds. Source rows are added to their totals as they come then.
inline bool hasLongRows(const ResizePlan& plan) { return plan.rowTaps > kernels::kChainTaps; }

/// Whether two destination rows share source rows, or nearly so, and are made together.
inline bool makesPairs(const ResizePlan& plan) {
    const int32_t most = plan.interpolation == interpSuper ? kernels::kAscendingTaps : kernels::kPairedTaps;
    return plan.vertical.ratio() <= plan.rowTaps && plan.rowTaps <= most;
}

/// The filtered rows that are in use at a time, next to those that are filtered at once: of a block of taps, of a pair
/// of destination rows, or of a single one.
inline int32_t rowsInUse(const ResizePlan& plan) {
    if (hasLongRows(plan)) return kernels::kTapsPerBlock;
    if (!makesPairs(plan)) return plan.rowTaps;
    return plan.rowTaps + static_cast<int32_t>(__builtin_ceil(plan.vertical.ratio()));
}

/// What brings sums along rows to means: super-sampling weighs whole pixels by 1. Chains leave it to the columns.
inline double columnScale(const ResizePlan& plan) {
    return plan.interpolation == interpSuper ? 1 / plan.horizontal.ratio() : 1;
}
inline double rowScale(const ResizePlan& plan) {
    if (plan.interpolation != interpSuper) return 1;
    return 1 / ((plan.columnTaps > kernels::kChainTaps ? 1 : plan.horizontal.ratio()) * plan.vertical.ratio());
}

/// The next rows of a sequence that is not done, and where they go. Where there are fewer, the last is done again.
template <class T, int channels, size_t rows>
void takeRows(const TileSource<T, channels>& source, RowSequence& sequence, Ring& ring, const T* (&from)[rows],
              float* (&to)[rows]) {
    int32_t row = 0;
    for (size_t i = 0; i < rows; ++i) {
        const bool isNew = i == 0 || !sequence.done();
        if (isNew) row = sequence.next();
        from[i] = source.at(row, 0);
        to[i] = isNew ? ring.next() : to[i - 1];
    }
}

inline int32_t wholeChunks(int32_t pixels) {
    const int32_t chunks = pixels / kernels::kTapChunk * kernels::kTapChunk;
    return chunks > 0 ? chunks : kernels::kTapChunk;
}

/// Strips of so many pixels that their filtered rows stay in the second-level cache.
inline int32_t ringPixels(const ResizePlan& plan, int32_t atOnce, int channels) {
    constexpr int32_t kRingFloats = 24576;
    return wholeChunks(kRingFloats / (rowsInUse(plan) + atOnce - 1) / channels);
}

/// The taps of a tile's columns one by one.
template <class T, int channels>
class ColumnTaps {
public:
    ColumnTaps(const TileSource<T, channels>& source, WorkBuffer& buffer)
        : pixels(buffer.take<kernels::PixelTaps>(source.tile.width)),
          pairs_(source.plan.isPlainLinear() ? buffer.take<float>(2 * int64_t{source.tile.width}) : nullptr) {}

    void list(const TileSource<T, channels>& source) {
        const ResizePlan& plan = source.plan;
        const auto* table = plan.table<float>(plan.horizontal.weightTable);
        const int32_t x = source.tile.x, width = source.tile.width;
        weights = table;
        if (pairs_ != nullptr) {
            kernels::pairFractions(table + x, width, pairs_);
            weights = pairs_;
        }
        listColumns(plan, x, pairs_ != nullptr ? 0 : x, plan.columnTaps, plan.columnPeriod, width, pixels);
    }

    kernels::StripTaps strip(const TileSource<T, channels>& source, int32_t x, int32_t width) const {
        return {pixels + x, weights, source.plan.columnTaps, width, source.columns.first, source.columns.last};
    }

    kernels::PixelTaps* pixels;
    const float* weights = nullptr;

private:
    float* pairs_;
};

/// Any plan: eight rows at once, turned.
template <class T, int channels>
class TurnedRows {
public:
    TurnedRows(const TileSource<T, channels>& source, WorkBuffer& buffer)
        : source_(source),
          taps_(source, buffer),
          columns_(buffer.take<float>(
              kernels::tapColumnFloats(source.plan.horizontal.ratio(), source.plan.columnTaps, channels))),
          results_(buffer.take<float>(8 * kernels::kTapChunk * channels)) {}

    int32_t stripPixels() const { return ringPixels(source_.plan, kAtOnce, channels); }
    static constexpr int32_t kAtOnce = kernels::kTapRows;

    void begin() { taps_.list(source_); }
    void beginStrip(int32_t x, int32_t width) {
        const ResizePlan& plan = source_.plan;
        filter_ = {taps_.strip(source_, x, width),
                   kernels::tapGroup(plan.horizontal.ratio(), plan.columnTaps),
                   plan.columnPeriod,
                   plan.isPadded(plan.horizontal),
                   columnScale(plan),
                   columns_,
                   results_};
    }
    void filterNext(RowSequence& sequence, Ring& ring) {
        const T* rows[kAtOnce];
        float* out[kAtOnce];
        takeRows(source_, sequence, ring, rows, out);
        kernels::filterRows<T, channels>(filter_, rows, out);
    }

private:
    const TileSource<T, channels>& source_;
    ColumnTaps<T, channels> taps_;
    float *columns_, *results_;
    kernels::RowFilter filter_{};
};

/// Enlargements: rows as lines of floats. See suitsLines() for what they gain.
template <class T, int channels>
class LineRows {
public:
    static bool suits(const ResizePlan& plan) { return kernels::suitsLines(plan.horizontal.ratio(), plan.columnTaps); }

    LineRows(const TileSource<T, channels>& source, WorkBuffer& buffer, int32_t stripElements = 2048)
        : source_(source), taps_(source, buffer), stripPixels_(wholeChunks(stripElements / channels)) {
        const int64_t pixels = source.tile.width < stripPixels() ? source.tile.width : stripPixels();
        const int64_t elements = roundUp(pixels * channels, kernels::kTapBlock);
        const ResizePlan& plan = source.plan;
        line_ = buffer.take<float>(columnsOf(pixels) * channels + kernels::LineFilter::kOverrun + 8);
        filter_.taps = plan.columnTaps;
        filter_.channels = channels;
        filter_.bases = buffer.take<int32_t>(elements / 8);
        filter_.order = buffer.take<int32_t>(elements);
        filter_.weights = buffer.take<float>(elements * plan.columnTaps);
    }

    /// Columns that the taps of so many neighbouring pixels reach, at most.
    int64_t columnsOf(int64_t pixels) const {
        const ResizePlan& plan = source_.plan;
        return static_cast<int64_t>(double(pixels - 1) * plan.horizontal.ratio()) + 1 + plan.columnTaps;
    }
    /// Strips whose tables stay in the second-level cache. Longer ones follow the source better than shorter ones.
    int32_t stripPixels() const { return stripPixels_; }
    static constexpr int32_t kAtOnce = 1;

    void begin() { taps_.list(source_); }
    void beginStrip(int32_t x, int32_t width) {
        const kernels::PixelTaps* const pixels = taps_.pixels + x;
        const int32_t first = pixels[0].first;
        reached_ = Reached(source_.columns, first, pixels[width - 1].first + filter_.taps - 1);
        const ptrdiff_t behind = source_.columns.last - reached_.from + 1 - reached_.columns;
        isWhole_ = reached_.left == 0 && reached_.right == 0 && behind * channels >= kernels::LineFilter::kOverrun;
        kernels::listLine(filter_, pixels, width, taps_.weights, source_.plan.columnPeriod, first);
    }
    void filterNext(RowSequence& sequence, Ring& ring) {
        const int32_t row = sequence.next();
        const T* from = source_.at(row, reached_.from);
        const float* line = line_;
        if constexpr (std::is_same_v<T, float>) {
            if (isWhole_) line = from;
        }
        if (line == line_) expand(row, line_);
        kernels::filterLine(filter_, line, asBytes(source_.at(row + 1, reached_.from)), elementBytes<T>, ring.next());
    }

    // The same in parts, for lines that are made of several rows.

    void expand(int32_t row, float* line) const {
        kernels::expandLine<T, channels>(source_.at(row, reached_.from), reached_.columns * channels, reached_.left,
                                         reached_.right, line);
        std::fill(line + lineElements(), line + roundUp(lineElements(), 8), 0.0f);  // whole vectors are computed on
    }
    ptrdiff_t lineElements() const { return (reached_.left + reached_.columns + reached_.right) * channels; }
    void filter(const float* line, float* out) const {
        kernels::filterLine(filter_, line, asBytes(line), elementBytes<float>, out);
    }

private:
    const TileSource<T, channels>& source_;
    ColumnTaps<T, channels> taps_;
    int32_t stripPixels_;
    float* line_;
    kernels::LineFilter filter_{};
    Reached reached_{{0, 0}, 0, 0};
    bool isWhole_ = false;  ///< Rows of floats serve as lines: windows stay among the legal columns.
};

/// One channel at the simplest ratios. They are binary fractions, so that positions and weights repeat exactly. Gains
/// 1.05 to 1.54 over the other ways, most for 16 bits.
template <class T>
class PhaseRows {
public:
    static bool suits(const ResizePlan& plan) {
        const Axis& axis = plan.horizontal;
        return axis.sourceReduced <= kernels::PhaseFilter::kMostStreams &&
               axis.targetReduced <= kernels::PhaseFilter::kMostPhases;
    }

    PhaseRows(const TileSource<T, 1>& source, WorkBuffer& buffer) : source_(source) {
        const ResizePlan& plan = source.plan;
        filter_.streams = plan.horizontal.sourceReduced;
        filter_.phases = plan.horizontal.targetReduced;
        const int64_t pixels = source.tile.width < stripPixels() ? source.tile.width : stripPixels();
        const int64_t columns =
            static_cast<int64_t>(double(pixels - 1) * plan.horizontal.ratio()) + 1 + plan.columnTaps;
        filter_.streamFloats = static_cast<ptrdiff_t>(kernels::streamFloats(columns, filter_.streams));
        weights_ = buffer.take<float>(2 * int64_t{plan.columnTaps});
        offsets_ = buffer.take<int32_t>(2 * int64_t{plan.columnTaps});
        line_ = buffer.take<float>(lineFloats());
        filter_.offsets = offsets_;
    }

    /// Long strips read the source in long runs, which counts for more than filtered rows close at hand.
    static int32_t stripPixels() { return 4096; }
    static constexpr int32_t kAtOnce = 1;

    void begin() { std::fill_n(line_, lineFloats(), 0.0f); }  // nothing denormal where nothing is written
    void beginStrip(int32_t x, int32_t width) {
        const ResizePlan& plan = source_.plan;
        const Axis& axis = plan.horizontal;
        const int32_t position = source_.tile.x + x;
        const int32_t first = plan.firstTap(axis, position), taps = plan.columnTaps;
        reached_ = Reached(source_.columns, first, plan.firstTap(axis, position + width - 1) + taps - 1);
        width_ = width;
        // A strip of one pixel has no second one, and may end the table.
        const int32_t second = filter_.phases > 1 && width > 1 ? position + 1 : position;
        filter_.taps = {weights_, weights_ + taps, taps, plan.firstTap(axis, second) - first};
        float pair[2];
        std::copy_n(plan.weights(axis, position, pair), taps, weights_);
        std::copy_n(plan.weights(axis, second, pair), taps, weights_ + taps);
        for (int32_t k = 0; k < filter_.taps.all(); ++k)
            offsets_[k] = static_cast<int32_t>(filter_.place(first + k - reached_.from));
    }
    void filterNext(RowSequence& sequence, Ring& ring) {
        const int32_t row = sequence.next();
        const kernels::LineEnds ends{reached_.columns, source_.columns.last - reached_.from + 1, reached_.left,
                                     reached_.right};
        kernels::dealOut(filter_, source_.at(row, reached_.from), ends, line_);
        kernels::filterPhases(filter_, line_, asBytes(source_.at(row + 1, reached_.from)), elementBytes<T>, width_,
                              ring.next());
    }

private:
    int64_t lineFloats() const { return int64_t{filter_.streamFloats} * filter_.streams; }

    const TileSource<T, 1>& source_;
    kernels::PhaseFilter filter_;
    int32_t* offsets_;
    float *weights_, *line_;
    Reached reached_{{0, 0}, 0, 0};
    int32_t width_ = 0;
};

}  // namespace qori::geometry
