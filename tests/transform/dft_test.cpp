// SPDX-License-Identifier: Apache-2.0
#include <initializer_list>

#include "fourier_members.h"

namespace qori::test {
namespace {

struct Dft {
    static constexpr PlanExports exportsOf(Elements elements) {
        switch (elements) {
            case Elements::real:
                return {[](QorImageSize size, int32_t flag, int32_t* plan, int32_t* init, int32_t* buffer) {
                            return call(qoriDFTGetSize_R_32f, size, flag, 1, plan, init, buffer);
                        },
                        [](QorImageSize size, int32_t flag, QorFft2DPlan* plan, uint8_t* init) {
                            return call(qoriDFTInit_R_32f, size, flag, 2, plan, init);
                        },
                        [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
                            return call(qoriDFTInitAlloc_R_32f, plan, size, flag, 1);
                        },
                        qoriDFTFree_R_32f, qoriDFTGetBufSize_R_32f};
            case Elements::complex:
                return {[](QorImageSize size, int32_t flag, int32_t* plan, int32_t* init, int32_t* buffer) {
                            return call(qoriDFTGetSize_C_32fc, size, flag, 1, plan, init, buffer);
                        },
                        [](QorImageSize size, int32_t flag, QorFft2DPlan* plan, uint8_t* init) {
                            return call(qoriDFTInit_C_32fc, size, flag, 2, plan, init);
                        },
                        [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
                            return call(qoriDFTInitAlloc_C_32fc, plan, size, flag, 1);
                        },
                        qoriDFTFree_C_32fc, qoriDFTGetBufSize_C_32fc};
            default:
                return {nullptr, nullptr,
                        [](QorFft2DPlan** plan, QorImageSize size, int32_t flag) {
                            return call(qoriDFTInitAlloc_R_32s, plan, size, flag, 1);
                        },
                        qoriDFTFree_R_32s, qoriDFTGetBufSize_R_32s};
        }
    }

