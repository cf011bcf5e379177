// SPDX-License-Identifier: Apache-2.0
// Extrema, their positions, extrema of blocks, and counts of elements within bounds.
#include "frame/checks.h"
#include "frame/float_control.h"
#include "image/driver.h"
#include "kernels/stats/reduce_count.h"
#include "kernels/stats/reduce_extrema.h"
#include "kernels/stats/reduce_narrow.h"

namespace qori::stats {
namespace {

using kernels::Biggest;
using kernels::ExtremumLanes;
using kernels::Smallest;

template <class T>
constexpr T kNan = std::is_floating_point_v<T> ? std::numeric_limits<T>::quiet_NaN() : T{};

template <class T, class... Orders>
void joinRegion(QorImageSize roi, int channels, Image<const T> src, ExtremumLanes<Orders>&... lanes) {
    kernels::forEachRowToReduce(
        roi, channels,
        [&](ptrdiff_t pixels, const T* row) { kernels::extremaRow<T, Orders...>(pixels * channels, row, lanes...); },
        src);
}

/// One order's extremum per channel. Where a float channel still stands at its start, it holds that very value or
/// nothing but NaN: the opposite order tells which.
template <class Order, class T>
QORI_NOINLINE void extremum(QorImageSize roi, int stored, int results, Image<const T> src, T* out) {
    ExtremumLanes<Order> lanes;
    joinRegion(roi, stored, src, lanes);
    T best[4];
    lanes.ofChannels(stored, best);
    bool unsure = false;
    for (int c = 0; c < results; ++c) {
        out[c] = best[c];
        unsure |= best[c] == Order::start;
    }
    if constexpr (std::is_floating_point_v<T>) {
        using Opposite = std::conditional_t<std::is_same_v<Order, Smallest<T>>, Biggest<T>, Smallest<T>>;
        if (!unsure) return;
        ExtremumLanes<Opposite> opposite;
        joinRegion(roi, stored, src, opposite);
        T worst[4];
        opposite.ofChannels(stored, worst);
        for (int c = 0; c < results; ++c)
            if (best[c] == Order::start && worst[c] == Opposite::start) out[c] = kNan<T>;
    }
}

template <class T, Layout layout>
QorResult minimum(Image<const T> src, QorImageSize roi, T* pMin) {
    if (QorResult r = firstOf(nullCheck(src, pMin), sizeCheck(roi))) return r;
    return underControlOf<T>([&] {
        extremum<Smallest<T>>(roi, channels(layout), processedChannels(layout), src, pMin);
        return QOR_OK;
    });
}

template <class T, Layout layout>
QorResult maximum(Image<const T> src, QorImageSize roi, T* pMax) {
    if (QorResult r = firstOf(nullCheck(src, pMax), sizeCheck(roi))) return r;
    return underControlOf<T>([&] {
        extremum<Biggest<T>>(roi, channels(layout), processedChannels(layout), src, pMax);
        return QOR_OK;
    });
}

/// Without a number in a channel, its lanes stand at their starts: the smallest above the biggest.
template <class T>
bool noNumber(T smallest, T biggest) {
    return std::is_floating_point_v<T> && smallest > biggest;
}

template <class T>
QORI_NOINLINE void bothExtrema(QorImageSize roi, int stored, int results, Image<const T> src, T* pMin, T* pMax) {
    ExtremumLanes<Smallest<T>> smallest;
    ExtremumLanes<Biggest<T>> biggest;
    joinRegion(roi, stored, src, smallest, biggest);
    T low[4], high[4];
    smallest.ofChannels(stored, low);
    biggest.ofChannels(stored, high);
    for (int c = 0; c < results; ++c) {
        pMin[c] = noNumber(low[c], high[c]) ? kNan<T> : low[c];
        pMax[c] = noNumber(low[c], high[c]) ? kNan<T> : high[c];
    }
}

template <class T, Layout layout>
QorResult minMax(Image<const T> src, QorImageSize roi, T* pMin, T* pMax) {
    if (QorResult r = firstOf(nullCheck(src, pMin, pMax), sizeCheck(roi))) return r;
    return underControlOf<T>([&] {
        bothExtrema(roi, channels(layout), processedChannels(layout), src, pMin, pMax);
        return QOR_OK;
    });
}

// --- positions ------------------------------------------------------------------------------------------------------

/// A part of the region: several rows, or a stretch of one. Lanes run through the whole region and are looked at after
/// each piece, so that rows cost what they cost a plain extremum; the search for a position stays within one piece.
struct Piece {
    int32_t x, y;
    QorImageSize size;
};

template <class T>
constexpr int32_t kPieceElements = 24'576 / static_cast<int32_t>(sizeof(T));

/// Calls use(piece) for each piece, from the top and from the left, until it returns false.
template <class T, class Use>
void forEachPiece(QorImageSize roi, int channels, Use use) {
    const int32_t pixels = kPieceElements<T> / channels, width = std::min(roi.width, pixels), height = pixels / width;
    for (int32_t y = 0; y < roi.height;) {
        const int32_t rows = std::min(height, roi.height - y);
        for (int32_t x = 0; x < roi.width;) {
            const int32_t columns = std::min(width, roi.width - x);
            if (!use(Piece{x, y, {columns, rows}})) return;
            x += columns;
        }
        y += rows;
    }
}

template <class T>
Image<const T> imageOf(Image<const T> src, int channels, const Piece& piece) {
    return {src.row(piece.y) + ptrdiff_t{piece.x} * channels, src.step};
}

template <class Order>
struct Best {
    using T = typename Order::Element;
    T value = Order::start;
    Piece piece{};
    bool found = false;
};

/// Keeps the first piece that holds each channel's extremum; false when no later piece can change any.
template <class Order, class T>
bool keepBetter(const ExtremumLanes<Order>& lanes, int stored, int results, const Piece& piece, Best<Order>* best) {
    T values[4];
    lanes.ofChannels(stored, values);
    bool open = false;
    for (int c = 0; c < results; ++c) {
        if (Order::better(values[c], best[c].value)) best[c] = {values[c], piece, true};
        open |= best[c].value != Order::limit;
    }
    return open;
}

template <class Order, class T>
void scanPieces(QorImageSize roi, int stored, int results, Image<const T> src, Best<Order>* best) {
    ExtremumLanes<Order> lanes;
    // The fourth channel of AC4 takes part in the lanes, but nothing of it is better than the limit.
    T values[4] = {Order::start, Order::start, Order::start, results < stored ? Order::limit : Order::start};
    kernels::ChannelVectors<T> bestSoFar;
    bool changed = true;
    forEachPiece<T>(roi, stored, [&](const Piece& piece) {
        joinRegion(piece.size, stored, imageOf(src, stored, piece), lanes);
        if (piece.x > 0 || piece.y > 0) {
            if (changed) bestSoFar = kernels::channelVectors(values, stored);
            changed = false;
            if (!kernels::anyBetter(lanes, bestSoFar)) return true;
        }
        if (!keepBetter<Order, T>(lanes, stored, results, piece, best)) return false;
        for (int c = 0; c < results; ++c) values[c] = best[c].value;
        changed = true;
        return true;
    });
}

/// The first pixel of the region whose element equals value; false, with (0, 0), where there is none.
template <class T>
bool locate(QorImageSize roi, int stored, int channel, Image<const T> src, T value, int32_t* x, int32_t* y) {
    const kernels::ChannelMasks<T> masks(stored, channel);
    const QorImageSize rows = isOneRun(roi, walk(src, stored)) ? QorImageSize{roi.width * roi.height, 1} : roi;
    *x = *y = 0;
    for (int32_t row = 0; row < rows.height; ++row) {
        const ptrdiff_t at = kernels::findInRow(src.row(row), ptrdiff_t{rows.width} * stored, masks, value);
        if (at < 0) continue;
        const auto pixel = static_cast<int32_t>(at / stored);
        *x = pixel % roi.width;
        *y = row + pixel / roi.width;
        return true;
    }
    return false;
}

template <class Order, class T>
QORI_NOINLINE void extremumAndPosition(QorImageSize roi, int stored, int results, Image<const T> src, T* out,
                                       int32_t* xs, int32_t* ys) {
    Best<Order> best[4];
    scanPieces<Order>(roi, stored, results, src, best);
    for (int c = 0; c < results; ++c) {
        // Without an element better than the start, the start itself may be anywhere.
        const Piece piece = best[c].found ? best[c].piece : Piece{0, 0, roi};
        const bool located = locate(piece.size, stored, c, imageOf(src, stored, piece), best[c].value, &xs[c], &ys[c]);
        out[c] = located ? best[c].value : kNan<T>;
        xs[c] += piece.x;
        ys[c] += piece.y;
    }
}

template <class T, Layout layout>
QorResult minimumIndex(Image<const T> src, QorImageSize roi, T* pMin, int32_t* pIndexX, int32_t* pIndexY) {
    if (QorResult r = firstOf(nullCheck(src, pMin, pIndexX, pIndexY), sizeCheck(roi))) return r;
    return underControlOf<T>([&] {
        extremumAndPosition<Smallest<T>>(roi, channels(layout), processedChannels(layout), src, pMin, pIndexX, pIndexY);
        return QOR_OK;
    });
}

template <class T, Layout layout>
QorResult maximumIndex(Image<const T> src, QorImageSize roi, T* pMax, int32_t* pIndexX, int32_t* pIndexY) {
    if (QorResult r = firstOf(nullCheck(src, pMax, pIndexX, pIndexY), sizeCheck(roi))) return r;
    return underControlOf<T>([&] {
        extremumAndPosition<Biggest<T>>(roi, channels(layout), processedChannels(layout), src, pMax, pIndexX, pIndexY);
        return QOR_OK;
    });
}

// --- blocks ---------------------------------------------------------------------------------------------------------

template <class T>
struct MinMax {
    T smallest = Smallest<T>::start, biggest = Biggest<T>::start;

