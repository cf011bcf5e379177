// SPDX-License-Identifier: Apache-2.0
#include <cmath>
#include <vector>

#include "harness/window.h"

namespace qori::test {
namespace {

enum Slot { kSrc, kDst, kBuffer, kSpec };

/// Pixels by coordinates of the region, whatever they are.
class Bordered {
public:
    Bordered(View<uint8_t> region, QorImageSize size, int32_t border, uint8_t value)
        : region_(region), size_(size), border_(border), value_(value) {}

    uint8_t at(int x, int y) const {
        const bool all = (border_ & 15) == borderReadAll || (border_ & 0xF0) == 0xF0;
        const auto open = [&](int32_t flag) { return all || (border_ & flag) != 0; };
        const bool missingX = (x < 0 && !open(borderReadLeft)) || (x >= size_.width && !open(borderReadRight));
        const bool missingY = (y < 0 && !open(borderReadTop)) || (y >= size_.height && !open(borderReadBottom));
        if ((missingX || missingY) && (border_ & 15) == borderConstant) return value_;
        if (missingX) x = std::clamp(x, 0, size_.width - 1);
        if (missingY) y = std::clamp(y, 0, size_.height - 1);
        return region_.get(x, y);
    }

private:
    View<uint8_t> region_;
    QorImageSize size_;
    int32_t border_;
    uint8_t value_;
};

struct Job {
    Shape shape;
    int mask;
    float delta;
    int32_t border;
    bool inPlace = false;
};

Around openSides(const Job& job) {
    const bool all = (job.border & 15) == borderReadAll || (job.border & 0xF0) == 0xF0;
    const int reach = job.mask / 2;
    const auto side = [&](int32_t flag) { return all || (job.border & flag) != 0 ? reach : 0; };
    return {side(borderReadLeft), side(borderReadTop), side(borderReadRight), side(borderReadBottom)};
}

/// isGreater(pixels, x, y) is the truth; invoke(src, srcStep, dst, dstStep, value, buffer) calls an export.
template <class Truth, class Invoke>
void checkAdaptive(const Job& job, int32_t bufferBytes, Truth isGreater, Invoke invoke) {
    SCOPED_TRACE(testing::Message() << "mask " << job.mask << " delta " << job.delta << " border " << job.border
                                    << (job.inPlace ? " in place" : ""));
    const Around around = openSides(job);
    const TestImage src(kSrc, withAround(job.shape, around), 1);
    const TestImage dst = job.inPlace ? src : TestImage(kDst, job.shape, 1);
    // Near the means, so that ties are met: a few levels only, or any.
    const int levels = random().oneIn(2) ? 3 : 256, base = random().below(257 - levels);
    src.fill<uint8_t>(1, [=] { return static_cast<uint8_t>(base + random().below(levels)); });
    const ptrdiff_t inside = around.top * ptrdiff_t{src.step()} + around.left;
    Snapshot before = src.snapshot(), expected = dst.snapshot();
    View<uint8_t> from = before.view<uint8_t>(1), to = expected.view<uint8_t>(1);
    from.origin += inside;
    if (job.inPlace) to.origin += inside;
    const auto value = static_cast<uint8_t>(base + levels / 2);
    const Bordered pixels(from, job.shape.roi(), job.border, value);
    std::vector<uint8_t> truth;
    for (int y = 0; y < job.shape.height; ++y)
        for (int x = 0; x < job.shape.width; ++x) truth.push_back(isGreater(pixels, x, y) ? 201 : 33);
    for (int y = 0; y < job.shape.height; ++y)
        for (int x = 0; x < job.shape.width; ++x) to.set(x, y, 0, truth[static_cast<size_t>(y * job.shape.width + x)]);
    const TestImage buffer = block(kBuffer, bufferBytes, random().below(4));
    buffer.fill<uint8_t>(1, [] { return static_cast<uint8_t>(random().bits()); });
    uint8_t* const source = src.data<uint8_t>() + inside;
    uint8_t* const target = job.inPlace ? source : dst.data<uint8_t>();
    EXPECT_EQ(QOR_OK, invoke(source, src.step(), target, dst.step(), value, buffer.data<uint8_t>()));
    QORI_EXPECT_UNCHANGED(dst, expected);
    if (!job.inPlace) {
        QORI_EXPECT_UNCHANGED(src, before);
    }
}

void checkBox(const Job& job) {
    int32_t bytes = 0;
    const QorImageSize mask{job.mask, job.mask};
    ASSERT_EQ(QOR_OK, qoriThresholdAdaptiveBoxGetBufferSize(job.shape.roi(), mask, 1, 1, &bytes));
    const int reach = job.mask / 2;
    checkAdaptive(
        job, bytes,
        [&](const Bordered& pixels, int x, int y) {
            int64_t sum = 0;
            for (int j = -reach; j <= reach; ++j)
                for (int i = -reach; i <= reach; ++i) sum += pixels.at(x + i, y + j);
            const int64_t area = int64_t{job.mask} * job.mask;
            return static_cast<long double>(sum - pixels.at(x, y) * area) < static_cast<long double>(job.delta) * area;
        },
        [&](const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, uint8_t value, uint8_t* buffer) {
            if (job.inPlace && random().oneIn(2))
                return call(qoriThresholdAdaptiveBox_8u_C1IR, dst, dstStep, job.shape.roi(), mask, job.delta,
                            uint8_t{201}, uint8_t{33}, job.border, value, buffer);
            return call(qoriThresholdAdaptiveBox_8u_C1R, src, srcStep, dst, dstStep, job.shape.roi(), mask, job.delta,
                        uint8_t{201}, uint8_t{33}, job.border, value, buffer);
        });
}

/// The weights by their definition, and the sums of the stated chains of fused multiply-adds.
void checkGauss(const Job& job, float sigma) {
    int32_t specBytes = 0, bytes = 0;
    const QorImageSize mask{job.mask, job.mask};
    ASSERT_EQ(QOR_OK, qoriThresholdAdaptiveGaussGetBufferSize(job.shape.roi(), mask, 1, 1, &specBytes, &bytes));
    ASSERT_EQ(4 * job.mask + 32, specBytes);
    const TestImage block = test::block(kSpec, specBytes, random().below(8));
    auto* const spec = block.data<QorAdaptiveGaussSpec>();
    ASSERT_EQ(QOR_OK, call(qoriThresholdAdaptiveGaussInit, job.shape.roi(), mask, 1, 1, sigma, spec));
    const uint8_t* const record = block.data<uint8_t>() + *block.data<uint8_t>();
    std::vector<float> weights(static_cast<size_t>(job.mask));
    std::memcpy(weights.data(), record + 24, weights.size() * sizeof(float));
    const int reach = job.mask / 2;
    checkAdaptive(
        job, bytes,
        [&](const Bordered& pixels, int x, int y) {
            float mean = 0;
            for (int j = 0; j < job.mask; ++j) {
                float along = 0;
                for (int i = 0; i < job.mask; ++i)
                    along = std::fma(weights[static_cast<size_t>(i)],
                                     static_cast<float>(pixels.at(x + i - reach, y + j - reach)), along);
                mean = std::fma(weights[static_cast<size_t>(j)], along, mean);
            }
            return static_cast<float>(pixels.at(x, y)) > mean - job.delta;
        },
        [&](const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, uint8_t value, uint8_t* buffer) {
            if (job.inPlace && random().oneIn(2))
                return call(qoriThresholdAdaptiveGauss_8u_C1IR, dst, dstStep, job.shape.roi(), job.delta, uint8_t{201},
                            uint8_t{33}, job.border, value, static_cast<const QorAdaptiveGaussSpec*>(spec), buffer);
            return call(qoriThresholdAdaptiveGauss_8u_C1R, src, srcStep, dst, dstStep, job.shape.roi(), job.delta,
                        uint8_t{201}, uint8_t{33}, job.border, value, static_cast<const QorAdaptiveGaussSpec*>(spec),
                        buffer);
        });
}

float drawDelta() {
    static constexpr float deltas[] = {0,        1,  -1,      0.5f, 1.0f / 3, -1.0f / 9,
                                       4.0f / 9, 20, -254.9f, 255,  1e-30f,   -1e-30f};
    return deltas[random().below(static_cast<int>(std::size(deltas)))];
}
int32_t drawBorder() {
    static constexpr int32_t kinds[] = {borderConstant, borderReplicate, borderReplicate, borderReadAll};
    return kinds[random().below(4)] | (random().oneIn(2) ? random().below(16) << 4 : 0);
}

template <class Check>
void sweep(Check check) {
    static constexpr int masks[] = {3, 5, 9, 15, 31};
    size_t turn = 0;
    forShapes(windowShapes(4), [&](const Shape& shape) {
        check({shape, masks[turn % 5], drawDelta(), drawBorder(), turn % 3 == 2});
        ++turn;
    });
    for (int mask : {3, 7})  // all sides and kinds: regions larger, smaller in one direction, and in both
        for (int32_t sides = 0; sides < 256; sides += 16)
            for (int32_t kind : {borderConstant, borderReplicate, borderReadAll})
                for (const QorImageSize size :
                     {QorImageSize{40, 9}, QorImageSize{9, 2}, QorImageSize{2, 9}, QorImageSize{1, 1}})
                    check({{.width = size.width, .height = size.height, .padding = 1},
                           mask,
                           drawDelta(),
                           kind | sides,
                           random().oneIn(2)});
    for (int mask : {3, 5, 7, 11, 33, 61})  // buffers have no byte to spare
        for (int width : {1, 2, mask - 1, mask, mask + 1, 90})
            check({{.width = width, .height = 1 + random().below(mask + 2)},
                   mask,
                   drawDelta(),
                   random().below(2),
                   random().oneIn(2)});
}

TEST(ThresholdAdaptiveSweep, Box) {
    sweep(checkBox);
    for (int mask : {127, 129, 131}) checkBox({{.width = 35, .height = 3}, mask, 0.25f, borderReplicate});
    for (const char* name : {"qoriThresholdAdaptiveBoxGetBufferSize", "qoriThresholdAdaptiveBox_8u_C1R",
                             "qoriThresholdAdaptiveBox_8u_C1IR"})
        markSwept(name);
}

TEST(ThresholdAdaptiveSweep, Gauss) {
    sweep([](const Job& job) {
        static constexpr float sigmas[] = {0, -1, 1.5f, 100, 0.2f};
        checkGauss(job, sigmas[random().below(5)]);
    });
    for (const char* name : {"qoriThresholdAdaptiveGaussGetBufferSize", "qoriThresholdAdaptiveGaussInit",
                             "qoriThresholdAdaptiveGauss_8u_C1R", "qoriThresholdAdaptiveGauss_8u_C1IR"})
        markSwept(name);
}

/// A mask whose sums leave 32 bits, over a region of two pixels.
TEST(ThresholdAdaptive, LargestMasks) {
    checkBox({{.width = 2, .height = 1}, 2049, 0, borderReplicate});
    const QorImageSize roi{2, 1}, mask{4107, 4107};
    int32_t bytes = 0;
    ASSERT_EQ(QOR_OK, qoriThresholdAdaptiveBoxGetBufferSize(roi, mask, 1, 1, &bytes));
    std::vector<uint8_t> buffer(static_cast<size_t>(bytes));
    const uint8_t src[] = {255, 254};
    uint8_t dst[2];
    // One more pixel in the sum decides: 4107 columns of 254 and of 255, replicated.
    EXPECT_EQ(QOR_OK,
              qoriThresholdAdaptiveBox_8u_C1R(src, 2, dst, 2, roi, mask, 0, 1, 0, borderReplicate, 0, buffer.data()));
    EXPECT_EQ(1, dst[0]);
    EXPECT_EQ(0, dst[1]);
}

TEST(ThresholdAdaptive, FillsWithoutReading) {
    const TestImage dst(kDst, {.width = 37, .height = 3, .padding = 2}, 1);
    uint8_t* const d = dst.data<uint8_t>();
    const auto* const nowhere = reinterpret_cast<const uint8_t*>(uintptr_t{64});
    auto* const noBuffer = reinterpret_cast<uint8_t*>(uintptr_t{64});
    uint8_t record[44];
    auto* const spec = reinterpret_cast<QorAdaptiveGaussSpec*>(record);
    const QorImageSize roi{37, 3};
    const auto expectAll = [&](uint8_t value, auto run) {
        Snapshot expected = dst.snapshot();
        for (int y = 0; y < 3; ++y)
            for (int x = 0; x < 37; ++x) expected.view<uint8_t>(1).set(x, y, 0, value);
        EXPECT_EQ(QOR_OK, run());
        QORI_EXPECT_UNCHANGED(dst, expected);
    };
    const auto expectBoth = [&](uint8_t value, int mask, float delta) {
        expectAll(value, [&] {
            return call(qoriThresholdAdaptiveBox_8u_C1R, nowhere, 37, d, 39, roi, QorImageSize{mask, mask}, delta,
                        uint8_t{7}, uint8_t{9}, int32_t{borderReplicate}, uint8_t{0}, noBuffer);
        });
        EXPECT_EQ(QOR_OK, qoriThresholdAdaptiveGaussInit(roi, {mask, mask}, 1, 1, 0, spec));
        expectAll(value, [&] {
            return call(qoriThresholdAdaptiveGauss_8u_C1R, nowhere, 37, d, 39, roi, delta, uint8_t{7}, uint8_t{9},
                        int32_t{borderReplicate}, uint8_t{0}, static_cast<const QorAdaptiveGaussSpec*>(spec), noBuffer);
        });
    };
    for (float delta : {300.0f, 255.00002f, INFINITY}) expectBoth(7, 3, delta);
    for (float delta : {-255.0f, -1000.0f, -INFINITY}) expectBoth(9, 3, delta);
    expectBoth(9, 3, NAN);
    expectBoth(7, 1, 1e-38f);
    for (float delta : {0.0f, -1e-38f, NAN}) expectBoth(9, 1, delta);
}

TEST(ThresholdAdaptive, MakesItsRecord) {
    alignas(8) uint8_t memory[128];
    const QorImageSize roi{10, 10};
    for (int shift = 0; shift < 8; ++shift) {
        auto* const spec = reinterpret_cast<QorAdaptiveGaussSpec*>(memory + shift);
        EXPECT_EQ(QOR_OK, call(qoriThresholdAdaptiveGaussInit, roi, QorImageSize{5, 5}, 1, 1, 0.0f, spec));
        EXPECT_EQ(8 - shift, memory[shift]);
        const uint8_t* const record = memory + 8;
        int32_t words[6];
        float sigma, weights[5];
        std::memcpy(words, record, sizeof words);
        std::memcpy(&sigma, record + 16, 4);
        std::memcpy(weights, record + 24, sizeof weights);
        EXPECT_EQ(1264677774, words[0]);
        EXPECT_EQ(1, words[1]);
        EXPECT_EQ(1, words[2]);
        EXPECT_EQ(5, words[3]);
        EXPECT_NEAR(1.1, sigma, 1e-6);
        if (sizeof(void*) == 8)
            EXPECT_EQ(24, words[5]);
        else
            EXPECT_EQ(static_cast<int32_t>(reinterpret_cast<uintptr_t>(record + 24)), words[5]);
        double total = 0;
        for (int k = -2; k <= 2; ++k) total += std::exp(static_cast<double>(-float(k * k) / (2 * sigma * sigma)));
        for (int k = -2; k <= 2; ++k)
            EXPECT_FLOAT_EQ(
                static_cast<float>(std::exp(static_cast<double>(-float(k * k) / (2 * sigma * sigma))) / total),
                weights[k + 2]);
    }
    // Wide and narrow bells.
    std::vector<uint8_t> large(4 * 4001 + 32);
    auto* const spec = reinterpret_cast<QorAdaptiveGaussSpec*>(large.data());
    for (float given : {0.0f, 0.01f, 1e-30f, 50.0f, 1e9f}) {
        EXPECT_EQ(QOR_OK, qoriThresholdAdaptiveGaussInit(roi, {4001, 4001}, 1, 1, given, spec));
        const uint8_t* const record = large.data() + large[0];
        float sigma, weight;
        std::memcpy(&sigma, record + 16, 4);
        const auto bell = [&](int k) {
            return k == 0 ? 1 : std::exp(static_cast<double>(-static_cast<float>(k * k) / (2 * sigma * sigma)));
        };
        double total = 0;
        for (int k = -2000; k <= 2000; ++k) total += bell(k);
        int wrong = 0;
        for (int k = -2000; k <= 2000; ++k) {
            std::memcpy(&weight, record + 24 + 4 * (k + 2000), 4);
            const double exact = bell(k) / total;
            wrong += !(std::abs(weight - exact) <= exact * 6.1e-8 + 1e-45);
        }
        EXPECT_EQ(0, wrong) << given;
    }
}

TEST(ThresholdAdaptive, ReportsItsSizes) {
    int32_t bytes = -1, specBytes = -1;
    const auto box = [&](QorImageSize roi, int mask) {
        return qoriThresholdAdaptiveBoxGetBufferSize(roi, {mask, mask}, 1, 1, &bytes);
    };
    EXPECT_EQ(QOR_OK, box({100, 50}, 7));
    const int base = ((128 + 4) * 7 + 416 * 8 + 31) / 32 * 32;
    EXPECT_EQ(((100 + 6) * 9 + 31) / 32 * 32 + 64 * 10 + 64 * 5 + base, bytes);
    EXPECT_EQ(QOR_OK, box({5, 50}, 7));
    EXPECT_EQ((11 * 56 + 31) / 32 * 32 + ((32 + 4) * 7 + 32 * 8 + 31) / 32 * 32, bytes);
    bytes = -1;
    EXPECT_EQ(QOR_ERR_SIZE, box({1 << 20, 1 << 20}, (1 << 20) + 1));
    // Areas of more bytes than 64 bits count.
    for (int32_t side : {1, 1 << 20, 1 << 30, INT32_MAX})
        for (int32_t mask : {(1 << 29) + 1, (1 << 30) + 1, INT32_MAX})
            EXPECT_EQ(QOR_ERR_SIZE, box({side, side}, mask)) << side << " by " << mask;
    EXPECT_EQ(QOR_ERR_SIZE,
              qoriThresholdAdaptiveGaussGetBufferSize({1, 1}, {INT32_MAX, INT32_MAX}, 1, 1, &specBytes, &bytes));
    for (const QorImageSize mask : {QorImageSize{3, 5}, QorImageSize{4, 4}, QorImageSize{0, 0}, QorImageSize{-1, -1}}) {
        EXPECT_EQ(QOR_ERR_MASK_SIZE, qoriThresholdAdaptiveBoxGetBufferSize({1, 1}, mask, 0, 0, &bytes));
        EXPECT_EQ(QOR_ERR_MASK_SIZE, qoriThresholdAdaptiveGaussGetBufferSize({1, 1}, mask, 0, 0, &specBytes, &bytes));
        EXPECT_EQ(QOR_ERR_SIZE, qoriThresholdAdaptiveGaussGetBufferSize({1, 0}, mask, 0, 0, &specBytes, &bytes));
    }
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriThresholdAdaptiveBoxGetBufferSize({0, 0}, {0, 0}, 0, 0, nullptr));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriThresholdAdaptiveGaussGetBufferSize({0, 0}, {0, 0}, 0, 0, nullptr, &bytes));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriThresholdAdaptiveGaussGetBufferSize({0, 0}, {0, 0}, 0, 0, &specBytes, nullptr));
    EXPECT_EQ(QOR_ERR_DATA_TYPE, qoriThresholdAdaptiveBoxGetBufferSize({1, 1}, {3, 3}, 5, 3, &bytes));
    EXPECT_EQ(QOR_ERR_CHANNELS_UNSUPPORTED,
              qoriThresholdAdaptiveGaussGetBufferSize({1, 1}, {3, 3}, 1, 3, &specBytes, &bytes));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriThresholdAdaptiveGaussInit({0, 0}, {0, 0}, 0, 0, 0, nullptr));
    EXPECT_EQ(-1, bytes);
    EXPECT_EQ(-1, specBytes);
}