    /// Every width and every height to 64 (of the main layout, else some), with another that changes; factors of all
    /// kinds, convolutions of primes and with chirps in a whole side and in parts of it.
    template <class Check>
    static void forSizes(bool isMain, Check check) {
        for (int n = 1; n <= 64; ++n) {
            if (isMain || random().oneIn(5)) check(QorImageSize{n, 1 + n * 7 % 23});
            if (isMain || random().oneIn(5)) check(QorImageSize{1 + n * 5 % 19, n});
        }
        if (!isMain) {
            for (QorImageSize size : {QorImageSize{202, 101}, {17, 40}, {24, 3}, {101, 18}}) check(size);
            return;
        }
        for (QorImageSize size : {QorImageSize{360, 2},
                                  {3, 1000},
                                  {202, 17},
                                  {101, 17},
                                  {18, 206},
                                  {17, 509},
                                  {1009, 1},
                                  {2, 1009},
                                  {2022, 1},
                                  {4099, 1},
                                  {1155, 3},
                                  {47, 64},
                                  {96, 32},
                                  {40, 128},
                                  {3, 1201},
                                  {1, 2309},
                                  {193, 2},
                                  {2, 149},
                                  {89, 3},
                                  {73, 2},
                                  {214, 5},
                                  {2003, 2},
                                  {4, 227},
                                  {293, 2},
                                  {4001, 1},
                                  {503, 2},
                                  {467, 2},
                                  {3, 569},
                                  {1553, 1},
                                  {1, 1259},
                                  {2, 1619}})
            check(size);
    }
};

TEST(Dft, AllMembers) {
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    FourierMembers<Dft>::operation<S, D, Layout::SL, QORI_KIND_##kind>(#name, &name);
#include "members/dft.inc"
#undef QORI_MEMBER
}

TEST(Dft, FailsInOrder) {
    FourierMembers<Dft>::checkFailures(qoriDFTFwd_RToPack_32f_C1R, qoriDFTInv_PackToR_32s8u_C1RSfs,
                                       qoriDFTInv_CToC_32fc_C1R, {1009, 1200});
}

TEST(Dft, PlansAreRefusedInOrder) {
    int32_t plan = -1, init = -1, buffer = -1;
    int32_t* const none = nullptr;
    QorFft2DPlan *const noPlan = nullptr, *out = nullptr;
    QorFft2DPlan** const noOut = nullptr;
    uint8_t* const noInit = nullptr;
    alignas(64) static uint8_t memory[1 << 17];
    auto* const record = reinterpret_cast<QorFft2DPlan*>(memory);
    for (QorImageSize size : {QorImageSize{0, 1}, {1, 0}, {-3, 4}}) {
        EXPECT_EQ(QOR_ERR_SIZE, call(qoriDFTGetSize_R_32f, size, 0, 0, none, none, none));
        EXPECT_EQ(QOR_ERR_SIZE, call(qoriDFTInit_C_32fc, size, 0, 0, noPlan, noInit));
        EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriDFTInitAlloc_R_32f, noOut, size, 0, 0));
        EXPECT_EQ(QOR_ERR_SIZE, call(qoriDFTInitAlloc_R_32f, &out, size, 0, 0));
    }
    const QorImageSize ok{30, 20};
    EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriDFTGetSize_R_32f, ok, 0, 0, &plan, none, &buffer));
    EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriDFTInit_C_32fc, ok, 0, 0, noPlan, noInit));
    for (int32_t flag : {0, 3, 5, 6, 7, 9, 16, -1}) {
        EXPECT_EQ(QOR_ERR_FLAG, call(qoriDFTGetSize_C_32fc, ok, flag, 0, &plan, &init, &buffer));
        EXPECT_EQ(QOR_ERR_FLAG, call(qoriDFTInit_R_32f, ok, flag, 0, record, noInit));
        EXPECT_EQ(QOR_ERR_FLAG, call(qoriDFTInitAlloc_C_32fc, &out, ok, flag, 0));
    }
    for (QorImageSize size : {QorImageSize{INT32_MAX, 1}, {1, INT32_MAX}, {1 << 28, 1}, {INT32_MAX, INT32_MAX}}) {
        EXPECT_EQ(QOR_ERR_SIZE, call(qoriDFTGetSize_C_32fc, size, 1, 0, &plan, &init, &buffer));
        EXPECT_EQ(QOR_ERR_NO_MEMORY, call(qoriDFTInitAlloc_R_32s, &out, size, 1, 0));
    }
    EXPECT_EQ(-1, plan);
    EXPECT_EQ(-1, init);
    EXPECT_EQ(-1, buffer);
    EXPECT_EQ(nullptr, out);
    // Chirps and long sides are made with memory for it.
    EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriDFTInit_R_32f, QorImageSize{101, 1}, 1, 0, record, noInit));
    EXPECT_EQ(QOR_ERR_NULL_PTR, call(qoriDFTInit_R_32f, QorImageSize{1, 1025}, 1, 0, record, noInit));
    EXPECT_EQ(QOR_OK, call(qoriDFTInit_R_32f, QorImageSize{97, 1024}, 1, 0, record, noInit));
}

/// Plans of powers of two are the other family's in all but their tag.
TEST(Dft, AgreesWithFft) {
    const QorImageSize size{64, 32};
    const Plan plan(Dft::exportsOf(Elements::real), size, fftDivBySqrtN);
    QorFft2DPlan* other = nullptr;
    ASSERT_EQ(QOR_OK, call(qoriFFTInitAlloc_R_32f, &other, 6, 5, int32_t{fftDivBySqrtN}, 1));
    const Shape shape = shapeOf(size);
    const TestImage src(kSrc, shape, 4), dst(kDst, shape, 4);
    src.fill<float>(1, noise);
    uint8_t* const none = nullptr;
    const float* const from = src.data<float>();
    const QorFft2DPlan* const ofFft = other;
    EXPECT_EQ(QOR_OK,
              call(qoriDFTFwd_RToPack_32f_C1R, from, src.step(), dst.data<float>(), dst.step(), plan.get(), none));
    const Snapshot expected = dst.snapshot();
    EXPECT_EQ(QOR_ERR_CONTEXT,
              call(qoriFFTFwd_RToPack_32f_C1R, from, src.step(), dst.data<float>(), dst.step(), plan.get(), none));
    EXPECT_EQ(QOR_OK, call(qoriFFTFwd_RToPack_32f_C1R, from, src.step(), dst.data<float>(), dst.step(), ofFft, none));
    QORI_EXPECT_UNCHANGED(dst, expected);
    EXPECT_EQ(QOR_OK, call(qoriFFTFree_R_32f, other));
}

