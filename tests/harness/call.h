// SPDX-License-Identifier: Apache-2.0
// Calls exports the way an awkward caller would: from a stack aligned to 4 bytes only (32 bits) and under every
// rounding mode, with subnormals flushed and exceptions trapping in turn, and checks that the control register comes
// back as it was.
#pragma once
#include <gtest/gtest.h>
#include <immintrin.h>

#include <cstdint>

namespace qori::test {

/// Notes that an export has been compared with its reference; what was never noted fails the run's last check.
void markSwept(const char* exportName);

/// Next in the cycle of awkward circumstances.
unsigned nextCircumstance();

namespace detail {

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
__attribute__((noinline)) inline void onStack(unsigned offset, void (*body)(void*), void* context) {
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
inline void onStack(unsigned, void (*body)(void*), void* context) { body(context); }
#endif

}  // namespace detail

template <class Function, class... Arguments>
auto call(Function function, Arguments... arguments) {
    using Result = decltype(function(arguments...));
    const unsigned circumstance = nextCircumstance();
    constexpr unsigned kFlags = 0x3F;
    constexpr int kControls = sizeof detail::kControls / sizeof *detail::kControls;
    const unsigned before = _mm_getcsr();
    const unsigned during = detail::kControls[circumstance % kControls];
    Result result{};
    auto body = [&] { result = function(arguments...); };
    _mm_setcsr(during);
    detail::onStack((circumstance / kControls + circumstance) % 4 * 4,
                    [](void* context) { (*static_cast<decltype(body)*>(context))(); }, &body);
    const unsigned after = _mm_getcsr();
    _mm_setcsr(before);
    EXPECT_EQ(during & ~kFlags, after & ~kFlags) << "the control register was left changed";
    return result;
}

}  // namespace qori::test
