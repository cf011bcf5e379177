// SPDX-License-Identifier: Apache-2.0
// Rows of bytes moved or filled without looking at them.
#pragma once
#include <cstddef>
#include <cstdint>

namespace qori::kernels {

void copyRow(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes);

/// Stores past the cache from the first 32-byte boundary of the destination on.
void copyRowStreaming(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes);

/// As copyRow, reading the source with non-temporal loads from its first 64-byte boundary on.
void copyRowStreamLoad(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes, bool streamStores);

/// A pixel repeated over 128 bytes. Pixels take 1, 2, 3, 4, 6, 8, 12 or 16 bytes, so that 96 bytes hold whole pixels and
/// any 32 bytes from an offset below 96 can be loaded.
struct Pattern {
    static constexpr int period = 96;
    alignas(32) uint8_t bytes[128];
};

template <class T>
Pattern patternOf(const T* pixel, int channels) {
    Pattern pattern;
    const auto* source = reinterpret_cast<const uint8_t*>(pixel);
    const int pixelBytes = channels * static_cast<int>(sizeof(T));
    for (int i = 0; i < pixelBytes; ++i) pattern.bytes[i] = source[i];
    for (int i = pixelBytes; i < 128; ++i) pattern.bytes[i] = pattern.bytes[i - pixelBytes];
    return pattern;
}

void fillRow(uint8_t* dst, const Pattern& pattern, ptrdiff_t bytes);
void fillRowStreaming(uint8_t* dst, const Pattern& pattern, ptrdiff_t bytes);

}  // namespace qori::kernels
