// SPDX-License-Identifier: Apache-2.0
#include "reference/mirror.h"
#include "harness/pixelwise.h"

namespace qori::test {
namespace {

constexpr int kStreamsFrom = 1'048'576;  ///< Bytes of traffic up to which no mirror asks for the cache.
constexpr int kSrcSlot = 0, kDstSlot = 1;
constexpr int32_t kFirstDiagonal = flipDiagonal, kAxes = 5;

constexpr bool mayReflect(const Shape& shape, int32_t axis) {
    return axis >= kFirstDiagonal ||
           ((axis == flipVerticalAxis || shape.height > 1) && (axis == flipHorizontalAxis || shape.width > 1));
}

/// Any values; what the destination held before shows what is kept.
template <class T, Layout L, Kind kind, class Function>
void check(Function function, const Shape& shape, int32_t axis) {
    constexpr int n = channels(L), pixelBytes = n * static_cast<int>(sizeof(T));
    Shape turned = shape;
    if (axis >= kFirstDiagonal) std::swap(turned.width, turned.height);
    const TestImage dst(kDstSlot, turned, pixelBytes);
    const TestImage src = kind == Kind::IR ? dst : TestImage(kSrcSlot, shape, pixelBytes);
    dst.fill<T>(n, AnyValue<T>{});
    src.fill<T>(n, AnyValue<T>{});
    Snapshot before = src.snapshot(), expected = dst.snapshot();
    const auto from = before.view<T>(n), to = expected.view<T>(n);
    for (int y = 0; y < turned.height; ++y)
        for (int x = 0; x < turned.width; ++x) {
            const QorPoint2D at = reference::reflected(x, y, shape.roi(), axis);
            for (int c = 0; c < processedChannels(L); ++c) to.set(x, y, c, from.get(at.x, at.y, c));
        }
    SCOPED_TRACE(axis);
    if constexpr (kind == Kind::IR)
        ASSERT_EQ(QOR_OK, call(function, dst.data<T>(), dst.step(), shape.roi(), axis));
    else
        ASSERT_EQ(QOR_OK, call(function, src.data<T>(), src.step(), dst.data<T>(), dst.step(), shape.roi(), axis));
    QORI_EXPECT_UNCHANGED(dst, expected);
    if (kind != Kind::IR) {
        QORI_EXPECT_UNCHANGED(src, before);
    }
}

template <class T, Layout L, Kind kind, class Function>
void checkAxes(Function function, const Shape& shape) {
    for (int32_t axis = 0; axis < (kind == Kind::IR || shape.flipped ? kFirstDiagonal : kAxes); ++axis)
        if (mayReflect(shape, axis)) check<T, L, kind>(function, shape, axis);
}

/// Sizes around those of the tiles in which diagonals are turned, and of their panels.
std::vector<Shape> diagonalShapes() {
    std::vector<Shape> shapes;
    for (int w : {4, 15, 16, 17, 31, 32, 33, 64, 70, 129})
        for (int h : {4, 8, 15, 16, 17, 33, 64, 130})
            shapes.push_back({.width = w, .height = h, .padding = w % 3, .atBegin = h % 2 == 0, .shift = w % 5});
    shapes.push_back({.width = 70, .height = 1030});
    shapes.push_back({.width = 1030, .height = 70});
    return shapes;
}

template <class T, Layout L, Kind kind, class Function>
void sweep(const char* name, Function function) {
    SCOPED_TRACE(name);
    forShapes(smallShapes(), [=](const Shape& shape) { checkAxes<T, L, kind>(function, shape); });
    if constexpr (kind == Kind::R) {
        forShapes(diagonalShapes(), [=](const Shape& shape) {
            for (int32_t axis = kFirstDiagonal; axis < kAxes; ++axis) check<T, L, kind>(function, shape, axis);
        });
        // One image runs in place.
        const auto inPlace = [=](T* image, int32_t step, QorImageSize roi, int32_t axis) {
            return function(image, step, image, step, roi, axis);
        };
        for (int width : {2, 13, 70}) checkAxes<T, L, Kind::IR>(inPlace, {.width = width, .height = 5, .padding = 2});
        constexpr int kBytes = 2 * channels(L) * static_cast<int>(sizeof(T));
        forStreamingChoices(kBytes, kStreamsFrom, [=](const Shape& s) { checkAxes<T, L, kind>(function, s); });
        qorTestSetCacheSize(0);
    }
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(Mirror, name) { sweep<S, Layout::SL, Kind::kind>(#name, name); }
#include "members/mirror.inc"
#undef QORI_MEMBER

TEST(Mirror, DiagonalsRefuseImagesThatShareAByte) {
    const TestImage memory(kDstSlot, {.width = 400, .height = 1}, 1);
    uint8_t* const p = memory.data<uint8_t>();
    const QorImageSize size{5, 3};  // 2 * 20 + 5 bytes, turned 4 * 30 + 3
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, memory, call(qoriMirror_8u_C1R, p, 20, p, 20, size, flipDiagonal));
    for (const int32_t axis : {flipDiagonal, flipAntiDiagonal}) {
        QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, memory, call(qoriMirror_8u_C1R, p, 20, p + 44, 30, size, axis));
        QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, memory, call(qoriMirror_8u_C1R, p + 122, 20, p, 30, size, axis));
        // Between the rows of the other is inside it, and so is the alpha of its last pixel.
        QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, memory, call(qoriMirror_8u_C1R, p, 20, p + 10, 30, size, axis));
        QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, memory,
                           call(qoriMirror_8u_AC4R, p, 20, p + 59, 30, QorImageSize{5, 3}, axis));
        EXPECT_EQ(QOR_OK, call(qoriMirror_8u_C1R, p, 20, p + 45, 30, size, axis));
        EXPECT_EQ(QOR_OK, call(qoriMirror_8u_C1R, p + 123, 20, p, 30, size, axis));
    }
}

