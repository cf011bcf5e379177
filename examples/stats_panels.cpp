// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

Picture filled(QorImageSize size, const uint8_t (&colour)[3]) {
    Picture out(size, 3);
    require(qoriSet_8u_C3R(colour, out.data(), out.step(), size));
    return out;
}

/// The height of a bar is the root of its bin, so that rare values show as well. Each channel raises its own light:
/// where bars of all three overlap, the plot is white.
Picture histograms(const Picture& photo) {
    constexpr int values = 256;
    const int bins = std::min(photo.width(), values);
    int32_t counts[3][values], levels[3][values + 1];
    int32_t *const countsOf[3] = {counts[0], counts[1], counts[2]}, *const levelsOf[3] = {levels[0], levels[1],
                                                                                          levels[2]};
    const int32_t nLevels[3] = {bins + 1, bins + 1, bins + 1};
    constexpr int32_t lower[3] = {0, 0, 0}, upper[3] = {values, values, values};
    require(
        qoriHistogramEven_8u_C3R(photo.data(), photo.step(), photo.size(), countsOf, levelsOf, nLevels, lower, upper));

    Picture out = filled(photo.size(), {18, 20, 24});
    const int width = photo.width(), height = photo.height();
    for (int c = 0; c < 3; ++c) {
        const double most = *std::max_element(counts[c], counts[c] + bins);
        for (int k = 0; k < bins; ++k) {
            const int begin = width * k / bins, end = width * (k + 1) / bins;
            const int bar = static_cast<int>(0.95 * height * std::sqrt(counts[c][k] / most));
            if (bar > 0) require(qoriSet_8u_C3CR(235, out.at(begin, height - bar) + c, out.step(), {end - begin, bar}));
        }
    }
    return out;
}

constexpr int kBlock = 16;

/// Tiles instead of the photograph's blocks, each of the colour that colourOf(x, y, tile, colour) sets.
template <class Colour>
Picture tiles(const Picture& photo, Colour colourOf) {
    Picture out(photo.size(), 3);
    for (int y = 0; y < photo.height(); y += kBlock)
        for (int x = 0; x < photo.width(); x += kBlock) {
            const QorImageSize tile{std::min(kBlock, photo.width() - x), std::min(kBlock, photo.height() - y)};
            uint8_t colour[3];
            colourOf(x, y, tile, colour);
            require(qoriSet_8u_C3R(colour, out.at(x, y), out.step(), tile));
        }
    return out;
}

/// Each channel's minimum or maximum in every block.
Picture blockExtrema(const Picture& photo, bool largest) {
    const QorImageSize grid{(photo.width() + kBlock - 1) / kBlock, (photo.height() + kBlock - 1) / kBlock};
    Picture plane(photo.size(), 1);
    const Picture extrema[3] = {Picture(grid, 1), Picture(grid, 1), Picture(grid, 1)};
    for (int c = 0; c < 3; ++c) {
        require(qoriCopy_8u_C3C1R(photo.data() + c, photo.step(), plane.data(), plane.step(), photo.size()));
        uint8_t* const out = extrema[c].data();
        require(qoriBlockMinMax_8u_C1R(plane.data(), plane.step(), photo.size(), largest ? nullptr : out,
                                       extrema[c].step(), largest ? out : nullptr, extrema[c].step(), {kBlock, kBlock},
                                       nullptr, nullptr));
    }
    return tiles(photo, [&](int x, int y, QorImageSize, uint8_t(&colour)[3]) {
        for (int c = 0; c < 3; ++c) colour[c] = *extrema[c].at(x / kBlock, y / kBlock);
    });
}

Picture blockMinima(const Picture& photo) { return blockExtrema(photo, false); }
Picture blockMaxima(const Picture& photo) { return blockExtrema(photo, true); }

Picture blockMeans(const Picture& photo) {
    return tiles(photo, [&](int x, int y, QorImageSize tile, uint8_t(&colour)[3]) {
        double mean[3];
        require(qoriMean_8u_C3R(photo.at(x, y), photo.step(), tile, mean));
        for (int c = 0; c < 3; ++c) colour[c] = static_cast<uint8_t>(std::lround(mean[c]));
    });
}

constexpr Panel kPanels[] = {
    {"Histograms of red, green and blue", "HistogramEven C3, Set C3C", histograms, {2, 2}},
    {"Minima of 16 x 16 blocks", "Copy C3C1, BlockMinMax C1, Set C3", blockMinima},
    {"Maxima of 16 x 16 blocks", "Copy C3C1, BlockMinMax C1, Set C3", blockMaxima},
    {"Means of 16 x 16 blocks", "Mean C3, Set C3", blockMeans},
};

}  // namespace

std::span<const Panel> statsPanels() { return kPanels; }

}  // namespace demo
