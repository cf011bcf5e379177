// SPDX-License-Identifier: Apache-2.0
// Up to eight elements as floats, zeros behind the n that there are.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

QORI_INLINE __m256 toFloats(const float* p, ptrdiff_t n) { return loadUpTo(p, n).v; }

QORI_INLINE __m256 toFloats(const uint8_t* p, ptrdiff_t n) {
    const __m128i bytes = n >= 8 ? _mm_loadl_epi64(reinterpret_cast<const __m128i*>(p))
                                 : qori::detail::loadBelow16(p, static_cast<int>(n));
    return _mm256_cvtepi32_ps(_mm256_cvtepu8_epi32(bytes));
}

QORI_INLINE __m128i loadWords(const void* p, ptrdiff_t n) {
    const auto* bytes = static_cast<const uint8_t*>(p);
    return n >= 8 ? _mm_loadu_si128(reinterpret_cast<const __m128i*>(bytes))
                  : qori::detail::loadBelow16(bytes, 2 * static_cast<int>(n));
}

QORI_INLINE __m256 toFloats(const uint16_t* p, ptrdiff_t n) {
    return _mm256_cvtepi32_ps(_mm256_cvtepu16_epi32(loadWords(p, n)));
}
QORI_INLINE __m256 toFloats(const int16_t* p, ptrdiff_t n) {
    return _mm256_cvtepi32_ps(_mm256_cvtepi16_epi32(loadWords(p, n)));
}

/// Asks for p's cache line; a hint that touches nothing.
QORI_INLINE void prefetch(const uint8_t* p) { _mm_prefetch(reinterpret_cast<const char*>(p), _MM_HINT_T0); }
/// The same, but the line stays out of the first-level cache, which is full of what is at hand.
QORI_INLINE void prefetchToL2(const uint8_t* p) { _mm_prefetch(reinterpret_cast<const char*>(p), _MM_HINT_T1); }

/// Asks for the cache line some way behind p.
template <class T>
QORI_INLINE void prefetchAhead(const T* p) {
    constexpr int kBytes = 1024;
    prefetch(reinterpret_cast<const uint8_t*>(p) + kBytes);
}

}  // namespace qori::kernels
