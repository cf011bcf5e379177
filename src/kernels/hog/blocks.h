// SPDX-License-Identifier: Apache-2.0
// Histograms of cells, which add up to blocks of 2 x 2 cells.
//
// A cell belongs to up to four blocks, in each of them at another place, and its pixels vote for the four cells of
// each: 16 sums a bin, in two vectors, made in one pass over the pixels, or 4 where blocks do not overlap. A block is
// the sum of its cells' shares in the order top-left, top-right, bottom-left, bottom-right, whichever windows it
// belongs to, so that it is the same bit by bit wherever it is made.
#pragma once
#include "gradients.h"

namespace qori::kernels {

/// Sums of a bin: for each of four places of the cell in a block the four cells.
inline constexpr int kHogSums = 16;

/// Shares of one cell by bin. Votes of even and of odd columns are summed apart, since neighbours often vote for the
/// same bin and each sum would wait for the one before. Beyond the last bin is one that is added to the first.
struct CellShares {
    static constexpr int kSets = 2, kMostBins = 16, kBins = kMostBins + 1;
    alignas(kVectorBytes) float sum[kSets][kBins][kHogSums];
};

namespace hog {

/// Adds weights times a vote to as many sums, each rounded once.
template <int count>
QORI_INLINE void addVote(float* sums, const float* weights, float vote) {
    if constexpr (count == 4) {
        _mm_store_ps(sums, _mm_fmadd_ps(_mm_loadu_ps(weights), _mm_set1_ps(vote), _mm_load_ps(sums)));
    } else {
        for (int k = 0; k < count; k += 8)
            store(sums + k, Vec<float>{_mm256_fmadd_ps(load(weights + k).v, splat(vote).v, load(sums + k).v)});
    }
}

/// In vectors as they are read: loads wait for two stores that they span.
template <int count>
QORI_INLINE void clearSums(float* sums) {
    if constexpr (count == 4)
        _mm_store_ps(sums, _mm_setzero_ps());
    else
        for (int k = 0; k < count; k += 8) store(sums + k, zero<float>());
}

template <int count>
QORI_INLINE void addSums(float* sums, const float* more) {
    if constexpr (count == 4)
        _mm_store_ps(sums, _mm_add_ps(_mm_load_ps(sums), _mm_load_ps(more)));
    else
        for (int k = 0; k < count; k += 8) store(sums + k, load(sums + k) + load(more + k));
}

/// `count` sums of each bin, from the k-th on.
template <int count>
QORI_INLINE void sumCell(const HogVotes& votes, ptrdiff_t step, int size, int nbins, const float* weights,
                         CellShares& shares, int k) {
    for (auto& set : shares.sum)
        for (int bin = 0; bin <= nbins; ++bin) clearSums<count>(set[bin] + k);
    weights += k;
    for (int y = 0; y < size; ++y) {
        const HogVotes row = votes.from(y * step);
        for (int x = 0; x < size; ++x, weights += kHogSums) {
            // Whatever a caller whose images overlap the buffer has made of it, no bin is beyond the last.
            float* const sums = shares.sum[x % CellShares::kSets][row.bin[x] & (CellShares::kMostBins - 1)] + k;
            addVote<count>(sums, weights, row.first[x]);
            addVote<count>(sums + kHogSums, weights, row.second[x]);
        }
    }
    for (int bin = 0; bin <= nbins; ++bin) addSums<count>(shares.sum[0][bin] + k, shares.sum[1][bin] + k);
    addSums<count>(shares.sum[0][0] + k, shares.sum[0][nbins] + k);
}

}  // namespace hog

/// Votes of size x size pixels, whose rows lie `step` pixels apart. weights: kHogSums floats a pixel.
inline void sumCell(const HogVotes& votes, ptrdiff_t step, int size, int nbins, const float* weights,
                    CellShares& shares) {
    hog::sumCell<kHogSums>(votes, step, size, nbins, weights, shares, 0);
}

/// The same of a cell that has but one place in blocks, whose share alone is made.
inline void sumCellAt(int place, const HogVotes& votes, ptrdiff_t step, int size, int nbins, const float* weights,
                      CellShares& shares) {
    hog::sumCell<4>(votes, step, size, nbins, weights, shares, 4 * place);
}

/// The cell's share of the block in which it has a place (0 to 3), as four cells by bin. The first one begins the
/// block.
inline void addShare(const CellShares& shares, int place, int nbins, float* block) {
    for (int bin = 0; bin < nbins; ++bin) {
        const __m128 share = _mm_load_ps(shares.sum[0][bin] + 4 * place);
        float* const at = block + 4 * bin;
        _mm_storeu_ps(at, place == 0 ? share : _mm_add_ps(_mm_loadu_ps(at), share));
    }
}

/// Added to the sum of squares, so that blocks without gradients stay zero: far below the square of a grey level.
inline constexpr double kHogEpsilon = 1e-6;

/// The sum of a block's n squares; n is a multiple of 4. In double precision nothing overflows.
inline double hogSquares(const float* values, int n) {
    __m256d sum = _mm256_setzero_pd();
    for (int i = 0; i < n; i += 4) {
        const __m256d v = _mm256_cvtps_pd(_mm_loadu_ps(values + i));
        sum = _mm256_fmadd_pd(v, v, sum);
    }
    double part[4];
    _mm256_storeu_pd(part, sum);
    return (part[0] + part[1]) + (part[2] + part[3]);
}

/// From four cells by bin to bins by cell, scaled to length 1, cut off at the threshold and scaled again.
inline void finishBlock(float* block, int nbins, float threshold) {
    alignas(kVectorBytes) float values[64];
    const int n = 4 * nbins;
    const auto scaleOf = [n](const float* from) {
        return static_cast<float>(1 / __builtin_sqrt(hogSquares(from, n) + kHogEpsilon));
    };
    const __m128 most = _mm_set1_ps(threshold);
    const __m128 first = _mm_set1_ps(scaleOf(block));
    for (int i = 0; i < n; i += 4)
        _mm_store_ps(values + i, _mm_min_ps(_mm_mul_ps(_mm_loadu_ps(block + i), first), most));
    const float second = scaleOf(values);
    for (int cell = 0; cell < 4; ++cell)
        for (int bin = 0; bin < nbins; ++bin) block[cell * nbins + bin] = values[4 * bin + cell] * second;
}

/// Floats to memory that is not read soon: one after the other past the cache, so that whole lines fill up. dst is
/// aligned to 4 bytes.
inline void streamFloats(float* dst, const float* src, ptrdiff_t n) {
    const auto isAligned = [&](uintptr_t bytes) { return reinterpret_cast<uintptr_t>(dst) % bytes == 0; };
    const auto one = [&] {
        int32_t word;
        __builtin_memcpy(&word, src, sizeof word);
        _mm_stream_si32(reinterpret_cast<int*>(dst), word);
        ++dst, ++src, --n;
    };
    const auto four = [&] {
        _mm_stream_ps(dst, _mm_loadu_ps(src));
        dst += 4, src += 4, n -= 4;
    };
    while (n > 0 && !isAligned(16)) one();
    if (n >= 4 && !isAligned(32)) four();
    for (; n >= 8; dst += 8, src += 8, n -= 8) stream(dst, load(src));
    if (n >= 4) four();
    while (n > 0) one();
}

}  // namespace qori::kernels
