// SPDX-License-Identifier: Apache-2.0
#include "harness/sweep.h"
#include "narrow_shapes.h"
#include "reference/stats.h"

namespace qori::test {
namespace {

enum class Measure { largest, magnitudes, squares, values, products };

constexpr int resultsOf(Layout layout) { return layout == Layout::AC4 ? 3 : channels(layout); }

/// Roundings between an element and a float result: the difference or product, the additions of the busiest of `lanes`
/// partial sums, the pairwise additions of 96 lanes at most, the final conversions. k of them keep a sum of magnitudes
/// within k u / (1 - k u) (Higham: Accuracy and stability of numerical algorithms, lemma 3.1).
double relativeError(const Shape& shape, int n, bool accurate) {
    const int lanes = accurate ? 24 : 48;
    const double u = std::ldexp(1.0, accurate ? -53 : -24);
    const int ofRow = (shape.width * n + lanes - 1) / lanes;
    const double k = 2 + double(shape.height) * ofRow + 7 + 2;
    return k * u / (1 - k * u);
}

/// One channel of a call: its elements (those of the second image, if any, too), how often each of them occurs, what
/// came out, and the status that the call should have.
template <class T>
struct Channel {
    std::vector<T> a, b;
    int times;
    double result;
    double relativeError;
    QorResult* expectedStatus;
};

/// What the terms of a measure add up to, in elements a and (where there is a second image) b, else empty.
template <Measure measure, class T>
reference::Sum<T> totalOf(const std::vector<T>& a, const std::vector<T>& b) {
    using Number = typename reference::Sum<T>::Number;
    const auto number = [&](size_t i) { return static_cast<Number>(a[i]); };
    const auto difference = [&](size_t i) { return b.empty() ? number(i) : number(i) - static_cast<Number>(b[i]); };
    const auto magnitude = [&](size_t i) { return difference(i) < 0 ? -difference(i) : difference(i); };
    if constexpr (measure == Measure::values)
        return reference::sumOf(a, number);
    else if constexpr (measure == Measure::magnitudes)
        return reference::sumOf(a, magnitude);
    else if constexpr (measure == Measure::squares)
        return reference::sumOf(a, [&](size_t i) { return difference(i) * difference(i); });
    else if constexpr (measure == Measure::products)
        return reference::sumOf(a, [&](size_t i) { return number(i) * static_cast<Number>(b[i]); });
    else {
        Number best = 0;
        for (size_t i = 0; i < a.size(); ++i)  // differences of floats are single precision here
            best = std::max(best,
                            std::is_integral_v<T> ? magnitude(i) : static_cast<Number>(static_cast<T>(magnitude(i))));
        return {best, best};
    }
}

template <Measure measure, class T>
reference::Sum<T> expectedTotal(const Channel<T>& channel, const std::vector<T>& a, const std::vector<T>& b) {
    const auto once = totalOf<measure>(a, b);
    const int times = measure == Measure::largest ? 1 : channel.times;
    return {once.total * times, once.magnitude * times};
}

template <Measure measure>
double rooted(double total) {
    return measure == Measure::squares ? std::sqrt(total) : total;
}

/// Calls with or without the hint, as the export has it.
template <class Function, class... Arguments>
QorResult callWith(int32_t hint, Function function, Arguments... arguments) {
    if constexpr (std::is_invocable_v<Function, Arguments..., int32_t>)
        return call(function, arguments..., hint);
    else
        return call(function, arguments...);
}

template <class Function, class T>
constexpr bool isBinary =
    std::is_invocable_v<Function, const T*, int32_t, const T*, int32_t, QorImageSize, double*> ||
    std::is_invocable_v<Function, const T*, int32_t, const T*, int32_t, QorImageSize, double*, int32_t>;

/// A member with or without a second image and a hint.
template <class T>
using MemberCall = FunctionRef<QorResult(const T*, int32_t, const T*, int32_t, QorImageSize, double*, int32_t)>;
template <class T>
using ChannelCheck = FunctionRef<void(const Channel<T>&)>;

template <class T>
void runMember(MemberCall<T> invoke, Layout layout, bool binary, const Shape& shape, int32_t hint,
               ChannelCheck<T> check) {
    const int n = channels(layout);
    TestImage src1(0, shape, n * static_cast<int>(sizeof(T))), src2(1, shape, n * static_cast<int>(sizeof(T)));
    src1.fill<T>(n, drawPixel<T>);
    src2.fill<T>(n, drawPixel<T>);
    const Snapshot before1 = src1.snapshot(), before2 = src2.snapshot();
    double results[5] = {-7, -7, -7, -7, -7};
    QorResult expectedStatus = QOR_OK;
    const QorResult status =
        invoke(src1.data<T>(), src1.step(), src2.data<T>(), src2.step(), shape.roi(), results, hint);
    const double relative = relativeError(shape, n, hint == hintAccurate);
    for (int c = 0; c < resultsOf(layout); ++c) {
        SCOPED_TRACE("channel " + std::to_string(c));
        const auto b = binary ? reference::channel(src2.view<T>(n), shape.roi(), c) : std::vector<T>{};
        const auto a = reference::channel(src1.view<T>(n), shape.roi(), c);
        check(Channel<T>{a, b, 1, results[c], relative, &expectedStatus});
    }
    EXPECT_EQ(expectedStatus, status);
    for (int c = resultsOf(layout); c < 5; ++c) EXPECT_EQ(-7, results[c]) << "a result that nobody asked for";
    QORI_EXPECT_UNCHANGED(src1, before1);
    QORI_EXPECT_UNCHANGED(src2, before2);
}

constexpr int kExtremeWidth = 37'500, kExtremeElements = kExtremeWidth * 192;

/// As many of the type's smallest and of its largest value.
template <class T>
const std::vector<T>& extremeElements(bool largest) {
    static const std::vector<T> all[2] = {std::vector<T>(kExtremeElements, std::numeric_limits<T>::min()),
                                          std::vector<T>(kExtremeElements, std::numeric_limits<T>::max())};
    return all[largest];
}

/// Regions of extreme pixels that fill every lane: rows beyond 32,768 pixels, merged into one and not.
template <class T>
void runExtremes(MemberCall<T> invoke, Layout layout, bool binary, ChannelCheck<T> check) {
    const int n = channels(layout), width = kExtremeWidth, height = kExtremeElements / width / n;
    for (int choice = 0; choice < 4; ++choice) {
        const auto &src1 = extremeElements<T>(choice % 2), &src2 = extremeElements<T>(choice / 2);
        const QorImageSize roi{choice % 3 == 0 ? width : width - 1, height};
        const int32_t step = width * n * static_cast<int>(sizeof(T));
        double results[4];
        QorResult expectedStatus = QOR_OK;
        const QorResult status = invoke(src1.data(), step, src2.data(), step, roi, results, hintFast);
        const std::vector<T> second = binary ? std::vector<T>{src2[0]} : std::vector<T>{};
        for (int c = 0; c < resultsOf(layout); ++c)
            check(Channel<T>{{src1[0]}, second, roi.width * roi.height, results[c], 0, &expectedStatus});
        EXPECT_EQ(expectedStatus, status);
    }
}

/// Rows that follow upwards are left out where steps must be positive.
template <class T>
__attribute__((noinline)) void sweepMember(const char* name, Layout layout, bool binary, bool anyStep,
                                           MemberCall<T> invoke, ChannelCheck<T> check) {
    for (int32_t hint : {int32_t{hintFast}, int32_t{hintAccurate}, -1}) {
        forShapes(smallShapes(), [&](const Shape& shape) {
            if (!shape.flipped || anyStep) runMember<T>(invoke, layout, binary, shape, hint, check);
        });
        if (std::is_integral_v<T>) break;
    }
    forShapes(narrowShapes(),
              [&](const Shape& shape) { runMember<T>(invoke, layout, binary, shape, hintFast, check); });
    if constexpr (std::is_integral_v<T>) runExtremes<T>(invoke, layout, binary, check);
    markSwept(name);
}

template <class T, Layout layout, class Function>
void sweepMember(const char* name, Function function, bool anyStep, ChannelCheck<T> check) {
    constexpr bool binary = isBinary<Function, T>;
    sweepMember<T>(
        name, layout, binary, anyStep,
        [=](const T* a, int32_t aStep, const T* b, int32_t bStep, QorImageSize roi, double* results, int32_t hint) {
            if constexpr (binary)
                return callWith(hint, function, a, aStep, b, bStep, roi, results);
            else
                return callWith(hint, function, a, aStep, roi, results);
        },
        check);
}

/// Integers are exact, roots and quotients of them correctly rounded.
template <Measure measure, class T>
void checkNorm(const Channel<T>& channel) {
    const auto expected = expectedTotal<measure>(channel, channel.a, channel.b);
    const auto total = static_cast<double>(expected.total);
    if (std::is_integral_v<T> || measure == Measure::largest) {
        EXPECT_EQ(rooted<measure>(total), channel.result);
    } else {  // the root halves a relative error, and squaring its result doubles it again
        const double result = measure == Measure::squares ? channel.result * channel.result : channel.result;
        EXPECT_NEAR(total, result, channel.relativeError * static_cast<double>(expected.magnitude));
    }
}

template <Measure measure, class T>
void checkRelative(const Channel<T>& channel) {
    auto expected = static_cast<double>(expectedTotal<measure>(channel, channel.a, channel.b).total);
    const auto denominator = static_cast<double>(expectedTotal<measure, T>(channel, channel.b, {}).total);
    if (denominator == 0)
        *channel.expectedStatus = QOR_WARN_DIV_BY_ZERO;
    else
        expected /= denominator;
    if (std::is_integral_v<T> || measure == Measure::largest) {
        EXPECT_EQ(rooted<measure>(expected), channel.result);
    } else {  // numerator and denominator may err in opposite directions
        const double result = measure == Measure::squares ? channel.result * channel.result : channel.result;
        EXPECT_NEAR(expected, result, 2 * channel.relativeError / (1 - channel.relativeError) * expected);
    }
}

template <Measure measure, class T, Layout layout, class Function>
void sweepNorm(const char* name, Function function, bool anyStep) {
    sweepMember<T, layout>(name, function, anyStep, [](const Channel<T>& channel) { checkNorm<measure>(channel); });
}

template <Measure measure, class T, Layout layout, class Function>
void sweepRelative(const char* name, Function function) {
    sweepMember<T, layout>(name, function, false, [](const Channel<T>& channel) { checkRelative<measure>(channel); });
}

#define QORI_SWEEP(operation, ...)                        \
    template <class T, Layout layout, class Function>     \
    void operation(const char* name, Function function) { \
        __VA_ARGS__;                                      \
    }
QORI_SWEEP(sum, sweepNorm<Measure::values, T, layout>(name, function, true))
QORI_SWEEP(normInf, sweepNorm<Measure::largest, T, layout>(name, function, false))
QORI_SWEEP(normL1, sweepNorm<Measure::magnitudes, T, layout>(name, function, false))
QORI_SWEEP(normL2, sweepNorm<Measure::squares, T, layout>(name, function, false))
QORI_SWEEP(normDiffInf, sweepNorm<Measure::largest, T, layout>(name, function, false))
QORI_SWEEP(normDiffL1, sweepNorm<Measure::magnitudes, T, layout>(name, function, false))
QORI_SWEEP(normDiffL2, sweepNorm<Measure::squares, T, layout>(name, function, false))
QORI_SWEEP(normRelInf, sweepRelative<Measure::largest, T, layout>(name, function))
QORI_SWEEP(normRelL1, sweepRelative<Measure::magnitudes, T, layout>(name, function))
QORI_SWEEP(normRelL2, sweepRelative<Measure::squares, T, layout>(name, function))

template <class T>
void checkMean(const Channel<T>& channel, bool oneChannel) {
    const auto sum = expectedTotal<Measure::values, T>(channel, channel.a, {});
    const auto pixels = static_cast<double>(channel.a.size()) * channel.times;
    const auto total = static_cast<double>(sum.total);
    if (std::is_integral_v<T>)
        EXPECT_EQ(oneChannel ? total / pixels : total * (1 / pixels), channel.result);
    else
        EXPECT_NEAR(total / pixels, channel.result,
                    channel.relativeError * static_cast<double>(sum.magnitude) / pixels);
}

template <class T, Layout layout, class Function>
void mean(const char* name, Function function) {
    sweepMember<T, layout>(name, function, true,
                           [](const Channel<T>& channel) { checkMean(channel, layout == Layout::C1); });
}

/// Doubles added from left to right, which shows beyond 2^53.
template <class T>
void checkOrderedProduct(const Channel<T>& channel) {
    double expected = 0;
    for (int time = 0; time < channel.times; ++time)
        for (size_t i = 0; i < channel.a.size(); ++i)
            expected += static_cast<double>(channel.a[i]) * static_cast<double>(channel.b[i]);
    EXPECT_EQ(expected, channel.result);
}

template <class T, Layout layout, class Function>
void dotProduct(const char* name, Function function) {
    if constexpr (std::is_floating_point_v<T>)
        sweepNorm<Measure::products, T, layout>(name, function, true);
    else
        sweepMember<T, layout>(name, function, true, [](const Channel<T>& channel) { checkOrderedProduct(channel); });
}

template <class T>
void checkWeightedRows(QorResult(QORI_CALL* function)(const T* const*, const T*, int32_t, T*, int32_t)) {
    for (int count : {1, 2, 3, 7})
        forShapes(smallShapes(), [&](const Shape& shape) {
            const Shape row{.width = shape.width, .atBegin = shape.atBegin, .shift = shape.shift};
            std::vector<TestImage> images;
            std::vector<const T*> rows;
            T weights[7];
            for (int i = 0; i < count; ++i) {
                images.emplace_back(i, row, static_cast<int>(sizeof(T)));
                images.back().template fill<T>(1, drawPixel<T>);
                rows.push_back(images.back().template data<T>());
                weights[i] = drawPixel<T>();
            }
            TestImage dst(7, row, static_cast<int>(sizeof(T)));
            Snapshot expected = dst.snapshot();
            for (int x = 0; x < row.width; ++x) {
                T sum = weights[0] * images[0].template view<T>(1).get(x, 0);
                for (int i = 1; i < count; ++i) {
                    const T product = weights[i] * images[static_cast<size_t>(i)].template view<T>(1).get(x, 0);
                    sum += product;
                }
                expected.template view<T>(1).set(x, 0, 0, sum);
            }
            ASSERT_EQ(QOR_OK,
                      call(function, rows.data(), static_cast<const T*>(weights), count, dst.data<T>(), row.width));
            QORI_EXPECT_UNCHANGED(dst, expected);
        });
}

template <class, Layout, class Function>
void sumWeightedRows(const char* name, Function function) {
    checkWeightedRows(function);
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(NormsSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/norms.inc"
#undef QORI_MEMBER

TEST(Norms, SumsOfMorePixelsThan32BitsCount) {
    const std::vector<uint8_t> row(65'536 * 4, 255);
    double r[4] = {};
    ASSERT_EQ(QOR_OK, qoriSum_8u_C1R(row.data(), 0, {65'536, 65'536}, r));
    EXPECT_EQ(255 * 4'294'967'296.0, r[0]);
    ASSERT_EQ(QOR_OK, qoriSum_8u_C4R(row.data(), 0, {65'536, 8'192}, r));
    for (double sum : r) EXPECT_EQ(255 * 536'870'912.0, sum);
    // The number of pixels wraps around: 2^31 reads as -2^31.
    ASSERT_EQ(QOR_OK, qoriMean_8u_C1R(row.data(), 0, {65'536, 32'768}, r));
    EXPECT_EQ(-255.0, r[0]);
}

TEST(Norms, SumsOfSquaresPast64Bits) {
    constexpr int kSide = 65'538;  // 65535^2 a pixel passes 2^64 by seven digits; rows overlap, each one pixel on
    const std::vector<uint16_t> brightest(2 * kSide, 65'535);
    double r = 0;
    ASSERT_EQ(QOR_OK, qoriNorm_L2_16u_C1R(brightest.data(), 2, {kSide, kSide}, &r));
    EXPECT_EQ(65'535.0 * kSide, r);
    const std::vector<int16_t> low(2 * kSide, INT16_MIN), high(2 * kSide, INT16_MAX);
    ASSERT_EQ(QOR_OK, qoriNormDiff_L2_16s_C1R(low.data(), 2, high.data(), 2, {kSide, kSide}, &r));
    EXPECT_EQ(65'535.0 * kSide, r);
}

TEST(Norms, DotProductsAddFromLeftToRightBeyond53Bits) {
    constexpr int kPixels = 3'000'000;  // above 2^53 after some two million
    std::vector<uint16_t> a(kPixels * 3), b(kPixels * 3);
    for (auto* image : {&a, &b})
        for (uint16_t& element : *image) element = static_cast<uint16_t>(65'535 - random().below(1'000));
    const auto expected = [&](int channel, int n, int pixels) {
        double sum = 0;
        for (int i = channel; i < pixels * n; i += n)
            sum += static_cast<double>(a[static_cast<size_t>(i)]) * static_cast<double>(b[static_cast<size_t>(i)]);
        return sum;
    };
    double r[3] = {};
    EXPECT_EQ(QOR_OK, qoriDotProd_16u64f_C1R(a.data(), 6'000, b.data(), 6'000, {3'000, 3'000}, r));
    EXPECT_EQ(expected(0, 1, 9'000'000), r[0]);
    EXPECT_EQ(QOR_OK, qoriDotProd_16u64f_C3R(a.data(), 6, b.data(), 6, {kPixels, 1}, r));
    for (int c = 0; c < 3; ++c) EXPECT_EQ(expected(c, 3, kPixels), r[c]);
}

TEST(Norms, AccurateFloatSumsCountPastSinglePrecision) {
    const std::vector<float> ones(16'777'217, 1.0f);
    double sum = 0;
    EXPECT_EQ(QOR_OK, qoriSum_32f_C1R(ones.data(), 4, {16'777'217, 1}, &sum, hintAccurate));
    EXPECT_EQ(16'777'217.0, sum);
}

TEST(Norms, MagnitudesOfLowestValues) {
    double r = 0;
    const int16_t lowest16 = INT16_MIN;
    const int32_t lowest32 = INT32_MIN;
    EXPECT_EQ(QOR_OK, qoriNorm_Inf_16s_C1R(&lowest16, 2, {1, 1}, &r));
    EXPECT_EQ(32'768.0, r);
    EXPECT_EQ(QOR_OK, qoriNorm_Inf_32s_C1R(&lowest32, 4, {1, 1}, &r));
    EXPECT_EQ(2'147'483'648.0, r);
}

TEST(Norms, NotANumberCountsInSumsAndIsIgnoredInTheLargest) {
    std::vector<float> row(101, 2.0f);
    row[57] = std::nanf("");
    double r = 0;
    for (int32_t hint : {int32_t{hintFast}, int32_t{hintAccurate}}) {
        EXPECT_EQ(QOR_OK, qoriSum_32f_C1R(row.data(), 404, {101, 1}, &r, hint));
        EXPECT_TRUE(std::isnan(r));
    }
    EXPECT_EQ(QOR_OK, qoriNorm_Inf_32f_C1R(row.data(), 404, {101, 1}, &r));
    EXPECT_EQ(2.0, r);
}

TEST(Norms, RelativeToZeroWarnsAndGivesTheDifference) {
    const int16_t a[6] = {3, 5, -4, 0, 0, 0}, zeros[6] = {}, second[6] = {0, 2, 0, 0, 0, 0};
    const float f[2] = {3, -4}, tiny[2] = {1e-45f, 0}, none[2] = {};
    double r[3] = {};
    EXPECT_EQ(QOR_WARN_DIV_BY_ZERO, qoriNormRel_L2_16s_C1R(a, 12, zeros, 12, {3, 1}, r));
    EXPECT_EQ(std::sqrt(50.0), r[0]);
    EXPECT_EQ(QOR_WARN_DIV_BY_ZERO, qoriNormRel_Inf_16s_C1R(a, 12, zeros, 12, {3, 1}, r));
    EXPECT_EQ(5.0, r[0]);
    EXPECT_EQ(QOR_WARN_DIV_BY_ZERO, qoriNormRel_L1_16s_C3R(a, 12, second, 12, {2, 1}, r));
    EXPECT_EQ(3.0, r[0]);
    EXPECT_EQ(1.5, r[1]);  // one channel's zero does not keep the others from being divided
    EXPECT_EQ(4.0, r[2]);
    EXPECT_EQ(QOR_WARN_DIV_BY_ZERO, qoriNormRel_L2_32f_C1R(f, 8, none, 8, {2, 1}, r, hintAccurate));
    EXPECT_EQ(5.0, r[0]);
    EXPECT_EQ(QOR_OK, qoriNormRel_Inf_32f_C1R(f, 8, tiny, 8, {2, 1}, r));  // subnormal, but not in double precision
    EXPECT_EQ(4.0 / static_cast<double>(1e-45f), r[0]);
}

TEST(Norms, ChecksPointersSizesThenSteps) {
    const uint8_t pixel[4] = {1, 2, 3, 4};
    const uint8_t* none = nullptr;
    double r[4] = {-7, -7, -7, -7};
    const QorImageSize empty{0, 0}, one{1, 1};
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriSum_8u_C1R(none, 1, empty, r));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriSum_8u_C1R(pixel, 1, empty, nullptr));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriMean_8u_C1R(none, 1, empty, nullptr));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriMean_8u_C4R(none, 1, empty, r));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriNormDiff_L1_8u_C1R(pixel, 1, none, 1, empty, r));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriDotProd_8u64f_C1R(none, 0, pixel, 0, empty, r));
    for (QorImageSize bad : {QorImageSize{0, 1}, QorImageSize{1, 0}, QorImageSize{INT32_MIN, 1}, QorImageSize{1, -1}}) {
        EXPECT_EQ(QOR_ERR_SIZE, qoriSum_8u_C1R(pixel, 0, bad, r));
        EXPECT_EQ(QOR_ERR_SIZE, qoriMean_8u_C3R(pixel, 0, bad, r));
        EXPECT_EQ(QOR_ERR_SIZE, qoriNorm_L2_8u_AC4R(pixel, 0, bad, r));
        EXPECT_EQ(QOR_ERR_SIZE, qoriNormRel_Inf_8u_C1R(pixel, 0, pixel, 0, bad, r));
        EXPECT_EQ(QOR_ERR_SIZE, qoriDotProd_8u64f_C3R(pixel, 0, pixel, 0, bad, r));
    }
    for (int32_t step : {0, -4}) {
        EXPECT_EQ(QOR_ERR_STEP, qoriNorm_Inf_8u_C1R(pixel, step, one, r));
        EXPECT_EQ(QOR_ERR_STEP, qoriNormDiff_L2_8u_C1R(pixel, 4, pixel, step, one, r));
        EXPECT_EQ(QOR_ERR_STEP, qoriNormRel_L1_8u_C4R(pixel, step, pixel, 4, one, r));
    }
    EXPECT_EQ(QOR_ERR_SIZE, qoriDotProd_8u64f_C1R(pixel, 0, pixel, 4, one, r));
    EXPECT_EQ(QOR_ERR_SIZE, qoriDotProd_8u64f_C1R(pixel, 4, pixel, 0, one, r));
    for (double untouched : r) EXPECT_EQ(-7, untouched);
    EXPECT_EQ(QOR_OK, qoriDotProd_8u64f_C3R(pixel, 0, pixel, 0, one, r));
}

TEST(Norms, WeightedRowsCheckArraysLengthsThenRows) {
    const float row[2] = {1, 2}, weights[2] = {1, 1};
    const float* rows[2] = {row, nullptr};
    float dst[2] = {-7, -7};
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriDotProdCol_32f_L2(nullptr, weights, 0, dst, 0));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriDotProdCol_32f_L2(rows, nullptr, 0, dst, 0));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriDotProdCol_32f_L2(rows, weights, 0, nullptr, 0));
    EXPECT_EQ(QOR_ERR_SIZE, qoriDotProdCol_32f_L2(rows, weights, 2, dst, 0));
    EXPECT_EQ(QOR_ERR_SIZE, qoriDotProdCol_32f_L2(rows, weights, 0, dst, 2));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriDotProdCol_32f_L2(rows, weights, 2, dst, 2));
    EXPECT_EQ(-7, dst[0]);
}

}  // namespace
}  // namespace qori::test
