// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "unary_row.h"

namespace qori::bench {
namespace {

/// Functors, so that the plain loops see through them.
template <int threshold>
struct ClipAbove {
    template <class T>
    T operator()(T x) const {
        return x > threshold ? static_cast<T>(threshold) : x;
    }
};
template <int threshold, int value>
struct ReplaceAbove {
    template <class T>
    T operator()(T x) const {
        return x > threshold ? static_cast<T>(value) : x;
    }
};
struct ReplaceOutside {
    template <class T>
    T operator()(T x) const {
        return x < 50 ? static_cast<T>(0) : x > 200 ? static_cast<T>(255) : x;
    }
};

Row withSmall(Row row) {
    row.sizes.push_back(kSmall);
    return row;
}

/// A row of an export whose parameters follow the size.
template <class T, class Plain, class Function, class... Parameters>
Row threshold(std::string name, int channels, double bestAtL2, double bestAtFrame, Function function,
              Parameters... parameters) {
    return withSmall(unaryRow<T, T>(
        std::move(name), channels, [=](auto... a) { return function(a..., parameters...); }, Plain{}, bestAtL2,
        bestAtFrame));
}

constexpr uint8_t kLow8[4] = {50, 50, 50, 50}, kHigh8[4] = {200, 200, 200, 200}, kBlack8[4] = {},
                  kWhite8[4] = {255, 255, 255, 255};
constexpr uint16_t kHigh16[4] = {200, 200, 200, 200}, kBlack16[4] = {};

Row otsuRow() {
    const auto make = [](Size size) {
        const Image<uint8_t> src(size, 1);
        return Contenders{[=] {
                              uint8_t level;
                              must(qoriComputeThreshold_Otsu_8u_C1R(src.data(), src.step(), size.roi(), &level));
                              keep(&level);
                          },
                          [=] {
                              uint32_t counts[256] = {};
                              for (int y = 0; y < size.height; ++y)
                                  for (int x = 0; x < size.width; ++x) ++counts[src.row(y)[x]];
                              double below = 0, moment = 0, all = 0, most = -1, best = 0;
                              for (int i = 0; i < 256; ++i) all += double(i) * counts[i];
                              for (int i = 0; i < 256; ++i) {
                                  below += counts[i];
                                  moment += double(i) * counts[i];
                                  const double above = double(size.width) * size.height - below;
                                  if (below == 0 || above == 0) continue;
                                  const double difference = moment / below - (all - moment) / above;
                                  const double variance = below * above * difference * difference;
                                  if (variance > most) most = variance, best = i;
                              }
                              keep(&best);
                          },
                          {}};
    };
    return {.operation = "Otsu threshold 8u C1",
            .bytesPerPixel = 1,
            .sizes = kSizes,
            .make = make,
            .roofline = Roofline::read,
            .bestAtL2 = 3'150,
            .bestAtFrame = 3'081};
}

using Above = ClipAbove<200>;
using AboveToBlack = ReplaceAbove<200, 0>;

const Rows rows{{
    threshold<uint8_t, Above>("threshold GT 8u C1", 1, 45'035, 14'619, qoriThreshold_GT_8u_C1R, uint8_t{200}),
    threshold<uint8_t, Above>("threshold GT 8u C3", 3, 0, 0, qoriThreshold_GT_8u_C3R, kHigh8),
    threshold<uint8_t, AboveToBlack>("threshold GTVal 8u C1", 1, 44'630, 14'871, qoriThreshold_GTVal_8u_C1R,
                                     uint8_t{200}, uint8_t{0}),
    threshold<uint8_t, AboveToBlack>("threshold GTVal 8u C3", 3, 0, 0, qoriThreshold_GTVal_8u_C3R, kHigh8, kBlack8),
    threshold<uint8_t, AboveToBlack>("threshold GTVal 8u C4", 4, 0, 0, qoriThreshold_GTVal_8u_C4R, kHigh8, kBlack8),
    threshold<uint8_t, AboveToBlack>("threshold GTVal 8u AC4", 4, 0, 0, qoriThreshold_GTVal_8u_AC4R, kHigh8, kBlack8),
    threshold<uint8_t, ReplaceOutside>("threshold LTValGTVal 8u C1", 1, 0, 0, qoriThreshold_LTValGTVal_8u_C1R,
                                       uint8_t{50}, uint8_t{0}, uint8_t{200}, uint8_t{255}),
    threshold<uint8_t, ReplaceOutside>("threshold LTValGTVal 8u C3", 3, 0, 0, qoriThreshold_LTValGTVal_8u_C3R, kLow8,
                                       kBlack8, kHigh8, kWhite8),
    threshold<uint16_t, Above>("threshold GT 16u C1", 1, 0, 0, qoriThreshold_GT_16u_C1R, uint16_t{200}),
    threshold<uint16_t, AboveToBlack>("threshold GTVal 16u AC4", 4, 0, 0, qoriThreshold_GTVal_16u_AC4R, kHigh16,
                                      kBlack16),
    threshold<int16_t, AboveToBlack>("threshold GTVal 16s C1", 1, 0, 0, qoriThreshold_GTVal_16s_C1R, int16_t{200},
                                     int16_t{0}),
    threshold<float, Above>("threshold GT 32f C1", 1, 0, 0, qoriThreshold_GT_32f_C1R, 200.f),
    threshold<float, AboveToBlack>("threshold GTVal 32f C1", 1, 0, 0, qoriThreshold_GTVal_32f_C1R, 200.f, 0.f),
    otsuRow(),
}};

}  // namespace
}  // namespace qori::bench
