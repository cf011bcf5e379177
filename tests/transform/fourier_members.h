// SPDX-License-Identifier: Apache-2.0
// The members of both families of Fourier transforms. Family says which exports make plans, exportsOf(elements), and
// which sizes there are, forSizes(is the main layout, check).
#pragma once
#include "fourier_cases.h"

namespace qori::test {

inline int32_t anyFlag() {
    static constexpr int32_t kFlags[] = {fftDivFwdByN, fftDivInvByN, fftDivBySqrtN, fftNoDiv};
    return kFlags[random().below(4)];
}

template <class Family>
struct FourierMembers {
    template <Elements elements, Layout layout, Kind kind, class Check>
    static void sweep(const char* name, Check check) {
        Family::forSizes(layout == Layout::C1 && kind == Kind::R, [=](QorImageSize size) {
            if (!testing::Test::HasFailure()) check(Family::exportsOf(elements), size);
        });
        markSwept(name);
    }

    // One function an operation, by the names of the registry.

    template <class, class, Layout layout, Kind kind, class Function>
    static void forwardToPack(const char* name, Function function) {
        sweep<Elements::real, layout, kind>(name, [=](const PlanExports& exports, QorImageSize size) {
            checkReal<layout, kind, true>(function, exports, size, anyFlag());
        });
    }
    template <class, class, Layout layout, Kind kind, class Function>
    static void inverseFromPack(const char* name, Function function) {
        sweep<Elements::real, layout, kind>(name, [=](const PlanExports& exports, QorImageSize size) {
            checkReal<layout, kind, false>(function, exports, size, anyFlag());
        });
    }
    template <class, class, Layout layout, Kind kind, class Function>
    static void forwardComplex(const char* name, Function function) {
        sweep<Elements::complex, layout, kind>(name, [=](const PlanExports& exports, QorImageSize size) {
            checkComplex<kind, true>(function, exports, size, anyFlag());
        });
    }
    template <class, class, Layout layout, Kind kind, class Function>
    static void inverseComplex(const char* name, Function function) {
        sweep<Elements::complex, layout, kind>(name, [=](const PlanExports& exports, QorImageSize size) {
            checkComplex<kind, false>(function, exports, size, anyFlag());
        });
    }
    template <class S, class D, Layout layout, Kind kind, class Function>
    static void forwardToIntegers(const char* name, Function function) {
        sweep<Elements::integers, layout, kind>(name, [=](const PlanExports& exports, QorImageSize size) {
            checkIntegers<S, D, layout, true>(function, exports, size, anyFlag(), random().below(9) - 4);
        });
    }
    template <class S, class D, Layout layout, Kind kind, class Function>
    static void inverseToBytes(const char* name, Function function) {
        sweep<Elements::integers, layout, kind>(name, [=](const PlanExports& exports, QorImageSize size) {
            checkIntegers<S, D, layout, false>(function, exports, size, anyFlag(), random().below(9) - 2);
        });
    }

    // Plans are made, measured and released by every one of these.
    template <class, class, Layout, Kind, class Function>
    static void getSize(const char* name, Function) {
        markSwept(name);
    }
    template <class, class, Layout, Kind, class Function>
    static void init(const char* name, Function) {
        markSwept(name);
    }
    template <class, class, Layout, Kind, class Function>
    static void initAlloc(const char* name, Function) {
        markSwept(name);
    }
    template <class, class, Layout, Kind, class Function>
    static void freePlan(const char* name, Function) {
        markSwept(name);
    }
    template <class, class, Layout, Kind, class Function>
    static void planBufferSize(const char* name, Function) {
        markSwept(name);
    }

    /// What one operation of each kind of plan refuses, with plans of the others; then failing allocations.
    template <class Real, class Integers, class Complex>
    static void checkFailures(Real real, Integers toBytes, Complex complex, QorImageSize size) {
        const PlanExports ofReal = Family::exportsOf(Elements::real),
                          ofIntegers = Family::exportsOf(Elements::integers),
                          ofComplex = Family::exportsOf(Elements::complex);
        checkOperation(
            [=](const void* src, int32_t srcStep, void* dst, int32_t dstStep, const QorFft2DPlan* plan,
                uint8_t* buffer) {
                return call(real, static_cast<const float*>(src), srcStep, static_cast<float*>(dst), dstStep, plan,
                            buffer);
            },
            ofReal, {ofIntegers, ofComplex});
        checkOperation(
            [=](const void* src, int32_t srcStep, void* dst, int32_t dstStep, const QorFft2DPlan* plan,
                uint8_t* buffer) {
                return call(toBytes, static_cast<const int32_t*>(src), srcStep, static_cast<uint8_t*>(dst), dstStep,
                            plan, 3, buffer);
            },
            ofIntegers, {ofReal, ofComplex});
        checkOperation(
            [=](const void* src, int32_t srcStep, void* dst, int32_t dstStep, const QorFft2DPlan* plan,
                uint8_t* buffer) {
                return call(complex, static_cast<const QorComplex32f*>(src), srcStep, static_cast<QorComplex32f*>(dst),
                            dstStep, plan, buffer);
            },
            ofComplex, {ofReal, ofIntegers});
        for (const PlanExports& exports : {ofReal, ofIntegers, ofComplex}) checkAllocations(exports, size);
    }
};

// Kinds by what names of members end with.
#define QORI_KIND_ Kind::none
#define QORI_KIND_R Kind::R
#define QORI_KIND_IR Kind::IR

}  // namespace qori::test
