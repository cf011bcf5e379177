// SPDX-License-Identifier: Apache-2.0
#include <vector>

#include "panels.h"

namespace demo {
namespace {

/// A kernel of integers over a divisor, for three channels.
class Filter {
public:
    Filter(const std::vector<int16_t>& kernel, QorImageSize kernelSize, int32_t divisor, QorImageSize region)
        : region_(region) {
        int32_t planBytes = 0, bufferBytes = 0;
        require(qoriFilterBorderGetSize(kernelSize, region, qor8u, qor16s, 3, &planBytes, &bufferBytes));
        plan_.resize(static_cast<size_t>(planBytes));
        buffer_.resize(static_cast<size_t>(bufferBytes));
        require(qoriFilterBorderInit_16s(kernel.data(), kernelSize, divisor, qor8u, 3, roundNearestEven, plan()));
    }

    void run(const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, int32_t border,
             const uint8_t (&borderValue)[3]) {
        require(
            qoriFilterBorder_8u_C3R(src, srcStep, dst, dstStep, region_, border, borderValue, plan(), buffer_.data()));
    }

private:
    QorLinearFilterPlan* plan() { return reinterpret_cast<QorLinearFilterPlan*>(plan_.data()); }

    QorImageSize region_;
    std::vector<uint8_t> plan_, buffer_;
};

/// A kernel over three regions, side by side: beyond their edges a constant, the nearest pixel, and the photograph
/// itself.
Picture underEachBorder(const Picture& photo, const std::vector<int16_t>& kernel, int side, int32_t divisor) {
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size()));
    constexpr int32_t kinds[3] = {borderConstant, borderReplicate, borderReadAll};
    const int margin = side / 2;
    const QorImageSize region{photo.width() / 3 - 2 * margin, photo.height() - 2 * margin};
    Filter filter(kernel, {side, side}, divisor, region);
    for (int i = 0; i < 3; ++i) {
        const int x = photo.width() * i / 3 + margin, y = margin;
        filter.run(photo.at(x, y), photo.step(), out.at(x, y), out.step(), kinds[i], {255, 120, 0});
    }
    return out;
}

/// Twice the picture less its binomial blur.
Picture unsharp(const Picture& photo) {
    return underEachBorder(photo, {-1, -4,  -6,  -4,  -1,   //
                                   -4, -16, -24, -16, -4,   //
                                   -6, -24, 476, -24, -6,   //
                                   -4, -16, -24, -16, -4,   //
                                   -1, -4,  -6,  -4,  -1},  //
                           5, 256);
}

/// Light from the upper left: the kernel is turned before it is laid over the picture.
Picture emboss(const Picture& photo) { return underEachBorder(photo, {2, 1, 0, 1, 1, -1, 0, -1, -2}, 3, 1); }

/// So wide that the borders show.
Picture mean(const Picture& photo) {
    constexpr int side = 33;
    return underEachBorder(photo, std::vector<int16_t>(static_cast<size_t>(side * side), 1), side, side * side);
}

/// A pixel a region, with the kernel's reach around it.
constexpr QorImageSize smallestFor(int side) { return {3 * side, side}; }

constexpr Panel kPanels[] = {
    {"Unsharp mask, 5 x 5", "FilterBorder C3: constant, nearest, real", unsharp, smallestFor(5)},
    {"Embossed, 3 x 3", "FilterBorder C3: constant, nearest, real", emboss, smallestFor(3)},
    {"Mean, 33 x 33", "FilterBorder C3: constant, nearest, real", mean, smallestFor(33)},
};

}  // namespace

std::span<const Panel> filterPanels() { return kPanels; }

}  // namespace demo
