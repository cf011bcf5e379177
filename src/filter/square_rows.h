// SPDX-License-Identifier: Apache-2.0
// Rows of an image that 3 x 3 windows overwrite, a few at a time, all neighbours being read from memory: what is gone
// is the row above a group alone, which is kept aside. A RowWindow does the same for any window, at the cost of its
// calls: rows of 512 bytes took a tenth to a quarter longer.
#pragma once
#include <algorithm>

#include "image/image.h"
#include "kernels/copy_rows.h"

namespace qori::filter {

/// Bytes of memory for rows of so many bytes, the neighbours on both sides included.
constexpr int64_t rowsAboveBytes(int64_t seenBytes) { return 2 * seenBytes; }

/// Calls make(rowOf, y, rows) for groups of at most `atOnce` rows from the top; rowOf(row) is a source row of
/// y - 1 to y + rows, where the region begins. `left` bytes of `seenBytes` lie before it.
template <class T, class Make>
void forGroupsInPlace(Image<T> image, int32_t height, int32_t atOnce, int64_t seenBytes, ptrdiff_t left,
                      uint8_t* memory, Make make) {
    uint8_t *above = memory, *next = memory + static_cast<ptrdiff_t>(seenBytes);
    for (int32_t y = 0; y < height; y += atOnce, std::swap(above, next)) {
        const int32_t rows = std::min(atOnce, height - y);
        if (y + rows < height)
            kernels::copyRow(next, asBytes(image.row(y + rows - 1)) - left, static_cast<ptrdiff_t>(seenBytes));
        const auto rowOf = [=](int32_t row) -> const T* {
            return row < y && y > 0 ? reinterpret_cast<const T*>(above + left) : image.row(row);
        };
        make(rowOf, y, rows);
    }
}

}  // namespace qori::filter
