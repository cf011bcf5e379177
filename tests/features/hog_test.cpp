// SPDX-License-Identifier: Apache-2.0
#include <cmath>
#include <limits>
#include <vector>

#include "harness/window.h"
#include "reference/border_axis.h"
#include "reference/hog.h"

namespace qori::test {
namespace {

using reference::HogGradient;
using reference::HogVote;

enum Slot { kSrc, kDst, kBuffer, kPlan };
constexpr int32_t kMirror = 3;
constexpr QorHogConfig kPersons{0, 8, 16, 8, 9, 8.0f, 0.2f, {64, 128}};

/// A plan in exactly its bytes, at any address.
class Plan {
public:
    explicit Plan(const QorHogConfig& config)
        : block_(test::block(kPlan, 16 * config.blockSize * config.blockSize + 72, random().below(4))) {
        int32_t bytes = 0;
        EXPECT_EQ(QOR_OK, call(qoriHOGGetSize, &config, &bytes));
        EXPECT_EQ(16 * config.blockSize * config.blockSize + 72, bytes);
        EXPECT_EQ(QOR_OK, call(qoriHOGInit, &config, block_.data<QorHogPlan>()));
    }
    const QorHogPlan* get() const { return block_.data<QorHogPlan>(); }
    int floats() const {
        int32_t bytes = 0;
        EXPECT_EQ(QOR_OK, call(qoriHOGGetDescriptorSize, get(), &bytes));
        return bytes / 4;
    }
    int bufferBytes(QorImageSize roi) const {
        int32_t bytes = 0;
        EXPECT_EQ(QOR_OK, call(qoriHOGGetBufferSize, get(), roi, &bytes));
        EXPECT_EQ(12 * roi.width * roi.height, bytes);
        return bytes;
    }

private:
    TestImage block_;
};

template <class T>
struct Source {
    View<T> region;  ///< Its origin is pixel (0, 0).
    QorImageSize area;
    int32_t border;
    T value[3];
    int channels;

