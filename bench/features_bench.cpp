// SPDX-License-Identifier: Apache-2.0
// Local binary patterns.
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
        if (reach > 0 && sizeof(D) == 1) {
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

const Rows lbp{{
    patterns<uint8_t, uint8_t>("LBP 3x3 8u C1", 1, 13'565, 10'948, qoriLBPImage3x3_8u_C1R),
    patterns<uint8_t, uint8_t>("LBP 3x3 8u C1, mode 3", 0, 0, 0, qoriLBPImageMode3x3_8u_C1R, uint8_t{3}),
    patterns<uint8_t, uint8_t>("LBP 5x5 8u C1", 2, 0, 0, qoriLBPImage5x5_8u_C1R),
    patterns<uint8_t, uint16_t>("LBP 5x5 8u16u C1", 2, 0, 0, qoriLBPImage5x5_8u16u_C1R),
    patterns<float, uint8_t>("LBP 3x3 32f8u C1", 1, 0, 0, qoriLBPImage3x3_32f8u_C1R),
    patterns<float, uint8_t>("LBP 5x5 32f8u C1", 2, 0, 0, qoriLBPImage5x5_32f8u_C1R),
    patterns<float, uint16_t>("LBP 5x5 32f16u C1", 2, 0, 0, qoriLBPImage5x5_32f16u_C1R),
    patterns<uint8_t, uint8_t>("LBP horizontal correction 8u C1", 0, 0, 0, qoriLBPImageHorizCorr_8u_C1R),
    patterns<uint16_t, uint8_t>("LBP horizontal correction 16u C1", 0, 0, 0, qoriLBPImageHorizCorr_16u_C1R),
}};

}  // namespace
}  // namespace qori::bench
