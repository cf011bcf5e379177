// SPDX-License-Identifier: Apache-2.0
// Rows of pixels moved as they are, by the way that suits the size of the call.
#pragma once
#include "frame/streaming.h"
#include "kernels/copy/select_rows.h"
#include "kernels/copy/stream_rows.h"

namespace qori::convert {

enum class RowWay { vectors, strings, streams };

inline RowWay rowWay(QorImageSize size, int pixelBytes, bool streaming) {
    return streaming ? RowWay::streams : usesStrings(size, pixelBytes) ? RowWay::strings : RowWay::vectors;
}

/// Pixels of so many bytes, or all but their last quarter. Images do not overlap; a source step of 0 repeats a row.
template <int pixelBytes, bool keepAlpha>
void moveRows(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, QorImageSize size, RowWay way) {
    if constexpr (keepAlpha) {
        for (int32_t y = 0; y < size.height; ++y)
            kernels::selectRow<pixelBytes, pixelBytes / 4 * 3>(dst + y * dstStep, src + y * srcStep, size.width);
    } else {
        const ptrdiff_t bytes = ptrdiff_t{size.width} * pixelBytes;
        if (way == RowWay::streams) return kernels::copyRowsStreaming(dst, dstStep, src, srcStep, bytes, size.height);
        const auto copy = way == RowWay::strings ? kernels::copyRowString : kernels::copyRow;
        for (int32_t y = 0; y < size.height; ++y) copy(dst + y * dstStep, src + y * srcStep, bytes);
    }
}

}  // namespace qori::convert
