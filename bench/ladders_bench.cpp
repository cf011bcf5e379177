// SPDX-License-Identifier: Apache-2.0
// Ladders: each operation over a range of sizes, ratios, kernels, level counts and tile heights, to find steps in its
// cost. QORI_BENCH_STEPS=1 prints every step.
#include <algorithm>
#include <cmath>
#include <limits>

#include "resize_job.h"

namespace qori::bench {
namespace {

template <class T>
std::vector<T> range(T from, T to, T by) {
    std::vector<T> values;
    for (T value = from; value <= to; value += by) values.push_back(value);
    return values;
}

/// One step per value of a parameter; job(value) gives the units and the work.
struct Job {
    double units;
    std::function<void()> work;
};

template <class Make>
Ladder ladder(std::string operation, std::vector<int> values, Make job, std::string reason = {}) {
    return {std::move(operation),
            [=] {
                std::vector<Step> steps;
                for (int value : values) {
                    Job made = job(value);
                    steps.push_back({std::to_string(value), made.units, std::move(made.work)});
                }
                return steps;
            },
            std::move(reason)};
}

// --- sizes ----------------------------------------------------------------------------------------------------------

/// Narrow regions, and all squares, inside padded rows.
constexpr int kNarrowRows = 1024;
const std::vector<int> kWidths = range(1, 40, 1);
const std::vector<int> kSquares = {1,  2,   3,   4,   6,   8,   11,  16,   23,   32,   45,   64,
                                   91, 128, 181, 256, 362, 512, 724, 1024, 1448, 2048, 2896, 4096};

/// function(sources, dst, roi) over images of n channels.
template <class S, class D, int n, int sources, class Call>
auto overRegions(bool squares, Call call) {
    return [=](int width) -> Job {
        const Size size{width, squares ? width : kNarrowRows}, whole{squares ? width + 32 : 64, size.height};
        std::vector<Image<S>> src;
        for (int i = 0; i < sources; ++i) src.push_back(Image<S>(whole, n));
        const Image<D> dst(whole, n);
        return {static_cast<double>(size.pixels()), [=] { call(src, dst, size.roi()); }};
    };
}

template <class S, class D, int n, int sources, class Call>
std::vector<Ladder> widthsAndSquares(const std::string& operation, Call call) {
    return {ladder(operation + ", widths", kWidths, overRegions<S, D, n, sources>(false, call),
                   "rows of less than a vector, or of 64 bytes, are worked on together"),
            ladder(operation + ", squares", kSquares, overRegions<S, D, n, sources>(true, call), "beyond a cache")};
}

template <class Function, class... Rest>
auto unary(Function function, Rest... rest) {
    return [=](const auto& src, const auto& dst, QorImageSize roi) {
        must(function(src[0].data(), src[0].step(), dst.data(), dst.step(), roi, rest...));
    };
}
template <class Function, class... Rest>
auto binary(Function function, Rest... rest) {
    return [=](const auto& src, const auto& dst, QorImageSize roi) {
        must(
            function(src[0].data(), src[0].step(), src[1].data(), src[1].step(), dst.data(), dst.step(), roi, rest...));
    };
}
template <class Function, class... Rest>
auto reduction(Function function, Rest... rest) {
    return [=](const auto& src, const auto&, QorImageSize roi) {
        double result[4];
        must(function(src[0].data(), src[0].step(), roi, result, rest...));
        keep(result);
    };
}

const Ladders copies8u{widthsAndSquares<uint8_t, uint8_t, 1, 1>("copy 8u C1", unary(qoriCopy_8u_C1R))};
const Ladders copies8uC3{widthsAndSquares<uint8_t, uint8_t, 3, 1>("copy 8u C3", unary(qoriCopy_8u_C3R))};
const Ladders masked{widthsAndSquares<uint8_t, uint8_t, 1, 2>(
    "copy masked 8u C1", [](const auto& src, const auto& dst, QorImageSize roi) {
        must(qoriCopy_8u_C1MR(src[0].data(), src[0].step(), dst.data(), dst.step(), roi, src[1].data(), src[1].step()));
    })};
const Ladders adds8u{widthsAndSquares<uint8_t, uint8_t, 1, 2>("add 8u C1", binary(qoriAdd_8u_C1RSfs, 0))};
const Ladders adds32f{widthsAndSquares<float, float, 1, 2>("add 32f C1", binary(qoriAdd_32f_C1R))};
const Ladders logarithms{widthsAndSquares<float, float, 1, 1>("ln 32f C1", unary(qoriLn_32f_C1R))};
const Ladders widening{widthsAndSquares<uint8_t, float, 1, 1>("convert 8u32f C1", unary(qoriConvert_8u32f_C1R))};
const Ladders sums{widthsAndSquares<uint8_t, uint8_t, 1, 1>("sum 8u C1", reduction(qoriSum_8u_C1R))};
const Ladders euclidean{widthsAndSquares<uint16_t, uint16_t, 3, 1>("norm L2 16u C3", reduction(qoriNorm_L2_16u_C3R))};
const Ladders floatSums{widthsAndSquares<float, float, 1, 1>("sum 32f C1", reduction(qoriSum_32f_C1R, hintFast))};

// --- channels -------------------------------------------------------------------------------------------------------

const Sizes kReduction{{768, 768}, {512, 512}};

/// Cost per element of 1, 3 and 4 channels.
template <class T>
Ladder channelLadder(const char* operation, QorInterpolationKind kind) {
    return {operation, [=] {
                const auto step = [&]<int n>() {
                    return Step{std::string("C") + std::to_string(n), double(n) * double(kReduction.dst.pixels()),
                                resizeJob<T, n>(kind, false, Image<T>(kReduction.src, n), Image<T>(kReduction.dst, n),
                                                kReduction)};
                };
                return std::vector<Step>{step.template operator()<1>(), step.template operator()<3>(),
                                         step.template operator()<4>()};
            }};
}
const Ladders channels{{channelLadder<uint8_t>("resize linear 8u, channels", interpLinear),
                        channelLadder<uint8_t>("resize cubic 8u, channels", interpCubic),
                        channelLadder<uint8_t>("resize lanczos3 8u, channels", interpLanczos),
                        channelLadder<uint8_t>("resize super 8u, channels", interpSuper)}};

// --- kernels --------------------------------------------------------------------------------------------------------

template <class T, class K, class Function, class... Divisor>
Ladder kernelLadder(const char* operation, Function function, int value, Divisor... divisor) {
    return ladder(operation, range(1, 32, 1), [=](int side) -> Job {
        const Size size{256, 256}, whole{256 + 32, 256 + 32};
        const Image<T> src(whole, 1), dst(whole, 1);
        const std::vector<K> kernel(static_cast<size_t>(side * side), static_cast<K>(value));
        return {double(size.pixels()) * (side * side + 8), [=] {
                    must(function(src.row(31) + 31, src.step(), dst.data(), dst.step(), size.roi(), kernel.data(),
                                  {side, side}, {0, 0}, divisor...));
                }};
    });
}
const Ladders kernels{{kernelLadder<uint8_t, int32_t>("filter of ones 8u, kernel side", qoriFilter_8u_C1R, 1, 9),
                       kernelLadder<uint8_t, int32_t>("filter of hundreds 8u, kernel side", qoriFilter_8u_C1R, 100, 9),
                       kernelLadder<int16_t, int32_t>("filter of ones 16s, kernel side", qoriFilter_16s_C1R, 1, 9),
                       kernelLadder<float, float>("filter of ones 32f, kernel side", qoriFilter_32f_C1R, 1)}};

// --- levels ---------------------------------------------------------------------------------------------------------

constexpr Size kCounted{256, 256};
const std::vector<int> kLevelCounts = {2,   3,   4,   5,   8,   9,    16,   17,   32,   33,   64,   65,
                                       128, 129, 256, 257, 512, 1024, 2048, 2049, 2100, 4096, 8192, 16384};

const Ladders rangeOfWords{{ladder("histogram range 16u, levels", kLevelCounts, [](int count) -> Job {
    std::vector<int32_t> levels;
    for (int k = 0; k < count; ++k) levels.push_back(static_cast<int32_t>(int64_t{65'536} * k / (count - 1)));
    const Image<uint16_t> image(kCounted, 1);
    const auto bins = std::make_shared<std::vector<int32_t>>(levels.size());
    uint32_t state = 1;
    for (int y = 0; y < kCounted.height; ++y)
        for (int x = 0; x < kCounted.width; ++x)
            image.row(y)[x] = static_cast<uint16_t>((state = state * 1664525u + 1013904223u) >> 16);
    return {double(kCounted.pixels()), [=] {
                must(qoriHistogramRange_16u_C1R(image.data(), image.step(), kCounted.roi(), bins->data(), levels.data(),
                                                static_cast<int32_t>(levels.size())));
            }};
})}};

enum class Order { random, ascending, constant };

Job floatsOf(Order order, int count) {
    std::vector<float> levels;
    for (int k = 0; k < count; ++k) levels.push_back(static_cast<float>(k) / static_cast<float>(count - 1));
    const Image<float> image(kCounted, 1);
    uint32_t state = 1;
    for (int y = 0; y < kCounted.height; ++y)
        for (int x = 0; x < kCounted.width; ++x) {
            const double noise = double((state = state * 1664525u + 1013904223u) >> 8) / (1 << 24);
            const double place = double(y * kCounted.width + x) / double(kCounted.pixels());
            image.row(y)[x] = static_cast<float>(order == Order::random      ? noise
                                                 : order == Order::ascending ? place
                                                                             : 0.4);
        }
    const auto bins = std::make_shared<std::vector<int32_t>>(levels.size());
    return {double(kCounted.pixels()) * (2 + std::log2(count)), [=] {
                must(qoriHistogramRange_32f_C1R(image.data(), image.step(), kCounted.roi(), bins->data(), levels.data(),
                                                static_cast<int32_t>(levels.size())));
            }};
}
const Ladders rangeOfFloats{
    {ladder(
         "histogram range 32f, levels", kLevelCounts, [](int count) { return floatsOf(Order::random, count); },
         "levels are compared eight at a time"),
     {"histogram range 32f, constant to random data", [] {
          const auto step = [](const char* name, Order order) {
              Job job = floatsOf(order, 256);
              return Step{name, job.units, job.work};
          };
          return std::vector<Step>{step("constant", Order::constant), step("ascending", Order::ascending),
                                   step("random", Order::random)};
      }}}};

// --- ratios and tiles -----------------------------------------------------------------------------------------------

/// Cost per pixel read or written, whichever are more.
template <class T>
Ladder ratioLadder(const char* operation, QorInterpolationKind kind, bool antialiasing, std::vector<int> lengths) {
    return ladder(
        operation, std::move(lengths),
        [=](int length) -> Job {
            const Sizes sizes{{480, 480}, {length, length}};
            return {double(sizes.src.pixels() + sizes.dst.pixels()),
                    resizeJob<T, 1>(kind, antialiasing, Image<T>(sizes.src, 1), Image<T>(sizes.dst, 1), sizes)};
        },
        "halves and other simple ratios have ways of their own");
}
const std::vector<int> kReduced = {1,   2,   3,   5,   8,   13,  21,  34,  48,  55,  60,  80,  89,  96,
                                   120, 144, 160, 200, 233, 240, 241, 320, 359, 360, 377, 400, 479, 480};
const std::vector<int> kAnyLength = {60,  96,  120, 160, 200, 233, 240, 241, 320, 359, 360,  377, 400,
                                     479, 480, 481, 600, 640, 719, 720, 800, 960, 961, 1200, 1440};
const Ladders ratios{
    {ratioLadder<uint8_t>("resize super 8u, lengths from 480", interpSuper, false, kReduced),
     ratioLadder<float>("resize super 32f, lengths from 480", interpSuper, false, kReduced),
     ratioLadder<uint8_t>("resize antialias linear 8u, lengths from 480", interpLinear, true, kReduced),
     ratioLadder<float>("resize antialias lanczos3 32f, lengths from 480", interpLanczos, true, kReduced),
     ratioLadder<uint8_t>("resize linear 8u, lengths from 480", interpLinear, false, kAnyLength),
     ratioLadder<uint8_t>("resize cubic 8u, lengths from 480", interpCubic, false, kAnyLength),
     ratioLadder<float>("resize cubic 32f, lengths from 480", interpCubic, false, kAnyLength)}};

template <class T, int channels = 1>
Ladder tileLadder(const char* operation, QorInterpolationKind kind, bool antialiasing, int from) {
    return ladder(
        operation, {1, 2, 4, 8, 16, 64, 512},
        [=](int rows) -> Job {
            const Sizes sizes{{from, from}, {512, 512}};
            return {double(sizes.dst.pixels()),
                    resizeJob<T, channels>(kind, antialiasing, Image<T>(sizes.src, channels),
                                           Image<T>(sizes.dst, channels), sizes, rows)};
        },
        "a call lists what its columns are made of, and destination rows of other tiles share source rows with its "
        "own");
}
const Ladders tiles{{tileLadder<uint8_t>("resize nearest 8u 3:2, tile rows", interpNearest, false, 768),
                     tileLadder<uint8_t>("resize nearest 8u odd, tile rows", interpNearest, false, 701),
                     tileLadder<uint8_t>("resize linear 8u 3:2, tile rows", interpLinear, false, 768),
                     tileLadder<uint8_t>("resize linear 8u odd, tile rows", interpLinear, false, 701),
                     tileLadder<uint8_t>("resize cubic 8u 3:2, tile rows", interpCubic, false, 768),
                     tileLadder<uint8_t>("resize cubic 8u odd, tile rows", interpCubic, false, 701),
                     tileLadder<uint8_t>("resize cubic 8u enlarging, tile rows", interpCubic, false, 301),
                     tileLadder<uint8_t, 3>("resize cubic 8u C3 odd, tile rows", interpCubic, false, 701),
                     tileLadder<uint8_t>("resize super 8u 3:2, tile rows", interpSuper, false, 768),
                     tileLadder<float>("resize super 32f odd, tile rows", interpSuper, false, 1301),
                     tileLadder<float>("resize linear 32f odd, tile rows", interpLinear, false, 701),
                     tileLadder<float>("resize linear 32f 2.5:1, tile rows", interpLinear, false, 1301),
                     tileLadder<float>("resize lanczos3 32f 3:2, tile rows", interpLanczos, false, 768),
                     tileLadder<float>("resize lanczos3 32f odd, tile rows", interpLanczos, false, 701),
                     tileLadder<float>("resize lanczos3 32f 2.5:1, tile rows", interpLanczos, false, 1301),
                     tileLadder<float, 3>("resize lanczos3 32f C3 2.5:1, tile rows", interpLanczos, false, 1301),
                     tileLadder<float>("resize antialias lanczos3 32f 2.5:1, tile rows", interpLanczos, true, 1301)}};

Step shape(const char* name, Sizes sizes) {
    return {
        name, 1.0,
        resizeJob<uint8_t, 1>(interpLinear, true, Image<uint8_t>(sizes.src, 1), Image<uint8_t>(sizes.dst, 1), sizes)};
}
const Ladders transposes{{{"resize antialias linear 8u, transposed", [] {
                               return std::vector<Step>{shape("16x2000 to 2000x16", {{16, 2000}, {2000, 16}}),
                                                        shape("2000x16 to 16x2000", {{2000, 16}, {16, 2000}})};
                           }}}};

}  // namespace
}  // namespace qori::bench
