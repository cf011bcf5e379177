// SPDX-License-Identifier: Apache-2.0
#include "resize_taps.h"

#include "resize_floats.h"

namespace qori::kernels {
namespace {

/// Within each half, rows become columns: v[j] holds element j of all four in its low half, element 4 + j in its high.
QORI_INLINE void turnQuads(__m256 v[4]) {
    const __m256 a = _mm256_unpacklo_ps(v[0], v[1]), b = _mm256_unpackhi_ps(v[0], v[1]);
    const __m256 c = _mm256_unpacklo_ps(v[2], v[3]), d = _mm256_unpackhi_ps(v[2], v[3]);
    v[0] = _mm256_shuffle_ps(a, c, 0x44);
    v[1] = _mm256_shuffle_ps(a, c, 0xEE);
    v[2] = _mm256_shuffle_ps(b, d, 0x44);
    v[3] = _mm256_shuffle_ps(b, d, 0xEE);
}

/// Turns four elements of eight rows, given as four vectors of a row each half, into vectors of a column each.
QORI_INLINE void turnFloats(const float* const rows[kTapRows], ptrdiff_t at, float* out) {
    __m256 v[4];
    for (int j = 0; j < 4; ++j) {
        const __m256 upper = _mm256_castps128_ps256(_mm_loadu_ps(rows[j] + at));
        v[j] = _mm256_insertf128_ps(upper, _mm_loadu_ps(rows[4 + j] + at), 1);
    }
    turnQuads(v);
    for (int j = 0; j < 4; ++j) _mm256_storeu_ps(out + 8 * j, v[j]);
}

/// Turns n (1 to 8) elements of eight rows into as many vectors; the vectors behind them are written too.
template <class T>
QORI_INLINE void turnIn(const T* const rows[kTapRows], ptrdiff_t at, ptrdiff_t n, float* out) {
    if constexpr (std::is_same_v<T, float>) {
        if (n >= 8) {
            turnFloats(rows, at, out);
            turnFloats(rows, at + 4, out + 32);
            return;
        }
    }
    __m256 upper[4], lower[4];
    for (int j = 0; j < 4; ++j) upper[j] = toFloats(rows[j] + at, n);
    for (int j = 0; j < 4; ++j) lower[j] = toFloats(rows[4 + j] + at, n);
    turnQuads(upper);
    turnQuads(lower);
    for (int j = 0; j < 4; ++j) {
        _mm256_storeu_ps(out + 8 * j, _mm256_permute2f128_ps(upper[j], lower[j], 0x20));
        _mm256_storeu_ps(out + 8 * (4 + j), _mm256_permute2f128_ps(upper[j], lower[j], 0x31));
    }
}

/// Turns eight vectors of eight rows back into eight elements of each row.
QORI_INLINE void turnOut(const float* in, float* const out[kTapRows], ptrdiff_t at) {
    // Four rows at a time: columns c and 4 + c side by side turn into eight elements of a row.
    for (int half = 0; half < 2; ++half) {
        __m256 v[4];
        for (int c = 0; c < 4; ++c) {
            const __m256 low = _mm256_castps128_ps256(_mm_loadu_ps(in + 8 * c + 4 * half));
            v[c] = _mm256_insertf128_ps(low, _mm_loadu_ps(in + 8 * (4 + c) + 4 * half), 1);
        }
        turnQuads(v);
        for (int j = 0; j < 4; ++j) _mm256_storeu_ps(out[4 * half + j] + at, v[j]);
    }
}

template <class T>
QORI_NOINLINE void turnRows(const T* const from[kTapRows], ptrdiff_t at, ptrdiff_t elements, ptrdiff_t legalEnd,
                            float* out) {
    const T* rows[kTapRows];  // not reloaded after every store
    for (int j = 0; j < kTapRows; ++j) rows[j] = from[j];
    ptrdiff_t done = 0;
    // Elements beyond the ones asked for, but inside the row, keep the vectors whole. Eight rows at once are more
    // streams than processors follow by themselves: each block asks for as many lines as it uses up.
    constexpr int kLines = sizeof(T);
    for (int row = 0; done < elements && at + done + 8 <= legalEnd; done += 8, row = (row + kLines) & (kTapRows - 1)) {
        for (int j = row; j < row + kLines; ++j) prefetchAhead(rows[j] + at + done);
        turnIn(rows, at + done, 8, out + 8 * done);
    }
    if (done < elements) turnIn(rows, at + done, elements - done, out + 8 * done);
}

/// Copies one turned pixel to `count` places.
template <int channels>
void repeatPixel(const float* pixel, float* out, int32_t count) {
    for (int32_t i = 0; i < count; ++i, out += 8 * channels)
        for (int c = 0; c < channels; ++c) _mm256_storeu_ps(out + 8 * c, _mm256_loadu_ps(pixel + 8 * c));
}

/// Turns the columns first..last of the source, which may lie outside the legal ones.
template <class T, int channels>
void turnColumns(const RowFilter& filter, const T* const rows[kTapRows], int32_t first, int32_t last) {
    const int32_t from = first < filter.legalFirst ? filter.legalFirst : first;
    const int32_t to = last > filter.legalLast ? filter.legalLast : last;
    constexpr ptrdiff_t pixel = 8 * channels;
    float* const inside = filter.columns + (from - first) * pixel;
    turnRows(rows, ptrdiff_t{from} * channels, ptrdiff_t{to - from + 1} * channels,
             (ptrdiff_t{filter.legalLast} + 1) * channels, inside);
    repeatPixel<channels>(inside, filter.columns, from - first);
    repeatPixel<channels>(inside + (to - from) * pixel, inside + (to - from + 1) * pixel, last - to);
}

/// One pixel of eight rows. `taps` 0 is any number.
template <int channels, int taps>
QORI_INLINE void sumTaps(const float* column, const float* weights, int32_t count, float* out) {
    __m256 sum[channels];
    const __m256 first = _mm256_broadcast_ss(weights);
    for (int c = 0; c < channels; ++c) sum[c] = _mm256_mul_ps(first, _mm256_loadu_ps(column + 8 * c));
    const int32_t n = taps > 0 ? taps : count;
#pragma GCC unroll 12
    for (int32_t k = 1; k < n; ++k) {
        const __m256 weight = _mm256_broadcast_ss(weights + k);
        column += 8 * channels;
        for (int c = 0; c < channels; ++c) sum[c] = _mm256_fmadd_ps(weight, _mm256_loadu_ps(column + 8 * c), sum[c]);
    }
    for (int c = 0; c < channels; ++c) _mm256_storeu_ps(out + 8 * c, sum[c]);
}

/// Pixels whose weights repeat, one phase after the other, so that the weights stay in registers.
template <int channels, int taps>
QORI_NOINLINE void sumPhases(const RowFilter& filter, const PixelTaps* pixels, int32_t count, float* results) {
    const int32_t origin = pixels[0].first;
    for (int32_t phase = 0; phase < filter.period; ++phase) {
        const float* weights = filter.weights + pixels[phase].weights;
        __m256 weight[taps];
        for (int k = 0; k < taps; ++k) weight[k] = _mm256_broadcast_ss(weights + k);
        for (int32_t i = phase; i < count; i += filter.period) {
            const float* column = filter.columns + ptrdiff_t{pixels[i].first - origin} * (8 * channels);
            for (int c = 0; c < channels; ++c, column += 8) {
                __m256 sum = _mm256_mul_ps(weight[0], _mm256_loadu_ps(column));
#pragma GCC unroll 12
                for (int k = 1; k < taps; ++k)
                    sum = _mm256_fmadd_ps(weight[k], _mm256_loadu_ps(column + 8 * channels * k), sum);
                _mm256_storeu_ps(results + 8 * (ptrdiff_t{i} * channels + c), sum);
            }
        }
    }
}

template <int channels, int taps>
QORI_NOINLINE void sumGroup(const RowFilter& filter, const PixelTaps* pixels, int32_t count, float* out) {
    if constexpr (taps > 0)
        if (filter.period > 0 && 2 * filter.period <= count)
            return sumPhases<channels, taps>(filter, pixels, count, out);
    const int32_t origin = pixels[0].first;
    for (int32_t i = 0; i < count; ++i, out += 8 * channels) {
        sumTaps<channels, taps>(filter.columns + ptrdiff_t{pixels[i].first - origin} * (8 * channels),
                                filter.weights + pixels[i].weights, filter.taps, out);
    }
}

template <int channels>
auto chooseSum(int32_t taps) {
    switch (taps) {
        case 2: return sumGroup<channels, 2>;
        case 4: return sumGroup<channels, 4>;
        case 6: return sumGroup<channels, 6>;
        case 8: return sumGroup<channels, 8>;
        case 10: return sumGroup<channels, 10>;
        case 12: return sumGroup<channels, 12>;
        default: return sumGroup<channels, 0>;
    }
}

enum class Finish { plain, scaled, limited };

/// Rounds to nearest. What 32 bits do not hold becomes the least integer, which is right below them only; where sums
/// may be so large, those above are cut where they saturate anyway.
template <Finish finish>
QORI_INLINE __m256i toIntegers(__m256 sum) {
    return _mm256_cvtps_epi32(finish == Finish::limited ? _mm256_min_ps(sum, _mm256_set1_ps(0x1p30f)) : sum);
}

/// Rounds and saturates the n (at most kTapBlock) elements of four sums.
template <Finish finish, class T>
QORI_INLINE void storeSums(T* dst, const __m256 sum[4], ptrdiff_t n) {
    if constexpr (std::is_same_v<T, float>) {
        for (int j = 0; j < 4; ++j) storeUpTo(dst + 8 * j, Vec<float>{sum[j]}, n - 8 * j);
    } else {
        __m256i whole[4];
        for (int j = 0; j < 4; ++j) whole[j] = toIntegers<finish>(sum[j]);
        if constexpr (sizeof(T) == 1) {
            const __m256i packed =
                _mm256_packus_epi16(_mm256_packs_epi32(whole[0], whole[1]), _mm256_packs_epi32(whole[2], whole[3]));
            storeUpTo(dst, Bytes{_mm256_permutevar8x32_epi32(packed, _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7))}, n);
        } else {
            for (int j = 0; j < 4; j += 2) {
                const __m256i packed = std::is_signed_v<T> ? _mm256_packs_epi32(whole[j], whole[j + 1])
                                                           : _mm256_packus_epi32(whole[j], whole[j + 1]);
                storeUpTo(dst + 8 * j, Vec<T>{_mm256_permute4x64_epi64(packed, 0xD8)}, n - 8 * j);
            }
        }
    }
}

template <Finish finish, class T>
QORI_INLINE void finishSums(T* dst, __m256 sum[4], float scale, ptrdiff_t n) {
    if constexpr (finish == Finish::scaled)
        for (int j = 0; j < 4; ++j) sum[j] = _mm256_mul_ps(sum[j], _mm256_set1_ps(scale));
    storeSums<finish>(dst, sum, n);
}

template <Finish finish, class T>
QORI_NOINLINE void sumColumn(const float* const* rows, const PairedTaps& given, float scale, T* dst,
                             ptrdiff_t elements) {
    const PairedTaps taps = given;  // not reloaded after every store
    for (ptrdiff_t i = 0; i < elements; i += kTapBlock) {
        __m256 sums[4];
        for (int j = 0; j < 4; j += kPairVectors)
            sumOne<kPairVectors>(
                taps, [&](int32_t k) { return rows[k] + i + 8 * j; }, sums + j);
        finishSums<finish>(dst + i, sums, scale, elements - i);
    }
}

template <Finish finish, class Fixed, class T>
QORI_INLINE void sumBlockPair(const float* const* rows, const PairedTaps& taps, float scale, ptrdiff_t at, T* dst,
                              T* second, ptrdiff_t n) {
    __m256 sums[4], others[4];
    for (int j = 0; j < 4; j += kPairVectors)
        sumPair<kPairVectors>(
            taps, Fixed{}, [&](int32_t k) { return rows[k] + at + 8 * j; }, sums + j, others + j);
    finishSums<finish>(dst + at, sums, scale, n);
    finishSums<finish>(second + at, others, scale, n);
}

template <Finish finish, class Fixed, class T>
QORI_NOINLINE void sumColumnPair(const float* const* rows, const PairedTaps& given, float scale, T* dst, T* second,
                                 ptrdiff_t elements) {
    const PairedTaps taps = given;
    const float* own[Fixed::count + Fixed::shift + 1];
    for (int k = 0; k < Fixed::count + Fixed::shift; ++k) own[k] = rows[k];
    const float* const* const from = Fixed::count > 0 ? own : rows;
    // Whole blocks first: with partial ones in the same loop, registers do not suffice.
    ptrdiff_t i = 0;
    for (; i + kTapBlock <= elements; i += kTapBlock) {
        if constexpr (sizeof(T) < 4) {
            prefetchAhead(dst + i);
            prefetchAhead(second + i);
        }
        sumBlockPair<finish, Fixed>(from, taps, scale, i, dst, second, kTapBlock);
    }
    if (i < elements) sumBlockPair<finish, Fixed>(from, taps, scale, i, dst, second, elements - i);
}

template <Finish finish, class T>
void sumColumns(const float* const* rows, const PairedTaps& taps, float scale, T* dst, T* second, ptrdiff_t elements) {
    if (second == nullptr) return sumColumn<finish>(rows, taps, scale, dst, elements);
    const auto sum = [&]<class Fixed>(Fixed) {
        sumColumnPair<finish, Fixed>(rows, taps, scale, dst, second, elements);
    };
    if constexpr (finish == Finish::plain)
        withFixedTaps(taps, sum);
    else
        sum(AnyTaps{});
}

/// Source columns that a group may span before it is made smaller.
constexpr int32_t kMostColumns = 128;

}  // namespace

