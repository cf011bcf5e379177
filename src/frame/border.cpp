// SPDX-License-Identifier: Apache-2.0
#include "border.h"

#include <algorithm>

#include "kernels/copy_rows.h"
#include "plan.h"

namespace qori {
namespace {

/// n copies of a pixel of so many bytes.
template <int bytes>
void repeatPixel(uint8_t* to, const uint8_t* pixel, ptrdiff_t n) {
    uint8_t value[bytes];  // `to` may lie in front of it
    __builtin_memcpy(value, pixel, bytes);
    for (; n > 0; --n, to += bytes) __builtin_memcpy(to, value, bytes);
}

/// n copies of a pixel of up to 32 bytes.
void repeat(uint8_t* to, const uint8_t* pixel, int32_t pixelBytes, ptrdiff_t n) {
    switch (pixelBytes) {
        case 1: return repeatPixel<1>(to, pixel, n);
        case 2: return repeatPixel<2>(to, pixel, n);
        case 3: return repeatPixel<3>(to, pixel, n);
        case 4: return repeatPixel<4>(to, pixel, n);
        case 6: return repeatPixel<6>(to, pixel, n);
        case 8: return repeatPixel<8>(to, pixel, n);
        case 12: return repeatPixel<12>(to, pixel, n);
        case 16: return repeatPixel<16>(to, pixel, n);
        default: break;
    }
    const Bytes value = loadUpTo(pixel, pixelBytes);
    for (ptrdiff_t i = 0; i < n; ++i) storeUpTo(to + i * pixelBytes, value, pixelBytes);
}

/// Saturates far above every size that a query reports.
int64_t product(int64_t a, int64_t b) {
    constexpr int64_t kTooMuch = int64_t{1} << 40;
    return a != 0 && b > kTooMuch / a ? kTooMuch : a * b;
}

}  // namespace

int32_t BorderedImage::seen(int32_t at, int32_t count, bool openBefore, bool openBehind) const {
    const int32_t last = count - 1;
    if (!rule.mirrors) return std::clamp(at, openBefore ? INT32_MIN : 0, openBehind ? INT32_MAX : last);
    if (count == 1 && !openBefore && !openBehind) return 0;  // either side mirrors the other
    while ((at < 0 && !openBefore) || (at > last && !openBehind)) at = at < 0 ? -at : 2 * last - at;
    return at;
}

void BorderedImage::gather(QorImageRect rect, uint8_t* to, ptrdiff_t toStep) const {
    const int32_t missingLeft = rule.open.left ? 0 : std::clamp(-rect.x, 0, rect.width);
    const int32_t missingRight = rule.open.right ? 0 : std::clamp(rect.x + rect.width - size.width, 0, rect.width);
    const int32_t present = std::max(rect.width - missingLeft - missingRight, 0);
    const ptrdiff_t leftBytes = ptrdiff_t{missingLeft} * pixelBytes, presentBytes = ptrdiff_t{present} * pixelBytes;
    const int32_t firstPresent = std::clamp(rect.x + missingLeft, rule.open.left ? INT32_MIN : 0, INT32_MAX);
    for (int32_t y = rect.y; y < rect.y + rect.height; ++y, to += toStep) {
        if (rule.constant != nullptr && isMissingRow(y)) {
            repeat(to, rule.constant, pixelBytes, rect.width);
            continue;
        }
        const int32_t row = seenRow(y);
        if (present > 0) kernels::copyRow(to + leftBytes, pixel(firstPresent, row), presentBytes);
        if (rule.mirrors) {
            const auto mirror = [&](int32_t begin, int32_t end) {
                for (int32_t i = begin; i < end; ++i)
                    repeat(to + ptrdiff_t{i} * pixelBytes, pixel(seenColumn(rect.x + i), row), pixelBytes, 1);
            };
            mirror(0, missingLeft);
            mirror(missingLeft + present, rect.width);
            continue;
        }
        const uint8_t *first = pixel(0, row), *last = pixel(size.width - 1, row);
        repeat(to, rule.constant != nullptr ? rule.constant : first, pixelBytes, missingLeft);
        repeat(to + leftBytes + presentBytes, rule.constant != nullptr ? rule.constant : last, pixelBytes,
               missingRight);
    }
}

int64_t borderBytes(QorImageSize region, Reach reach, int32_t pixelBytes) {
    const int64_t bandRow = roundUp((int64_t{region.width} + reach.columns()) * pixelBytes, kBlockAlignment);
    const int64_t stripRow = roundUp((3 * int64_t{reach.columns()} + 1) * pixelBytes, kBlockAlignment);
    return std::max(product(2 * int64_t{reach.rows()}, bandRow), product(region.height, stripRow));
}

BorderParts::BorderParts(const BorderedImage& image, Reach reach, PartHints hints, uint8_t* buffer)
    : image_(image),
      reach_(reach),
      hints_(hints),
      buffer_(buffer),
      capacity_(borderBytes(image.size, reach, image.pixelBytes)) {
    addRows();
}

/// Bands first, then what lies between them. Where the bands meet they are one, of fewer rows than the window is high,
/// so that its surroundings still fit the buffer.
void BorderParts::addRows() {
    const auto [width, height] = image_.size;
    const int32_t top = image_.rule.open.top ? 0 : reach_.top, bottom = image_.rule.open.bottom ? 0 : reach_.bottom;
    if (height <= top + bottom) return add({{0, 0, width, height}, false, 0});
    if (top > 0) add({{0, 0, width, top}, false, 0});
    if (bottom > 0) add({{0, height - bottom, width, bottom}, false, 0});
    addColumns(top, height - top - bottom);
}

/// Strips as wide as the kernel likes where the buffer allows, else just wide enough: those always fit.
void BorderParts::addColumns(int32_t y, int32_t height) {
    const int32_t width = image_.size.width, block = hints_.blockPixels;
    const int32_t left = image_.rule.open.left ? 0 : reach_.left, right = image_.rule.open.right ? 0 : reach_.right;
    int32_t leftStrip = left > 0 ? std::max(left, block) : 0, rightStrip = 0;
    ptrdiff_t slack = hints_.slackBytes;
    if (right > 0) {
        rightStrip = right + static_cast<int32_t>((slack + image_.pixelBytes - 1) / image_.pixelBytes);
        if (width > leftStrip + rightStrip) rightStrip += (width - leftStrip - rightStrip) % block;
    }
    const bool closed = left > 0 || right > 0;
    if (closed && width <= leftStrip + rightStrip) leftStrip = width, rightStrip = 0;
    if (!fits(std::max(leftStrip, rightStrip), slack)) {
        slack = 0;
        leftStrip = closed && width <= left + right ? width : left;
        rightStrip = closed && width <= left + right ? 0 : right;
    }
    if (leftStrip > 0) add({{0, y, leftStrip, height}, false, slack});
    if (rightStrip > 0) add({{width - rightStrip, y, rightStrip, height}, false, slack});
    const int32_t inside = width - leftStrip - rightStrip;
    const ptrdiff_t beyond = rightStrip > 0 ? ptrdiff_t{rightStrip - right} * image_.pixelBytes : 0;
    if (inside > 0) add({{leftStrip, y, inside, height}, true, beyond});
}

ptrdiff_t BorderParts::rowBytes(int32_t width, ptrdiff_t slackBytes) const {
    const int64_t pixels = int64_t{width} + reach_.columns();
    return static_cast<ptrdiff_t>(roundUp(pixels * image_.pixelBytes + slackBytes, kBlockAlignment));
}

bool BorderParts::fits(int32_t width, ptrdiff_t slackBytes) const {
    return int64_t{rowBytes(width, slackBytes)} * (int64_t{reach_.rows()} + 1) <= capacity_;
}

/// The part of a job from its row y on: no more rows than the cache likes, and than the buffer takes together with
/// those around them.
BorderPart BorderParts::make(const Job& job, int32_t y) {
    QorImageRect area{job.area.x, job.area.y + y, job.area.width, job.area.height - y};
    const int32_t x = area.x - reach_.left, above = area.y - reach_.top;
    if (job.fromSource) return {area, image_.pixel(x, above), image_.step, job.slackBytes};
    const ptrdiff_t step = rowBytes(area.width, job.slackBytes);
    const int64_t room = capacity_ / step - reach_.rows();
    const int64_t cached = std::max(int64_t{64}, 4 * int64_t{reach_.rows()});
    area.height = static_cast<int32_t>(std::min({int64_t{area.height}, room, cached}));
    const int32_t seen = area.width + reach_.columns();
    image_.gather({x, above, seen, area.height + reach_.rows()}, buffer_, step);
    return {area, buffer_, step, step - ptrdiff_t{seen} * image_.pixelBytes};
}

}  // namespace qori
