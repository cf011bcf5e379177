// SPDX-License-Identifier: Apache-2.0
// Oriented gradients by their definition: orientations and votes in single precision, operation by operation, sums and
// norms in double precision.
#pragma once
#include <algorithm>
#include <cmath>
#include <numbers>
#include <vector>

#include "qori.h"

namespace qori::test::reference {

struct HogGradient {
    float dx, dy;

    float squares() const { return std::fma(dx, dx, dy * dy); }
};

struct HogVote {
    int bin;
    float first, second;
};

inline float orientation(float dx, float dy) {
    const float pi = static_cast<float>(std::numbers::pi), e = 2.220446e-16f;
    const float xx = dx * dx, yy = dy * dy;
    if (xx >= yy)
        return dx * dy / (xx + 0.28f * yy + e) + (dx < 0   ? pi
                                                  : dy < 0 ? static_cast<float>(2 * std::numbers::pi)
                                                           : 0.0f);
    return static_cast<float>(dy >= 0 ? std::numbers::pi / 2 : 3 * std::numbers::pi / 2) -
           dx * dy / (yy + 0.28f * xx + e);
}

inline HogVote voteOf(HogGradient g, int nbins) {
    const float place = orientation(g.dx, g.dy) * static_cast<float>(nbins / std::numbers::pi) - 0.5f;
    const float bin = std::floor(place), fraction = place - bin;
    const auto size = static_cast<float>(std::sqrt(static_cast<double>(g.squares())));
    return {(static_cast<int>(bin) + 2 * nbins) % nbins, size * (1 - fraction), size * fraction};
}

/// The weight of pixel i along an axis for one of two cells.
inline double hogWeight(int i, int cell, const QorHogConfig& config) {
    const double sigma = static_cast<double>(config.blockWeightParam), d = i + 0.5 - config.cellSize;
    const double u = (i + 0.5) / config.cellSize - 0.5 - cell;
    return std::exp(-d * d / (2 * sigma * sigma)) * std::max(0.0, 1 - std::abs(u));
}

/// vote(x, y) gives a pixel's vote; (x, y) is the block's corner.
template <class Vote>
std::vector<double> hogBlock(const QorHogConfig& config, int x, int y, Vote vote) {
    const int n = config.nbins;
    std::vector<double> sums(static_cast<size_t>(4 * n));
    for (int j = 0; j < config.blockSize; ++j)
        for (int i = 0; i < config.blockSize; ++i) {
            const HogVote v = vote(x + i, y + j);
            for (int cell = 0; cell < 4; ++cell) {
                const double weight = static_cast<double>(
                    static_cast<float>(hogWeight(i, cell % 2, config) * hogWeight(j, cell / 2, config)));
                sums.data()[cell * n + v.bin] += weight * static_cast<double>(v.first);
                sums.data()[cell * n + (v.bin + 1) % n] += weight * static_cast<double>(v.second);
            }
        }
    const auto normalise = [&] {
        double squares = 1e-6;
        for (double sum : sums) squares += sum * sum;
        for (double& sum : sums) sum /= std::sqrt(squares);
    };
    normalise();
    for (double& sum : sums) sum = std::min(sum, static_cast<double>(config.normParam));
    normalise();
    return sums;
}

/// The blocks of a window in the order of the configuration.
template <class Vote>
std::vector<double> hogWindow(const QorHogConfig& config, QorPoint2D at, Vote vote) {
    const int across = (config.winSize.width - config.blockSize) / config.blockStride + 1;
    const int down = (config.winSize.height - config.blockSize) / config.blockStride + 1;
    std::vector<double> all;
    for (int k = 0; k < across * down; ++k) {
        const int x = config.blockOrder == 0 ? k % across : k / down;
        const int y = config.blockOrder == 0 ? k / across : k % down;
        const std::vector<double> block =
            hogBlock(config, at.x + x * config.blockStride, at.y + y * config.blockStride, vote);
        all.insert(all.end(), block.begin(), block.end());
    }
    return all;
}

}  // namespace qori::test::reference
