// SPDX-License-Identifier: Apache-2.0
// Gathering bytes of a row by table. A lane is 16 bytes of the result; each comes from anywhere in the row, but
// neighbours come from near each other, so a lane is one to four loads of 16 bytes (windows), each shuffled, joined by
// or. A lane whose bytes lie further apart makes the whole row fall back to moving elements one by one.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

struct Gather {
    static constexpr int kLane = 16, kMostWindows = 4;
    /// Bytes of tables per lane, offsets included.
    static constexpr int kLaneBytes = kLane * 4 + kMostWindows * (kLane + 4);

    int32_t windows = 0;               ///< Per lane; 0 to move elements one by one.
    ptrdiff_t groups = 0;              ///< Pairs of lanes.
    const int32_t* offsets = nullptr;  ///< Byte of the row for each byte of the result.
    const int32_t* bases = nullptr;    ///< Per group and window: starts of both lanes' loads.
    const uint8_t* masks = nullptr;  ///< Per group and window: 32 shuffle indices, negative for another window's bytes.
    /// Groups from the third to before this one have the masks of the groups two before them, and bases `stride` bytes
    /// behind theirs: at simple ratios all but those at the ends. Known for one window only.
    ptrdiff_t alikeEnd = 0;
    ptrdiff_t stride = 0;
};

/// Builds the tables for `groups` pairs of lanes whose 32 offsets each are already stored at the start of `memory`, for
/// rows of at least 16 bytes. `memory` is 32-byte aligned and holds 2 * groups * kLaneBytes.
Gather buildGather(uint8_t* memory, ptrdiff_t groups, int32_t rowBytes);

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

/// dst[i] = row[offset of i] for `bytes` bytes, moved in elements of `elementBytes`. `later` is the memory of a row
/// that will be needed soon; it is asked for, not read.
void gatherRow(const Gather& gather, const uint8_t* row, const uint8_t* later, uint8_t* dst, ptrdiff_t bytes,
               int elementBytes);

/// Leaves alike only those groups that have the 16 weights of the group two before them, too.
void compareWeights(Gather& gather, const int16_t* weights);

}  // namespace qori::kernels
