// SPDX-License-Identifier: Apache-2.0
#include "taps_columns.h"

#include "floats.h"
#include "image/image.h"
#include "kernels/copy_rows.h"

namespace qori::kernels {
namespace {

enum class Finish {
    plain,
    scaled,  ///< Of super-sampling.
    limited
};

/// Rounds to nearest. What 32 bits do not hold becomes the least integer, which is right below them only; where sums
/// may be so large, those above are cut where they saturate anyway.
template <Finish finish>
QORI_INLINE __m256i toIntegers(__m256 sum) {
    return _mm256_cvtps_epi32(finish == Finish::limited ? _mm256_min_ps(sum, _mm256_set1_ps(0x1p30f)) : sum);
}

/// Rounds and saturates a block of sums.
template <Finish finish, class T>
QORI_INLINE void storeSums(T* dst, const __m256 sum[4]) {
    if constexpr (std::is_same_v<T, float>) {
        for (int j = 0; j < 4; ++j) store(dst + 8 * j, Vec<float>{sum[j]});
    } else {
        __m256i whole[4];
        for (int j = 0; j < 4; ++j) whole[j] = toIntegers<finish>(sum[j]);
        if constexpr (sizeof(T) == 1) {
            const __m256i packed =
                _mm256_packus_epi16(_mm256_packs_epi32(whole[0], whole[1]), _mm256_packs_epi32(whole[2], whole[3]));
            store(dst, Bytes{_mm256_permutevar8x32_epi32(packed, _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7))});
        } else {
            for (int j = 0; j < 4; j += 2) {
                const __m256i packed = std::is_signed_v<T> ? _mm256_packs_epi32(whole[j], whole[j + 1])
                                                           : _mm256_packus_epi32(whole[j], whole[j + 1]);
                store(dst + 8 * j, Vec<T>{_mm256_permute4x64_epi64(packed, 0xD8)});
            }
        }
    }
}

template <Finish finish, class T>
QORI_INLINE void finishSums(T* dst, __m256 sum[4], float scale) {
    if constexpr (finish == Finish::scaled)
        for (int j = 0; j < 4; ++j) sum[j] = _mm256_mul_ps(sum[j], _mm256_set1_ps(scale));
    storeSums<finish>(dst, sum);
}

/// Makes one row or two, of at least one block. The last block ends with the row and may make elements again.
template <class T>
using SumRows = void (*)(const float* const* rows, const PairedTaps& taps, float scale, T* dst, T* second,
                         ptrdiff_t elements);

template <class Body>
QORI_INLINE void forEachBlock(ptrdiff_t elements, Body body) {
    const ptrdiff_t last = elements - kTapBlock;
    for (ptrdiff_t i = 0;; i = std::min(i + kTapBlock, last)) {
        body(i);
        if (i == last) return;
    }
}

template <Finish finish, class T>
void sumColumn(const float* const* rows, const PairedTaps& given, float scale, T* dst, T*, ptrdiff_t elements) {
    const PairedTaps taps = given;  // not reloaded after every store
    forEachBlock(elements, [&](ptrdiff_t i) {
        __m256 sums[4];
        for (int j = 0; j < 4; j += kPairVectors)
            sumChain<kPairVectors>(
                taps.first, taps.count, [&](int32_t k) { return rows[k] + i + 8 * j; }, sums + j,
                finish == Finish::scaled ? kAscendingTaps : kPairedTaps);
        finishSums<finish>(dst + i, sums, scale);
    });
}

template <Finish finish, class Fixed, class T>
void sumColumnPair(const float* const* rows, const PairedTaps& given, float scale, T* dst, T* second,
                   ptrdiff_t elements) {
    const PairedTaps taps = given;
    const float* own[Fixed::count + Fixed::shift + 1];
    for (int k = 0; k < Fixed::count + Fixed::shift; ++k) own[k] = rows[k];
    const float* const* const from = Fixed::count > 0 ? own : rows;
    forEachBlock(elements, [&](ptrdiff_t i) {
        if constexpr (sizeof(T) < 4) {
            prefetchAhead(dst + i);
            prefetchAhead(second + i);
        }
        __m256 sums[4], others[4];
        for (int j = 0; j < 4; j += kPairVectors)
            sumPair<kPairVectors>(
                taps, Fixed{}, [&](int32_t k) { return from[k] + i + 8 * j; }, sums + j, others + j);
        finishSums<finish>(dst + i, sums, scale);
        finishSums<finish>(second + i, others, scale);
    });
}

template <Finish finish, class T>
SumRows<T> chooseSum(const PairedTaps& taps, bool isPair) {
    if (!isPair) return sumColumn<finish, T>;
    SumRows<T> chosen = nullptr;
    const auto choose = [&]<class Fixed>(Fixed) { chosen = sumColumnPair<finish, Fixed, T>; };
    if constexpr (finish == Finish::plain)
        withFixedTaps(taps, choose);
    else
        withAnyTaps(taps, choose);
    return chosen;
}

template <class T>
SumRows<T> chooseSum(const PairedTaps& taps, ColumnFinish finish, bool isPair) {
    if (finish.scale != 1) return chooseSum<Finish::scaled, T>(taps, isPair);
    if constexpr (!std::is_same_v<T, float>)
        if (!finish.isBounded) return chooseSum<Finish::limited, T>(taps, isPair);
    return chooseSum<Finish::plain, T>(taps, isPair);
}

}  // namespace

