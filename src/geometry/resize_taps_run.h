// SPDX-License-Identifier: Apache-2.0
// Tiles of the weighted forms: linear in single precision, cubic, Lanczos, super and antialiasing.
#pragma once
#include "kernels/resize_lines.h"
#include "resize_run.h"

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
        const int32_t first = legal_.clamp(plan_.firstTap(plan_.vertical, tile_.y + y));
        last_ = legal_.clamp(plan_.firstTap(plan_.vertical, tile_.y + y) + plan_.rowTaps - 1);
        if (y == 0 || first > next_) next_ = first;
    }

    const ResizePlan& plan_;
    Tile tile_;
    Range legal_;
    int32_t y_ = 0, next_ = 0, last_ = 0;
};

template <class T, int channels>
class TapsTile {
public:
    TapsTile(const ResizePlan& plan, Tile tile, WorkBuffer& buffer) : source_{plan, tile} {
        const double ratio = plan.horizontal.ratio();
        byLines_ = kernels::suitsLines(ratio, plan.columnTaps, channels, plan.columnPeriod == 1);
        stripPixels_ = byLines_ ? lineStripOf(tile.width) : stripOf(tile.width, plan.rowTaps);
        ringRows_ = byLines_ ? plan.rowTaps : plan.rowTaps + kernels::kTapRows;
        ringStep_ = static_cast<ptrdiff_t>(roundUp(int64_t{stripPixels_} * channels, kernels::kTapBlock));
        pixels_ = buffer.take<kernels::PixelTaps>(tile.width);
        pairs_ = isLinear() ? buffer.take<float>(2 * int64_t{tile.width}) : nullptr;
        if (byLines_) {
            line_ = buffer.take<float>(lineColumns(ratio) * channels + kernels::LineFilter::kOverrun + 8);
            lines_.taps = plan.columnTaps;
            lines_.channels = channels;
            lines_.bases = buffer.take<int32_t>(ringStep_ / 8);
            lines_.order = buffer.take<int32_t>(ringStep_);
            lines_.weights = buffer.take<float>(int64_t{ringStep_} * plan.columnTaps);
        } else {
            columns_ = buffer.take<float>(kernels::tapColumnFloats(ratio, plan.columnTaps, channels));
            results_ = buffer.take<float>(8 * kernels::kTapChunk * channels);
        }
        ring_ = buffer.take<float>(int64_t{ringRows_} * ringStep_);
        tapRows_ = buffer.take<const float*>(plan.rowTaps);
    }

    void run(Image<const T> src, Image<T> dst, OpenSides open) {
        source_.open(src, open);
        listPixels();
        for (int32_t x = 0; x < source_.tile.width; x += stripPixels_) {
            const int32_t rest = source_.tile.width - x;
            runStrip(dst, x, rest < stripPixels_ ? rest : stripPixels_);
        }
    }

private:
    bool isLinear() const { return source_.plan.interpolation == interpLinear && source_.plan.antialiasing == 0; }

    /// Pixels per strip, such that the filtered rows of a strip stay in the second-level cache.
    static int32_t stripOf(int32_t width, int32_t rowTaps) {
        constexpr int32_t kRingFloats = 24576;
        const int32_t fits =
            kRingFloats / (rowTaps + kernels::kTapRows) / channels / kernels::kTapChunk * kernels::kTapChunk;
        const int32_t pixels = fits > kernels::kTapChunk ? fits : kernels::kTapChunk;
        return width < pixels ? width : pixels;
    }

    /// Strips whose tables stay in the second-level cache. Longer ones follow the source better than shorter ones.
    static int32_t lineStripOf(int32_t width) {
        constexpr int32_t kElements = 2048;
        constexpr int32_t pixels = kElements / channels / kernels::kTapChunk * kernels::kTapChunk;
        return width < pixels ? width : pixels;
    }

    /// Source columns that a strip reaches at most.
    int64_t lineColumns(double ratio) const {
        return static_cast<int64_t>((stripPixels_ - 1) * ratio) + 1 + source_.plan.columnTaps;
    }

    void listPixels() {
        const ResizePlan& plan = source_.plan;
        const Axis& axis = plan.horizontal;
        const auto* fractions = plan.table<float>(axis.weightTable);
        for (int32_t x = 0; x < source_.tile.width; ++x) {
            const int32_t position = source_.tile.x + x, period = plan.columnPeriod;
            const int32_t set = isLinear() ? (period > 0 ? x % period : x) : period > 0 ? position % period : position;
            pixels_[x] = {plan.firstTap(axis, position), set * plan.columnTaps};
            if (!isLinear()) continue;
            pairs_[2 * x] = 1 - fractions[position];
            pairs_[2 * x + 1] = fractions[position];
        }
    }

