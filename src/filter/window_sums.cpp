// SPDX-License-Identifier: Apache-2.0
// Sums of windows along rows or down columns, as floats.
#include <algorithm>

#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/plan.h"
#include "kernels/box/across.h"

namespace qori::filter {
namespace {

using kernels::FloatSum;

QorResult windowCheck(int32_t maskSize, int32_t anchor) {
    if (maskSize < 1) return QOR_ERR_MASK_SIZE;
    return anchor < 0 || anchor >= maskSize ? QOR_ERR_ANCHOR : QOR_OK;
}

/// Whether 32 bits hold the sums of the unsigned elements that kernels add up.
template <class S>
bool fits(int32_t maskSize) {
    constexpr uint32_t kLargest = sizeof(S) == 1 ? UINT8_MAX : UINT16_MAX;
    return static_cast<uint32_t>(maskSize) <= UINT32_MAX / kLargest;
}

/// int16_t is summed with 2^15 on top of each element.
template <class S>
FloatSum ruleOf(int32_t maskSize) {
    return {std::is_signed_v<S> ? int64_t{maskSize} << 15 : 0};
}

/// Windows of more than 65,537 words, or more bytes still.
template <class S>
void sumLongRow(const S* first, int32_t maskSize, ptrdiff_t channels, float* dst, ptrdiff_t elements) {
    for (ptrdiff_t c = 0; c < channels; ++c) {
        int64_t sum = 0;
        for (int32_t i = 0; i < maskSize; ++i) sum += first[i * channels + c];
        for (ptrdiff_t i = c;; i += channels) {
            dst[i] = static_cast<float>(sum);
            if (i + channels >= elements) break;
            sum += first[i + maskSize * channels] - first[i];
        }
    }
}

template <class S, Layout layout>
QorResult sumWindowRow(Image<const S> src, Image<float> dst, QorImageSize roi, int32_t maskSize, int32_t anchor) {
    const QorResult checked = firstOf(nullCheck(src, dst), std::is_same_v<S, uint16_t> ? sizeCheck(roi) : QOR_OK,
                                      windowCheck(maskSize, anchor));
    if (checked != QOR_OK || sizeCheck(roi) != QOR_OK) return checked;
    return underDefaultControl([&] {
        constexpr int n = channels(layout);
        const ptrdiff_t elements = ptrdiff_t{roi.width} * n;
        for (int32_t y = 0; y < roi.height; ++y) {
            const S* const first = src.row(y) - ptrdiff_t{anchor} * n;
            if (fits<S>(maskSize))
                kernels::alongRow<n>(first, maskSize, dst.row(y), elements, ruleOf<S>(maskSize));
            else
                sumLongRow(first, maskSize, n, dst.row(y), elements);
        }
        return QOR_OK;
    });
}

/// Column sums of type Sum, kept from row to row in `sums`.
template <class Sum, class S>
void sumColumns(Image<const S> src, Image<float> dst, ptrdiff_t elements, int32_t height, int32_t maskSize,
                int32_t anchor, Sum* sums) {
    const S* const first = src.row(-anchor);
    kernels::sumTerms<1>(&first, sums, elements);
    for (int32_t k = 1; k < maskSize; ++k) kernels::addRow(sums, src.row(k - anchor), elements);
    for (int32_t y = 0; y < height; ++y) {
        if (y > 0) kernels::slideRow(sums, src.row(y - anchor + maskSize - 1), src.row(y - anchor - 1), elements);
        kernels::acrossTerms<1, false>(sums, 0, 1, dst.row(y), elements, ruleOf<S>(maskSize));
    }
}

template <class Sum, class S>
QorResult sumInMemory(Image<const S> src, Image<float> dst, ptrdiff_t elements, int32_t height, int32_t maskSize,
                      int32_t anchor) {
    const WorkMemory memory(int64_t{elements} * static_cast<int64_t>(sizeof(Sum)) + kBlockAlignment);
    if (QorResult r = memory.check()) return r;
    sumColumns(src, dst, elements, height, maskSize, anchor, memory.template begin<Sum>());
    return QOR_OK;
}

/// Short windows of bytes over destinations on 16 bytes need no memory.
QorResult sumOnStack(Image<const uint8_t> src, Image<float> dst, ptrdiff_t elements, int32_t height, int32_t maskSize,
                     int32_t anchor) {
    constexpr ptrdiff_t kStrip = 2048;
    alignas(kVectorBytes) uint32_t sums[kStrip];
    for (ptrdiff_t x = 0; x < elements; x += kStrip)
        sumColumns(Image<const uint8_t>{src.data + x, src.step}, Image<float>{dst.data + x, dst.step},
                   std::min(kStrip, elements - x), height, maskSize, anchor, +sums);
    return QOR_OK;
}

template <class S, Layout layout>
QorResult sumWindowColumn(Image<const S> src, Image<float> dst, QorImageSize roi, int32_t maskSize, int32_t anchor) {
    const QorResult checked = firstOf(nullCheck(src, dst), windowCheck(maskSize, anchor));
    if (checked != QOR_OK || sizeCheck(roi) != QOR_OK) return checked;
    const ptrdiff_t elements = ptrdiff_t{roi.width} * channels(layout);
    return underDefaultControl([&] {
        if constexpr (sizeof(S) == 1) {
            constexpr int32_t kShort = 257;  // as many bytes as 16 bits hold the sum of
            const uintptr_t ends = reinterpret_cast<uintptr_t>(dst.data) | static_cast<uintptr_t>(dst.step);
            if (maskSize <= kShort && ends % 16 == 0)
                return sumOnStack(src, dst, elements, roi.height, maskSize, anchor);
        }
        if (fits<S>(maskSize)) return sumInMemory<uint32_t>(src, dst, elements, roi.height, maskSize, anchor);
        return sumInMemory<double>(src, dst, elements, roi.height, maskSize, anchor);
    });
}

}  // namespace
}  // namespace qori::filter

#include "entries/window_sums.inc"
