// SPDX-License-Identifier: Apache-2.0
// Which pixel of a square is nearest to all the others: the colour median, by sums of |dr| + |dg| + |db|.
#pragma once
#include <limits>

#include "order.h"

namespace qori::kernels {
namespace detail {

/// Lanes in which 24 distances fit: 24 * 3 * 255 = 18360 for bytes, 24 * 3 * 65535 = 4718520 for words.
template <class T>
struct DistanceOf {
    using type = int32_t;
};
template <>
struct DistanceOf<uint8_t> {
    using type = int16_t;
};
template <>
struct DistanceOf<float> {
    using type = float;
};

template <class W>
QORI_INLINE Vec<W> distance(const Vec<W>* a, const Vec<W>* b) {
    const auto difference = [=](int c) __attribute__((always_inline))->Vec<W> {
        if constexpr (std::is_same_v<W, float>) {
            const Vec<W> d = a[c] - b[c];
            return {_mm256_andnot_ps(_mm256_set1_ps(-0.0f), d.v)};
        } else {
            return {absoluteDifference(a[c], b[c]).v};
        }
    };
    return difference(0) + difference(1) + difference(2);
}

}  // namespace detail

template <class T>
using DistanceIn = typename detail::DistanceOf<T>::type;

/// Pixels of one row, channels apart, in the type in which distances are summed.
template <class T>
struct ColourRow {
    static constexpr int pixels = 64, room = pixels + 4 + Vec<DistanceIn<T>>::lanes;
    alignas(kVectorBytes) DistanceIn<T> plane[3][room];

    void read(const T* p, ptrdiff_t count, int channels) {
        for (ptrdiff_t i = 0; i < count; ++i)
            for (int c = 0; c < 3; ++c) plane[c][i] = get(p + i * channels + c);
    }
};

/// Up to ColourRow::pixels medians of side x side pixels; rows[j] has the windows' row j. The results are whole
/// vectors. Float sums read the control register.
template <int side, class T>
QORI_NOINLINE void medianColour(const ColourRow<T>* const* rows, ptrdiff_t count, ColourRow<T>& result) {
    using W = DistanceIn<T>;
    constexpr int all = side * side;
    for (ptrdiff_t at = 0; at < count; at += Vec<W>::lanes) {
        const auto pixel = [=](int k, Vec<W>* to) __attribute__((always_inline)) {
            for (int c = 0; c < 3; ++c) to[c] = load(rows[k / side]->plane[c] + at + k % side);
        };
        Vec<W> sums[all];
        for (int k = 0; k < all; ++k) sums[k] = zero<W>();
        for (int k = 0; k < all; ++k) {  // adds to each sum in row order: those before k have met it already
            Vec<W> own[3], sum = sums[k];
            pixel(k, own);
            for (int j = k + 1; j < all; ++j) {
                Vec<W> other[3];
                pixel(j, other);
                const Vec<W> d = detail::distance(own, other);
                sum = sum + d;
                sums[j] = sums[j] + d;
            }
            sums[k] = sum;
        }
        Vec<W> best[3], least;
        pixel(0, best);
        if constexpr (std::is_same_v<W, float>)  // NaN is not less than infinity
            least = smaller(sums[0], splat(std::numeric_limits<float>::infinity()));
        else
            least = sums[0];
        for (int k = 1; k < all; ++k) {
            Vec<W> other[3];
            pixel(k, other);
            const Mask<W> nearer = isLess(sums[k], least);
            least = select(nearer, sums[k], least);
            for (int c = 0; c < 3; ++c) best[c] = select(nearer, other[c], best[c]);
        }
        for (int c = 0; c < 3; ++c) store(result.plane[c] + at, best[c]);
    }
}

}  // namespace qori::kernels
