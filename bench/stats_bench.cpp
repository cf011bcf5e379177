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
        return Contenders{[=] { ours(images, size.roi()); },
                          [=] {
                              double sums[4] = {};
                              for (int y = 0; y < size.height; ++y)
                                  plain(images[0].row(y), images[sources - 1].row(y), size.width, sums);
                              keep(sums);
                          },
                          {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = double(n * sources * sizeof(T)),
            .sizes = std::move(sizes),
            .make = make,
            .roofline = Roofline::read,
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame};
}

/// One term per element, added as the compiler likes: in 64-bit integers, or in the float type of Real.
template <class T, int n, class Real = float, class Term>
constexpr auto plainSum(Term term) {
    return [=](const T* a, const T* b, int width, double* sums) {
        using Total = std::conditional_t<std::is_floating_point_v<T>, Real, int64_t>;
        Total row[n] = {};
        for (int x = 0; x < width; ++x)
            for (int c = 0; c < n; ++c)
                row[c] += static_cast<Total>(term(static_cast<Total>(a[x * n + c]), static_cast<Total>(b[x * n + c])));
        for (int c = 0; c < n; ++c) sums[c] += static_cast<double>(row[c]);
    };
}

template <class T, int n>
void plainLargest(const T* a, const T*, int width, double* sums) {
    T row[n] = {};
    for (int x = 0; x < width; ++x)
        for (int c = 0; c < n; ++c) row[c] = std::max(row[c], a[x * n + c]);
    for (int c = 0; c < n; ++c) sums[c] = std::max(sums[c], static_cast<double>(row[c]));
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
        must(function(images[0].data(), images[0].step(), roi, result, hint...));
        keep(result);
    };
}

template <class Function, class... Hint>
auto binary(Function function, Hint... hint) {
    return [=](const auto& images, QorImageSize roi) {
        double result[4];
        must(function(images[0].data(), images[0].step(), images[1].data(), images[1].step(), roi, result, hint...));
        keep(result);
    };
}

template <class T, class Function>
auto extremum(Function function) {
    return [=](const auto& images, QorImageSize roi) {
        T result[4];
        must(function(images[0].data(), images[0].step(), roi, result));
        keep(result);
    };
}

template <class T, class Function>
auto bothExtrema(Function function) {
    return [=](const auto& images, QorImageSize roi) {
        T low[4], high[4];
        must(function(images[0].data(), images[0].step(), roi, low, high));
        keep(low);
        keep(high);
    };
}

template <class T, int n>
constexpr auto plainValues = plainSum<T, n>(kValue);
template <class T, int n>
constexpr auto plainMagnitudes = plainSum<T, n>([](auto a, auto) { return std::abs(a); });
template <class T, int n>
constexpr auto plainSquares = plainSum<T, n>(kSquare);

