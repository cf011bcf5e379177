// SPDX-License-Identifier: Apache-2.0
// Weighted sums along rows of three or four channels in single precision. Pixels of two rows fill a vector: four lanes
// for each, the last of three channels idle. A tap is one load then, and nothing is turned or gathered. The sums are
// those of resize_taps.h, bit for bit.
#pragma once
#include "taps.h"

namespace qori::kernels {

constexpr int kQuadRows = 4;  ///< Rows filtered at once.

/// Whether quads are the way: for few taps, which are added in ascending order everywhere, and where all source pixels
/// are needed. Over turned rows four channels gain 1.1 to 1.4, floats less than integers; two taps of floats, which
/// need no conversion, are not worth spreading in reductions. The idle lane of three channels pays for four taps of
/// integers only: 1.12 to 1.19 in enlargements.
constexpr bool suitsQuads(double ratio, int32_t taps, int channels, bool isFloat) {
    constexpr int32_t kMostTaps = 8;
    if (channels < 3 || taps > kMostTaps || ratio > taps) return false;
    return channels == 3 ? ratio <= 1 && taps == 4 && !isFloat : ratio <= 1 || taps > 2 || !isFloat;
}

struct QuadFilter : StripTaps {
    int32_t group = 1;         ///< Destination pixels whose columns are spread at once: quadGroup().
    float* columns = nullptr;  ///< Room for them: quadColumnFloats().
};

int32_t quadGroup(double ratio);
/// On a 32-byte boundary.
int64_t quadColumnFloats(double ratio, int32_t taps);

/// Filters four rows, each given by the address of source column 0, into rows of floats; a multiple of eight elements
/// of each is written, with zeros behind the pixels. Rows of floats may be the same if their sources are.
template <class T, int channels>
void filterQuads(const QuadFilter& filter, const T* const rows[kQuadRows], float* const out[kQuadRows]);

}  // namespace qori::kernels
