// SPDX-License-Identifier: Apache-2.0
// Functions of one image. Integer results are the real results under the scaling rule, rounded once.
#include "images.h"
#include "kernels/arith/exp_ln.h"
#include "kernels/pack_convert.h"

namespace qori::arith {
namespace {

using namespace kernels;

/// float(v) per vector of floats.
template <class Function>
struct OfFloats {
    Function function;

    template <int n>
    QORI_INLINE Pack<float, n> operator()(int, Pack<float, n> a) const {
        for (Vec<float>& v : a.v) v.v = function(v.v);
        return a;
    }
};

/// A value in every lane of a vector of 8- or 16-bit integers.
template <class T>
QORI_INLINE __m256i splat(T value) {
    return sizeof(T) == 1 ? _mm256_set1_epi8(static_cast<char>(value)) : _mm256_set1_epi16(static_cast<short>(value));
}

template <class T>
QORI_INLINE __m256i greater(__m256i a, __m256i b) {
    if constexpr (sizeof(T) == 1)
        return _mm256_max_epu8(a, b);
    else
        return std::is_signed_v<T> ? _mm256_max_epi16(a, b) : _mm256_max_epu16(a, b);
}

template <class T>
QORI_INLINE __m256i isAtLeast(__m256i a, __m256i b) {
    const __m256i most = greater<T>(a, b);
    return sizeof(T) == 1 ? _mm256_cmpeq_epi8(most, a) : _mm256_cmpeq_epi16(most, a);
}

struct AbsoluteShorts {
    /// The largest of x and its saturated negative.
    template <int n>
    QORI_INLINE Pack<int16_t, n> operator()(int, Pack<int16_t, n> a) const {
        for (Vec<int16_t>& v : a.v) v.v = _mm256_max_epi16(v.v, _mm256_subs_epi16(_mm256_setzero_si256(), v.v));
        return a;
    }
};

QORI_INLINE __m256d powerOfTwo(int exponent) {
    return _mm256_castsi256_pd(_mm256_slli_epi64(_mm256_set1_epi64x(exponent + 1023), 52));
}

/// Doubles in two halves, limited to what T holds at most, to the nearest integers.
template <class T>
QORI_INLINE Vec<int32_t> nearest(__m256d low, __m256d high) {
    const __m256d most = _mm256_set1_pd(std::numeric_limits<T>::max());
    return {
        _mm256_set_m128i(_mm256_cvtpd_epi32(_mm256_min_pd(high, most)), _mm256_cvtpd_epi32(_mm256_min_pd(low, most)))};
}

/// In float, for 8 bits, and for scale factors from -2 up. With y = sqrt(x) 2^-s and t a half: y^2 - t^2 is 0 or at
/// least 1/4 (s = 0; the other scales shift both alike), so y is t or at least 2^-11 from it while y <= 2^8, and at
/// least 2^-13 for s = -2 with y <= 2^10. Half a unit in y's last place is 2^-17 and 2^-15: it rounds to neither t nor
/// past it. Bytes saturate above 2^8.
template <class T>
struct FloatRoot {
    float factor;

    template <int n>
    QORI_INLINE Pack<T, n> operator()(int, Pack<T, n> a) const {
        Pack<float, n> root = toFloat(a);
        for (Vec<float>& v : root.v) {
            const __m256 positive = _mm256_max_ps(v.v, _mm256_setzero_ps());
            v.v = _mm256_mul_ps(_mm256_sqrt_ps(positive), _mm256_set1_ps(factor));
        }
        return roundTo<NearestEven, T>(root);
    }
};

/// In double, for the scales below: results below 2^16 are a half or at least 2^-19 from one.
template <class T>
struct DoubleRoot {
    __m256d factor;

    template <int n>
    QORI_INLINE Pack<T, n> operator()(int, Pack<T, n> a) const {
        Pack<int32_t, n> wide = extend<int32_t>(a);
        for (Vec<int32_t>& v : wide.v) {
            v.v = _mm256_max_epi32(v.v, _mm256_setzero_si256());
            const auto root = [&](__m128i x) { return _mm256_mul_pd(_mm256_sqrt_pd(_mm256_cvtepi32_pd(x)), factor); };
            v = nearest<T>(root(_mm256_castsi256_si128(v.v)), root(_mm256_extracti128_si256(v.v, 1)));
        }
        return fit<T>(wide);
    }
};

template <class T>
struct Exponential {
    ExponentialTable table;

