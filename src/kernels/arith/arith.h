// SPDX-License-Identifier: Apache-2.0
// Sums, differences and products of elements. Each operation tells, per element type:
//     exact(a, b)   the result without scaling, saturated by the processor itself, where it can (hasExact);
//     wide(a, b)    the exact value in lanes W, of magnitude up to `limit`, for the scaling rule.
// b is the second operand: differences are b - a.
#pragma once
#include <bit>
#include <type_traits>

#include "kernels/map.h"
#include "kernels/scale_round.h"
#include "qori.h"

namespace qori::kernels {

/// The type of an element's parts: complex elements are pairs.
template <class T>
struct ComponentOf {
    using type = T;
};
template <>
struct ComponentOf<QorComplex16s> {
    using type = int16_t;
};
template <>
struct ComponentOf<QorComplex32s> {
    using type = int32_t;
};
template <>
struct ComponentOf<QorComplex32f> {
    using type = float;
};
template <class T>
using Component = typename ComponentOf<T>::type;

template <class T>
constexpr bool isComplex = !std::is_same_v<T, Component<T>>;
template <class T>
constexpr bool isFloat = std::is_same_v<Component<T>, float>;

/// A vector of elements as one of their components, and back.
template <class T>
QORI_INLINE Vec<Component<T>> components(Vec<T> a) {
    return fromInteger<Component<T>>(toInteger(a.v));
}
template <class T>
QORI_INLINE Vec<T> elements(Vec<Component<T>> a) {
    return fromInteger<T>(toInteger(a.v));
}

namespace detail {

/// Saturated 32-bit sum: where both operands differ in sign from it, the limit on their side.
QORI_INLINE __m256i saturateSum32(__m256i a, __m256i sum, __m256i overflowSign) {
    const __m256i limit = _mm256_xor_si256(_mm256_srai_epi32(a, 31), _mm256_set1_epi32(INT32_MAX));
    return _mm256_castps_si256(
        _mm256_blendv_ps(_mm256_castsi256_ps(sum), _mm256_castsi256_ps(limit), _mm256_castsi256_ps(overflowSign)));
}

/// Lanes that hold their minimum for an exact value of minus that, M = 2^31 or 2^63: they become M - 256. No rule tells
/// the two apart, as scales that bring M into the element's range make less than 1/2 of 256.
template <class W>
QORI_INLINE Vec<W> mendMinimum(Vec<W> v) {
    return v ^ selectOrZero(isEqual(v, splat(std::numeric_limits<W>::min())), splat<W>(-256));
}

/// Real and imaginary parts exchanged.
QORI_INLINE Vec<int16_t> swapParts(Vec<int16_t> a) {
    return {_mm256_shufflehi_epi16(_mm256_shufflelo_epi16(a.v, 0xB1), 0xB1)};
}

}  // namespace detail

/// For exponents of normal numbers.
QORI_INLINE double powerOfTwo(int exponent) {
    return std::bit_cast<double>(static_cast<int64_t>(1023 + exponent) << 52);
}

/// The largest magnitude of an integer component, and the lanes of twice its width.
template <class C>
constexpr uint64_t largestMagnitude = 0;
template <>
inline constexpr uint64_t largestMagnitude<uint8_t> = 255;
template <>
inline constexpr uint64_t largestMagnitude<uint16_t> = 65535;
template <>
inline constexpr uint64_t largestMagnitude<int16_t> = 32768;
template <>
inline constexpr uint64_t largestMagnitude<int32_t> = uint64_t{1} << 31;
template <class C>
using SignedLane = std::conditional_t<sizeof(C) == 1, int16_t, std::conditional_t<sizeof(C) == 2, int32_t, int64_t>>;

template <class T>
struct Sum {
    using C = Component<T>;
    using W = SignedLane<C>;
    static constexpr bool hasExact = true;
    static constexpr uint64_t limit = 2 * largestMagnitude<C>;  // at most 2^32, in lanes of 64 bits

    static QORI_INLINE Vec<T> exact(Vec<T> first, Vec<T> second) {
        const Vec<C> a = components(first), b = components(second);
        if constexpr (isFloat<T>)
            return elements<T>(a + b);
        else if constexpr (sizeof(C) <= 2)
            return elements<T>(addSaturated(a, b));
        else {
            const __m256i sum = _mm256_add_epi32(a.v, b.v);
            return elements<T>({detail::saturateSum32(
                b.v, sum, _mm256_and_si256(_mm256_xor_si256(a.v, sum), _mm256_xor_si256(b.v, sum)))});
        }
    }
    static QORI_INLINE Wide<W> wide(Vec<T> first, Vec<T> second) {
        const Wide<W> a = widen<W>(components(first)), b = widen<W>(components(second));
        return {a.low + b.low, a.high + b.high};
    }
    /// Half the sum: the average that rounds up, less 1 where it rounded an odd sum to an odd value.
    static QORI_INLINE Vec<T> halved(Vec<T> a, Vec<T> b) requires std::is_same_v<T, uint8_t> {
        const __m256i up = _mm256_avg_epu8(a.v, b.v);
        const __m256i excess = _mm256_and_si256(_mm256_and_si256(_mm256_xor_si256(a.v, b.v), up), _mm256_set1_epi8(1));
        return {_mm256_sub_epi8(up, excess)};
    }
};

/// second - first. Differences of unsigned elements below 0 become 0 before scaling, as they would after it.
template <class T>
struct Difference {
    using C = Component<T>;
    using W = SignedLane<C>;
    static constexpr bool hasExact = true;
    static constexpr uint64_t limit = std::is_signed_v<C> ? 2 * largestMagnitude<C> - 1 : largestMagnitude<C>;

