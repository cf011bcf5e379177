// SPDX-License-Identifier: Apache-2.0
#include <limits>

#include "harness/sweep.h"
#include "reference/dct.h"

namespace qori::test {
namespace {

constexpr int kSrc = 0, kDst = 1, kPlan = 2, kInit = 3, kBuffer = 4;
/// RMS of the errors, relative to the result's.
constexpr double kAccuracy = 4e-7;

using Operation = QorResult(QORI_CALL*)(const float*, int32_t, float*, int32_t, const QorDct2DPlan*, uint8_t*);

struct Direction {
    decltype(&qoriDCTFwdGetSize_32f) getSize;
    decltype(&qoriDCTFwdInit_32f) init;
    decltype(&qoriDCTFwdInitAlloc_32f) initAlloc;
    decltype(&qoriDCTFwdFree_32f) free;
    decltype(&qoriDCTFwdGetBufSize_32f) getBufSize;
    Operation c1, c3, c4, ac4;
    bool isInverse;
};
const Direction kDirections[] = {
    {qoriDCTFwdGetSize_32f, qoriDCTFwdInit_32f, qoriDCTFwdInitAlloc_32f, qoriDCTFwdFree_32f, qoriDCTFwdGetBufSize_32f,
     qoriDCTFwd_32f_C1R, qoriDCTFwd_32f_C3R, qoriDCTFwd_32f_C4R, qoriDCTFwd_32f_AC4R, false},
    {qoriDCTInvGetSize_32f, qoriDCTInvInit_32f, qoriDCTInvInitAlloc_32f, qoriDCTInvFree_32f, qoriDCTInvGetBufSize_32f,
     qoriDCTInv_32f_C1R, qoriDCTInv_32f_C3R, qoriDCTInv_32f_C4R, qoriDCTInv_32f_AC4R, true}};

TEST(Dct, EveryExportIsHere) {
    for (const char* name : {
#define QORI_MEMBER(name, ...) #name,
#include "members/dct.inc"
#undef QORI_MEMBER
         })
        markSwept(name);
}

/// A plan and a buffer of exactly the sizes reported, each before a guard page, at any alignment.
struct Prepared {
    const QorDct2DPlan* plan;
    uint8_t* buffer;
    int32_t bufferBytes;

