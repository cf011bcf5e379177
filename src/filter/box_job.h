// SPDX-License-Identifier: Apache-2.0
// Means of rectangular windows, whatever the border and wherever the memory comes from.
#pragma once
#include "frame/plan.h"
#include "frame/row_window.h"

namespace qori::filter {

/// A box laid over an image and where it goes.
template <class T, Layout layout>
struct BoxJob {
    BorderedImage src;
    Image<T> dst;
    QorImageSize mask;
    Reach reach;  ///< mask.width - 1 columns and mask.height - 1 rows.

    bool inPlace() const { return src.origin == asBytes(dst.data); }
    int64_t area() const { return int64_t{mask.width} * mask.height; }
};

template <class T, Layout layout>
BorderedImage imageOf(Image<const T> src, QorImageSize roi, BorderRule rule) {
    return {asBytes(src.data), src.step, roi, pixelSize<T, layout>, rule};
}

/// Where a run's memory comes from: a caller's buffer of so many bytes, or the allocator for the duration of the call.
struct BoxBuffer {
    uint8_t* memory;
    int64_t bytes;
};

/// The job, in that memory or, without it, the allocator's: QOR_ERR_NO_MEMORY and nothing done where there is none. In
/// files of its own for each type (box_bytes.cpp, box_words.cpp, box_floats.cpp), which both kinds of boxes share.
template <class T, Layout layout>
QorResult box(const BoxJob<T, layout>& job, const BoxBuffer* buffer);

}  // namespace qori::filter
