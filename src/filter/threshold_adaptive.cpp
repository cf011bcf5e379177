// SPDX-License-Identifier: Apache-2.0
// Thresholds against the mean of each pixel's neighbourhood, plain or with Gaussian weights.
#include "adaptive_spec.h"
#include "box_sums.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/box/compare.h"
#include "sizes.h"

namespace qori::filter {
namespace {

struct AdaptiveRule {
    float delta;
    uint8_t valGT, valLE;
    int32_t borderType;
    uint8_t borderValue;

    kernels::TwoValues values() const { return {valGT, valLE}; }
};

QorResult maskCheck(QorImageSize mask) {
    return mask.width != mask.height || mask.width < 1 || mask.width % 2 == 0 ? QOR_ERR_MASK_SIZE : QOR_OK;
}

QorResult kindCheck(int32_t borderType) {
    const Border border = Border::of(borderType);
    return border.isOneOf(BorderKind::constant, BorderKind::replicate, BorderKind::readAll) ? QOR_OK : QOR_ERR_BORDER;
}

QorResult queryCheck(QorImageSize roi, QorImageSize mask, int32_t dataType, int32_t numChannels) {
    return firstOf(sizeCheck(roi), maskCheck(mask), dataTypeCheck(dataType, 1),
                   numChannels == 1 ? QOR_OK : QOR_ERR_CHANNELS_UNSUPPORTED);
}

/// What both queries report; there is no slack for an alignment.
int64_t bufferBytes(QorImageSize roi, int64_t mask) {
    const auto align = [](int64_t bytes) { return roundUp(bytes, 32); };
    const int64_t w = roi.width, h = roi.height, reach = mask / 2;
    const int64_t base = align(product(align(w + mask - 1) + 4, mask) + product(align(4 * w), mask + 1));
    if (mask > w || mask > h) return align(product(w + mask - 1, mask + h - 1)) + base;
    const auto beside = [=](int64_t side) { return 64 * ((product(reach, side) + 31) / 32); };
    return align(product(std::max(w, h) + mask - 1, 3 * reach)) + beside(w) + beside(h) + base;
}

QorResult adaptiveBoxBufferSize(QorImageSize roi, QorImageSize mask, int32_t dataType, int32_t numChannels,
                                int32_t* size) {
    const QorResult checked = firstOf(nullCheck(size), queryCheck(roi, mask, dataType, numChannels));
    return checked != QOR_OK ? checked : reportSize(bufferBytes(roi, mask.width), size);
}

QorResult adaptiveGaussBufferSize(QorImageSize roi, QorImageSize mask, int32_t dataType, int32_t numChannels,
                                  int32_t* specSize, int32_t* size) {
    const QorResult checked = firstOf(nullCheck(specSize, size), queryCheck(roi, mask, dataType, numChannels));
    if (checked != QOR_OK) return checked;
    const int64_t specBytes = AdaptiveSpec::bytes(mask.width);
    if (specBytes > INT32_MAX) return QOR_ERR_SIZE;
    if (QorResult r = reportSize(bufferBytes(roi, mask.width), size)) return r;
    return reportSize(specBytes, specSize);
}

QorResult adaptiveGaussInit(QorImageSize roi, QorImageSize mask, int32_t dataType, int32_t numChannels, float sigma,
                            QorAdaptiveGaussSpec* spec) {
    const QorResult checked = firstOf(nullCheck(spec), queryCheck(roi, mask, dataType, numChannels));
    if (checked != QOR_OK) return checked;
    return underDefaultControl([&] {
        fillAdaptiveSpec(spec, mask.width, sigma);
        return QOR_OK;
    });
}

/// Where one value is the answer for all pixels: it is written and nothing is read. A delta that is no number makes
/// every comparison false.
bool fillsAll(const AdaptiveRule& rule, int32_t mask, Image<uint8_t> dst, QorImageSize roi) {
    const float delta = rule.delta;
    const bool allGreater = delta > 255 || (mask == 1 && delta > 0);
    if (!allGreater && !(delta <= -255) && mask != 1 && delta == delta) return false;
    for (int32_t y = 0; y < roi.height; ++y)
        kernels::fillBytes(dst.row(y), allGreater ? rule.valGT : rule.valLE, roi.width);
    return true;
}

struct AdaptiveJob {
    BorderedImage src;
    Image<uint8_t> dst;
    AdaptiveRule rule;
    int32_t mask, reach;
    Place place;
    WindowNeeds needs;

