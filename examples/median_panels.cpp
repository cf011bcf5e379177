// SPDX-License-Identifier: Apache-2.0
#include "panels.h"

namespace demo {
namespace {

/// One channel element in eight is black or white, by an arithmetic sequence of pseudo-random numbers.
void saltAndPepper(const Picture& picture) {
    uint32_t state = 20141009;
    for (int y = 0; y < picture.height(); ++y)
        for (int i = 0; i < 3 * picture.width(); ++i) {
            state = state * 1664525u + 1013904223u;
            if (state >> 29 == 0) picture.at(0, y)[i] = (state >> 28 & 1) != 0 ? 255 : 0;
        }
}

/// Four strips: the noise, and what medians of 3 x 3, 5 x 5 and 9 x 9 leave of it.
Picture despeckled(const Picture& photo) {
    constexpr int kReach = 4, kMasks[4] = {1, 3, 5, 9};
    const Picture around({photo.width() + 2 * kReach, photo.height() + 2 * kReach}, 3), out(photo.size(), 3);
    require(qoriCopyReplicateBorder_8u_C3R(photo.data(), photo.step(), photo.size(), around.data(), around.step(),
                                           around.size(), kReach, kReach));
    saltAndPepper(around);
    for (int i = 0; i < 4; ++i) {
        const int x = photo.width() * i / 4, side = kMasks[i];
        const QorImageSize strip{photo.width() * (i + 1) / 4 - x, photo.height()};
        require(qoriFilterMedian_8u_C3R(around.at(x + kReach, kReach), around.step(), out.at(x, 0), out.step(), strip,
                                        {side, side}, {side / 2, side / 2}));
    }
    return out;
}

constexpr Panel kPanels[] = {
    {"Salt and pepper, medians of 3 x 3, 5 x 5, 9 x 9", "FilterMedian", despeckled, {4, 1}},
};

}  // namespace

std::span<const Panel> medianPanels() { return kPanels; }

}  // namespace demo