int32_t tapGroup(double ratio, int32_t taps) {
    if (ratio > 2.0 * taps) return 1;
    const double pixels = kMostColumns / ratio;
    return pixels >= kTapChunk ? kTapChunk : pixels < 1 ? 1 : static_cast<int32_t>(pixels);
}

int64_t tapColumnFloats(double ratio, int32_t taps, int channels) {
    // One column for the rounding of the span, eight elements that the last turn writes beyond it.
    const auto columns = static_cast<int64_t>((tapGroup(ratio, taps) - 1) * ratio) + taps + 1;
    return 8 * (columns * channels + 8);
}

template <class T, int channels>
void filterRows(const RowFilter& filter, const T* const rows[kTapRows], float* const out[kTapRows]) {
    const auto sum = chooseSum<channels>(filter.taps);
    for (int32_t x = 0; x < filter.width; x += kTapChunk) {
        const int32_t end = x + kTapChunk < filter.width ? x + kTapChunk : filter.width;
        for (int32_t i = x; i < end; i += filter.group) {
            const int32_t count = filter.group < end - i ? filter.group : end - i;
            const PixelTaps* pixels = filter.pixels + i;
            turnColumns<T, channels>(filter, rows, pixels[0].first, pixels[count - 1].first + filter.taps - 1);
            sum(filter, pixels, count, filter.results + ptrdiff_t{i - x} * (8 * channels));
        }
        for (ptrdiff_t e = 0; e < ptrdiff_t{end - x} * channels; e += 8)
            turnOut(filter.results + 8 * e, out, ptrdiff_t{x} * channels + e);
    }
}

