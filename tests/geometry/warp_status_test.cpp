// SPDX-License-Identifier: Apache-2.0
// Which faults each function of the warp reports, in which order, and that it then writes nothing.
#include "warp_jobs.h"

namespace qori::test {
namespace {

constexpr double kIdentity[6] = {1, 0, 0, 0, 1, 0}, kSingular[6] = {2, 4, 0, 1, 2, 0};
constexpr QorImageSize kOk{20, 10}, kNone{0, 10}, kNegative{10, -1};
const double kNan = std::nan(""), kInfinite = INFINITY;

/// Two faults each, where the first is the one that is reported.
TEST(WarpStatus, SizeQueryChecksInOrder) {
    const TestImage out = block(kWarpBuffer, 8);
    int32_t *plan = out.data<int32_t>(), *init = plan + 1;
    const auto query = [&](QorImageSize src, QorImageSize dst, int32_t type, const double* c, int32_t kind,
                           int32_t direction, int32_t border) {
        return call(qoriWarpAffineGetSize, src, dst, type, c, kind, direction, border, plan, init);
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriWarpAffineGetSize(kNone, kOk, 1, kIdentity, 1, 0, 0, nullptr, init));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriWarpAffineGetSize(kNone, kOk, 1, kIdentity, 1, 0, 0, plan, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, query(kNone, kOk, 1, nullptr, 1, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, query(kNone, kOk, 3, kIdentity, 1, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, query(kOk, kNegative, 3, kIdentity, 1, 0, 0));
    for (int32_t bad : {0, 2, 6, 8, 14, 20, -1})
        QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, out, query(kOk, kOk, bad, kIdentity, 8, 0, 0));
    for (int32_t bad : {0, 3, 8, 16, -1})
        QORI_EXPECT_STATUS(QOR_ERR_INTERPOLATION, out, query(kOk, kOk, qor8u, kIdentity, bad, 2, 0));
    for (int32_t bad : {-1, 2, INT32_MIN})
        QORI_EXPECT_STATUS(QOR_ERR_DIRECTION, out, query(kOk, kOk, qor8u, kSingular, interpLinear, bad, 2));
    QORI_EXPECT_STATUS(QOR_ERR_COEFFS, out, query(kOk, kOk, qor8u, kSingular, interpLinear, 0, 2));
    for (int32_t bad : {2, 3, 4, 5, 8, 9, 0x12, 0x100, -1})
        QORI_EXPECT_STATUS(QOR_ERR_BORDER, out, query({2, 1 << 30}, kOk, qor8u, kIdentity, interpLinear, 0, bad));
    const struct {
        int32_t type, height;
    } limits[] = {{qor8u, 1 << 30}, {qor16u, 1 << 29}, {qor16s, 1 << 29}, {qor32f, 1 << 28}, {qor64f, 1 << 27}};
    for (const auto& limit : limits) {
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, query({2, limit.height}, kOk, limit.type, kIdentity, interpCubic, 0, 6));
        EXPECT_EQ(QOR_OK, query({INT32_MAX, limit.height - 1}, kOk, limit.type, kIdentity, interpCubic, 0, 6));
    }
    for (int32_t good : {0, 1, 6, 7, 0x10, 0xF1, 0x86, 0xF7})
        EXPECT_EQ(QOR_OK, query(kOk, kOk, qor64f, kIdentity, interpNearest, 1, good));
    EXPECT_EQ(0, *init);
    markSwept("qoriWarpAffineGetSize");
}

TEST(WarpStatus, MatricesWithoutInverseAreRefusedByQueryAndInitialiser) {
    const TestImage out = block(kWarpPlan, 4096), sizes = block(kWarpBuffer, 8);
    const auto status = [&](std::array<double, 6> c, int32_t direction) {
        int32_t* s = sizes.data<int32_t>();
        const QorResult query =
            call(qoriWarpAffineGetSize, kOk, kOk, int32_t{qor8u}, static_cast<const double*>(c.data()),
                 int32_t{interpLinear}, direction, int32_t{borderReplicate}, s, s + 1);
        const Snapshot before = out.snapshot();
        const QorResult init =
            call(qoriWarpAffineLinearInit, kOk, kOk, int32_t{qor8u}, static_cast<const double*>(c.data()), direction,
                 int32_t{1}, int32_t{borderReplicate}, static_cast<const double*>(nullptr), int32_t{0},
                 out.data<QorWarpPlan>());
        EXPECT_EQ(query, init);
        if (init < 0) {
            QORI_EXPECT_UNCHANGED(out, before);
        }
        return query;
    };
    for (int32_t direction : {0, 1}) {
        EXPECT_EQ(QOR_ERR_COEFFS, status({1, 1, 0, 1, 1 + 0.9e-10, 0}, direction));
        EXPECT_EQ(QOR_OK, status({1, 1, 0, 1, 1 + 1.2e-10, 0}, direction));
        EXPECT_EQ(QOR_ERR_COEFFS, status({0, 0.99e-5, 0, -0.99e-5, 0, 0}, direction));  // a small quarter turn
        EXPECT_EQ(QOR_OK, status({0, 1.1e-5, 0, -1.1e-5, 0, 0}, direction));
        EXPECT_EQ(QOR_OK, status({1e-5, 0, 0, 0, 1e-5, 0}, direction));  // no turn
        EXPECT_EQ(QOR_ERR_COEFFS, status({1e-100, 0, 0, 0, 1e-100, 0}, direction));
        EXPECT_EQ(QOR_ERR_COEFFS, status({1e200, 0, 0, 0, 1e200, 0}, direction));      // the product overflows
        EXPECT_EQ(QOR_ERR_COEFFS, status({1, 1e200, 0, 1e200, 1, 0}, direction));      // so does the other
        EXPECT_EQ(QOR_ERR_COEFFS, status({1e-90, 0, 1e300, 0, 1e-90, 0}, direction));  // the inverse does
        for (size_t i = 0; i < 6; ++i)
            for (double bad : {kNan, kInfinite, -kInfinite}) {
                std::array<double, 6> c{1, 0, 0, 0, 1, 0};
                c[i] = bad;
                EXPECT_EQ(QOR_ERR_COEFFS, status(c, direction));
            }
    }
}

TEST(WarpStatus, InitialisersCheckInOrder) {
    const TestImage out = block(kWarpPlan, 4096), scratch = block(kWarpInit, 64);
    auto* plan = out.data<QorWarpPlan>();
    auto* buffer = scratch.data<uint8_t>();
    const double value[4] = {};
    const auto linear = [&](QorImageSize src, QorImageSize dst, int32_t type, const double* c, int32_t direction,
                            int32_t channels, int32_t border, const double* v, int32_t smooth) {
        const QorResult nearest =
            call(qoriWarpAffineNearestInit, src, dst, type, c, direction, channels, border, v, smooth, plan);
        const QorResult cubic = call(qoriWarpAffineCubicInit, src, dst, type, c, direction, channels, 0.0, 0.5, border,
                                     v, smooth, plan, buffer);
        const QorResult result =
            call(qoriWarpAffineLinearInit, src, dst, type, c, direction, channels, border, v, smooth, plan);
        EXPECT_EQ(result, nearest);
        EXPECT_EQ(result, cubic);
        return result;
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out,
                       qoriWarpAffineLinearInit(kNone, kOk, 1, kIdentity, 0, 1, 1, value, 0, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out,
                       qoriWarpAffineNearestInit(kNone, kOk, 1, kIdentity, 0, 1, 1, value, 0, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out,
                       qoriWarpAffineCubicInit(kNone, kOk, 1, kIdentity, 0, 1, 0, 0, 1, value, 0, plan, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, linear(kNone, kOk, 1, nullptr, 0, 1, 1, value, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, linear(kNone, kOk, 3, kIdentity, 0, 1, 1, value, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, linear(kOk, kNegative, 3, kIdentity, 0, 1, 1, value, 0));
    QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, out, linear(kOk, kOk, 3, kIdentity, 2, 1, 1, value, 0));
    QORI_EXPECT_STATUS(QOR_ERR_DIRECTION, out, linear(kOk, kOk, 1, kSingular, 2, 1, 1, value, 0));
    QORI_EXPECT_STATUS(QOR_ERR_COEFFS, out, linear(kOk, kOk, 1, kSingular, 0, 1, 2, value, 0));
    for (int32_t bad : {2, 5, 8, 0x10, 0x81, 0xF0, 0xF1, 0x106, -1})
        QORI_EXPECT_STATUS(QOR_ERR_BORDER, out, linear(kOk, kOk, 1, kIdentity, 0, 2, bad, nullptr, 0));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, linear(kOk, kOk, 1, kIdentity, 0, 2, 0, nullptr, 1));
    for (int32_t bad : {0, 2, 5, -1})
        QORI_EXPECT_STATUS(QOR_ERR_CHANNELS_UNSUPPORTED, out, linear(kOk, kOk, 1, kIdentity, 0, bad, 1, nullptr, 1));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, out, linear({1, 9}, kOk, 1, kIdentity, 0, 1, 1, nullptr, 1));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, out, linear(kOk, kOk, 1, kIdentity, 0, 1, 1, nullptr, -1));
    QORI_EXPECT_STATUS(QOR_ERR_COEFFS, out, linear({1, 9}, kOk, 1, kIdentity, 0, 1, 1, nullptr, 0));
    QORI_EXPECT_STATUS(QOR_ERR_COEFFS, out, linear({9, 1}, kOk, 1, kIdentity, 1, 1, 6, nullptr, 0));
    for (int32_t good : {1, 6, 7, 0x36, 0xF7})
        EXPECT_EQ(QOR_OK, linear(kOk, kOk, 1, kIdentity, 0, 3, good, nullptr, 0));
    for (const char* name : {"qoriWarpAffineNearestInit", "qoriWarpAffineLinearInit", "qoriWarpAffineCubicInit"})
        markSwept(name);
}

/// A plan and the arguments of a call with it.
template <class T, int channels>
struct Fixture {
    WarpJob job;
    WarpPlanMade made;
    TestImage src, dst, memory;

    explicit Fixture(WarpJob j)
        : job(j),
          made(makeWarpPlan(j, kTypeCode<T>, channels)),
          src(kWarpSrc, {.width = j.src.width, .height = j.src.height}, channels * int{sizeof(T)}),
          dst(kWarpDst, {.width = 64, .height = 40}, channels * int{sizeof(T)}),
          memory(block(kWarpBuffer, 64)) {
        src.fill<T>(channels, drawPixel<T>);
    }
    template <class Function>
    QorResult run(Function function, QorPoint2D at, QorImageSize size, int32_t srcStep = 0, int32_t dstStep = 0) const {
        return call(function, static_cast<const T*>(src.data<T>()), src.step() + srcStep, dst.data<T>(),
                    dst.step() + dstStep, at, size, static_cast<const QorWarpPlan*>(made.plan), memory.data<uint8_t>());
    }
};

WarpJob plainJob(int32_t interpolation, int32_t border = borderConstant) {
    return {{.interpolation = interpolation}, {1, 0, 0.5, 0, 1, 0.25}, true, kOk, {12, 15}, border};
}

TEST(WarpStatus, OperationsCheckInOrder) {
    const Fixture<uint8_t, 1> f(plainJob(interpLinear));
    const auto linear = qoriWarpAffineLinear_8u_C1R;
    const auto* s = f.src.data<uint8_t>();
    auto *d = f.dst.data<uint8_t>(), *b = f.memory.data<uint8_t>();
    const QorImageSize ok{12, 15}, none{0, -1}, negative{4, -1};
    const QorPoint2D zero{0, 0}, outside{12, 0};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, linear(nullptr, 20, d, 64, outside, none, f.made.plan, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, linear(s, 20, nullptr, 64, outside, none, f.made.plan, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, linear(s, 20, d, 64, outside, none, nullptr, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, linear(s, 20, d, 64, outside, none, f.made.plan, nullptr));
    QORI_EXPECT_STATUS(QOR_WARN_NOTHING_TO_DO, f.dst, f.run(qoriWarpAffineCubic_8u_C1R, outside, none));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, f.dst, f.run(qoriWarpAffineNearest_8u_C1R, outside, negative));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, f.dst, f.run(qoriWarpAffineCubic_8u_C1R, outside, negative));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, f.dst, f.run(qoriWarpAffineLinear_8u_C3R, outside, negative));
    const Fixture<int16_t, 3> words(plainJob(interpCubic));
    QORI_EXPECT_STATUS(QOR_OK, block(kWarpOther, 1), words.run(qoriWarpAffineCubic_16s_C3R, zero, ok));
    const TestImage other = block(kWarpOther, 1024);
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, f.dst, linear(s, 20, d, 64, outside, negative, other.data<QorWarpPlan>(), b));
    const Fixture<uint16_t, 1> type(plainJob(interpLinear));
    const TestImage& wordDst = type.dst;
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, wordDst,
                       qoriWarpAffineLinear_16s_C1R(type.src.data<int16_t>(), 40, wordDst.data<int16_t>(), 128, outside,
                                                    negative, type.made.plan, b));
    const Fixture<double, 1> doubles(plainJob(interpLinear));
    const auto doublesOf = qoriWarpAffineLinear_64f_C1R;
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, doubles.dst, doubles.run(doublesOf, outside, negative, 4));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, doubles.dst, doubles.run(doublesOf, outside, ok, 4));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, doubles.dst, doubles.run(doublesOf, outside, ok, 0, -7));
    const QorPoint2D badOffsets[] = {{-1, 0}, {0, -1}, outside, {0, 15}, {INT32_MIN, 0}, {0, INT32_MAX}};
    for (QorPoint2D bad : badOffsets)
        QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, doubles.dst, doubles.run(doublesOf, bad, ok));
    EXPECT_EQ(QOR_OK, doubles.run(doublesOf, zero, ok));
}

