// SPDX-License-Identifier: Apache-2.0
// Tables of bytes, looked up 32 elements at a time: a shuffle looks up a row of sixteen entries, and gives 0 where the
// top bit of its index is set.
#pragma once
#include "kernels/map.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// A table of 16 * rows entries, for the low bits of an element: 4, 7 or 8 of them for 1, 8 or 16 rows.
///
/// Rows are kept as their difference to the row before. The index loses sixteen from row to row and turns negative
/// behind the element's own row, so that the differences up to there, and no others, add up to its entry. The upper
/// eight rows use the indexes of the lower ones and are kept as the difference to these: 41 operations for 32 elements
/// where each row by itself, with an index of its own, takes 64.
template <int rows>
class ByteLookup {
public:
    static_assert(rows == 1 || rows == 8 || rows == 16);
    static constexpr int entries = 16 * rows;

    ByteLookup() = default;
    explicit ByteLookup(const uint8_t* table) {
        takeDifferences(difference_, table, nullptr);
        if constexpr (rows == 16) takeDifferences(difference_ + 128, table + 128, table);
    }

    QORI_INLINE Bytes operator()(Bytes v) const {
        Bytes index = v & splat(uint8_t{rows == 1 ? 0x0F : 0x7F});
        Bytes low = shuffleInBlocks(row(0), index);
        if constexpr (rows == 1) return low;
        Bytes high = rows == 16 ? shuffleInBlocks(row(8), index) : zero<uint8_t>();
        for (int i = 1; i < 8; ++i) {
            index = index - splat(uint8_t{16});
            low = low ^ shuffleInBlocks(row(i), index);
            if constexpr (rows == 16) high = high ^ shuffleInBlocks(row(8 + i), index);
        }
        if constexpr (rows == 8) return low;
        const Mask<int8_t> isUpper = isLess(Vec<int8_t>{v.v}, zero<int8_t>());
        return low ^ selectOrZero(Mask<uint8_t>{isUpper.v}, high);
    }
    /// As an operation of the row map.
    QORI_INLINE Pack<uint8_t, 32> operator()(int, Pack<uint8_t, 32> source) const { return {{(*this)(source.v[0])}}; }

private:
    static constexpr int kHalf = rows == 1 ? 16 : 128;  ///< Entries that have their indexes to themselves.

    /// The rows of half a table, less another half's where there is one, as differences to the row before.
    static void takeDifferences(uint8_t* to, const uint8_t* half, const uint8_t* other) {
        uint8_t rowsBefore[16 + 128] = {};
        uint8_t* const entry = rowsBefore + 16;
        for (int i = 0; i < kHalf; i += 32) {
            const Bytes two = loadUpTo(half + i, kHalf - i);
            storeUpTo(entry + i, other == nullptr ? two : two ^ loadUpTo(other + i, kHalf - i), kHalf - i);
        }
        for (int i = 0; i < kHalf; i += 32)
            storeUpTo(to + i, loadUpTo(entry + i, kHalf - i) ^ loadUpTo(rowsBefore + i, kHalf - i), kHalf - i);
    }
    QORI_INLINE Bytes row(int i) const { return repeatBlock(difference_ + 16 * i); }

    alignas(kVectorBytes) uint8_t difference_[entries];
};

/// A block whose size is rounded up to whole vectors, in place.
QORI_NOINLINE inline void lookUpBlock(uint8_t* block, int n, const ByteLookup<16>& table) {
    for (int x = 0; x < n; x += Bytes::lanes) store(block + x, table(load(block + x)));
}

}  // namespace qori::kernels
