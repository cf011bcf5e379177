// SPDX-License-Identifier: Apache-2.0
// One channel of integer images to floats, and floats times a power of two to integers: to nearest, ties to even,
// saturated. In double precision, where the products are exact.
#pragma once
#include <cstddef>
#include <cstdint>

namespace qori::kernels {

/// 2^-scaleFactor, or where that is out of a double's range, one that gives any float the same integer.
double factorOfScale(int32_t scaleFactor);

/// Elements of the channel are `channels` apart; the floats are neighbours.
template <class T>
void channelToFloats(const T* src, int channels, float* dst, ptrdiff_t pixels);
template <class T>
void floatsToChannel(const float* src, double factor, T* dst, int channels, ptrdiff_t pixels);

extern template void channelToFloats(const uint8_t*, int, float*, ptrdiff_t);
extern template void channelToFloats(const int32_t*, int, float*, ptrdiff_t);
extern template void floatsToChannel(const float*, double, uint8_t*, int, ptrdiff_t);
extern template void floatsToChannel(const float*, double, int32_t*, int, ptrdiff_t);

}  // namespace qori::kernels
