// SPDX-License-Identifier: Apache-2.0
// Row operations that are functions of one image: absolute values, roots, exponentials and logarithms. Integer results
// are the real results under the scaling rule, rounded once. All but the absolute values want the default control
// register.
#pragma once
#include "arith.h"
#include "exp_ln.h"
#include "kernels/pack_convert.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// A function of floats, vector by vector.
template <class Function>
struct OfFloats {
    Function function;

    template <int n>
    QORI_INLINE Pack<float, n> operator()(int, Pack<float, n> a) const {
        for (Vec<float>& v : a.v) v = function(v);
        return a;
    }
};

struct AbsoluteShorts {
    /// The largest of x and its saturated negative.
    template <int n>
    QORI_INLINE Pack<int16_t, n> operator()(int, Pack<int16_t, n> a) const {
        for (Vec<int16_t>& v : a.v) v = larger(v, subtractSaturated(zero<int16_t>(), v));
        return a;
    }
};

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
        for (Vec<float>& v : root.v) v = squareRoot(larger(v, zero<float>())) * splat(factor);
        return roundTo<NearestEven, T>(root);
    }
};

/// In double, for the scales below: results below 2^16 are a half or at least 2^-19 from one.
template <class T>
struct DoubleRoot {
    double factor;

    template <int n>
    QORI_INLINE Pack<T, n> operator()(int, Pack<T, n> a) const {
        const __m256d factors = _mm256_set1_pd(factor);
        Pack<int32_t, n> wide = extend<int32_t>(a);
        for (Vec<int32_t>& v : wide.v) {
            v = larger(v, zero<int32_t>());
            const auto root = [&](__m128i x) { return _mm256_mul_pd(_mm256_sqrt_pd(_mm256_cvtepi32_pd(x)), factors); };
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
            v = v - splat(table.first - 1);
            const __m256i index = smaller(larger(v, zero<int32_t>()), splat<int32_t>(15)).v;
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
        const Vec<T> x = a.v[0], one = splat<T>(1);
        const Mask<T> none = isLess(x, one);
        if (any(none)) note(none, x);
        return {{select(none, splat(std::numeric_limits<T>::min()), rule(larger(x, one)))}};
    }

    /// The zeros behind the last elements are no zeros of the image.
    template <int n>
    QORI_INLINE Pack<T, n> tail(int phase, ptrdiff_t count, Pack<T, n> a) {
        alignas(kVectorBytes) T padded[n];
        store(padded, a.v[0]);
        for (ptrdiff_t i = count; i < n; ++i) padded[i] = 1;
        return (*this)(phase, Pack<T, n>{{load(padded)}});
    }

private:
    void note(Mask<T> none, Vec<T> x) {
        if (warning != QOR_OK) return;
        T lanes[Vec<T>::lanes];
        store(lanes, x);
        warning = lanes[firstSelected(none)] < 0 ? QOR_WARN_LOG_NEGATIVE : QOR_WARN_LOG_ZERO;
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
    QORI_INLINE Vec<T> operator()(Vec<T> x) const {
        Vec<T> reached = zero<T>();
        for (int i = 0; i < count; ++i) reached = reached - Vec<T>{isAtMost(splat(least[i]), x).v};  // less -1
        return reached;
    }
};

/// In double, for the scales below.
template <class T>
struct ScaledLogarithm {
    double factor;

    QORI_INLINE Vec<T> operator()(Vec<T> x) const {
        const __m256d factors = _mm256_set1_pd(factor);
        Pack<int32_t, Vec<T>::lanes> wide = extend<int32_t>(Pack<T, Vec<T>::lanes>{{x}});
        for (Vec<int32_t>& v : wide.v) {
            const auto scaled = [&](__m128i half) { return _mm256_mul_pd(logarithm(half), factors); };
            v = nearest<T>(scaled(_mm256_castsi256_si128(v.v)), scaled(_mm256_extracti128_si256(v.v, 1)));
        }
        return fit<T>(wide).v[0];
    }
};

}  // namespace qori::kernels