constexpr int kTurns = 200;

/// RMS error of many forward transforms of complex images by RMS of the exact results.
double complexError(QorImageSize size) {
    const Plan plan(Dft::exportsOf(Elements::complex), size, fftNoDiv);
    const TestImage src(kSrc, shapeOf(size), 8), dst(kDst, shapeOf(size), 8);
    const View<float> from = src.view<float>(2), to = dst.view<float>(2);
    uint8_t* const none = nullptr;
    Deviation deviation;
    for (int turn = 0; turn < kTurns; ++turn) {
        src.fill<float>(2, noise);
        reference::Field field(size.width, size.height);
        src.forEach([&](int x, int y) { field.at(x, y) = {from.get(x, y, 0), from.get(x, y, 1)}; });
        const reference::Field truth = reference::transformed(field, -1);
        EXPECT_EQ(QOR_OK, call(qoriDFTFwd_CToC_32fc_C1R, src.data<const QorComplex32f>(), src.step(),
                               dst.data<QorComplex32f>(), dst.step(), plan.get(), none));
        dst.forEach([&](int x, int y) {
            deviation.add(to.get(x, y, 0), truth.at(x, y).real());
            deviation.add(to.get(x, y, 1), truth.at(x, y).imag());
        });
    }
    return deviation.relative();
}

/// The same of real images, or back.
double realError(bool isForward, QorImageSize size) {
    const Plan plan(Dft::exportsOf(Elements::real), size, fftNoDiv);
    const TestImage src(kSrc, shapeOf(size), 4), dst(kDst, shapeOf(size), 4);
    const View<float> from = src.view<float>(1), to = dst.view<float>(1);
    uint8_t* const none = nullptr;
    Deviation deviation;
    for (int turn = 0; turn < kTurns; ++turn) {
        src.fill<float>(1, noise);
        const reference::Field truth = isForward ? spectrumOf(from, size, 0) : imageOf(from, size, 0);
        EXPECT_EQ(QOR_OK, call(isForward ? qoriDFTFwd_RToPack_32f_C1R : qoriDFTInv_PackToR_32f_C1R,
                               src.data<const float>(), src.step(), dst.data<float>(), dst.step(), plan.get(), none));
        dst.forEach([&](int x, int y) {
            deviation.add(to.get(x, y), isForward ? reference::packedValue(truth, x, y) : truth.at(x, y).real());
        });
    }
    return deviation.relative();
}

/// Factors that have none in common take no products between them, and spectra of real rows are made and taken apart
/// with one rounding a product: errors with more roundings are 5 to 13 percent above these.
TEST(Dft, TakesNoNeedlessRoundings) {
    EXPECT_LE(complexError({20, 20}), 0.96e-7);
    EXPECT_LE(complexError({12, 12}), 0.81e-7);
    EXPECT_LE(realError(true, {22, 1}), 0.705e-7);
    EXPECT_LE(realError(false, {22, 1}), 0.717e-7);
    EXPECT_LE(realError(true, {19, 12}), 0.89e-7);
    EXPECT_LE(realError(false, {19, 12}), 0.89e-7);
}

/// Short real rows, and the columns of images of one or two, are transformed in doubles: floats are half as much off
/// again at least. Of more than eight rows halves are put together in doubles; in floats errors are a twentieth larger.
TEST(Dft, RoundsShortRowsOnce) {
    EXPECT_LE(realError(true, {20, 4}), 0.52e-7);
    EXPECT_LE(realError(true, {24, 4}), 0.52e-7);
    EXPECT_LE(realError(false, {64, 2}), 0.45e-7);
    EXPECT_LE(realError(true, {2, 12}), 0.45e-7);
    EXPECT_LE(realError(false, {2, 48}), 0.45e-7);
    EXPECT_LE(realError(false, {1, 6}), 0.35e-7);
    EXPECT_LE(realError(false, {18, 16}), 0.955e-7);
    EXPECT_LE(realError(true, {32, 9}), 0.955e-7);
    EXPECT_LE(realError(false, {64, 9}), 1.03e-7);
}