    bool opens(int32_t flag) const { return (border & 15) == borderReadAll || (border & flag) != 0; }
    float at(int x, int y, int c) const {
        const reference::BorderAxis columns{area.width, opens(borderReadLeft), opens(borderReadRight)};
        const reference::BorderAxis rows{area.height, opens(borderReadTop), opens(borderReadBottom)};
        const int32_t kind = border & 15;
        if (kind == borderConstant && (columns.isMissing(x) || rows.isMissing(y))) return static_cast<float>(value[c]);
        return static_cast<float>(region.get(columns.seen(x, kind == kMirror), rows.seen(y, kind == kMirror), c));
    }
    HogVote vote(int x, int y, int nbins) const {
        HogGradient best{};
        for (int c = 0; c < channels; ++c) {
            const HogGradient g{at(x + 1, y, c) - at(x - 1, y, c), at(x, y + 1, c) - at(x, y - 1, c)};
            if (c == 0 || g.squares() > best.squares()) best = g;
        }
        return reference::voteOf(best, nbins);
    }
};

QorImageSize areaOf(const QorHogConfig& config, QorImageSize roi) {
    const auto trim = [&](int side) {
        return (side - config.blockSize) / config.blockStride * config.blockStride + config.blockSize;
    };
    return {trim(roi.width), trim(roi.height)};
}

template <class T>
T drawPixel(int range) {
    if constexpr (std::is_same_v<T, float>)
        return static_cast<T>(random().below(range)) / 8 - 3;
    else
        return static_cast<T>(random().below(range) * (sizeof(T) == 2 && range > 200 ? 257 : 1));
}

template <class T, int channels, class Function>
QorResult run(Function function, const T* src, int32_t step, QorImageSize roi, const std::vector<QorPoint2D>& locations,
              float* dst, const Plan& plan, int32_t border, const T* value, uint8_t* buffer) {
    const auto count = static_cast<int32_t>(locations.size());
    const bool isNull = count == 1 && locations[0].x == 0 && locations[0].y == 0 && random().oneIn(2);
    const QorPoint2D* const at = isNull ? nullptr : locations.data();
    if constexpr (channels == 1)
        return call(function, src, step, roi, at, count, dst, plan.get(), border, *value, buffer);
    else
        return call(function, src, step, roi, at, count, dst, plan.get(), border, value, buffer);
}

struct Case {
    QorHogConfig config;
    QorImageSize roi;
    std::vector<QorPoint2D> locations;
    int32_t border;
};

template <class T, int channels, class Function>
void checkCase(const Case& job, Function function) {
    const QorHogConfig& config = job.config;
    SCOPED_TRACE(testing::Message() << "cell " << config.cellSize << " stride " << config.blockStride << " bins "
                                    << config.nbins << " window " << config.winSize.width << "x"
                                    << config.winSize.height << " roi " << job.roi.width << "x" << job.roi.height
                                    << " border " << job.border << " windows " << job.locations.size());
    Source<T> source{{}, areaOf(config, job.roi), job.border, {}, channels};
    const auto side = [&](int32_t flag) { return source.opens(flag) ? 1 : 0; };
    const Around around{side(borderReadLeft), side(borderReadTop), side(borderReadRight), side(borderReadBottom)};
    const Shape shape{.width = job.roi.width,
                      .height = job.roi.height,
                      .padding = static_cast<int>(sizeof(T)) * random().below(3),
                      .atBegin = random().oneIn(2)};
    const TestImage src(kSrc, withAround(shape, around), channels * static_cast<int>(sizeof(T)));
    const int range = random().oneIn(3) ? 4 : 255;  // few levels make gradients along the axes, and none
    src.fill<T>(channels, [=] { return drawPixel<T>(range); });
    for (T& v : source.value) v = drawPixel<T>(255);
    const ptrdiff_t inside =
        around.top * ptrdiff_t{src.step()} + around.left * channels * static_cast<ptrdiff_t>(sizeof(T));
    source.region = {src.data<uint8_t>() + inside, src.step(), channels};
    const Plan plan(config);
    const int floats = plan.floats();
    std::vector<double> expected;
    for (QorPoint2D at : job.locations) {
        if (at.x < 0 || at.y < 0 || at.x > source.area.width - config.winSize.width ||
            at.y > source.area.height - config.winSize.height)
            continue;
        const std::vector<double> window =
            reference::hogWindow(config, at, [&](int x, int y) { return source.vote(x, y, config.nbins); });
        expected.insert(expected.end(), window.begin(), window.end());
    }
    const TestImage dst = block(kDst, std::max(4 * static_cast<int>(expected.size()), 4), 4 * random().below(5));
    ASSERT_EQ(expected.size() % static_cast<size_t>(floats), 0u);
    const TestImage buffer = block(kBuffer, plan.bufferBytes(job.roi), random().below(4));
    buffer.fill<uint8_t>(1, [] { return static_cast<uint8_t>(random().bits()); });
    const Snapshot before = src.snapshot();
    Snapshot after = dst.snapshot();
    ASSERT_EQ(QOR_OK, (run<T, channels>(function, reinterpret_cast<const T*>(src.data<uint8_t>() + inside), src.step(),
                                        job.roi, job.locations, dst.data<float>(), plan, job.border, source.value,
                                        buffer.data<uint8_t>())));
    size_t wrong = 0;
    for (size_t i = 0; i < expected.size(); ++i) {
        const float made = dst.view<float>(1).get(static_cast<int>(i), 0);
        wrong += !(std::abs(static_cast<double>(made) - expected[i]) <= 3e-6);
        after.view<float>(1).set(static_cast<int>(i), 0, 0, made);
    }
    EXPECT_EQ(0u, wrong) << "of " << expected.size();
    QORI_EXPECT_UNCHANGED(dst, after);  // around the descriptors
    QORI_EXPECT_UNCHANGED(src, before);
    const Snapshot work = buffer.snapshot();
    EXPECT_EQ("", buffer.difference(work));
}

Case drawCase() {
    const auto below = [](int n) { return random().below(n); };
    Case job;
    QorHogConfig& config = job.config;
    config.cellSize = random().oneIn(3) ? 2 + below(15) : 2 + below(4);
    config.blockSize = 2 * config.cellSize;
    config.blockStride = config.cellSize * (random().oneIn(2) ? 1 : 1 + below(4));
    config.nbins = 2 + below(15);
    config.blockOrder = below(2);
    config.blockWeightParam = 1 + static_cast<float>(below(100)) / 8;
    config.normParam = random().oneIn(4) ? 10 : 0.2f;
    config.winSize = {config.blockSize + below(4) * config.blockStride,
                      config.blockSize + below(4) * config.blockStride};
    job.roi = {config.winSize.width + below(3) * below(30), config.winSize.height + below(3) * below(20)};
    static constexpr int32_t kinds[] = {borderConstant, borderReplicate, kMirror, borderReadAll};
    job.border = kinds[below(4)] | (random().oneIn(2) ? below(16) << 4 : 0);
    const QorImageSize area = areaOf(config, job.roi);
    const int mostX = area.width - config.winSize.width, mostY = area.height - config.winSize.height;
    const int count = random().oneIn(3) ? 1 : 1 + below(12), step = random().oneIn(2) ? config.blockStride : 1;
    for (int i = 0; i < count; ++i)
        job.locations.push_back({below(mostX / step + 1) * step, below(mostY / step + 1) * step});
    if (count == 1) job.locations[0] = {0, 0};
    while (random().oneIn(3)) {  // windows outside
        static constexpr int beyond[] = {-1, INT32_MIN, INT32_MAX, INT32_MAX - 5};
        const int most = 1 + below(3);
        const QorPoint2D outside[] = {
            {beyond[below(4)], 0}, {0, beyond[below(4)]}, {mostX + most, 0}, {0, mostY + most}};
        job.locations.insert(job.locations.begin() + below(static_cast<int>(job.locations.size()) + 1),
                             outside[below(4)]);
    }
    return job;
}

template <class S, int channels, class Function>
void hog(const char* name, Function function) {
    for (int i = 0; i < 250 && !testing::Test::HasFailure(); ++i) checkCase<S, channels>(drawCase(), function);
    // Pieces of columns, and their borders.
    for (int width : {255, 256, 257, 264, 520})
        checkCase<S, channels>({{0, 8, 16, 8, 9, 8, 0.2f, {width / 8 * 8, 16}}, {width, 17}, {{0, 0}}, width % 2},
                               function);
    markSwept(name);
}
template <class, int, class Function>
void hogGetSize(const char* name, Function) {
    markSwept(name);  // these and the next ones by every case above
}
template <class, int, class Function>
void hogInit(const char* name, Function) {
    markSwept(name);
}
template <class, int, class Function>
void hogGetDescriptorSize(const char* name, Function) {
    markSwept(name);
}
template <class, int, class Function>
void hogGetBufferSize(const char* name, Function) {
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(HogSweep, name) { operation<S, channels(Layout::SL)>(#name, &name); }
#include "members/hog.inc"
#undef QORI_MEMBER

/// Descriptors of many windows, and of each of them alone.
void expectSharedEqual(const QorHogConfig& config, QorImageSize roi, int stepX, int stepY, int shift, bool shuffled) {
    SCOPED_TRACE(testing::Message() << "cell " << config.cellSize << " bins " << config.nbins << " steps " << stepX
                                    << ", " << stepY << " shift " << shift);
    std::vector<uint8_t> image(static_cast<size_t>(roi.width * roi.height));
    for (uint8_t& pixel : image) pixel = random().value<uint8_t>();
    const Plan plan(config);
    const auto floats = static_cast<size_t>(plan.floats());
    std::vector<uint8_t> buffer(static_cast<size_t>(plan.bufferBytes(roi)));
    const QorImageSize area = areaOf(config, roi);
    std::vector<QorPoint2D> locations;
    for (int y = 0; y + config.winSize.height <= area.height; y += stepY)
        for (int x = 0; x + config.winSize.width <= area.width; x += stepX) locations.push_back({x, y});
    for (size_t i = locations.size() - 1; shuffled && i > 0; --i)
        std::swap(locations[i], locations[static_cast<size_t>(random().below(static_cast<int>(i) + 1))]);
    std::vector<float> together(floats * locations.size() + 8), alone(floats);
    ASSERT_EQ(QOR_OK,
              qoriHOG_8u32f_C1R(image.data(), roi.width, roi, locations.data(), static_cast<int32_t>(locations.size()),
                                together.data() + shift, plan.get(), kMirror, 0, buffer.data()));
    size_t different = 0;
    for (size_t i = 0; i < locations.size(); ++i) {
        ASSERT_EQ(QOR_OK, qoriHOG_8u32f_C1R(image.data(), roi.width, roi, &locations[i], 1, alone.data(), plan.get(),
                                            kMirror, 0, buffer.data()));
        const float* const shared = together.data() + shift + i * floats;
        different += std::memcmp(shared, alone.data(), 4 * floats) != 0;
    }
    EXPECT_EQ(0u, different) << "of " << locations.size() << " windows";
    EXPECT_EQ(0, together[static_cast<size_t>(shift) + floats * locations.size()]);
}

TEST(Hog, SharedBlocksEqualSeparateOnes) {
    QorHogConfig small = kPersons;
    small.winSize = {32, 48};
    for (int order : {0, 1}) {
        small.blockOrder = order;
        for (int shift = 0; shift < 5; ++shift)  // of the destination: more than 4 MB, past the cache
            expectSharedEqual(small, {300, 260}, 8, 8, shift, order == 1);
        expectSharedEqual(small, {150, 130}, 4, 12, 0, true);    // windows on several grids
        expectSharedEqual(small, {200, 100}, 24, 16, 1, false);  // some of a grid
        // Cells too small for the buffer to hold all blocks, or those of one row of windows.
        expectSharedEqual({order, 3, 6, 3, 9, 4, 0.2f, {12, 12}}, {90, 150}, 3, 3, 0, true);
        expectSharedEqual({order, 2, 4, 2, 9, 4, 0.2f, {12, 12}}, {40, 90}, 2, 2, 0, true);
        expectSharedEqual({order, 2, 4, 2, 16, 4, 0.2f, {12, 20}}, {40, 30}, 2, 2, 0, false);
        expectSharedEqual({order, 4, 8, 12, 5, 4, 0.2f, {20, 32}}, {100, 90}, 12, 12, 0, true);  // gaps
    }
}

TEST(Hog, VotesForUnsignedOrientations) {
    const QorHogConfig config{0, 4, 8, 4, 4, 100, 10, {8, 8}};
    const Plan plan(config);
    std::vector<uint8_t> buffer(static_cast<size_t>(plan.bufferBytes({8, 8})));
    const auto cellOf = [&](auto pixel) {
        uint8_t image[64];
        for (int i = 0; i < 64; ++i) image[i] = static_cast<uint8_t>(pixel(i % 8, i / 8));
        std::vector<float> made(16);
        EXPECT_EQ(QOR_OK, qoriHOG_8u32f_C1R(image, 8, {8, 8}, nullptr, 1, made.data(), plan.get(), borderReplicate, 0,
                                            buffer.data()));
        return made;
    };
    // To the right, and to the left: half a vote each for the bins on both sides of the axis.
    for (const std::vector<float>&cell :
         {cellOf([](int x, int) { return 10 * x; }), cellOf([](int x, int) { return 200 - 10 * x; })}) {
        EXPECT_NEAR(cell[0], cell[3], 1e-5);
        EXPECT_GT(cell[0], 0.1f);
        EXPECT_NEAR(0, cell[1], 1e-5);
        EXPECT_NEAR(0, cell[2], 1e-5);
    }
    const std::vector<float> down = cellOf([](int, int y) { return 10 * y; });
    EXPECT_NEAR(down[1], down[2], 1e-5);
    EXPECT_GT(down[1], 0.1f);
    EXPECT_NEAR(0, down[0], 1e-5);
    for (float value : cellOf([](int, int) { return 90; })) EXPECT_EQ(0, value);
}

/// Numbers that are none, or too large, reach the blocks of their pixels only, and no memory.
TEST(Hog, TakesAnyFloats) {
    const QorHogConfig config{0, 4, 8, 8, 9, 4, 0.2f, {8, 8}};
    const Plan plan(config);
    const QorImageSize roi{24, 8};
    std::vector<uint8_t> buffer(static_cast<size_t>(plan.bufferBytes(roi)));
    for (float odd : {NAN, INFINITY, 3e38f, 1e20f, std::numeric_limits<float>::denorm_min()}) {
        std::vector<float> image(192, 5.0f), made(108, -1);
        image[4 * 24 + 4] = odd;
        const QorPoint2D at[] = {{0, 0}, {8, 0}, {16, 0}};
        ASSERT_EQ(QOR_OK, call(qoriHOG_32f_C1R, static_cast<const float*>(image.data()), 96, roi, at, 3, made.data(),
                               plan.get(), int32_t{borderReplicate}, 0.0f, buffer.data()));
        for (size_t i = 36; i < 108; ++i) EXPECT_EQ(0, made[i]);
    }
}

TEST(Hog, ChecksConfigurations) {
    const auto statusOf = [](auto change) {
        QorHogConfig config = kPersons;
        change(config);
        int32_t bytes = -1;
        const TestImage plan = block(kPlan, 16 * 64 * 64 + 72);
        const Snapshot before = plan.snapshot();
        const QorResult result = call(qoriHOGGetSize, &config, &bytes);
        EXPECT_EQ(result, call(qoriHOGInit, &config, plan.data<QorHogPlan>()));
        EXPECT_EQ(result == QOR_OK, bytes == 16 * config.blockSize * config.blockSize + 72);
        if (result != QOR_OK) {
            QORI_EXPECT_UNCHANGED(plan, before);
            EXPECT_EQ(-1, bytes);
        }
        return result;
    };
    EXPECT_EQ(QOR_OK, statusOf([](QorHogConfig&) {}));
    EXPECT_EQ(QOR_OK, statusOf([](QorHogConfig& c) { c.blockOrder = -7; }));
    for (int32_t cell : {1, 17, 0, -8, 4, 16}) EXPECT_EQ(-9999, statusOf([=](QorHogConfig& c) { c.cellSize = cell; }));
    for (int32_t size : {24, 8, 0, -16, 66}) EXPECT_EQ(-9999, statusOf([=](QorHogConfig& c) { c.blockSize = size; }));
    for (int32_t stride : {12, 0, -8, 4})
        EXPECT_EQ(-9999, statusOf([=](QorHogConfig& c) { c.blockStride = stride, c.winSize = {1, 1}; }));
    for (int32_t bins : {1, 17, 0, -9}) EXPECT_EQ(-9999, statusOf([=](QorHogConfig& c) { c.nbins = bins; }));
    for (float value : {0.0f, -1.0f, -INFINITY, NAN}) {
        EXPECT_EQ(-9999, statusOf([=](QorHogConfig& c) { c.blockWeightParam = value; }));
        EXPECT_EQ(-9999, statusOf([=](QorHogConfig& c) { c.normParam = value, c.winSize = {0, 0}; }));
    }
    for (float value : {1e-45f, INFINITY}) {
        EXPECT_EQ(QOR_OK, statusOf([=](QorHogConfig& c) { c.blockWeightParam = value; }));
        EXPECT_EQ(QOR_OK, statusOf([=](QorHogConfig& c) { c.normParam = value; }));
    }
    for (const QorImageSize window : {QorImageSize{8, 128}, QorImageSize{64, 12}, QorImageSize{65, 128},
                                      QorImageSize{64, 127}, QorImageSize{-64, 128}, QorImageSize{INT32_MIN, 16}})
        EXPECT_EQ(QOR_ERR_SIZE, statusOf([=](QorHogConfig& c) { c.winSize = window; }));
    EXPECT_EQ(QOR_ERR_SIZE, statusOf([](QorHogConfig& c) { c.blockStride = 16, c.winSize.width = 72; }));
    EXPECT_EQ(QOR_OK, statusOf([](QorHogConfig& c) { c.winSize = {16, 16}; }));
    int32_t bytes = 0;
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHOGGetSize(nullptr, &bytes));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHOGGetSize(&kPersons, nullptr));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHOGInit(&kPersons, nullptr));
}

TEST(Hog, ReportsSizes) {
    const Plan plan(kPersons);
    EXPECT_EQ(7 * 15 * 36, plan.floats());
    int32_t bytes = -1;
    EXPECT_EQ(QOR_ERR_SIZE, qoriHOGGetBufferSize(plan.get(), {63, 128}, &bytes));
    EXPECT_EQ(QOR_ERR_SIZE, qoriHOGGetBufferSize(plan.get(), {64, 127}, &bytes));
    EXPECT_EQ(QOR_ERR_SIZE, qoriHOGGetBufferSize(plan.get(), {16384, 16384}, &bytes));  // 3 * 2^30
    EXPECT_EQ(QOR_ERR_SIZE, qoriHOGGetBufferSize(plan.get(), {INT32_MAX, INT32_MAX}, &bytes));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHOGGetBufferSize(plan.get(), {64, 128}, nullptr));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriHOGGetDescriptorSize(nullptr, &bytes));
    const int32_t record[18] = {};
    const auto* const unfilled = reinterpret_cast<const QorHogPlan*>(record);
    EXPECT_EQ(QOR_ERR_CONTEXT, qoriHOGGetBufferSize(unfilled, {0, 0}, &bytes));
    EXPECT_EQ(QOR_ERR_CONTEXT, qoriHOGGetDescriptorSize(unfilled, &bytes));
    QorHogConfig huge = kPersons;
    for (int32_t side : {1 << 20, INT32_MAX / 8 * 8}) {
        huge.winSize = {side, side};
        EXPECT_EQ(QOR_ERR_SIZE, qoriHOGGetDescriptorSize(Plan(huge).get(), &bytes));
    }
    EXPECT_EQ(-1, bytes);
}

