// SPDX-License-Identifier: Apache-2.0
// What masked forms leave alone: kept pixels lie on a page that cannot be written.
#include <algorithm>
#include <vector>

#include "harness/call.h"
#include "harness/guarded_memory.h"
#include "qori.h"

namespace qori::test {
namespace {

/// A writable page followed by one that is not.
struct HalfWritable {
    GuardedPages pages = mapGuarded(2 * kPage);
    uint8_t* const end = pages.begin + kPage;

    void protect(bool writable) const {
#ifdef _WIN32
        DWORD old;
        VirtualProtect(end, kPage, writable ? PAGE_READWRITE : PAGE_READONLY, &old);
#else
        mprotect(end, kPage, writable ? PROT_READ | PROT_WRITE : PROT_READ);
#endif
    }
    ~HalfWritable() { unmapGuarded(pages); }
};

/// Rows of pixels around the end of the writable page. Masks select some of those that end at least `distance` bytes
/// before it; run(dst, width, mask) writes ones to the selected bytes of pixels that are zero.
template <class Run>
void checkKept(int pixelBytes, int selectedBytes, int distance, Run run) {
    const HalfWritable memory;
    ASSERT_NE(nullptr, memory.pages.begin);
    for (int before = 1; before <= 75; ++before) {
        for (int shift : {0, 1, pixelBytes / 2 + 1}) {
            memory.protect(true);
            std::fill(memory.pages.begin, memory.pages.begin + 2 * kPage, uint8_t{0});
            memory.protect(false);
            uint8_t* const dst = memory.end - before * pixelBytes - shift;
            const int width = before + 3 + before % 50;
            std::vector<uint8_t> mask(static_cast<size_t>(width)), expected(static_cast<size_t>(width * pixelBytes));
            for (int x = 0; x < before && dst + (x + 1) * pixelBytes <= memory.end - distance; ++x) {
                if (x % 5 == 1 || x % 7 == 3) continue;
                mask[static_cast<size_t>(x)] = 1;
                for (int i = 0; i < selectedBytes; ++i) expected[static_cast<size_t>(x * pixelBytes + i)] = 1;
            }
            run(dst, width, mask.data());
            ASSERT_TRUE(std::equal(expected.begin(), expected.end(), dst)) << before << " pixels, shift " << shift;
        }
    }
}

/// The copy and the fill of one layout.
template <class T, class Copy, class Set>
void checkBoth(Copy copy, Set set, int channels, int selected, int distance) {
    constexpr int element = sizeof(T);
    const std::vector<uint8_t> ones(4096, 1);
    const auto* source = reinterpret_cast<const T*>(ones.data());
    const auto check = [&](auto run) { checkKept(channels * element, selected * element, distance, run); };
    check([&](uint8_t* dst, int width, const uint8_t* mask) {
        EXPECT_EQ(QOR_OK, call(copy, source, 0, reinterpret_cast<T*>(dst), 0, QorImageSize{width, 1}, mask, 0));
    });
    check([&](uint8_t* dst, int width, const uint8_t* mask) {
        const QorImageSize roi{width, 1};
        if constexpr (std::is_invocable_v<Set, T, T*, int32_t, QorImageSize, const uint8_t*, int32_t>)
            EXPECT_EQ(QOR_OK, call(set, *source, reinterpret_cast<T*>(dst), 0, roi, mask, 0));
        else
            EXPECT_EQ(QOR_OK, call(set, source, reinterpret_cast<T*>(dst), 0, roi, mask, 0));
    });
}

TEST(Kept, VectorsWithoutASelectedPixelAreNotWritten) {
    constexpr int vector = 31;  // between a selected byte and one that may be rewritten
    checkBoth<uint8_t>(&qoriCopy_8u_C1MR, &qoriSet_8u_C1MR, 1, 1, vector);
    checkBoth<uint8_t>(&qoriCopy_8u_C3MR, &qoriSet_8u_C3MR, 3, 3, vector);
    checkBoth<uint8_t>(&qoriCopy_8u_AC4MR, &qoriSet_8u_AC4MR, 4, 3, vector);
    checkBoth<int16_t>(&qoriCopy_16s_C1MR, &qoriSet_16s_C1MR, 1, 1, vector);
    checkBoth<int16_t>(&qoriCopy_16s_C3MR, &qoriSet_16s_C3MR, 3, 3, vector);
    checkBoth<int16_t>(&qoriCopy_16s_AC4MR, &qoriSet_16s_AC4MR, 4, 3, vector);
}

TEST(Kept, PixelsOfWholeWordsAreWrittenOneByOne) {
    checkBoth<uint8_t>(&qoriCopy_8u_C4MR, &qoriSet_8u_C4MR, 4, 4, 0);
    checkBoth<int16_t>(&qoriCopy_16s_C4MR, &qoriSet_16s_C4MR, 4, 4, 0);
    checkBoth<int32_t>(&qoriCopy_32s_C1MR, &qoriSet_32s_C1MR, 1, 1, 0);
    checkBoth<int32_t>(&qoriCopy_32s_C3MR, &qoriSet_32s_C3MR, 3, 3, 0);
    checkBoth<int32_t>(&qoriCopy_32s_C4MR, &qoriSet_32s_C4MR, 4, 4, 0);
    checkBoth<int32_t>(&qoriCopy_32s_AC4MR, &qoriSet_32s_AC4MR, 4, 3, 0);
}

}  // namespace
}  // namespace qori::test
