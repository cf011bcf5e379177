// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <memory>
#include <new>

#include "panels.h"

namespace demo {
namespace {

struct Freed {
    void operator()(float* p) const { qoriFree(p); }
};

/// Three channels of floats.
struct Floats {
    int32_t step = 0;
    std::unique_ptr<float, Freed> pixels;

    explicit Floats(QorImageSize size) : pixels(qoriMalloc_32f_C3(size.width, size.height, &step)) {
        if (pixels == nullptr) throw std::bad_alloc();
    }
    float* data() const { return pixels.get(); }
};

/// Bands from two stops less to two stops more light: a power of two is a scale factor.
Picture exposures(const Picture& photo) {
    Picture out(photo.size(), 3);
    constexpr uint8_t one[3] = {1, 1, 1};
    constexpr auto& scales = recipes::exposures::scales;
    constexpr int bands = static_cast<int>(scales.size());
    for (int i = 0; i < bands; ++i) {
        const int begin = photo.width() * i / bands, end = photo.width() * (i + 1) / bands;
        require(qoriMulC_8u_C3RSfs(photo.at(begin, 0), photo.step(), one, out.at(begin, 0), out.step(),
                                   {end - begin, photo.height()}, scales[static_cast<size_t>(i)]));
    }
    return out;
}

/// Evening light: a factor per channel over a power of two.
Picture warmth(const Picture& photo) {
    Picture out(photo.size(), 3);
    constexpr auto factors = bytes(recipes::warmth::factors);
    require(qoriMulC_8u_C3RSfs(photo.data(), photo.step(), factors.data(), out.data(), out.step(), photo.size(),
                               recipes::warmth::scale));
    return out;
}

/// What a step of some pixels to the right and down changes: saturated differences both ways, added and brightened.
Picture difference(const Picture& photo) {
    Picture out(photo.size(), 3), back(photo.size(), 3);
    using namespace recipes::difference;
    constexpr uint8_t none[3] = {0, 0, 0}, brighter[3] = {gain, gain, gain};
    require(qoriSet_8u_C3R(none, out.data(), out.step(), out.size()));
    const QorImageSize part{photo.width() - shift, photo.height() - shift};
    const uint8_t* moved = photo.at(shift, shift);
    require(qoriSub_8u_C3RSfs(photo.data(), photo.step(), moved, photo.step(), out.data(), out.step(), part, 0));
    require(qoriSub_8u_C3RSfs(moved, photo.step(), photo.data(), photo.step(), back.data(), back.step(), part, 0));
    require(qoriAdd_8u_C3IRSfs(back.data(), back.step(), out.data(), out.step(), part, 0));
    require(qoriMulC_8u_C3IRSfs(brighter, out.data(), out.step(), part, 0));
    return out;
}

/// Darker towards the corners: the product with a mask whose 255 stands for 1.
Picture vignette(const Picture& photo) {
    const QorImageSize size = photo.size();
    Picture mask(size, 1), threefold(size, 3), out(size, 3);
    for (int y = 0; y < size.height; ++y)
        for (int x = 0; x < size.width; ++x) {
            const double dx = 2.0 * x / size.width - 1, dy = 2.0 * y / size.height - 1, r = dx * dx + dy * dy;
            *mask.at(x, y) = static_cast<uint8_t>(255 * std::max(0.0, 1 - recipes::vignette::loss * r));
        }
    require(qoriDup_8u_C1C3R(mask.data(), mask.step(), threefold.data(), threefold.step(), size));
    require(qoriMulScale_8u_C3R(photo.data(), photo.step(), threefold.data(), threefold.step(), out.data(), out.step(),
                                size));
    return out;
}

/// Through floats and back: e^(gamma ln x), which keeps 255 where it is.
Picture gammaCurve(const Picture& photo) {
    const QorImageSize size = photo.size();
    constexpr float gamma = static_cast<float>(recipes::gammaCurve::gamma),
                    toOne[3] = {1 / 255.0f, 1 / 255.0f, 1 / 255.0f}, toByte[3] = {255, 255, 255};
    constexpr float gammas[3] = {gamma, gamma, gamma};
    const Floats linear(size);
    Picture out(size, 3);
    float* const p = linear.data();
    require(qoriConvert_8u32f_C3R(photo.data(), photo.step(), p, linear.step, size));
    require(qoriMulC_32f_C3IR(toOne, p, linear.step, size));
    require(qoriLn_32f_C3IR(p, linear.step, size));  // minus infinity for black, which Exp takes back to 0
    require(qoriMulC_32f_C3IR(gammas, p, linear.step, size));
    require(qoriExp_32f_C3IR(p, linear.step, size));
    require(qoriMulC_32f_C3IR(toByte, p, linear.step, size));
    require(qoriConvert_32f8u_C3R(p, linear.step, out.data(), out.step(), size, roundNearestEven));
    return out;
}

/// Square roots with bits behind the point: shadows open, and black stays black.
Picture openShadows(const Picture& photo) {
    Picture out(photo.size(), 3);
    require(qoriSqrt_8u_C3RSfs(photo.data(), photo.step(), out.data(), out.step(), photo.size(),
                               recipes::openShadows::scale));
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::exposures::about, exposures, {5, 1}},   {recipes::warmth::about, warmth},
    {recipes::difference::about, difference, {3, 3}}, {recipes::vignette::about, vignette, {2, 2}},
    {recipes::gammaCurve::about, gammaCurve},         {recipes::openShadows::about, openShadows},
};

}  // namespace

std::span<const Panel> arithPanels() { return kPanels; }

}  // namespace demo
