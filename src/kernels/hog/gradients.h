// SPDX-License-Identifier: Apache-2.0
// Gradients of rows as votes for orientations. All of it in single precision; under default control.
#pragma once
#include "kernels/vector_math.h"

namespace qori::kernels {

/// For each pixel of some rows: the bin that it votes for, and how much for that and for the next one.
struct HogVotes {
    float *first, *second;
    uint8_t* bin;

    HogVotes from(ptrdiff_t pixel) const { return {first + pixel, second + pixel, bin + pixel}; }
};

/// Pixels made at a time; votes are written in whole blocks.
inline constexpr int kHogBlock = Vec<float>::lanes;

namespace hog {

/// Eight elements as numbers whose differences are exact, but for floats.
template <class T>
QORI_INLINE auto loadNumbers(const T* p) {
    if constexpr (sizeof(T) == 4)
        return load(p);
    else if constexpr (sizeof(T) == 1)
        return Vec<int32_t>{_mm256_cvtepu8_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(p)))};
    else
        return Vec<int32_t>{loadWidened(p).v};
}

QORI_INLINE Vec<float> asFloats(Vec<float> a) { return a; }
QORI_INLINE Vec<float> asFloats(Vec<int32_t> a) { return {_mm256_cvtepi32_ps(a.v)}; }

template <class T>
QORI_INLINE Vec<float> difference(const T* high, const T* low) {
    return asFloats(loadNumbers(high) - loadNumbers(low));
}

struct Gradient {
    Vec<float> dx, dy, squares;  ///< squares: dx^2 + dy^2.

    QORI_INLINE static Gradient of(Vec<float> dx, Vec<float> dy) {
        return {dx, dy, {_mm256_fmadd_ps(dx.v, dx.v, (dy * dy).v)}};
    }
    QORI_INLINE Gradient orLarger(const Gradient& other) const {
        const Mask<float> larger = isLess(squares, other.squares);
        return {select(larger, other.dx, dx), select(larger, other.dy, dy), select(larger, other.squares, squares)};
    }
};

/// Channel c of eight pixels of three: the elements of a channel lie in different lanes of the three vectors.
template <int c>
QORI_INLINE Vec<float> channelOf(const Vec<float> (&v)[3]) {
    constexpr int lanes[3] = {0x49, 0x92, 0x24};  // lanes 0, 3, 6; lanes 1, 4, 7; lanes 2, 5
    constexpr int ofSecond = lanes[(c + 1) % 3], ofThird = lanes[(c + 2) % 3];
    // Of the second vector channel 0 has lanes 1, 4, 7, channel 1 lanes 2, 5 and channel 2 lanes 0, 3, 6.
    const __m256 two = _mm256_blend_ps(v[0].v, v[1].v, ofSecond);
    const __m256 all = _mm256_blend_ps(two, v[2].v, ofThird);
    constexpr int order[3][8] = {{0, 3, 6, 1, 4, 7, 2, 5}, {1, 4, 7, 2, 5, 0, 3, 6}, {2, 5, 0, 3, 6, 1, 4, 7}};
    const __m256i index = _mm256_setr_epi32(order[c][0], order[c][1], order[c][2], order[c][3], order[c][4],
                                            order[c][5], order[c][6], order[c][7]);
    return {_mm256_permutevar8x32_ps(all, index)};
}

/// Of eight pixels; of three channels the gradient with the largest sum of squares, the first where several have it.
template <int channels, class T>
QORI_INLINE Gradient gradientAt(const T* above, const T* row, const T* below) {
    if constexpr (channels == 1) {
        return Gradient::of(difference(row + 1, row - 1), difference(below, above));
    } else {
        Vec<float> dx[3], dy[3];
        for (int k = 0; k < 3; ++k) {
            const int at = k * Vec<float>::lanes;
            dx[k] = difference(row + at + 3, row + at - 3);
            dy[k] = difference(below + at, above + at);
        }
        return Gradient::of(channelOf<0>(dx), channelOf<0>(dy))
            .orLarger(Gradient::of(channelOf<1>(dx), channelOf<1>(dy)))
            .orLarger(Gradient::of(channelOf<2>(dx), channelOf<2>(dy)));
    }
}

