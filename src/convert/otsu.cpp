// SPDX-License-Identifier: Apache-2.0
// Otsu's threshold of an 8-bit image.
#include "frame/checks.h"
#include "frame/float_control.h"
#include "image/driver.h"
#include "kernels/stats/histogram.h"

namespace qori::convert {
namespace {

constexpr int kLevels = 256;

/// Counts of every level. Counters hold 32 bits, so they are emptied into the doubles before they could overflow.
void countLevels(Image<const uint8_t> src, QorImageSize roi, double* counts) {
    for (int i = 0; i < kLevels; ++i) counts[i] = 0;
    const int32_t band = INT32_MAX / roi.width;  // at least one row, and at most 2^31 pixels
    for (int32_t y = 0; y < roi.height;) {
        const int32_t rows = std::min(band, roi.height - y);
        kernels::ByteCounters<1> counters;
        forEachRow(
            QorImageSize{roi.width, rows},
            [&](ptrdiff_t pixels, const uint8_t* row) { kernels::countBytesRow<1, 1>(counters, row, pixels); },
            walk(Image<const uint8_t>{src.row(y), src.step}, 1));
        uint32_t counted[kLevels];
        counters.ofChannel(0, counted);
        for (int i = 0; i < kLevels; ++i) counts[i] += counted[i];
        y += rows;
    }
}

/// The level with the largest variance between the elements up to it and those above. The order of the operations
/// decides between levels whose variances differ in their last bits.
int bestLevel(const double* counts) {
    constexpr double kLeastShare = 0x1p-23, kMostShare = 1 - kLeastShare;
    double total = 0, moment = 0;
    for (int i = 0; i < kLevels; ++i) {
        total += counts[i];
        moment += (i + 0.5) * counts[i];
    }
    const double perElement = 1 / total, mean = perElement * moment;
    double share = 0, firstMoment = 0, most = 0;
    int best = 0;
    for (int i = 0; i < kLevels; ++i) {
        if (counts[i] == 0) continue;  // nothing moves to the other side: the variance stays
        const double probability = counts[i] * perElement;
        share += probability;
        firstMoment += (i + 0.5) * probability;
        const double rest = 1 - share;
        if (std::min(share, rest) < kLeastShare || std::max(share, rest) > kMostShare) continue;
        const double below = firstMoment / share, above = (mean - share * below) / rest;
        const double variance = share * rest * ((below - above) * (below - above));
        if (variance > most) {
            most = variance;
            best = i;
        }
    }
    return best;
}

QorResult otsuThreshold(Image<const uint8_t> src, QorImageSize roi, uint8_t* pThreshold) {
    if (QorResult r = firstOf(nullCheck(src, pThreshold), sizeCheck(roi))) return r;
    if (QorResult r = rowCheck(src.step, roi.width)) return r;
    return underDefaultControl([&] {
        double counts[kLevels];
        countLevels(src, roi, counts);
        *pThreshold = static_cast<uint8_t>(bestLevel(counts));
        return QorResult{QOR_OK};
    });
}

}  // namespace
}  // namespace qori::convert

#include "entries/otsu.inc"
