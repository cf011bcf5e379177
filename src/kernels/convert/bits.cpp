// SPDX-License-Identifier: Apache-2.0
#include "bits.h"

#include "kernels/simd.h"

namespace qori::kernels {
namespace {

/// Bits to bytes: the first bit is the most significant one of the word's first byte in memory.
QORI_INLINE Bytes spreadBits(uint32_t word) {
    const __m256i byteOf = _mm256_setr_epi8(0, 0, 0, 0, 0, 0, 0, 0, 1, 1, 1, 1, 1, 1, 1, 1, 2, 2, 2, 2, 2, 2, 2, 2, 3,
                                            3, 3, 3, 3, 3, 3, 3);
    const __m256i bitOf = _mm256_set1_epi64x(0x0102040810204080);
    const __m256i bytes = _mm256_shuffle_epi8(_mm256_set1_epi32(static_cast<int>(word)), byteOf);
    return {_mm256_cmpeq_epi8(_mm256_and_si256(bytes, bitOf), bitOf)};
}

/// 32 bits from bit `shift` of eight bytes.
QORI_INLINE uint32_t bitsFrom(uint64_t bytes, int shift) {
    return __builtin_bswap32(static_cast<uint32_t>(__builtin_bswap64(bytes) << shift >> 32));
}

}  // namespace

void unpackBitsRow(uint8_t* dst, const uint8_t* src, int shift, ptrdiff_t pixels) {
    const ptrdiff_t bytes = (shift + pixels + 7) / 8;
    ptrdiff_t done = 0;
    for (; done <= pixels - 32 && done / 8 + 8 <= bytes; done += 32)
        store(dst + done, spreadBits(bitsFrom(detail::loadWord<uint64_t>(src + done / 8), shift)));
    for (; done < pixels; done += 32) {
        const ptrdiff_t left = bytes - done / 8;
        uint64_t last = 0;
        for (int i = 0; i < (left < 8 ? left : 8); ++i) last |= uint64_t{src[done / 8 + i]} << (8 * i);
        storeUpTo(dst + done, spreadBits(bitsFrom(last, shift)), pixels - done);
    }
}

}  // namespace qori::kernels