/// The angle in [0, 2 pi) by a rational approximation of the arc tangent, off by up to 0.005.
QORI_INLINE Vec<float> orientationOf(const Gradient& g) {
    constexpr float kPi = 3.14159265f, kEpsilon = 2.220446e-16f;
    const Vec<float> xx = g.dx * g.dx, yy = g.dy * g.dy, none = zero<float>();
    const Mask<float> isWide = isAtMost(yy, xx);
    const Vec<float> larger = select(isWide, xx, yy), smaller = select(isWide, yy, xx);
    const Vec<float> ratio = (g.dx * g.dy) / (larger + splat(0.28f) * smaller + splat(kEpsilon));
    const Mask<float> isUp = isAtMost(none, g.dy);
    const Vec<float> wide = select(isLess(g.dx, none), splat(kPi), select(isUp, none, splat(2 * kPi)));
    const Vec<float> tall = select(isUp, splat(kPi / 2), splat(3 * kPi / 2));
    return select(isWide, ratio + wide, tall - ratio);
}

/// A bin of -1 ... 2 nbins - 1 modulo nbins; where the gradient is no number, any.
QORI_INLINE Vec<int32_t> wrapBin(Vec<int32_t> bin, int nbins) {
    const Vec<int32_t> count = splat(nbins), last = splat(nbins - 1);
    const Vec<int32_t> raised = bin + selectOrZero(isLess(bin, zero<int32_t>()), count);
    const Vec<int32_t> wrapped = raised - selectOrZero(isLess(last, raised), count);
    return {_mm256_min_epu32(wrapped.v, last.v)};
}

QORI_INLINE void storeBins(uint8_t* p, Vec<int32_t> bins) {
    const __m128i words = _mm_packs_epi32(_mm256_castsi256_si128(bins.v), _mm256_extracti128_si256(bins.v, 1));
    _mm_storel_epi64(reinterpret_cast<__m128i*>(p), _mm_packus_epi16(words, words));
}

template <int channels, class T>
QORI_INLINE void voteBlock(const T* above, const T* row, const T* below, const HogVotes& votes, int nbins,
                           float binsPerRadian) {
    const Gradient gradient = gradientAt<channels>(above, row, below);
    const Vec<float> place = orientationOf(gradient) * splat(binsPerRadian) - splat(0.5f);
    const Vec<float> bin{_mm256_floor_ps(place.v)};
    const Vec<float> fraction = place - bin;
    const Vec<float> size = squareRoot(gradient.squares);
    store(votes.first, size * (splat(1.0f) - fraction));
    store(votes.second, size * fraction);
    storeBins(votes.bin, wrapBin({_mm256_cvttps_epi32(bin.v)}, nbins));
}

}  // namespace hog

/// Of n pixels. The row is read from one pixel to the left to one behind it. A square root in single precision is what
/// one in double precision rounds to.
template <int channels, class T>
void hogVotes(const T* above, const T* row, const T* below, HogVotes votes, ptrdiff_t n, int nbins,
              float binsPerRadian) {
    ptrdiff_t x = 0;
    for (; x + kHogBlock <= n; x += kHogBlock)
        hog::voteBlock<channels>(above + x * channels, row + x * channels, below + x * channels, votes.from(x), nbins,
                                 binsPerRadian);
    if (x == n) return;
    T rest[3][(kHogBlock + 2) * channels] = {};
    const auto copy = [&](const T* from, T* to, ptrdiff_t pixels) {
        for (ptrdiff_t i = 0; i < pixels * channels; ++i) to[i] = from[i];
    };
    copy(above + x * channels, rest[0] + channels, n - x);
    copy(row + (x - 1) * channels, rest[1], n - x + 2);
    copy(below + x * channels, rest[2] + channels, n - x);
    hog::voteBlock<channels>(rest[0] + channels, rest[1] + channels, rest[2] + channels, votes.from(x), nbins,
                             binsPerRadian);
}

}  // namespace qori::kernels