template <class T>
void filterColumn(const float* const* rows, const PairedTaps& taps, ColumnFinish finish, T* dst, T* second,
                  ptrdiff_t elements) {
    if (finish.scale != 1) return sumColumns<Finish::scaled>(rows, taps, finish.scale, dst, second, elements);
    if (finish.isBounded || std::is_same_v<T, float>)
        return sumColumns<Finish::plain>(rows, taps, 1, dst, second, elements);
    if constexpr (!std::is_same_v<T, float>) sumColumns<Finish::limited>(rows, taps, 1, dst, second, elements);
}

#define QORI_TAPS(T)                                                                                    \
    template void filterRows<T, 1>(const RowFilter&, const T* const[kTapRows], float* const[kTapRows]); \
    template void filterRows<T, 3>(const RowFilter&, const T* const[kTapRows], float* const[kTapRows]); \
    template void filterRows<T, 4>(const RowFilter&, const T* const[kTapRows], float* const[kTapRows]);
QORI_TAPS(uint8_t)
QORI_TAPS(uint16_t)
QORI_TAPS(int16_t)
QORI_TAPS(float)
#undef QORI_TAPS
template void filterColumn(const float* const*, const PairedTaps&, ColumnFinish, uint8_t*, uint8_t*, ptrdiff_t);
template void filterColumn(const float* const*, const PairedTaps&, ColumnFinish, uint16_t*, uint16_t*, ptrdiff_t);
template void filterColumn(const float* const*, const PairedTaps&, ColumnFinish, int16_t*, int16_t*, ptrdiff_t);
template void filterColumn(const float* const*, const PairedTaps&, ColumnFinish, float*, float*, ptrdiff_t);

}  // namespace qori::kernels