/// One source in each layout, in L2 and beyond the cache: what layouts cost beside each other.
const std::vector<Size> kOfLayouts = {{256, 256}, kFrame};
#define QORI_LAYOUT_ROWS(title, T, plain, wrap, function, ...)                                                        \
    reductionRow<T, 1, 1>(title " C1", wrap(function##_C1R __VA_OPT__(, ) __VA_ARGS__), plain<T, 1>, {}, kOfLayouts), \
        reductionRow<T, 3, 1>(title " C3", wrap(function##_C3R __VA_OPT__(, ) __VA_ARGS__), plain<T, 3>, {},          \
                              kOfLayouts),                                                                            \
        reductionRow<T, 4, 1>(title " C4", wrap(function##_C4R __VA_OPT__(, ) __VA_ARGS__), plain<T, 4>, {},          \
                              {kOfLayouts[0]})

const Rows layouts{{
    QORI_LAYOUT_ROWS("layouts: sum 8u", uint8_t, plainValues, unary, qoriSum_8u),
    QORI_LAYOUT_ROWS("layouts: sum 16u", uint16_t, plainValues, unary, qoriSum_16u),
    QORI_LAYOUT_ROWS("layouts: sum 16s", int16_t, plainValues, unary, qoriSum_16s),
    QORI_LAYOUT_ROWS("layouts: sum 32f fast", float, plainValues, unary, qoriSum_32f, hintFast),
    QORI_LAYOUT_ROWS("layouts: norm Inf 8u", uint8_t, plainLargest, unary, qoriNorm_Inf_8u),
    QORI_LAYOUT_ROWS("layouts: norm Inf 16u", uint16_t, plainLargest, unary, qoriNorm_Inf_16u),
    QORI_LAYOUT_ROWS("layouts: norm Inf 32f", float, plainLargest, unary, qoriNorm_Inf_32f),
    QORI_LAYOUT_ROWS("layouts: norm L1 8u", uint8_t, plainMagnitudes, unary, qoriNorm_L1_8u),
    QORI_LAYOUT_ROWS("layouts: norm L1 16u", uint16_t, plainMagnitudes, unary, qoriNorm_L1_16u),
    QORI_LAYOUT_ROWS("layouts: norm L1 32f fast", float, plainMagnitudes, unary, qoriNorm_L1_32f, hintFast),
    QORI_LAYOUT_ROWS("layouts: norm L2 8u", uint8_t, plainSquares, unary, qoriNorm_L2_8u),
    QORI_LAYOUT_ROWS("layouts: norm L2 16u", uint16_t, plainSquares, unary, qoriNorm_L2_16u),
    QORI_LAYOUT_ROWS("layouts: norm L2 32f fast", float, plainSquares, unary, qoriNorm_L2_32f, hintFast),
    QORI_LAYOUT_ROWS("layouts: max 8u", uint8_t, plainLargest, extremum<uint8_t>, qoriMax_8u),
    QORI_LAYOUT_ROWS("layouts: max 16u", uint16_t, plainLargest, extremum<uint16_t>, qoriMax_16u),
    QORI_LAYOUT_ROWS("layouts: max 32f", float, plainLargest, extremum<float>, qoriMax_32f),
    QORI_LAYOUT_ROWS("layouts: minMax 8u", uint8_t, plainLargest, bothExtrema<uint8_t>, qoriMinMax_8u),
    QORI_LAYOUT_ROWS("layouts: minMax 16u", uint16_t, plainLargest, bothExtrema<uint16_t>, qoriMinMax_16u),
    QORI_LAYOUT_ROWS("layouts: minMax 32f", float, plainLargest, bothExtrema<float>, qoriMinMax_32f),
}};

const Rows norms{{
    reductionRow<uint8_t, 1, 1>("sum 8u C1", unary(qoriSum_8u_C1R), plainValues<uint8_t, 1>, {120'205, 31'314}),
    reductionRow<uint8_t, 3, 1>("mean 8u C3", unary(qoriMean_8u_C3R), plainValues<uint8_t, 3>, {3'561, 3'689}),
    reductionRow<float, 1, 1>("sum 32f C1 fast", unary(qoriSum_32f_C1R, hintFast), plainValues<float, 1>,
                              {11'570, 5'701}),
    reductionRow<float, 1, 1>("sum 32f C1 accurate", unary(qoriSum_32f_C1R, hintAccurate),
                              plainSum<float, 1, double>(kValue), {11'521, 5'723}),
    reductionRow<uint8_t, 1, 1>("norm L2 8u C1", unary(qoriNorm_L2_8u_C1R), plainSquares<uint8_t, 1>, {54'766, 28'426}),
    reductionRow<uint8_t, 1, 2>("normdiff L1 8u C1", binary(qoriNormDiff_L1_8u_C1R), plainSum<uint8_t, 1>(kDistance),
                                {76'990, 14'682}),
    reductionRow<uint8_t, 3, 2>("normdiff L1 8u C3", binary(qoriNormDiff_L1_8u_C3R), plainSum<uint8_t, 3>(kDistance)),
    reductionRow<uint8_t, 1, 2>("normdiff L2 8u C1", binary(qoriNormDiff_L2_8u_C1R),
                                plainSum<uint8_t, 1>(kSquaredDistance), {43'406, 14'723}),
    reductionRow<uint8_t, 3, 2>("normdiff L2 8u C3", binary(qoriNormDiff_L2_8u_C3R),
                                plainSum<uint8_t, 3>(kSquaredDistance)),
    reductionRow<uint8_t, 1, 2>("normrel L1 8u C1", binary(qoriNormRel_L1_8u_C1R), plainSum<uint8_t, 1>(kDistance)),
    reductionRow<uint8_t, 1, 2>("dot product 8u C1", binary(qoriDotProd_8u64f_C1R), plainSum<uint8_t, 1>(kProduct),
                                {42'924, 14'939}),
    reductionRow<uint8_t, 3, 2>("dot product 8u C3", binary(qoriDotProd_8u64f_C3R), plainSum<uint8_t, 3>(kProduct)),
    reductionRow<int16_t, 1, 2>("dot product 16s C1", binary(qoriDotProd_16s64f_C1R), plainSum<int16_t, 1>(kProduct)),
    reductionRow<float, 1, 2>("dot product 32f C1 fast", binary(qoriDotProd_32f64f_C1R, hintFast),
                              plainSum<float, 1>(kProduct), {8'997, 3'502}),
    reductionRow<float, 1, 2>("dot product 32f C1 accurate", binary(qoriDotProd_32f64f_C1R, hintAccurate),
                              plainSum<float, 1, double>(kProduct)),
}};

template <class T, class Function>
auto indexed(Function function) {
    return [=](const auto& images, QorImageSize roi) {
        T value[4];
        int32_t x[4], y[4];
        must(function(images[0].data(), images[0].step(), roi, value, x, y));
        keep(value);
        keep(x);
        keep(y);
    };
}

template <class T>
void plainMinMax(const T* a, const T*, int width, double* sums) {
    T low = a[0], high = a[0];
    for (int x = 0; x < width; ++x) {
        low = std::min(low, a[x]);
        high = std::max(high, a[x]);
    }
    sums[0] = std::min(sums[0], static_cast<double>(low));
    sums[1] = std::max(sums[1], static_cast<double>(high));
}

template <class T>
void plainIndex(const T* a, const T*, int width, double* sums) {
    for (int x = 0; x < width; ++x)
        if (static_cast<double>(a[x]) > sums[0]) {
            sums[0] = static_cast<double>(a[x]);
            sums[1] = x;
        }
}

/// The largest element lies at the end, so that no search ends early.
template <class T, class Function>
Row indexRow(std::string name, Function function, Best best) {
    const auto make = [=](Size size) {
        std::vector<Image<T>> images{Image<T>(size, 1)};
        for (int y = 0; y < size.height; ++y)
            for (int x = 0; x < size.width; ++x)
                images[0].row(y)[x] = std::min(images[0].row(y)[x], static_cast<T>(200));
        images[0].row(size.height - 1)[size.width - 1] = 201;
        const auto ours = indexed<T>(function);
        return Contenders{[=] { ours(images, size.roi()); },
                          [=] {
                              double sums[2] = {-1, 0};
                              for (int y = 0; y < size.height; ++y)
                                  plainIndex<T>(images[0].row(y), nullptr, size.width, sums);
                              keep(sums);
                          },
                          {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = sizeof(T),
            .sizes = kSizes,
            .make = make,
            .roofline = Roofline::read,
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame};
}

const auto blocks8u = [](const auto& images, QorImageSize roi) {
    static std::vector<uint8_t> low(1 << 20), high(1 << 20);
    uint8_t all[2];
    const int step = (roi.width + 15) / 16;
    must(qoriBlockMinMax_8u_C1R(images[0].data(), images[0].step(), roi, low.data(), step, high.data(), step, {16, 16},
                                all, all + 1));
    keep(low.data());
};

const auto inRange8u = [](const auto& images, QorImageSize roi) {
    int32_t count;
    must(qoriCountInRange_8u_C1R(images[0].data(), images[0].step(), roi, &count, 50, 180));
    keep(&count);
};

const Rows extrema{{
    reductionRow<uint8_t, 1, 1>("max 8u C1", extremum<uint8_t>(qoriMax_8u_C1R), plainLargest<uint8_t, 1>),
    reductionRow<float, 1, 1>("max 32f C1", extremum<float>(qoriMax_32f_C1R), plainLargest<float, 1>),
    reductionRow<uint8_t, 1, 1>("minMax 8u C1", bothExtrema<uint8_t>(qoriMinMax_8u_C1R), plainMinMax<uint8_t>,
                                {71'798, 29'263}),
    reductionRow<float, 1, 1>("minMax 32f C1", bothExtrema<float>(qoriMinMax_32f_C1R), plainMinMax<float>,
                              {2'580, 1'665}),
    indexRow<uint8_t>("maxIndx 8u C1", qoriMaxIndx_8u_C1R, {10'793, 7'467}),
    indexRow<float>("maxIndx 32f C1", qoriMaxIndx_32f_C1R, {2'623, 1'573}),
    reductionRow<uint8_t, 1, 1>("blockMinMax 16x16 8u C1", blocks8u, plainMinMax<uint8_t>),
    reductionRow<uint8_t, 1, 1>("countInRange 8u C1", inRange8u,
                                plainSum<uint8_t, 1>([](auto a, auto) { return a >= 50 && a <= 180; })),
}};

/// Columns of a wider image: what a row costs to begin and to end.
const std::vector<Size> kColumns = {{1, 4'096}, {3, 4'096}, {8, 4'096}, {24, 4'096}};
const Rows columns{{
    reductionRow<uint8_t, 1, 1>("columns: sum 8u C1", unary(qoriSum_8u_C1R), plainValues<uint8_t, 1>, {}, kColumns),
    reductionRow<uint16_t, 3, 1>("columns: sum 16u C3", unary(qoriSum_16u_C3R), plainValues<uint16_t, 3>, {}, kColumns),
    reductionRow<float, 1, 1>("columns: sum 32f C1 fast", unary(qoriSum_32f_C1R, hintFast), plainValues<float, 1>, {},
                              kColumns),
    reductionRow<uint8_t, 4, 1>("columns: norm L2 8u C4", unary(qoriNorm_L2_8u_C4R), plainSquares<uint8_t, 4>, {},
                                kColumns),
    reductionRow<uint8_t, 1, 2>("columns: normdiff L1 8u C1", binary(qoriNormDiff_L1_8u_C1R),
                                plainSum<uint8_t, 1>(kDistance), {}, kColumns),
    reductionRow<uint8_t, 1, 1>("columns: minMax 8u C1", bothExtrema<uint8_t>(qoriMinMax_8u_C1R), plainMinMax<uint8_t>,
                                {}, kColumns),
    reductionRow<uint8_t, 1, 1>("columns: countInRange 8u C1", inRange8u,
                                plainSum<uint8_t, 1>([](auto a, auto) { return a >= 50 && a <= 180; }), {}, kColumns),
}};

/// Noise over the whole type, 0 to 1 for floats; `flat` makes all pixels equal. plain is one table and one loop: a
/// counter for every value, or 256 between 0 and 1.
template <class T, int n, class Ours>
Row histogramRow(std::string name, bool flat, Ours ours, Best best = {},
                 std::vector<Size> sizes = {kL1, kL2, kFrame, kNarrow}) {
    constexpr bool isFloat = std::is_floating_point_v<T>;
    const auto make = [=](Size size) {
        Image<T> image(size, n);
        uint32_t state = 7;
        for (int y = 0; y < size.height; ++y)
            for (int i = 0; i < image.elements(); ++i) {
                state = state * 1664525u + 1013904223u;
                image.row(y)[i] = flat ? static_cast<T>(isFloat ? 0.3 : 9)
                                       : static_cast<T>(isFloat ? (state >> 8) / 16'777'216.0 : state >> 12);
            }
        const auto table = std::make_shared<std::vector<int32_t>>(n << (isFloat ? 8 : 8 * sizeof(T)));
        return Contenders{
            [=] { ours(image, size.roi()); },
            [=] {
                for (int y = 0; y < size.height; ++y)
                    for (int x = 0; x < size.width; ++x)
                        for (int c = 0; c < n; ++c) {
                            const auto value = image.row(y)[x * n + c];
                            ++(*table)[static_cast<size_t>(isFloat ? value * 256 : value) * n + static_cast<size_t>(c)];
                        }
                keep(table->data());
            },
            {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = n * sizeof(T),
            .sizes = std::move(sizes),
            .make = make,
            .roofline = Roofline::read,
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame};
}

std::vector<int32_t> levelsUpTo(int32_t last) {
    std::vector<int32_t> levels;
    for (int32_t k = 0; k <= last; ++k) levels.push_back(k);
    return levels;
}

const auto bytes1 = [levels = levelsUpTo(256)](const Image<uint8_t>& image, QorImageSize roi) {
    int32_t bins[256];
    must(qoriHistogramRange_8u_C1R(image.data(), image.step(), roi, bins, levels.data(), 257));
    keep(bins);
};

const auto bytes3 = [levels = levelsUpTo(256)](const Image<uint8_t>& image, QorImageSize roi) {
    int32_t bins[3][256];
    int32_t* binPointers[3] = {bins[0], bins[1], bins[2]};
    const int32_t* levelPointers[3] = {levels.data(), levels.data(), levels.data()};
    const int32_t counts[3] = {257, 257, 257};
    must(qoriHistogramRange_8u_C3R(image.data(), image.step(), roi, binPointers, levelPointers, counts));
    keep(bins);
};

/// A prepared histogram of 16u with the given number of levels over the whole range.
auto words(int32_t count) {
    int32_t specSize, bufferSize;
    const float lower = 0, upper = 65'536;
    must(qoriHistogramGetBufferSize(qor16u, {1, 1}, &count, 1, 1, &specSize, &bufferSize));
    const auto spec = std::make_shared<std::vector<int32_t>>(specSize / 4);
    const auto buffer = std::make_shared<std::vector<uint8_t>>(bufferSize);
    const auto bins = std::make_shared<std::vector<int32_t>>(count);
    must(
        qoriHistogramUniformInit(qor16u, &lower, &upper, &count, 1, reinterpret_cast<QorHistogramSpec*>(spec->data())));
    return [=](const Image<uint16_t>& image, QorImageSize roi) {
        must(qoriHistogram_16u_C1R(image.data(), image.step(), roi, bins->data(),
                                   reinterpret_cast<const QorHistogramSpec*>(spec->data()), buffer->data()));
        keep(bins->data());
    };
}

const auto searched = [](const Image<uint16_t>& image, QorImageSize roi) {
    int32_t bins[256], levels[257];
    must(qoriHistogramEven_16u_C1R(image.data(), image.step(), roi, bins, levels, 257, 0, 65'536));
    keep(bins);
};

/// `count` levels over the whole range, each given `times` times.
template <class T>
auto ranged(int32_t count, int32_t times = 1) {
    using Level = std::conditional_t<std::is_floating_point_v<T>, float, int32_t>;
    std::vector<Level> levels;
    for (int32_t k = 0; k < count; ++k) {
        const double part = double(k / times * times) / (count - 1);
        levels.push_back(static_cast<Level>(std::is_floating_point_v<T> ? part : part * 65'536));
    }
    const auto bins = std::make_shared<std::vector<int32_t>>(count);
    return [=](const Image<T>& image, QorImageSize roi) {
        if constexpr (std::is_floating_point_v<T>)
            must(qoriHistogramRange_32f_C1R(image.data(), image.step(), roi, bins->data(), levels.data(), count));
        else
            must(qoriHistogramRange_16u_C1R(image.data(), image.step(), roi, bins->data(), levels.data(), count));
        keep(bins->data());
    };
}

std::vector<Row> histogramRows() {
    std::vector<Row> rows{
        histogramRow<uint8_t, 1>("histogram 8u C1 256 bins", false, bytes1, {3'325, 3'159}),
        histogramRow<uint8_t, 1>("histogram 8u C1 256 bins, constant", true, bytes1),
        histogramRow<uint8_t, 3>("histogram 8u C3 256 bins", false, bytes3, {1'100, 1'021}),
        histogramRow<uint16_t, 1>("histogram 16u C1 65536 bins", false, words(65'537), {1'493, 1'420}),
        histogramRow<uint16_t, 1>("histogram 16u C1 65536 bins, constant", true, words(65'537)),
        histogramRow<uint16_t, 1>("histogram 16u C1 256 bins", false, words(257), {}, {kSmall, kL1, kL2}),
        histogramRow<uint16_t, 1>("histogram even 16u C1 256 bins", false, searched),
        histogramRow<uint16_t, 1>("range 16u C1 65536 bins", false, ranged<uint16_t>(65'537), {}, {kSmall, kL2}),
        histogramRow<uint16_t, 1>("range 16u C1 1100 levels thrice", false, ranged<uint16_t>(3'300, 3), {}, {kL2}),
        histogramRow<float, 1>("range 32f C1 256 bins, constant", true, ranged<float>(257), {}, {kL2}),
        histogramRow<float, 1>("range 32f C1 333 levels thrice", false, ranged<float>(999, 3), {}, {kL2}),
    };
    // Ladders: what one level more costs.
    for (int32_t count : {2, 9, 32, 33, 257, 2'049, 2'100, 4'096})
        rows.push_back(histogramRow<uint16_t, 1>("range 16u C1, levels " + std::to_string(count), false,
                                                 ranged<uint16_t>(count), {}, {kSmall, kL2}));
    for (int32_t count : {2, 9, 32, 64, 65, 257, 2'048, 4'096})
        rows.push_back(histogramRow<float, 1>("range 32f C1, levels " + std::to_string(count), false,
                                              ranged<float>(count), {}, {kSmall, kL2}));
    return rows;
}

const Rows histograms(histogramRows());

}  // namespace
}  // namespace qori::bench
