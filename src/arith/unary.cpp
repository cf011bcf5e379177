// SPDX-License-Identifier: Apache-2.0
// Functions of one image. Integer results are the real results under the scaling rule, rounded once.
#include "images.h"
#include "kernels/exp_ln.h"
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

/// In float, for scale factors from -2 up. With y = sqrt(x) 2^-s and t a half: y^2 - t^2 is 0 or at least 1/4 (s = 0;
/// the other scales shift both alike), so y is t or at least 2^-11 from it while y <= 2^8, and at least 2^-13 for s =
/// -2 with y <= 2^10. Half a unit in y's last place is 2^-17 and 2^-15: it rounds to neither t nor past it.
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

/// Remembers the first element at or below 0: its kind is the warning.
template <class T>
struct Logarithm {
    __m256d factor;
    QorResult warning = QOR_OK;

    template <int n>
    QORI_INLINE Pack<T, n> operator()(int, Pack<T, n> a) {
        Pack<int32_t, n> wide = extend<int32_t>(a);
        for (Vec<int32_t>& v : wide.v) {
            const __m256i one = _mm256_set1_epi32(1), none = _mm256_cmpgt_epi32(one, v.v);
            const int holes = _mm256_movemask_ps(_mm256_castsi256_ps(none));
            if (holes != 0 && warning == QOR_OK) {
                const int negative = _mm256_movemask_ps(_mm256_castsi256_ps(v.v));
                warning = negative >> __builtin_ctz(static_cast<unsigned>(holes)) & 1 ? QOR_WARN_LOG_NEGATIVE
                                                                                      : QOR_WARN_LOG_ZERO;
            }
            const __m256i positive = _mm256_max_epi32(v.v, one);
            const auto scaled = [&](__m128i x) { return _mm256_mul_pd(logarithm(x), factor); };
            v = nearest<T>(scaled(_mm256_castsi256_si128(positive)), scaled(_mm256_extracti128_si256(positive, 1)));
            v.v = _mm256_blendv_epi8(v.v, _mm256_set1_epi32(std::numeric_limits<T>::min()), none);
        }
        return fit<T>(wide);
    }

    /// The zeros behind the last elements are no zeros of the image.
    template <int n>
    QORI_INLINE Pack<T, n> tail(int phase, ptrdiff_t count, Pack<T, n> a) {
        alignas(32) T padded[n];
        for (int i = 0; i < Pack<T, n>::vectors; ++i) store(padded + i * Vec<T>::lanes, a.v[i]);
        for (ptrdiff_t i = count; i < n; ++i) padded[i] = 1;
        return (*this)(phase, kernels::detail::loadPack<T, n>(padded));
    }
};

template <Layout layout, class T, class Op>
QorResult runUnary(Op&& op, Image<const T> src, Image<T> dst, QorImageSize roi) {
    const ControlScope scope;
    const bool streaming = streams(streamRules::copy, traffic(roi, 2 * channels(layout) * elementBytes<T>));
    mapImage<keepsAlpha<layout>>(roi, channels(layout), op, streaming, dst, src);
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
    const auto run = [&](auto operation) { runBinary<layout>(operation, src, src, dst, roi); };
    if (!withScaledOperation<Product<T>, T>(scale, run)) fillConstant<layout>(dst, roi, T{});
    return QOR_OK;
}

template <class T, Layout layout>
QorResult squareRoot(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check(src, dst, roi)) return r;
    if constexpr (std::is_same_v<T, float>) {
        return runFloats<layout>([](__m256 v) { return _mm256_sqrt_ps(v); }, src, dst, roi);
    } else {
        const int exponent = boundedExponent(scale);
        if (exponent > 2) return runUnary<layout>(DoubleRoot<T>{powerOfTwo(exponent)}, src, dst, roi);
        return runUnary<layout>(FloatRoot<T>{std::ldexp(1.0f, exponent)}, src, dst, roi);
    }
}

template <class T, Layout layout>
QorResult exponential(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check(src, dst, roi)) return r;
    if constexpr (std::is_same_v<T, float>) {
        return runFloats<layout>([](__m256 v) { return kernels::exponential(v); }, src, dst, roi);
    } else {
        return runUnary<layout>(Exponential<T>{{scale, std::numeric_limits<T>::max()}}, src, dst, roi);
    }
}

template <class T, Layout layout>
QorResult logarithm(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check(src, dst, roi)) return r;
    if constexpr (std::is_same_v<T, float>) {
        return runFloats<layout>([](__m256 v) { return kernels::logarithm(v); }, src, dst, roi);
    } else {
        Logarithm<T> op{powerOfTwo(boundedExponent(scale))};
        runUnary<layout>(op, src, dst, roi);
        return op.warning;
    }
}

}  // namespace
}  // namespace qori::arith

#include "entries/arith_unary.inc"
