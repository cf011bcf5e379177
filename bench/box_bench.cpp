// SPDX-License-Identifier: Apache-2.0
// Box and Gauss filters, window sums and adaptive thresholds; the source has the pixels around the region.
#include "bench.h"

namespace qori::bench {
namespace {

constexpr int kRim = 32;

/// Room around the region, which itself begins on a 64-byte boundary.
template <class T>
class Rimmed {
public:
    Rimmed(Size size, int channels)
        : left_(64 * kRim),
          image_({size.width + 2 * left_ / channels / static_cast<int>(sizeof(T)) + 1, size.height + 2 * kRim},
                 channels) {}
    T* data() const { return row(0); }
    T* row(int y) const { return image_.row(y + kRim) + left_ / static_cast<int>(sizeof(T)); }
    int32_t step() const { return image_.step(); }

private:
    int left_;
    Image<T> image_;
};

struct Best {
    double atL2 = 0, atFrame = 0;
};

const std::vector<Size> kFilterSizes = {kL1, kL2, kFrame, kNarrow};

template <class T>
std::function<void()> plainBox(Rimmed<T> src, Image<T> dst, int channels, int side) {
    return [=] {
        for (int y = 0; y < dst.height(); ++y) {
            T* d = dst.row(y);
            for (int x = 0; x < dst.elements(); ++x) {
                std::conditional_t<std::is_same_v<T, float>, float, unsigned> sum = 0;
                for (int j = -side / 2; j <= side / 2; ++j)
                    for (int i = -side / 2; i <= side / 2; ++i) sum += src.row(y + j)[x + i * channels];
                d[x] = static_cast<T>(sum / static_cast<decltype(sum)>(side * side));
            }
            keep(d);
        }
    };
}

template <class T>
Row rowOf(std::string name, int channels, Best best, std::function<Contenders(Size)> make, std::string peer = {}) {
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * channels * sizeof(T),
            .sizes = kFilterSizes,
            .make = std::move(make),
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame,
            .peerName = std::move(peer)};
}

template <class T, int channels, class Function>
Row box(std::string name, Function function, int side, Best best = {}) {
    return rowOf<T>(std::move(name), channels, best, [=](Size size) {
        const Rimmed<T> src(size, channels);
        const Image<T> dst(size, channels);
        return Contenders{[=] {
                              must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), {side, side},
                                            {side / 2, side / 2}));
                          },
                          side <= 3 ? plainBox<T>(src, dst, channels, side) : std::function<void()>{},
                          {}};
    });
}

/// The peer is the same operation from one image to another.
template <class T, int channels, class Function, class Apart>
Row inPlace(std::string name, Function function, Apart apart, int side) {
    return rowOf<T>(
        std::move(name), channels, {},
        [=](Size size) {
            const Rimmed<T> image(size, channels), src(size, channels);
            const Image<T> dst(size, channels);
            const QorImageSize mask{side, side};
            const QorPoint2D anchor{side / 2, side / 2};
            return Contenders{[=] { must(function(image.data(), image.step(), size.roi(), mask, anchor)); },
                              {},
                              [=] { apart(src.data(), src.step(), dst.data(), dst.step(), size.roi(), mask, anchor); }};
        },
        "not in place");
}

template <class T, int channels, class Function>
Row bordered(std::string name, Function function, int side) {
    return rowOf<T>(std::move(name), channels, {}, [=](Size size) {
        const Image<T> src(size, channels), dst(size, channels);
        int32_t bytes = 0;
        must(qoriFilterBoxBorderGetBufferSize(size.roi(), {side, side}, 1, channels, &bytes));
        const Block buffer = allocate(static_cast<size_t>(bytes));
        return Contenders{[=] {
                              must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), {side, side},
                                            borderReplicate, nullptr, buffer.get()));
                          },
                          {},
                          {}};
    });
}

