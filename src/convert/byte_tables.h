// SPDX-License-Identifier: Apache-2.0
// Applies tables of 256 bytes to images of bytes.
#pragma once
#include "kernels/lut/byte_lookup.h"
#include "kernels/lut/plane_blocks.h"

namespace qori::convert {

/// One table per processed channel. Tables that are all the same need not tell channels apart.
template <Layout layout>
void applyByteTables(QorImageSize roi, Image<const uint8_t> src, Image<uint8_t> dst, const uint8_t (*tables)[256]) {
    constexpr int n = channels(layout), processed = processedChannels(layout);
    bool same = true;
    for (int c = 1; c < processed; ++c) same &= __builtin_memcmp(tables[0], tables[c], 256) == 0;
    if (same) {
        kernels::mapImage<layout == Layout::AC4>(roi, n, kernels::ByteLookup<16>(tables[0]), false, dst, src);
        return;
    }
    if constexpr (processed > 1) {
        kernels::ByteLookup<16> lookups[processed];
        for (int c = 0; c < processed; ++c) lookups[c] = kernels::ByteLookup<16>(tables[c]);
        kernels::mapByPlanes<n, n, uint8_t>(
            roi, processed, src, dst, layout == Layout::AC4 ? kernels::kKeptAlpha : kernels::kSameOrder, uint8_t{0},
            [&](int c, uint8_t* plane, int pixels) { kernels::lookUpBlock(plane, pixels, lookups[c]); });
    }
}

}  // namespace qori::convert
