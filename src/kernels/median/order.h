// SPDX-License-Identifier: Apache-2.0
// The order of elements: integers as they are, floats by their bits, which is the total order of IEEE 754:
// -NaN < -infinity < ... < -0 < +0 < ... < infinity < NaN. No instruction here reads the control register.
#pragma once
#include <utility>

#include "kernels/vector_math.h"

namespace qori::kernels {

namespace detail {

template <class T>
struct KeyOf {
    using type = T;
};
template <>
struct KeyOf<float> {
    using type = int32_t;
};
template <>
struct KeyOf<double> {
    using type = int64_t;
};

}  // namespace detail

/// The integer type whose order is that of the elements.
template <class T>
using Key = typename detail::KeyOf<T>::type;

/// Elements as keys. The bits of negative floats grow with the magnitude, so all but the sign turn over; done twice,
/// they are back.
template <class T>
QORI_INLINE Vec<Key<T>> keysOf(Vec<T> a) {
    const __m256i bits = toInteger(a.v);
    if constexpr (std::is_same_v<T, float>) {
        return {_mm256_xor_si256(bits, _mm256_srli_epi32(_mm256_srai_epi32(bits, 31), 1))};
    } else if constexpr (std::is_same_v<T, double>) {
        const __m256i negative = _mm256_cmpgt_epi64(_mm256_setzero_si256(), bits);
        return {_mm256_xor_si256(bits, _mm256_srli_epi64(negative, 1))};
    } else {
        return {bits};
    }
}

template <class T>
QORI_INLINE Vec<T> elementsOf(Vec<Key<T>> keys) {
    return fromInteger<T>(toInteger(keysOf(fromInteger<T>(keys.v)).v));
}

/// a becomes the smaller of the two, b the larger.
template <class K>
QORI_INLINE void order(Vec<K>& a, Vec<K>& b) {
    if constexpr (sizeof(K) == 8) {
        const __m256i swap = _mm256_cmpgt_epi64(a.v, b.v), first = a.v;
        a.v = _mm256_blendv_epi8(first, b.v, swap);
        b.v = _mm256_blendv_epi8(b.v, first, swap);
    } else {
        const Vec<K> first = smaller(a, b);
        b = larger(a, b);
        a = first;
    }
}

template <class K>
QORI_INLINE Vec<K> lower(Vec<K> a, Vec<K> b) {
    if constexpr (sizeof(K) == 8)
        return {_mm256_blendv_epi8(a.v, b.v, _mm256_cmpgt_epi64(a.v, b.v))};
    else
        return smaller(a, b);
}

template <class K>
QORI_INLINE Vec<K> upper(Vec<K> a, Vec<K> b) {
    if constexpr (sizeof(K) == 8)
        return {_mm256_blendv_epi8(b.v, a.v, _mm256_cmpgt_epi64(a.v, b.v))};
    else
        return larger(a, b);
}

/// Elements in memory of any alignment.
template <class T>
QORI_INLINE T get(const T* p) {
    T element;
    __builtin_memcpy(&element, p, sizeof element);
    return element;
}
template <class T>
QORI_INLINE void put(T* p, T element) {
    __builtin_memcpy(p, &element, sizeof element);
}

/// One element as an unsigned number of the same order.
template <class T>
QORI_INLINE auto rankOf(T element) {
    if constexpr (std::is_floating_point_v<T>) {
        using Word = std::make_unsigned_t<Key<T>>;
        constexpr int kSign = 8 * sizeof(Word) - 1;
        Word bits;
        __builtin_memcpy(&bits, &element, sizeof bits);
        return static_cast<Word>(bits ^ ((bits >> kSign) != 0 ? ~Word{0} : Word{1} << kSign));
    } else {
        using Word = std::make_unsigned_t<T>;
        return static_cast<Word>(static_cast<Word>(element) ^
                                 (std::is_signed_v<T> ? Word{1} << (8 * sizeof(T) - 1) : Word{0}));
    }
}

template <class T, class Word>
QORI_INLINE T elementOf(Word rank) {
    if constexpr (std::is_floating_point_v<T>) {
        constexpr int kSign = 8 * sizeof(Word) - 1;
        const Word bits = rank ^ ((rank >> kSign) != 0 ? Word{1} << kSign : ~Word{0});
        T element;
        __builtin_memcpy(&element, &bits, sizeof element);
        return element;
    } else {
        return static_cast<T>(rank ^ (std::is_signed_v<T> ? Word{1} << (8 * sizeof(T) - 1) : Word{0}));
    }
}

}  // namespace qori::kernels
