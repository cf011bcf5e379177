// SPDX-License-Identifier: Apache-2.0
// Resizes as their callers set them up: queries, plan, buffers of exactly the reported sizes against guard pages.
#pragma once
#include <cmath>

#include "harness/sweep.h"
#include "reference/resize.h"

namespace qori::test {

using reference::Method;

/// The exports of one element type; 64f has the linear ones only.
template <class T>
struct Exports;

#define QORI_QUERIES(t)                                                \
    static constexpr const char* suffix = #t;                          \
    static constexpr auto getSize = qoriResizeGetSize_##t;             \
    static constexpr auto getBufferSize = qoriResizeGetBufferSize_##t; \
    static constexpr auto getBorderSize = qoriResizeGetBorderSize_##t; \
    static constexpr auto getSrcOffset = qoriResizeGetSrcOffset_##t;   \
    static constexpr auto getSrcRoi = qoriResizeGetSrcRoi_##t;         \
    static constexpr auto linearInit = qoriResizeLinearInit_##t;
#define QORI_EXPORTS(T, t)                                             \
    template <>                                                        \
    struct Exports<T> {                                                \
        QORI_QUERIES(t)                                                \
        static constexpr auto nearestInit = qoriResizeNearestInit_##t; \
        static constexpr auto cubicInit = qoriResizeCubicInit_##t;     \
        static constexpr auto lanczosInit = qoriResizeLanczosInit_##t; \
        static constexpr auto superInit = qoriResizeSuperInit_##t;     \
    };
QORI_EXPORTS(uint8_t, 8u)
QORI_EXPORTS(uint16_t, 16u)
QORI_EXPORTS(int16_t, 16s)
QORI_EXPORTS(float, 32f)
#undef QORI_EXPORTS
template <>
struct Exports<double> {
    QORI_QUERIES(64f)
};
#undef QORI_QUERIES

enum Slot { kSrc, kDst, kPlan, kInit, kBuffer, kTileSrc, kPlanCopy };

template <class T>
QorResult initPlan(const Method& m, QorImageSize src, QorImageSize dst, QorResizePlan* plan, uint8_t* init) {
    using E = Exports<T>;
    const auto lobes = static_cast<uint32_t>(m.lobes);
    if (m.antialiasing) {
        if (m.interpolation == interpLinear) return call(qoriResizeAntialiasingLinearInit, src, dst, plan, init);
        if (m.interpolation == interpCubic)
            return call(qoriResizeAntialiasingCubicInit, src, dst, m.b, m.c, plan, init);
        return call(qoriResizeAntialiasingLanczosInit, src, dst, lobes, plan, init);
    }
    if (m.interpolation == interpLinear) return call(E::linearInit, src, dst, plan);
    if constexpr (!std::is_same_v<T, double>) {
        if (m.interpolation == interpNearest) return call(E::nearestInit, src, dst, plan);
        if (m.interpolation == interpCubic) return call(E::cubicInit, src, dst, m.b, m.c, plan, init);
        if (m.interpolation == interpLanczos) return call(E::lanczosInit, src, dst, lobes, plan, init);
        return call(E::superInit, src, dst, plan);
    }
    return QOR_ERR_UNSUPPORTED_MODE;
}

/// A filled plan. What lies around its block and around the initialisation buffer must have stayed as it was.
template <class T>
QorResizePlan* makePlan(const Method& m, QorImageSize src, QorImageSize dst) {
    int32_t planBytes = -1, initBytes = -1;
    EXPECT_EQ(QOR_OK,
              call(Exports<T>::getSize, src, dst, m.interpolation, int32_t{m.antialiasing}, &planBytes, &initBytes));
    const int shift = random().below(64);
    TestImage plan = block(kPlan, planBytes, shift), init = block(kInit, initBytes, random().below(2) * 3);
    const Snapshot around = plan.snapshot(), initAround = init.snapshot();
    EXPECT_EQ(QOR_OK, initPlan<T>(m, src, dst, plan.data<QorResizePlan>(), init.data<uint8_t>()));
    const auto expectMarginsKept = [](const TestImage& image, Snapshot before, int bytes) {
        const Snapshot now = image.snapshot();
        std::copy_n(now.bytes.begin() + before.originOffset, bytes, before.bytes.begin() + before.originOffset);
        QORI_EXPECT_UNCHANGED(image, before);
    };
    expectMarginsKept(plan, around, planBytes);
    expectMarginsKept(init, initAround, initBytes);
    return plan.data<QorResizePlan>();
}

/// Any operation of the family with one argument list.
template <class T, class Function>
QorResult operate(Function function, const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorPoint2D offset,
                  QorImageSize size, int32_t border, const QorResizePlan* plan, uint8_t* buffer) {
    if constexpr (std::is_invocable_v<Function, const T*, int32_t, T*, int32_t, QorPoint2D, QorImageSize,
                                      const QorResizePlan*, uint8_t*>)
        return call(function, src, srcStep, dst, dstStep, offset, size, plan, buffer);
    else
        return call(function, src, srcStep, dst, dstStep, offset, size, border, static_cast<const T*>(nullptr), plan,
                    buffer);
}

struct Job {
    Method method;
    QorImageSize src, dst;
    int32_t border = borderReplicate;

    bool open(int32_t flag) const { return (border & 7) == borderReadAll || (border & flag) != 0; }
};

inline std::string describe(const Job& job) {
    const Method& m = job.method;
    return "interpolation " + std::to_string(m.interpolation) + (m.antialiasing ? " antialiasing" : "") + ", lobes " +
           std::to_string(m.lobes) + ", B " + std::to_string(m.b) + ", C " + std::to_string(m.c) + ", " +
           std::to_string(job.src.width) + "x" + std::to_string(job.src.height) + " to " +
           std::to_string(job.dst.width) + "x" + std::to_string(job.dst.height) + ", border " +
           std::to_string(job.border);
}

}  // namespace qori::test
