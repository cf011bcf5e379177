// SPDX-License-Identifier: Apache-2.0
// What every call and every comparison of images shares, compiled once.
#include "call.h"

#include <immintrin.h>

#include "sweep.h"

namespace qori::test {
namespace {

enum Control : unsigned {
    kMasked = 0x1F80,  ///< No exception traps.
    kDown = 0x2000,
    kUp = 0x4000,
    kZero = 0x6000,
    kFlushToZero = 0x8000,
    kDenormalsAreZero = 0x40
};

constexpr unsigned kControls[] = {
    kMasked, kMasked | kDown,         kMasked | kUp,       kMasked | kZero, kMasked | kFlushToZero | kDenormalsAreZero,
    0,       kUp | kDenormalsAreZero, kZero | kFlushToZero};

#if defined(__i386__)
/// Calls body(context) with the stack moved by `offset` bytes from a 16-byte boundary.
__attribute__((noinline)) void onStack(unsigned offset, void (*body)(void*), void* context) {
    __asm__ volatile(
        "movl %%esp, %%ebx\n\t"
        "andl $-16, %%esp\n\t"
        "subl $16, %%esp\n\t"
        "subl %0, %%esp\n\t"
        "pushl %2\n\t"
        "call *%1\n\t"
        "movl %%ebx, %%esp\n\t"
        :
        : "r"(offset), "r"(body), "r"(context)
        : "ebx", "eax", "ecx", "edx", "memory", "cc");
}
#else
void onStack(unsigned, void (*body)(void*), void* context) { body(context); }
#endif

}  // namespace

void callAwkwardly(void (*body)(void*), void* context) {
    static unsigned calls;
    const unsigned circumstance = calls++;
    constexpr unsigned kFlags = 0x3F, kAll = sizeof kControls / sizeof *kControls;
    const unsigned before = _mm_getcsr(), during = kControls[circumstance % kAll];
    _mm_setcsr(during);
    onStack((circumstance / kAll + circumstance) % 4 * 4, body, context);
    const unsigned after = _mm_getcsr();
    _mm_setcsr(before);
    EXPECT_EQ(during & ~kFlags, after & ~kFlags) << "the control register was left changed";
}

void expectUnchanged(const TestImage& image, const Snapshot& expected, const char* file, int line) {
    if (const std::string difference = image.difference(expected); !difference.empty())
        ADD_FAILURE_AT(file, line) << difference;
}

void expectStatus(QorResult expected, QorResult status, const char* text, const char* file, int line) {
    if (status != expected) ADD_FAILURE_AT(file, line) << text << " gave " << status << ", not " << expected;
}

}  // namespace qori::test
