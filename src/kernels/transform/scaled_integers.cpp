// SPDX-License-Identifier: Apache-2.0
#include "scaled_integers.h"

#include <limits>

namespace qori::kernels {

double factorOfScale(int32_t scaleFactor) {
    // Floats are multiples of 2^-149 below 2^128: beyond these exponents everything is 0 or saturates.
    const int32_t bounded = scaleFactor > 300 ? 300 : scaleFactor < -300 ? -300 : scaleFactor;
    const uint64_t bits = static_cast<uint64_t>(1023 - bounded) << 52;
    double factor;
    __builtin_memcpy(&factor, &bits, sizeof factor);
    return factor;
}

template <class T>
void channelToFloats(const T* src, int channels, float* dst, ptrdiff_t pixels) {
    if (channels == 1)
        for (ptrdiff_t i = 0; i < pixels; ++i) dst[i] = static_cast<float>(src[i]);
    else
        for (ptrdiff_t i = 0; i < pixels; ++i) dst[i] = static_cast<float>(src[i * channels]);
}

namespace {

/// What is no number becomes the type's minimum.
template <class T>
T toInteger(float value, double factor) {
    constexpr double low = std::numeric_limits<T>::min(), high = std::numeric_limits<T>::max();
    double scaled = value * factor;
    scaled = scaled > low ? scaled : low;
    scaled = scaled < high ? scaled : high;
    return static_cast<T>(static_cast<int32_t>(__builtin_rint(scaled)));
}

}  // namespace

template <class T>
void floatsToChannel(const float* src, double factor, T* dst, int channels, ptrdiff_t pixels) {
    if (channels == 1)
        for (ptrdiff_t i = 0; i < pixels; ++i) dst[i] = toInteger<T>(src[i], factor);
    else
        for (ptrdiff_t i = 0; i < pixels; ++i) dst[i * channels] = toInteger<T>(src[i], factor);
}

template void channelToFloats(const uint8_t*, int, float*, ptrdiff_t);
template void channelToFloats(const int32_t*, int, float*, ptrdiff_t);
template void floatsToChannel(const float*, double, uint8_t*, int, ptrdiff_t);
template void floatsToChannel(const float*, double, int32_t*, int, ptrdiff_t);

}  // namespace qori::kernels
