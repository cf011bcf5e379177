// SPDX-License-Identifier: Apache-2.0
#include "half.h"

#include "floats.h"

namespace qori::kernels {
namespace {

/// Source bytes that half a vector works on: whole pairs of pixels. Results take half of it.
template <int channels>
constexpr int kStride = channels == 3 ? 12 : 16;

/// Puts the elements of neighbouring pixels side by side.
template <int channels>
QORI_INLINE Bytes pairUp(Bytes pixels) {
    if constexpr (channels == 1) return pixels;
    const __m128i order = channels == 3 ? _mm_setr_epi8(0, 3, 1, 4, 2, 5, 6, 9, 7, 10, 8, 11, -1, -1, -1, -1)
                                        : _mm_setr_epi8(0, 4, 1, 5, 2, 6, 3, 7, 8, 12, 9, 13, 10, 14, 11, 15);
    return shuffleInBlocks(pixels, {_mm256_broadcastsi128_si256(order)});
}

/// Sums of four, at most 1020, halved twice.
template <bool toEven>
QORI_INLINE __m256i quarter(__m256i sum) {
    if constexpr (!toEven) return _mm256_srli_epi16(_mm256_add_epi16(sum, _mm256_set1_epi16(2)), 2);
    const __m256i odd = _mm256_and_si256(_mm256_srli_epi16(sum, 2), _mm256_set1_epi16(1));
    return _mm256_srli_epi16(_mm256_add_epi16(_mm256_add_epi16(sum, odd), _mm256_set1_epi16(1)), 2);
}

/// Two half vectors that begin at offset `first` and two strides on.
template <int channels, bool toEven>
QORI_INLINE __m256i halve(const uint8_t* a, const uint8_t* b, int first) {
    const auto sums = [=](const uint8_t* row) {
        const Bytes pixels = loadBlocks(row + first, row + first + 2 * kStride<channels>);
        return _mm256_maddubs_epi16(pairUp<channels>(pixels).v, _mm256_set1_epi8(1));
    };
    return quarter<toEven>(_mm256_add_epi16(sums(a), sums(b)));
}

/// 4 strides of both rows become 2 strides of results.
template <int channels, bool toEven>
QORI_INLINE void halveBlock(const uint8_t* a, const uint8_t* b, uint8_t* dst) {
    const Bytes packed{
        _mm256_packus_epi16(halve<channels, toEven>(a, b, 0), halve<channels, toEven>(a, b, kStride<channels>))};
    if constexpr (channels == 3) {
        const __m128i close = _mm_setr_epi8(0, 1, 2, 3, 4, 5, 8, 9, 10, 11, 12, 13, -1, -1, -1, -1);
        storeBlocks(dst, dst + 12, shuffleInBlocks(packed, {_mm256_broadcastsi128_si256(close)}));
    } else {
        store(dst, packed);
    }
}

template <int channels, bool toEven>
QORI_NOINLINE void halveRowOf(const uint8_t* a, const uint8_t* b, ptrdiff_t later, uint8_t* dst, ptrdiff_t bytes) {
    constexpr int kResult = 2 * kStride<channels>;
    constexpr int kExcess =
        16 - kStride<channels>;  // bytes beyond the block that are read and, for three channels, written
    ptrdiff_t i = 0;
    for (; i + kResult + kExcess <= bytes; i += kResult) {
        prefetchToL2(a + later + 2 * i);
        prefetchToL2(b + later + 2 * i);
        halveBlock<channels, toEven>(a + 2 * i, b + 2 * i, dst + i);
    }
    // What is left, by half vectors.
    for (; i < bytes; i += kStride<channels> / 2) {
        const ptrdiff_t rest = bytes - i < kStride<channels> / 2 ? bytes - i : kStride<channels> / 2;
        const auto sums = [=](const uint8_t* row) {
            return _mm256_maddubs_epi16(pairUp<channels>(loadPartial(row + 2 * i, 2 * rest)).v, _mm256_set1_epi8(1));
        };
        const __m256i quarters = quarter<toEven>(_mm256_add_epi16(sums(a), sums(b)));
        storePartial(dst + i, Bytes{_mm256_packus_epi16(quarters, quarters)}, rest);
    }
}

}  // namespace

template <int channels>
void halveRow8u(const uint8_t* a, const uint8_t* b, ptrdiff_t later, uint8_t* dst, ptrdiff_t pixels, bool toEven) {
    (toEven ? halveRowOf<channels, true> : halveRowOf<channels, false>)(a, b, later, dst, pixels * channels);
}

template void halveRow8u<1>(const uint8_t*, const uint8_t*, ptrdiff_t, uint8_t*, ptrdiff_t, bool);
template void halveRow8u<3>(const uint8_t*, const uint8_t*, ptrdiff_t, uint8_t*, ptrdiff_t, bool);
template void halveRow8u<4>(const uint8_t*, const uint8_t*, ptrdiff_t, uint8_t*, ptrdiff_t, bool);

void halveRow32f(const float* a, const float* b, ptrdiff_t later, float* dst, ptrdiff_t pixels, float weight,
                 float scale) {
    const __m256 weights = _mm256_set1_ps(weight), scales = _mm256_set1_ps(scale);
    const auto mix = [=](__m256 first, __m256 second) {
        return _mm256_fmadd_ps(weights, second, _mm256_mul_ps(weights, first));
    };
    const auto across = [=](const float* row, ptrdiff_t n) {
        const __m256 low = toFloats(row, 2 * n), high = toFloats(row + 8, 2 * n - 8);
        return mix(_mm256_shuffle_ps(low, high, 0x88), _mm256_shuffle_ps(low, high, 0xDD));
    };
    const auto block = [=](ptrdiff_t i, ptrdiff_t n) {
        const __m256 sum = _mm256_mul_ps(mix(across(a + 2 * i, n), across(b + 2 * i, n)), scales);
        storeUpTo(dst + i, Vec<float>{_mm256_castpd_ps(_mm256_permute4x64_pd(_mm256_castps_pd(sum), 0xD8))}, n);
    };
    ptrdiff_t i = 0;
    for (; i + 8 <= pixels; i += 8) {
        prefetchToL2(reinterpret_cast<const uint8_t*>(a + 2 * i) + later);
        prefetchToL2(reinterpret_cast<const uint8_t*>(b + 2 * i) + later);
        block(i, 8);
    }
    if (i < pixels) block(i, pixels - i);
}

}  // namespace qori::kernels
