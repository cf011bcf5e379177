// SPDX-License-Identifier: Apache-2.0
#include <array>
#include <initializer_list>

#include "fourier_members.h"

namespace qori::test {
namespace {

int32_t orderOf(int32_t n) {
    int32_t order = 0;
    while (1 << order < n) ++order;
    return order;
}

struct Fft {
    static constexpr PlanExports exportsOf(Elements elements) {
        switch (elements) {
            case Elements::real:
                return {
                    [](QorImageSize size, int32_t flag, int32_t* plan, int32_t* init, int32_t* buffer) {
                        return call(qoriFFTGetSize_R_32f, orderOf(size.width), orderOf(size.height), flag, 1, plan,
                                    init, buffer);
                    },
                    [](QorImageSize size, int32_t flag, QorFft2DPlan* plan, uint8_t* init) {
                        return call(qoriFFTInit_R_32f, orderOf(size.width), orderOf(size.height), flag, 2, plan, init);
                    },
                    [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
                        return call(qoriFFTInitAlloc_R_32f, plan, orderOf(size.width), orderOf(size.height), flag, 1);
                    },
                    qoriFFTFree_R_32f, qoriFFTGetBufSize_R_32f};
            case Elements::complex:
                return {
                    [](QorImageSize size, int32_t flag, int32_t* plan, int32_t* init, int32_t* buffer) {
                        return call(qoriFFTGetSize_C_32fc, orderOf(size.width), orderOf(size.height), flag, 1, plan,
                                    init, buffer);
                    },
                    [](QorImageSize size, int32_t flag, QorFft2DPlan* plan, uint8_t* init) {
                        return call(qoriFFTInit_C_32fc, orderOf(size.width), orderOf(size.height), flag, 2, plan, init);
                    },
                    [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
                        return call(qoriFFTInitAlloc_C_32fc, plan, orderOf(size.width), orderOf(size.height), flag, 1);
                    },
                    qoriFFTFree_C_32fc, qoriFFTGetBufSize_C_32fc};
            default:
                return {nullptr, nullptr,
                        [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
                            return call(qoriFFTInitAlloc_R_32s, plan, orderOf(size.width), orderOf(size.height), flag,
                                        1);
                        },
                        qoriFFTFree_R_32s, qoriFFTGetBufSize_R_32s};
        }
    }

    /// Every pair of sides up to 64 (of the main layout, else some), some larger ones where tables come from the init
    /// buffer and blocks leave a cache.
    template <class Check>
    static void forSizes(bool isMain, Check check) {
        for (int x = 0; x <= 6; ++x)
            for (int y = 0; y <= 6; ++y)
                if (isMain || random().oneIn(4)) check(QorImageSize{1 << x, 1 << y});
        if (!isMain) {
            for (QorImageSize size : {QorImageSize{64, 32}, {8, 1024}, {2048, 2}}) check(size);
            return;
        }
        for (QorImageSize size :
             {QorImageSize{128, 16}, {16, 256}, {512, 2}, {2, 1024}, {2048, 1}, {4, 2048}, {4096, 2}})
            check(size);
    }
};

TEST(Fft, AllMembers) {
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    FourierMembers<Fft>::operation<S, D, Layout::SL, QORI_KIND_##kind>(#name, &name);
#include "members/fft.inc"
#undef QORI_MEMBER
}

TEST(Fft, FailsInOrder) {
    FourierMembers<Fft>::checkFailures(qoriFFTFwd_RToPack_32f_C1R, qoriFFTInv_PackToR_32s8u_C1RSfs,
                                       qoriFFTInv_CToC_32fc_C1R, {2048, 4096});
}

TEST(Fft, PlansAreRefusedInOrder) {
    int32_t plan = -1, init = -1, buffer = -1;
    const auto real = [&](int32_t x, int32_t y, int32_t flag, int32_t* p) {
        return call(qoriFFTGetSize_R_32f, x, y, flag, 1, p, &init, &buffer);
    };
    const auto complex = [&](int32_t x, int32_t y, int32_t flag, int32_t* p) {
        return call(qoriFFTGetSize_C_32fc, x, y, flag, 1, p, &init, &buffer);
    };
    for (int32_t order : {-1, 31, INT32_MIN, INT32_MAX}) {
        EXPECT_EQ(QOR_ERR_ORDER, real(order, 0, 0, nullptr));
        EXPECT_EQ(QOR_ERR_ORDER, complex(0, order, 0, nullptr));
    }
    for (int32_t flag : {0, 3, 5, 6, 7, 9, 16, -1}) {
        EXPECT_EQ(QOR_ERR_NULL_PTR, real(30, 0, flag, nullptr));
        EXPECT_EQ(QOR_ERR_FLAG, real(30, 29, flag, &plan));
        EXPECT_EQ(QOR_ERR_FLAG, complex(30, 29, flag, &plan));
    }
    EXPECT_EQ(QOR_ERR_ORDER, real(30, 0, fftNoDiv, &plan));
    EXPECT_EQ(QOR_ERR_ORDER, real(0, 29, fftNoDiv, &plan));
    EXPECT_EQ(QOR_ERR_ORDER, complex(29, 0, fftNoDiv, &plan));
    EXPECT_EQ(QOR_ERR_ORDER, complex(0, 29, fftNoDiv, &plan));
    EXPECT_EQ(QOR_ERR_SIZE, real(29, 28, fftNoDiv, &plan));
    EXPECT_EQ(QOR_ERR_SIZE, complex(28, 0, fftNoDiv, &plan));
    EXPECT_EQ(-1, plan);
    EXPECT_EQ(-1, init);
    EXPECT_EQ(-1, buffer);

    alignas(64) static uint8_t memory[1 << 16];
    auto* const record = reinterpret_cast<QorFft2DPlan*>(memory);
    QorFft2DPlan *const none = nullptr, *out = nullptr;
    uint8_t* const noInit = nullptr;
    EXPECT_EQ(QOR_ERR_ORDER, call(qoriFFTInit_R_32f, 31, 0, 0, 0, none, noInit));
    EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriFFTInit_R_32f, 30, 0, 0, 0, none, noInit));
    EXPECT_EQ(QOR_ERR_FLAG, call(qoriFFTInit_C_32fc, 29, 0, 0, 0, record, noInit));
    EXPECT_EQ(QOR_ERR_ORDER, call(qoriFFTInit_C_32fc, 29, 0, 8, 0, record, noInit));
    for (const auto& [x, y] : {std::pair{11, 0}, {0, 11}, {12, 3}}) {
        EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriFFTInit_R_32f, x, y, 8, 0, record, noInit));
        EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriFFTInit_C_32fc, x, y, 8, 0, record, noInit));
        EXPECT_EQ(QOR_OK, real(x, y, 8, &plan));
        EXPECT_GT(init, 0);
        EXPECT_EQ(QOR_OK, complex(x, y, 8, &plan));
        EXPECT_GT(init, 0);
    }
    EXPECT_EQ(QOR_OK, call(qoriFFTInit_R_32f, 10, 10, 8, 12345, record, noInit));
    QorFft2DPlan** const noOut = nullptr;
    EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriFFTInitAlloc_R_32s, noOut, -1, 0, 0, 0));
    EXPECT_EQ(QOR_ERR_ORDER, call(qoriFFTInitAlloc_R_32s, &out, -1, 0, 0, 0));
    EXPECT_EQ(QOR_ERR_FLAG, call(qoriFFTInitAlloc_R_32s, &out, 30, 0, 0, 0));
    EXPECT_EQ(QOR_ERR_ORDER, call(qoriFFTInitAlloc_R_32s, &out, 30, 0, 1, 0));
    EXPECT_EQ(QOR_ERR_NO_MEMORY, call(qoriFFTInitAlloc_R_32s, &out, 15, 15, 1, 0));
    EXPECT_EQ(nullptr, out);
}

