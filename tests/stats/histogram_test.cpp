// SPDX-License-Identifier: Apache-2.0
#include <set>

#include "harness/sweep.h"
#include "reference/stats.h"

namespace qori::test {
namespace {

constexpr int resultsOf(Layout layout) { return layout == Layout::AC4 ? 3 : channels(layout); }

template <class T>
using Level = std::conditional_t<std::is_floating_point_v<T>, float, int32_t>;

/// The definition: bin k counts levels[k] <= v < levels[k + 1].
template <class T, class L>
std::vector<int32_t> count(const std::vector<T>& elements, const std::vector<L>& levels) {
    std::vector<int32_t> bins(levels.size() - 1);
    for (size_t k = 0; k + 1 < levels.size(); ++k)
        for (T v : elements) bins[k] += levels[k] <= static_cast<L>(v) && static_cast<L>(v) < levels[k + 1];
    return bins;
}

enum class Order { consecutive, increasing, any };

/// Levels in and around the type's range: for integers also beyond it.
template <class T>
std::vector<Level<T>> drawLevels(Order order, int count) {
    using L = Level<T>;
    std::vector<L> levels;
    if constexpr (std::is_integral_v<T>) {
        const L lowest = std::numeric_limits<T>::min(), span = 1 << 8 * sizeof(T);
        if (order == Order::consecutive) {
            const L first = lowest - 5 + static_cast<L>(random().below(span));
            for (int k = 0; k < count; ++k) levels.push_back(first + k);
            return levels;
        }
        for (int k = 0; k < count; ++k)
            levels.push_back(random().oneIn(8) ? random().value<L>()
                                               : lowest - span / 8 + random().below(span + span / 4));
    } else {
        for (int k = 0; k < count; ++k) levels.push_back(static_cast<L>(random().below(1 << 24) - (1 << 23)) / 4'096);
        if (order == Order::any && count > 3) levels[static_cast<size_t>(random().below(count))] = std::nanf("");
    }
    if (order == Order::any) return levels;
    const std::set<L> sorted(levels.begin(), levels.end());
    levels.assign(sorted.begin(), sorted.end());
    if (levels.size() == 1) levels.push_back(levels[0] + 1);
    return levels;
}

/// Some values exactly at levels.
template <class T>
void fill(const TestImage& image, int n, const std::vector<Level<T>>& levels) {
    const bool flat = random().oneIn(4);
    const T one = random().value<T>();
    image.fill<T>(n, [&]() -> T {
        if (flat && !random().oneIn(30)) return one;
        if (random().oneIn(4))
            return static_cast<T>(levels[static_cast<size_t>(random().below(static_cast<int>(levels.size())))]);
        return random().value<T>();
    });
}

/// Arguments of one call: levels and bins of each channel, and the pointers that multi-channel forms take.
template <class T, int n>
struct Job {
    std::vector<Level<T>> levels[n];
    std::vector<int32_t> bins[n];
    const Level<T>* levelPointers[n];
    int32_t* binPointers[n];
    int32_t counts[n];

    void prepare() {
        for (int c = 0; c < n; ++c) {
            bins[c].assign(levels[c].size(), -7);  // one more than there are bins
            levelPointers[c] = levels[c].data();
            binPointers[c] = bins[c].data();
            counts[c] = static_cast<int32_t>(levels[c].size());
        }
    }
    void expectCounts(const TestImage& src, const Shape& shape, int stored) {
        for (int c = 0; c < n; ++c) {
            SCOPED_TRACE("channel " + std::to_string(c));
            auto expected = count(reference::channel(src.view<T>(stored), shape.roi(), c), levels[c]);
            expected.push_back(-7);
            EXPECT_EQ(expected, bins[c]);
        }
    }
};

/// Runs run(src, shape, job) over shapes and kinds of levels.
template <class T, Layout layout, class Run>
void sweepLevels(const char* name, std::initializer_list<Order> orders, Run run) {
    constexpr int n = resultsOf(layout);
    for (Order order : orders)
        forShapes(smallShapes(), [&](const Shape& shape) {
            if (shape.flipped) return;
            constexpr int counts[] = {2, 3, 5, 17, 40, 110, 257, 300};
            Job<T, n> job;
            for (auto& levels : job.levels) levels = drawLevels<T>(order, counts[random().below(8)]);
            TestImage src(0, shape, channels(layout) * static_cast<int>(sizeof(T)));
            fill<T>(src, channels(layout), job.levels[0]);
            const Snapshot before = src.snapshot();
            job.prepare();
            run(src, shape, job);
            job.expectCounts(src, shape, channels(layout));
            QORI_EXPECT_UNCHANGED(src, before);
        });
    markSwept(name);
}

template <class T, Layout layout, class Function>
void histogramRange(const char* name, Function function) {
    sweepLevels<T, layout>(name, {Order::consecutive, Order::increasing, Order::any},
                           [&](const TestImage& src, const Shape& shape, auto& job) {
                               QorResult status;
                               if constexpr (layout == Layout::C1)
                                   status = call(function, src.data<T>(), src.step(), shape.roi(), job.binPointers[0],
                                                 job.levelPointers[0], job.counts[0]);
                               else
                                   status = call(function, src.data<T>(), src.step(), shape.roi(), job.binPointers,
                                                 job.levelPointers, job.counts);
                               ASSERT_EQ(QOR_OK, status);
                           });
}

template <class T, Layout layout, class Function>
void histogramEven(const char* name, Function function) {
    constexpr int n = resultsOf(layout);
    sweepLevels<T, layout>(name, {Order::any}, [&](const TestImage& src, const Shape& shape, auto& job) {
        int32_t lower[n], upper[n];
        int32_t* levelPointers[n];
        std::vector<int32_t> expected[n];
        for (int c = 0; c < n; ++c) {
            const int bins = job.counts[c] - 1;
            lower[c] = job.levels[c].front();
            upper[c] = job.levels[c].back();
            const int64_t span = int64_t{upper[c]} - lower[c], sign = span < 0 ? -1 : 1;
            for (int k = 0; k <= bins; ++k)  // widths differ by one, the wider bins come first
                expected[c].push_back(static_cast<int32_t>(lower[c] + k * (span / bins) +
                                                           sign * std::min<int64_t>(k, sign * (span % bins))));
            levelPointers[c] = job.levels[c].data();
        }
        QorResult status;
        if constexpr (layout == Layout::C1)
            status = call(function, src.data<T>(), src.step(), shape.roi(), job.binPointers[0], levelPointers[0],
                          job.counts[0], lower[0], upper[0]);
        else
            status = call(function, src.data<T>(), src.step(), shape.roi(), job.binPointers, levelPointers, job.counts,
                          lower, upper);
        ASSERT_EQ(QOR_OK, status);
        for (int c = 0; c < n; ++c) EXPECT_EQ(expected[c], job.levels[c]);
    });
}

template <class T>
constexpr int32_t kTypeCode = std::is_floating_point_v<T> ? qor32f
                              : sizeof(T) == 1            ? qor8u
                              : std::is_signed_v<T>       ? qor16s
                                                          : qor16u;

/// A prepared record and its buffer in guarded memory of the reported sizes.
struct Prepared {
    int32_t specSize = 0, bufferSize = 0;
    TestImage spec, buffer;

    template <class Init>
    Prepared(int32_t type, const int32_t* counts, int n, Init init) : spec(1, {}, 1), buffer(2, {}, 1) {
        EXPECT_EQ(QOR_OK, qoriHistogramGetBufferSize(type, {1, 1}, counts, n, 0, &specSize, &bufferSize));
        spec = TestImage(1, {.width = specSize}, 1);
        buffer = TestImage(2, {.width = bufferSize + 1}, 1);
        init(spec.data<QorHistogramSpec>());
    }
};

template <class T, Layout layout, class Function>
void histogram(const char* name, Function function) {
    constexpr int n = channels(layout);
    sweepLevels<T, layout>(
        name, {Order::consecutive, Order::increasing}, [&](const TestImage& src, const Shape& shape, auto& job) {
            std::vector<float> floats[n];
            const float* pointers[n];
            for (int c = 0; c < n; ++c) {
                auto& levels = job.levels[c];
                if constexpr (std::is_integral_v<T>)  // those that floats hold
                    std::erase_if(levels, [](int32_t level) { return level < -1'000'000 || level > 1'000'000; });
                while (levels.size() < 2) levels.push_back(levels.empty() ? Level<T>{} : levels.back() + 1);
                floats[c].assign(levels.begin(), levels.end());
                pointers[c] = floats[c].data();
            }
            job.prepare();
            Prepared prepared(kTypeCode<T>, job.counts, n, [&](QorHistogramSpec* spec) {
                ASSERT_EQ(QOR_OK, call(qoriHistogramInit, kTypeCode<T>, static_cast<const float* const*>(pointers),
                                       static_cast<const int32_t*>(job.counts), n, spec));
            });
            const Snapshot before = prepared.spec.snapshot();
            const auto* spec = prepared.spec.template data<const QorHistogramSpec>();
            QorResult status;
            if constexpr (layout == Layout::C1)
                status = call(function, src.data<T>(), src.step(), shape.roi(), job.binPointers[0], spec,
                              prepared.buffer.template data<uint8_t>());
            else
                status = call(function, src.data<T>(), src.step(), shape.roi(), job.binPointers, spec,
                              prepared.buffer.template data<uint8_t>());
            ASSERT_EQ(QOR_OK, status);
            QORI_EXPECT_UNCHANGED(prepared.spec, before);
        });
}

/// The sizes, and that each set-up function fills a record of them and nothing around it.
template <class, Layout, class Function>
void histogramSizes(const char* name, Function function) {
    const int32_t counts[4] = {2, 257, 3, 5};
    const std::pair<int32_t, int32_t> bytesPerChannel[] = {
        {qor8u, 1'024}, {qor16u, 262'144}, {qor16s, 262'144}, {qor32f, 0}};
    for (const auto& [type, bytes] : bytesPerChannel)
        for (int n : {1, 3, 4}) {
            int32_t spec = -7, buffer = -7;
            ASSERT_EQ(QOR_OK, call(function, type, QorImageSize{9, 9}, counts, n, n % 2, &spec, &buffer));
            EXPECT_EQ(48 + 4 * (n == 1 ? 2 : n == 3 ? 262 : 267), spec);
            EXPECT_EQ(bytes * n, buffer);
        }
    markSwept(name);
}

template <class T>
std::vector<T> words(const TestImage& spec, int32_t bytes) {
    std::vector<T> all(static_cast<size_t>(bytes) / 4);
    std::memcpy(all.data(), spec.data<uint8_t>(), static_cast<size_t>(bytes));
    return all;
}

template <class, Layout, class Function>
void histogramInit(const char* name, Function function) {
    const float a[3] = {-1.9f, 0.5f, 300.7f}, b[2] = {4, 5}, c[4] = {1, 2, 3, 4};
    const float* levels[3] = {a, b, c};
    const int32_t counts[3] = {3, 2, 4};
    for (int32_t type : {int32_t{qor8u}, int32_t{qor32f}}) {
        Prepared prepared(type, counts, 3, [&](QorHistogramSpec* spec) {
            ASSERT_EQ(QOR_OK, call(function, type, levels, counts, 3, spec));
        });
        const auto record = words<int32_t>(prepared.spec, prepared.specSize);
        EXPECT_EQ((std::vector<int32_t>{type, 3, 0, 0x74736968, 3, 2, 4, 0}),
                  std::vector(record.begin(), record.begin() + 8));
        const auto at = reinterpret_cast<uintptr_t>(prepared.spec.data<uint8_t>());
        EXPECT_EQ(static_cast<int32_t>(48 + (sizeof at == 4 ? at : 0)), record[8]);
        EXPECT_EQ(12, record[9] - record[8]);
        EXPECT_EQ(8, record[10] - record[9]);
        EXPECT_EQ(0, record[11]);
        const auto floats = words<float>(prepared.spec, prepared.specSize);
        if (type == qor32f)
            EXPECT_EQ((std::vector{-1.9f, 0.5f, 300.7f, 4.0f, 5.0f}),
                      std::vector(floats.begin() + 12, floats.begin() + 17));
        else
            EXPECT_EQ((std::vector{-1, 0, 300, 4, 5, 1, 2, 3, 4}), std::vector(record.begin() + 12, record.end()));
    }
    markSwept(name);
}

template <class, Layout, class Function>
void histogramUniformInit(const char* name, Function function) {
    const float lower[3] = {0, -10.5f, 0.1f}, upper[3] = {100, 10.5f, 1.3f};
    const int32_t counts[3] = {8, 5, 7};
    const float three = 3;
    Prepared narrow(qor8u, counts + 1, 1, [&](QorHistogramSpec* spec) {
        ASSERT_EQ(QOR_WARN_ADJUSTED, call(function, int32_t{qor8u}, lower, &three, counts + 1, 1, spec));
    });
    const auto narrowRecord = words<int32_t>(narrow.spec, narrow.specSize);
    EXPECT_EQ((std::vector{0, 0, 1, 2, 3}), std::vector(narrowRecord.begin() + 12, narrowRecord.end()));
    Prepared wide(qor16s, counts, 3, [&](QorHistogramSpec* spec) {
        ASSERT_EQ(QOR_WARN_ADJUSTED,
                  call(function, int32_t{qor16s}, lower, upper, counts, 3, spec));  // channel 2: width 0.2
    });
    const auto record = words<int32_t>(wide.spec, wide.specSize);
    EXPECT_EQ(1, record[2]);
    EXPECT_EQ((std::vector{0, 14, 28, 42, 57, 71, 85, 100, -10, -5, 0, 5, 10, 0, 0, 0, 0, 0, 1, 1}),
              std::vector(record.begin() + 12, record.end()));
    Prepared floats(qor32f, counts, 3, [&](QorHistogramSpec* spec) {
        ASSERT_EQ(QOR_OK, call(function, int32_t{qor32f}, lower, upper, counts, 3, spec));
    });
    const auto levels = words<float>(floats.spec, floats.specSize);
    size_t at = 12;
    for (int c = 0; c < 3; ++c) {
        const float width = (upper[c] - lower[c]) / static_cast<float>(counts[c] - 1);
        for (int k = 0; k < counts[c]; ++k, ++at)
            EXPECT_EQ(k == 0               ? lower[c]
                      : k == counts[c] - 1 ? upper[c]
                                           : static_cast<float>(std::fma(k, double{width}, double{lower[c]})),
                      levels[at]);
    }
    markSwept(name);
}

template <class, Layout, class Function>
void histogramLevels(const char* name, Function function) {
    const float given[4] = {-3.5f, 0, 2.25f, 70'000};
    const float* pointers[1] = {given};
    const int32_t counts[1] = {4};
    for (int32_t type : {int32_t{qor16s}, int32_t{qor32f}}) {
        Prepared prepared(type, counts, 1, [&](QorHistogramSpec* spec) {
            ASSERT_EQ(QOR_OK, qoriHistogramInit(type, pointers, counts, 1, spec));
        });
        float read[5] = {-7, -7, -7, -7, -7};
        float* out[1] = {read};
        ASSERT_EQ(QOR_OK,
                  call(function, prepared.spec.data<const QorHistogramSpec>(), static_cast<float* const*>(out)));
        for (int k = 0; k < 4; ++k) EXPECT_EQ(type == qor32f ? given[k] : std::trunc(given[k]), read[k]);
        EXPECT_EQ(-7, read[4]);
    }
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(HistogramSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/histogram.inc"
#undef QORI_MEMBER

TEST(Histogram, LastLevelIsNotCounted) {
    const uint8_t pixel = 255;
    const int32_t upTo256[3] = {0, 128, 256}, upTo255[3] = {0, 128, 255};
    int32_t bins[2];
    EXPECT_EQ(QOR_OK, qoriHistogramRange_8u_C1R(&pixel, 1, {1, 1}, bins, upTo256, 3));
    EXPECT_EQ(1, bins[1]);
    EXPECT_EQ(QOR_OK, qoriHistogramRange_8u_C1R(&pixel, 1, {1, 1}, bins, upTo255, 3));
    EXPECT_EQ(0, bins[0] + bins[1]);
    int32_t levels[5], four[4];
    EXPECT_EQ(QOR_OK, qoriHistogramEven_8u_C1R(&pixel, 1, {1, 1}, four, levels, 5, 0, 10));
    EXPECT_EQ((std::vector{0, 3, 6, 8, 10}), std::vector(levels, levels + 5));
}

TEST(Histogram, AllWordsOneByOne) {
    std::vector<uint16_t> image(65'536 * 2);
    for (size_t i = 0; i < image.size(); ++i) image[i] = static_cast<uint16_t>(i * 40'503);
    image[0] = 65'535;
    std::vector<int32_t> bins(65'536), expected(65'536, 2);
    expected[0] = 1;
    expected[65'535] = 3;
    std::vector<int32_t> levels(65'537);
    for (size_t i = 0; i < levels.size(); ++i) levels[i] = static_cast<int32_t>(i);
    EXPECT_EQ(QOR_OK,
              qoriHistogramRange_16u_C1R(image.data(), 131'072, {65'536, 2}, bins.data(), levels.data(), 65'537));
    EXPECT_EQ(expected, bins);
    const float lower = 0, upper = 65'536;
    const int32_t count = 65'537;
    Prepared prepared(qor16u, &count, 1, [&](QorHistogramSpec* spec) {
        EXPECT_EQ(QOR_OK, qoriHistogramUniformInit(qor16u, &lower, &upper, &count, 1, spec));
    });
    bins.assign(65'536, -7);
    EXPECT_EQ(QOR_OK, qoriHistogram_16u_C1R(image.data(), 131'072, {65'536, 2}, bins.data(),
                                            prepared.spec.data<QorHistogramSpec>(), prepared.buffer.data<uint8_t>()));
    EXPECT_EQ(expected, bins);
}

TEST(Histogram, FloatsDoNotDependOnTheControlRegister) {
    const float pixels[8] = {0, 1e-40f, 2e-40f, 0.5f, NAN, 1, INFINITY, -1};
    std::vector<float> levels = {0, 1.5e-40f, 0.25f, 2};
    for (int32_t count : {4, 80}) {  // compared with each element, and searched
        while (static_cast<int32_t>(levels.size()) < count) levels.push_back(levels.back() + 1);
        std::vector<int32_t> expected(static_cast<size_t>(count) - 1), bins;
        std::copy_n(std::begin({2, 1, 2}), 3, expected.begin());
        const float* const pointer[1] = {levels.data()};
        for (int circumstance = 0; circumstance < 8; ++circumstance) {
            bins.assign(expected.size(), -7);
            ASSERT_EQ(QOR_OK, call(qoriHistogramRange_32f_C1R, pixels, 32, QorImageSize{8, 1}, bins.data(),
                                   static_cast<const float*>(levels.data()), count));
            EXPECT_EQ(expected, bins);
            Prepared prepared(qor32f, &count, 1, [&](QorHistogramSpec* spec) {
                ASSERT_EQ(QOR_OK, call(qoriHistogramInit, int32_t{qor32f}, pointer, &count, 1, spec));
            });
            const auto* spec = prepared.spec.data<const QorHistogramSpec>();
            bins.assign(expected.size(), -7);
            ASSERT_EQ(QOR_OK, call(qoriHistogram_32f_C1R, pixels, 32, QorImageSize{8, 1}, bins.data(), spec,
                                   prepared.buffer.data<uint8_t>()));
            EXPECT_EQ(expected, bins);
            std::vector<float> read(levels.size());
            float* const out[1] = {read.data()};
            ASSERT_EQ(QOR_OK, call(qoriHistogramGetLevels, spec, out));
            EXPECT_EQ(levels, read);
        }
    }
}

std::vector<float> uniformLevels(int32_t type, float lower, float upper, int32_t count) {
    std::vector<float> read(static_cast<size_t>(count));
    Prepared(type, &count, 1, [&](QorHistogramSpec* spec) {
        EXPECT_EQ(QOR_OK, call(qoriHistogramUniformInit, type, &lower, &upper, &count, 1, spec));
        float* const out[1] = {read.data()};
        EXPECT_EQ(QOR_OK, qoriHistogramGetLevels(spec, out));
    });
    return read;
}

TEST(Histogram, LevelsBeyondTheirTypeBecomeItsEnds) {
    constexpr float beyond = 2147483648.0f;
    const float given[5] = {-INFINITY, 0, 128, beyond, INFINITY};
    const float* const pointers[1] = {given};
    const int32_t four = 4;
    Prepared prepared(qor8u, &four, 1, [&](QorHistogramSpec* spec) {
        const float* const upper[1] = {given + 1};
        ASSERT_EQ(QOR_OK, call(qoriHistogramInit, int32_t{qor8u}, upper, &four, 1, spec));
    });
    const auto record = words<int32_t>(prepared.spec, prepared.specSize);
    EXPECT_EQ((std::vector{0, 128, INT32_MAX, INT32_MAX}), std::vector(record.begin() + 12, record.end()));
    Prepared low(qor8u, &four, 1, [&](QorHistogramSpec* spec) {
        ASSERT_EQ(QOR_OK, call(qoriHistogramInit, int32_t{qor8u}, pointers, &four, 1, spec));
    });
    const uint8_t pixels[4] = {0, 127, 128, 255};
    int32_t bins[3];
    ASSERT_EQ(QOR_OK, qoriHistogram_8u_C1R(pixels, 4, {4, 1}, bins, low.spec.data<QorHistogramSpec>(),
                                           low.buffer.data<uint8_t>()));
    EXPECT_EQ((std::vector{0, 2, 2}), std::vector(bins, bins + 3));
    EXPECT_EQ((std::vector{0.0f, beyond, beyond}), uniformLevels(qor16u, 0, 8e9f, 3));
    EXPECT_EQ((std::vector{-beyond, 0.0f, beyond}), uniformLevels(qor16s, -INFINITY, INFINITY, 3));
    // Floats hold the bounds, but not their difference.
    EXPECT_EQ((std::vector{-3e38f, -1.5e38f, 0.0f, 1.5e38f, 3e38f}), uniformLevels(qor32f, -3e38f, 3e38f, 5));
    EXPECT_EQ((std::vector{-INFINITY, 0.0f, INFINITY}), uniformLevels(qor32f, -INFINITY, INFINITY, 3));
    for (int circumstance = 0; circumstance < 8; ++circumstance)
        EXPECT_NEAR(5e-40, uniformLevels(qor32f, 1e-40f, 9e-40f, 3)[1], 2e-45);
}

TEST(Histogram, SizesBeyond32BitsAreRefused) {
    constexpr int32_t most = (INT32_MAX - 48) / 4;
    int32_t size = -7, buffer = -7;
    for (int32_t type : {int32_t{qor8u}, int32_t{2}})
        for (const auto& [counts, n] : {std::pair{std::array{1 << 30, 2, 2}, 1},
                                        {std::array{most + 1, 2, 2}, 1},
                                        {std::array{most, 2, 2}, 3},
                                        {std::array{INT32_MAX, INT32_MAX, INT32_MAX}, 3}}) {
            EXPECT_EQ(QOR_ERR_SIZE, qoriHistogramGetBufferSize(type, {1, 1}, counts.data(), n, 0, &size, &buffer));
            EXPECT_EQ(-14, size + buffer);
        }
    EXPECT_EQ(QOR_OK, qoriHistogramGetBufferSize(qor8u, {1, 1}, &most, 1, 0, &size, &buffer));
    EXPECT_EQ(48 + 4 * int64_t{most}, size);
}

TEST(Histogram, DirectFormsCheckPointersSizesStepsThenLevels) {
    const uint8_t pixels[4] = {};
    const int32_t given[2] = {0, 1}, counts[3] = {2, 2, 1}, bounds[3] = {0, 0, 0};
    int32_t bins[2] = {-7, -7}, levels[2] = {-7, -7};
    const QorImageSize empty{0, 0}, one{1, 1};
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogramRange_8u_C1R(nullptr, 0, empty, bins, given, 1));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogramRange_8u_C1R(pixels, 0, empty, nullptr, given, 1));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogramEven_8u_C1R(pixels, 0, empty, bins, nullptr, 1, 0, 1));
    EXPECT_EQ(QOR_ERR_SIZE, qoriHistogramRange_8u_C1R(pixels, 0, {1, 0}, bins, given, 1));
    EXPECT_EQ(QOR_ERR_STEP, qoriHistogramRange_8u_C1R(pixels, 0, one, bins, given, 1));
    EXPECT_EQ(QOR_ERR_STEP, qoriHistogramEven_8u_C1R(pixels, -1, one, bins, levels, 1, 0, 1));
    EXPECT_EQ(QOR_ERR_HIST_LEVELS, qoriHistogramEven_8u_C1R(pixels, 1, one, bins, levels, 1, 0, 1));
    int32_t* binArrays[3] = {bins, bins, nullptr};
    int32_t* levelArrays[3] = {levels, levels, levels};
    const int32_t* givenArrays[3] = {given, given, nullptr};
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogramRange_8u_C3R(pixels, 3, empty, binArrays, levelArrays, counts));
    binArrays[2] = bins;
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogramRange_8u_AC4R(pixels, 4, empty, binArrays, givenArrays, counts));
    EXPECT_EQ(QOR_ERR_NULL_PTR,
              qoriHistogramEven_8u_C3R(pixels, 3, empty, binArrays, levelArrays, counts, nullptr, bounds));
    EXPECT_EQ(QOR_ERR_HIST_LEVELS,
              qoriHistogramEven_8u_C3R(pixels, 3, one, binArrays, levelArrays, counts, bounds, bounds));
    EXPECT_EQ(-28, bins[0] + bins[1] + levels[0] + levels[1]);
}

TEST(Histogram, SetUpChecksInOrder) {
    const float up[2] = {1, 2}, same[2] = {1, 1}, lower = 1, upper = 0, nan = std::nanf("");
    const float *good[1] = {up}, *flat[1] = {same}, *missing[3] = {up, nullptr, flat[0]};
    const int32_t two[3] = {2, 2, 1}, few[1] = {1};
    const Shape block{.width = 128};
    TestImage memory(1, block, 1);
    auto* spec = memory.data<QorHistogramSpec>();
    QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, memory, qoriHistogramInit(2, flat, few, 2, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, memory, qoriHistogramInit(qor8u, flat, few, 2, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, memory, qoriHistogramInit(qor8u, nullptr, few, 2, spec));
    QORI_EXPECT_STATUS(QOR_ERR_CHANNELS_UNSUPPORTED, memory, qoriHistogramInit(qor8u, missing, few, 2, spec));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, memory, qoriHistogramInit(qor8u, missing, two, 3, spec));
    QORI_EXPECT_STATUS(QOR_ERR_HIST_LEVELS, memory, qoriHistogramInit(qor8u, flat, few, 1, spec));
    QORI_EXPECT_STATUS(QOR_ERR_BAD_RANGE, memory, qoriHistogramInit(qor8u, flat, two, 1, spec));
    QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, memory, qoriHistogramUniformInit(19, &lower, &upper, few, 2, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, memory, qoriHistogramUniformInit(qor8u, &lower, nullptr, few, 2, spec));
    QORI_EXPECT_STATUS(QOR_ERR_CHANNELS_UNSUPPORTED, memory,
                       qoriHistogramUniformInit(qor8u, &lower, &upper, few, 5, spec));
    QORI_EXPECT_STATUS(QOR_ERR_HIST_LEVELS, memory, qoriHistogramUniformInit(qor8u, &lower, &upper, few, 1, spec));
    QORI_EXPECT_STATUS(QOR_ERR_BAD_RANGE, memory, qoriHistogramUniformInit(qor8u, &lower, &upper, two, 1, spec));
    QORI_EXPECT_STATUS(QOR_ERR_BAD_RANGE, memory, qoriHistogramUniformInit(qor32f, &lower, &nan, two, 1, spec));
    int32_t size = -7, buffer = -7;
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogramGetBufferSize(2, {0, 0}, two, 2, 0, nullptr, &buffer));
    EXPECT_EQ(QOR_ERR_SIZE, qoriHistogramGetBufferSize(2, {0, 0}, two, 2, 0, &size, &buffer));
    EXPECT_EQ(QOR_ERR_CHANNELS_UNSUPPORTED, qoriHistogramGetBufferSize(2, {1, 1}, two, 2, 0, &size, &buffer));
    EXPECT_EQ(QOR_ERR_HIST_LEVELS, qoriHistogramGetBufferSize(2, {1, 1}, two, 3, 0, &size, &buffer));
    EXPECT_EQ(-14, size + buffer);
    EXPECT_EQ(QOR_ERR_DATA_TYPE, qoriHistogramGetBufferSize(2, {1, 1}, two, 1, 0, &size, &buffer));
    EXPECT_EQ(56, size);
    EXPECT_EQ(0, buffer);
    EXPECT_EQ(QOR_OK, qoriHistogramInit(qor32f, good, two, 1, spec));
}

TEST(Histogram, PreparedFormsCheckPointersSizesStepsThenTheRecord) {
    const uint16_t pixels[4] = {};
    alignas(4) uint8_t zeros[64] = {}, buffer[4];
    const auto* spec = reinterpret_cast<const QorHistogramSpec*>(zeros);
    int32_t bins[2] = {-7, -7};
    int32_t* const partly[3] = {bins, nullptr, bins};
    float level = -7;
    float* const levels[1] = {&level};
    const QorImageSize empty{0, 0}, roi{2, 1};
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogram_16u_C1R(nullptr, 0, empty, bins, spec, buffer));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogram_16u_C3R(pixels, 0, empty, partly, spec, buffer));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogram_16u_C1R(pixels, 0, empty, bins, nullptr, buffer));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogram_16u_C1R(pixels, 0, empty, bins, spec, nullptr));
    EXPECT_EQ(QOR_ERR_SIZE, qoriHistogram_16u_C1R(pixels, 0, empty, bins, spec, buffer));
    EXPECT_EQ(QOR_ERR_STEP, qoriHistogram_16u_C1R(pixels, 3, roi, bins, spec, buffer));
    EXPECT_EQ(QOR_ERR_STEP, qoriHistogram_16u_C1R(pixels, 0, roi, bins, spec, buffer));
    EXPECT_EQ(QOR_ERR_BAD_ARG, qoriHistogram_16u_C1R(pixels, 4, roi, bins, spec, buffer));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogramGetLevels(nullptr, levels));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHistogramGetLevels(spec, nullptr));
    EXPECT_EQ(QOR_ERR_BAD_ARG, qoriHistogramGetLevels(spec, levels));
    EXPECT_EQ(-7, level);
    EXPECT_EQ(-14, bins[0] + bins[1]);
}

}  // namespace
}  // namespace qori::test
