// SPDX-License-Identifier: Apache-2.0
#include <memory>

#include "panels.h"

namespace demo {
namespace {

/// 255 where the green channel is above its Otsu threshold, 0 elsewhere.
Picture otsuMask(const Picture& photo) {
    const QorImageSize size = photo.size();
    Picture mask(size, 1);
    require(qoriCopy_8u_C3C1R(photo.data() + 1, photo.step(), mask.data(), mask.step(), size));
    uint8_t level;
    require(qoriComputeThreshold_Otsu_8u_C1R(mask.data(), mask.step(), size, &level));
    require(qoriThreshold_GTVal_8u_C1IR(mask.data(), mask.step(), size, level, 255));
    require(qoriThreshold_LTVal_8u_C1IR(mask.data(), mask.step(), size, 255, 0));
    return mask;
}

/// The mask, and under it the photograph.
Picture brightParts(const Picture& photo) {
    const QorImageSize size = photo.size();
    const Picture mask = otsuMask(photo);
    Picture out(size, 3);
    require(qoriDup_8u_C1C3R(mask.data(), mask.step(), out.data(), out.step(), size));
    const QorImageSize half{size.width / 2, size.height};
    if (half.width > 0)
        require(qoriCopy_8u_C3MR(photo.data(), photo.step(), out.data(), out.step(), half, mask.data(), mask.step()));
    return out;
}

/// Shadows and lights in colours of their own, channel by channel between them.
Picture zebra(const Picture& photo) {
    namespace recipe = recipes::zebra;
    constexpr uint8_t dark[3] = {recipe::dark, recipe::dark, recipe::dark};
    constexpr uint8_t light[3] = {recipe::light, recipe::light, recipe::light};
    constexpr auto shadow = bytes(recipe::shadow), glare = bytes(recipe::glare);
    Picture out(photo.size(), 3);
    require(qoriThreshold_LTValGTVal_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size(), dark,
                                            shadow.data(), light, glare.data()));
    return out;
}

/// Strips: Otsu's threshold, and what is not some levels below the means of larger and larger squares.
Picture adaptiveBesideOtsu(const Picture& photo) {
    constexpr auto& sides = recipes::adaptiveBesideOtsu::sides;
    constexpr int kStrips = 1 + static_cast<int>(sides.size());
    const QorImageSize size = photo.size();
    const Picture binary = otsuMask(photo);
    Picture grey(size, 1);
    require(qoriCopy_8u_C3C1R(photo.data() + 1, photo.step(), grey.data(), grey.step(), size));
    for (int i = 1; i < kStrips; ++i) {
        const int x = size.width * i / kStrips, side = sides[static_cast<size_t>(i - 1)];
        const QorImageSize mask{side, side}, strip{size.width * (i + 1) / kStrips - x, size.height};
        int32_t bytes;
        require(qoriThresholdAdaptiveBoxGetBufferSize(strip, mask, 1, 1, &bytes));
        const auto buffer = std::make_unique<uint8_t[]>(static_cast<size_t>(bytes));
        require(qoriThresholdAdaptiveBox_8u_C1R(grey.at(x, 0), grey.step(), binary.at(x, 0), binary.step(), strip, mask,
                                                recipes::adaptiveBesideOtsu::delta, 255, 0, borderReplicate, 0,
                                                buffer.get()));
    }
    Picture out(size, 3);
    require(qoriDup_8u_C1C3R(binary.data(), binary.step(), out.data(), out.step(), size));
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::brightParts::about, brightParts},
    {recipes::zebra::about, zebra},
    {recipes::adaptiveBesideOtsu::about, adaptiveBesideOtsu, {5, 1}},
};

}  // namespace

std::span<const Panel> thresholdPanels() { return kPanels; }

}  // namespace demo
