// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

constexpr int kSide = recipes::openedAndClosed::side, kReach = kSide / 2;

/// A disc of kSide pixels across.
const uint8_t* disc() {
    static const std::vector<uint8_t> mask = [] {
        std::vector<uint8_t> bytes;
        for (int y = -kReach; y <= kReach; ++y)
            for (int x = -kReach; x <= kReach; ++x) bytes.push_back(x * x + y * y <= kReach * kReach + kReach);
        return bytes;
    }();
    return mask.data();
}

/// The photograph with its edge pixels repeated on all sides, for windows that reach beyond it.
Picture framed(const Picture& photo, int rim) {
    Picture out({photo.width() + 2 * rim, photo.height() + 2 * rim}, 3);
    require(qoriCopyReplicateBorder_8u_C3R(photo.data(), photo.step(), photo.size(), out.data(), out.step(), out.size(),
                                           rim, rim));
    return out;
}

/// Left: erosion, then dilation, which leave out what is bright and smaller than the disc. Right: the other way about.
Picture openedAndClosed(const Picture& photo) {
    const Picture wide = framed(photo, 2 * kReach);
    const QorImageSize disced{kSide, kSide}, once{photo.width() + 2 * kReach, photo.height() + 2 * kReach};
    const QorPoint2D middle{kReach, kReach};
    Picture eroded(once, 3), dilated(once, 3), out(photo.size(), 3);
    const uint8_t* const inner = wide.at(kReach, kReach);
    require(qoriErode_8u_C3R(inner, wide.step(), eroded.data(), eroded.step(), once, disc(), disced, middle));
    require(qoriDilate_8u_C3R(inner, wide.step(), dilated.data(), dilated.step(), once, disc(), disced, middle));
    const int half = photo.width() / 2;
    const QorImageSize left{std::max(1, half), photo.height()}, right{photo.width() - half, photo.height()};
    require(qoriDilate_8u_C3R(eroded.at(kReach, kReach), eroded.step(), out.data(), out.step(), left, disc(), disced,
                              middle));
    require(qoriErode_8u_C3R(dilated.at(kReach + half, kReach), dilated.step(), out.at(half, 0), out.step(), right,
                             disc(), disced, middle));
    return out;
}

/// Largest minus smallest of a square, brighter.
Picture gradient(const Picture& photo) {
    using namespace recipes::gradient;
    constexpr int rim = side / 2;
    const Picture wide = framed(photo, rim);
    const QorImageSize square{side, side};
    const QorPoint2D middle{rim, rim};
    const uint8_t* const inner = wide.at(rim, rim);
    Picture smallest(photo.size(), 3), out(photo.size(), 3);
    require(qoriFilterMin_8u_C3R(inner, wide.step(), smallest.data(), smallest.step(), photo.size(), square, middle));
    require(qoriFilterMax_8u_C3R(inner, wide.step(), out.data(), out.step(), photo.size(), square, middle));
    require(qoriSub_8u_C3IRSfs(smallest.data(), smallest.step(), out.data(), out.step(), photo.size(), scale));
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::openedAndClosed::about, openedAndClosed},
    {recipes::gradient::about, gradient},
};

}  // namespace

std::span<const Panel> morphologyPanels() { return kPanels; }

}  // namespace demo
