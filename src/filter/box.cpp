// SPDX-License-Identifier: Apache-2.0
// Means of rectangular windows around an anchor; neighbours are read from memory.
#include "box_job.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "square_run.h"

namespace qori::filter {
namespace {

Reach reachOf(QorImageSize mask, QorPoint2D anchor) {
    return {anchor.x, anchor.y, mask.width - 1 - anchor.x, mask.height - 1 - anchor.y};
}

template <class... Images>
QorResult check(QorImageSize roi, QorImageSize mask, QorPoint2D anchor, Images... images) {
    return firstOf(nullCheck(images...), stepCheck(images...), sizeCheck(roi), maskSizeCheck(mask),
                   anchorCheck(anchor, mask));
}

/// Bytes in 3 x 3 around their middle have a kernel of their own.
template <Layout layout>
QorResult square(const BoxJob<uint8_t, layout>& job) {
    const WorkMemory memory(RowWindow::bytes(job.src, squareNeeds(job.inPlace())) + kBlockAlignment);
    if (QorResult r = memory.check()) return r;
    runSquare<kernels::Square::ones, layout>(job.src, job.dst, job.inPlace(), memory.template begin<uint8_t>());
    return QOR_OK;
}

template <class T, Layout layout>
QorResult filterAround(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask, QorPoint2D anchor) {
    const BoxJob<T, layout> job{imageOf<T, layout>(src, roi, BorderRule::readAll()), dst, mask, reachOf(mask, anchor)};
    if constexpr (sizeof(T) == 1)
        if (mask.width == 3 && mask.height == 3 && anchor.x == 1 && anchor.y == 1) return square(job);
    return underDefaultControl([&] { return box(job, nullptr); });
}

template <class T, Layout layout>
QorResult filterBox(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask, QorPoint2D anchor) {
    const QorResult checked = check(roi, mask, anchor, src, dst);
    return checked != QOR_OK ? checked : filterAround<T, layout>(src, dst, roi, mask, anchor);
}

template <class T, Layout layout>
QorResult filterBoxInPlace(Image<T> image, QorImageSize roi, QorImageSize mask, QorPoint2D anchor) {
    const QorResult checked = check(roi, mask, anchor, image);
    return checked != QOR_OK ? checked : filterAround<T, layout>({image.data, image.step}, image, roi, mask, anchor);
}

}  // namespace
}  // namespace qori::filter

#include "entries/box.inc"