    template <int n>
    QORI_INLINE Pack<T, n> operator()(int, Pack<T, n> a) const {
        const __m256i low = _mm256_load_si256(reinterpret_cast<const __m256i*>(table.value));
        const __m256i high = _mm256_load_si256(reinterpret_cast<const __m256i*>(table.value + 8));
        Pack<int32_t, n> wide = extend<int32_t>(a);
        for (Vec<int32_t>& v : wide.v) {
            __m256i index = _mm256_sub_epi32(v.v, _mm256_set1_epi32(table.first - 1));
            index = _mm256_min_epi32(_mm256_max_epi32(index, _mm256_setzero_si256()), _mm256_set1_epi32(15));
            const __m256i upper = _mm256_slli_epi32(index, 28);  // bit 3 on top
            v.v = _mm256_castps_si256(_mm256_blendv_ps(_mm256_castsi256_ps(_mm256_permutevar8x32_epi32(low, index)),
                                                       _mm256_castsi256_ps(_mm256_permutevar8x32_epi32(high, index)),
                                                       _mm256_castsi256_ps(upper)));
        }
        return fit<T>(wide);
    }
};

/// Logarithms of positive integers are the rule's; others give T's least value, and the kind of the first is the
/// warning.
template <class T, class Rule>
struct Logarithm {
    Rule rule;
    QorResult warning = QOR_OK;

    template <int n>
    QORI_INLINE Pack<T, n> operator()(int, Pack<T, n> a) {
        const __m256i x = a.v[0].v, one = splat<T>(1);
        const __m256i none = _mm256_xor_si256(isAtLeast<T>(x, one), _mm256_set1_epi32(-1));
        if (!_mm256_testz_si256(none, none)) note(none, x);
        const __m256i result = rule(greater<T>(x, one));
        return {{{_mm256_blendv_epi8(result, splat<T>(std::numeric_limits<T>::min()), none)}}};
    }

    /// The zeros behind the last elements are no zeros of the image.
    template <int n>
    QORI_INLINE Pack<T, n> tail(int phase, ptrdiff_t count, Pack<T, n> a) {
        alignas(32) T padded[n];
        store(padded, a.v[0]);
        for (ptrdiff_t i = count; i < n; ++i) padded[i] = 1;
        return (*this)(phase, kernels::detail::loadPack<T, n>(padded));
    }

private:
    void note(__m256i none, __m256i x) {
        if (warning != QOR_OK) return;
        // The top byte of the first hole holds its sign.
        const int byte = __builtin_ctz(static_cast<unsigned>(_mm256_movemask_epi8(none))) + int{sizeof(T)} - 1;
        const bool negative = std::is_signed_v<T> && (_mm256_movemask_epi8(x) >> byte & 1) != 0;
        warning = negative ? QOR_WARN_LOG_NEGATIVE : QOR_WARN_LOG_ZERO;
    }
};

/// The least x of each result from 1 up: e^((r - 1/2) 2^scale) rounded up, where a result is at most 11.
struct LogarithmSteps {
    int count;
    uint16_t least[11];
};
constexpr LogarithmSteps kLogarithmSteps[] = {{11, {2, 5, 13, 34, 91, 245, 666, 1809, 4915, 13360, 36316}},
                                              {6, {3, 21, 149, 1097, 8104, 59875}},
                                              {3, {8, 404, 22027}},
                                              {1, {55}},
                                              {1, {2981}},
                                              {0, {}}};

/// For scales from 0 up: counts the steps that x has reached.
template <class T>
struct CountSteps {
    int count = 0;
    T least[11];

    explicit CountSteps(int scale) {
        const LogarithmSteps& steps = kLogarithmSteps[std::min(scale, 5)];
        while (count < steps.count && steps.least[count] <= std::numeric_limits<T>::max()) {
            least[count] = static_cast<T>(steps.least[count]);
            ++count;
        }
    }
    QORI_INLINE __m256i operator()(__m256i x) const {
        Vec<T> reached = zero<T>();
        for (int i = 0; i < count; ++i) {
            const __m256i mask = isAtLeast<T>(x, splat<T>(least[i]));
            reached.v = sizeof(T) == 1 ? _mm256_sub_epi8(reached.v, mask) : _mm256_sub_epi16(reached.v, mask);
        }
        return reached.v;
    }
};

/// In double, for the scales below.
template <class T>
struct ScaledLogarithm {
    __m256d factor;

