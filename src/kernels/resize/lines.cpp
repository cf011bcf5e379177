// SPDX-License-Identifier: Apache-2.0
#include "lines.h"

#include "floats.h"
#include "octets.h"

namespace qori::kernels {
namespace {

using Windows = LineFilter::Windows;

/// Eight results. `taps` 0 is any number.
template <int taps, Windows windows>
QORI_INLINE __m256 sumWindows(const float* window, __m256i order, const float* weights, int32_t count,
                              ptrdiff_t pixel) {
    const int32_t n = taps > 0 ? taps : count;
    const __m256 second = _mm256_castsi256_ps(_mm256_slli_epi32(order, 28));
    const auto gather = [&] {
        const __m256 low = _mm256_permutevar8x32_ps(_mm256_loadu_ps(window), order);
        if constexpr (windows == Windows::one) return low;
        const __m256 high = _mm256_permutevar8x32_ps(_mm256_loadu_ps(window + 8), order);
        return _mm256_blendv_ps(low, high, second);
    };
    __m256 sum = _mm256_mul_ps(_mm256_loadu_ps(weights), gather());
#pragma GCC unroll 12
    for (int32_t k = 1; k < n; ++k) {
        window += pixel;
        sum = _mm256_fmadd_ps(_mm256_loadu_ps(weights + 8 * k), gather(), sum);
    }
    return sum;
}

template <int taps, Windows windows>
QORI_NOINLINE void filterLineOf(const LineFilter& filter, const float* line, const uint8_t* later, int bytes,
                                float* out) {
    const ptrdiff_t pixel = filter.channels, tableFloats = 8 * ptrdiff_t{taps > 0 ? taps : filter.taps};
    const ptrdiff_t cycle = filter.cycle > 0 ? filter.cycle : filter.groups, last = filter.groups - 1;
    const int32_t *bases = filter.bases, *order = filter.order;
    const float* weights = filter.weights;
    const auto sum = [&](ptrdiff_t g, ptrdiff_t table) {
        const float* from = weights + table * tableFloats;
        const __m256i places = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(order + 8 * table));
        return sumWindows<taps, windows>(line + bases[g], places, from, filter.taps, pixel);
    };
    ptrdiff_t table = 0;
    for (ptrdiff_t g = 0; g < last; ++g) {
        prefetch(later + ptrdiff_t{bases[g]} * bytes);
        _mm256_storeu_ps(out + 8 * g, sum(g, table));
        table = table + 1 < cycle ? table + 1 : 0;
    }
    _mm256_storeu_ps(out + 8 * last, sum(last, last));
}

template <int taps>
void filterLineOf(const LineFilter& filter, const float* line, const uint8_t* later, int bytes, float* out) {
    if (filter.windows == Windows::one)
        filterLineOf<taps, Windows::one>(filter, line, later, bytes, out);
    else
        filterLineOf<taps, Windows::two>(filter, line, later, bytes, out);
}

/// Whether a group's tables are those of `cycle` groups before.
bool repeats(const LineFilter& filter, ptrdiff_t g, ptrdiff_t cycle) {
    bool same = isSame(filter.order + 8 * g, filter.order + 8 * (g - cycle));
    for (int32_t k = 0; k < filter.taps; ++k)
        same = same &&
               isSame(filter.weights + 8 * (g * filter.taps + k), filter.weights + 8 * ((g - cycle) * filter.taps + k));
    return same;
}

void findCycle(LineFilter& filter) {
    const ptrdiff_t cycle = channelCycle(filter.channels);
    filter.cycle = filter.groups > cycle ? cycle : 0;
    for (ptrdiff_t g = cycle; g + 1 < filter.groups && filter.cycle > 0; ++g)
        if (!repeats(filter, g, cycle)) filter.cycle = 0;
}

/// Lists groups `begin` to before `end`, and those that are made together with them. Returns which windows serve.
template <int channels>
QORI_NOINLINE Windows listLineOf(const LineFilter& filter, const PixelTaps* pixels, int32_t width, const float* weights,
                                 int32_t origin, ptrdiff_t begin, ptrdiff_t end) {
    const int32_t taps = filter.taps;
    __m256i beyond = _mm256_setzero_si256();
    for (ptrdiff_t group = begin / channels * channels; group < end; group += channels) {
        const EightPixels eight(pixels, width, static_cast<int32_t>(group / channels) * 8, weights);
        const int octets = static_cast<int>(std::min<ptrdiff_t>(channels, filter.groups - group));
        for (int j = 0; j < octets; ++j) {
            const __m256i places = octetPlaces<channels>(eight.first, origin, j), base = leastOfAll(places);
            filter.bases[group + j] = _mm256_cvtsi256_si32(base);
            const __m256i order = _mm256_sub_epi32(places, base);
            store(filter.order + 8 * (group + j), Vec<int32_t>{order});
            beyond = _mm256_or_si256(beyond, _mm256_srli_epi32(order, 3));
        }
        forTaps(eight.weights, taps, [&](int32_t k, __m256 w) {
            for (int j = 0; j < octets; ++j)
                store(filter.weights + 8 * ((group + j) * taps + k),
                      fromInteger<float>(spreadToOctet<channels>(toInteger(w), j)));
        });
    }
    return _mm256_testz_si256(beyond, beyond) ? Windows::one : Windows::two;
}

template <int channels>
void repeatFloats(const float* pixel, float* out, int32_t count) {
    for (int32_t i = 0; i < count; ++i)
        for (int c = 0; c < channels; ++c) *out++ = pixel[c];
}

}  // namespace