TEST(WarpStatus, QueriesOfAPlanCheckInOrder) {
    const TestImage other = block(kWarpOther, 1024), out = block(kWarpInit, 64);
    auto* fake = other.data<QorWarpPlan>();
    auto* bytes = out.data<int32_t>();
    auto* border = out.data<QorBorderExtent>();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriWarpGetBufferSize(nullptr, kOk, bytes));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriWarpGetBufferSize(fake, kOk, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, out, qoriWarpGetBufferSize(fake, kOk, bytes));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriWarpGetBorderSize(nullptr, border));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriWarpGetBorderSize(fake, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, out, qoriWarpGetBorderSize(fake, border));
    for (int32_t kind : {interpNearest, interpLinear, interpCubic}) {
        const auto [plan, status] = makeWarpPlan(plainJob(kind), qor32f, 4);
        QorBorderExtent b{9, 9, 9, 9};
        EXPECT_EQ(QOR_OK, call(qoriWarpGetBorderSize, static_cast<const QorWarpPlan*>(plan), &b));
        const int one = kind == interpCubic;
        EXPECT_TRUE(b.left == one && b.top == one && b.right == 2 * one && b.bottom == 2 * one);
    }
    markSwept("qoriWarpGetBorderSize");
    markSwept("qoriWarpGetBufferSize");
}

