// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>
#include <iterator>

#include "panels.h"
#include "recipe_values.h"

namespace demo {
namespace {

/// Few shades a channel, other numbers of them in each strip: intervals and the constants in their place.
Picture posterised(const Picture& photo) {
    constexpr int kStrips = std::size(recipes::kShades.values), kMost = 8;
    Picture out(photo.size(), 3);
    for (int i = 0; i < kStrips; ++i) {
        const int count = recipes::kShades.values[i], x = photo.width() * i / kStrips;
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

static_assert(*std::max_element(std::begin(recipes::kShades.values), std::end(recipes::kShades.values)) <= 8);

constexpr int kNodes = 5;
constexpr int32_t kNodeLevels[3][kNodes] = {{0, 48, 128, 208, 256}, {0, 48, 128, 208, 256}, {0, 48, 128, 208, 256}};
constexpr int32_t kNodeValues[3][kNodes] = {{0, 30, 150, 238, 255}, {0, 36, 134, 224, 255}, {24, 56, 124, 200, 236}};

/// A channel's curve, drawn in its own light over a plot that is as wide as high: every value's image is found by the
/// table itself.
void drawCurve(const Picture& out, int side, int channel) {
    uint8_t values[256], mapped[256];
    for (int i = 0; i < 256; ++i) values[i] = static_cast<uint8_t>(i);
    require(
        qoriLUT_Cubic_8u_C1R(values, 256, mapped, 256, {256, 1}, kNodeValues[channel], kNodeLevels[channel], kNodes));
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
    const int32_t* const levels[3] = {kNodeLevels[0], kNodeLevels[1], kNodeLevels[2]};
    const int32_t* const values[3] = {kNodeValues[0], kNodeValues[1], kNodeValues[2]};
    constexpr int32_t nLevels[3] = {kNodes, kNodes, kNodes};
    Picture out(photo.size(), 3);
    require(qoriLUT_Cubic_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size(), values, levels,
                                 nLevels));
    const int side = std::min(photo.width(), photo.height()) / 2;
    if (side < 16) return out;
    constexpr uint8_t kPaper[3] = {24, 26, 31};
    require(qoriSet_8u_C3R(kPaper, out.at(out.width() - side, out.height() - side), out.step(), {side, side}));
    for (int c = 0; c < 3; ++c) drawCurve(out, side, c);
    return out;
}

/// The green channel as if it were temperature: black through violet and orange to white.
Picture heat(const Picture& photo) {
    uint8_t palette[3 * 256];
    for (int i = 0; i < 256; ++i) {
        const double t = i / 255.0;
        const double light[3] = {std::sqrt(t), t * t * t, t < 0.5 ? std::sin(6.2831853 * t) : std::max(0.0, 4 * t - 3)};
        for (int c = 0; c < 3; ++c)
            palette[3 * i + c] = static_cast<uint8_t>(255 * std::clamp(light[c], 0.0, 1.0) + 0.5);
    }
    Picture green(photo.size(), 1), out(photo.size(), 3);
    require(qoriCopy_8u_C3C1R(photo.data() + 1, photo.step(), green.data(), green.step(), photo.size()));
    require(qoriLUTPalette_8u24u_C1R(green.data(), green.step(), out.data(), out.step(), photo.size(), palette, 8));
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::kShades.caption, "LUT C3", posterised, {3, 1}},
    {"A tone curve for each channel, and the curves", "LUT_Cubic C3", toneCurves},
    {"False colours from a palette", "LUTPalette 8u24u, Copy C3C1", heat},
};

}  // namespace

std::span<const Panel> tablePanels() { return kPanels; }

}  // namespace demo