/// A constant is its own mean, and has no other frequency.
TEST(Fft, ConstantsAreExact) {
    for (const auto flag : {fftDivFwdByN, fftNoDiv}) {
        const QorImageSize size{32, 16};
        const float expected = flag == fftNoDiv ? 3.0f * 32 * 16 : 3.0f;
        const Plan plan(Fft::exportsOf(Elements::real), size, flag);
        const TestImage image(kDst, shapeOf(size), 4);
        image.fill<float>(1, [] { return 3.0f; });
        EXPECT_EQ(QOR_OK,
                  call(qoriFFTFwd_RToPack_32f_C1IR, image.data<float>(), image.step(), plan.get(), plan.buffer()));
        const View<float> spectrum = image.view<float>(1);
        image.forEach([&](int x, int y) { EXPECT_EQ(x + y == 0 ? expected : 0, spectrum.get(x, y)) << x << "," << y; });
    }
}

/// Sums and differences of two pixels, halved: to nearest, halves to even, saturated; any scale factor.
TEST(Fft, IntegersAreRoundedToEven) {
    const QorImageSize size{2, 1};
    const Plan plan(Fft::exportsOf(Elements::integers), size, fftNoDiv);
    const auto forward = [&](uint8_t a, uint8_t b, int32_t scaleFactor) {
        const uint8_t src[2] = {a, b};
        std::array<int32_t, 2> dst{-7, -7};
        EXPECT_EQ(QOR_OK,
                  qoriFFTFwd_RToPack_8u32s_C1RSfs(src, 2, dst.data(), 8, plan.get(), scaleFactor, plan.buffer()));
        return dst;
    };
    const auto inverse = [&](int32_t a, int32_t b, int32_t scaleFactor) {
        const int32_t src[2] = {a, b};
        std::array<uint8_t, 2> dst{77, 77};
        EXPECT_EQ(QOR_OK,
                  qoriFFTInv_PackToR_32s8u_C1RSfs(src, 8, dst.data(), 2, plan.get(), scaleFactor, plan.buffer()));
        return dst;
    };
    using Integers = std::array<int32_t, 2>;
    using Bytes = std::array<uint8_t, 2>;
    EXPECT_EQ((Integers{2, 0}), forward(1, 2, 1));
    EXPECT_EQ((Integers{2, 2}), forward(5, 0, 1));
    EXPECT_EQ((Integers{4, -4}), forward(0, 7, 1));
    EXPECT_EQ((Integers{INT32_MAX, INT32_MIN}), forward(1, 200, -31));
    EXPECT_EQ((Integers{0, 0}), forward(255, 0, INT32_MAX));
    EXPECT_EQ((Integers{INT32_MAX, INT32_MIN}), forward(0, 1, INT32_MIN));
    EXPECT_EQ((Bytes{2, 0}), inverse(2, 1, 1));
    EXPECT_EQ((Bytes{2, 2}), inverse(5, 0, 1));
    EXPECT_EQ((Bytes{254, 254}), inverse(509, 0, 1));
    EXPECT_EQ((Bytes{255, 0}), inverse(-100, 1000, 0));
    EXPECT_EQ((Bytes{0, 0}), inverse(INT32_MAX, 0, INT32_MAX));
    EXPECT_EQ((Bytes{255, 0}), inverse(0, 1, INT32_MIN));
}

}  // namespace
}  // namespace qori::test
