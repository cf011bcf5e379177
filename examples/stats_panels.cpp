// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

Picture filled(QorImageSize size, const std::array<uint8_t, 3>& colour) {
    Picture out(size, 3);
    require(qoriSet_8u_C3R(colour.data(), out.data(), out.step(), size));
    return out;
}

/// The height of a bar is the root of its bin, so that rare values show as well. Each channel raises its own light:
/// where bars of all three overlap, the plot is white.
Picture histograms(const Picture& photo) {
    using namespace recipes::histograms;
    constexpr int values = most;
    const int bins = std::min(photo.width(), values);
    int32_t counts[3][values], levels[3][values + 1];
    int32_t *const countsOf[3] = {counts[0], counts[1], counts[2]}, *const levelsOf[3] = {levels[0], levels[1],
                                                                                          levels[2]};
    const int32_t nLevels[3] = {bins + 1, bins + 1, bins + 1};
    constexpr int32_t lower[3] = {0, 0, 0}, upper[3] = {values, values, values};
    require(
        qoriHistogramEven_8u_C3R(photo.data(), photo.step(), photo.size(), countsOf, levelsOf, nLevels, lower, upper));

    Picture out = filled(photo.size(), bytes(paper));
    const int width = photo.width(), height = photo.height();
    for (int c = 0; c < 3; ++c) {
        const double highest = *std::max_element(counts[c], counts[c] + bins);
        for (int k = 0; k < bins; ++k) {
            const int begin = width * k / bins, end = width * (k + 1) / bins;
            const int bar = static_cast<int>(high * height * std::sqrt(counts[c][k] / highest));
            if (bar > 0) require(qoriSet_8u_C3CR(ink, out.at(begin, height - bar) + c, out.step(), {end - begin, bar}));
        }
    }
    return out;
}

/// Tiles instead of the photograph's blocks, each of the colour that colourOf(x, y, tile, colour) sets.
template <class Colour>
Picture tiles(const Picture& photo, int block, Colour colourOf) {
    Picture out(photo.size(), 3);
    for (int y = 0; y < photo.height(); y += block)
        for (int x = 0; x < photo.width(); x += block) {
            const QorImageSize tile{std::min(block, photo.width() - x), std::min(block, photo.height() - y)};
            uint8_t colour[3];
            colourOf(x, y, tile, colour);
            require(qoriSet_8u_C3R(colour, out.at(x, y), out.step(), tile));
        }
    return out;
}

/// Each channel's minimum or maximum in every block.
Picture blockExtrema(const Picture& photo, int block, bool largest) {
    const QorImageSize grid{(photo.width() + block - 1) / block, (photo.height() + block - 1) / block};
    Picture plane(photo.size(), 1);
    const Picture extrema[3] = {Picture(grid, 1), Picture(grid, 1), Picture(grid, 1)};
    for (int c = 0; c < 3; ++c) {
        require(qoriCopy_8u_C3C1R(photo.data() + c, photo.step(), plane.data(), plane.step(), photo.size()));
        uint8_t* const out = extrema[c].data();
        require(qoriBlockMinMax_8u_C1R(plane.data(), plane.step(), photo.size(), largest ? nullptr : out,
                                       extrema[c].step(), largest ? out : nullptr, extrema[c].step(), {block, block},
                                       nullptr, nullptr));
    }
    return tiles(photo, block, [&](int x, int y, QorImageSize, uint8_t(&colour)[3]) {
        for (int c = 0; c < 3; ++c) colour[c] = *extrema[c].at(x / block, y / block);
    });
}

Picture blockMinima(const Picture& photo) { return blockExtrema(photo, recipes::blockMinima::block, false); }
Picture blockMaxima(const Picture& photo) { return blockExtrema(photo, recipes::blockMaxima::block, true); }

Picture blockMeans(const Picture& photo) {
    return tiles(photo, recipes::blockMeans::block, [&](int x, int y, QorImageSize tile, uint8_t(&colour)[3]) {
        double mean[3];
        require(qoriMean_8u_C3R(photo.at(x, y), photo.step(), tile, mean));
        for (int c = 0; c < 3; ++c) colour[c] = static_cast<uint8_t>(std::lround(mean[c]));
    });
}

constexpr Panel kPanels[] = {
    {recipes::histograms::about, histograms, {2, 2}},
    {recipes::blockMinima::about, blockMinima},
    {recipes::blockMaxima::about, blockMaxima},
    {recipes::blockMeans::about, blockMeans},
};

}  // namespace

std::span<const Panel> statsPanels() { return kPanels; }

}  // namespace demo
