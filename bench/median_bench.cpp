// SPDX-License-Identifier: Apache-2.0
// Medians; the source has the pixels around the region.
#include <algorithm>

#include "bench.h"

namespace qori::bench {
namespace {

/// Noise over the whole range of the type, and room around the region, which begins on a 64-byte boundary.
template <class T>
class Noise {
public:
    Noise(Size size, int channels, int reach)
        : reach_(reach), left_(64 * channels), image_({size.width + 128, size.height + 2 * reach}, channels) {
        uint32_t state = 7;
        for (int y = 0; y < size.height + 2 * reach; ++y)
            for (int i = 0; i < image_.elements(); ++i) {
                state = state * 1664525u + 1013904223u;
                image_.row(y)[i] = static_cast<T>(sizeof(T) == 1   ? state >> 24
                                                  : sizeof(T) == 2 ? state >> 16
                                                                   : state >> 8);
            }
    }
    const T* data() const { return row(0); }
    const T* row(int y) const { return image_.row(y + reach_) + left_; }
    int32_t step() const { return image_.step(); }

private:
    int reach_, left_;
    Image<T> image_;
};

/// Selection as the standard library does it.
template <class T>
std::function<void()> plainOf(Noise<T> src, Image<T> dst, int channels, QorImageSize mask) {
    return [=] {
        std::vector<T> seen(static_cast<size_t>(mask.width * mask.height));
        for (int y = 0; y < dst.height(); ++y)
            for (int x = 0; x < dst.elements(); ++x) {
                auto to = seen.begin();
                for (int j = -(mask.height / 2); j <= mask.height / 2; ++j)
                    for (int i = -(mask.width / 2); i <= mask.width / 2; ++i) *to++ = src.row(y + j)[x + i * channels];
                const auto middle = seen.begin() + mask.width * mask.height / 2;
                std::nth_element(seen.begin(), middle, seen.end());
                dst.row(y)[x] = *middle;
            }
        keep(dst.data());
    };
}

struct Best {
    double atL2 = 0, atFrame = 0, own = 0;
};

template <class T, int channels, class Function>
Row rectangle(std::string name, Function function, int side, Best best = {},
              std::vector<Size> sizes = {kL1, kL2, kFrame, kNarrow}) {
    const QorImageSize mask{side, side};
    const auto make = [=](Size size) {
        const Noise<T> src(size, channels, side / 2);
        const Image<T> dst(size, channels);
        return Contenders{[=] {
                              must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), mask,
                                            QorPoint2D{side / 2, side / 2}));
                          },
                          size.pixels() * side * side > 9 * kL2.pixels() ? std::function<void()>{}
                                                                         : plainOf(src, dst, channels, mask),
                          {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * channels * sizeof(T),
            .sizes = std::move(sizes),
            .make = make,
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame,
            .best = best.own};
}

/// The peer reads its neighbours from memory.
template <class T, class Function, class Apart>
Row bordered(std::string name, Function function, Apart apart, int side, int32_t dataType, bool inPlace) {
    const QorImageSize mask{side, side};
    const auto make = [=](Size size) {
        const Noise<T> src(size, 1, side / 2);
        const Image<T> dst(size, 1), image(size, 1);
        int32_t bytes = 0;
        must(qoriFilterMedianBorderGetBufferSize(size.roi(), mask, dataType, 1, &bytes));
        const Block buffer = allocate(static_cast<size_t>(bytes));
        return Contenders{
            [=] {
                must(function(inPlace ? dst.data() : image.data(), dst.step(), dst.data(), dst.step(), size.roi(), mask,
                              borderReplicate, T{}, buffer.get()));
            },
            {},
            [=] {
                apart(src.data(), src.step(), dst.data(), dst.step(), size.roi(), mask, QorPoint2D{side / 2, side / 2});
            }};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * sizeof(T),
            .sizes = {kL1, kL2, kFrame},
            .make = make,
            .peerName = "without border"};
}

template <class T, int channels, class Function>
Row shape(std::string name, Function function, int32_t code) {
    const auto make = [=](Size size) {
        const Noise<T> src(size, channels, 2);
        const Image<T> dst(size, channels);
        return Contenders{
            [=] { must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), code)); }, {}, {}};
    };
    return {.operation = std::move(name), .bytesPerPixel = 2.0 * channels * sizeof(T), .sizes = {kL2}, .make = make};
}

