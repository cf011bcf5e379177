// SPDX-License-Identifier: Apache-2.0
// Erosion and dilation by any window, for the families of masks and of rectangles.
#pragma once
#include "window_cover.h"

namespace qori::filter {

/// Where work memory comes from.
enum class WorkFrom {
    stackIfItFits,  ///< The allocator otherwise; where it has none, narrower tiles on the stack.
    allocator
};

/// The smallest or largest elements of the windows; the same image with the same step is done in place. Arguments are
/// as they must be; returns QOR_OK or QOR_ERR_NO_MEMORY, with nothing written then.
template <class S, bool largest>
QorResult extremeOf(Image<const S> src, Image<S> dst, QorImageSize roi, Layout layout, const Window& window,
                    WorkFrom memory);

}  // namespace qori::filter
