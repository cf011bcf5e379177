// SPDX-License-Identifier: Apache-2.0
// The vocabulary of the kernels: vectors of 32 bytes and the operations on them, named after what they do. `.v` is the
// register, for an operation that has one user. Partial loads and stores touch exactly the elements that they are
// given.
#pragma once
#include <immintrin.h>

#include <cstddef>
#include <cstdint>
#include <type_traits>

#define QORI_INLINE __attribute__((always_inline)) inline
#define QORI_NOINLINE __attribute__((noinline))

namespace qori {

template <class T>
struct Vec {
    static constexpr int lanes = 32 / static_cast<int>(sizeof(T));
    __m256i v;
};

template <>
struct Vec<float> {
    static constexpr int lanes = 8;
    __m256 v;
};

template <>
struct Vec<double> {
    static constexpr int lanes = 4;
    __m256d v;
};

using Bytes = Vec<uint8_t>;

// --- registers of any type as bytes and back ------------------------------------------------------------------------

QORI_INLINE __m256i toInteger(__m256i v) { return v; }
QORI_INLINE __m256i toInteger(__m256 v) { return _mm256_castps_si256(v); }
QORI_INLINE __m256i toInteger(__m256d v) { return _mm256_castpd_si256(v); }

template <class T>
QORI_INLINE Vec<T> fromInteger(__m256i v) {
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_castsi256_ps(v)};
    else if constexpr (std::is_same_v<T, double>)
        return {_mm256_castsi256_pd(v)};
    else
        return {v};
}

// --- whole vectors --------------------------------------------------------------------------------------------------

/// For a loaded vector that is used more than once. Compilers fold the load into the first use and load again for the
/// next, and what streams from the second-level cache then waits for the load ports.
template <class V>
QORI_INLINE void loadOnce(V& v) {
    __asm__("" : "+x"(v));
}

template <class T>
QORI_INLINE Vec<T> load(const T* p) {
    return fromInteger<T>(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(p)));
}

/// Whether two whole vectors in memory have the same bits.
template <class T>
QORI_INLINE bool isSame(const T* a, const T* b) {
    const __m256i difference = _mm256_xor_si256(toInteger(load(a).v), toInteger(load(b).v));
    return _mm256_testz_si256(difference, difference) != 0;
}

template <class T>
QORI_INLINE void store(T* p, Vec<T> a) {
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(p), toInteger(a.v));
}

/// Stores past the cache; p is 32-byte aligned. A call that streams ends with streamFence().
template <class T>
QORI_INLINE void stream(T* p, Vec<T> a) {
    _mm256_stream_si256(reinterpret_cast<__m256i*>(p), toInteger(a.v));
}

QORI_INLINE void streamFence() { _mm_sfence(); }

template <bool streaming, class T>
QORI_INLINE void storeAs(T* p, Vec<T> a) {
    if constexpr (streaming)
        stream(p, a);
    else
        store(p, a);
}

template <class T>
QORI_INLINE Vec<T> zero() {
    return fromInteger<T>(_mm256_setzero_si256());
}

/// 16 bytes at low and 16 at high.
QORI_INLINE Bytes loadHalves(const uint8_t* low, const uint8_t* high) {
    const __m128i a = _mm_loadu_si128(reinterpret_cast<const __m128i*>(low));
    const __m128i b = _mm_loadu_si128(reinterpret_cast<const __m128i*>(high));
    return {_mm256_inserti128_si256(_mm256_castsi128_si256(a), b, 1)};
}

QORI_INLINE void storeHalves(uint8_t* low, uint8_t* high, Bytes a) {
    _mm_storeu_si128(reinterpret_cast<__m128i*>(low), _mm256_castsi256_si128(a.v));
    _mm_storeu_si128(reinterpret_cast<__m128i*>(high), _mm256_extracti128_si256(a.v, 1));
}

/// 16 bytes at p in both halves.
QORI_INLINE Bytes loadTwice(const uint8_t* p) {
    return {_mm256_broadcastsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p)))};
}

// --- partial vectors ------------------------------------------------------------------------------------------------

namespace detail {

template <class Word>
QORI_INLINE Word loadWord(const uint8_t* p) {
    Word word;
    __builtin_memcpy(&word, p, sizeof word);
    return word;
}

template <class Word>
QORI_INLINE void storeWord(uint8_t* p, Word word) {
    __builtin_memcpy(p, &word, sizeof word);
}

/// The n bytes at p (1 to 15), zeros behind them: two loads that overlap, the second shifted into place.
QORI_INLINE __m128i loadBelow16(const uint8_t* p, int n) {
    if (n >= 8) {
        const __m128i low = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(p));
        const __m128i high = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(p + n - 8));
        return _mm_unpacklo_epi64(low, _mm_srl_epi64(high, _mm_cvtsi32_si128(8 * (16 - n))));
    }
    if (n >= 4) {
        const __m128i low = _mm_cvtsi32_si128(loadWord<int32_t>(p));
        const __m128i high = _mm_cvtsi32_si128(loadWord<int32_t>(p + n - 4));
        return _mm_unpacklo_epi32(low, _mm_srl_epi32(high, _mm_cvtsi32_si128(8 * (8 - n))));
    }
    const uint32_t first = p[0], middle = p[n >> 1], last = p[n - 1];
    return _mm_cvtsi32_si128(static_cast<int32_t>(first | middle << (8 * (n >> 1)) | last << (8 * (n - 1))));
}

