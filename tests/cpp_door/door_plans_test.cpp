// SPDX-License-Identifier: Apache-2.0
// Plans of the C++ header against the functions of qori.h, bit by bit.
#include "qori.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <vector>

#include "harness/companion/qorcore_instrumented.h"

namespace {

using namespace qori;

/// Something of everything: waves, an edge, and what they are of that differs between channels.
template <class T, class L>
Image<T, L> picture(QorImageSize size) {
    Image<T, L> image(size);
    constexpr int channels = View<T, L>::stride;
    for (int y = 0; y < size.height; ++y)
        for (int x = 0; x < size.width * channels; ++x)
            image.at(0, y)[x] = static_cast<T>((x * x + 31 * y + (x > size.width ? 90 : 0)) % 251);
    return image;
}

template <class T, class L>
bool same(const Image<T, L>& a, const Image<T, L>& b) {
    bool all = true;
    for (int y = 0; y < a.height(); ++y) {
        const auto bytes = static_cast<std::size_t>(a.width() * View<T, L>::stride) * sizeof(T);
        all = all && std::memcmp(a.at(0, y), b.at(0, y), bytes) == 0;
    }
    return all;
}

constexpr QorImageSize kFrom = {61, 43}, kTo = {29, 17};

/// A plan's record and the work memory of a call, by the functions of qori.h.
struct Bytes {
    explicit Bytes(int32_t n) : data(static_cast<std::size_t>(n) + 1) {}
    uint8_t* get() { return data.data(); }
    std::vector<uint8_t> data;
};

TEST(ResizePlans, AreTheirFunctions) {
    const auto src = picture<uint8_t, C3>(kFrom);
    Image<uint8_t, C3> ours(kTo), theirs(kTo);
    struct Way {
        Interpolation how;
        QorResult (*make)(QorResizePlan*, uint8_t*);
        decltype(&qoriResizeCubic_8u_C3R) run;
    };
    const Way ways[] = {
        {Interpolation::cubic(0.25, 0.5),
         [](QorResizePlan* p, uint8_t* i) { return qoriResizeCubicInit_8u(kFrom, kTo, 0.25f, 0.5f, p, i); },
         qoriResizeCubic_8u_C3R},
        {Interpolation::lanczos(2),
         [](QorResizePlan* p, uint8_t* i) { return qoriResizeLanczosInit_8u(kFrom, kTo, 2, p, i); },
         qoriResizeLanczos_8u_C3R},
        {Interpolation::linear(), [](QorResizePlan* p, uint8_t*) { return qoriResizeLinearInit_8u(kFrom, kTo, p); },
         qoriResizeLinear_8u_C3R},
        {Interpolation::linear().antialiased(),
         [](QorResizePlan* p, uint8_t* i) { return qoriResizeAntialiasingLinearInit(kFrom, kTo, p, i); },
         qoriResizeAntialiasing_8u_C3R},
        {Interpolation::cubic().antialiased(),
         [](QorResizePlan* p, uint8_t* i) { return qoriResizeAntialiasingCubicInit(kFrom, kTo, 0, 0.5f, p, i); },
         qoriResizeAntialiasing_8u_C3R},
        {Interpolation::lanczos().antialiased(),
         [](QorResizePlan* p, uint8_t* i) { return qoriResizeAntialiasingLanczosInit(kFrom, kTo, 3, p, i); },
         qoriResizeAntialiasing_8u_C3R},
    };
    for (const Way& way : ways) {
        const ResizePlan<uint8_t> plan(kFrom, kTo, way.how);
        ASSERT_EQ(QOR_OK, plan.status()) << way.how.kind;
        int32_t planBytes, initBytes, bytes;
        qoriResizeGetSize_8u(kFrom, kTo, way.how.kind, way.how.widens, &planBytes, &initBytes);
        Bytes record(planBytes), init(initBytes);
        auto* made = reinterpret_cast<QorResizePlan*>(record.get());
        ASSERT_EQ(QOR_OK, way.make(made, init.get()));
        qoriResizeGetBufferSize_8u(made, kTo, 3, &bytes);
        Bytes work(bytes);
        ASSERT_EQ(QOR_OK, way.run(src.at(0, 0), src.step(), theirs.at(0, 0), theirs.step(), {0, 0}, kTo,
                                  borderReplicate, nullptr, made, work.get()));
        ASSERT_EQ(QOR_OK, fill({1, 2, 3}, ours));
        EXPECT_EQ(QOR_OK, plan(src, ours));
        EXPECT_TRUE(same(ours, theirs)) << way.how.kind << way.how.widens;
    }
}

TEST(ResizePlans, TilesMakeTheWhole) {
    const auto src = picture<uint16_t, C4>(kFrom);
    for (const Interpolation how : {Interpolation::nearest(), Interpolation::super(), Interpolation::linear(),
                                    Interpolation::lanczos(), Interpolation::cubic().antialiased()}) {
        const ResizePlan<uint16_t> plan(kFrom, kTo, how);
        Image<uint16_t, C4> whole(kTo), tiled(kTo);
        Buffer buffer;
        ASSERT_EQ(QOR_OK, plan(src, whole));
        for (int32_t y = 0; y < kTo.height; y += 5)
            for (int32_t x = 0; x < kTo.width; x += 11) {
                const QorImageRect part = {x, y, std::min(11, kTo.width - x), std::min(5, kTo.height - y)};
                EXPECT_EQ(QOR_OK, plan.tile(src, tiled.view().crop(part), {x, y}, borderReplicate, buffer));
            }
        EXPECT_TRUE(same(whole, tiled)) << how.kind;
    }
    QorImageRect from, trimmed;
    const ResizePlan<uint16_t> plan(kFrom, kTo, Interpolation::linear());
    EXPECT_EQ(QOR_OK, plan.source_of({20, 10, 90, 90}, from, trimmed));
    EXPECT_EQ(9, trimmed.width);
    EXPECT_EQ(kFrom.width, from.x + from.width);
    QorBorderExtent extent;
    EXPECT_EQ(QOR_OK, plan.reach(extent));
    EXPECT_EQ(1, extent.right);
}

TEST(ResizePlans, SayWhyTheyAreNot) {
    const auto src = picture<uint8_t, C1>(kFrom);
    Image<uint8_t> dst(kTo), other({29, 18});
    const ResizePlan<uint8_t> plan(kFrom, kTo, Interpolation::linear());
    EXPECT_EQ(QOR_ERR_SIZE, plan(src, other));
    EXPECT_EQ(QOR_ERR_SIZE, plan(dst, dst));
    const ResizePlan<uint8_t> wrong({1, 1}, kTo, Interpolation::linear());
    EXPECT_FALSE(wrong);
    EXPECT_EQ(QOR_ERR_SIZE, wrong.status());
    EXPECT_EQ(QOR_ERR_SIZE, wrong(src, dst));
    EXPECT_EQ(nullptr, wrong.get());
    EXPECT_EQ(QOR_WARN_NOTHING_TO_DO, ResizePlan<uint8_t>(kFrom, {0, 5}, Interpolation::linear()).status());
    EXPECT_EQ(QOR_ERR_UNSUPPORTED_MODE,
              ResizePlan<uint8_t>(kFrom, kTo, Interpolation::nearest().antialiased()).status());
    EXPECT_EQ(QOR_ERR_UNSUPPORTED_MODE, ResizePlan<double>(kFrom, kTo, Interpolation::cubic()).status());
    EXPECT_EQ(QOR_OK, ResizePlan<double>(kFrom, kTo, Interpolation::linear()).status());
    for (int n = 1; n <= 2; ++n) {
        qorTestFailAllocation(n);
        const ResizePlan<uint8_t> none(kFrom, kTo, Interpolation::cubic());
        EXPECT_EQ(QOR_ERR_NO_MEMORY, none.status());
        EXPECT_EQ(QOR_ERR_NO_MEMORY, none(src, dst));
    }
    qorTestFailAllocation(1);
    EXPECT_EQ(QOR_ERR_NO_MEMORY, plan(src, dst));
    qorTestFailAllocation(0);
    ResizePlan<uint8_t> moved(kFrom, kTo, Interpolation::linear()), taker(std::move(moved));
    EXPECT_TRUE(taker);
    EXPECT_FALSE(moved);
    EXPECT_LT(moved(src, dst), 0);
    static_assert(!std::is_copy_constructible_v<ResizePlan<uint8_t>> && !std::is_copy_assignable_v<DctPlan>);
}

TEST(WarpPlans, AreTheirFunctions) {
    const auto src = picture<float, C3>(kFrom);
    const double turn[6] = {0.8, -0.3, 5, 0.3, 0.8, -4}, grey[3] = {10, 20, 30};
    Image<float, C3> ours(kTo), theirs(kTo);
    const WarpAffinePlan<float, C3> plan(kFrom, kTo, turn, Interpolation::cubic(), {borderConstant, {10, 20, 30}});
    ASSERT_EQ(QOR_OK, plan.status());
    ASSERT_EQ(QOR_OK, plan(src, ours));
    int32_t planBytes, initBytes, bytes;
    qoriWarpAffineGetSize(kFrom, kTo, qor32f, turn, interpCubic, 0, borderConstant, &planBytes, &initBytes);
    Bytes record(planBytes), init(initBytes);
    auto* made = reinterpret_cast<QorWarpPlan*>(record.get());
    ASSERT_EQ(QOR_OK, qoriWarpAffineCubicInit(kFrom, kTo, qor32f, turn, 0, 3, 0, 0.5, borderConstant, grey, 0, made,
                                              init.get()));
    qoriWarpGetBufferSize(made, kTo, &bytes);
    Bytes work(bytes);
    ASSERT_EQ(QOR_OK, qoriWarpAffineCubic_32f_C3R(src.at(0, 0), src.step(), theirs.at(0, 0), theirs.step(), {0, 0}, kTo,
                                                  made, work.get()));
    EXPECT_TRUE(same(ours, theirs));
    for (const Interpolation how : {Interpolation::nearest(), Interpolation::linear()})
        EXPECT_EQ(QOR_OK, (WarpAffinePlan<float, C3>(kFrom, kTo, turn, how)(src, ours)));
    EXPECT_EQ(QOR_ERR_INTERPOLATION, (WarpAffinePlan<float, C3>(kFrom, kTo, turn, Interpolation::super()).status()));
    const double flat[6] = {1, 1, 0, 1, 1, 0};
    EXPECT_EQ(QOR_ERR_COEFFS, (WarpAffinePlan<float>(kFrom, kTo, flat, Interpolation::linear()).status()));
}

template <class Plan, class T>
void checkRoundTrip(const Plan& plan, const Image<T, C1>& src) {
    Image<T> spectrum(src.size()), back(src.size()), itself(src.size());
    Buffer buffer;
    ASSERT_EQ(QOR_OK, plan.status());
    EXPECT_EQ(QOR_OK, plan.forward(src, spectrum));
    EXPECT_EQ(QOR_OK, plan.inverse(spectrum, back, buffer));
    for (int y = 0; y < src.height(); ++y)
        for (int x = 0; x < src.width(); ++x) {
            if constexpr (std::is_same_v<T, float>)
                ASSERT_NEAR(*src.at(x, y), *back.at(x, y), 1e-3);
            else
                ASSERT_NEAR(src.at(x, y)->re, back.at(x, y)->re, 1e-3);
        }
    if constexpr (!std::is_same_v<Plan, DctPlan>) {
        for (int y = 0; y < src.height(); ++y)
            for (int x = 0; x < src.width(); ++x) *itself.at(x, y) = *src.at(x, y);
        EXPECT_EQ(QOR_OK, plan.forward(in_place(itself)));
        EXPECT_TRUE(same(itself, spectrum));
        EXPECT_EQ(QOR_OK, plan.inverse(in_place(itself), buffer));
        EXPECT_TRUE(same(itself, back));
    }
    Image<T> other({src.width(), src.height() + 1});
    EXPECT_EQ(QOR_ERR_SIZE, plan.forward(src, other));
    EXPECT_EQ(QOR_ERR_SIZE, plan.inverse(other, back));
}

TEST(TransformPlans, GoThereAndBack) {
    const auto real = picture<float, C1>({24, 15});
    Image<QorComplex32f> complex({24, 15}), square({16, 8});
    for (int y = 0; y < 15; ++y)
        for (int x = 0; x < 24; ++x) *complex.at(x, y) = {*real.at(x, y), float(x - y)};
    for (int y = 0; y < 8; ++y)
        for (int x = 0; x < 16; ++x) *square.at(x, y) = *complex.at(x, y);
    checkRoundTrip(DftPlan<float>({24, 15}), real);
    checkRoundTrip(DftPlan<QorComplex32f>({24, 15}), complex);
    checkRoundTrip(FftPlan<float>({32, 16}), picture<float, C1>({32, 16}));
    checkRoundTrip(FftPlan<QorComplex32f>({16, 8}), square);
    checkRoundTrip(DctPlan({24, 15}), real);
    EXPECT_EQ(QOR_ERR_ORDER, FftPlan<float>({24, 16}).status());
    EXPECT_EQ(QOR_ERR_SIZE, DftPlan<float>({0, 16}).status());
    qorTestFailAllocation(1);
    EXPECT_EQ(QOR_ERR_NO_MEMORY, DctPlan({24, 15}).status());
    qorTestFailAllocation(0);
    DctPlan plan({24, 15}), taker(std::move(plan));
    EXPECT_TRUE(taker);
    EXPECT_FALSE(plan);
    Image<float> spectrum({24, 15});
    EXPECT_EQ(QOR_ERR_CONTEXT, plan.forward(real, spectrum));
    plan = std::move(taker);
    EXPECT_EQ(QOR_OK, plan.forward(real, spectrum));
}

TEST(TransformPlans, BytesHaveScaledSpectra) {
    const auto src = picture<uint8_t, C3>({16, 8});
    Image<int32_t, C3> dft({16, 8}), fft({16, 8});
    Image<uint8_t, C3> back({16, 8});
    const DftPlan<int32_t> anySize({16, 8}, fftNoDiv);
    const FftPlan<int32_t> powers({16, 8}, fftNoDiv);
    EXPECT_EQ(QOR_OK, anySize.forward(src, dft, 0));
    EXPECT_EQ(QOR_OK, powers.forward(src, fft, 0));
    double sums[3];
    ASSERT_EQ(QOR_OK, sum(src, sums));
    for (int c = 0; c < 3; ++c) EXPECT_EQ(sums[c], dft.at(0, 0)[c]);
    EXPECT_TRUE(same(dft, fft));
    EXPECT_EQ(QOR_OK, powers.inverse(fft, back, 7));  // 16 * 8 = 2^7
    double difference[3];
    ASSERT_EQ(QOR_OK, norm_diff_inf(src, back, difference));
    EXPECT_LE(difference[0], 1);
    EXPECT_EQ(QOR_ERR_BAD_ARG, DftPlan<float>({16, 8}).forward(Image<float>({16, 8}), Image<float>({16, 8}), 3));
}

TEST(FilterPlans, AreTheirFunctions) {
    const auto src = picture<uint8_t, C3>(kFrom);
    Image<uint8_t, C3> ours(kFrom), theirs(kFrom);
    const int16_t emboss[3][3] = {{-2, -1, 0}, {-1, 1, 1}, {0, 1, 2}};
    const LinearFilterPlan<uint8_t, C3> plan(Kernel{emboss}, 2, roundHalfAway);
    ASSERT_EQ(QOR_OK, plan.status());
    ASSERT_EQ(QOR_OK, plan(src, ours, {borderConstant, {5, 6, 7}}));
    int32_t planBytes, bytes;
    qoriFilterBorderGetSize({3, 3}, kFrom, qor8u, qor16s, 3, &planBytes, &bytes);
    Bytes record(planBytes), work(bytes);
    auto* made = reinterpret_cast<QorLinearFilterPlan*>(record.get());
    const uint8_t value[3] = {5, 6, 7};
    ASSERT_EQ(QOR_OK, qoriFilterBorderInit_16s(emboss[0], {3, 3}, 2, qor8u, 3, roundHalfAway, made));
    ASSERT_EQ(QOR_OK, qoriFilterBorder_8u_C3R(src.at(0, 0), src.step(), theirs.at(0, 0), theirs.step(), kFrom,
                                              borderConstant, value, made, work.get()));
    EXPECT_TRUE(same(ours, theirs));
    const float third[1][3] = {{1 / 3.f, 1 / 3.f, 1 / 3.f}};
    EXPECT_EQ(QOR_OK, (LinearFilterPlan<uint8_t, C3>(Kernel{third})(src, ours)));
    EXPECT_EQ(QOR_ERR_DIVISOR, (LinearFilterPlan<uint8_t, C3>(Kernel{emboss}, 0).status()));
    EXPECT_EQ(QOR_ERR_DATA_TYPE, (LinearFilterPlan<float>(Kernel{emboss}).status()));
}

TEST(FilterPlans, AdaptiveThresholds) {
    const auto src = picture<uint8_t, C1>(kFrom);
    Image<uint8_t> ours(kFrom), theirs(kFrom), itself(kFrom);
    const AdaptiveGaussPlan plan({7, 7}, 1.5f);
    ASSERT_EQ(QOR_OK, plan.status());
    ASSERT_EQ(QOR_OK, plan(src, ours, 3, borderReplicate, 200, 100));
    int32_t planBytes, bytes;
    qoriThresholdAdaptiveGaussGetBufferSize(kFrom, {7, 7}, qor8u, 1, &planBytes, &bytes);
    Bytes record(planBytes), work(bytes);
    auto* made = reinterpret_cast<QorAdaptiveGaussSpec*>(record.get());
    ASSERT_EQ(QOR_OK, qoriThresholdAdaptiveGaussInit(kFrom, {7, 7}, qor8u, 1, 1.5f, made));
    ASSERT_EQ(QOR_OK, qoriThresholdAdaptiveGauss_8u_C1R(src.at(0, 0), src.step(), theirs.at(0, 0), theirs.step(), kFrom,
                                                        3, 200, 100, borderReplicate, 0, made, work.get()));
    EXPECT_TRUE(same(ours, theirs));
    ASSERT_EQ(QOR_OK, copy(src, itself));
    EXPECT_EQ(QOR_OK, plan(in_place(itself), 3, borderReplicate, 200, 100));
    EXPECT_TRUE(same(itself, theirs));
    EXPECT_EQ(QOR_ERR_MASK_SIZE, AdaptiveGaussPlan({4, 4}).status());
}

TEST(HistogramPlans, CountWhatTheyAreMadeFor) {
    const auto src = picture<uint16_t, C3>(kFrom);
    int32_t counts[3][4] = {}, wanted[3][4] = {};
    int32_t* const lists[3] = {counts[0], counts[1], counts[2]};
    const HistogramPlan<uint16_t, C3> plan({0, 10, 20}, {256, 266, 276}, {5, 5, 3});
    ASSERT_EQ(QOR_OK, plan.status());
    ASSERT_EQ(QOR_OK, plan(src, lists));
    for (int y = 0; y < kFrom.height; ++y)
        for (int x = 0; x < kFrom.width; ++x)
            for (int c = 0; c < 3; ++c) {
                const int width = c < 2 ? 64 : 128, bin = (src.at(x, y)[c] - 10 * c) / width;
                if (src.at(x, y)[c] >= 10 * c && bin < (c < 2 ? 4 : 2)) ++wanted[c][bin];
            }
    EXPECT_EQ(0, std::memcmp(counts, wanted, sizeof counts));
    const float edges[3] = {0, 100.5f, 300};
    const float* const levels[1] = {edges};
    const HistogramPlan<float> given(levels, 3);
    float read[3] = {};
    float* const into[1] = {read};
    EXPECT_EQ(QOR_OK, given.levels(into));
    EXPECT_EQ(100.5f, read[1]);
    int32_t two[2];
    const auto grey = picture<float, C1>(kFrom);
    EXPECT_EQ(QOR_OK, given(grey, two));
    EXPECT_EQ(kFrom.width * kFrom.height, two[0] + two[1]);
    EXPECT_EQ(QOR_ERR_HIST_LEVELS, (HistogramPlan<float>(0, 1, 1).status()));
}

TEST(HogPlans, AreTheirFunctions) {
    const auto src = picture<uint8_t, C3>({96, 160});
    const QorHogConfig persons = {0, 8, 16, 8, 9, 8.0f, 0.2f, {64, 128}};
    const HogPlan plan(persons);
    ASSERT_EQ(QOR_OK, plan.status());
    ASSERT_EQ(3780, plan.descriptor_floats());
    const QorPoint2D corners[2] = {{0, 0}, {16, 24}};
    std::vector<float> ours(2 * 3780), theirs(2 * 3780);
    ASSERT_EQ(QOR_OK, plan(src, corners, 2, ours.data(), {borderConstant, {1, 2, 3}}));
    int32_t planBytes, bytes;
    qoriHOGGetSize(&persons, &planBytes);
    Bytes record(planBytes);
    auto* made = reinterpret_cast<QorHogPlan*>(record.get());
    ASSERT_EQ(QOR_OK, qoriHOGInit(&persons, made));
    qoriHOGGetBufferSize(made, src.size(), &bytes);
    Bytes work(bytes);
    const uint8_t value[3] = {1, 2, 3};
    ASSERT_EQ(QOR_OK, qoriHOG_8u32f_C3R(src.at(0, 0), src.step(), src.size(), corners, 2, theirs.data(), made,
                                        borderConstant, value, work.get()));
    EXPECT_EQ(ours, theirs);
    EXPECT_EQ(QOR_ERR_UNSUPPORTED_MODE, HogPlan(QorHogConfig{}).status());
    EXPECT_EQ(QOR_ERR_SIZE, plan(picture<uint8_t, C1>({8, 8}), corners, 1, ours.data()));
}

}  // namespace