template <class T, int channels, class Function>
Row gauss(std::string name, Function function, int32_t mask, Best best = {}) {
    return rowOf<T>(std::move(name), channels, best, [=](Size size) {
        const Rimmed<T> src(size, channels);
        const Image<T> dst(size, channels);
        return Contenders{
            [=] { must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), mask)); }, {}, {}};
    });
}

Contenders adaptiveBox(Size size) {
    const Image<uint8_t> src(size, 1), dst(size, 1);
    const QorImageSize mask{15, 15};
    int32_t bytes = 0;
    must(qoriThresholdAdaptiveBoxGetBufferSize(size.roi(), mask, 1, 1, &bytes));
    const Block buffer = allocate(static_cast<size_t>(bytes));
    return {[=] {
                must(qoriThresholdAdaptiveBox_8u_C1R(src.data(), src.step(), dst.data(), dst.step(), size.roi(), mask,
                                                     10, 255, 0, borderReplicate, 0, buffer.get()));
            },
            {},
            {}};
}

Contenders adaptiveGauss(Size size) {
    const Image<uint8_t> src(size, 1), dst(size, 1);
    const QorImageSize mask{15, 15};
    int32_t bytes = 0, specBytes = 0;
    must(qoriThresholdAdaptiveGaussGetBufferSize(size.roi(), mask, 1, 1, &specBytes, &bytes));
    const Block buffer = allocate(static_cast<size_t>(bytes)), record = allocate(static_cast<size_t>(specBytes));
    auto* const spec = reinterpret_cast<QorAdaptiveGaussSpec*>(record.get());
    must(qoriThresholdAdaptiveGaussInit(size.roi(), mask, 1, 1, 0, spec));
    return {[=, kept = record] {
                must(qoriThresholdAdaptiveGauss_8u_C1R(src.data(), src.step(), dst.data(), dst.step(), size.roi(), 10,
                                                       255, 0, borderReplicate, 0, spec, buffer.get()));
                keep(kept.get());
            },
            {},
            {}};
}