    QORI_INLINE __m256i operator()(__m256i x) const {
        Pack<int32_t, Vec<T>::lanes> wide = extend<int32_t>(Pack<T, Vec<T>::lanes>{{{x}}});
        for (Vec<int32_t>& v : wide.v) {
            const auto scaled = [&](__m128i half) { return _mm256_mul_pd(logarithm(half), factor); };
            v = nearest<T>(scaled(_mm256_castsi256_si128(v.v)), scaled(_mm256_extracti128_si256(v.v, 1)));
        }
        return fit<T>(wide).v[0].v;
    }
};

template <Layout layout, class T, class Op>
QorResult runUnary(Op&& op, Image<const T> src, Image<T> dst, QorImageSize roi) {
    mapImage<keepsAlpha<layout>>(roi, channels(layout), op, streamsTo<layout>(dst, roi, src), dst, src);
    return QOR_OK;
}

template <Layout layout, class Function>
QorResult runFloats(Function function, Image<const float> src, Image<float> dst, QorImageSize roi) {
    return runUnary<layout>(OfFloats<Function>{function}, src, dst, roi);
}

template <class T>
QorResult check(Image<const T> src, Image<T> dst, QorImageSize roi) {
    return firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst));
}

/// 2^-scale, at bounds beyond which every integer result is 0 or saturated.
int boundedExponent(int32_t scale) { return scale > 100 ? -100 : scale < -100 ? 100 : -scale; }

/// Bitwise for floats and in integers for the others: nothing here reads the control register.
template <class T, Layout layout>
QorResult absolute(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = check(src, dst, roi)) return r;
    if constexpr (std::is_same_v<T, float>) {
        return runFloats<layout>([](__m256 v) { return _mm256_andnot_ps(_mm256_set1_ps(-0.0f), v); }, src, dst, roi);
    } else {
        src.step &= ~1;
        dst.step &= ~1;
        return runUnary<layout>(AbsoluteShorts{}, src, dst, roi);
    }
}

template <class T, Layout layout>
QorResult square(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check(src, dst, roi)) return r;
    return underControlOf<kernels::Component<T>>([&] {
        const auto run = [&](auto operation) { runBinary<layout>(operation, src, src, dst, roi); };
        if (!withScaledOperation<Product<T>, T>(scale, run)) fillConstant<layout>(dst, roi, T{});
        return QOR_OK;
    });
}

template <class T, Layout layout>
QorResult squareRoot(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check(src, dst, roi)) return r;
    return underDefaultControl([&] {
        if constexpr (std::is_same_v<T, float>) {
            return runFloats<layout>([](__m256 v) { return _mm256_sqrt_ps(v); }, src, dst, roi);
        } else {
            const int exponent = boundedExponent(scale);
            if (sizeof(T) == 1 || exponent <= 2)
                return runUnary<layout>(FloatRoot<T>{std::ldexp(1.0f, exponent)}, src, dst, roi);
            return runUnary<layout>(DoubleRoot<T>{powerOfTwo(exponent)}, src, dst, roi);
        }
    });
}

template <class T, Layout layout>
QorResult exponential(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check(src, dst, roi)) return r;
    return underDefaultControl([&] {
        if constexpr (std::is_same_v<T, float>)
            return runFloats<layout>([](__m256 v) { return kernels::exponential(v); }, src, dst, roi);
        else
            return runUnary<layout>(Exponential<T>{{scale, std::numeric_limits<T>::max()}}, src, dst, roi);
    });
}

template <class T, Layout layout>
QorResult logarithm(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check(src, dst, roi)) return r;
    return underDefaultControl([&] {
        if constexpr (std::is_same_v<T, float>) {
            return runFloats<layout>([](__m256 v) { return kernels::logarithm(v); }, src, dst, roi);
        } else {
            const auto run = [&]<class Rule>(Rule rule) {
                Logarithm<T, Rule> op{rule};
                runUnary<layout>(op, src, dst, roi);
                return op.warning;
            };
            if (scale >= 0) return run(CountSteps<T>{scale});
            return run(ScaledLogarithm<T>{powerOfTwo(boundedExponent(scale))});
        }
    });
}

}  // namespace
}  // namespace qori::arith

#include "entries/arith_unary.inc"
