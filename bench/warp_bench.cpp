// SPDX-License-Identifier: Apache-2.0
// Affine warps about the middle of the image; plans and buffers are made outside the timing. What lies outside the
// source is the border value. Turns by 0 degrees and multiples of 90 move pixels, whatever the interpolation: those
// rows are shifted by a fraction, so that it does its work.
#include <cmath>
#include <numbers>

#include "bench.h"

namespace qori::bench {
namespace {

template <class T, int channels>
struct WarpExports;
#define QORI_EXPORTS(T, t, n)                                                \
    template <>                                                              \
    struct WarpExports<T, n> {                                               \
        static constexpr int32_t type = qor##t;                              \
        static constexpr const char* name = #t " C" #n;                      \
        static constexpr auto nearest = qoriWarpAffineNearest_##t##_C##n##R; \
        static constexpr auto linear = qoriWarpAffineLinear_##t##_C##n##R;   \
        static constexpr auto cubic = qoriWarpAffineCubic_##t##_C##n##R;     \
    };
QORI_EXPORTS(uint8_t, 8u, 1)
QORI_EXPORTS(uint8_t, 8u, 3)
QORI_EXPORTS(uint8_t, 8u, 4)
QORI_EXPORTS(uint16_t, 16u, 1)
QORI_EXPORTS(uint16_t, 16u, 3)
QORI_EXPORTS(float, 32f, 1)
QORI_EXPORTS(float, 32f, 3)
QORI_EXPORTS(double, 64f, 1)
#undef QORI_EXPORTS

struct Map {
    const char* name;
    double degrees, scale = 1, shear = 0;
};

constexpr Size kSize{1920, 1080};

template <class T, int channels>
std::function<void()> warpJob(QorInterpolationKind kind, Map map, int32_t border, Image<T> src, Image<T> dst) {
    using E = WarpExports<T, channels>;
    const double angle = map.degrees * std::numbers::pi / 180, c = map.scale * std::cos(angle),
                 s = map.scale * std::sin(angle), x = (kSize.width - 1) / 2.0, y = (kSize.height - 1) / 2.0;
    const double a[6] = {c, c * map.shear - s, x - c * x - (c * map.shear - s) * y + 0.3,
                         s, s * map.shear + c, y - s * x - (s * map.shear + c) * y + 0.4};
    const double value[4] = {};
    int32_t planBytes, initBytes, bufferBytes;
    must(qoriWarpAffineGetSize(kSize.roi(), kSize.roi(), E::type, a, kind, 0, border, &planBytes, &initBytes));
    const Block memory = allocate(static_cast<size_t>(planBytes)), init = allocate(static_cast<size_t>(initBytes) + 1);
    auto* plan = reinterpret_cast<QorWarpPlan*>(memory.get());
    const auto common = [&](auto function, auto... more) {
        must(function(kSize.roi(), kSize.roi(), E::type, a, 0, channels, more...));
    };
    if (kind == interpCubic)
        common(qoriWarpAffineCubicInit, 0.0, 0.5, border, value, 0, plan, init.get());
    else
        common(kind == interpLinear ? qoriWarpAffineLinearInit : qoriWarpAffineNearestInit, border, value, 0, plan);
    must(qoriWarpGetBufferSize(plan, kSize.roi(), &bufferBytes));
    const Block buffer = allocate(static_cast<size_t>(bufferBytes));
    const auto function = kind == interpNearest ? E::nearest : kind == interpLinear ? E::linear : E::cubic;
    return [=] {
        must(function(src.data(), src.step(), dst.data(), dst.step(), {0, 0}, kSize.roi(),
                      reinterpret_cast<QorWarpPlan*>(memory.get()), buffer.get()));
    };
}

const char* nameOf(QorInterpolationKind kind) {
    return kind == interpNearest ? "nearest" : kind == interpLinear ? "linear" : "cubic";
}

template <class T, int channels>
Row row(QorInterpolationKind kind, Map map, double best = 0, int32_t border = borderConstant) {
    const auto make = [=](Size) {
        return Contenders{
            warpJob<T, channels>(kind, map, border, Image<T>(kSize, channels), Image<T>(kSize, channels)), {}, {}};
    };
    return {.operation = std::string("warp ") + nameOf(kind) + " " + map.name +
                         (border == borderReplicate ? " replicate " : " ") + WarpExports<T, channels>::name,
            .bytesPerPixel = 2 * channels * sizeof(T),
            .sizes = {kSize},
            .make = make,
            .best = best};
}

constexpr Map kTilted{"15 degrees", 15}, kHalved{"scale 0.5", 0, 0.5};
constexpr Map kMaps[] = {{"0 degrees", 0},        {"45 degrees", 45}, {"90 degrees", 90},
                         {"180 degrees", 180},    {"scale 2", 0, 2},  kHalved,
                         {"shear 0.3", 0, 1, 0.3}};

std::vector<Row> warpRows(QorInterpolationKind kind, double bestGray, double bestColour) {
    std::vector<Row> rows = {row<uint8_t, 1>(kind, kTilted, bestGray), row<uint8_t, 3>(kind, kTilted, bestColour)};
    for (const Map& map : kMaps) {
        rows.push_back(row<uint8_t, 1>(kind, map));
        rows.push_back(row<uint8_t, 3>(kind, map));
    }
    rows.push_back(row<uint8_t, 1>(kind, kTilted, 0, borderReplicate));
    rows.push_back(row<uint8_t, 3>(kind, kTilted, 0, borderReplicate));
    // Three quarters of the destination lie outside.
    rows.push_back(row<uint8_t, 1>(kind, kHalved, 0, borderReplicate));
    rows.push_back(row<uint8_t, 3>(kind, kHalved, 0, borderReplicate));
    rows.push_back(row<uint8_t, 4>(kind, kTilted));
    rows.push_back(row<uint16_t, 1>(kind, kTilted));
    rows.push_back(row<uint16_t, 3>(kind, kTilted));
    rows.push_back(row<float, 1>(kind, kTilted));
    rows.push_back(row<float, 3>(kind, kTilted));
    rows.push_back(row<double, 1>(kind, kTilted));
    return rows;
}

const Rows nearest{warpRows(interpNearest, 1'761, 1'423)}, linear{warpRows(interpLinear, 1'082, 691)},
    cubic{warpRows(interpCubic, 135, 55)};

}  // namespace
}  // namespace qori::bench
