// SPDX-License-Identifier: Apache-2.0
#include <cmath>

#include "correlation_cases.h"

namespace qori::test {
namespace {

/// Results of integers are exact in double precision, then rounded to float; of floats they are summed in doubles.
template <class S, class D>
double toleranceOf() {
    if constexpr (std::is_same_v<D, double>)
        return 1e-12;
    else
        return std::is_integral_v<S> ? 6e-8 : 1e-6;
}

Placement placementOf(std::string_view name) {
    return name.find("Full") != name.npos    ? Placement::full
           : name.find("Valid") != name.npos ? Placement::valid
                                             : Placement::same;
}
Normaliser normaliserOf(std::string_view name) {
    return name.find("_NormLevel_") != name.npos ? Normaliser::centred
           : name.find("_Norm_") != name.npos    ? Normaliser::energy
                                                 : Normaliser::none;
}

/// Templates around the width of a tap's cell, of a vector and of the rows that are done together; sources as large
/// and larger.
std::vector<Job> smallJobs(Placement placement, Normaliser normaliser) {
    constexpr QorImageSize kTemplates[] = {{1, 1}, {2, 1}, {1, 2}, {3, 3}, {5, 4}, {8, 2}, {7, 9}, {16, 5}, {19, 3}};
    constexpr QorImageSize kMore[] = {{0, 0}, {1, 3}, {7, 1}, {14, 6}, {33, 12}};
    std::vector<Job> jobs;
    int number = 0;
    for (const QorImageSize tpl : kTemplates)
        for (const QorImageSize more : kMore) {
            jobs.push_back({{tpl.width + more.width, tpl.height + more.height}, tpl, placement, normaliser});
            jobs.back().padding = number % 3 == 0 ? 0 : number;
            jobs.back().atBegin = number % 2 == 1;
            jobs.back().scale = std::array{-8, -7, 0, -12}[static_cast<size_t>(number % 4)];
            ++number;
        }
    return jobs;
}

template <class S, class D, Layout layout, class Function>
void runOlder(Function function, const std::vector<Job>& jobs) {
    constexpr int n = channels(layout);
    for (const Job& job : jobs) {
        SCOPED_TRACE(describe(job));
        Scene<S, D> scene(job, n);
        scene.src.template fill<S>(n, drawPixel<S>);
        scene.tpl.template fill<S>(n, drawPixel<S>);
        const Snapshot src = scene.src.snapshot(), tpl = scene.tpl.snapshot(), dst = scene.dst.snapshot();
        const auto run = [&](auto... scale) {
            return call(function, scene.src.template data<S>(), scene.src.step(), job.src, scene.tpl.template data<S>(),
                        scene.tpl.step(), job.tpl, scene.dst.template data<D>(), scene.dst.step(), scale...);
        };
        if constexpr (std::is_same_v<D, uint8_t>)
            ASSERT_EQ(QOR_OK, run(job.scale));
        else
            ASSERT_EQ(QOR_OK, run());
        scene.compare(layout == Layout::AC4 ? 3 : n, toleranceOf<S, D>(), dst);
        QORI_EXPECT_UNCHANGED(scene.src, src);
        QORI_EXPECT_UNCHANGED(scene.tpl, tpl);
        if (testing::Test::HasFailure()) return;
    }
}

template <class S, class D, Layout layout, class Function>
void sweep(const char* name, Function function) {
    runOlder<S, D, layout>(function, smallJobs(placementOf(name), normaliserOf(name)));
    markSwept(name);
}

constexpr bool isOlder(std::string_view name) { return name.substr(0, 17) != "qoriCrossCorrNorm"; }

TEST(CrossCorr, EveryShapeTypeAndLayout) {
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    if constexpr (isOlder(#name)) {                              \
        SCOPED_TRACE(#name);                                     \
        sweep<S, D, Layout::SL>(#name, name);                    \
    }
#include "members/crosscorr.inc"
#undef QORI_MEMBER
}

/// Templates that are transformed, in layouts of several channels and in types that have no algorithm argument.
TEST(CrossCorr, OlderFormsOfLargeTemplates) {
    const auto jobs = [](Placement placement, Normaliser normaliser) {
        return std::vector<Job>{{{60, 50}, {33, 37}, placement, normaliser, 3, false, -8},
                                {{50, 71}, {40, 21}, placement, normaliser, 0, true, -7}};
    };
    const auto full = jobs(Placement::full, Normaliser::centred);
    runOlder<double, double, Layout::C1>(qoriCrossCorrFull_NormLevel_64f_C1R, full);
    runOlder<uint8_t, uint8_t, Layout::C4>(qoriCrossCorrFull_NormLevel_8u_C4RSfs, full);
    runOlder<int8_t, float, Layout::C3>(qoriCrossCorrSame_Norm_8s32f_C3R, jobs(Placement::same, Normaliser::energy));
    const auto valid = jobs(Placement::valid, Normaliser::centred);
    runOlder<uint16_t, float, Layout::AC4>(qoriCrossCorrValid_NormLevel_16u32f_AC4R, valid);
    runOlder<double, double, Layout::C1>(qoriCrossCorrValid_NormLevel_64f_C1R, valid);
}

/// With a buffer of exactly the reported size, full of garbage, that ends at a no-access page.
template <class S, class D, class Function>
QorResult callAlgorithm(Function function, const Scene<S, D>& scene, int32_t hint) {
    const Job& job = scene.job;
    int32_t bytes = 0;
    EXPECT_EQ(QOR_OK, call(qoriCrossCorrNormGetBufferSize, job.src, job.tpl, job.algorithm(hint), &bytes));
    const TestImage buffer = block(3, bytes);
    buffer.fill<uint8_t>(1, [] { return uint8_t{0xFF}; });
    const auto run = [&](auto... scale) {
        return call(function, scene.src.template data<S>(), scene.src.step(), job.src, scene.tpl.template data<S>(),
                    scene.tpl.step(), job.tpl, scene.dst.template data<D>(), scene.dst.step(), scale...,
                    job.algorithm(hint), buffer.data<uint8_t>());
    };
    if constexpr (std::is_same_v<D, uint8_t>)
        return run(job.scale);
    else
        return run();
}

template <class S, class D, class Function>
void runAlgorithm(Function function, const Job& job, int32_t hint, double tolerance, auto fill) {
    SCOPED_TRACE(describe(job) + ", hint " + std::to_string(hint));
    Scene<S, D> scene(job, 1);
    fill(scene);
    const Snapshot src = scene.src.snapshot(), tpl = scene.tpl.snapshot(), dst = scene.dst.snapshot();
    ASSERT_EQ(QOR_OK, (callAlgorithm<S, D>(function, scene, hint)));
    scene.compare(1, tolerance, dst);
    QORI_EXPECT_UNCHANGED(scene.src, src);
    QORI_EXPECT_UNCHANGED(scene.tpl, tpl);
}

constexpr int32_t kHints[] = {0, corrTransform, corrDirect};

template <class S, class D, class Function>
void sweepAlgorithms(const char* name, Function function) {
    for (const Placement placement : {Placement::full, Placement::valid, Placement::same})
        for (const Normaliser normaliser : {Normaliser::none, Normaliser::energy, Normaliser::centred}) {
            std::vector<Job> jobs = smallJobs(placement, normaliser);
            for (size_t i = 0; i < jobs.size(); ++i) {
                runAlgorithm<S, D>(function, jobs[i], kHints[i % 3], toleranceOf<S, D>(), [](const auto& scene) {
                    scene.src.template fill<S>(1, drawPixel<S>);
                    scene.tpl.template fill<S>(1, drawPixel<S>);
                });
                if (testing::Test::HasFailure()) return;
            }
        }
    markSwept(name);
}

TEST(CrossCorr, EveryAlgorithm) {
    sweepAlgorithms<uint8_t, float>("qoriCrossCorrNorm_8u32f_C1R", qoriCrossCorrNorm_8u32f_C1R);
    sweepAlgorithms<uint16_t, float>("qoriCrossCorrNorm_16u32f_C1R", qoriCrossCorrNorm_16u32f_C1R);
    sweepAlgorithms<float, float>("qoriCrossCorrNorm_32f_C1R", qoriCrossCorrNorm_32f_C1R);
    sweepAlgorithms<uint8_t, uint8_t>("qoriCrossCorrNorm_8u_C1RSfs", qoriCrossCorrNorm_8u_C1RSfs);
    markSwept("qoriCrossCorrNormGetBufferSize");
}

/// Several tiles in either direction, both ways.
TEST(CrossCorr, LargeSourcesAndTemplates) {
    struct Sizes {
        QorImageSize src, tpl;
    };
    constexpr Sizes kSizes[] = {{{1100, 21}, {3, 2}},  {{40, 700}, {2, 5}},   {{90, 80}, {40, 37}},
                                {{150, 90}, {27, 12}}, {{45, 300}, {3, 200}}, {{300, 20}, {260, 6}}};
    int number = 0;
    for (const auto& [src, tpl] : kSizes)
        for (const int32_t hint : {int32_t{corrTransform}, int32_t{corrDirect}}) {
            const Job job{src, tpl, static_cast<Placement>(number % 3), static_cast<Normaliser>(number / 2 % 3),
                          number};
            ++number;
            const auto fill = [](const auto& scene, auto draw) {
                scene.src.template fill<decltype(draw())>(1, draw);
                scene.tpl.template fill<decltype(draw())>(1, draw);
            };
            runAlgorithm<uint8_t, float>(qoriCrossCorrNorm_8u32f_C1R, job, hint, 6e-8,
                                         [&](const auto& scene) { fill(scene, drawPixel<uint8_t>); });
            runAlgorithm<uint16_t, float>(qoriCrossCorrNorm_16u32f_C1R, job, hint, 6e-8,
                                          [&](const auto& scene) { fill(scene, drawPixel<uint16_t>); });
            runAlgorithm<float, float>(qoriCrossCorrNorm_32f_C1R, job, hint, 1e-6,
                                       [&](const auto& scene) { fill(scene, drawPixel<float>); });
        }
}

/// Templates of 32,512 pixels and more, whose sums of 8-bit products leave 32 bits.
TEST(CrossCorr, SumsThatLeave32Bits) {
    for (const QorImageSize tpl : {QorImageSize{8, 4063}, {16, 2032}, {10, 3310}}) {
        const Job job{{tpl.width + 3, tpl.height + 2}, tpl, Placement::valid, Normaliser::none};
        for (const int32_t hint : kHints)
            runAlgorithm<uint8_t, float>(qoriCrossCorrNorm_8u32f_C1R, job, hint, 6e-8, [](const auto& scene) {
                scene.src.template fill<uint8_t>(1, [] { return uint8_t{255}; });
                scene.tpl.template fill<uint8_t>(1, [] { return uint8_t{255}; });
            });
    }
}

/// A photograph's kinds of places: slopes, edges, noise, and areas that are burnt out but for a few pixels.
template <class T>
void fillScene(const TestImage& image, QorImageSize size, double offset, double contrast) {
    const View<T> pixels = image.view<T>(1);
    for (int y = 0; y < size.height; ++y)
        for (int x = 0; x < size.width; ++x) {
            double value = 0.4 * x / size.width + 0.3 * std::sin(0.2 * y) + 0.05 * (random().below(5) - 2);
            if ((x / 23 + y / 17) % 3 == 0) value = random().oneIn(40) ? 0.98 : 1;
            if ((x / 29 + y / 31) % 4 == 1) value = 0;
            pixels.set(x, y, 0, static_cast<T>(offset + std::round(contrast * value * 255) / 255));
        }
}

template <class T, class Function>
void compareScene(Function function, double offset, double contrast) {
    SCOPED_TRACE(std::string("offset ") + std::to_string(offset) + ", contrast " + std::to_string(contrast));
    for (const QorImageSize tpl : {QorImageSize{3, 3}, {16, 16}, {26, 60}})
        for (const int32_t hint : {int32_t{corrTransform}, int32_t{corrDirect}})
            for (const Normaliser normaliser : {Normaliser::energy, Normaliser::centred}) {
                const Job job{{90, 70}, tpl, Placement::valid, normaliser};
                runAlgorithm<T, float>(function, job, hint, 1e-5, [&](const auto& scene) {
                    fillScene<T>(scene.src, job.src, offset, contrast);
                    fillScene<T>(scene.tpl, job.tpl, offset, contrast);
                });
                if (testing::Test::HasFailure()) return;
            }
}

TEST(CrossCorr, OffsetsDoNotCostPrecision) {
    compareScene<uint8_t>(qoriCrossCorrNorm_8u32f_C1R, 0, 255);
    compareScene<uint8_t>(qoriCrossCorrNorm_8u32f_C1R, 250, 3);
    compareScene<uint16_t>(qoriCrossCorrNorm_16u32f_C1R, 0, 65535);
    compareScene<uint16_t>(qoriCrossCorrNorm_16u32f_C1R, 60'000, 4);
    compareScene<uint16_t>(qoriCrossCorrNorm_16u32f_C1R, 60'000, 1);
    compareScene<float>(qoriCrossCorrNorm_32f_C1R, 0, 1);
    compareScene<float>(qoriCrossCorrNorm_32f_C1R, 1000, 255);
    compareScene<float>(qoriCrossCorrNorm_32f_C1R, -60'000, 4);
    compareScene<float>(qoriCrossCorrNorm_32f_C1R, 1e7, 255);
}

/// The products whose difference is a window's energy leave the 53 bits of a double.
TEST(CrossCorr, NearlyConstantWindows) {
    const Job job{{40, 135}, {27, 120}, Placement::valid, Normaliser::centred};
    const auto draw = [] { return static_cast<uint16_t>(random().oneIn(500) ? 65534 : 65535); };
    for (const int32_t hint : kHints)
        runAlgorithm<uint16_t, float>(qoriCrossCorrNorm_16u32f_C1R, job, hint, 6e-8, [&](const auto& scene) {
            scene.src.template fill<uint16_t>(1, draw);
            scene.tpl.template fill<uint16_t>(1, draw);
        });
}

/// What an element that is huge or not finite does to results ends where its windows end.
TEST(CrossCorr, HugeAndNonFiniteElements) {
    const Job job{{60, 50}, {9, 7}, Placement::full, Normaliser::centred};
    for (const int32_t hint : kHints)
        for (const float bad : {std::nanf(""), HUGE_VALF, -HUGE_VALF, 1e25f}) {
            SCOPED_TRACE(std::to_string(bad) + ", hint " + std::to_string(hint));
            Scene<float, float> scene(job, 1);
            scene.src.fill<float>(1, drawPixel<float>);
            scene.tpl.fill<float>(1, drawPixel<float>);
            scene.src.view<float>(1).set(20, 30, 0, bad);
            ASSERT_EQ(QOR_OK, (callAlgorithm<float, float>(qoriCrossCorrNorm_32f_C1R, scene, hint)));
            const reference::Correlation correlation(reference::plane(scene.src.view<float>(1), job.src, 0),
                                                     reference::plane(scene.tpl.view<float>(1), job.tpl, 0),
                                                     Normaliser::centred);
            for (int y = 0; y < 56; ++y)
                for (int x = 0; x < 68; ++x) {
                    const float result = scene.dst.view<float>(1).get(x, y);
                    if (!std::isfinite(bad) && x >= 20 && x < 29 && y >= 30 && y < 37)
                        ASSERT_TRUE(std::isnan(result)) << x << ", " << y;
                    else
                        ASSERT_NEAR(correlation.at(x - 8, y - 6).value, result, 1e-6) << x << ", " << y;
                }
        }
}

TEST(CrossCorr, ConstantImages) {
    for (const int32_t hint : kHints)
        for (const float value : {0.0f, 1.0f, 0.1f, 60'000.1f}) {
            const Job job{{40, 30}, {7, 5}, Placement::valid, Normaliser::centred};
            // A constant source gives 0, whatever the template; a constant template does not divide by zero.
            for (const bool isSource : {true, false})
                runAlgorithm<float, float>(qoriCrossCorrNorm_32f_C1R, job, hint, isSource ? 0 : 1e-5,
                                           [&](const auto& scene) {
                                               scene.src.template fill<float>(1, drawPixel<float>);
                                               scene.tpl.template fill<float>(1, drawPixel<float>);
                                               const TestImage& image = isSource ? scene.src : scene.tpl;
                                               image.template fill<float>(1, [=] { return value; });
                                           });
            // Without centring, windows and templates of zeros give 0.
            const Job energy{{40, 30}, {7, 5}, Placement::full, Normaliser::energy};
            runAlgorithm<float, float>(qoriCrossCorrNorm_32f_C1R, energy, hint, 1e-6, [&](const auto& scene) {
                scene.src.template fill<float>(1, [=] { return value; });
                scene.tpl.template fill<float>(1, [=] { return value; });
            });
        }
}

/// Exactly 0, whatever the transform's errors.
TEST(CrossCorr, WindowsOfZeros) {
    for (const Normaliser normaliser : {Normaliser::none, Normaliser::energy}) {
        const Job job{{70, 40}, {9, 8}, Placement::full, normaliser};
        for (const int32_t hint : kHints) {
            Scene<float, float> scene(job, 1);
            scene.tpl.fill<float>(1, drawPixel<float>);
            for (int y = 0; y < 40; ++y)
                for (int x = 0; x < 70; ++x) scene.src.view<float>(1).set(x, y, 0, x < 30 ? 0 : drawPixel<float>());
            ASSERT_EQ(QOR_OK, (callAlgorithm<float, float>(qoriCrossCorrNorm_32f_C1R, scene, hint)));
            for (int y = 0; y < 47; ++y)
                for (int x = 0; x < 30; ++x) ASSERT_EQ(0, scene.dst.view<float>(1).get(x, y)) << x << ", " << y;
        }
    }
}

TEST(CrossCorr, ScalesOfAnySize) {
    const uint8_t src[] = {200, 100, 50, 3}, tpl[] = {255};
    // Results of the plain kind: 51,000, 25,500, 12,750 and 765.
    struct Case {
        int32_t scale;
        uint8_t expected[4];
    };
    constexpr Case kCases[] = {{0, {255, 255, 255, 255}},    {8, {199, 100, 50, 3}},
                               {9, {100, 50, 25, 1}},        {2, {255, 255, 255, 191}},
                               {17, {0, 0, 0, 0}},           {128, {0, 0, 0, 0}},
                               {INT32_MAX, {0, 0, 0, 0}},    {INT32_MIN, {255, 255, 255, 255}},
                               {-127, {255, 255, 255, 255}}, {256, {0, 0, 0, 0}}};
    const TestImage buffer = block(3, 65'536);
    for (const auto& [scale, expected] : kCases) {
        uint8_t dst[4] = {};
        EXPECT_EQ(QOR_OK, call(qoriCrossCorrNorm_8u_C1RSfs, src, 4, QorImageSize{4, 1}, tpl, 1, QorImageSize{1, 1}, dst,
                               4, scale, corrPlain | corrValid, buffer.data<uint8_t>()));
        for (int x = 0; x < 4; ++x) EXPECT_EQ(expected[x], dst[x]) << "scale " << scale << ", " << x;
    }
}

constexpr QorImageSize kSource{20, 10}, kPattern{5, 4};

TEST(CrossCorr, QueryChecksInOrder) {
    const TestImage out = block(0, 4);
    auto* bytes = out.data<int32_t>();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriCrossCorrNormGetBufferSize({0, 1}, kPattern, 3, nullptr));
    for (const QorImageSize bad : {QorImageSize{0, 10}, {20, 0}, {-1, 10}, {4, 10}, {20, 3}})
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriCrossCorrNormGetBufferSize(bad, kPattern, 3, bytes));
    for (const QorImageSize bad : {QorImageSize{0, 4}, {5, 0}, {5, INT32_MIN}, {21, 4}, {5, 11}})
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriCrossCorrNormGetBufferSize(kSource, bad, 3, bytes));
    for (const int32_t bad : {3, 255, 0x300, 0xFF00, 0x30000, 0xFF0000, 0x1000000, -1, INT32_MIN})
        QORI_EXPECT_STATUS(QOR_ERR_ALGORITHM, out, qoriCrossCorrNormGetBufferSize(kSource, kPattern, bad, bytes));
    const QorImageSize huge{60'000, 60'000};
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriCrossCorrNormGetBufferSize(huge, huge, corrNorm, bytes));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out,
                       qoriCrossCorrNormGetBufferSize({INT32_MAX, INT32_MAX}, {INT32_MAX, INT32_MAX}, 2, bytes));
    EXPECT_EQ(QOR_OK, qoriCrossCorrNormGetBufferSize({INT32_MAX, INT32_MAX}, kPattern, corrNormLevel, bytes));
    for (int kind = 0; kind <= 2; ++kind)
        for (const int32_t hint : kHints)
            for (int shape = 0; shape <= 2; ++shape)
                EXPECT_EQ(QOR_OK, qoriCrossCorrNormGetBufferSize(kSource, kPattern, kind | hint | shape << 16, bytes));
}

TEST(CrossCorr, OperationsCheckInOrder) {
    const TestImage out = block(0, 2048), work = block(1, 65'536);
    const uint8_t pixels[512] = {};
    auto* dst = out.data<float>();
    const auto status = [&](const uint8_t* src, int32_t srcStep, QorImageSize srcSize, const uint8_t* tpl,
                            int32_t tplStep, QorImageSize tplSize, float* to, int32_t toStep, int32_t algorithm,
                            bool hasBuffer = true) {
        return qoriCrossCorrNorm_8u32f_C1R(src, srcStep, srcSize, tpl, tplStep, tplSize, to, toStep, algorithm,
                                           hasBuffer ? work.data<uint8_t>() : nullptr);
    };
    const QorImageSize none{0, 3};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, status(nullptr, 0, none, pixels, 0, none, dst, 0, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, status(pixels, 0, none, nullptr, 0, none, dst, 0, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, status(pixels, 0, none, pixels, 0, none, nullptr, 0, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status(pixels, 0, none, pixels, 0, kPattern, dst, 0, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status(pixels, 0, kSource, pixels, 0, none, dst, 0, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status(pixels, 0, kPattern, pixels, 0, {6, 4}, dst, 0, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status(pixels, 0, kPattern, pixels, 0, {5, 5}, dst, 0, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, status(pixels, 0, kSource, pixels, 5, kPattern, dst, 96, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, status(pixels, 20, kSource, pixels, -5, kPattern, dst, 96, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, status(pixels, 20, kSource, pixels, 5, kPattern, dst, 0, 3, false));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, status(pixels, 20, kSource, pixels, 5, kPattern, dst, 96, 3, false));
    for (const int32_t bad : {3, 0x300, 0x30000, -1})
        QORI_EXPECT_STATUS(QOR_ERR_ALGORITHM, out, status(pixels, 20, kSource, pixels, 5, kPattern, dst, 96, bad));
    const QorImageSize huge{60'000, 60'000};  // for which the query reports no buffer
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status(pixels, 60'000, huge, pixels, 60'000, huge, dst, 96, corrValid));
    EXPECT_EQ(QOR_OK, status(pixels, 20, kSource, pixels, 5, kPattern, dst, 96, corrValid));
    EXPECT_EQ(QOR_OK, status(pixels, 20, kPattern, pixels, 5, kPattern, dst, 96, corrValid));  // one placement
}

TEST(CrossCorr, OlderFormsAllocateAndFree) {
    const TestImage out = block(0, 4096);
    const float pixels[200] = {};
    const int live = qorTestLiveBlocks();
    const auto run = [&](QorImageSize tpl, int32_t step) {
        return qoriCrossCorrSame_Norm_32f_C1R(pixels, 80, {20, 10}, pixels, step, tpl, out.data<float>(), 80);
    };
    qorTestFailAllocation(1);
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, run({21, 1}, 0));  // before memory is asked for
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, run({5, 1}, 0));
    QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, out, run({5, 1}, 80));
    EXPECT_EQ(QOR_OK, run({5, 1}, 80));
    EXPECT_EQ(live, qorTestLiveBlocks());
    EXPECT_EQ(0, qorTestDamagedBlocks());
}

}  // namespace
}  // namespace qori::test
