// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>
#include <type_traits>

#include "bench.h"

namespace qori::bench {
namespace {

struct Best {
    double atL2 = 0, atFrame = 0;
};

/// Reductions read their sources; ours(images, roi) calls the export, plain(rows, elements, n) adds one row to a double
/// per channel.
template <class T, int n, int sources, class Ours, class Plain>
Row reductionRow(std::string name, Ours ours, Plain plain, Best best = {}, std::vector<Size> sizes = kSizes) {
    const auto make = [=](Size size) {
        std::vector<Image<T>> images;
        for (int i = 0; i < sources; ++i) images.push_back(Image<T>(size, n));
        return Contenders{
            [=] { ours(images, size.roi()); },
            [=] {
                double sums[4] = {};
                for (int y = 0; y < size.height; ++y) plain(images[0].row(y), images[sources - 1].row(y), size.width, sums);
                keep(sums);
            },
            {}};
    };
    return {.operation = std::move(name), .bytesPerPixel = double(n * sources * sizeof(T)), .sizes = std::move(sizes), .make = make,
            .roofline = Roofline::read, .bestAtL2 = best.atL2, .bestAtFrame = best.atFrame};
}

/// One term per element, added as the compiler likes: in 64-bit integers, or in the float type of Real.
template <class T, int n, class Real = float, class Term>
auto plainSum(Term term) {
    return [=](const T* a, const T* b, int width, double* sums) {
        using Total = std::conditional_t<std::is_floating_point_v<T>, Real, int64_t>;
        Total row[n] = {};
        for (int x = 0; x < width; ++x)
            for (int c = 0; c < n; ++c) row[c] += static_cast<Total>(term(static_cast<Total>(a[x * n + c]), static_cast<Total>(b[x * n + c])));
        for (int c = 0; c < n; ++c) sums[c] += static_cast<double>(row[c]);
    };
}

template <class T, int n>
auto plainLargest() {
    return [](const T* a, const T*, int width, double* sums) {
        T row[n] = {};
        for (int x = 0; x < width; ++x)
            for (int c = 0; c < n; ++c) row[c] = std::max(row[c], a[x * n + c]);
        for (int c = 0; c < n; ++c) sums[c] = std::max(sums[c], static_cast<double>(row[c]));
    };
}

constexpr auto kValue = [](auto a, auto) { return a; };
constexpr auto kSquare = [](auto a, auto) { return a * a; };
constexpr auto kDistance = [](auto a, auto b) { return a < b ? b - a : a - b; };
constexpr auto kSquaredDistance = [](auto a, auto b) { return (a - b) * (a - b); };
constexpr auto kProduct = [](auto a, auto b) { return a * b; };

template <class Function, class... Hint>
auto unary(Function function, Hint... hint) {
    return [=](const auto& images, QorImageSize roi) {
        double result[4];
        function(images[0].data(), images[0].step(), roi, result, hint...);
        keep(result);
    };
}

template <class Function, class... Hint>
auto binary(Function function, Hint... hint) {
    return [=](const auto& images, QorImageSize roi) {
        double result[4];
        function(images[0].data(), images[0].step(), images[1].data(), images[1].step(), roi, result, hint...);
        keep(result);
    };
}

const Rows norms{{
    reductionRow<uint8_t, 1, 1>("sum 8u C1", unary(qoriSum_8u_C1R), plainSum<uint8_t, 1>(kValue), {120'205, 31'314}),
    reductionRow<uint8_t, 3, 1>("mean 8u C3", unary(qoriMean_8u_C3R), plainSum<uint8_t, 3>(kValue), {3'561, 3'689}),
    reductionRow<uint8_t, 4, 1>("sum 8u C4", unary(qoriSum_8u_C4R), plainSum<uint8_t, 4>(kValue)),
    reductionRow<uint16_t, 1, 1>("sum 16u C1", unary(qoriSum_16u_C1R), plainSum<uint16_t, 1>(kValue)),
    reductionRow<int16_t, 3, 1>("sum 16s C3", unary(qoriSum_16s_C3R), plainSum<int16_t, 3>(kValue)),
    reductionRow<float, 1, 1>("sum 32f C1 fast", unary(qoriSum_32f_C1R, hintFast), plainSum<float, 1>(kValue), {11'570, 5'701}),
    reductionRow<float, 1, 1>("sum 32f C1 accurate", unary(qoriSum_32f_C1R, hintAccurate), plainSum<float, 1, double>(kValue), {11'521, 5'723}),
    reductionRow<float, 3, 1>("sum 32f C3 fast", unary(qoriSum_32f_C3R, hintFast), plainSum<float, 3>(kValue)),
    reductionRow<uint8_t, 1, 1>("norm Inf 8u C1", unary(qoriNorm_Inf_8u_C1R), plainLargest<uint8_t, 1>()),
    reductionRow<uint8_t, 3, 1>("norm Inf 8u C3", unary(qoriNorm_Inf_8u_C3R), plainLargest<uint8_t, 3>()),
    reductionRow<float, 1, 1>("norm L1 32f C1 fast", unary(qoriNorm_L1_32f_C1R, hintFast), plainSum<float, 1>([](auto a, auto) { return std::abs(a); })),
    reductionRow<uint8_t, 1, 1>("norm L2 8u C1", unary(qoriNorm_L2_8u_C1R), plainSum<uint8_t, 1>(kSquare), {54'766, 28'426}),
    reductionRow<uint8_t, 3, 1>("norm L2 8u C3", unary(qoriNorm_L2_8u_C3R), plainSum<uint8_t, 3>(kSquare)),
    reductionRow<uint8_t, 4, 1>("norm L2 8u C4", unary(qoriNorm_L2_8u_C4R), plainSum<uint8_t, 4>(kSquare)),
    reductionRow<uint16_t, 1, 1>("norm L2 16u C1", unary(qoriNorm_L2_16u_C1R), plainSum<uint16_t, 1>(kSquare)),
    reductionRow<float, 1, 1>("norm L2 32f C1 fast", unary(qoriNorm_L2_32f_C1R, hintFast), plainSum<float, 1>(kSquare)),
    reductionRow<float, 3, 1>("norm L2 32f C3 fast", unary(qoriNorm_L2_32f_C3R, hintFast), plainSum<float, 3>(kSquare)),
    reductionRow<uint8_t, 1, 2>("normdiff L1 8u C1", binary(qoriNormDiff_L1_8u_C1R), plainSum<uint8_t, 1>(kDistance), {76'990, 14'682}),
    reductionRow<uint8_t, 3, 2>("normdiff L1 8u C3", binary(qoriNormDiff_L1_8u_C3R), plainSum<uint8_t, 3>(kDistance)),
    reductionRow<uint8_t, 1, 2>("normdiff L2 8u C1", binary(qoriNormDiff_L2_8u_C1R), plainSum<uint8_t, 1>(kSquaredDistance), {43'406, 14'723}),
    reductionRow<uint8_t, 3, 2>("normdiff L2 8u C3", binary(qoriNormDiff_L2_8u_C3R), plainSum<uint8_t, 3>(kSquaredDistance)),
    reductionRow<uint8_t, 1, 2>("normrel L1 8u C1", binary(qoriNormRel_L1_8u_C1R), plainSum<uint8_t, 1>(kDistance)),
    reductionRow<uint8_t, 1, 2>("dot product 8u C1", binary(qoriDotProd_8u64f_C1R), plainSum<uint8_t, 1>(kProduct), {42'924, 14'939}),
    reductionRow<uint8_t, 3, 2>("dot product 8u C3", binary(qoriDotProd_8u64f_C3R), plainSum<uint8_t, 3>(kProduct)),
    reductionRow<int16_t, 1, 2>("dot product 16s C1", binary(qoriDotProd_16s64f_C1R), plainSum<int16_t, 1>(kProduct)),
    reductionRow<float, 1, 2>("dot product 32f C1 fast", binary(qoriDotProd_32f64f_C1R, hintFast), plainSum<float, 1>(kProduct), {8'997, 3'502}),
    reductionRow<float, 1, 2>("dot product 32f C1 accurate", binary(qoriDotProd_32f64f_C1R, hintAccurate), plainSum<float, 1, double>(kProduct)),
}};

}  // namespace
}  // namespace qori::bench
