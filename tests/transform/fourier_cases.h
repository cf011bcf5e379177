// SPDX-License-Identifier: Apache-2.0
// What both families of two-dimensional transforms are held to. A family says how plans of a size are made and which
// exports there are; plans and buffers are of exactly the reported sizes, against guard pages.
#pragma once
#include <algorithm>
#include <cmath>
#include <functional>
#include <vector>

#include "harness/pixelwise.h"
#include "reference/fourier.h"

namespace qori::test {

enum Slot { kSrc, kDst, kPlan, kBuffer, kInit };
enum class Elements { real, integers, complex };

/// Exports of a family for one kind of elements; size queries and Init do not exist for integers.
struct PlanExports {
    QorResult (*getSize)(QorImageSize, int32_t, int32_t*, int32_t*, int32_t*);
    QorResult (*init)(QorImageSize, int32_t, QorFft2DPlan*, uint8_t*);
    QorResult (*initAlloc)(QorFft2DPlan**, QorImageSize, int32_t);
    QorResult(QORI_CALL* free)(QorFft2DPlan*);
    QorResult(QORI_CALL* getBufSize)(const QorFft2DPlan*, int32_t*);
};

/// A plan with a work buffer: by Init where there is one and chance wants it, else by InitAlloc.
class Plan {
public:
    Plan(const PlanExports& exports, QorImageSize size, int32_t flag) : free_(exports.free) {
        int32_t planBytes = 0, initBytes = 0, queried = -1;
        if (exports.getSize != nullptr && random().oneIn(2)) {
            EXPECT_EQ(QOR_OK, exports.getSize(size, flag, &planBytes, &initBytes, &queried));
            const TestImage block = test::block(kPlan, planBytes, random().below(4));
            const TestImage init = test::block(kInit, std::max(initBytes, 1), random().below(4));
            block.fill<uint8_t>(1, junk);
            plan_ = block.data<QorFft2DPlan>();
            EXPECT_EQ(QOR_OK, exports.init(size, flag, plan_, init.data<uint8_t>()));
            init.fill<uint8_t>(1, junk);
        } else {
            isAllocated_ = true;
            EXPECT_EQ(QOR_OK, exports.initAlloc(&plan_, size, flag));
        }
        EXPECT_EQ(QOR_OK, call(exports.getBufSize, get(), &bufferBytes_));
        if (queried >= 0) {
            EXPECT_EQ(queried, bufferBytes_);
        }
    }
    ~Plan() {
        if (isAllocated_) {
            EXPECT_EQ(QOR_OK, free_(plan_));
        }
    }
    Plan(const Plan&) = delete;
    Plan& operator=(const Plan&) = delete;

    const QorFft2DPlan* get() const { return plan_; }
    /// Of the reported size and full of junk, or none.
    uint8_t* buffer() const {
        if (random().oneIn(4)) return nullptr;
        const TestImage memory = block(kBuffer, bufferBytes_, random().below(4));
        memory.fill<uint8_t>(1, junk);
        return memory.data<uint8_t>();
    }

private:
    static uint8_t junk() { return static_cast<uint8_t>(random().bits()); }

    QorResult(QORI_CALL* free_)(QorFft2DPlan*);
    QorFft2DPlan* plan_ = nullptr;
    int32_t bufferBytes_ = 0;
    bool isAllocated_ = false;
};

inline Shape shapeOf(QorImageSize size) {
    static constexpr int paddings[] = {0, 32, 3};
    return {.width = size.width,
            .height = size.height,
            .padding = paddings[random().below(3)],
            .atBegin = random().oneIn(2),
            .shift = random().below(3)};
}

/// What forward and inverse multiply by.
struct Norm {
    double forward = 1, inverse = 1;

