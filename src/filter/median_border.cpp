// SPDX-License-Identifier: Apache-2.0
// Medians with a border, in place too.
#include "frame/checks.h"
#include "frame/row_window.h"
#include "kernels/copy_rows.h"
#include "median_run.h"
#include "sizes.h"

namespace qori::filter {
namespace {

bool isSmallerThan(QorImageSize mask, QorImageSize roi) { return mask.width < roi.width && mask.height < roi.height; }

int64_t a32(int64_t bytes) { return roundUp(bytes, 32); }

/// The part of the buffer that masks without a network have to themselves.
int64_t maskBytes(QorImageSize mask, int32_t dataType, int64_t e) {
    const int64_t area = int64_t{mask.width} * mask.height;
    const bool isLine = mask.width == 1 || mask.height == 1;
    if (mask.width < 6 && mask.height < 6 && (isLine || mask.width == mask.height)) return 0;
    if (dataType != qor32f) return a32(4 * e * area);
    if (isLine) return a32(4 * area);
    if (area >= 625) return a32(128 * ((area + 15) / 16) + 12'288);
    return a32(12 * roundUp(area, 16) + 64 * ((std::max(mask.width, mask.height) + 15) / 16));
}

int64_t bufferBytes(QorImageSize roi, QorImageSize mask, int32_t dataType, int64_t e) {
    const int64_t w = roi.width, h = roi.height, mw = mask.width, mh = mask.height;
    if (product(mw, mh) > INT32_MAX) return product(mw, mh);
    const int64_t own = maskBytes(mask, dataType, e);
    if (!isSmallerThan(mask, roi)) return own + a32(product(w + mw - 1, (h + mh - 1) * e));
    const auto columns = [e](int64_t n) { return (n * e + 31) / 32; };
    const int64_t beside = std::max(product(w + mw - 1, (mh / 2 + mh) * e), product(h + mh - 1, (mw / 2 + mw) * e));
    return own + 2 * product(mh, a32(w * e)) + 64 * (columns(w * (mh / 2)) + columns(h * (mw / 2))) + a32(beside);
}

QorResult medianBorderBufferSize(QorImageSize roi, QorImageSize mask, int32_t dataType, int32_t numChannels,
                                 int32_t* pBufferSize) {
    const QorResult channels = numChannels == 1 ? QOR_OK : QOR_ERR_CHANNELS_UNSUPPORTED;
    if (QorResult r = firstOf(nullCheck(pBufferSize), sizeCheck(roi), oddMaskCheck(mask),
                              dataTypeCheck(dataType, qor8u, qor16u, qor16s, qor32f), channels))
        return r;
    const int32_t e = dataType == qor8u ? 1 : dataType == qor32f ? 4 : 2;
    return reportSize(bufferBytes(roi, mask, dataType, e), pBufferSize);
}

/// What networks want of a window: in place, eight rows of 5 x 5 at a time, with the four above them.
WindowNeeds networkNeeds(QorImageSize mask, bool inPlace) {
    constexpr int32_t kRowsOf5x5 = 8;
    return {.reach = Reach::ofKernel(mask),
            .rowsAtOnce = networkRows(mask, kRowsOf5x5),
            .place = inPlace ? Place::anyOrder : Place::apart};
}

/// Networks, on rows straight from the image wherever it still has them.
template <class T>
void runWindow(const BorderedImage& src, Image<T> dst, QorImageSize mask, const WindowNeeds& needs, uint8_t* buffer) {
    RowWindow window(src, needs, buffer);
    window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
        T* to[kMostNetworkRows];
        for (int32_t k = 0; k < rows; ++k) to[k] = dst.row(y + k) + part.x;
        medianByNetwork<false>(
            mask, [&](int32_t k) { return part.row<T>(y + k - needs.reach.top); }, to, rows, part.width, 1);
    });
}

template <class T>
void runSearch(const MedianJob<T>& job) {
    for (int32_t y = 0; y < job.size.height; ++y)
        kernels::medianBySearch(job.windows.row(y), job.windows.step, 1, job.mask, job.dst.row(y), job.size.width);
}

/// Rows together with all that their windows see, as many as the buffer holds; in place, none is overwritten before
/// it is in the buffer.
template <class T>
void runBands(const BorderedImage& src, Image<T> dst, QorImageSize mask, uint8_t* buffer, int64_t bytes) {
    const Reach reach = Reach::ofKernel(mask);
    const int32_t width = src.size.width + reach.columns();
    const int32_t step = width * elementBytes<T>;
    const int64_t room = bytes / step - reach.rows();
    const int32_t most = static_cast<int32_t>(std::min(int64_t{src.size.height}, room));
    const auto gather = [&](int32_t y, int32_t rows, int32_t to) {
        src.gather({-reach.left, y, width, rows}, buffer + ptrdiff_t{to} * step, step);
    };
    gather(-reach.top, reach.rows(), 0);
    for (int32_t y = 0, rows; y < src.size.height; y += rows) {
        rows = std::min(most, src.size.height - y);
        gather(y + reach.bottom, rows, reach.rows());
        const MedianJob<T> job{
            {reinterpret_cast<const T*>(buffer), step}, {dst.row(y), dst.step}, {src.size.width, rows}, mask, 1, 1};
        if (hasNetwork(mask)) {
            for (int32_t k = 0; k < rows; ++k) {
                T* const to = job.dst.row(k);
                medianByNetwork<false>(
                    mask, [&](int32_t j) { return job.windows.row(k + j); }, &to, 1, src.size.width, 1);
            }
        } else if (medianOfAny(job) != QOR_OK) {
            runSearch(job);
        }
        for (int32_t k = 0; k < reach.rows(); ++k)
            kernels::copyRow(buffer + ptrdiff_t{k} * step, buffer + ptrdiff_t{k + rows} * step, step);
    }
}

template <class T>
QorResult medianBorder(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask, int32_t mode, T value,
                       uint8_t* pBuffer) {
    const Border border = Border::of(mode);
    const bool taken = border.isOneOf(BorderKind::constant, BorderKind::replicate, BorderKind::readAll);
    if (QorResult r = firstOf(nullCheck(src, dst, pBuffer), sizeCheck(roi), alignedStepCheck(src, dst),
                              oddMaskCheck(mask), taken ? QOR_OK : QOR_ERR_BAD_ARG))
        return r;
    const bool inPlace = src.data == dst.data;
    if (mask.width == 1 && mask.height == 1) {
        if (inPlace) return QOR_OK;
        for (int32_t y = 0; y < roi.height; ++y)
            kernels::copyRow(asBytes(dst.row(y)), asBytes(src.row(y)), ptrdiff_t{roi.width} * elementBytes<T>);
        return QOR_OK;
    }
    const BorderedImage image{asBytes(src.data), src.step, roi, elementBytes<T>, BorderRule::of(border, &value)};
    constexpr int32_t kCode = sizeof(T) == 1 ? qor8u : std::is_floating_point_v<T> ? qor32f : qor16u;
    // A region of few columns or rows leaves the buffer too small for the window, but never for a band.
    const int64_t bytes = bufferBytes(roi, mask, kCode, elementBytes<T>);
    const WindowNeeds needs = networkNeeds(mask, inPlace);
    if (hasNetwork(mask) && RowWindow::bytes(image, needs) <= bytes)
        runWindow(image, dst, mask, needs, pBuffer);
    else
        runBands(image, dst, mask, pBuffer, bytes);
    return QOR_OK;
}

}  // namespace
}  // namespace qori::filter

#include "entries/median_border.inc"
