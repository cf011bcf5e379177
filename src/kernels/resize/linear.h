// SPDX-License-Identifier: Apache-2.0
// Linear 8u in fixed point: rows of 16-bit elements between the two passes.
#pragma once
#include "gather.h"

namespace qori::kernels {

/// A row, and the memory of one that will be needed soon: it is asked for, not read.
struct LinearRow {
    const uint8_t *bytes, *later;
};

/// The horizontal pass. A group is 16 pairs of neighbours (p0, p1); `weights` holds -2w per pair, w in 0..16384, or
/// coarse ones. out = (p0 * (16384 - w) + p1 * w + 128) >> 8, at most 16320.
void linearRow8u(const Gather& gather, LinearRow row, const int16_t* weights, bool coarse, int16_t* out);

/// Lists the weights for it, in linearOrder() and up to a multiple of 32: pairs (16384 - w, w), one for each pixel,
/// become -2w for each element or, if all such are short, pairs of signed bytes that count 1/128. Tells whether they
/// are, and leaves alike only those groups that have the weights of the group two before them, too.
bool listLinearWeights(Gather& gather, const int32_t* pairs, int16_t* weights);

/// The vertical pass: dst = (h0 * (16384 - w) + h1 * w + 0x80000) >> 20. Rows are in the order of linearOrder() and
/// hold whole blocks of 32 elements.
void linearColumn8u(const int16_t* h0, const int16_t* h1, int32_t w, uint8_t* dst, ptrdiff_t elements);
/// Two destination rows between the same two rows.
void linearColumns8u(const int16_t* h0, const int16_t* h1, const int32_t w[2], uint8_t* dst, uint8_t* second,
                     ptrdiff_t elements);

/// Place of element i in a row of linearRow8u: within each 32 the second and third eight change places, so that packing
/// two vectors to bytes puts them in order.
constexpr ptrdiff_t linearOrder(ptrdiff_t i) { return (i & ~ptrdiff_t{24}) | (i & 8) << 1 | (i & 16) >> 1; }

}  // namespace qori::kernels
