// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>
#include <numbers>

#include "panels.h"

namespace demo {
namespace {

/// Few shades a channel, other numbers of them in each strip: intervals and the constants in their place.
Picture posterised(const Picture& photo) {
    constexpr auto& shadeCounts = recipes::posterised::shades;
    constexpr int kStrips = static_cast<int>(shadeCounts.size()), kMost = *std::ranges::max_element(shadeCounts);
    Picture out(photo.size(), 3);
    for (int i = 0; i < kStrips; ++i) {
        const int count = shadeCounts[static_cast<size_t>(i)], x = photo.width() * i / kStrips;
        int32_t ends[kMost + 1], constants[kMost + 1] = {};
        for (int k = 0; k <= count; ++k) ends[k] = 256 * k / count;
        for (int k = 0; k < count; ++k) constants[k] = 255 * k / (count - 1);
        const int32_t *const levels[3] = {ends, ends, ends}, *const shades[3] = {constants, constants, constants};
        const int32_t nLevels[3] = {count + 1, count + 1, count + 1};
        const QorImageSize strip{photo.width() * (i + 1) / kStrips - x, photo.height()};
        require(qoriLUT_8u_C3R(photo.at(x, 0), photo.step(), out.at(x, 0), out.step(), strip, shades, levels, nLevels));
    }
    return out;
}

constexpr auto& kNodeLevels = recipes::toneCurves::levels;
constexpr auto& kNodeValues = recipes::toneCurves::values;
constexpr int32_t kNodes = static_cast<int32_t>(kNodeLevels.size());

/// A channel's curve, drawn in its own light over a plot that is as wide as high: every value's image is found by the
/// table itself.
void drawCurve(const Picture& out, int side, int channel) {
    uint8_t values[256], mapped[256];
    for (int i = 0; i < 256; ++i) values[i] = static_cast<uint8_t>(i);
    require(qoriLUT_Cubic_8u_C1R(values, 256, mapped, 256, {256, 1}, kNodeValues[static_cast<size_t>(channel)].data(),
                                 kNodeLevels.data(), kNodes));
    const int thickness = std::max(1, side / 80), left = out.width() - side, top = out.height() - side;
    const auto heightAt = [&](int x) { return mapped[x * 255 / std::max(1, side - 1)] * (side - thickness) / 255; };
    for (int x = 0; x < side; ++x) {
        const int here = heightAt(x), next = heightAt(std::min(x + 1, side - 1));
        const int from = std::min(here, next), bar = std::abs(next - here) + thickness;
        require(qoriSet_8u_C3CR(255, out.at(left + x, top + side - from - bar) + channel, out.step(), {1, bar}));
    }
}

/// Warm lights and cool shadows by a cubic for each channel, and the three curves in the corner.
Picture toneCurves(const Picture& photo) {
    const int32_t* const levels[3] = {kNodeLevels.data(), kNodeLevels.data(), kNodeLevels.data()};
    const int32_t* const values[3] = {kNodeValues[0].data(), kNodeValues[1].data(), kNodeValues[2].data()};
    constexpr int32_t nLevels[3] = {kNodes, kNodes, kNodes};
    Picture out(photo.size(), 3);
    require(qoriLUT_Cubic_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size(), values, levels,
                                 nLevels));
    const int side = std::min(photo.width(), photo.height()) / 2;
    if (side < 16) return out;
    constexpr auto paper = bytes(recipes::toneCurves::paper);
    require(qoriSet_8u_C3R(paper.data(), out.at(out.width() - side, out.height() - side), out.step(), {side, side}));
    for (int c = 0; c < 3; ++c) drawCurve(out, side, c);
    return out;
}

/// The green channel as if it were temperature: black through violet and orange to white.
Picture heat(const Picture& photo) {
    uint8_t palette[3 * 256];
    for (int i = 0; i < 256; ++i) {
        const double t = i / 255.0;
        const double light[3] = {std::sqrt(t), t * t * t,
                                 t < 0.5 ? std::sin(2 * std::numbers::pi * t) : std::max(0.0, 4 * t - 3)};
        for (int c = 0; c < 3; ++c)
            palette[3 * i + c] = static_cast<uint8_t>(255 * std::clamp(light[c], 0.0, 1.0) + 0.5);
    }
    Picture green(photo.size(), 1), out(photo.size(), 3);
    require(qoriCopy_8u_C3C1R(photo.data() + 1, photo.step(), green.data(), green.step(), photo.size()));
    require(qoriLUTPalette_8u24u_C1R(green.data(), green.step(), out.data(), out.step(), photo.size(), palette, 8));
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::posterised::about, posterised, {3, 1}},
    {recipes::toneCurves::about, toneCurves},
    {recipes::heat::about, heat},
};

}  // namespace

std::span<const Panel> tablePanels() { return kPanels; }

}  // namespace demo
