// SPDX-License-Identifier: Apache-2.0
// Local binary patterns and descriptors of oriented gradients.
#include <algorithm>

#include "bench.h"

namespace qori::bench {
namespace {

/// Patterns of the eight neighbours at a distance, counter-clockwise from the top-left one.
template <class T, class D>
std::function<void()> plainPatterns(Image<T> src, Image<D> dst, int reach) {
    return [=] {
        static constexpr int dx[] = {-1, -1, -1, 0, 1, 1, 1, 0}, dy[] = {-1, 0, 1, 1, 1, 0, -1, -1};
        for (int y = 0; y < dst.height(); ++y) {
            const int last = dst.height() - 1, end = dst.elements() - 1;
            D* const d = dst.row(y);
            const auto codeAt = [&](int x, auto column) {
                int code = 0;
                const T centre = src.row(y)[x];
                for (int i = 0; i < 8; ++i)
                    code |= (src.row(std::clamp(y + reach * dy[i], 0, last))[column(x + reach * dx[i])] >= centre) << i;
                return static_cast<D>(code);
            };
            const auto clamped = [=](int x) { return std::clamp(x, 0, end); };
            for (int x = 0; x <= end; ++x)
                d[x] = x < reach || x > end - reach ? codeAt(x, clamped) : codeAt(x, [](int at) { return at; });
            keep(d);
        }
    };
}

template <class T, class D, class Function, class... Mode>
Row patterns(std::string name, int reach, double bestAtL2, double bestAtFrame, Function function, Mode... mode) {
    const auto make = [=](Size size) {
        const Image<T> src(size, 1);
        const Image<D> dst(size, 1);
        Contenders contenders{[=] {
                                  must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), mode...,
                                                borderReplicate, T{0}));
                              },
                              {},
                              {}};
        if (reach > 0 && sizeof(D) == 1 && size.width <= kFrame.width) {
            contenders.plain = plainPatterns(src, dst, reach);
            contenders.output = outputOf(dst);
        }
        return contenders;
    };
    return {.operation = std::move(name),
            .bytesPerPixel = double(sizeof(T) + sizeof(D)),
            .sizes = kSizes,
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

/// Beyond the largest cache too.
Row withLarge(Row row) {
    row.sizes.push_back(kContiguous.back());
    return row;
}

const Rows lbp{{
    withLarge(patterns<uint8_t, uint8_t>("LBP 3x3 8u C1", 1, 13'565, 10'948, qoriLBPImage3x3_8u_C1R)),
    patterns<uint8_t, uint8_t>("LBP 3x3 8u C1, mode 3", 0, 0, 0, qoriLBPImageMode3x3_8u_C1R, uint8_t{3}),
    patterns<uint8_t, uint8_t>("LBP 5x5 8u C1", 2, 0, 0, qoriLBPImage5x5_8u_C1R),
    patterns<uint8_t, uint16_t>("LBP 5x5 8u16u C1", 2, 0, 0, qoriLBPImage5x5_8u16u_C1R),
    withLarge(patterns<float, uint8_t>("LBP 3x3 32f8u C1", 1, 0, 0, qoriLBPImage3x3_32f8u_C1R)),
    patterns<float, uint8_t>("LBP 5x5 32f8u C1", 2, 0, 0, qoriLBPImage5x5_32f8u_C1R),
    patterns<float, uint16_t>("LBP 5x5 32f16u C1", 2, 0, 0, qoriLBPImage5x5_32f16u_C1R),
    patterns<uint8_t, uint8_t>("LBP horizontal correction 8u C1", 0, 0, 0, qoriLBPImageHorizCorr_8u_C1R),
    patterns<uint16_t, uint8_t>("LBP horizontal correction 16u C1", 0, 0, 0, qoriLBPImageHorizCorr_16u_C1R),
}};

/// Plan, buffer and destination of persons, 64 x 128, every eight pixels or ten by six of them.
struct Persons {
    std::vector<QorPoint2D> windows;
    Block plan, buffer, descriptors;

    Persons(Size size, bool all, int blockStride = 8) {
        const QorHogConfig config{0, 8, 16, blockStride, 9, 8.0f, 0.2f, {64, 128}};
        const int stepX = all ? 8 : (size.width - 64) / 9, stepY = all ? 8 : (size.height - 128) / 5;
        for (int y = 0; y + 128 <= size.height; y += stepY)
            for (int x = 0; x + 64 <= size.width; x += stepX) windows.push_back({x, y});
        int32_t bytes = 0;
        must(qoriHOGGetSize(&config, &bytes));
        plan = allocate(static_cast<size_t>(bytes));
        must(qoriHOGInit(&config, reinterpret_cast<QorHogPlan*>(plan.get())));
        must(qoriHOGGetBufferSize(record(), size.roi(), &bytes));
        buffer = allocate(static_cast<size_t>(bytes));
        must(qoriHOGGetDescriptorSize(record(), &bytes));
        descriptors = allocate(static_cast<size_t>(bytes) * windows.size());
    }
    const QorHogPlan* record() const { return reinterpret_cast<const QorHogPlan*>(plan.get()); }
    float* destination() const { return reinterpret_cast<float*>(descriptors.get()); }
};

constexpr Size kVideo{640, 480};

template <class T, int channels, class Function>
Row gradients(std::string name, bool all, double best, Function function, int blockStride = 8) {
    const auto make = [=](Size size) {
        const Image<T> src(size, channels);
        const Persons persons(size, all, blockStride);
        return Contenders{[=] {
                              const auto run = [&](auto value) {
                                  must(function(src.data(), src.step(), size.roi(), persons.windows.data(),
                                                static_cast<int32_t>(persons.windows.size()), persons.destination(),
                                                persons.record(), borderReplicate, value, persons.buffer.get()));
                              };
                              if constexpr (channels == 1)
                                  run(T{0});
                              else
                                  run(nullptr);
                          },
                          {},
                          {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = double(channels * sizeof(T)),
            .sizes = {kVideo},
            .make = make,
            .roofline = Roofline::read,
            .best = best};
}

const Rows hog{{
    gradients<uint8_t, 1>("HOG 64x128 windows 8u32f C1, 3285 windows", true, 39, qoriHOG_8u32f_C1R),
    gradients<uint8_t, 3>("HOG 64x128 windows 8u32f C3, 3285 windows", true, 35, qoriHOG_8u32f_C3R),
    gradients<uint8_t, 1>("HOG 64x128 windows 8u32f C1, 60 windows", false, 80, qoriHOG_8u32f_C1R),
    gradients<uint16_t, 1>("HOG 64x128 windows 16u32f C1, 3285 windows", true, 0, qoriHOG_16u32f_C1R),
    gradients<float, 1>("HOG 64x128 windows 32f C1, 3285 windows", true, 0, qoriHOG_32f_C1R),
    gradients<uint8_t, 1>("HOG 64x128 windows, blocks side by side 8u32f C1, 60 windows", false, 0, qoriHOG_8u32f_C1R,
                          16),
}};

/// Windows side by side, over each other or alone; units are windows.
const Ladders windows{{{"HOG 8u C1, windows", [] {
                            std::vector<Step> steps;
                            const Image<uint8_t> src(kVideo, 1);
                            const Persons persons(kVideo, true);
                            for (int n : {1, 2, 4, 8, 16, 32, 44, 45, 64, 128, 256, 512, 1024, 3285})
                                steps.push_back({std::to_string(n), double(n), [=] {
                                                     must(qoriHOG_8u32f_C1R(src.data(), src.step(), kVideo.roi(),
                                                                            persons.windows.data(), n,
                                                                            persons.destination(), persons.record(),
                                                                            borderReplicate, 0, persons.buffer.get()));
                                                 }});
                            return steps;
                        }}}};

}  // namespace
}  // namespace qori::bench
