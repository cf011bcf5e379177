// SPDX-License-Identifier: Apache-2.0
#include "weights.h"

namespace qori::kernels {
namespace {

constexpr int kVectors = kPositions / 4;

/// A value of each position.
struct Values {
    __m256d v[kVectors];

    static QORI_INLINE Values all(double value) {
        Values values;
        for (__m256d& v : values.v) v = _mm256_set1_pd(value);
        return values;
    }
};

QORI_INLINE __m256d magnitudeOf(__m256d v) { return _mm256_andnot_pd(_mm256_set1_pd(-0.0), v); }

struct Linear {
    QORI_INLINE __m256d operator()(__m256d t) const {
        const __m256d isInside = _mm256_cmp_pd(t, _mm256_set1_pd(1), _CMP_LT_OQ);
        return _mm256_and_pd(_mm256_sub_pd(_mm256_set1_pd(1), t), isInside);
    }
};

struct Samples {
    const double* samples;
    int32_t rate, support;

    QORI_INLINE __m256d operator()(__m256d t) const {
        const __m256d at = _mm256_mul_pd(t, _mm256_set1_pd(rate));
        const __m256d isInside = _mm256_cmp_pd(t, _mm256_set1_pd(support), _CMP_LT_OQ);
        const __m128i index = _mm_min_epi32(_mm256_cvttpd_epi32(at), _mm_set1_epi32(rate * support - 1));
        const auto pair = [=, this](int32_t i) { return _mm_loadu_pd(samples + i); };
        const __m256d even = _mm256_set_m128d(pair(_mm_extract_epi32(index, 2)), pair(_mm_cvtsi128_si32(index)));
        const __m256d odd = _mm256_set_m128d(pair(_mm_extract_epi32(index, 3)), pair(_mm_extract_epi32(index, 1)));
        const __m256d from = _mm256_unpacklo_pd(even, odd), rise = _mm256_sub_pd(_mm256_unpackhi_pd(even, odd), from);
        const __m256d part = _mm256_sub_pd(at, _mm256_cvtepi32_pd(index));
        return _mm256_and_pd(_mm256_add_pd(from, _mm256_mul_pd(part, rise)), isInside);
    }
};

template <class Function>
QORI_NOINLINE double makeWeightsBy(const Function& function, const Taps& taps, const double (&fractions)[kPositions],
                                   int count, float* out) {
    constexpr int32_t kKept = 32;  // so many are not evaluated twice
    const auto weigh = [&](int32_t k) {
        Values w;
        for (int i = 0; i < kVectors; ++i) {
            const __m256d from = _mm256_set1_pd(k - (taps.count / 2 - 1));
            const __m256d distance = _mm256_sub_pd(from, _mm256_loadu_pd(fractions + 4 * i));
            w.v[i] = function(magnitudeOf(_mm256_mul_pd(_mm256_set1_pd(taps.scale), distance)));
        }
        return w;
    };
    Values kept[kKept], factor = Values::all(1);
    if (taps.normalises) {
        Values sum = Values::all(0);
        for (int32_t k = 0; k < taps.count; ++k) {
            const Values w = weigh(k);
            if (k < kKept) kept[k] = w;
            for (int i = 0; i < kVectors; ++i) sum.v[i] = _mm256_add_pd(sum.v[i], w.v[i]);
        }
        for (int i = 0; i < kVectors; ++i) factor.v[i] = _mm256_div_pd(factor.v[i], sum.v[i]);
    }
    Values magnitude = Values::all(0), rest = Values::all(1), most = Values::all(-1), largest = Values::all(0);
    for (int32_t k = 0; k < taps.count; ++k) {
        const Values w = taps.normalises && k < kKept ? kept[k] : weigh(k);
        alignas(16) float rounded[kPositions];
        for (int i = 0; i < kVectors; ++i) {
            const __m128 narrow = _mm256_cvtpd_ps(_mm256_mul_pd(w.v[i], factor.v[i]));
            _mm_store_ps(rounded + 4 * i, narrow);
            const __m256d stored = _mm256_cvtps_pd(narrow), size = magnitudeOf(stored);
            magnitude.v[i] = _mm256_add_pd(magnitude.v[i], size);
            rest.v[i] = _mm256_sub_pd(rest.v[i], stored);
            const __m256d isLarger = _mm256_cmp_pd(size, most.v[i], _CMP_GT_OQ);
            largest.v[i] = _mm256_blendv_pd(largest.v[i], _mm256_set1_pd(k), isLarger);
            most.v[i] = _mm256_blendv_pd(most.v[i], size, isLarger);
        }
        for (int j = 0; j < count; ++j) out[ptrdiff_t{j} * taps.count + k] = rounded[j];
    }
    double sums[kPositions], rests[kPositions], places[kPositions], all = 0;
    for (int i = 0; i < kVectors; ++i) {
        _mm256_storeu_pd(sums + 4 * i, magnitude.v[i]);
        _mm256_storeu_pd(rests + 4 * i, rest.v[i]);
        _mm256_storeu_pd(places + 4 * i, largest.v[i]);
    }
    for (int j = 0; j < count; ++j) {
        float& one = out[ptrdiff_t{j} * taps.count + static_cast<int32_t>(places[j])];
        if (taps.normalises) one = static_cast<float>(static_cast<double>(one) + rests[j]);
        all = sums[j] <= all ? all : sums[j];
    }
    return all;
}

}  // namespace

double makeWeights(const Filter& filter, const Taps& taps, const double (&fractions)[kPositions], int count,
                   float* out) {
    switch (filter.shape) {
        case Filter::Shape::linear: return makeWeightsBy(Linear{}, taps, fractions, count, out);
        case Filter::Shape::cubic: return makeWeightsBy(filter.cubic, taps, fractions, count, out);
        default: break;
    }
    return makeWeightsBy(Samples{filter.samples, filter.rate, filter.support}, taps, fractions, count, out);
}

}  // namespace qori::kernels
