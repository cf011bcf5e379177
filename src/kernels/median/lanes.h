// SPDX-License-Identifier: Apache-2.0
// Counts as bytes and words of a vector, as the ways of counting use them.
#pragma once
#include <algorithm>

#include "kernels/simd.h"

namespace qori::kernels::lanes {

/// On a 32-byte boundary.
QORI_INLINE __m256i block(const uint8_t* p) { return _mm256_load_si256(reinterpret_cast<const __m256i*>(p)); }
QORI_INLINE void storeBlock(uint8_t* p, __m256i v) { _mm256_store_si256(reinterpret_cast<__m256i*>(p), v); }
QORI_INLINE __m256i bytesOf(int v) { return _mm256_set1_epi8(static_cast<char>(v)); }
QORI_INLINE __m256i wordsOf(int v) { return _mm256_set1_epi16(static_cast<int16_t>(v)); }
/// Of the bytes.
QORI_INLINE __m256i numbers() {
    return _mm256_setr_epi8(0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16, 17, 18, 19, 20, 21, 22, 23, 24,
                            25, 26, 27, 28, 29, 30, 31);
}
/// -1 in the first n bytes, all of them or fewer.
QORI_INLINE __m256i firsts(int n) { return _mm256_cmpgt_epi8(bytesOf(std::min(n, kVectorBytes)), numbers()); }

}  // namespace qori::kernels::lanes