    Norm(QorImageSize size, int32_t flag) {
        const double points = static_cast<double>(size.width) * size.height;
        if (flag == fftDivFwdByN) forward = 1 / points;
        if (flag == fftDivInvByN) inverse = 1 / points;
        if (flag == fftDivBySqrtN) forward = inverse = 1 / std::sqrt(points);
    }
};

/// Errors add up like a random walk over the butterflies of each side; convolutions with chirps have a few more.
inline double allowedError(QorImageSize size) {
    return 4e-8 * (3 + std::sqrt(std::log2(static_cast<double>(size.width) * size.height + 1)));
}

/// Sums of squares of errors and of what is expected.
class Deviation {
public:
    void add(double actual, double expected) {
        errors_ += (actual - expected) * (actual - expected);
        total_ += expected * expected;
    }
    /// RMS of the errors by RMS of what is expected.
    double relative() const { return errors_ == 0 ? 0 : std::sqrt(errors_ / total_); }

private:
    double errors_ = 0, total_ = 0;
};

inline float noise() { return static_cast<float>(static_cast<int32_t>(random().bits())) / 0x1p31f; }

/// Runs a transform and checks all but the values: the surroundings, the source, channels that are kept.
template <class S, class D, Layout layout, class Invoke>
void runOnce(const TestImage& src, const TestImage& dst, bool inPlace, Invoke invoke) {
    constexpr int n = channels(layout);
    const Snapshot before = src.snapshot();
    Snapshot expected = dst.snapshot();
    EXPECT_EQ(QOR_OK, invoke());
    const View<D> actual = dst.view<D>(n), to = expected.view<D>(n);
    dst.forEach([&](int x, int y) {
        for (int c = 0; c < processedChannels(layout); ++c) to.set(x, y, c, actual.get(x, y, c));
    });
    QORI_EXPECT_UNCHANGED(dst, expected);
    if (!inPlace) {
        QORI_EXPECT_UNCHANGED(src, before);
    }
}

/// The packed spectrum of channel c of a real image.
template <class T>
reference::Field spectrumOf(const View<T>& image, QorImageSize size, int c) {
    reference::Field field(size.width, size.height);
    for (int y = 0; y < size.height; ++y)
        for (int x = 0; x < size.width; ++x) field.at(x, y) = static_cast<double>(image.get(x, y, c));
    return reference::transformed(field, -1);
}

template <class T>
reference::Field imageOf(const View<T>& packed, QorImageSize size, int c) {
    return reference::transformed(
        reference::unpacked(size.width, size.height,
                            [&](int x, int y) { return static_cast<double>(packed.get(x, y, c)); }),
        1);
}

/// Forward or inverse of 32f images; function(src, dst) of either kind.
template <Layout layout, Kind kind, bool isForward, class Function>
void checkReal(Function function, const PlanExports& exports, QorImageSize size, int32_t flag) {
    SCOPED_TRACE(testing::Message() << size.width << "x" << size.height << " flag " << flag);
    constexpr int n = channels(layout);
    const Plan plan(exports, size, flag);
    const TestImage src(kSrc, shapeOf(size), 4 * n);
    const TestImage dst = kind == Kind::IR ? src : TestImage(kDst, shapeOf(size), 4 * n);
    dst.fill<float>(n, AnyValue<float>{});
    src.fill<float>(n, noise);
    std::vector<reference::Field> truth;
    for (int c = 0; c < processedChannels(layout); ++c)
        truth.push_back(isForward ? spectrumOf(src.view<float>(n), size, c) : imageOf(src.view<float>(n), size, c));
    runOnce<float, float, layout>(src, dst, kind == Kind::IR, [&] {
        if constexpr (kind == Kind::IR)
            return call(function, dst.data<float>(), dst.step(), plan.get(), plan.buffer());
        else
            return call(function, static_cast<const float*>(src.data<float>()), src.step(), dst.data<float>(),
                        dst.step(), plan.get(), plan.buffer());
    });
    const View<float> actual = dst.view<float>(n);
    const Norm norm(size, flag);
    for (int c = 0; c < processedChannels(layout); ++c) {
        const reference::Field& field = truth[static_cast<size_t>(c)];
        Deviation deviation;
        dst.forEach([&](int x, int y) {
            const double expected =
                isForward ? reference::packedValue(field, x, y) * norm.forward : field.at(x, y).real() * norm.inverse;
            deviation.add(actual.get(x, y, c), expected);
        });
        EXPECT_LE(deviation.relative(), allowedError(size)) << "channel " << c;
    }
}

/// An image of complex numbers, its own channel pair.
template <Kind kind, bool isForward, class Function>
void checkComplex(Function function, const PlanExports& exports, QorImageSize size, int32_t flag) {
    SCOPED_TRACE(testing::Message() << size.width << "x" << size.height << " flag " << flag);
    const Plan plan(exports, size, flag);
    const TestImage src(kSrc, shapeOf(size), 8);
    const TestImage dst = kind == Kind::IR ? src : TestImage(kDst, shapeOf(size), 8);
    dst.fill<float>(2, AnyValue<float>{});
    src.fill<float>(2, noise);
    reference::Field field(size.width, size.height);
    const View<float> from = src.view<float>(2);
    src.forEach([&](int x, int y) { field.at(x, y) = {from.get(x, y, 0), from.get(x, y, 1)}; });
    const reference::Field truth = reference::transformed(field, isForward ? -1 : 1);
    runOnce<float, float, Layout::C2>(src, dst, kind == Kind::IR, [&] {
        if constexpr (kind == Kind::IR)
            return call(function, dst.data<QorComplex32f>(), dst.step(), plan.get(), plan.buffer());
        else
            return call(function, static_cast<const QorComplex32f*>(src.data<QorComplex32f>()), src.step(),
                        dst.data<QorComplex32f>(), dst.step(), plan.get(), plan.buffer());
    });
    const Norm norm(size, flag);
    const double scale = isForward ? norm.forward : norm.inverse;
    Deviation deviation;
    const View<float> actual = dst.view<float>(2);
    dst.forEach([&](int x, int y) {
        deviation.add(actual.get(x, y, 0), truth.at(x, y).real() * scale);
        deviation.add(actual.get(x, y, 1), truth.at(x, y).imag() * scale);
    });
    EXPECT_LE(deviation.relative(), allowedError(size));
}

/// Whether an integer is the value rounded and saturated, give or take what single precision loses before.
template <class D>
bool isRounded(D actual, double value, double loss) {
    const auto saturated = [](double v) {
        return std::nearbyint(std::clamp(v, static_cast<double>(std::numeric_limits<D>::min()),
                                         static_cast<double>(std::numeric_limits<D>::max())));
    };
    return actual >= saturated(value - loss) && actual <= saturated(value + loss);
}

template <class S, class D, Layout layout, bool isForward, class Function>
void checkIntegers(Function function, const PlanExports& exports, QorImageSize size, int32_t flag,
                   int32_t scaleFactor) {
    SCOPED_TRACE(testing::Message() << size.width << "x" << size.height << " flag " << flag << " scale "
                                    << scaleFactor);
    constexpr int n = channels(layout);
    const Plan plan(exports, size, flag);
    const TestImage src(kSrc, shapeOf(size), n * static_cast<int>(sizeof(S)));
    const TestImage dst(kDst, shapeOf(size), n * static_cast<int>(sizeof(D)));
    dst.fill<D>(n, AnyValue<D>{});
    src.fill<S>(
        n, [] { return isForward ? static_cast<S>(random().bits()) : static_cast<S>(random().below(2001) - 1000); });
    const Norm norm(size, flag);
    runOnce<S, D, layout>(src, dst, false, [&] {
        return call(function, static_cast<const S*>(src.data<S>()), src.step(), dst.data<D>(), dst.step(), plan.get(),
                    scaleFactor, plan.buffer());
    });
    const View<D> actual = dst.view<D>(n);
    for (int c = 0; c < processedChannels(layout); ++c) {
        const reference::Field field =
            isForward ? spectrumOf(src.view<S>(n), size, c) : imageOf(src.view<S>(n), size, c);
        double largest = 0;
        for (const reference::Complex& value : field.values) largest = std::max(largest, std::abs(value));
        const double scale = std::ldexp(isForward ? norm.forward : norm.inverse, -scaleFactor);
        int wrong = 0;
        dst.forEach([&](int x, int y) {
            const double value = (isForward ? reference::packedValue(field, x, y) : field.at(x, y).real()) * scale;
            wrong += !isRounded(actual.get(x, y, c), value, largest * scale * 1e-6);
        });
        EXPECT_EQ(0, wrong) << "channel " << c;
    }
}

// --- statuses, memory ------------------------------------------------------------------------------------------------

/// An operation with everything but its plan and images fixed.
using Operation = std::function<QorResult(const void* src, int32_t srcStep, void* dst, int32_t dstStep,
                                          const QorFft2DPlan* plan, uint8_t* buffer)>;

/// `right` makes plans for the operation, `wrong` others.
inline void checkOperation(const Operation& run, const PlanExports& right, const std::vector<PlanExports>& wrong) {
    const QorImageSize size{8, 4};
    const TestImage src(kSrc, {.width = 64, .height = 4}, 1), dst(kDst, {.width = 64, .height = 4}, 1);
    QorFft2DPlan *plan = nullptr, *other = nullptr;
    ASSERT_EQ(QOR_OK, right.initAlloc(&plan, size, fftNoDiv));
    const auto* s = src.data<uint8_t>();
    auto* d = dst.data<uint8_t>();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, run(nullptr, 0, nullptr, 0, nullptr, nullptr));
    for (const PlanExports& exports : wrong) {
        ASSERT_EQ(QOR_OK, exports.initAlloc(&other, size, fftNoDiv));
        QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, dst, run(nullptr, 0, nullptr, 0, other, nullptr));
        int32_t bytes = 0;
        EXPECT_EQ(QOR_ERR_CONTEXT, right.getBufSize(other, &bytes));
        EXPECT_EQ(QOR_ERR_CONTEXT, right.free(other));
        EXPECT_EQ(QOR_OK, exports.free(other));
    }
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, run(nullptr, 0, d, 64, plan, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, run(s, 0, nullptr, 0, plan, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, run(s, 0, d, 64, plan, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, run(s, 64, d, 0, plan, nullptr));
    qorTestFailAllocation(1);
    QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, run(s, 64, d, 64, plan, nullptr));
    qorTestFailAllocation(0);
    EXPECT_EQ(QOR_OK, run(s, 64, d, 64, plan, nullptr));
    // With a buffer, nothing is asked of the allocator.
    int32_t bytes = 0;
    ASSERT_EQ(QOR_OK, right.getBufSize(plan, &bytes));
    std::vector<uint8_t> buffer(static_cast<size_t>(bytes));
    qorTestFailAllocation(1);
    EXPECT_EQ(QOR_OK, run(s, 64, d, 64, plan, buffer.data()));
    qorTestFailAllocation(0);
    EXPECT_EQ(1, qorTestLiveBlocks());
    EXPECT_EQ(QOR_ERR_NULL_PTR, right.free(nullptr));
    EXPECT_EQ(QOR_OK, right.free(plan));
}

/// Whichever allocation fails, nothing stays and nothing is written.
inline void checkAllocations(const PlanExports& exports, QorImageSize size) {
    QorFft2DPlan* plan = nullptr;
    int failing = 1;
    for (; failing < 9; ++failing) {
        qorTestFailAllocation(failing);
        const QorResult result = exports.initAlloc(&plan, size, fftDivInvByN);
        qorTestFailAllocation(0);
        if (result == QOR_OK) break;
        EXPECT_EQ(QOR_ERR_NO_MEMORY, result);
        EXPECT_EQ(nullptr, plan);
        EXPECT_EQ(0, qorTestLiveBlocks());
    }
    EXPECT_GT(failing, 1);
    EXPECT_LT(failing, 9);
    EXPECT_EQ(QOR_OK, exports.free(plan));
}

}  // namespace qori::test
