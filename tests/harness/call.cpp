// SPDX-License-Identifier: Apache-2.0
// What every call and every comparison of images shares, compiled once.
#include "call.h"

#include <immintrin.h>

#include <algorithm>
#include <cstdlib>

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
#elif defined(_WIN64)
constexpr int kKeptRegisters = 10;

/// xmm6 to xmm15, which a callee keeps.
struct alignas(16) KeptVectors {
    uint64_t halves[2 * kKeptRegisters];
    bool operator==(const KeptVectors&) const = default;
};

/// Calls body(context) with the stack moved by 0 or 16 bytes from a 32-byte boundary and known values in the vector
/// registers that are its caller's.
__attribute__((noinline)) void onStack(unsigned offset, void (*body)(void*), void* context) {
    static uint64_t calls;
    KeptVectors kept;
    for (uint64_t& half : kept.halves) half = ++calls * 0x9E3779B97F4A7C15u;
    const KeptVectors before = kept;
    // A frame of a size that is not known has a frame pointer, by which unwinding finds the way back from any stack.
    const size_t moved = offset / 8 % 2 * 16;
    __asm__ volatile("" ::"r"(__builtin_alloca(moved + 1)));
    __asm__ volatile(
        "movq %%rsp, %%rbx\n\t"
        "andq $-32, %%rsp\n\t"
        "subq $64, %%rsp\n\t"
        "subq %[moved], %%rsp\n\t"
        ".irp i, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15\n\t"
        "movups 16 * (\\i - 6)(%[kept]), %%xmm\\i\n\t"
        ".endr\n\t"
        "call *%[body]\n\t"
        ".irp i, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15\n\t"
        "movups %%xmm\\i, 16 * (\\i - 6)(%[kept])\n\t"
        ".endr\n\t"
        "movq %%rbx, %%rsp\n\t"
        : "+c"(context)
        : [moved] "r"(moved), [body] "r"(body), [kept] "S"(&kept)
        : "rax", "rbx", "rdx", "r8", "r9", "r10", "r11", "xmm0", "xmm1", "xmm2", "xmm3", "xmm4", "xmm5", "xmm6", "xmm7",
          "xmm8", "xmm9", "xmm10", "xmm11", "xmm12", "xmm13", "xmm14", "xmm15", "memory", "cc");
    EXPECT_TRUE(before == kept) << "vector registers of the caller were left changed";
}
#else
void onStack(unsigned, void (*body)(void*), void* context) { body(context); }
#endif

class BodyTest : public testing::Test {
public:
    explicit BodyTest(void (*body)()) : body_(body) {}
    void TestBody() override { body_(); }

private:
    void (*body_)();
};

}  // namespace

const testing::TestInfo* registerTest(const char* suite, const char* name, const char* file, int line, void (*body)()) {
    return testing::RegisterTest(suite, name, nullptr, nullptr, file, line,
                                 [body]() -> testing::Test* { return new BodyTest(body); });
}

void callAwkwardly(void (*body)(void*), void* context) {
    static unsigned calls;
    const unsigned circumstance = calls++;
    constexpr unsigned kFlags = 0x3F, kAll = sizeof kControls / sizeof *kControls;
    const unsigned before = _mm_getcsr(), during = kControls[circumstance % kAll];
    _mm_setcsr(during);
    onStack((circumstance / kAll + circumstance) % 4 * 4, body, context);
    // A library of the sanitizers leaves the upper halves of the vector registers as they are: at -O1 the compiler does
    // not clear them, and what others compute without AVX, exp() for one, takes several times as long then.
    _mm256_zeroupper();
    const unsigned after = _mm_getcsr();
    _mm_setcsr(before);
    EXPECT_EQ(during & ~kFlags, after & ~kFlags) << "the control register was left changed";
}

void forShapes(const std::vector<Shape>& shapes, FunctionRef<void(const Shape&)> check) {
    // One shape in so many over slow libraries: members share kernels, which between them meet all shapes.
    static const char* const asked = std::getenv("QORI_SHAPES_APART");
    const size_t apart =
        std::min(asked == nullptr ? 1 : static_cast<size_t>(std::max(1, std::atoi(asked))), shapes.size());
    for (size_t i = apart > 1 ? static_cast<size_t>(random().below(static_cast<int>(apart))) : 0; i < shapes.size();
         i += apart) {
        SCOPED_TRACE(describe(shapes[i]));
        check(shapes[i]);
        if (testing::Test::HasFailure()) return;
    }
}

void forStreamingChoices(int bytesPerPixel, int trafficBytes, FunctionRef<void(const Shape&)> check) {
    const std::vector<Shape> shapes = largeShapes(bytesPerPixel, trafficBytes);
    qorTestSetCacheSize(1);
    forShapes(shapes, check);
    for (int32_t cache : {1 << 28, -1}) {
        qorTestSetCacheSize(cache);
        forShapes({shapes.front()}, check);
    }
}

void expectUnchanged(const TestImage& image, const Snapshot& expected, const char* file, int line) {
    if (const std::string difference = image.difference(expected); !difference.empty())
        ADD_FAILURE_AT(file, line) << difference;
}

void expectStatus(QorResult expected, QorResult status, const char* text, const char* file, int line) {
    if (status != expected) ADD_FAILURE_AT(file, line) << text << " gave " << status << ", not " << expected;
}

}  // namespace qori::test
