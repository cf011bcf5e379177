// SPDX-License-Identifier: Apache-2.0
#include <cmath>

#include "panels.h"

namespace demo {
namespace {

constexpr int kBlock = 8, kStrips = static_cast<int>(recipes::requantised::coarseness.size());

/// Every coefficient to the nearest multiple of a step that grows with its frequency, as a codec would store it.
void quantise(int16_t (&coefficients)[64], int coarseness) {
    for (int i = 0; i < 64; ++i) {
        const int step = recipes::requantised::least + coarseness * (1 + i % kBlock + i / kBlock);
        coefficients[i] = static_cast<int16_t>(std::lround(static_cast<double>(coefficients[i]) / step) * step);
    }
}

void throughCoefficients(const Picture& plane, int x, int y, int coarseness) {
    int16_t coefficients[64];
    require(qoriDCT8x8FwdLS_8u16s_C1R(plane.at(x, y), plane.step(), coefficients, -128));
    quantise(coefficients, coarseness);
    require(qoriDCT8x8InvLSClip_16s8u_C1R(coefficients, plane.at(x, y), plane.step(), 128, 0, 255));
}

/// Blocks of 8 x 8 transformed, rounded and transformed back: fine steps in the left third, coarse ones in the right.
Picture requantised(const Picture& photo) {
    const Picture planes[3] = {{photo.size(), 1}, {photo.size(), 1}, {photo.size(), 1}};
    uint8_t* const data[3] = {planes[0].data(), planes[1].data(), planes[2].data()};
    require(qoriCopy_8u_C3P3R(photo.data(), photo.step(), data, planes[0].step(), photo.size()));
    const int columns = photo.width() / kBlock;
    for (const Picture& plane : planes)
        for (int y = 0; y + kBlock <= photo.height(); y += kBlock)
            for (int i = 0; i < columns; ++i)
                throughCoefficients(plane, i * kBlock, y,
                                    recipes::requantised::coarseness[static_cast<size_t>(i * kStrips / columns)]);
    const Picture out(photo.size(), 3);
    require(qoriCopy_8u_P3C3R(data, planes[0].step(), out.data(), out.step(), photo.size()));
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::requantised::about, requantised, {kStrips * kBlock, kBlock}},
};

}  // namespace

std::span<const Panel> dctPanels() { return kPanels; }

}  // namespace demo
