// SPDX-License-Identifier: Apache-2.0
// Rows whose channels move: planes, single channels, alpha dropped or kept. Elements are 1, 2 or 4 bytes.
#pragma once
#include <cstddef>
#include <cstdint>

namespace qori::kernels {

/// Packed pixels to `channels` planes (3 or 4) and back.
template <int channels, int element>
void splitRow(uint8_t* const* planes, const uint8_t* src, ptrdiff_t pixels, bool streaming);
template <int channels, int element>
void mergeRow(uint8_t* dst, const uint8_t* const* planes, ptrdiff_t pixels, bool streaming);

/// src and dst point at the channel's element of the first pixel. insertRow rewrites the bytes between elements.
template <int channels, int element>
void extractRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels, bool streaming);
template <int channels, int element>
void insertRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels);

/// Every element to all channels of its pixel.
template <int channels, int element>
void duplicateRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels, bool streaming);

/// Four channels to three, and three into the first three of four.
template <int element>
void dropAlphaRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels, bool streaming);
template <int element>
void fillColourRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels);

}  // namespace qori::kernels