    AdaptiveJob(Image<const uint8_t> source, Image<uint8_t> to, QorImageSize roi, const AdaptiveRule& given,
                int32_t maskSize)
        : src{source.data, source.step, roi, 1, BorderRule::of(Border::of(given.borderType), &given.borderValue)},
          dst(to),
          rule(given),
          mask(maskSize),
          reach(maskSize / 2),
          place(source.data == to.data ? Place::inOrder : Place::apart),
          needs{.reach = {reach, reach, reach, reach}, .place = place} {}
};

/// The smallest integer that is not below delta * area. 24 bits times an area of up to 30, as a buffer's size has to
/// fit 32 bits, can be one bit more than a double has: where the product is a whole number by rounding, its rest tells.
int64_t excessOf(float delta, int64_t area) {
    const double product = static_cast<double>(delta) * static_cast<double>(area);
    const double rest = __builtin_fma(static_cast<double>(delta), static_cast<double>(area), -product);
    const auto whole = static_cast<int64_t>(product);
    const auto back = static_cast<double>(whole);
    return whole + (back < product || (back == product && rest > 0));
}

/// Masks whose sums need 64 bits.
void compareLong(const uint8_t* src, const uint32_t* sums, int32_t mask, int64_t excess, uint8_t* dst,
                 kernels::TwoValues values, ptrdiff_t elements) {
    const int64_t area = int64_t{mask} * mask;
    int64_t sum = 0;
    for (int32_t i = 0; i < mask; ++i) sum += sums[i];
    for (ptrdiff_t i = 0; i < elements; ++i) {
        if (i > 0) sum += int64_t{sums[i + mask - 1]} - sums[i - 1];
        dst[i] = sum < src[i] * area + excess ? values.greater : values.rest;
    }
}

/// Columns of type S; the buffer is what the query reports, at any alignment.
template <class S>
void compareBox(AdaptiveJob job, uint8_t* buffer) {
    job.needs.rowsLeft = ColumnSums<S, uint8_t, 1>::rowsLeft(job.needs.reach);
    BlockLayout pieces(1);
    pieces.add(RowWindow::bytes(job.src, job.needs));
    RowWindow window(job.src, job.needs, buffer);
    ColumnSums<S, uint8_t, 1> columns(window, job.needs.reach, pieces);
    auto* const sums = tableOf<uint32_t>(buffer, pieces.bytes());
    columns.bind(buffer);
    const int64_t area = int64_t{job.mask} * job.mask, excess = excessOf(job.rule.delta, area);
    constexpr int64_t kMostArea = 1 << 22;
    window.forEach([&](const WindowPart& part, int32_t y, int32_t) {
        const uint8_t* const src = part.row(y) + job.reach;
        const S* const made = columns.makeRow(part, y);
        uint8_t* const dst = job.dst.row(y) + part.x;
        if constexpr (sizeof(S) == 4)
            if (area > kMostArea) return compareLong(src, made, job.mask, excess, dst, job.rule.values(), part.width);
        kernels::acrossRunning<1, false>(made, job.mask, sums, part.width, kernels::PlainSum{});
        kernels::compareSums(src, sums, static_cast<int32_t>(area), static_cast<int32_t>(excess), dst,
                             job.rule.values(), part.width);
    });
}

QorResult adaptiveBox(Image<const uint8_t> src, Image<uint8_t> dst, QorImageSize roi, QorImageSize mask,
                      const AdaptiveRule& rule, uint8_t* buffer) {
    const QorResult checked =
        firstOf(nullCheck(src, dst, buffer), sizeCheck(roi), maskCheck(mask), kindCheck(rule.borderType));
    if (checked != QOR_OK) return checked;
    return underDefaultControl([&] {
        if (fillsAll(rule, mask.width, dst, roi)) return QOR_OK;
        const AdaptiveJob job(src, dst, roi, rule, mask.width);
        constexpr int32_t kSigned = INT16_MAX / 255;  // rows whose sums have a sign's bit to spare in 16
        if (mask.height <= kSigned)
            compareBox<uint16_t>(job, buffer);
        else
            compareBox<uint32_t>(job, buffer);
        return QOR_OK;
    });
}

/// Memory of the Gauss form: the row window's, a ring of weighed rows, and a row as floats.
class GaussMemory {
public:
    /// Makes `rows` rows at a time.
    GaussMemory(const AdaptiveJob& job, int32_t rows) : needs(job.needs), slots(job.mask + rows - 1) {
        needs.rowsAtOnce = rows;
        pieces_.add(RowWindow::bytes(job.src, needs));
        ring = pieces_.add(int64_t{slots} * job.src.size.width * elementBytes<float>);
        line = pieces_.add((int64_t{job.src.size.width} + job.mask - 1) * elementBytes<float>);
    }
    int64_t bytes() const { return pieces_.bytes(); }

