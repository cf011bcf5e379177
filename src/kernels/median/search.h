// SPDX-License-Identifier: Apache-2.0
// The median of any window without any memory, slowly: bit by bit from the top, by counting what lies below.
#pragma once
#include "image/image.h"
#include "order.h"

namespace qori::kernels {

/// A row of medians. src is the first element of the first window; neighbours are `apart` elements and `step` bytes
/// away. dst may not overlap the windows.
template <class T>
QORI_NOINLINE void medianBySearch(const T* src, ptrdiff_t step, ptrdiff_t apart, QorImageSize mask, T* dst,
                                  ptrdiff_t elements) {
    using Word = decltype(rankOf(T{}));
    constexpr ptrdiff_t block = 64;
    const int64_t below = int64_t{mask.width} * mask.height / 2;
    for (ptrdiff_t begin = 0; begin < elements; begin += block) {
        const ptrdiff_t n = std::min(block, elements - begin);
        Word found[block] = {};
        for (int bit = 8 * sizeof(T) - 1; bit >= 0; --bit) {
            int64_t count[block] = {};
            Word tried[block];
            for (ptrdiff_t i = 0; i < n; ++i) tried[i] = static_cast<Word>(found[i] | Word{1} << bit);
            for (int32_t y = 0; y < mask.height; ++y) {
                const T* row = advance(src, y * step) + begin;
                for (int32_t x = 0; x < mask.width; ++x, row += apart)
                    for (ptrdiff_t i = 0; i < n; ++i) count[i] += rankOf(get(row + i)) < tried[i];
            }
            for (ptrdiff_t i = 0; i < n; ++i)
                if (count[i] <= below) found[i] = tried[i];
        }
        for (ptrdiff_t i = 0; i < n; ++i) put(dst + begin + i, elementOf<T>(found[i]));
    }
}

}  // namespace qori::kernels
