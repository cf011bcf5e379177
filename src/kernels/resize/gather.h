// SPDX-License-Identifier: Apache-2.0
// Gathering bytes of a row by table. A lane is 16 bytes of the result; each comes from anywhere in the row, but
// neighbours come from near each other, so a lane is one to four loads of 16 bytes (windows), each shuffled, joined by
// or. A lane whose bytes lie further apart makes the whole row fall back to moving pixels one by one. Tables are made
// from the indices of a plan, a lane in a dozen instructions, so that even a single row pays for them.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

/// Where the pixels of a row come from.
struct Picks {
    const int32_t* indices;  ///< Of the source, one per pixel of the result, ascending.
    int32_t count;
    int32_t first, last;  ///< Indices that may be read, others stand for the nearest; rows are given from the first on.
    int32_t period;       ///< Pixels after which indices go on by one step and weights repeat, or 0 where not known.

    int32_t clamp(int32_t index) const { return index < first ? first : index > last ? last : index; }
};

/// Where n (16 at most) entries of a table of `count` from `at` on lie in memory: in the table, or in `copy` with the
/// last one repeated.
QORI_INLINE const int32_t* readable(const int32_t* table, int32_t count, int32_t at, int32_t n, int32_t* copy) {
    if (at + n <= count) return table + at;
    for (int32_t i = 0; i < n; ++i) copy[i] = table[at + i < count ? at + i : count - 1];
    return copy;
}

struct Gather {
    static constexpr int kLane = 16, kMostWindows = 4;
    static constexpr int kLaneBytes = kMostWindows * (kLane + 4);  ///< Of tables per lane.

    Picks picks{};
    int32_t pixelBytes = 0;
    int32_t windows = 0;       ///< Per lane; 0 to move pixels one by one.
    ptrdiff_t groups = 0;      ///< Pairs of lanes.
    int32_t* bases = nullptr;  ///< Per group and window: starts of both lanes' loads.
    uint8_t* masks = nullptr;  ///< Per group and window: 32 shuffle indices, negative for another window's bytes.
    /// Groups from the third to before this one have the masks of the groups two before them, and bases `stride` bytes
    /// behind theirs: at simple ratios all but those at the ends. Known for one window only.
    ptrdiff_t alikeEnd = 0;
    ptrdiff_t stride = 0;
    /// By the period: of the alike groups there are tables for those before kListed only.
    bool isPeriodic = false;
    static constexpr ptrdiff_t kListed = 6;
};

/// Bytes of the tables for a row of so many pixels.
constexpr int64_t gatherTableBytes(int64_t pixels, int pixelBytes) {
    return (pixels * pixelBytes + 31) / 32 * 2 * Gather::kLaneBytes;
}

/// Tables, where so many rows pay for them, for rows that hold 16 bytes at least, of pixels of 1, 2, 3, 4, 6, 8, 12 or
/// 16 bytes and indices that need no clamping. `memory` is 32-byte aligned and holds gatherTableBytes().
Gather buildGather(uint8_t* memory, const Picks& picks, int pixelBytes, int32_t rows);
/// Tables for pairs of bytes: each element of a pixel and its neighbour's of the next index, in linearOrder() and up
/// to a multiple of 32 pairs. `memory` holds kLaneBytes for each lane. Of groups that are alike by the period only the
/// first are made.
Gather buildPairs(uint8_t* memory, const Picks& picks, int channels);

/// 32 bytes of the result; base and mask move on to the next group.
template <int windows>
QORI_INLINE Bytes gatherGroup(const uint8_t* row, const int32_t*& base, const uint8_t*& mask) {
    Bytes result;
    for (int w = 0; w < windows; ++w) {
        const Bytes part = shuffleInBlocks(loadBlocks(row + base[2 * w], row + base[2 * w + 1]), load(mask + 32 * w));
        result = w == 0 ? part : result | part;
    }
    base += 2 * windows;
    mask += 32 * windows;
    return result;
}

/// Makes a row of pixels. `later` is the memory of a row that will be needed soon; it is asked for, not read.
void gatherRow(const Gather& gather, const uint8_t* row, const uint8_t* later, uint8_t* dst);

}  // namespace qori::kernels
