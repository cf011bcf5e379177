// SPDX-License-Identifier: Apache-2.0
// Sums whose order of additions is part of the result, and sums over rows.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

/// Dot products of 32-bit integers, which no integer register holds: products and sums in double precision, one
/// channel's from left to right.
template <int channels, class T>
QORI_NOINLINE void sequentialDotRowOf(double* sums, ptrdiff_t pixels, const T* a, const T* b) {
    double own[channels];
    for (int c = 0; c < channels; ++c) own[c] = sums[c];
    for (ptrdiff_t x = 0; x < pixels; ++x)
        for (int c = 0; c < channels; ++c) {
            const ptrdiff_t i = x * channels + c;
            own[c] += static_cast<double>(a[i]) * static_cast<double>(b[i]);
        }
    for (int c = 0; c < channels; ++c) sums[c] = own[c];
}

template <class T>
void sequentialDotRow(double* sums, int channels, ptrdiff_t pixels, const T* a, const T* b) {
    switch (channels) {
        case 1: return sequentialDotRowOf<1>(sums, pixels, a, b);
        case 3: return sequentialDotRowOf<3>(sums, pixels, a, b);
        default: return sequentialDotRowOf<4>(sums, pixels, a, b);
    }
}

QORI_INLINE Vec<float> scaled(Vec<float> a, float weight) { return {_mm256_mul_ps(a.v, _mm256_set1_ps(weight))}; }
QORI_INLINE Vec<double> scaled(Vec<double> a, double weight) { return {_mm256_mul_pd(a.v, _mm256_set1_pd(weight))}; }
QORI_INLINE Vec<float> added(Vec<float> a, Vec<float> b) { return {_mm256_add_ps(a.v, b.v)}; }
QORI_INLINE Vec<double> added(Vec<double> a, Vec<double> b) { return {_mm256_add_pd(a.v, b.v)}; }

/// dst[j] = weights[0] * rows[0][j] + weights[1] * rows[1][j] + ..., every product rounded, added in this order.
template <class T>
void weightedRows(T* dst, ptrdiff_t length, const T* const* rows, const T* weights, int count) {
    constexpr int n = Vec<T>::lanes, vectors = 4;
    ptrdiff_t j = 0;
    for (; j <= length - n * vectors; j += n * vectors) {
        Vec<T> sum[vectors];
        for (int v = 0; v < vectors; ++v) sum[v] = scaled(load(rows[0] + j + v * n), weights[0]);
        for (int i = 1; i < count; ++i)
            for (int v = 0; v < vectors; ++v) sum[v] = added(sum[v], scaled(load(rows[i] + j + v * n), weights[i]));
        for (int v = 0; v < vectors; ++v) store(dst + j + v * n, sum[v]);
    }
    for (; j < length; j += n) {
        const ptrdiff_t rest = length - j;
        Vec<T> sum = scaled(loadUpTo(rows[0] + j, rest), weights[0]);
        for (int i = 1; i < count; ++i) sum = added(sum, scaled(loadUpTo(rows[i] + j, rest), weights[i]));
        storeUpTo(dst + j, sum, rest);
    }
}

}  // namespace qori::kernels
