// SPDX-License-Identifier: Apache-2.0
// Means of centred rectangular windows with a border, in the caller's buffer.
#include "box_job.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "sizes.h"
#include "square_run.h"

namespace qori::filter {
namespace {

/// An even mask reaches further to the right and below, other than kernels of linear filters.
Reach reachOf(QorImageSize mask) {
    const int32_t left = (mask.width - 1) / 2, top = (mask.height - 1) / 2;
    return {left, top, mask.width - 1 - left, mask.height - 1 - top};
}

/// What the query reports for any element type. Its areas, the last but one alone as large as all pixels seen in four
/// bytes each, are more than the forms of a run need; the run that a small one does not hold gives way to another.
int64_t bufferBytes(QorImageSize roi, QorImageSize mask, int32_t n) {
    const Reach reach = reachOf(mask);
    const int64_t columns = int64_t{roi.width} + mask.width - 1, rows = int64_t{roi.height} + mask.height - 1;
    const int64_t above = 2 * int64_t{mask.height} - 2 - reach.top, beside = 2 * int64_t{mask.width} - 2 - reach.left;
    return 8 * n * (product(above, columns) + product(beside, rows)) + (columns + 2) * (n == 1 ? 4 : 16) +
           4 * n * product(columns, rows) + 4 * int64_t{reach.top} + 4;
}

QorResult filterBoxBorderGetBufferSize(QorImageSize roi, QorImageSize mask, int32_t dataType, int32_t numChannels,
                                       int32_t* size) {
    const QorResult checked = firstOf(nullCheck(size), sizeCheck(roi), maskSizeCheck(mask),
                                      dataTypeCheck(dataType, 1, 5, 7, 13), channelsCheck(numChannels));
    return checked != QOR_OK ? checked : reportSize(bufferBytes(roi, mask, numChannels), size);
}

/// Kinds that are not named matter only where a window leaves the region on a closed side.
QorResult kindCheck(Border border, Reach reach) {
    const Sides& open = border.open;
    const bool synthesises = (reach.left > 0 && !open.left) || (reach.top > 0 && !open.top) ||
                             (reach.right > 0 && !open.right) || (reach.bottom > 0 && !open.bottom);
    if (!synthesises || border.isOneOf(BorderKind::constant, BorderKind::replicate)) return QOR_OK;
    return QOR_ERR_BORDER;
}

/// A border value as a pixel in memory; zeros where there is none.
template <class T, Layout layout>
struct BorderPixel {
    T value[4] = {};

    explicit BorderPixel(const T* given) {
        for (int c = 0; given != nullptr && c < processedChannels(layout); ++c) value[c] = given[c];
    }
};

template <class T, Layout layout>
QorResult filterBoxBorder(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask, int32_t mode,
                          const T* borderValue, uint8_t* memory) {
    const Border border = Border::of(mode);
    const QorResult checked =
        firstOf(nullCheck(src, dst, memory), stepCheck(src, dst), sizeCheck(roi), maskSizeCheck(mask));
    if (checked != QOR_OK) return checked;
    if (mode == borderConstant && borderValue == nullptr) return QOR_ERR_NULL_PTR;
    const Reach reach = reachOf(mask);
    if (QorResult r = kindCheck(border, reach)) return r;
    const BorderPixel<T, layout> pixel(borderValue);
    BorderRule rule = BorderRule::of(border, pixel.value);
    rule.open.top |= reach.top == 0;  // a single row needs no row of constants
    rule.open.bottom |= reach.bottom == 0;
    const BoxJob<T, layout> job{imageOf<T, layout>(src, roi, rule), dst, mask, reach};
    const BoxBuffer buffer{memory, bufferBytes(roi, mask, channels(layout))};
    if constexpr (sizeof(T) == 1)
        if (mask.width == 3 && mask.height == 3) {
            runSquare<kernels::Square::ones, layout>(job.src, dst, job.inPlace(), memory);
            return QOR_OK;
        }
    return underDefaultControl([&] { return box(job, &buffer); });
}

}  // namespace
}  // namespace qori::filter

#include "entries/box_border.inc"
