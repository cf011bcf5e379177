// SPDX-License-Identifier: Apache-2.0
// Rows of bytes moved or filled without looking at them.
#pragma once
#include "byte_tables.h"
#include "simd.h"
#include "streamed_lines.h"

namespace qori::kernels {

void copyRow(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes);

/// Whole lines of the destination past the cache.
void copyRowStreaming(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes, RowStores stores = RowStores::streamed);

/// Rows of 8 KiB and more by the processor's string move, which need not fetch a cache line that it overwrites whole:
/// for images that do not stay in the second-level cache, on processors with fast strings.
void copyRowString(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes);

/// Rows of 1 to kNarrowRow bytes, one after the other.
inline constexpr int kNarrowRow = 64;
void copyNarrowRows(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, int bytes, int rows);

/// As copyRow, reading the source with non-temporal loads from its first 64-byte boundary on.
void copyRowStreamLoad(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes, bool streamStores);

/// A pixel repeated over 128 bytes. Pixels take 1, 2, 3, 4, 6, 8, 12 or 16 bytes, so that 96 bytes hold whole pixels
/// and any 32 bytes from an offset below 96 can be loaded.
struct Pattern {
    static constexpr int period = 96;
    alignas(kVectorBytes) uint8_t bytes[128];
};

template <int pixelBytes>
Pattern repeatPixel(const uint8_t* pixel) {
    static constexpr auto index = [] {
        std::array<ByteTable, 4> tables{};
        for (int i = 0; i < 128; ++i)
            tables[static_cast<size_t>(i / 32)].at[i % 32] = static_cast<uint8_t>(i % pixelBytes);
        return tables;
    }();
    const Bytes both{_mm256_broadcastsi128_si256(_mm256_castsi256_si128(loadPartial(pixel, pixelBytes).v))};
    Pattern pattern;
    for (int k = 0; k < 4; ++k)
        store(pattern.bytes + 32 * k, shuffleInBlocks(both, load(index[static_cast<size_t>(k)].at)));
    return pattern;
}

template <int channels, class T>
Pattern patternOf(const T* pixel) {
    return repeatPixel<channels* static_cast<int>(sizeof(T))>(reinterpret_cast<const uint8_t*>(pixel));
}

void fillRow(uint8_t* dst, const Pattern& pattern, ptrdiff_t bytes);
void fillRowStreaming(uint8_t* dst, const Pattern& pattern, ptrdiff_t bytes);

/// As copyRowString, for patterns that repeat every four bytes.
bool repeatsWords(const Pattern& pattern);
void fillRowString(uint8_t* dst, const Pattern& pattern, ptrdiff_t bytes);

}  // namespace qori::kernels