const Rows rows{{
    box<uint8_t, 1>("box 3x3 8u C1", qoriFilterBox_8u_C1R, 3, {14'230, 10'764}),
    box<uint8_t, 3>("box 3x3 8u C3", qoriFilterBox_8u_C3R, 3),
    box<uint8_t, 4>("box 3x3 8u C4", qoriFilterBox_8u_C4R, 3),
    box<float, 1>("box 3x3 32f C1", qoriFilterBox_32f_C1R, 3, {883, 692}),
    box<uint8_t, 1>("box 5x5 8u C1", qoriFilterBox_8u_C1R, 5, {1'292, 1'320}),
    box<float, 1>("box 5x5 32f C1", qoriFilterBox_32f_C1R, 5, {705, 581}),
    box<uint8_t, 1>("box 15x15 8u C1", qoriFilterBox_8u_C1R, 15, {1'942, 1'878}),
    box<uint8_t, 3>("box 15x15 8u C3", qoriFilterBox_8u_C3R, 15),
    box<uint8_t, 4>("box 15x15 8u C4", qoriFilterBox_8u_C4R, 15),
    box<uint16_t, 1>("box 15x15 16u C1", qoriFilterBox_16u_C1R, 15),
    box<uint16_t, 3>("box 15x15 16u C3", qoriFilterBox_16u_C3R, 15),
    box<float, 1>("box 15x15 32f C1", qoriFilterBox_32f_C1R, 15, {826, 690}),
    box<float, 3>("box 15x15 32f C3", qoriFilterBox_32f_C3R, 15),
    box<uint8_t, 1>("box 31x31 8u C1", qoriFilterBox_8u_C1R, 31, {1'629, 1'692}),
    box<float, 1>("box 31x31 32f C1", qoriFilterBox_32f_C1R, 31, {798, 715}),
    inPlace<uint8_t, 1>("box 3x3 8u C1 in place", qoriFilterBox_8u_C1IR, qoriFilterBox_8u_C1R, 3),
    inPlace<uint8_t, 1>("box 15x15 8u C1 in place", qoriFilterBox_8u_C1IR, qoriFilterBox_8u_C1R, 15),
    inPlace<uint16_t, 1>("box 15x15 16u C1 in place", qoriFilterBox_16u_C1IR, qoriFilterBox_16u_C1R, 15),
    inPlace<float, 1>("box 15x15 32f C1 in place", qoriFilterBox_32f_C1IR, qoriFilterBox_32f_C1R, 15),
    bordered<uint8_t, 1>("box 15x15 border 8u C1", qoriFilterBoxBorder_8u_C1R, 15),
    bordered<uint8_t, 1>("box 3x3 border 8u C1", qoriFilterBoxBorder_8u_C1R, 3),
    gauss<uint8_t, 1>("gauss 3x3 8u C1", qoriFilterGauss_8u_C1R, mask3x3, {14'988, 9'771}),
    gauss<uint8_t, 3>("gauss 3x3 8u C3", qoriFilterGauss_8u_C3R, mask3x3, {4'836, 2'665}),
    gauss<uint8_t, 4>("gauss 3x3 8u C4", qoriFilterGauss_8u_C4R, mask3x3),
    gauss<uint16_t, 1>("gauss 3x3 16u C1", qoriFilterGauss_16u_C1R, mask3x3),
    gauss<float, 1>("gauss 3x3 32f C1", qoriFilterGauss_32f_C1R, mask3x3),
    gauss<uint8_t, 1>("gauss 5x5 8u C1", qoriFilterGauss_8u_C1R, mask5x5, {3'093, 2'815}),
    gauss<uint8_t, 3>("gauss 5x5 8u C3", qoriFilterGauss_8u_C3R, mask5x5, {1'152, 851}),
    gauss<uint8_t, 4>("gauss 5x5 8u C4", qoriFilterGauss_8u_C4R, mask5x5),
    gauss<float, 1>("gauss 5x5 32f C1", qoriFilterGauss_32f_C1R, mask5x5),
    rowOf<uint8_t>("adaptive threshold box 15x15 8u C1", 1, {1'044, 1'022}, adaptiveBox),
    rowOf<uint8_t>("adaptive threshold gauss 15x15 8u C1", 1, {482, 444}, adaptiveGauss),
}};

template <class T, int channels, class Function>
Ladder masks(std::string name, Function function, std::string reason = "3 x 3 bytes have a kernel of their own") {
    return {std::move(name),
            [=] {
                const Size size{1920, 1080};
                const Rimmed<T> src(size, channels);
                const Image<T> dst(size, channels);
                std::vector<Step> steps;
                for (int side = 3; side <= 61; side += 2)
                    steps.push_back({std::to_string(side), double(size.pixels()), [=] {
                                         must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(),
                                                       {side, side}, {side / 2, side / 2}));
                                     }});
                return steps;
            },
            std::move(reason)};
}

const Ladders ladders{
    {masks<uint8_t, 1>("box 8u C1, side of the mask", qoriFilterBox_8u_C1R),
     masks<uint8_t, 3>("box 8u C3, side of the mask", qoriFilterBox_8u_C3R),
     masks<uint8_t, 4>("box 8u C4, side of the mask", qoriFilterBox_8u_C4R),
     masks<uint16_t, 1>("box 16u C1, side of the mask", qoriFilterBox_16u_C1R),
     masks<float, 1>("box 32f C1, side of the mask", qoriFilterBox_32f_C1R,
                     "wide windows are added up in passes of up to 8 terms, in an order that the "
                     "bound of the error holds to: 14 loads and 2 stores per vector for 61 columns, half of "
                     "them across lines, where 7 take 7 behind the divisions. 61 x 61 costs 1.53 of 7 x 7")}};

}  // namespace
}  // namespace qori::bench
