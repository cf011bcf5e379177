// SPDX-License-Identifier: Apache-2.0
#include "harness/sweep.h"
#include "reference/threshold.h"

namespace qori::test {
namespace {

QorResult otsu(const uint8_t* src, int32_t step, QorImageSize roi, uint8_t* threshold) {
    return call(qoriComputeThreshold_Otsu_8u_C1R, src, step, roi, threshold);
}

uint8_t otsu(const std::vector<uint8_t>& elements) {
    uint8_t threshold = 99;
    const auto width = static_cast<int32_t>(elements.size());
    EXPECT_EQ(QOR_OK, otsu(elements.data(), width, {width, 1}, &threshold));
    return threshold;
}

/// Noise, two peaks, or a few values.
auto drawing() {
    const int way = random().below(3), low = random().below(256), high = random().below(256);
    return [=] {
        const int spread = random().below(20) + random().below(20) - 19;
        const int value = way == 0   ? random().below(256)
                          : way == 1 ? std::clamp((random().oneIn(3) ? low : high) + spread, 0, 255)
                                     : (random().oneIn(5) ? low : high);
        return static_cast<uint8_t>(value);
    };
}

TEST(Otsu, EveryShape) {
    forShapes(smallShapes(), [](Shape shape) {
        shape.flipped = false;
        const TestImage src(1, shape, 1), result = block(0, 1);
        src.fill<uint8_t>(1, drawing());
        const auto view = src.view<uint8_t>(1);
        std::vector<uint8_t> elements;
        for (int y = 0; y < shape.height; ++y)
            for (int x = 0; x < shape.width; ++x) elements.push_back(view.get(x, y));
        const Snapshot before = src.snapshot();
        EXPECT_EQ(QOR_OK, otsu(src.data<uint8_t>(), src.step(), shape.roi(), result.data<uint8_t>()));
        EXPECT_EQ(reference::otsu(elements), *result.data<uint8_t>());
        QORI_EXPECT_UNCHANGED(src, before);
    });
    markSwept("qoriComputeThreshold_Otsu_8u_C1R");
}

/// Mirrored histograms have maxima that are equal but for the last bits.
TEST(Otsu, NearlyEqualMaxima) {
    for (int turn = 0; turn < 2'000; ++turn) {
        std::vector<uint8_t> elements;
        for (int i = random().below(40) + 1; i > 0; --i) {
            const auto value = static_cast<uint8_t>(random().below(256));
            elements.push_back(value);
            elements.push_back(static_cast<uint8_t>(255 - value));
        }
        ASSERT_EQ(reference::otsu(elements), otsu(elements));
    }
}

TEST(Otsu, KnownLevels) {
    EXPECT_EQ(0, otsu({7}));
    EXPECT_EQ(0, otsu(std::vector<uint8_t>(1'000, 7)));
    EXPECT_EQ(0, otsu({0, 255}));  // every level up to 254 parts them alike: the lowest
    EXPECT_EQ(100, otsu({100, 200, 200, 100}));
    EXPECT_EQ(254, otsu({254, 255}));
    EXPECT_EQ(12, otsu({10, 11, 12, 240, 241, 242}));
}

/// One element among 2^23 is just what a side needs; among more than that it is passed over.
TEST(Otsu, SidesOfTooFewElements) {
    std::vector<uint8_t> elements((1 << 23) + 1, 50);
    elements[0] = 40;
    const auto with = [&](int32_t width) {
        uint8_t threshold = 99;
        EXPECT_EQ(QOR_OK, otsu(elements.data(), width, {width, 1}, &threshold));
        return int{threshold};
    };
    EXPECT_EQ(40, with(1 << 23));
    EXPECT_EQ(0, with((1 << 23) + 1));
}

TEST(Otsu, WidthBeyondTheStep) {
    const TestImage src(1, {.width = 4, .height = 2}, 1), result = block(0, 1);
    const auto status = [&](int32_t step) { return otsu(src.data<uint8_t>(), step, {4, 2}, result.data<uint8_t>()); };
    for (int32_t step : {3, 0, -4, INT32_MIN}) QORI_EXPECT_STATUS(QOR_ERR_STEP, result, status(step));
    EXPECT_EQ(QOR_OK, status(4));
}

}  // namespace
}  // namespace qori::test
