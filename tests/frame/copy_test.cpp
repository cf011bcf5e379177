// SPDX-License-Identifier: Apache-2.0
#include "frame/mask.h"
#include "harness/sweep.h"
#include "kernels/streamed_lines.h"
#include "reference/move.h"

namespace qori::test {
namespace {

constexpr int kAboveEveryBound = (1 << 20) + (1 << 16);
constexpr int kSrcSlot = 0, kDstSlot = 1, kMaskSlot = 2, kPlaneSlot = 3;

/// One copy with everything checked: result, surroundings, sources.
template <class T, Layout SL, Layout DL, Kind kind, class Function>
void checkPacked(Function function, const Shape& shape) {
    constexpr int element = sizeof(T);
    // A channel of interest may be any of the pixel's; the pointers move, the reference sees a view from there.
    const int srcChannel =
        channels(SL) > 1 && (channels(DL) == 1 || isChannelOfInterest(SL)) ? shape.width % channels(SL) : 0;
    const int dstChannel =
        channels(DL) > 1 && (channels(SL) == 1 || isChannelOfInterest(DL)) ? (shape.width + 1) % channels(DL) : 0;
    TestImage src(kSrcSlot, shape, element * channels(SL)), dst(kDstSlot, shape, element * channels(DL));
    TestImage mask(kMaskSlot, shape, 1);
    src.fill<T>(channels(SL), [] { return static_cast<T>(random().value<T>()); });
    dst.fill<T>(channels(DL), [] { return static_cast<T>(random().value<T>()); });
    if (kind == Kind::MR) fillMask(mask, shape);
    const Snapshot srcBefore = src.snapshot();
    Snapshot expected = dst.snapshot();
    const View<uint8_t> maskView = mask.view<uint8_t>(1);
    auto from = src.view<T>(channels(SL)), to = expected.view<T>(channels(DL));
    from.origin += element * srcChannel;
    to.origin += element * dstChannel;
    reference::copy(from, to, shape.roi(), reference::routes(SL, DL), kind == Kind::MR ? &maskView : nullptr);
    QorResult result;
    if constexpr (kind == Kind::MR)
        result = call(function, src.data<T>(), src.step(), dst.data<T>(), dst.step(), shape.roi(), mask.data<uint8_t>(),
                      mask.step());
    else
        result =
            call(function, src.data<T>() + srcChannel, src.step(), dst.data<T>() + dstChannel, dst.step(), shape.roi());
    ASSERT_EQ(QOR_OK, result);
    QORI_EXPECT_UNCHANGED(dst, expected);
    QORI_EXPECT_UNCHANGED(src, srcBefore);
}

template <class T, Layout packedLayout, bool split, class Function>
void checkPlanar(Function function, const Shape& shape) {
    constexpr int n = channels(packedLayout);
    TestImage packed(kSrcSlot, shape, n * static_cast<int>(sizeof(T)));
    std::vector<TestImage> planes;
    T* pointers[n];
    packed.fill<T>(n, [] { return static_cast<T>(random().value<T>()); });
    for (int c = 0; c < n; ++c) {
        planes.emplace_back(kPlaneSlot + c, shape, static_cast<int>(sizeof(T)));
        planes[static_cast<size_t>(c)].fill<T>(1, [] { return static_cast<T>(random().value<T>()); });
        pointers[c] = planes[static_cast<size_t>(c)].template data<T>();
    }
    Snapshot packedExpected = packed.snapshot();
    std::vector<Snapshot> planesExpected;
    for (const TestImage& plane : planes) planesExpected.push_back(plane.snapshot());
    for (int c = 0; c < n; ++c) {
        auto whole = packedExpected.view<T>(n);
        auto plane = planesExpected[static_cast<size_t>(c)].template view<T>(1);
        if (split)
            reference::copy(whole, plane, shape.roi(), {{c, 0}}, nullptr);
        else
            reference::copy(plane, whole, shape.roi(), {{0, c}}, nullptr);
    }
    QorResult result;
    if constexpr (split)
        result = call(function, packed.data<T>(), packed.step(), static_cast<T* const*>(pointers), planes[0].step(),
                      shape.roi());
    else
        result = call(function, const_cast<const T* const*>(pointers), planes[0].step(), packed.data<T>(),
                      packed.step(), shape.roi());
    ASSERT_EQ(QOR_OK, result);
    QORI_EXPECT_UNCHANGED(packed, packedExpected);
    for (size_t c = 0; c < n; ++c) QORI_EXPECT_UNCHANGED(planes[c], planesExpected[c]);
}

template <class T, Layout SL, Layout DL, Kind kind, class Function>
void sweep(const char* name, Function function) {
    const auto check = [&](const Shape& shape) {
        if constexpr (isPlanar(DL))
            checkPlanar<T, SL, true>(function, shape);
        else if constexpr (isPlanar(SL))
            checkPlanar<T, DL, false>(function, shape);
        else
            checkPacked<T, SL, DL, kind>(function, shape);
    };
    forShapes(smallShapes(), check);
    forStreamingChoices(static_cast<int>(sizeof(T)) * (channels(SL) + channels(DL)), kAboveEveryBound, check);
    markSwept(name);
}

template <int n>
void checkDuplicate(decltype(&qoriDup_8u_C1C3R) function, const Shape& shape) {
    TestImage src(kSrcSlot, shape, 1), dst(kDstSlot, shape, n);
    src.fill<uint8_t>(1, [] { return random().value<uint8_t>(); });
    const Snapshot srcBefore = src.snapshot();
    Snapshot expected = dst.snapshot();
    for (int c = 0; c < n; ++c)
        reference::copy(src.view<uint8_t>(1), expected.view<uint8_t>(n), shape.roi(), {{0, c}}, nullptr);
    ASSERT_EQ(QOR_OK, call(function, src.data<uint8_t>(), src.step(), dst.data<uint8_t>(), dst.step(), shape.roi()));
    QORI_EXPECT_UNCHANGED(dst, expected);
    QORI_EXPECT_UNCHANGED(src, srcBefore);
}

// One function per operation of the registry; a new operation does not compile until it has its own.
#define QORI_SAME_SWEEP(operation)                                      \
    template <class T, Layout SL, Layout DL, Kind kind, class Function> \
    void operation(const char* name, Function function) {               \
        sweep<T, SL, DL, kind>(name, function);                         \
    }
QORI_SAME_SWEEP(copyPixels)
QORI_SAME_SWEEP(copyColour)
QORI_SAME_SWEEP(copyMasked)
QORI_SAME_SWEEP(extractChannel)
QORI_SAME_SWEEP(insertChannel)
QORI_SAME_SWEEP(copyChannel)
QORI_SAME_SWEEP(dropAlpha)
QORI_SAME_SWEEP(fillColour)
QORI_SAME_SWEEP(splitPlanes)
QORI_SAME_SWEEP(mergePlanes)

template <class T, Layout SL, Layout DL, Kind kind, class Function>
void duplicate(const char* name, Function function) {
    const auto check = [&](const Shape& shape) { checkDuplicate<channels(DL)>(function, shape); };
    forShapes(smallShapes(), check);
    forStreamingChoices(1 + channels(DL), kAboveEveryBound, check);
    markSwept(name);
}

template <class T, Layout SL, Layout DL, Kind kind, class Function>
void copyManaged(const char* name, Function function) {
    for (int32_t flags = 0; flags < 4; ++flags) {
        const auto flagged = [&](const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, QorImageSize roi) {
            return function(src, srcStep, dst, dstStep, roi, flags);
        };
        forShapes(smallShapes(), [&](const Shape& shape) { checkPacked<T, SL, DL, kind>(flagged, shape); });
    }
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(CopySweep, name) { operation<S, Layout::SL, Layout::DL, Kind::kind>(#name, &name); }
#include "members/copy.inc"
#undef QORI_MEMBER

/// Images too large for the second-level cache, in rows about the length from which other moves are taken.
constexpr int kLongRows[] = {8191, 8192, 8193, 12301};
constexpr int kManyRows = 65;
/// What streams in one piece, many at a time.
constexpr int kPieceRow = 512, kManyPieces = 1100;

TEST(Copy, LongRowsArriveWhateverTheirAlignment) {
    for (int32_t cache : {1, 1 << 28}) {  // past the cache, and through it
        qorTestSetCacheSize(cache);
        for (int width : {kLongRows[0], kLongRows[1], kLongRows[2], kLongRows[3], kPieceRow}) {
            const int height = width == kPieceRow ? kManyPieces : kManyRows;
            for (int shift : {0, 1, 33}) {
                const Shape from{.width = width, .height = height, .padding = 7, .shift = shift};
                const Shape to{.width = width, .height = height, .padding = 64 - shift, .flipped = shift == 1};
                SCOPED_TRACE(describe(from));
                TestImage src(kSrcSlot, from, 1), dst(kDstSlot, to, 1);
                src.fill<uint8_t>(1, [] { return random().value<uint8_t>(); });
                Snapshot expected = dst.snapshot();
                reference::copy(src.view<uint8_t>(1), expected.view<uint8_t>(1), from.roi(), {{0, 0}}, nullptr);
                EXPECT_EQ(QOR_OK, qoriCopy_8u_C1R(src.data<uint8_t>(), src.step(), dst.data<uint8_t>(), dst.step(),
                                                  from.roi()));
                QORI_EXPECT_UNCHANGED(dst, expected);
                EXPECT_EQ(QOR_OK, qoriCopy_8u_C1R(dst.data<uint8_t>(), dst.step(), dst.data<uint8_t>(), dst.step(),
                                                  from.roi()));
                QORI_EXPECT_UNCHANGED(dst, expected);
            }
        }
    }
    qorTestSetCacheSize(0);
}

TEST(Copy, SameImageAsSourceAndDestinationIsUntouched) {
    for (const Shape& shape : {Shape{.width = 77, .height = 3}, Shape{.width = 200, .height = 2, .padding = 5}}) {
        TestImage image(kDstSlot, shape, 4);
        image.fill<uint8_t>(4, [] { return random().value<uint8_t>(); });
        const Snapshot before = image.snapshot();
        auto* p = image.data<uint8_t>();
        EXPECT_EQ(QOR_OK, qoriCopy_8u_C4R(p, image.step(), p, image.step(), shape.roi()));
        EXPECT_EQ(QOR_OK, qoriCopy_8u_AC4R(p, image.step(), p, image.step(), shape.roi()));
        EXPECT_EQ(QOR_OK, qoriCopy_8u_C4CR(p + 1, image.step(), p + 1, image.step(), shape.roi()));
        QORI_EXPECT_UNCHANGED(image, before);
    }
}

TEST(Copy, ZeroStepsRepeatTheSourceRowAndKeepTheLastDestinationRow) {
    const uint8_t row[3] = {7, 8, 9};
    const Shape shape{.width = 3, .height = 4};
    TestImage dst(kDstSlot, shape, 1);
    EXPECT_EQ(QOR_OK, qoriCopy_8u_C1R(row, 0, dst.data<uint8_t>(), dst.step(), shape.roi()));
    for (int y = 0; y < 4; ++y)
        for (int x = 0; x < 3; ++x) EXPECT_EQ(row[x], dst.view<uint8_t>(1).get(x, y));
    uint8_t only[3] = {};
    EXPECT_EQ(QOR_OK, qoriCopy_8u_C1R(dst.data<uint8_t>(), dst.step(), only, 0, shape.roi()));
    EXPECT_EQ(0, std::memcmp(row, only, 3));
}

/// What streams of `bytes` bytes at every address of two lines: whole lines, as many as there are or none.
template <class Ends>
void expectWholeLines(ptrdiff_t size, ptrdiff_t step, ptrdiff_t mostAround, Ends ends) {
    using kernels::kCacheLine;
    alignas(kCacheLine) static uint8_t memory[2 * kCacheLine];
    for (ptrdiff_t at = 0; at < 2 * kCacheLine; at += step)
        for (ptrdiff_t bytes = 0; bytes < 1'000; bytes += size) {
            SCOPED_TRACE(testing::Message() << bytes << " bytes in elements of " << size << " from " << at);
            auto [head, lines] = ends(memory + at, bytes / size);
            head *= size;
            lines *= size;
            EXPECT_EQ(0, lines % kCacheLine);
            EXPECT_EQ(lines < 3 * kCacheLine, lines == 0);
            if (lines > 0) {
                EXPECT_EQ(0, (at + head) % kCacheLine);
                EXPECT_LE(head + lines, bytes);
                EXPECT_LT(bytes - head - lines, kCacheLine);
            } else {
                EXPECT_LT(bytes, mostAround + 3 * kCacheLine);
            }
            if (testing::Test::HasFailure()) return;
        }
}

TEST(Copy, WholeCacheLinesStream) {
    using kernels::StreamedLines;
    expectWholeLines(1, 1, 64, [](uint8_t* dst, ptrdiff_t n) { return StreamedLines::ofBytes(dst, n); });
    const auto inGroups = [](auto element) {
        using T = decltype(element);
        constexpr ptrdiff_t size = sizeof(T);
        const auto ends = [](uint8_t* dst, ptrdiff_t n) {
            return StreamedLines::ofGroups(reinterpret_cast<T*>(dst), n);
        };
        expectWholeLines(size, 32, 96 + 64, [=](uint8_t* dst, ptrdiff_t n) {
            EXPECT_EQ(0, ends(dst, n).head % 12) << "constants of channels";
            EXPECT_EQ(0, ends(dst + size, n).lines);
            return ends(dst, n);
        });
    };
    inGroups(uint8_t{});
    inGroups(uint16_t{});
    inGroups(float{});
    inGroups(double{});
}

TEST(Copy, OfRowsThatOverlapTheLastStays) {
    constexpr int width = 8'000, rows = 300;  // more than what lies between rows that stream together
    std::vector<uint8_t> src(width * rows);
    for (uint8_t& byte : src) byte = random().value<uint8_t>();
    for (int step : {0, 1'000}) {
        std::vector<uint8_t> dst(static_cast<size_t>(width + step * (rows - 1))), expected = dst;
        for (int y = 0; y < rows; ++y) std::memcpy(expected.data() + y * step, src.data() + y * width, width);
        for (int32_t cache : {1, 1 << 28}) {
            qorTestSetCacheSize(cache);
            EXPECT_EQ(QOR_OK, qoriCopy_8u_C1R(src.data(), width, dst.data(), step, {width, rows}));
            EXPECT_TRUE(dst == expected) << step;
        }
    }
    qorTestSetCacheSize(0);
}

TEST(Copy, AsksForTheCacheOnlyAboveEachBound) {
    std::vector<uint8_t> memory(6 << 20);
    const auto queriesOf = [&](auto copy, QorImageSize roi) {
        const int before = qorTestCacheQueries();
        EXPECT_EQ(QOR_OK, copy(roi));
        return qorTestCacheQueries() - before;
    };
    auto* words = reinterpret_cast<int32_t*>(memory.data());
    int32_t* planes[3] = {words + (1 << 19), words + (1 << 19) + 50'000, words + (1 << 19) + 100'000};
    const auto split = [&](QorImageSize roi) {
        return qoriCopy_32s_C3P3R(words, roi.width * 12, planes, roi.width * 4, roi);
    };
    EXPECT_EQ(0, queriesOf(split, {43'690, 1}));  // 24 bytes a pixel: 1,048,560
    EXPECT_EQ(1, queriesOf(split, {43'691, 1}));
    uint8_t* bytePlanes[3] = {memory.data() + (3 << 20), memory.data() + (4 << 20), memory.data() + (5 << 20)};
    const auto splitBytes = [&](QorImageSize roi) {
        return qoriCopy_8u_C3P3R(memory.data(), roi.width * 3, bytePlanes, roi.width, roi);
    };
    EXPECT_EQ(0, queriesOf(splitBytes, {87'381, 1}));  // 6 bytes a pixel: 524,286
    EXPECT_EQ(1, queriesOf(splitBytes, {87'382, 1}));
}

TEST(Copy, ChecksPointersThenSizes) {
    const Shape shape{.width = 4, .height = 2};
    TestImage src(kSrcSlot, shape, 4), dst(kDstSlot, shape, 4), mask(kMaskSlot, shape, 1);
    auto *s = src.data<uint8_t>(), *d = dst.data<uint8_t>(), *m = mask.data<uint8_t>();
    const QorImageSize none{0, 0}, ok = shape.roi();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriCopy_8u_C1R(nullptr, 0, d, 0, none));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriCopy_8u_C1R(s, 0, nullptr, 0, none));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriCopy_8u_C4MR(s, 16, d, 16, none, nullptr, 4));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriCopyManaged_8u_C1R(nullptr, 16, d, 16, none, 3));
    for (QorImageSize bad : {QorImageSize{0, 2}, QorImageSize{4, 0}, QorImageSize{-1, 2}, QorImageSize{4, INT32_MIN}}) {
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriCopy_8u_C1R(s, -1, d, -1, bad));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriCopy_8u_AC4MR(s, 16, d, 16, bad, m, 4));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriDup_8u_C1C4R(s, 16, d, 16, bad));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriCopyManaged_8u_C1R(s, 16, d, 16, bad, 0));
    }
    for (int missing = 0; missing < 4; ++missing) {
        uint8_t* planes[4] = {d, d, d, d};
        planes[missing] = nullptr;
        QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriCopy_8u_C4P4R(s, 16, planes, 4, none));
        QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriCopy_8u_P4C4R(planes, 16, d, 4, ok));
    }
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriCopy_8u_C3P3R(s, 16, nullptr, 4, none));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriCopy_8u_P3C3R(nullptr, 16, d, 4, ok));
}

}  // namespace
}  // namespace qori::test