    Prepared(const Direction& direction, QorImageSize roi, int shift = 0) {
        int32_t planBytes = 0, initBytes = -1;
        EXPECT_EQ(QOR_OK, call(direction.getSize, roi, shift, &planBytes, &initBytes, &bufferBytes));
        const TestImage planBlock = block(kPlan, planBytes, shift), init = block(kInit, std::max(initBytes, 1), shift);
        auto* const made = planBlock.data<QorDct2DPlan>();
        EXPECT_EQ(QOR_OK, call(direction.init, roi, shift, made, initBytes == 0 ? nullptr : init.data<uint8_t>()));
        int32_t reported = 0;
        EXPECT_EQ(QOR_OK, call(direction.getBufSize, made, &reported));
        EXPECT_EQ(bufferBytes, reported);
        const TestImage memory = block(kBuffer, bufferBytes, 3 * shift);
        memory.fill<uint8_t>(1, [] { return uint8_t{0xFF}; });  // floats that are no numbers
        plan = made;
        buffer = memory.data<uint8_t>();
    }
};

double rms(const std::vector<double>& values) {
    double squares = 0;
    for (double value : values) squares += value * value;
    return std::sqrt(squares / static_cast<double>(values.size()));
}

std::vector<double> channelOf(const View<float>& view, int width, int height, int channel) {
    std::vector<double> values;
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x) values.push_back(static_cast<double>(view.get(x, y, channel)));
    return values;
}

/// Each channel against its reference, relative to its own size: what is beside it does not show. Everything else
/// around the image, and the alpha of AC4, stays as it is.
void check(const Direction& direction, Operation operation, const Shape& shape, int channels, int processed,
           bool inPlace = false) {
    const Prepared prepared(direction, shape.roi(), shape.width % 5);
    const TestImage src(kSrc, shape, 4 * channels), other(kDst, shape, 4 * channels);
    const TestImage& dst = inPlace ? src : other;
    int c = 0;
    src.fill<float>(channels, [&] {
        constexpr float kSizes[] = {1, 1e5f, 1e-5f, 1};
        return kSizes[c++ % channels] * (static_cast<float>(random().below(2001) - 1000) / 700);
    });
    if (processed < channels)
        for (int y = 0; y < shape.height; ++y)
            for (int x = 0; x < shape.width; ++x)
                src.view<float>(4).set(x, y, 3, std::numeric_limits<float>::infinity());
    const Snapshot before = src.snapshot();
    Snapshot expected = dst.snapshot();
    ASSERT_EQ(QOR_OK, call(operation, src.data<const float>(), src.step(), dst.data<float>(), dst.step(), prepared.plan,
                           prepared.buffer));
    if (!inPlace) {
        QORI_EXPECT_UNCHANGED(src, before);
    }
    Snapshot source = before;
    for (int channel = 0; channel < processed; ++channel) {
        const auto in = channelOf(source.view<float>(channels), shape.width, shape.height, channel);
        const auto exact = reference::cosineTransform(in, shape.width, shape.height, direction.isInverse);
        const auto made = channelOf(dst.view<float>(channels), shape.width, shape.height, channel);
        std::vector<double> errors;
        for (size_t i = 0; i < exact.size(); ++i) errors.push_back(made[i] - exact[i]);
        ASSERT_LE(rms(errors), kAccuracy * rms(exact)) << "channel " << channel;
        for (int y = 0; y < shape.height; ++y)
            for (int x = 0; x < shape.width; ++x)
                expected.view<float>(channels).set(x, y, channel, dst.view<float>(channels).get(x, y, channel));
    }
    EXPECT_EQ("", dst.difference(expected));
}

class DctBothWays : public testing::TestWithParam<int> {
protected:
    const Direction& direction() const { return kDirections[GetParam()]; }
};

TEST_P(DctBothWays, EverySizeTo64) {
    for (int height = 1; height <= 64; ++height)
        for (int width = 1; width <= 64; ++width) {
            const Shape shape{.width = width, .height = height, .padding = 4 * (width % 3), .atBegin = height % 2 == 0};
            SCOPED_TRACE(describe(shape));
            check(direction(), direction().c1, shape, 1, 1, width % 4 == 0);
            if (HasFailure()) return;
        }
}

TEST_P(DctBothWays, LongPrimesAndMixedLengths) {
    for (const QorImageSize size : {QorImageSize{1009, 3},
                                    {2, 1009},
                                    {4099, 1},
                                    {1, 4099},
                                    {8198, 2},
                                    {1024, 17},
                                    {5, 2048},
                                    {1000, 30},
                                    {134, 67},
                                    {101, 202},
                                    {360, 72},
                                    {3721, 1},
                                    {16384, 1}}) {
        const Shape shape{.width = size.width, .height = size.height};
        SCOPED_TRACE(describe(shape));
        check(direction(), direction().c1, shape, 1, 1);
        if (HasFailure()) return;
    }
}

TEST_P(DctBothWays, Channels) {
    for (const QorImageSize size : {QorImageSize{1, 1},
                                    {2, 3},
                                    {5, 5},
                                    {8, 8},
                                    {16, 17},
                                    {17, 16},
                                    {3, 33},
                                    {33, 9},
                                    {24, 7},
                                    {67, 20},
                                    {20, 67},
                                    {48, 48}})
        for (bool inPlace : {false, true})
            for (int padding : {0, 1, 12}) {  // steps that are no multiple of an element too
                const Shape shape{.width = size.width, .height = size.height, .padding = padding, .shift = padding};
                SCOPED_TRACE(describe(shape));
                check(direction(), direction().c1, shape, 1, 1, inPlace);
                check(direction(), direction().c3, shape, 3, 3, inPlace);
                check(direction(), direction().c4, shape, 4, 4, inPlace);
                check(direction(), direction().ac4, shape, 4, 3, inPlace);
                if (HasFailure()) return;
            }
}

TEST_P(DctBothWays, PlansInMemoryOfTheirOwn) {
    for (const QorImageSize size : {QorImageSize{40, 30}, {1021, 4}}) {
        int32_t planBytes, initBytes, bufferBytes;
        ASSERT_EQ(QOR_OK, direction().getSize(size, 0, &planBytes, &initBytes, &bufferBytes));
        const int allocations = initBytes == 0 ? 1 : 2;
        QorDct2DPlan* plan = nullptr;
        for (int failing = 1; failing <= allocations; ++failing) {
            qorTestFailAllocation(failing);
            EXPECT_EQ(QOR_ERR_NO_MEMORY, direction().initAlloc(&plan, size, 0));
            EXPECT_EQ(nullptr, plan);
            EXPECT_EQ(0, qorTestLiveBlocks());
        }
        qorTestFailAllocation(allocations + 1);
        ASSERT_EQ(QOR_OK, call(direction().initAlloc, &plan, size, 0));
        EXPECT_EQ(1, qorTestLiveBlocks());
        qorTestFailAllocation(1);  // the transform allocates nothing
        std::vector<float> in(static_cast<size_t>(size.width * size.height), 1.0f), own(in), callers(in);
        const Prepared prepared(direction(), size);
        EXPECT_EQ(QOR_OK, direction().c1(in.data(), 4 * size.width, own.data(), 4 * size.width, plan, prepared.buffer));
        EXPECT_EQ(QOR_OK, direction().c1(in.data(), 4 * size.width, callers.data(), 4 * size.width, prepared.plan,
                                         prepared.buffer));
        EXPECT_EQ(callers, own);
        EXPECT_EQ(nullptr, qorMalloc(1)) << "an allocation was made";
        EXPECT_EQ(QOR_OK, call(direction().free, plan));
        EXPECT_EQ(0, qorTestLiveBlocks());
    }
}

TEST_P(DctBothWays, ChecksInOrder) {
    const Direction& d = direction();
    const TestImage out = block(kDst, 64), other = block(kSrc, 1024);
    auto* const numbers = out.data<int32_t>();
    auto* const block = other.data<QorDct2DPlan>();
    const QorImageSize none{10, 0}, huge{1 << 26, 1}, chirp{1009, 1};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, d.getSize(none, 0, nullptr, numbers, numbers + 1));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, d.getSize(none, 0, numbers, numbers + 1, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, d.getSize(none, 0, numbers, numbers + 1, numbers + 2));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, d.getSize(huge, 0, numbers, numbers + 1, numbers + 2));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, d.getSize({1, INT32_MAX}, 0, numbers, numbers + 1, numbers + 2));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, d.getSize({INT32_MAX - 1, 1}, 0, numbers, numbers + 1, numbers + 2));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, other, d.init(none, 0, nullptr, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, other, d.init(none, 0, block, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, other, d.init(huge, 0, block, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, other, d.init(chirp, 0, block, nullptr));
    QorDct2DPlan* made = nullptr;
    EXPECT_EQ(QOR_ERR_NULL_PTR, d.initAlloc(nullptr, none, 0));
    EXPECT_EQ(QOR_ERR_SIZE, d.initAlloc(&made, none, 0));
    EXPECT_EQ(QOR_ERR_SIZE, d.initAlloc(&made, huge, 0));
    EXPECT_EQ(nullptr, made);
    other.fill<uint8_t>(1, [] { return uint8_t{0}; });
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, other, d.free(nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, other, d.free(block));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, d.getBufSize(nullptr, numbers));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, d.getBufSize(block, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, out, d.getBufSize(block, numbers));

    const Prepared prepared(d, {2, 2});
    auto* const pixels = out.data<float>();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, d.c1(pixels, 0, pixels, 8, nullptr, prepared.buffer));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, out, d.c1(nullptr, 0, pixels, 8, block, prepared.buffer));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, d.c3(nullptr, 0, pixels, 8, prepared.plan, prepared.buffer));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, d.c4(pixels, 0, nullptr, 8, prepared.plan, prepared.buffer));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, d.ac4(pixels, 0, pixels, 8, prepared.plan, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, d.c1(pixels, 0, pixels, 8, prepared.plan, prepared.buffer));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, d.ac4(pixels, 8, pixels, -8, prepared.plan, prepared.buffer));
}