    void runStrip(Image<T> dst, int32_t x, int32_t width) {
        const ResizePlan& plan = source_.plan;
        const Tile& tile = source_.tile;
        const kernels::RowFilter filter{pixels_ + x,
                                        isLinear() ? pairs_ : plan.table<float>(plan.horizontal.weightTable),
                                        plan.columnTaps,
                                        width,
                                        source_.columns.first,
                                        source_.columns.last,
                                        kernels::tapGroup(plan.horizontal.ratio(), plan.columnTaps),
                                        plan.columnPeriod,
                                        columns_,
                                        results_};
        if (byLines_) listStrip(filter);
        RowSequence sequence(plan, tile, source_.rows);
        const float scale = plan.interpolation == interpSuper
                                ? static_cast<float>(1 / (plan.horizontal.ratio() * plan.vertical.ratio()))
                                : 1.0f;
        int32_t filtered = 0, newest = INT32_MIN, needed = 0;  // rows in the ring, counted from the tile's first
        int32_t lastNeeded = 0;
        for (int32_t y = 0; y < tile.height; ++y) {
            const int32_t tap = plan.firstTap(plan.vertical, tile.y + y);
            const int32_t first = source_.rows.clamp(tap), last = source_.rows.clamp(tap + plan.rowTaps - 1);
            needed = y == 0 || first > lastNeeded ? needed + last - first + 1 : needed + last - lastNeeded;
            lastNeeded = last;
            while (filtered < needed) filterNext(filter, sequence, filtered, newest);
            const int32_t place = needed - (last - first + 1);
            listTapRows(tap, first, place % ringRows_);
            float pair[2];
            kernels::filterColumn<T>(tapRows_, rowWeights(tile.y + y, pair), plan.rowTaps, scale,
                                     advance(dst.row(y), ptrdiff_t{x} * channels * elementBytes<T>),
                                     ptrdiff_t{width} * channels);
        }
    }

    /// Points the taps of a destination row at the ring's rows, of which source row `first` lies in `place`.
    void listTapRows(int32_t tap, int32_t first, int32_t place) const {
        for (int32_t k = 0; k < source_.plan.rowTaps; ++k) {
            const int32_t at = place + source_.rows.clamp(tap + k) - first;  // less than twice around
            tapRows_[k] = ring_ + (at < ringRows_ ? at : at - ringRows_) * ringStep_;
        }
    }

    float* ringRow(int32_t place) const { return ring_ + place % ringRows_ * ringStep_; }

    const float* rowWeights(int32_t position, float (&pair)[2]) const {
        const ResizePlan& plan = source_.plan;
        const auto* weights = plan.table<float>(plan.vertical.weightTable);
        if (!isLinear()) return weights + ptrdiff_t{plan.weightSet(plan.vertical, position)} * plan.rowTaps;
        pair[0] = 1 - weights[position];
        pair[1] = weights[position];
        return pair;
    }

    /// The columns that a strip's taps reach, and how many of them lie outside the legal ones.
    struct LineEnds {
        int32_t first, left, right;  // from source column `first`, with so many repeated at the ends
        ptrdiff_t elements;          // of legal columns
        bool whole;                  // Rows of floats serve as lines: windows stay among the legal columns.
    };

    void listStrip(const kernels::RowFilter& filter) {
        const int32_t first = filter.pixels[0].first, last = filter.pixels[filter.width - 1].first + filter.taps - 1;
        const Range& legal = source_.columns;
        const int32_t from = legal.clamp(first), to = legal.clamp(last);
        ends_ = {from, from - first, last - to, ptrdiff_t{to - from + 1} * channels,
                 from == first && ptrdiff_t{legal.last - to} * channels >= kernels::LineFilter::kOverrun};
        kernels::listLine(lines_, filter.pixels, filter.width, filter.weights, first);
    }

    void filterNextLine(RowSequence& sequence, int32_t& filtered) {
        const int32_t row = sequence.next();
        const T* from = source_.at(row, ends_.first);
        const float* line = line_;
        if constexpr (std::is_same_v<T, float>) {
            if (ends_.whole) line = from;
        }
        if (line == line_) kernels::expandLine<T, channels>(from, ends_.elements, ends_.left, ends_.right, line_);
        kernels::filterLine(lines_, line, asBytes(source_.at(row + 1, ends_.first)), elementBytes<T>,
                            ringRow(filtered++));
    }

    /// Filters the next eight rows of the sequence; where there are fewer, the last is done again.
    void filterNext(const kernels::RowFilter& filter, RowSequence& sequence, int32_t& filtered, int32_t& newest) {
        if (byLines_) return filterNextLine(sequence, filtered);
        const T* rows[kernels::kTapRows];
        float* out[kernels::kTapRows];
        int32_t last = newest;
        for (int32_t i = 0; i < kernels::kTapRows; ++i) {
            if (!sequence.done()) {
                last = sequence.next();
                out[i] = ringRow(filtered++);
            } else {
                out[i] = out[i - 1];
            }
            rows[i] = source_.at(last, 0);
        }
        newest = last;
        kernels::filterRows<T, channels>(filter, rows, out);
    }

    TileSource<T, channels> source_;
    int32_t stripPixels_, ringRows_;
    ptrdiff_t ringStep_;
    kernels::PixelTaps* pixels_;
    float* pairs_;
    bool byLines_;
    // By turning rows.
    float* columns_ = nullptr;
    float* results_ = nullptr;
    // By lines.
    float* line_ = nullptr;
    kernels::LineFilter lines_{};
    LineEnds ends_{};
    float* ring_;
    const float** tapRows_;
};

}  // namespace qori::geometry
