// SPDX-License-Identifier: Apache-2.0
#include <cmath>
#include <memory>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

/// Floats of a picture's size.
class Floats {
public:
    Floats(QorImageSize size, int channels)
        : step_(size.width * channels * 4),
          values_(static_cast<size_t>(size.width) * static_cast<size_t>(size.height) * static_cast<size_t>(channels)) {}

    float* data() { return values_.data(); }
    float* at(int x, int y) { return values_.data() + ptrdiff_t{step_ / 4} * y + x; }
    int32_t step() const { return step_; }

private:
    int32_t step_;
    std::vector<float> values_;
};

/// A transform of any size; the inverse divides.
class Transform {
public:
    explicit Transform(QorImageSize size) {
        QorFft2DPlan* plan = nullptr;
        require(qoriDFTInitAlloc_R_32f(&plan, size, fftDivInvByN, hintFast));
        plan_.reset(plan);
        int32_t bytes = 0;
        require(qoriDFTGetBufSize_R_32f(plan, &bytes));
        buffer_.resize(static_cast<size_t>(bytes));
    }
    const QorFft2DPlan* plan() const { return plan_.get(); }
    uint8_t* buffer() { return buffer_.data(); }

private:
    struct Release {
        void operator()(QorFft2DPlan* plan) const { qoriDFTFree_R_32f(plan); }
    };
    std::unique_ptr<QorFft2DPlan, Release> plan_;
    std::vector<uint8_t> buffer_;
};

/// Frequency 0 in the middle: the four quarters change places.
void centre(Floats& from, Floats& to, QorImageSize size) {
    const int right = size.width / 2, left = size.width - right, low = size.height / 2, top = size.height - low;
    const auto move = [&](int fromX, int fromY, int toX, int toY, QorImageSize part) {
        if (part.width > 0 && part.height > 0)
            require(qoriCopy_32f_C1R(from.at(fromX, fromY), from.step(), to.at(toX, toY), to.step(), part));
    };
    move(0, 0, right, low, {left, top});
    move(left, 0, 0, low, {right, top});
    move(0, top, right, 0, {left, low});
    move(left, top, 0, 0, {right, low});
}

/// The magnitudes of the green channel's frequencies, some powers of e up to the mean's from black to white.
Picture logSpectrum(const Picture& photo) {
    const QorImageSize size = photo.size();
    Picture grey(size, 1), out(size, 3);
    require(qoriCopy_8u_C3C1R(photo.data() + 1, photo.step(), grey.data(), grey.step(), size));
    Floats image(size, 1), sizes(size, 1);
    require(qoriConvert_8u32f_C1R(grey.data(), grey.step(), image.data(), image.step(), size));
    Transform transform(size);
    require(qoriDFTFwd_RToPack_32f_C1IR(image.data(), image.step(), transform.plan(), transform.buffer()));
    require(qoriMagnitudePack_32f_C1R(image.data(), image.step(), sizes.data(), sizes.step(), size));
    require(qoriAddC_32f_C1IR(1, sizes.data(), sizes.step(), size));
    require(qoriLn_32f_C1IR(sizes.data(), sizes.step(), size));
    const float most = *sizes.data();
    centre(sizes, image, size);
    require(qoriScale_32f8u_C1R(image.data(), image.step(), grey.data(), grey.step(), size,
                                most - static_cast<float>(recipes::logSpectrum::powers), most));
    require(qoriDup_8u_C1C3R(grey.data(), grey.step(), out.data(), out.step(), size));
    return out;
}

/// What a lens far out of focus makes of a point, around the first pixel and across the edges.
Floats disc(QorImageSize size, int radius) {
    Floats kernel(size, 3);
    int area = 0;
    for (int pass = 0; pass < 2; ++pass)
        for (int y = -radius; y <= radius; ++y)
            for (int x = -radius; x <= radius; ++x) {
                if (x * x + y * y > radius * radius) continue;
                if (pass == 0) {
                    ++area;
                    continue;
                }
                float* const pixel = kernel.at(3 * ((x + size.width) % size.width), (y + size.height) % size.height);
                for (int c = 0; c < 3; ++c) pixel[c] = 1.0f / static_cast<float>(area);
            }
    return kernel;
}

/// A convolution as the product of two spectra: its time does not depend on the radius.
Picture outOfFocus(const Picture& photo) {
    const QorImageSize size = photo.size();
    Floats image(size, 3), kernel = disc(size, recipes::outOfFocus::radius);
    Transform transform(size);
    require(qoriConvert_8u32f_C3R(photo.data(), photo.step(), image.data(), image.step(), size));
    require(qoriDFTFwd_RToPack_32f_C3IR(image.data(), image.step(), transform.plan(), transform.buffer()));
    require(qoriDFTFwd_RToPack_32f_C3IR(kernel.data(), kernel.step(), transform.plan(), transform.buffer()));
    require(qoriMulPack_32f_C3IR(kernel.data(), kernel.step(), image.data(), image.step(), size));
    require(qoriDFTInv_PackToR_32f_C3IR(image.data(), image.step(), transform.plan(), transform.buffer()));
    Picture out(size, 3);
    require(qoriConvert_32f8u_C3R(image.data(), image.step(), out.data(), out.step(), size, roundNearestEven));
    return out;
}

constexpr int kAcross = 2 * recipes::outOfFocus::radius + 1;

constexpr Panel kPanels[] = {
    {recipes::logSpectrum::about, logSpectrum},
    {recipes::outOfFocus::about, outOfFocus, {kAcross, kAcross}},
};

}  // namespace

std::span<const Panel> fourierPanels() { return kPanels; }

}  // namespace demo
