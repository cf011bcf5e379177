// SPDX-License-Identifier: Apache-2.0
// Erosion and dilation; the source has the pixels around the region.
#include <algorithm>

#include "bench.h"

namespace qori::bench {
namespace {

/// Room for some pixels around the region. The region itself begins on a 64-byte boundary.
template <class T>
class Rimmed {
public:
    Rimmed(Size size, int channels, int rim = 1)
        : rim_(rim),
          left_((rim * channels * static_cast<int>(sizeof(T)) + 63) / 64 * 64 / static_cast<int>(sizeof(T))),
          image_({size.width + 2 * left_ / channels + 2, size.height + 2 * rim}, channels) {}
    T* data() const { return row(0); }
    T* row(int y) const { return image_.row(y + rim_) + left_; }
    int32_t step() const { return image_.step(); }

private:
    int rim_, left_;
    Image<T> image_;
};

template <bool largest, class T>
std::function<void()> plainOf(Rimmed<T> src, Image<T> dst, int channels, int reach = 1) {
    return [=] {
        for (int y = 0; y < dst.height(); ++y) {
            T* d = dst.row(y);
            for (int x = 0; x < dst.elements(); ++x) {
                T best = src.row(y)[x];
                for (int j = -reach; j <= reach; ++j)
                    for (int i = -reach; i <= reach; ++i) {
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
        return Contenders{[=] { must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi())); },
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
        return Contenders{[=] { must(function(image.data(), image.step(), size.roi())); },
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

// --- any window -----------------------------------------------------------------------------------------------------

enum class Form { rectangle, disc, cross, noise };

std::vector<uint8_t> maskOf(Form form, int side) {
    std::vector<uint8_t> mask;
    for (int y = 0; y < side; ++y)
        for (int x = 0; x < side; ++x) {
            const int dx = 2 * x + 1 - side, dy = 2 * y + 1 - side;
            const bool isIn = form == Form::rectangle ? true
                              : form == Form::disc    ? dx * dx + dy * dy <= side * side
                              : form == Form::cross   ? x == side / 2 || y == side / 2
                                                      : (7 * x + 13 * y + x * y) % 3 != 0;
            mask.push_back(isIn);
        }
    return mask;
}

/// Calls an erosion by a mask of bytes, or a minimum or maximum filter, which has none.
template <class T, class Function>
void runWindow(Function function, const T* src, int32_t srcStep, T* dst, int32_t dstStep, Size size, int side,
               const std::vector<uint8_t>& mask) {
    const QorImageSize window{side, side};
    const QorPoint2D middle{side / 2, side / 2};
    if constexpr (std::is_invocable_v<Function, const T*, int32_t, T*, int32_t, QorImageSize, QorImageSize, QorPoint2D>)
        must(function(src, srcStep, dst, dstStep, size.roi(), window, middle));
    else
        must(function(src, srcStep, dst, dstStep, size.roi(), mask.data(), window, middle));
}

template <class T, int channels, class Function>
std::function<void()> windowOf(Function function, Size size, Form form, int side, bool inPlace = false) {
    const Rimmed<T> src(size, channels, side / 2);
    const std::vector<uint8_t> mask = maskOf(form, side);
    if (inPlace)
        return [=] { runWindow<T>(function, src.data(), src.step(), src.data(), src.step(), size, side, mask); };
    const Image<T> dst(size, channels);
    return [=] { runWindow<T>(function, src.data(), src.step(), dst.data(), dst.step(), size, side, mask); };
}

template <bool largest, class T, int channels, class Function>
Row window7(std::string name, Function function, Form form, Best best = {}) {
    const auto make = [=](Size size) {
        Contenders contenders{windowOf<T, channels>(function, size, form, 7), {}, {}};
        if (form == Form::rectangle)
            contenders.plain = plainOf<largest>(Rimmed<T>(size, channels, 3), Image<T>(size, channels), channels, 3);
        return contenders;
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * channels * sizeof(T),
            .sizes = kMorphologySizes,
            .make = make,
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame};
}

/// The peer is the same operation from one image to another.
template <class T, int channels, class Function>
Row window7InPlace(std::string name, Function function, Form form) {
    const auto make = [=](Size size) {
        return Contenders{
            windowOf<T, channels>(function, size, form, 7, true), {}, windowOf<T, channels>(function, size, form, 7)};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * channels * sizeof(T),
            .sizes = kMorphologySizes,
            .make = make,
            .peerName = "not in place"};
}

const Rows windows{{
    window7<false, uint8_t, 1>("erode 7x7 8u C1 (byte mask)", qoriErode_8u_C1R, Form::rectangle, {6'690, 6'950}),
    window7<false, uint8_t, 1>("erode 7x7 8u C1 (rectangle)", qoriFilterMin_8u_C1R, Form::rectangle, {7'690, 7'490}),
    window7<true, uint8_t, 1>("dilate 7x7 8u C1 (rectangle)", qoriFilterMax_8u_C1R, Form::rectangle, {7'516, 7'134}),
    window7<false, uint8_t, 3>("erode 7x7 8u C3 (rectangle)", qoriFilterMin_8u_C3R, Form::rectangle),
    window7<false, uint8_t, 4>("erode 7x7 8u C4 (rectangle)", qoriFilterMin_8u_C4R, Form::rectangle),
    window7<false, uint16_t, 1>("erode 7x7 16u C1 (rectangle)", qoriFilterMin_16u_C1R, Form::rectangle),
    window7<false, float, 1>("erode 7x7 32f C1 (rectangle)", qoriFilterMin_32f_C1R, Form::rectangle),
    window7<false, uint8_t, 1>("erode 7x7 8u C1 (disc)", qoriErode_8u_C1R, Form::disc),
    window7<false, uint8_t, 1>("erode 7x7 8u C1 (cross)", qoriErode_8u_C1R, Form::cross),
    window7InPlace<uint8_t, 1>("erode 7x7 8u C1 (byte mask) in place", qoriErode_8u_C1R, Form::rectangle),
    window7InPlace<uint8_t, 1>("erode 7x7 8u C1 (disc) in place", qoriErode_8u_C1R, Form::disc),
    window7InPlace<float, 3>("erode 7x7 32f C3 (byte mask) in place", qoriErode_32f_C3R, Form::rectangle),
}};

/// Cost against the side of the window; units are pixels.
template <class T, int channels, class Function>
Ladder sideLadder(std::string operation, Function function, Form form, std::string reason = {}) {
    const auto make = [=] {
        std::vector<Step> steps;
        constexpr Size size{1024, 768};
        for (int side : {3, 5, 7, 9, 11, 13, 15, 21, 25, 31, 41, 51, 61})
            steps.push_back({std::to_string(side), static_cast<double>(size.pixels()),
                             windowOf<T, channels>(function, size, form, side)});
        return steps;
    };
    return {std::move(operation), make, std::move(reason)};
}

/// 61 x 7 costs 1.25 to 1.4 of 7 x 7, 7 x 61 1.15 to 1.35, of which the block of 61 rows, beyond the first-level cache.
const std::string kPasses =
    "3 x 3 has kernels of its own; widths of 17 and more are doubled in registers, two rows at a time, by up to four "
    "shifts and five joins a vector more than 7 taps, and blocks of tall windows leave the first-level cache";

const Ladders sides{{
    sideLadder<uint8_t, 1>("minimum filter 8u, side", qoriFilterMin_8u_C1R, Form::rectangle, kPasses),
    sideLadder<uint8_t, 3>("minimum filter 8u C3, side", qoriFilterMin_8u_C3R, Form::rectangle, kPasses),
    sideLadder<float, 1>("minimum filter 32f, side", qoriFilterMin_32f_C1R, Form::rectangle, kPasses),
    sideLadder<uint8_t, 1>("erode by a rectangle 8u, side", qoriErode_8u_C1R, Form::rectangle, kPasses),
    sideLadder<uint8_t, 1>("erode by a cross 8u, side", qoriErode_8u_C1R, Form::cross),
    sideLadder<uint8_t, 1>("erode by a disc 8u, side", qoriErode_8u_C1R, Form::disc, "one or two joins for each row"),
    sideLadder<uint8_t, 1>("erode by noise 8u, side", qoriErode_8u_C1R, Form::noise, "joins for each run of pixels"),
}};

}  // namespace
}  // namespace qori::bench
