// SPDX-License-Identifier: Apache-2.0
// Version record, load-time behaviour and image memory.
#include <cstring>

#include "harness/call.h"
#include "harness/companion/qorcore_instrumented.h"
#include "harness/image.h"

namespace qori::test {
namespace {

TEST(Version, RecordReadsAsReleased) {
    const QorLibraryVersion* version = call(&qoriGetLibVersion);
    ASSERT_NE(nullptr, version);
    EXPECT_EQ(version, qoriGetLibVersion());
    EXPECT_EQ(8, version->versionMajor);
    EXPECT_EQ(2, version->versionMinor);
    EXPECT_EQ(1, version->versionPatch);
    EXPECT_EQ(44077, version->revision);
    EXPECT_EQ(0, std::memcmp("k5\0\0", version->cpuCode, 4));
    EXPECT_STREQ("qorIP AVX2 (k5)", version->libraryName);
    EXPECT_STREQ("8.2.1 (r44077)", version->versionText);
    EXPECT_STREQ("Oct  9 2014", version->buildDateText);
    markSwept("qoriGetLibVersion");
}

TEST(Load, AsksForTheProcessorFeaturesOnce) { EXPECT_EQ(1, qorTestFeatureQueries()); }

template <class Function>
void checkAllocator(const char* name, Function allocate, uint32_t pixelBytes) {
    SCOPED_TRACE(name);
    for (const auto& [width, height] : {std::pair{1, 1}, {2, 5}, {100, 2}, {64, 3}, {333, 7}}) {
        int32_t step = -1;
        auto* image = reinterpret_cast<uint8_t*>(call(allocate, width, height, &step));
        ASSERT_NE(nullptr, image);
        const int64_t rowBytes = int64_t{width} * pixelBytes;
        EXPECT_EQ((rowBytes + 63) / 64 * 64, step);
        EXPECT_EQ(0u, reinterpret_cast<uintptr_t>(image) % 64);
        std::memset(image, 0xAB, static_cast<size_t>(step) * static_cast<size_t>(height));  // all of it is ours
        qoriFree(image);
    }
    const int live = qorTestLiveBlocks();
    int32_t step = 77;
    EXPECT_EQ(nullptr, allocate(10, 10, nullptr));
    for (const auto& [width, height] : {std::pair{0, 5}, {-1, 5}, {5, 0}, {5, INT32_MIN}}) {
        step = 77;
        EXPECT_EQ(nullptr, allocate(width, height, &step));
        EXPECT_EQ(0, step);
    }
    qorTestFailAllocation(1);
    EXPECT_EQ(nullptr, allocate(3, 3, &step));
    EXPECT_EQ((3 * pixelBytes + 63) / 64 * 64, static_cast<uint32_t>(step));
    // Sizes wrap modulo 2^32: this step is 0 for every pixel size that divides 2^32, and nothing can be allocated.
    if ((pixelBytes & (pixelBytes - 1)) == 0 && pixelBytes > 1) {
        EXPECT_EQ(nullptr, allocate(static_cast<int32_t>((uint64_t{1} << 32) / pixelBytes - 1), 1, &step));
        EXPECT_EQ(0, step);
    }
    EXPECT_EQ(live, qorTestLiveBlocks());
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) operation##Test<D, Layout::DL>(#name, &name);
template <class T, Layout L, class Function>
void allocateImageTest(const char* name, Function function) {
    checkAllocator(name, function, sizeof(T) * channels(L));
}
template <class T, Layout L, class Function>
void freeImageTest(const char* name, Function function) {
    function(nullptr);
    markSwept(name);
}

TEST(Memory, AllocatesRowsOn64ByteBoundaries) {
#include "members/memory.inc"
}

}  // namespace
}  // namespace qori::test