    void join(MinMax other) {
        if (other.smallest < smallest) smallest = other.smallest;
        if (other.biggest > biggest) biggest = other.biggest;
    }
    T reportedSmallest() const { return noNumber(smallest, biggest) ? kNan<T> : smallest; }
    T reportedBiggest() const { return noNumber(smallest, biggest) ? kNan<T> : biggest; }
};

/// Where the results of one row of blocks go; either may be null.
template <class T>
struct BlockRow {
    T *smallest, *biggest;

    void put(ptrdiff_t block, MinMax<T> extrema) const {
        if (smallest) smallest[block] = extrema.reportedSmallest();
        if (biggest) biggest[block] = extrema.reportedBiggest();
    }
};

/// One row of blocks: the extrema of each column first, strip by strip, then those of each block's columns. Strips hold
/// whole blocks where they can; wider blocks are joined from several strips. Returns the extrema of all blocks.
template <class T>
MinMax<T> blockRow(Image<const T> src, int32_t y, int32_t rows, int32_t width, int32_t blockWidth, BlockRow<T> out) {
    constexpr int32_t kStrip = 2'048 / static_cast<int32_t>(sizeof(T));
    alignas(kVectorBytes) T smallest[kStrip + Vec<T>::lanes], biggest[kStrip + Vec<T>::lanes];
    const int32_t strip = blockWidth < kStrip ? kStrip / blockWidth * blockWidth : kStrip;
    MinMax<T> all, block;
    ptrdiff_t done = 0;
    int32_t left = blockWidth;  // columns that the current block still wants
    for (int32_t x = 0; x < width;) {
        const int32_t columns = std::min(blockWidth < kStrip ? strip : std::min(strip, left), width - x);
        kernels::columnExtrema(src.row(y) + x, src.step, rows, columns, smallest, biggest);
        for (int32_t at = 0; at < columns;) {
            const int32_t own = std::min(left, columns - at);
            block.join(
                {kernels::bestOf<Smallest<T>>(smallest + at, own), kernels::bestOf<Biggest<T>>(biggest + at, own)});
            at += own;
            left -= own;
            if (left > 0 && x + at < width) continue;
            out.put(done++, block);
            all.join(block);
            block = {};
            left = blockWidth;
        }
        x += columns;
    }
    return all;
}

template <class T>
QorResult blockMinMax(Image<const T> src, QorImageSize roi, Image<T> dstMin, Image<T> dstMax, QorImageSize block,
                      T* pGlobalMin, T* pGlobalMax) {
    if (isNull(src) || (isNull(dstMin) && isNull(dstMax))) return QOR_ERR_NULL_PTR;
    if (QorResult r = firstOf(sizeCheck(roi), sizeCheck(block))) return r;
    const int32_t blocks = (roi.width - 1) / block.width + 1;
    // Numbers of elements against steps in bytes: the check is that coarse.
    if (QorResult r = rowCheck(src.step, roi.width)) return r;
    if ((!isNull(dstMin) && blocks > dstMin.step) || (!isNull(dstMax) && blocks > dstMax.step)) return QOR_ERR_STEP;
    return underControlOf<T>([&] {
        MinMax<T> all;
        for (int32_t y = 0, by = 0; y < roi.height; ++by) {
            const int32_t rows = std::min(block.height, roi.height - y);
            all.join(
                blockRow<T>(src, y, rows, roi.width, block.width,
                            {isNull(dstMin) ? nullptr : dstMin.row(by), isNull(dstMax) ? nullptr : dstMax.row(by)}));
            y += rows;
        }
        if (pGlobalMin) *pGlobalMin = all.reportedSmallest();
        if (pGlobalMax) *pGlobalMax = all.reportedBiggest();
        return QOR_OK;
    });
}

// --- counting -------------------------------------------------------------------------------------------------------

template <class T>
QORI_NOINLINE void countRegion(QorImageSize roi, int stored, int results, Image<const T> src, int32_t* out,
                               const T* lower, const T* upper) {
    const T low[4] = {lower[0], lower[results > 1], lower[results > 1 ? 2 : 0], T{}};
    const T high[4] = {upper[0], upper[results > 1], upper[results > 1 ? 2 : 0], T{}};
    const kernels::Bounds<T> bounds{kernels::channelVectors(low, stored), kernels::channelVectors(high, stored)};
    kernels::Counts<T> counts;
    kernels::forEachRowToReduce(
        roi, stored,
        [&](ptrdiff_t pixels, const T* row) { kernels::countRow(counts, bounds, stored, pixels * stored, row); }, src);
    counts.finish(stored);
    for (int c = 0; c < results; ++c) out[c] = counts.total(c).saturated();
}

template <class T, Layout layout>
QorResult countInRange(Image<const T> src, QorImageSize roi, int32_t* pCounts, const T* lower, const T* upper) {
    constexpr int results = processedChannels(layout);
    if (QorResult r = firstOf(nullCheck(src, pCounts, lower, upper), stepCheck(src), sizeCheck(roi))) return r;
    return underControlOf<T>([&] {
        for (int c = 0; c < results; ++c)
            if (upper[c] < lower[c]) return QOR_ERR_BAD_RANGE;
        countRegion(roi, channels(layout), results, src, pCounts, lower, upper);
        return QOR_OK;
    });
}

}  // namespace
}  // namespace qori::stats

#include "entries/extrema.inc"