TEST(Mirror, ChecksTheAxisThenItsEnds) {
    const TestImage src(kSrcSlot, {.width = 64, .height = 1}, 1), dst(kDstSlot, {.width = 64, .height = 1}, 1);
    uint8_t *s = src.data<uint8_t>(), *d = dst.data<uint8_t>();
    for (const int32_t axis : {-1, 5, INT32_MIN}) {
        QORI_EXPECT_STATUS(QOR_ERR_FLIP_AXIS, dst, call(qoriMirror_8u_C1R, s, 0, d, -8, QorImageSize{1, 1}, axis));
        QORI_EXPECT_STATUS(QOR_ERR_FLIP_AXIS, dst, call(qoriMirror_8u_C1IR, d, 8, QorImageSize{1, 1}, axis));
    }
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriMirror_8u_C1R, s, 8, d, 8, QorImageSize{0, 1}, 9));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriMirror_8u_C1IR, d, 8, QorImageSize{1, 0}, 9));
    QORI_EXPECT_STATUS(QOR_ERR_FLIP_AXIS, dst, call(qoriMirror_8u_C1IR, d, 8, QorImageSize{5, 5}, flipDiagonal));
    for (const int32_t axis : {flipHorizontalAxis, flipBothAxes}) {
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriMirror_8u_C1R, s, 8, d, 8, QorImageSize{5, 1}, axis));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriMirror_8u_C1IR, d, 8, QorImageSize{5, 1}, axis));
    }
    for (const int32_t axis : {flipVerticalAxis, flipBothAxes}) {
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriMirror_8u_C1R, s, 8, d, 8, QorImageSize{1, 5}, axis));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriMirror_8u_C1IR, d, 8, QorImageSize{1, 5}, axis));
    }
    // Diagonals: steps come before sizes.
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, call(qoriMirror_8u_C1R, s, 0, nullptr, 0, QorImageSize{0, 0}, 3));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, call(qoriMirror_8u_C1R, s, 8, d, 0, QorImageSize{0, 0}, 3));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, call(qoriMirror_8u_C1R, s, -8, d, 8, QorImageSize{0, 0}, 4));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriMirror_8u_C1R, s, 8, d, 8, QorImageSize{0, 1}, 4));
}

TEST(Mirror, AsksForTheCacheAboveTheBoundOfTheLayout) {
    std::vector<uint8_t> memory(2 << 20);
    uint8_t *s = memory.data(), *d = s + (1 << 20);
    const auto queriesOf = [](auto mirror) {
        const int before = qorTestCacheQueries();
        EXPECT_EQ(QOR_OK, mirror());
        return qorTestCacheQueries() - before;
    };
    EXPECT_EQ(0, queriesOf([&] { return qoriMirror_8u_C4R(s, 1024, d, 1024, {256, 512}, flipHorizontalAxis); }));
    EXPECT_EQ(1, queriesOf([&] { return qoriMirror_8u_C4R(s, 1024, d, 1024, {256, 513}, flipHorizontalAxis); }));
    EXPECT_EQ(1, queriesOf([&] { return qoriMirror_8u_C4R(s, 1024, d, 2052, {256, 513}, flipDiagonal); }));
    EXPECT_EQ(0, queriesOf([&] { return qoriMirror_8u_AC4R(s, 1024, d, 1024, {256, 513}, flipVerticalAxis); }));
}

}  // namespace
}  // namespace qori::test
