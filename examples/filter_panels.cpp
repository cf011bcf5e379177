// SPDX-License-Identifier: Apache-2.0
#include <string_view>
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
             const uint8_t* borderValue) {
        require(
            qoriFilterBorder_8u_C3R(src, srcStep, dst, dstStep, region_, border, borderValue, plan(), buffer_.data()));
    }

private:
    QorLinearFilterPlan* plan() { return reinterpret_cast<QorLinearFilterPlan*>(plan_.data()); }

    QorImageSize region_;
    std::vector<uint8_t> plan_, buffer_;
};

/// The border that a recipe names.
int32_t borderOf(std::string_view name) {
    return name == "constant" ? borderConstant : name == "replicate" ? borderReplicate : borderReadAll;
}

/// A kernel over three regions, side by side: beyond their edges a constant, the nearest pixel, and the photograph
/// itself. One element is a kernel of equal ones.
template <size_t n>
Picture underEachBorder(const Picture& photo, const std::array<int, n>& elements, int side, int32_t divisor) {
    using recipes::unsharp::borders, recipes::unsharp::outside;
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size()));
    std::vector<int16_t> kernel(static_cast<size_t>(side * side));
    for (size_t i = 0; i < kernel.size(); ++i) kernel[i] = static_cast<int16_t>(elements[i % n]);
    const int margin = side / 2;
    const QorImageSize region{photo.width() / 3 - 2 * margin, photo.height() - 2 * margin};
    Filter filter(kernel, {side, side}, divisor, region);
    for (int i = 0; i < 3; ++i) {
        const int x = photo.width() * i / 3 + margin, y = margin;
        filter.run(photo.at(x, y), photo.step(), out.at(x, y), out.step(), borderOf(borders[static_cast<size_t>(i)]),
                   bytes(outside).data());
    }
    return out;
}

/// Twice the picture less its binomial blur.
Picture unsharp(const Picture& photo) {
    using namespace recipes::unsharp;
    return underEachBorder(photo, kernel, side, divisor);
}

/// Light from the upper left: the kernel is turned before it is laid over the picture.
Picture emboss(const Picture& photo) {
    using namespace recipes::emboss;
    return underEachBorder(photo, kernel, side, divisor);
}

/// So wide that the borders show.
Picture mean(const Picture& photo) {
    using namespace recipes::mean;
    return underEachBorder(photo, kernel, side, divisor);
}

/// A pixel a region, with the kernel's reach around it.
constexpr QorImageSize smallestFor(int side) { return {3 * side, side}; }

constexpr Panel kPanels[] = {
    {recipes::unsharp::about, unsharp, smallestFor(recipes::unsharp::side)},
    {recipes::emboss::about, emboss, smallestFor(recipes::emboss::side)},
    {recipes::mean::about, mean, smallestFor(recipes::mean::side)},
};

}  // namespace

std::span<const Panel> filterPanels() { return kPanels; }

}  // namespace demo