INSTANTIATE_TEST_SUITE_P(Directions, DctBothWays, testing::Values(0, 1));

/// There and back, by one plan, the input to a few units in the last place of its RMS.
TEST(Dct, RoundTrip) {
    for (const QorImageSize size : {QorImageSize{64, 64}, {512, 100}, {63, 65}, {509, 19}, {77, 1}}) {
        std::vector<float> in(static_cast<size_t>(size.width * size.height)), there(in), back(in);
        for (float& value : in) value = static_cast<float>(random().below(2001) - 1000) / 577;
        const Prepared prepared(kDirections[0], size);
        const int32_t step = 4 * size.width;
        ASSERT_EQ(QOR_OK,
                  call(qoriDCTFwd_32f_C1R, in.data(), step, there.data(), step, prepared.plan, prepared.buffer));
        ASSERT_EQ(QOR_OK,
                  call(qoriDCTInv_32f_C1R, there.data(), step, back.data(), step, prepared.plan, prepared.buffer));
        std::vector<double> errors;
        for (size_t i = 0; i < in.size(); ++i)
            errors.push_back(static_cast<double>(in[i]) - static_cast<double>(back[i]));
        EXPECT_LE(rms(errors), 4 * 0x1p-23) << size.width;
    }
}

}  // namespace
}  // namespace qori::test