TEST(Hog, ChecksInOrder) {
    const Plan plan(kPersons);
    const TestImage dst = block(kDst, 4 * 3780);
    const std::vector<float> image(64 * 128 * 3);
    std::vector<uint8_t> buffer(12 * 64 * 128);
    const int32_t record[18] = {};
    const auto* const unfilled = reinterpret_cast<const QorHogPlan*>(record);
    const QorHogPlan *p = plan.get(), *noPlan = nullptr;
    const float *s = image.data(), *noSource = nullptr;
    float *d = dst.data<float>(), *nowhere = nullptr;
    uint8_t* const b = buffer.data();
    const QorPoint2D at[2] = {{-1, 0}, {0, -1}}, *none = nullptr;
    const QorImageSize ok{64, 128}, small{63, 128};
    const auto expect = [&](QorResult status, auto... arguments) {
        QORI_EXPECT_STATUS(status, dst, call(qoriHOG_32f_C1R, arguments...));
    };
    expect(QOR_ERR_NULL_PTR, s, 0, small, none, 0, d, noPlan, 2, 0.0f, b);
    expect(QOR_ERR_NULL_PTR, noSource, 0, small, none, 0, d, unfilled, 2, 0.0f, b);
    expect(QOR_ERR_NULL_PTR, s, 0, small, none, 0, nowhere, unfilled, 2, 0.0f, b);
    expect(QOR_ERR_NULL_PTR, s, 0, small, none, 0, d, unfilled, 2, 0.0f, static_cast<uint8_t*>(nullptr));
    expect(QOR_ERR_CONTEXT, s, 0, small, none, 0, d, unfilled, 2, 0.0f, b);
    expect(QOR_ERR_STEP, s, 0, small, none, 0, d, p, 2, 0.0f, b);
    expect(QOR_ERR_STEP_ALIGN, s, 255, small, none, 0, d, p, 2, 0.0f, b);
    expect(QOR_ERR_STEP_ALIGN, s, 258, small, none, 0, d, p, 2, 0.0f, b);
    expect(QOR_ERR_SIZE, s, 256, small, none, 0, d, p, 2, 0.0f, b);
    expect(QOR_ERR_SIZE, s, 256, QorImageSize{64, 127}, none, 0, d, p, 2, 0.0f, b);
    expect(QOR_ERR_BAD_ARG, s, 256, ok, none, 0, d, p, 2, 0.0f, b);
    expect(QOR_ERR_NULL_PTR, s, 256, ok, none, 2, d, p, 2, 0.0f, b);
    for (int32_t border : {2, 4, 5, 7, 15, 2 | 0xF0}) expect(QOR_ERR_BORDER, s, 256, ok, at, 2, d, p, border, 0.0f, b);
    expect(QOR_OK, s, 256, ok, at, 2, d, p, int32_t{borderReadAll} & 0, 0.0f, b);  // windows outside write nothing
    const float* const noValue = nullptr;
    const auto coloured = [&](QorResult status, int32_t border, const float* value) {
        QORI_EXPECT_STATUS(status, dst, call(qoriHOG_32f_C3R, s, 768, ok, at, 2, d, p, border, value, b));
    };
    coloured(QOR_ERR_NULL_PTR, borderConstant, noValue);
    coloured(QOR_ERR_NULL_PTR, borderConstant | 0xF0, noValue);
    coloured(QOR_ERR_BORDER, 2, noValue);
    for (int32_t border : {int32_t{borderReplicate}, kMirror, int32_t{borderReadAll}})
        coloured(QOR_OK, border, noValue);
    const auto* const words = reinterpret_cast<const uint16_t*>(s);
    QORI_EXPECT_STATUS(QOR_ERR_STEP_ALIGN, dst,
                       call(qoriHOG_16u32f_C1R, words, 129, small, none, 0, d, p, 2, uint16_t{0}, b));
    const auto* const bytes = reinterpret_cast<const uint8_t*>(s);
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriHOG_8u32f_C1R, bytes, 65, small, none, 0, d, p, 2, uint8_t{0}, b));
}

}  // namespace
}  // namespace qori::test
