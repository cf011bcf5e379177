// SPDX-License-Identifier: Apache-2.0
// The record of an oriented-gradient descriptor, and the table of weights behind it.
#pragma once
#include "frame/plan.h"

namespace qori::features {

struct HogPlan {
    static constexpr uint32_t kTag = 0x4B61738F;
    static constexpr int32_t kMostBins = 16, kMostCell = 16;

    uint32_t tag;
    int32_t blockOrder;  ///< 0: blocks of a window row by row, else column by column.
    int32_t cellSize, blockSize, blockStride;
    int32_t nbins;
    int32_t blockLength;  ///< Floats of a block: four cells of nbins.
    int32_t winWidth, winHeight;
    float threshold;           ///< Largest value of a block between its two normalisations.
    int64_t descriptorLength;  ///< Floats of a window, or more than 32 bits measure where there are as many.
    int32_t blocksAcross, blocksDown;
    int32_t reserved[4];

    /// For each pixel of a cell its weights in each of the four places that the cell can have in a block (top-left,
    /// top-right, bottom-left, bottom-right), and for each of these the four cells that it votes for: 16 floats.
    const float* weights() const { return reinterpret_cast<const float*>(this + 1); }
    static constexpr int64_t bytes(int64_t blockSize) { return 16 * blockSize * blockSize + 72; }
};
static_assert(sizeof(HogPlan) == HogPlan::bytes(0));

/// Under default control, as it compares floats.
QorResult configCheck(const QorHogConfig* config);

/// Under default control.
void fillHogPlan(HogPlan* plan, const QorHogConfig& config);

}  // namespace qori::features
