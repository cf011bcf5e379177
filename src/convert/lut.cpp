// SPDX-License-Identifier: Apache-2.0
// Tables given by levels: constants, straight lines and cubics between them.
#include "byte_tables.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/plan.h"
#include "kernels/lut/curve.h"
#include "kernels/lut/few_steps.h"
#include "kernels/lut/kept_polynomials.h"
#include "kernels/lut/places.h"
#include "kernels/lut/table_rows.h"

namespace qori::convert {
namespace {

using kernels::Curve;
using kernels::Search;

template <class T>
using Level = std::conditional_t<std::is_floating_point_v<T>, float, int32_t>;

enum class Form { step, linear, cubic };

/// One channel's table.
template <class T>
struct Channel {
    Curve<Level<T>> curve;
    Form form;
    bool isOrdered;                          ///< Levels never decrease.
    const kernels::PolynomialRoom* solving;  ///< Where the curve is solved as elements need it; null: all of it is.
};

QorResult countCheck(int32_t count) { return count < 2 ? QOR_ERR_LUT_LEVELS : QOR_OK; }

/// One channel checks its levels last, several check them first.
template <Layout layout, class T, class L>
QorResult check(Image<const T> src, Image<T> dst, QorImageSize roi, const L* const* values, const L* const* levels,
                const int32_t* counts) {
    if constexpr (layout == Layout::C1) {
        return firstOf(nullCheck(src, dst, *values, *levels), sizeCheck(roi), stepCheck(src, dst), countCheck(*counts));
    } else {
        if (QorResult r = nullCheck(src, dst, values, levels, counts)) return r;
        for (int c = 0; c < processedChannels(layout); ++c)
            if (QorResult r = firstOf(nullCheck(values[c], levels[c]), countCheck(counts[c]))) return r;
        return firstOf(sizeCheck(roi), stepCheck(src, dst));
    }
}

// --- a table of every value -----------------------------------------------------------------------------------------

/// Integers, levels in any order: the last interval that holds a value counts. Steps leave values from the last level
/// on as they are even where an interval holds them. table[0] is the entry of value 0.
template <class T>
void fillTable(T* table, const Channel<T>& channel) {
    constexpr int32_t lowest = kernels::kLowestOf<T>, highest = kernels::kHighestOf<T>;
    const Curve<int32_t>& curve = channel.curve;
    const auto within = [=](int32_t level) { return std::clamp(level, lowest, highest + 1); };
    const int32_t tail = within(curve.levels[curve.count - 1]);
    kernels::fillIdentity(table, lowest, channel.isOrdered ? within(curve.levels[0]) : highest + 1);
    for (int32_t k = 0; k < curve.count - 1; ++k) {
        const int32_t first = within(curve.levels[k]), end = within(curve.levels[k + 1]);
        if (first >= end) continue;
        switch (channel.form) {
            case Form::step:
                kernels::fillEntries(table, first, end, static_cast<T>(std::clamp(curve.values[k], lowest, highest)));
                break;
            case Form::linear: kernels::tabulate<T, false>(table, first, end, curve, k); break;
            case Form::cubic: kernels::tabulate<T, true>(table, first, end, curve, k); break;
        }
    }
    if (channel.isOrdered || channel.form == Form::step) kernels::fillIdentity(table, tail, highest + 1);
}

template <Layout layout>
void mapBytes(Image<const uint8_t> src, Image<uint8_t> dst, QorImageSize roi, const Channel<uint8_t>* channel) {
    uint8_t tables[processedChannels(layout)][256];
    for (int c = 0; c < processedChannels(layout); ++c) fillTable(tables[c], channel[c]);
    applyByteTables<layout>(roi, src, dst, tables);
}

template <Layout layout, class T>
QorResult mapWordsByTable(Image<const T> src, Image<T> dst, QorImageSize roi, const Channel<T>* channel) {
    constexpr int n = channels(layout), processed = processedChannels(layout);
    constexpr int32_t lowest = kernels::kLowestOf<T>;
    OwnedBlocks<processed> blocks;
    T* tables[processed];
    for (T*& table : tables) table = blocks.template add<T>(65'536 * elementBytes<T>);
    if (QorResult r = blocks.check()) return r;
    for (int c = 0; c < processed; ++c) {
        tables[c] -= lowest;
        fillTable(tables[c], channel[c]);
    }
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, T* d, const T* s) {
            if constexpr (n == 1)
                kernels::lookUpRow(d, s, pixels, static_cast<const T*>(tables[0]), -1);
            else
                kernels::lookUpRow<n, processed, T, T>(d, s, pixels, tables, -1);
        },
        walk(dst, n), walk(src, n));
    return QOR_OK;
}

// --- element by element ---------------------------------------------------------------------------------------------

template <class T>
Search searchOf(const Channel<T>& channel) {
    if (channel.isOrdered) return channel.curve.count <= kernels::kMostCompared ? Search::comparison : Search::halving;
    if (std::is_floating_point_v<T>) return Search::first;
    return channel.form == Form::step ? Search::lastOrTail : Search::last;
}

template <bool isCubic, class T>
void mapByCurve(T* plane, int pixels, const uint32_t* places, const Channel<T>& channel) {
    if constexpr (std::is_integral_v<T>)
        if (channel.solving != nullptr)
            return kernels::mapBySolving<isCubic>(plane, pixels, places, channel.curve, *channel.solving);
    kernels::mapByCurve<isCubic>(plane, pixels, places, channel.curve);
}

/// Finds each element's interval, then looks up or computes what it gives.
template <Layout layout, class T>
void mapBySearch(Image<const T> src, Image<T> dst, QorImageSize roi, const Channel<T>* channel) {
    constexpr int n = channels(layout), processed = processedChannels(layout);
    Search way[processed];
    for (int c = 0; c < processed; ++c) way[c] = searchOf(channel[c]);
    const auto map = [&](int c, T* plane, int pixels) {
        alignas(kVectorBytes) uint32_t places[kernels::PlaneBlock<n, n, T>::kPixels];
        const Curve<Level<T>>& curve = channel[c].curve;
        kernels::findPlaces(plane, pixels, curve.levels, curve.count, way[c], places);
        switch (channel[c].form) {
            case Form::step: return kernels::replaceByValues(plane, pixels, places, curve.values, curve.count);
            case Form::linear: return mapByCurve<false>(plane, pixels, places, channel[c]);
            case Form::cubic: return mapByCurve<true>(plane, pixels, places, channel[c]);
        }
    };
    kernels::mapByPlanes<n, n, T>(roi, processed, src, dst,
                                  layout == Layout::AC4 ? kernels::kKeptAlpha : kernels::kSameOrder, T{0}, map);
}

/// Whether no channel has more levels than that, or any out of order.
template <Layout layout, class T>
bool isFewSteps(const Channel<T>* channel, int32_t most) {
    for (int c = 0; c < processedChannels(layout); ++c)
        if (!channel[c].isOrdered || channel[c].curve.count > most) return false;
    return true;
}

template <Layout layout, class T>
void mapFewSteps(Image<const T> src, Image<T> dst, QorImageSize roi, const Channel<T>* channel) {
    constexpr int n = channels(layout), processed = processedChannels(layout);
    int32_t most = 0;
    for (int c = 0; c < processed; ++c) most = std::max(most, channel[c].curve.count);
    kernels::FewSteps<T, n> steps(most);
    for (int c = 0; c < n; ++c) {
        const Curve<Level<T>>& curve = channel[c < processed ? c : 0].curve;
        steps.setChannel(c, curve.levels, curve.values, curve.count);
    }
    steps.finish();
    kernels::mapImage<layout == Layout::AC4>(roi, n, kernels::ApplyFewSteps<T, n>{&steps, most}, false, dst, src);
}

// --- choices --------------------------------------------------------------------------------------------------------

/// 16 bits: whether so few pixels are searched one by one that no memory is taken for a table of 65536 entries.
/// Measured: filling it takes as long as a search of 1,600 pixels (steps of 64 levels, which are found in 3 ns each) or
/// of 7,700 (curves of up to 256 intervals: 4 ns).
template <Layout layout, class T>
bool isSmall(QorImageSize roi, const Channel<T>* channel) {
    int32_t most = 4'096;
    if (channel[0].form != Form::step) most *= 2;
    for (int c = 0; c < processedChannels(layout); ++c)
        if (channel[c].curve.count > 257) most = 4'096;
    return int64_t{roi.width} * roi.height <= most;
}

/// Takes no memory. Not all intervals are solved where they are more than the pixels, either.
template <Layout layout, class T>
void mapFewWords(Image<const T> src, Image<T> dst, QorImageSize roi, Channel<T>* channel) {
    constexpr int processed = processedChannels(layout);
    kernels::KeptPolynomials<processed> kept;
    kernels::PolynomialRoom rooms[processed];
    const int32_t most = std::min(roi.width * roi.height, kept.kMost);
    for (int c = 0; c < processed; ++c) {
        if (channel[c].form == Form::step) continue;
        if (channel[c].curve.count - 1 <= most) {
            kept.solveAll(c, channel[c].curve);
        } else {
            rooms[c] = kept.forget(c);
            channel[c].solving = &rooms[c];
        }
    }
    mapBySearch<layout>(src, dst, roi, channel);
}

template <Layout layout, class T>
QorResult mapWords(Image<const T> src, Image<T> dst, QorImageSize roi, Channel<T>* channel, Form form) {
    constexpr int32_t mostOverTable = 12;  // levels that are compared in less time than a table is looked up
    const bool small = isSmall<layout>(roi, channel);
    if (form == Form::step && isFewSteps<layout>(channel, small ? kernels::kMostFewSteps : mostOverTable)) {
        mapFewSteps<layout>(src, dst, roi, channel);
        return QOR_OK;
    }
    if (!small) return mapWordsByTable<layout>(src, dst, roi, channel);
    mapFewWords<layout>(src, dst, roi, channel);
    return QOR_OK;
}

/// Curves take memory for their polynomials.
template <Layout layout>
QorResult mapFloats(Image<const float> src, Image<float> dst, QorImageSize roi, Channel<float>* channel, Form form) {
    if (form == Form::step && isFewSteps<layout>(channel, kernels::kMostFewSteps)) {
        mapFewSteps<layout>(src, dst, roi, channel);
        return QOR_OK;
    }
    constexpr int processed = processedChannels(layout);
    OwnedBlocks<3 * processed> blocks;
    for (int c = 0; c < processed && form != Form::step; ++c) {
        Curve<float>& curve = channel[c].curve;
        for (int power = 0; power < (curve.isCubic ? 3 : 1); ++power)
            curve.c[power] = blocks.template add<double>(int64_t{curve.count - 1} * elementBytes<double>);
    }
    if (QorResult r = blocks.check()) return r;
    for (int c = 0; c < processed && form != Form::step; ++c) kernels::fillPolynomials(channel[c].curve);
    mapBySearch<layout>(src, dst, roi, channel);
    return QOR_OK;
}

/// Checked arguments. Cubics of fewer than four levels are straight lines.
template <Layout layout, class T>
QorResult map(Image<const T> src, Image<T> dst, QorImageSize roi, const Level<T>* const* values,
              const Level<T>* const* levels, const int32_t* counts, Form form) {
    Channel<T> channel[processedChannels(layout)];
    for (int c = 0; c < processedChannels(layout); ++c) {
        const Form own = form == Form::cubic && counts[c] < 4 ? Form::linear : form;
        channel[c] = {{levels[c], values[c], counts[c], {}, own == Form::cubic},
                      own,
                      kernels::neverDecreasing(levels[c], counts[c]),
                      nullptr};
    }
    if constexpr (std::is_same_v<T, uint8_t>) {
        mapBytes<layout>(src, dst, roi, channel);
        return QOR_OK;
    } else if constexpr (std::is_same_v<T, float>) {
        return mapFloats<layout>(src, dst, roi, channel, form);
    } else {
        return mapWords<layout>(src, dst, roi, channel, form);
    }
}

template <class T, Layout layout>
QorResult lutStep(Image<const T> src, Image<T> dst, QorImageSize roi, const Level<T>* const* values,
                  const Level<T>* const* levels, const int32_t* counts) {
    if (QorResult r = check<layout>(src, dst, roi, values, levels, counts)) return r;
    return underControlOf<T>([&] { return map<layout>(src, dst, roi, values, levels, counts, Form::step); });
}

template <class T, Layout layout>
QorResult lutLinear(Image<const T> src, Image<T> dst, QorImageSize roi, const Level<T>* const* values,
                    const Level<T>* const* levels, const int32_t* counts) {
    if (QorResult r = check<layout>(src, dst, roi, values, levels, counts)) return r;
    return underDefaultControl([&] { return map<layout>(src, dst, roi, values, levels, counts, Form::linear); });
}

template <class T, Layout layout>
QorResult lutCubic(Image<const T> src, Image<T> dst, QorImageSize roi, const Level<T>* const* values,
                   const Level<T>* const* levels, const int32_t* counts) {
    if (QorResult r = check<layout>(src, dst, roi, values, levels, counts)) return r;
    return underDefaultControl([&] { return map<layout>(src, dst, roi, values, levels, counts, Form::cubic); });
}

}  // namespace
}  // namespace qori::convert

#include "entries/lut.inc"
