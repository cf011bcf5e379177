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

Picture filtered(const Picture& photo, const std::vector<int16_t>& kernel, QorImageSize kernelSize, int32_t divisor) {
    Picture out(photo.size(), 3);
    Filter(kernel, kernelSize, divisor, photo.size())
        .run(photo.data(), photo.step(), out.data(), out.step(), borderReplicate, {});
    return out;
}

/// Twice the picture less its binomial blur.
Picture unsharp(const Picture& photo) {
    return filtered(photo, {-1, -4,  -6,  -4,  -1,   //
                            -4, -16, -24, -16, -4,   //
                            -6, -24, 476, -24, -6,   //
                            -4, -16, -24, -16, -4,   //
                            -1, -4,  -6,  -4,  -1},  //
                    {5, 5}, 256);
}

/// Light from the upper left: the kernel is turned before it is laid over the picture.
Picture emboss(const Picture& photo) { return filtered(photo, {2, 1, 0, 1, 1, -1, 0, -1, -2}, {3, 3}, 1); }

/// Three regions under a wide mean: beyond their edges a constant, the nearest pixel, and the photograph itself.
Picture borders(const Picture& photo) {
    Picture out(photo.size(), 3);
    constexpr int side = 33, margin = side / 2;
    const std::vector<int16_t> ones(static_cast<size_t>(side * side), 1);
    require(qoriCopy_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size()));
    constexpr int32_t kinds[3] = {borderConstant, borderReplicate, borderReadAll};
    const QorImageSize region{photo.width() / 3 - 2 * margin, photo.height() - 2 * margin};
    if (region.width < 1 || region.height < 1) return out;
    Filter mean(ones, {side, side}, side * side, region);
    for (int i = 0; i < 3; ++i) {
        const int x = photo.width() * i / 3 + margin, y = margin;
        mean.run(photo.at(x, y), photo.step(), out.at(x, y), out.step(), kinds[i], {255, 120, 0});
    }
    return out;
}

constexpr Panel kPanels[] = {
    {"Unsharp mask, 5 x 5", "FilterBorder C3, replicated", unsharp},
    {"Embossed, 3 x 3", "FilterBorder C3, replicated", emboss},
    {"33 x 33 mean: constant, nearest, real", "FilterBorder C3, three borders", borders},
};

}  // namespace

std::span<const Panel> filterPanels() { return kPanels; }

}  // namespace demo