    WindowNeeds needs;
    int32_t slots;  ///< Rows of the ring: as many as the windows of the rows made at a time have.
    int64_t ring = 0, line = 0;

private:
    BlockLayout pieces_{1};
};

/// Rows are weighed as they enter; then columns of the ring, two rows at a time where the buffer holds so many.
void compareGauss(const AdaptiveJob& job, const float* weights, uint8_t* buffer) {
    GaussMemory memory(job, 2);
    if (memory.bytes() > bufferBytes(job.src.size, job.mask)) memory = GaussMemory(job, 1);
    RowWindow window(job.src, memory.needs, buffer);
    const ptrdiff_t taps = job.mask, width = job.src.size.width, slots = memory.slots;
    auto* const ring = tableOf<float>(buffer, memory.ring);
    auto* const line = tableOf<float>(buffer, memory.line);
    window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
        const auto slotOf = [&](int32_t row) { return ring + (row + job.reach) % slots * width + part.x; };
        const int32_t last = y + rows - 1 + job.reach;
        for (int32_t row = y == 0 ? -job.reach : y + job.reach; row <= last; ++row) {
            kernels::floatsOfBytes(part.row(row), line, part.width + taps - 1);
            kernels::weighAlong(line, weights, taps, slotOf(row), part.width);
        }
        // Of a last row without another below it, what is made in its place gives way.
        const uint8_t* const src[] = {part.row(y) + job.reach, part.row(y + rows - 1) + job.reach};
        uint8_t* const dst[] = {job.dst.row(y) + part.x, job.dst.row(y + rows - 1) + part.x};
        const kernels::FloatRing rowsOfRing{ring + part.x, ring + part.x + slots * width, width};
        kernels::compareWeighed(src, rowsOfRing, slotOf(y - job.reach), weights, taps, job.rule.delta, dst,
                                job.rule.values(), part.width);
    });
}

QorResult adaptiveGauss(Image<const uint8_t> src, Image<uint8_t> dst, QorImageSize roi, const AdaptiveRule& rule,
                        const QorAdaptiveGaussSpec* block, uint8_t* buffer) {
    const QorResult checked = firstOf(nullCheck(src, dst, block, buffer), sizeCheck(roi), kindCheck(rule.borderType));
    if (checked != QOR_OK) return checked;
    const AdaptiveSpec* const spec = adaptiveSpecOf(block);
    if (spec == nullptr) return QOR_ERR_CONTEXT;
    return underDefaultControl([&] {
        if (fillsAll(rule, spec->maskSize, dst, roi)) return QOR_OK;
        compareGauss(AdaptiveJob(src, dst, roi, rule, spec->maskSize), spec->weights(), buffer);
        return QOR_OK;
    });
}

}  // namespace
}  // namespace qori::filter

#include "entries/threshold_adaptive.inc"