    static QORI_INLINE Vec<T> exact(Vec<T> first, Vec<T> second) {
        const Vec<C> a = components(first), b = components(second);
        if constexpr (isFloat<T>)
            return elements<T>(b - a);
        else if constexpr (sizeof(C) <= 2)
            return elements<T>(subtractSaturated(b, a));
        else {
            const __m256i difference = _mm256_sub_epi32(b.v, a.v);
            return elements<T>({detail::saturateSum32(
                b.v, difference, _mm256_and_si256(_mm256_xor_si256(b.v, a.v), _mm256_xor_si256(b.v, difference)))});
        }
    }
    static QORI_INLINE Wide<W> wide(Vec<T> first, Vec<T> second) {
        if constexpr (!std::is_signed_v<C>) {
            return widen<W>(exact(first, second));
        } else {
            const Wide<W> a = widen<W>(components(first)), b = widen<W>(components(second));
            return {b.low - a.low, b.high - a.high};
        }
    }
    static QORI_INLINE Vec<T> halved(Vec<T> a, Vec<T> b) requires std::is_same_v<T, uint8_t> {
        return Sum<T>::halved(exact(a, b), zero<T>());
    }
};

template <class T>
struct Product {
    using C = Component<T>;
    using W = std::conditional_t<std::is_signed_v<C>, SignedLane<C>, std::make_unsigned_t<SignedLane<C>>>;
    static constexpr bool hasExact = isFloat<T>;
    // 8u: 65,025. 16u: 65,535^2. 16s: 2^30. Complex parts reach 2^31 and 2^63, which the lane does not
    // hold and mendMinimum() lowers by 256.
    static constexpr uint64_t square = largestMagnitude<C> * largestMagnitude<C>,
                              limit = isComplex<T> ? 2 * square - 256 : square;

    static QORI_INLINE Vec<T> exact(Vec<T> first, Vec<T> second) {
        const Vec<float> a = components(first), b = components(second);
        if constexpr (isComplex<T>) {
            const __m256 byReal = _mm256_mul_ps(a.v, _mm256_moveldup_ps(b.v));
            const __m256 byImaginary = _mm256_mul_ps(_mm256_permute_ps(a.v, 0xB1), _mm256_movehdup_ps(b.v));
            return elements<T>({_mm256_addsub_ps(byReal, byImaginary)});
        } else {
            return a * b;
        }
    }
    static QORI_INLINE Wide<W> wide(Vec<T> first, Vec<T> second) {
        const auto a = components(first), b = components(second);
        if constexpr (std::is_same_v<T, uint8_t>) {
            const Wide<W> x = widen<W>(a), y = widen<W>(b);
            return {{_mm256_mullo_epi16(x.low.v, y.low.v)}, {_mm256_mullo_epi16(x.high.v, y.high.v)}};
        } else if constexpr (!isComplex<T>) {
            const __m256i low = _mm256_mullo_epi16(a.v, b.v);
            const __m256i high = std::is_signed_v<T> ? _mm256_mulhi_epi16(a.v, b.v) : _mm256_mulhi_epu16(a.v, b.v);
            return {{_mm256_unpacklo_epi16(low, high)}, {_mm256_unpackhi_epi16(low, high)}};
        } else if constexpr (std::is_same_v<C, int16_t>) {
            return complex16(a, b);
        } else {
            return complex32(a, b);
        }
    }

private:
    /// With a = p + qi, b = r + ti: pr - qt is at most 2^30 + 2^15 (2^15 - 1) in magnitude and fits; it comes as
    /// pr + q(-t - 1) + q, because -t need not fit 16 bits. pt + qr is 2^31 for four times -2^15 alone.
    static QORI_INLINE Wide<W> complex16(Vec<int16_t> a, Vec<int16_t> b) {
        const __m256i conjugate = _mm256_xor_si256(b.v, _mm256_set1_epi32(static_cast<int32_t>(0xFFFF0000u)));
        const __m256i real = _mm256_add_epi32(_mm256_madd_epi16(a.v, conjugate), _mm256_srai_epi32(a.v, 16));
        const __m256i imaginary = detail::mendMinimum<int32_t>({_mm256_madd_epi16(a.v, detail::swapParts(b).v)}).v;
        return {{_mm256_unpacklo_epi32(real, imaginary)}, {_mm256_unpackhi_epi32(real, imaginary)}};
    }
    /// The same in 64 bits: |pr - qt| <= 2^62 + 2^31 (2^31 - 1); pt + qr is 2^63 for four times -2^31 alone.
    static QORI_INLINE Wide<W> complex32(Vec<int32_t> a, Vec<int32_t> b) {
        const __m256i q = _mm256_srli_epi64(a.v, 32), t = _mm256_srli_epi64(b.v, 32);
        const __m256i real = _mm256_sub_epi64(_mm256_mul_epi32(a.v, b.v), _mm256_mul_epi32(q, t));
        const __m256i imaginary = _mm256_add_epi64(_mm256_mul_epi32(a.v, t), _mm256_mul_epi32(q, b.v));
        return {{real}, detail::mendMinimum<int64_t>({imaginary})};
    }
};

// --- row operations -------------------------------------------------------------------------------------------------

/// Makes a row operation of a function of two vectors.
template <class T, class Function>
struct Binary {
    static constexpr bool mayStream = true;
    Function function;