TEST(WarpStatus, TilesBeyondTheDestinationAreTrimmed) {
    const Fixture<uint8_t, 1> f(plainJob(interpNearest));
    const Snapshot untouched = f.dst.snapshot();
    const auto run = [&](QorPoint2D at, QorImageSize size) { return f.run(qoriWarpAffineNearest_8u_C1R, at, size); };
    EXPECT_EQ(QOR_OK, run({0, 0}, {12, 15}));
    EXPECT_EQ(QOR_WARN_ADJUSTED, run({0, 0}, {13, 15}));
    EXPECT_EQ(QOR_WARN_ADJUSTED, run({0, 14}, {12, 2}));  // by its offset alone
    EXPECT_EQ(QOR_WARN_ADJUSTED, run({11, 0}, {INT32_MAX, INT32_MAX}));
    Snapshot expected = f.dst.snapshot();  // only the plan's 12 x 15 pixels may differ
    const auto now = expected.view<uint8_t>(1), before = const_cast<Snapshot&>(untouched).view<uint8_t>(1);
    for (int y = 0; y < 15; ++y)
        for (int x = 0; x < 12; ++x) now.set(x, y, 0, before.get(x, y));
    EXPECT_EQ(untouched.bytes, expected.bytes);
}

TEST(WarpStatus, ASourceThatMeetsNoPixel) {
    for (int32_t border : {0, 1, 6, 7}) {
        WarpJob job = plainJob(interpLinear, border);
        job.coeffs = {1, 0, 400, 0, 1, 0};
        job.isBackward = false;
        job.borderValue = {77.5};
        const Fixture<uint8_t, 1> f(job);
        const QorResult expected = border >= borderReadAll ? QOR_WARN_WARP_EMPTY : QOR_OK;
        EXPECT_EQ(expected, f.made.status);
        const Snapshot before = f.dst.snapshot();
        EXPECT_EQ(expected, f.run(qoriWarpAffineLinear_8u_C1R, {0, 0}, {12, 15}));
        if (expected != QOR_OK) {
            EXPECT_EQ(expected, f.run(qoriWarpAffineLinear_8u_C1R, {0, 0}, {13, 15}));  // before the trimming is told
            QORI_EXPECT_UNCHANGED(f.dst, before);
        }
        for (int y = 0; y < 15 && expected == QOR_OK; ++y)
            for (int x = 0; x < 12; ++x)
                EXPECT_EQ(border == borderConstant ? 78 : f.src.view<uint8_t>(1).get(0, std::min(y, 9)),
                          f.dst.view<uint8_t>(1).get(x, y));
    }
    // A source whose image lies between four pixel centres, and one that covers a single one.
    WarpJob job = plainJob(interpNearest, borderReadAll);
    job.isBackward = false;
    job.coeffs = {0.02, 0, 5.2, 0, 0.02, 5.2};
    EXPECT_EQ(QOR_WARN_WARP_EMPTY, makeWarpPlan(job, qor8u, 1).status);
    job.coeffs = {0.02, 0, 4.9, 0, 0.02, 4.9};
    EXPECT_EQ(QOR_OK, makeWarpPlan(job, qor8u, 1).status);
}

}  // namespace
}  // namespace qori::test