TEST(ThresholdAdaptive, ChecksInOrder) {
    const TestImage src(kSrc, {.width = 12, .height = 6}, 1), dst(kDst, {.width = 10, .height = 4}, 1);
    const TestImage buffer = block(kBuffer, 8192);
    alignas(8) uint8_t record[64] = {};
    auto* const spec = reinterpret_cast<QorAdaptiveGaussSpec*>(record);
    const QorAdaptiveGaussSpec *cs = spec, *noSpec = nullptr;
    const uint8_t *s = src.data<uint8_t>() + 13, *noSource = nullptr;
    uint8_t *d = dst.data<uint8_t>(), *b = buffer.data<uint8_t>(), *none = nullptr;
    const QorImageSize ok{10, 4}, flat{10, 0}, mask{3, 3};
    const auto box = [&](const uint8_t* from, uint8_t* to, QorImageSize roi, QorImageSize m, int32_t kind,
                         uint8_t* mem) {
        return qoriThresholdAdaptiveBox_8u_C1R(from, 12, to, 10, roi, m, 300, 1, 0, kind, 0, mem);
    };
    const auto gauss = [&](const uint8_t* from, uint8_t* to, QorImageSize roi, int32_t kind,
                           const QorAdaptiveGaussSpec* weights, uint8_t* mem) {
        return qoriThresholdAdaptiveGauss_8u_C1R(from, 12, to, 10, roi, 0, 1, 0, kind, 0, weights, mem);
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, box(noSource, d, flat, {4, 4}, 2, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, box(s, none, flat, {4, 4}, 2, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, box(s, d, flat, {4, 4}, 2, none));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, box(s, d, flat, {4, 4}, 2, b));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, box(s, d, ok, {4, 4}, 2, b));
    for (int32_t kind : {2, 3, 4, 5, 7, 15, 2 | 0xF0}) {
        QORI_EXPECT_STATUS(QOR_ERR_BORDER, dst, box(s, d, ok, mask, kind, b));
        QORI_EXPECT_STATUS(QOR_ERR_BORDER, dst, gauss(s, d, ok, kind, cs, b));
    }
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, gauss(noSource, d, flat, 2, cs, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, gauss(s, none, flat, 2, cs, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, gauss(s, d, flat, 2, noSpec, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, gauss(s, d, flat, 2, cs, none));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, gauss(s, d, flat, 2, cs, b));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, dst, gauss(s, d, ok, 0, cs, b));
    ASSERT_EQ(QOR_OK, qoriThresholdAdaptiveGaussInit(ok, mask, 1, 1, 0, spec));
    EXPECT_EQ(QOR_OK, gauss(s, d, ok, 0, cs, b));
    // The distance, then every word that has one right value: tag, type, channels, an even mask, no weights.
    for (const auto& [word, value] : {std::pair{0, 1}, {1, 5}, {2, 3}, {3, 4}, {3, -3}, {5, 0}}) {
        uint8_t damaged[64];
        std::memcpy(damaged, record, sizeof damaged);
        std::memcpy(damaged + record[0] + 4 * word, &value, 4);
        alignas(8) uint8_t aligned[64];
        std::memcpy(aligned, damaged, sizeof aligned);
        QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, dst,
                           gauss(s, d, ok, 0, reinterpret_cast<QorAdaptiveGaussSpec*>(aligned), b));
    }
    record[0] = 9;
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, dst, gauss(s, d, ok, 0, cs, b));
}

}  // namespace
}  // namespace qori::test
