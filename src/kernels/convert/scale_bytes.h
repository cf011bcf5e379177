// SPDX-License-Identifier: Apache-2.0
// Row operations between bytes and the whole range of another type, or a range of floats. Those that take or give
// floats, and ScaleExactly, want the default control register.
#pragma once
#include "kernels/pack_convert.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// x in every byte of the wider element; signed types have 0 at their minimum.
template <class D>
struct RepeatByte {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<uint8_t, n> a) const {
        Pack<D, n> out = extend<D>(a);
        for (Vec<D>& v : out.v) {
            if constexpr (sizeof(D) == 2) {
                v.v = _mm256_or_si256(v.v, _mm256_slli_epi16(v.v, 8));
                if constexpr (std::is_signed_v<D>) v.v = _mm256_xor_si256(v.v, _mm256_set1_epi16(INT16_MIN));
            } else {
                const __m256i lowBytes = _mm256_setr_epi8(0, 0, 0, 0, 4, 4, 4, 4, 8, 8, 8, 8, 12, 12, 12, 12,  //
                                                          0, 0, 0, 0, 4, 4, 4, 4, 8, 8, 8, 8, 12, 12, 12, 12);
                v.v = _mm256_shuffle_epi8(v.v, lowBytes);
                if constexpr (std::is_signed_v<D>) v.v = _mm256_xor_si256(v.v, _mm256_set1_epi32(INT32_MIN));
            }
        }
        return out;
    }
};

struct ToRange {
    static constexpr bool mayStream = true;
    float lower, factor;

    template <int n>
    QORI_INLINE Pack<float, n> operator()(int, Pack<uint8_t, n> a) const {
        Pack<float, n> out = toFloat(a);
        for (Vec<float>& v : out.v) v = splat(lower) + v * splat(factor);
        return out;
    }
};

struct FromRange {
    static constexpr bool mayStream = true;
    float factor, offset;

    template <int n>
    QORI_INLINE Pack<uint8_t, n> operator()(int, Pack<float, n> a) const {
        for (Vec<float>& v : a.v) v.v = _mm256_fmsub_ps(v.v, _mm256_set1_ps(factor), _mm256_set1_ps(offset));
        return roundTo<NearestEven, uint8_t>(a);
    }
};

/// ((s - (s >> 8)) >> 8) + 128 of s = x less its type's middle. |s - (s >> 8)| stays below 32768, or 2^31.
template <class S>
struct TakeTopByte {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<uint8_t, n> operator()(int, Pack<S, n> a) const {
        using Signed = std::make_signed_t<S>;
        Pack<Signed, n> out;
        for (int i = 0; i < Pack<S, n>::vectors; ++i) {
            if constexpr (sizeof(S) == 2) {
                const __m256i middle = _mm256_set1_epi16(std::is_signed_v<S> ? 0 : INT16_MIN);
                const __m256i s = _mm256_xor_si256(a.v[i].v, middle);
                const __m256i top = _mm256_srai_epi16(_mm256_sub_epi16(s, _mm256_srai_epi16(s, 8)), 8);
                out.v[i] = {_mm256_add_epi16(top, _mm256_set1_epi16(128))};
            } else {
                const __m256i s = a.v[i].v;
                const __m256i top = _mm256_srai_epi32(_mm256_sub_epi32(s, _mm256_srai_epi32(s, 8)), 24);
                out.v[i] = {_mm256_add_epi32(top, _mm256_set1_epi32(128))};
            }
        }
        return narrow<uint8_t>(out);
    }
};

/// 255/65535 of the distance from the type's minimum.
template <class S>
struct ScaleExactly {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<uint8_t, n> operator()(int, Pack<S, n> a) const {
        Pack<int32_t, n> wide = extend<int32_t>(a);
        Pack<float, n> out;
        for (int i = 0; i < Pack<float, n>::vectors; ++i) {
            if constexpr (std::is_signed_v<S>) wide.v[i].v = _mm256_add_epi32(wide.v[i].v, _mm256_set1_epi32(32768));
            out.v[i] = {_mm256_mul_ps(_mm256_cvtepi32_ps(wide.v[i].v), _mm256_set1_ps(0.0038910505827516317f))};
        }
        return roundTo<NearestEven, uint8_t>(out);
    }
};

template <>
struct ScaleExactly<int32_t> {
    static constexpr bool mayStream = true;

    static QORI_INLINE __m128i scale(__m128i x) {
        const __m256d factor = _mm256_set1_pd(255.0 / 4294967295.0),
                      middle = _mm256_set1_pd(2147483648.0 * 255.0 / 4294967295.0);
        const __m256d value = _mm256_add_pd(_mm256_mul_pd(_mm256_cvtepi32_pd(x), factor), middle);
        return _mm256_cvttpd_epi32(_mm256_round_pd(value, _MM_FROUND_TO_NEAREST_INT | _MM_FROUND_NO_EXC));
    }

    template <int n>
    QORI_INLINE Pack<uint8_t, n> operator()(int, Pack<int32_t, n> a) const {
        for (Vec<int32_t>& v : a.v)
            v.v = _mm256_set_m128i(scale(_mm256_extracti128_si256(v.v, 1)), scale(_mm256_castsi256_si128(v.v)));
        return narrow<uint8_t>(a);
    }
};

}  // namespace qori::kernels
