// SPDX-License-Identifier: Apache-2.0
#include "panels.h"

namespace demo {
namespace {

/// One channel element in eight is black or white, by an arithmetic sequence of pseudo-random numbers.
void saltAndPepper(const Picture& picture) {
    using namespace recipes::despeckled;
    uint32_t state = seed;
    for (int y = 0; y < picture.height(); ++y)
        for (int i = 0; i < 3 * picture.width(); ++i) {
            state = state * uint32_t{factor} + uint32_t{more};
            if (state >> 29 == 0) picture.at(0, y)[i] = (state >> 28 & 1) != 0 ? 255 : 0;
        }
}

/// Strips: the noise, and what medians of larger and larger squares leave of it.
Picture despeckled(const Picture& photo) {
    constexpr auto& sides = recipes::despeckled::sides;
    constexpr int kStrips = 1 + static_cast<int>(sides.size()), kReach = sides.back() / 2;
    const Picture around({photo.width() + 2 * kReach, photo.height() + 2 * kReach}, 3), out(photo.size(), 3);
    require(qoriCopyReplicateBorder_8u_C3R(photo.data(), photo.step(), photo.size(), around.data(), around.step(),
                                           around.size(), kReach, kReach));
    saltAndPepper(around);
    for (int i = 0; i < kStrips; ++i) {
        const int x = photo.width() * i / kStrips, side = i == 0 ? 1 : sides[static_cast<size_t>(i - 1)];
        const QorImageSize strip{photo.width() * (i + 1) / kStrips - x, photo.height()};
        require(qoriFilterMedian_8u_C3R(around.at(x + kReach, kReach), around.step(), out.at(x, 0), out.step(), strip,
                                        {side, side}, {side / 2, side / 2}));
    }
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::despeckled::about, despeckled, {5, 1}},
};

}  // namespace

std::span<const Panel> medianPanels() { return kPanels; }

}  // namespace demo