// Best rates: 8u 15x15 is meant to be five times its row, 40 and 37; 16u reaches 100 and 32f half of that.
const Rows rows{{
    rectangle<uint8_t, 1>("median 3x3 8u C1", qoriFilterMedian_8u_C1R, 3, {7'598, 6'518}),
    rectangle<uint8_t, 1>("median 5x5 8u C1", qoriFilterMedian_8u_C1R, 5, {2'398, 2'374}),
    rectangle<uint8_t, 1>("median 15x15 8u C1", qoriFilterMedian_8u_C1R, 15, {200, 185}, {kL2, kFrame}),
    rectangle<uint16_t, 1>("median 15x15 16u C1", qoriFilterMedian_16u_C1R, 15, {100, 100}, {kL2, kFrame}),
    rectangle<float, 1>("median 15x15 32f C1", qoriFilterMedian_32f_C1R, 15, {50, 50}, {kL2, kFrame}),
    rectangle<double, 1>("median 15x15 64f C1", qoriFilterMedian_64f_C1R, 15, {}, {kL2}),
    rectangle<uint8_t, 3>("median 3x3 8u C3", qoriFilterMedian_8u_C3R, 3),
    rectangle<uint8_t, 3>("median 15x15 8u C3", qoriFilterMedian_8u_C3R, 15, {}, {kL2}),
    rectangle<uint16_t, 1>("median 3x3 16u C1", qoriFilterMedian_16u_C1R, 3),
    rectangle<uint16_t, 1>("median 5x5 16u C1", qoriFilterMedian_16u_C1R, 5),
    rectangle<float, 1>("median 3x3 32f C1", qoriFilterMedian_32f_C1R, 3),
    rectangle<float, 1>("median 5x5 32f C1", qoriFilterMedian_32f_C1R, 5),
    rectangle<double, 1>("median 3x3 64f C1", qoriFilterMedian_64f_C1R, 3),
    bordered<uint8_t>("median border 3x3 8u C1", qoriFilterMedianBorder_8u_C1R, qoriFilterMedian_8u_C1R, 3, qor8u,
                      false),
    bordered<uint8_t>("median border 3x3 8u C1 in place", qoriFilterMedianBorder_8u_C1R, qoriFilterMedian_8u_C1R, 3,
                      qor8u, true),
    bordered<uint8_t>("median border 5x5 8u C1 in place", qoriFilterMedianBorder_8u_C1R, qoriFilterMedian_8u_C1R, 5,
                      qor8u, true),
    bordered<uint8_t>("median border 15x15 8u C1 in place", qoriFilterMedianBorder_8u_C1R, qoriFilterMedian_8u_C1R, 15,
                      qor8u, true),
    shape<uint8_t, 1>("median cross 5x5 8u C1", qoriFilterMedianCross_8u_C1R, mask5x5),
    shape<uint8_t, 1>("median horizontal 5 8u C1", qoriFilterMedianHoriz_8u_C1R, mask5x1),
    shape<uint8_t, 3>("median colour 3x3 8u C3", qoriFilterMedianColor_8u_C3R, mask3x3),
    shape<float, 3>("median colour 5x5 32f C3", qoriFilterMedianColor_32f_C3R, mask5x5),
}};

/// Cost per pixel by the side of the mask.
template <class T, class Function>
Ladder sides(const char* operation, Function function, double power) {
    return {
        operation,
        [=] {
            std::vector<Step> steps;
            for (int side : {3, 5, 7, 9, 11, 13, 15, 17, 21, 25, 31, 37, 43, 49, 55, 61}) {
                const Size size{512, 512};
                const Noise<T> src(size, 1, side / 2);
                const Image<T> dst(size, 1);
                steps.push_back({std::to_string(side), power == 0 ? 1.0 : double(side), [=] {
                                     must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(),
                                                   QorImageSize{side, side}, QorPoint2D{side / 2, side / 2}));
                                 }});
            }
            return steps;
        },
        "3 x 3 and 5 x 5 are networks, up to 15 x 15 tiles of pixels whose cost grows with the mask, above counts of "
        "columns"};
}

/// What a row's medians are like decides how those of large masks are counted.
Ladder contents(int side) {
    const auto make = [side](const char* name, auto value) -> Step {
        const Size size{512, 512};
        const Image<uint8_t> src({size.width + side, size.height + side}, 1), dst(size, 1);
        for (int y = 0; y < src.height(); ++y)
            for (int x = 0; x < src.elements(); ++x) src.row(y)[x] = static_cast<uint8_t>(value(x, y));
        return {name, 1.0, [=] {
                    must(qoriFilterMedian_8u_C1R(src.data(), src.step(), dst.data(), dst.step(), size.roi(),
                                                 {side, side}, {0, 0}));
                }};
    };
    return {"median 8u " + std::to_string(side) + "x" + std::to_string(side) + ", flat to steep images",
            [=] {
                return std::vector<Step>{make("flat", [](int, int) { return 77; }),
                                         make("gentle slope", [](int x, int y) { return 60 + (x + y) / 16; }),
                                         make("chequers", [](int x, int y) { return (x / 90 + y / 70) % 2 * 170; }),
                                         make("steep slope", [](int x, int y) { return x + y / 2; })};
            },
            "rows whose medians take more than 32 values need whole histograms"};
}

const Ladders ladders{{sides<uint8_t>("median 8u, mask side", qoriFilterMedian_8u_C1R, 0),
                       sides<uint16_t>("median 16u, mask side", qoriFilterMedian_16u_C1R, 1),
                       sides<float>("median 32f, mask side", qoriFilterMedian_32f_C1R, 1), contents(17), contents(61)}};

}  // namespace
}  // namespace qori::bench
