// SPDX-License-Identifier: Apache-2.0
// The record of an adaptive threshold's weights. The block's first byte is the distance to the record, which begins at
// the next multiple of 8 behind it; the weights follow it.
#pragma once
#include "frame/plan.h"

namespace qori::filter {

struct AdaptiveSpec {
    static constexpr uint32_t kTag = 0x4B61738E;

    uint32_t tag;
    int32_t dataType, numChannels, maskSize;
    float sigma;
    uint32_t weightAddress;  ///< Where addresses have 64 bits, the distance from the record.

    const float* weights() const { return reinterpret_cast<const float*>(this + 1); }
    /// 8 bytes for the distance, the record, the weights.
    static constexpr int64_t bytes(int64_t maskSize) { return 4 * maskSize + 32; }
};
static_assert(sizeof(AdaptiveSpec) + 8 == AdaptiveSpec::bytes(0));

/// Under default control.
void fillAdaptiveSpec(QorAdaptiveGaussSpec* block, int32_t maskSize, float sigma);

/// Null where the block has not been filled.
const AdaptiveSpec* adaptiveSpecOf(const QorAdaptiveGaussSpec* block);

}  // namespace qori::filter