void listLine(LineFilter& filter, const PixelTaps* pixels, int32_t width, const float* weights, int32_t period,
              int32_t origin) {
    filter.groups = (ptrdiff_t{width} * filter.channels + 7) / 8;
    const auto list = filter.channels == 1 ? listLineOf<1> : filter.channels == 3 ? listLineOf<3> : listLineOf<4>;
    const ptrdiff_t cycle = channelCycle(filter.channels), last = filter.groups - 1;
    const int32_t cyclePixels = static_cast<int32_t>(8 * cycle / filter.channels);
    if (period > 0 && cyclePixels % period == 0 && last > 2 * cycle) {
        const Windows first = list(filter, pixels, width, weights, origin, 0, 2 * cycle);
        const Windows second = list(filter, pixels, width, weights, origin, last, filter.groups);
        filter.windows = first == Windows::two ? first : second;
        filter.cycle = cycle;
        const int32_t step = filter.bases[cycle] - filter.bases[0];
        for (ptrdiff_t g = 2 * cycle; g < last; ++g) filter.bases[g] = filter.bases[g - cycle] + step;
        return;
    }
    filter.windows = list(filter, pixels, width, weights, origin, 0, filter.groups);
    findCycle(filter);
}

void filterLine(const LineFilter& filter, const float* line, const uint8_t* later, int bytes, float* out) {
    switch (filter.taps) {
        case 2: return filterLineOf<2>(filter, line, later, bytes, out);
        case 4: return filterLineOf<4>(filter, line, later, bytes, out);
        case 6: return filterLineOf<6>(filter, line, later, bytes, out);
        default: return filterLineOf<0>(filter, line, later, bytes, out);
    }
}

template <class T, int channels>
void expandLine(const T* row, ptrdiff_t elements, int32_t left, int32_t right, float* line) {
    float* const inside = line + ptrdiff_t{left} * channels;
    ptrdiff_t i = 0;
    for (; i + 8 <= elements; i += 8) _mm256_storeu_ps(inside + i, toFloats(row + i, 8));
    if (i < elements) _mm256_storeu_ps(inside + i, toFloats(row + i, elements - i));
    repeatFloats<channels>(inside, line, left);
    repeatFloats<channels>(inside + elements - channels, inside + elements, right);
}

#define QORI_LINES(T)                                                              \
    template void expandLine<T, 1>(const T*, ptrdiff_t, int32_t, int32_t, float*); \
    template void expandLine<T, 3>(const T*, ptrdiff_t, int32_t, int32_t, float*); \
    template void expandLine<T, 4>(const T*, ptrdiff_t, int32_t, int32_t, float*);
QORI_LINES(uint8_t)
QORI_LINES(uint16_t)
QORI_LINES(int16_t)
QORI_LINES(float)
#undef QORI_LINES

}  // namespace qori::kernels
