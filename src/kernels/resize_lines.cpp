// SPDX-License-Identifier: Apache-2.0
#include "resize_lines.h"

#include "resize_floats.h"

namespace qori::kernels {
namespace {

template <int taps>
QORI_NOINLINE void filterLineOf(const LineFilter& filter, const float* line, float* out) {
    const int32_t n = taps > 0 ? taps : filter.taps;
    const int32_t* bases = filter.bases;
    const int32_t* order = filter.order;
    const float* weights = filter.weights;
    const ptrdiff_t pixel = filter.channels;
    for (ptrdiff_t g = 0; g < filter.groups; ++g, order += 8, weights += 8 * n, out += 8) {
        const float* window = line + bases[g];
        const __m256i places = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(order));
        const auto gather = [&] { return _mm256_permutevar8x32_ps(_mm256_loadu_ps(window), places); };
        __m256 sum = _mm256_mul_ps(_mm256_loadu_ps(weights), gather());
#pragma GCC unroll 8
        for (int32_t k = 1; k < n; ++k) {
            window += pixel;
            sum = _mm256_fmadd_ps(_mm256_loadu_ps(weights + 8 * k), gather(), sum);
        }
        _mm256_storeu_ps(out, sum);
    }
}

template <int channels>
void repeatFloats(const float* pixel, float* out, int32_t count) {
    for (int32_t i = 0; i < count; ++i)
        for (int c = 0; c < channels; ++c) *out++ = pixel[c];
}

}  // namespace

void listLine(LineFilter& filter, const PixelTaps* pixels, int32_t width, const float* weights, int32_t origin) {
    const ptrdiff_t elements = ptrdiff_t{width} * filter.channels;
    filter.groups = (elements + 7) / 8;
    int32_t pixel = 0, channel = 0;
    for (ptrdiff_t g = 0; g < filter.groups; ++g) {
        int32_t places[8], base = INT32_MAX;
        for (int i = 0; i < 8; ++i) {
            const float* from = weights + pixels[pixel].weights;
            for (int32_t k = 0; k < filter.taps; ++k) filter.weights[(g * filter.taps + k) * 8 + i] = from[k];
            places[i] = (pixels[pixel].first - origin) * filter.channels + channel;
            base = places[i] < base ? places[i] : base;
            if (8 * g + i + 1 >= elements) continue;
            channel = channel + 1 < filter.channels ? channel + 1 : 0;
            pixel += channel == 0;
        }
        filter.bases[g] = base;
        for (int i = 0; i < 8; ++i) filter.order[8 * g + i] = places[i] - base;
    }
}

void filterLine(const LineFilter& filter, const float* line, float* out) {
    switch (filter.taps) {
        case 2: return filterLineOf<2>(filter, line, out);
        case 4: return filterLineOf<4>(filter, line, out);
        case 6: return filterLineOf<6>(filter, line, out);
        default: return filterLineOf<0>(filter, line, out);
    }
}

template <class T, int channels>
void expandLine(const T* row, ptrdiff_t elements, int32_t left, int32_t right, const T* nextRow, float* line) {
    float* const inside = line + ptrdiff_t{left} * channels;
    constexpr ptrdiff_t kPerLine = 64 / static_cast<ptrdiff_t>(sizeof(T));
    for (ptrdiff_t i = 0; i < elements; i += kPerLine)
        _mm_prefetch(reinterpret_cast<const char*>(nextRow + i), _MM_HINT_T0);
    ptrdiff_t i = 0;
    for (; i + 8 <= elements; i += 8) _mm256_storeu_ps(inside + i, toFloats(row + i, 8));
    if (i < elements) _mm256_storeu_ps(inside + i, toFloats(row + i, elements - i));
    repeatFloats<channels>(inside, line, left);
    repeatFloats<channels>(inside + elements - channels, inside + elements, right);
}

#define QORI_LINES(T)                                                                        \
    template void expandLine<T, 1>(const T*, ptrdiff_t, int32_t, int32_t, const T*, float*); \
    template void expandLine<T, 3>(const T*, ptrdiff_t, int32_t, int32_t, const T*, float*); \
    template void expandLine<T, 4>(const T*, ptrdiff_t, int32_t, int32_t, const T*, float*);
QORI_LINES(uint8_t)
QORI_LINES(uint16_t)
QORI_LINES(int16_t)
QORI_LINES(float)
#undef QORI_LINES

}  // namespace qori::kernels
