// SPDX-License-Identifier: Apache-2.0
// Erosion and dilation; the source has the pixels around the region.
#include <algorithm>

#include "bench.h"

namespace qori::bench {
namespace {

/// Room for one pixel around the region. The region itself begins on a 64-byte boundary.
template <class T>
class Rimmed {
public:
    Rimmed(Size size, int channels)
        : left_(64 / static_cast<int>(sizeof(T))),
          image_({size.width + 2 * left_ / channels + 2, size.height + 2}, channels) {}
    T* data() const { return image_.row(1) + left_; }
    T* row(int y) const { return image_.row(y + 1) + left_; }
    int32_t step() const { return image_.step(); }

private:
    int left_;
    Image<T> image_;
};

template <bool largest, class T>
std::function<void()> plainOf(Rimmed<T> src, Image<T> dst, int channels) {
    return [=] {
        for (int y = 0; y < dst.height(); ++y) {
            T* d = dst.row(y);
            for (int x = 0; x < dst.elements(); ++x) {
                T best = src.row(y)[x];
                for (int j = -1; j <= 1; ++j)
                    for (int i = -1; i <= 1; ++i) {
                        const T other = src.row(y + j)[x + i * channels];
                        best = largest ? std::max(best, other) : std::min(best, other);
                    }
                d[x] = best;
            }
            keep(d);
        }
    };
}

const std::vector<Size> kMorphologySizes = {kL1, kL2, kFrame, kNarrow};

struct Best {
    double atL2 = 0, atFrame = 0;
};

template <bool largest, class T, int channels, class Function>
Row apart(std::string name, Function function, Best best = {}) {
    const auto make = [=](Size size) {
        const Rimmed<T> src(size, channels);
        const Image<T> dst(size, channels);
        return Contenders{[=] { function(src.data(), src.step(), dst.data(), dst.step(), size.roi()); },
                          plainOf<largest>(src, dst, channels),
                          {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * channels * sizeof(T),
            .sizes = kMorphologySizes,
            .make = make,
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame};
}

/// The peer is the same operation from one image to another.
template <class T, int channels, class Function, class Apart>
Row inPlace(std::string name, Function function, Apart apart) {
    const auto make = [=](Size size) {
        const Rimmed<T> image(size, channels), src(size, channels);
        const Image<T> dst(size, channels);
        return Contenders{[=] { function(image.data(), image.step(), size.roi()); },
                          {},
                          [=] { apart(src.data(), src.step(), dst.data(), dst.step(), size.roi()); }};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * channels * sizeof(T),
            .sizes = kMorphologySizes,
            .make = make,
            .peerName = "not in place"};
}

const Rows rows{{
    apart<false, uint8_t, 1>("erode 3x3 8u C1", qoriErode3x3_8u_C1R, {19'633, 12'970}),
    apart<false, uint8_t, 3>("erode 3x3 8u C3", qoriErode3x3_8u_C3R),
    apart<false, uint8_t, 4>("erode 3x3 8u C4", qoriErode3x3_8u_C4R),
    apart<false, uint16_t, 1>("erode 3x3 16u C1", qoriErode3x3_16u_C1R),
    apart<false, float, 1>("erode 3x3 32f C1", qoriErode3x3_32f_C1R),
    apart<true, uint8_t, 1>("dilate 3x3 8u C1", qoriDilate3x3_8u_C1R, {16'888, 13'251}),
    apart<true, uint8_t, 3>("dilate 3x3 8u C3", qoriDilate3x3_8u_C3R),
    apart<true, uint8_t, 4>("dilate 3x3 8u C4", qoriDilate3x3_8u_C4R),
    apart<true, uint16_t, 1>("dilate 3x3 16u C1", qoriDilate3x3_16u_C1R),
    apart<true, float, 1>("dilate 3x3 32f C1", qoriDilate3x3_32f_C1R),
    inPlace<uint8_t, 1>("erode 3x3 8u C1 in place", qoriErode3x3_8u_C1IR, qoriErode3x3_8u_C1R),
    inPlace<uint8_t, 3>("erode 3x3 8u C3 in place", qoriErode3x3_8u_C3IR, qoriErode3x3_8u_C3R),
    inPlace<uint16_t, 1>("erode 3x3 16u C1 in place", qoriErode3x3_16u_C1IR, qoriErode3x3_16u_C1R),
    inPlace<float, 1>("erode 3x3 32f C1 in place", qoriErode3x3_32f_C1IR, qoriErode3x3_32f_C1R),
}};

}  // namespace
}  // namespace qori::bench
