// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>
#include <numbers>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

constexpr int kCell = recipes::gradients::cell, kBlock = 2 * kCell, kBins = recipes::gradients::bins;

/// A line through the middle of a cell along the edges of one orientation, as bright as its share of the gradients.
void drawStroke(const Picture& out, int x, int y, int bin, float share) {
    const double gradient = (bin + 0.5) * std::numbers::pi / kBins;  // edges are at right angles to it
    const double dx = -std::sin(gradient), dy = std::cos(gradient);
    constexpr double half = recipes::gradients::half;
    const int light = std::min(255, static_cast<int>(recipes::gradients::gain * share));
    for (int i = -kCell + 1; i < kCell; ++i) {
        uint8_t* const pixel = out.at(x + kCell / 2 + static_cast<int>(std::lround(dx * i / half)),
                                      y + kCell / 2 + static_cast<int>(std::lround(dy * i / half)));
        for (int c = 0; c < 3; ++c)
            pixel[c] = static_cast<uint8_t>(std::max<int>(pixel[c], c == 2 ? light / 2 : light));
    }
}

/// One window for each block.
std::vector<float> descriptorsOf(const Picture& photo, const std::vector<QorPoint2D>& corners) {
    const QorHogConfig config{0, kCell, kBlock, kBlock, kBins, kCell, 0.2f, {kBlock, kBlock}};
    int32_t planBytes = 0, bytes = 0, bufferBytes = 0;
    require(qoriHOGGetSize(&config, &planBytes));
    std::vector<uint8_t> memory(static_cast<size_t>(planBytes));
    auto* const plan = reinterpret_cast<QorHogPlan*>(memory.data());
    require(qoriHOGInit(&config, plan));
    require(qoriHOGGetDescriptorSize(plan, &bytes));
    require(qoriHOGGetBufferSize(plan, photo.size(), &bufferBytes));
    std::vector<uint8_t> buffer(static_cast<size_t>(bufferBytes));
    std::vector<float> descriptors(static_cast<size_t>(bytes) / sizeof(float) * corners.size());
    require(qoriHOG_8u32f_C3R(photo.data(), photo.step(), photo.size(), corners.data(),
                              static_cast<int32_t>(corners.size()), descriptors.data(), plan, borderReplicate, nullptr,
                              buffer.data()));
    return descriptors;
}

/// Orientations of each cell over the darkened photograph.
Picture gradients(const Picture& photo) {
    Picture out(photo.size(), 3);
    for (int y = 0; y < photo.height(); ++y)
        for (int i = 0; i < 3 * photo.width(); ++i) out.at(0, y)[i] = photo.at(0, y)[i] / recipes::gradients::darker;
    std::vector<QorPoint2D> corners;
    for (int y = 0; y + kBlock <= photo.height(); y += kBlock)
        for (int x = 0; x + kBlock <= photo.width(); x += kBlock) corners.push_back({x, y});
    const std::vector<float> descriptors = descriptorsOf(photo, corners);
    const float* share = descriptors.data();
    for (const QorPoint2D corner : corners)
        for (int cell = 0; cell < 4; ++cell)
            for (int bin = 0; bin < kBins; ++bin)
                drawStroke(out, corner.x + cell % 2 * kCell, corner.y + cell / 2 * kCell, bin, *share++);
    return out;
}

/// The patterns of the green channel, and below how often each code is met, by the root.
Picture patterns(const Picture& photo) {
    using namespace recipes::patterns;
    constexpr int kCodes = codes;
    const Picture grey(photo.size(), 1), pattern(photo.size(), 1);
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_C3C1R(photo.data() + 1, photo.step(), grey.data(), grey.step(), photo.size()));
    require(qoriLBPImage3x3_8u_C1R(grey.data(), grey.step(), pattern.data(), pattern.step(), photo.size(),
                                   borderReplicate, 0));
    for (int c = 0; c < 3; ++c)
        require(qoriCopy_8u_C1C3R(pattern.data(), pattern.step(), out.data() + c, out.step(), photo.size()));
    int32_t counts[kCodes], levels[kCodes + 1];
    require(
        qoriHistogramEven_8u_C1R(pattern.data(), pattern.step(), photo.size(), counts, levels, kCodes + 1, 0, kCodes));
    const int width = photo.width(), plot = photo.height() / part, top = photo.height() - plot;
    constexpr auto kPaper = bytes(paper), kInk = bytes(ink);
    require(qoriSet_8u_C3R(kPaper.data(), out.at(0, top), out.step(), {width, plot}));
    const double most = *std::max_element(counts, counts + kCodes);
    for (int k = 0; k < kCodes; ++k) {
        const int begin = width * k / kCodes, end = width * (k + 1) / kCodes;
        const int bar = static_cast<int>(high * plot * std::sqrt(counts[k] / most));
        if (bar > 0 && end > begin)
            require(qoriSet_8u_C3R(kInk.data(), out.at(begin, photo.height() - bar), out.step(), {end - begin, bar}));
    }
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::gradients::about, gradients, {kBlock, kBlock}},
    {recipes::patterns::about, patterns, {3, 3}},
};

}  // namespace

std::span<const Panel> featuresPanels() { return kPanels; }

}  // namespace demo
