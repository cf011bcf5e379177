// SPDX-License-Identifier: Apache-2.0
// Rows of packed spectra where the parts of a frequency lie side by side: pixel 2 k holds the real part, 2 k + 1 the
// imaginary one, of every channel.
#pragma once
#include "butterflies.h"
#include "spectrum_elements.h"

namespace qori::kernels {

/// Products of `pairs` frequencies. In place where dst is a or b.
template <int channels, int processed, class T, class Product>
void multiplyPairs(Product product, const T* a, const T* b, T* dst, ptrdiff_t pairs) {
    for (ptrdiff_t i = 0; i < pairs; ++i, a += 2 * channels, b += 2 * channels, dst += 2 * channels)
        for (int c = 0; c < processed; ++c) {
            const Frequency<T> f = product(Frequency<T>{a[c], a[c + channels]}, Frequency<T>{b[c], b[c + channels]});
            dst[c] = f.re;
            dst[c + channels] = f.im;
        }
}

/// Of one channel of floats, four at a time: the same roundings.
template <bool conjugate>
void multiplyFloatPairs(const float* a, const float* b, float* dst, ptrdiff_t pairs) {
    const __m256 sign = _mm256_castsi256_ps(_mm256_set1_epi64x(conjugate ? INT64_MIN : 0));
    for (ptrdiff_t i = 0; i < 2 * pairs; i += 8) {
        const ptrdiff_t left = 2 * pairs - i;
        const __m256 x = loadUpTo(a + i, left).v, y = _mm256_xor_ps(loadUpTo(b + i, left).v, sign);
        // Even lanes are a.re c - a.im d, odd ones a.re d + a.im c.
        const __m256 cross = _mm256_mul_ps(_mm256_movehdup_ps(x), _mm256_permute_ps(y, 0xB1));
        storeUpTo(dst + i, Vec<float>{_mm256_fmaddsub_ps(_mm256_moveldup_ps(x), y, cross)}, left);
    }
}

/// value(f) of `pairs` frequencies in order to dst, and what it makes of their conjugates to mirror, backwards.
template <int channels, class T, class Value>
void evaluatePairs(Value value, const T* src, T* dst, T* mirror, ptrdiff_t pairs) {
    for (ptrdiff_t i = 0; i < pairs; ++i, src += 2 * channels, dst += channels, mirror -= channels)
        for (int c = 0; c < channels; ++c) {
            const Frequency<T> f = {src[c], src[c + channels]};
            dst[c] = value(f);
            mirror[c] = value.mirrored(dst[c], f);
        }
}

}  // namespace qori::kernels
