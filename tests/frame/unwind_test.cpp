// SPDX-License-Identifier: Apache-2.0
// 64-bit Windows: the stack can be unwound from wherever a call stands, as debuggers and handlers of the caller's do,
// and what the call has saved of its caller's registers comes back.
#include <immintrin.h>

#include "harness/call.h"
#include "harness/companion/qorcore_instrumented.h"
#include "harness/guarded_memory.h"
#include "qori.h"

namespace qori::test {
namespace {

constexpr QorResult kUnwound = 0x600D;
unsigned controlOfCaller;

/// A function of its own, so that the handler knows its frame.
__attribute__((noinline, noclone)) QorResult callFaulting(QorResult (*body)(uint8_t*), uint8_t* forbidden) {
    controlOfCaller = _mm_getcsr();
    const QorResult result = body(forbidden);
    __asm__ volatile("");
    return result;
}

/// Unwinds from a stray access to callFaulting and goes on there as if its call had returned.
LONG CALLBACK unwindToCall(EXCEPTION_POINTERS* fault) {
    if (fault->ExceptionRecord->ExceptionCode != EXCEPTION_ACCESS_VIOLATION) return EXCEPTION_CONTINUE_SEARCH;
    CONTEXT* context = fault->ContextRecord;
    for (int frames = 0; frames < 64; ++frames) {
        DWORD64 base = 0, establisher = 0;
        void* data = nullptr;
        RUNTIME_FUNCTION* function = RtlLookupFunctionEntry(context->Rip, &base, nullptr);
        if (function == nullptr) {  // a leaf
            context->Rip = *reinterpret_cast<const DWORD64*>(context->Rsp);
            context->Rsp += sizeof(DWORD64);
        } else if (base + function->BeginAddress == reinterpret_cast<DWORD64>(&callFaulting)) {
            context->Rax = kUnwound;
            context->MxCsr = context->FltSave.MxCsr = controlOfCaller;  // no unwind data say where it is kept
            return EXCEPTION_CONTINUE_EXECUTION;
        } else {
            RtlVirtualUnwind(UNW_FLAG_NHANDLER, base, context->Rip, function, context, &data, &establisher, nullptr);
        }
    }
    return EXCEPTION_CONTINUE_SEARCH;
}

template <class T>
T* as(uint8_t* p) {
    return reinterpret_cast<T*>(p);
}

constexpr QorImageSize kSize{64, 64};
constexpr int kStep = 1024;
alignas(64) uint8_t image[64 * kStep], buffer[1 << 20];
double value;

// Kernels that have many registers to give back, below drivers of every kind.
using Faulting = QorResult (*)(uint8_t*);
constexpr Faulting kFaulting[] = {
    [](uint8_t* p) { return qoriCopy_8u_C1R(p, kStep, image, kStep, kSize); },
    [](uint8_t* p) { return qoriAdd_8u_C3RSfs(p, kStep, image, kStep, image, kStep, kSize, 1); },
    [](uint8_t* p) { return qoriConvert_8u32f_C1R(p, kStep, as<float>(image), kStep, kSize); },
    [](uint8_t* p) { return qoriSqrt_32f_C1R(as<float>(p), kStep, as<float>(image), kStep, kSize); },
    [](uint8_t* p) { return qoriExp_32f_C1R(as<float>(p), kStep, as<float>(image), kStep, kSize); },
    [](uint8_t* p) { return qoriNorm_L2_8u_C1R(p, kStep, kSize, &value); },
    [](uint8_t* p) {
        return qoriFilterMedian_8u_C1R(p, kStep, image, kStep, kSize, {5, 5}, {2, 2});
    },
    [](uint8_t* p) {
        return qoriFilterMedian_8u_C1R(p, kStep, image, kStep, kSize, {11, 11}, {5, 5});
    },
    [](uint8_t* p) {
        return qoriFilterBox_8u_C1R(p, kStep, image, kStep, kSize, {5, 5}, {2, 2});
    },
    [](uint8_t* p) { return qoriFilterGauss_8u_C1R(p, kStep, image, kStep, kSize, 55); },
    [](uint8_t* p) { return qoriDilate3x3_8u_C1R(p, kStep, image, kStep, kSize); },
    [](uint8_t* p) { return qoriMirror_8u_C1R(p, kStep, image, kStep, kSize, flipDiagonal); },
    [](uint8_t* p) { return qoriLBPImage5x5_8u16u_C1R(p, kStep, as<uint16_t>(image), kStep, kSize, 1, 0); },
    [](uint8_t* p) {
        return qoriCrossCorrNorm_32f_C1R(as<float>(p), kStep, kSize, as<float>(image), kStep, {8, 8}, as<float>(image),
                                         kStep, corrNorm | corrValid | corrDirect, buffer);
    },
};

TEST(Unwind, FromAStrayAccessToTheCall) {
    const GuardedPages pages = mapGuarded(kPage);
    ASSERT_NE(nullptr, pages.begin);
    void* const handler = AddVectoredExceptionHandler(1, unwindToCall);
    for (const Faulting& body : kFaulting)
        EXPECT_EQ(kUnwound, call(&callFaulting, body, pages.begin - kPage)) << (&body - kFaulting);
    RemoveVectoredExceptionHandler(handler);
    unmapGuarded(pages);
    qorTestForgetBlocks();  // no handler gives back what a call had allocated
}

}  // namespace
}  // namespace qori::test