void fillUpBlock(float* row, ptrdiff_t elements) {
    for (ptrdiff_t i = (elements + 7) / 8 * 8; i % kTapBlock != 0; i += 8)
        _mm256_storeu_ps(row + i, _mm256_setzero_ps());
}

template <class T>
void filterColumn(const float* const* rows, const PairedTaps& taps, ColumnFinish finish, T* dst, T* second,
                  ptrdiff_t elements) {
    const SumRows<T> sum = chooseSum<T>(taps, finish, second != nullptr);
    const auto scale = static_cast<float>(finish.scale);
    if (elements >= kTapBlock) return sum(rows, taps, scale, dst, second, elements);
    T narrow[2][kTapBlock];
    sum(rows, taps, scale, narrow[0], narrow[1], kTapBlock);
    copyRow(asBytes(dst), asBytes(narrow[0]), elements * elementBytes<T>);
    if (second != nullptr) copyRow(asBytes(second), asBytes(narrow[1]), elements * elementBytes<T>);
}

namespace {

template <int vectors, int taps, bool isFirst>
QORI_INLINE void addVectors(const float* const* rows, const float* weights, int32_t count, ptrdiff_t at,
                            double* totals) {
    Totals<vectors> sum;
    sum.clear();
    for (int v = 0; v < vectors && !isFirst; ++v) {
        sum.low[v] = _mm256_loadu_pd(totals + at + 8 * v);
        sum.high[v] = _mm256_loadu_pd(totals + at + 8 * v + 4);
    }
    sum.addBlock(weights, taps > 0 ? taps : count, [=](int32_t k) { return rows[k] + at; });
    for (int v = 0; v < vectors; ++v) {
        _mm256_storeu_pd(totals + at + 8 * v, sum.low[v]);
        _mm256_storeu_pd(totals + at + 8 * v + 4, sum.high[v]);
    }
}

template <int taps, bool isFirst>
QORI_NOINLINE void addRows(const float* const* given, const float* weights, int32_t count, double* totals,
                           ptrdiff_t elements) {
    const float* rows[kTapsPerBlock];  // not reloaded after every store
    for (int32_t k = 0; k < kTapsPerBlock; ++k) rows[k] = given[k < count ? k : 0];
    ptrdiff_t i = 0;
    for (; i + 8 < elements; i += 16) addVectors<2, taps, isFirst>(rows, weights, count, i, totals);
    if (i < elements) addVectors<1, taps, isFirst>(rows, weights, count, i, totals);
}

template <Finish finish, class T>
void finishAll(const double* totals, double scale, T* dst, ptrdiff_t elements) {
    for (ptrdiff_t i = 0; i < elements; i += kTapBlock) {
        __m256 sums[4] = {};
        for (int j = 0; j < 4 && i + 8 * j < elements; ++j) {
            const double* const from = totals + i + 8 * j;
            sums[j] = Totals<1>{{_mm256_loadu_pd(from)}, {_mm256_loadu_pd(from + 4)}}.times(scale, 0);
        }
        if (i + kTapBlock <= elements) {
            storeSums<finish>(dst + i, sums);
            continue;
        }
        T last[kTapBlock];
        storeSums<finish>(last, sums);
        copyRow(asBytes(dst + i), asBytes(last), (elements - i) * elementBytes<T>);
    }
}

}  // namespace

void addToTotals(const float* const* rows, const float* weights, int32_t taps, bool isFirst, double* totals,
                 ptrdiff_t elements) {
    const auto add = taps == kTapsPerBlock ? (isFirst ? addRows<kTapsPerBlock, true> : addRows<kTapsPerBlock, false>)
                                           : (isFirst ? addRows<0, true> : addRows<0, false>);
    add(rows, weights, taps, totals, elements);
}

template <class T>
void finishTotals(const double* totals, ColumnFinish finish, T* dst, ptrdiff_t elements) {
    if (finish.isBounded || std::is_same_v<T, float>)
        return finishAll<Finish::plain>(totals, finish.scale, dst, elements);
    if constexpr (!std::is_same_v<T, float>) finishAll<Finish::limited>(totals, finish.scale, dst, elements);
}

#define QORI_COLUMNS(T)                                                                                  \
    template void filterColumn(const float* const*, const PairedTaps&, ColumnFinish, T*, T*, ptrdiff_t); \
    template void finishTotals(const double*, ColumnFinish, T*, ptrdiff_t);
QORI_COLUMNS(uint8_t)
QORI_COLUMNS(uint16_t)
QORI_COLUMNS(int16_t)
QORI_COLUMNS(float)
#undef QORI_COLUMNS

}  // namespace qori::kernels