/// There and back, in place, the input to 4 units in the last place of its RMS, which is between a half and 1.
TEST(Dft, RoundTrip) {
    for (const QorImageSize size :
         {QorImageSize{64, 64}, {27, 49}, {100, 77}, {509, 19}, {1009, 3}, {4099, 1}, {3, 1009}, {1024, 64}, {2, 48}})
        for (const int32_t flag : {int32_t{fftDivFwdByN}, int32_t{fftDivInvByN}, int32_t{fftDivBySqrtN}}) {
            SCOPED_TRACE(testing::Message() << size.width << "x" << size.height << " flag " << flag);
            const Plan ofReal(Dft::exportsOf(Elements::real), size, flag);
            const TestImage image(kSrc, shapeOf(size), 4);
            image.fill<float>(1, noise);
            Snapshot before = image.snapshot();
            uint8_t* const none = nullptr;
            EXPECT_EQ(QOR_OK, call(qoriDFTFwd_RToPack_32f_C1IR, image.data<float>(), image.step(), ofReal.get(), none));
            EXPECT_EQ(QOR_OK, call(qoriDFTInv_PackToR_32f_C1IR, image.data<float>(), image.step(), ofReal.get(), none));
            const View<float> now = image.view<float>(1), input = before.view<float>(1);
            double errors = 0;
            image.forEach([&](int x, int y) {
                const double error = static_cast<double>(now.get(x, y)) - static_cast<double>(input.get(x, y));
                errors += error * error;
            });
            EXPECT_LE(std::sqrt(errors / (static_cast<double>(size.width) * size.height)), 4 * 0x1p-24);
        }
}

/// Means near the end of the floats come back as they are.
TEST(Dft, LargeMeansStayFinite) {
    for (const QorImageSize size : {QorImageSize{64, 1}, {64, 9}, {256, 2}, {30, 9}, {33, 9}, {1, 6}}) {
        SCOPED_TRACE(testing::Message() << size.width << "x" << size.height);
        const Plan plan(Dft::exportsOf(Elements::real), size, fftNoDiv);
        const TestImage image(kSrc, shapeOf(size), 4);
        image.fill<float>(1, [] { return 0.0f; });
        image.view<float>(1).set(0, 0, 0, 3e38f);
        EXPECT_EQ(QOR_OK,
                  call(qoriDFTInv_PackToR_32f_C1IR, image.data<float>(), image.step(), plan.get(), plan.buffer()));
        const View<float> pixels = image.view<float>(1);
        image.forEach([&](int x, int y) { EXPECT_EQ(3e38f, pixels.get(x, y)) << x << "," << y; });
    }
}

/// A plan is used where it was copied to, by several calls; the results do not depend on where it is.
TEST(Dft, PlansMayBeMoved) {
    const QorImageSize size{303, 6};
    int32_t planBytes = 0, initBytes = 0, bufferBytes = 0;
    ASSERT_EQ(QOR_OK, qoriDFTGetSize_R_32f(size, fftNoDiv, 1, &planBytes, &initBytes, &bufferBytes));
    std::vector<uint8_t> init(static_cast<size_t>(initBytes));
    const auto blockOf = [&](std::vector<uint8_t>& memory) {
        memory.resize(static_cast<size_t>(planBytes) + 64);
        return memory.data() + (64 - reinterpret_cast<uintptr_t>(memory.data()) % 64) % 64;
    };
    std::vector<uint8_t> first, second;
    uint8_t *const made = blockOf(first), *const copied = blockOf(second);
    ASSERT_EQ(QOR_OK, qoriDFTInit_R_32f(size, fftNoDiv, 1, reinterpret_cast<QorFft2DPlan*>(made), init.data()));
    const TestImage src(kSrc, shapeOf(size), 4), dst(kDst, shapeOf(size), 4);
    src.fill<float>(1, noise);
    uint8_t* const none = nullptr;
    const float* const from = src.data<float>();
    const auto run = [&](const uint8_t* plan) {
        return call(qoriDFTFwd_RToPack_32f_C1R, from, src.step(), dst.data<float>(), dst.step(),
                    reinterpret_cast<const QorFft2DPlan*>(plan), none);
    };
    EXPECT_EQ(QOR_OK, run(made));
    const Snapshot expected = dst.snapshot();
    std::memcpy(copied, made, static_cast<size_t>(planBytes) - 64);
    std::fill(first.begin(), first.end(), uint8_t{0xAA});
    EXPECT_EQ(QOR_OK, run(copied));
    QORI_EXPECT_UNCHANGED(dst, expected);
}

}  // namespace
}  // namespace qori::test