    QORI_INLINE Pack<T, Vec<T>::lanes> operator()(int, Pack<T, Vec<T>::lanes> a, Pack<T, Vec<T>::lanes> b) {
        return {{function(a.v[0], b.v[0])}};
    }
};

/// The same with a constant per channel as its first operand.
template <class T, class Operation>
struct WithConstant {
    static constexpr bool mayStream = true;
    Operation operation;
    ChannelVectors<T> values;

    QORI_INLINE Pack<T, Vec<T>::lanes> operator()(int phase, Pack<T, Vec<T>::lanes> a) {
        return operation(phase, Pack<T, Vec<T>::lanes>{{values.v[phase]}}, a);
    }
};

template <class Op>
struct Exact {
    template <class V>
    QORI_INLINE V operator()(V a, V b) const {
        return Op::exact(a, b);
    }
};

template <class Op>
struct Halved {
    template <class V>
    QORI_INLINE V operator()(V a, V b) const {
        return Op::halved(a, b);
    }
};

template <class Op, class Rule>
struct ByRule {
    Rule rule;

    template <class T>
    QORI_INLINE Vec<T> operator()(Vec<T> a, Vec<T> b) const {
        const auto wide = Op::wide(a, b);
        return elements<T>(narrow<Component<T>>(rule(wide.low), rule(wide.high)));
    }
};

/// Calls run(operation) with the row operation for the scale; false where all results are 0. The types of the
/// operations do not depend on Run, so that what runs them in several ways compiles its loops once.
template <class Op, class T, class Run>
bool withScaledOperation(int32_t scale, Run run) {
    using C = Component<T>;
    const auto binary = [&]<class Function>(Function function) { run(Binary<T, Function>{function}); };
    if constexpr (isFloat<T>) {
        binary(Exact<Op>{});
        return true;
    } else {
        if constexpr (requires(Vec<T> a) { Op::halved(a, a); }) {
            if (scale == 1) {
                binary(Halved<Op>{});
                return true;
            }
        }
        return withScaleRule<C, typename Op::W, Op::limit>(scale, [&]<class Rule>(Rule rule) {
            constexpr bool isExact = Op::hasExact && std::is_same_v<Rule, Saturate<C, typename Op::W>>;
            using Function = std::conditional_t<isExact, Exact<Op>, ByRule<Op, Rule>>;
            if constexpr (isExact)
                binary(Function{});
            else
                binary(Function{rule});
        });
    }
}

// --- products of fractions ------------------------------------------------------------------------------------------

/// a * b / max, max = 2^n - 1 standing for 1, to nearest. No product is an odd multiple of max / 2, max being odd, so
/// there are no ties. With t = a * b + 2^(n-1): (t + (t >> n)) >> n; t + (t >> n) is at most 2^2n - 2^(n-1) - 1.
template <class T>
QORI_INLINE Vec<T> fractionProduct(Vec<T> a, Vec<T> b) {
    using W = typename Product<T>::W;
    constexpr int n = 8 * static_cast<int>(sizeof(T));
    const Wide<W> product = Product<T>::wide(a, b);
    const auto divide = [](Vec<W> v) {
        const Vec<W> t = v + splat(static_cast<W>(W{1} << (n - 1)));
        const ShiftCount shift(n);
        return shiftRight(t + shiftRight(t, shift), shift);
    };
    return narrow<T>(divide(product.low), divide(product.high));
}

struct FractionProduct {
    template <class V>
    QORI_INLINE V operator()(V a, V b) const {
        return fractionProduct(a, b);
    }
};

/// One value, for results known beforehand.
template <class T>
struct Fill {
    static constexpr bool mayStream = true;
    Vec<T> value;

    QORI_INLINE Pack<T, Vec<T>::lanes> operator()(int) const { return {{value}}; }
};

}  // namespace qori::kernels
