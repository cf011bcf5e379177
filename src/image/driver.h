// SPDX-License-Identifier: Apache-2.0
// Walks a region row by row; a region without padding is one long row.
#pragma once
#include "image.h"

namespace qori {

/// An image together with the bytes that one of its pixels takes.
template <class Rows>
struct Walk {
    Rows image;
    int32_t pixelBytes;
};

template <class T>
Walk<Image<T>> walk(Image<T> image, int channels) {
    return {image, static_cast<int32_t>(sizeof(T)) * channels};
}

template <class T, int n>
Walk<Planes<T, n>> walk(Planes<T, n> planes) {
    return {planes, static_cast<int32_t>(sizeof(T))};
}

/// Whether the region is one contiguous run of pixels in every image, with a pixel count that 32 bits hold.
template <class... Rows>
bool isOneRun(QorImageSize roi, Walk<Rows>... walks) {
    return int64_t{roi.width} * roi.height <= INT32_MAX &&
           ((int64_t{roi.width} * walks.pixelBytes == walks.image.step) && ...);
}

/// Calls row(pixels, rows...) for each row from the top, or once where the region is one run.
template <class Row, class... Rows>
void forEachRow(QorImageSize roi, Row row, Walk<Rows>... walks) {
    if (isOneRun(roi, walks...)) roi = {roi.width * roi.height, 1};
    for (int32_t y = 0; y < roi.height; ++y) row(ptrdiff_t{roi.width}, walks.image.row(y)...);
}

}  // namespace qori