QORI_INLINE void storeBelow16(uint8_t* p, __m128i a, int n) {
    if (n & 8) {
        _mm_storel_epi64(reinterpret_cast<__m128i*>(p), a);
        a = _mm_unpackhi_epi64(a, a);
        p += 8;
    }
    if (n & 4) {
        storeWord(p, _mm_cvtsi128_si32(a));
        a = _mm_srli_epi64(a, 32);
        p += 4;
    }
    const int32_t rest = _mm_cvtsi128_si32(a);
    if (n & 2) storeWord(p, static_cast<int16_t>(rest));
    if (n & 1) p[n & 2] = static_cast<uint8_t>(n & 2 ? rest >> 16 : rest);
}

/// Selects the first n of eight 4-byte words. Masked moves neither touch nor fault on the others.
QORI_INLINE __m256i firstWords(ptrdiff_t n) {
    return _mm256_cmpgt_epi32(_mm256_set1_epi32(static_cast<int32_t>(n)), _mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7));
}

/// 4-byte words of one element, where masked moves can carry it.
template <class T>
constexpr int wordsOf = static_cast<int>(sizeof(T) / 4);

}  // namespace detail

/// The first n elements at p (0 <= n < lanes), zeros behind them.
template <class T>
QORI_INLINE Vec<T> loadPartial(const T* p, ptrdiff_t n) {
    if constexpr (sizeof(T) >= 4)
        return fromInteger<T>(
            _mm256_maskload_epi32(reinterpret_cast<const int*>(p), detail::firstWords(n * detail::wordsOf<T>)));
    const auto* bytes = reinterpret_cast<const uint8_t*>(p);
    const int count = static_cast<int>(n) * static_cast<int>(sizeof(T));
    if (count >= 16) {
        const __m128i low = _mm_loadu_si128(reinterpret_cast<const __m128i*>(bytes));
        const __m128i high = count > 16 ? detail::loadBelow16(bytes + 16, count - 16) : _mm_setzero_si128();
        return fromInteger<T>(_mm256_inserti128_si256(_mm256_castsi128_si256(low), high, 1));
    }
    const __m128i low = count > 0 ? detail::loadBelow16(bytes, count) : _mm_setzero_si128();
    return fromInteger<T>(_mm256_zextsi128_si256(low));
}

/// Stores the first n elements (0 <= n < lanes).
template <class T>
QORI_INLINE void storePartial(T* p, Vec<T> a, ptrdiff_t n) {
    if constexpr (sizeof(T) >= 4)
        return _mm256_maskstore_epi32(reinterpret_cast<int*>(p), detail::firstWords(n * detail::wordsOf<T>),
                                      toInteger(a.v));
    auto* bytes = reinterpret_cast<uint8_t*>(p);
    int count = static_cast<int>(n) * static_cast<int>(sizeof(T));
    __m128i half = _mm256_castsi256_si128(toInteger(a.v));
    if (count >= 16) {
        _mm_storeu_si128(reinterpret_cast<__m128i*>(bytes), half);
        half = _mm256_extracti128_si256(toInteger(a.v), 1);
        if (count == 16) return;
        bytes += 16;
        count -= 16;
    }
    detail::storeBelow16(bytes, half, count);
}

/// At most one vector: whole where n reaches it, nothing where n is not positive.
template <class T>
QORI_INLINE Vec<T> loadUpTo(const T* p, ptrdiff_t n) {
    return n >= Vec<T>::lanes ? load(p) : n > 0 ? loadPartial(p, n) : zero<T>();
}

template <class T>
QORI_INLINE void storeUpTo(T* p, Vec<T> a, ptrdiff_t n) {
    if (n >= Vec<T>::lanes)
        store(p, a);
    else if (n > 0)
        storePartial(p, a, n);
}

/// The 4-byte words of a whose mask has its top bit set; the others are neither written nor looked at.
QORI_INLINE void storeWords(uint8_t* p, Bytes a, Bytes mask) {
    _mm256_maskstore_epi32(reinterpret_cast<int*>(p), mask.v, a.v);
}

// --- bytes ----------------------------------------------------------------------------------------------------------

/// Per byte: where the mask's top bit is set b, else a.
QORI_INLINE Bytes blend(Bytes a, Bytes b, Bytes mask) { return {_mm256_blendv_epi8(a.v, b.v, mask.v)}; }

QORI_INLINE Bytes operator|(Bytes a, Bytes b) { return {_mm256_or_si256(a.v, b.v)}; }
QORI_INLINE Bytes operator&(Bytes a, Bytes b) { return {_mm256_and_si256(a.v, b.v)}; }
QORI_INLINE Bytes operator^(Bytes a, Bytes b) { return {_mm256_xor_si256(a.v, b.v)}; }

QORI_INLINE Bytes isZero(Bytes a) { return {_mm256_cmpeq_epi8(a.v, _mm256_setzero_si256())}; }

/// One bit per byte: its top bit.
QORI_INLINE uint32_t topBits(Bytes a) { return static_cast<uint32_t>(_mm256_movemask_epi8(a.v)); }

/// Within each half, byte i becomes a[index[i] & 15], or 0 where the index has its top bit set.
QORI_INLINE Bytes shuffleHalves(Bytes a, Bytes index) { return {_mm256_shuffle_epi8(a.v, index.v)}; }

}  // namespace qori
