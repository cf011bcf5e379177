// SPDX-License-Identifier: Apache-2.0
#include "harness/pixelwise.h"
#include "reference/mirror.h"

namespace qori::test {
namespace {

constexpr int kStreamsFrom = 1'048'576;  ///< Bytes of traffic up to which no copy asks for the cache.
constexpr int kSrcSlot = 0, kDstSlot = 1;

/// Pixels on the four sides.
struct Sides {
    int left, top, right, bottom;
};

Shape framed(Shape shape, Sides sides) {
    shape.width += sides.left + sides.right;
    shape.height += sides.top + sides.bottom;
    return shape;
}

/// The larger image as it must be: outside(x, y, c) of the source's coordinates gives what the frame shows.
template <class T, Layout L, class Outside>
Snapshot expectedFrame(const TestImage& dst, View<T> src, const Shape& shape, Sides sides, Outside outside) {
    Snapshot expected = dst.snapshot();
    const auto to = expected.view<T>(channels(L));
    const auto isInside = [&](int x, int y) { return x >= 0 && x < shape.width && y >= 0 && y < shape.height; };
    for (int y = -sides.top; y < shape.height + sides.bottom; ++y)
        for (int x = -sides.left; x < shape.width + sides.right; ++x)
            for (int c = 0; c < processedChannels(L); ++c)
                to.set(x + sides.left, y + sides.top, c, isInside(x, y) ? src.get(x, y, c) : outside(x, y, c));
    return expected;
}

template <class T, Layout L, Kind kind, bool constant, class Function>
void check(Function function, const Shape& shape, Sides sides) {
    constexpr int n = channels(L), pixelBytes = n * static_cast<int>(sizeof(T));
    const Shape larger = framed(shape, sides);
    const TestImage dst(kDstSlot, larger, pixelBytes), src(kSrcSlot, shape, pixelBytes);
    dst.fill<T>(n, AnyValue<T>{});
    src.fill<T>(n, AnyValue<T>{});
    const Snapshot srcBefore = src.snapshot();
    View<T> from = src.view<T>(n);
    T* const inside = reinterpret_cast<T*>(dst.data<uint8_t>() + ptrdiff_t{sides.top} * dst.step() +
                                           ptrdiff_t{sides.left} * pixelBytes);
    if (kind == Kind::IR) from = {reinterpret_cast<uint8_t*>(inside), dst.step(), n};
    T value[4];
    for (T& v : value) v = random().value<T>();
    const Snapshot expected = expectedFrame<T, L>(dst, from, shape, sides, [&](int x, int y, int c) {
        const QorPoint2D at = reference::nearest(x, y, shape.roi());
        return constant ? value[c] : from.get(at.x, at.y, c);
    });
    QorResult result;
    if constexpr (constant && L == Layout::C1)
        result = call(function, src.data<T>(), src.step(), shape.roi(), dst.data<T>(), dst.step(), larger.roi(),
                      sides.top, sides.left, value[0]);
    else if constexpr (constant)
        result = call(function, src.data<T>(), src.step(), shape.roi(), dst.data<T>(), dst.step(), larger.roi(),
                      sides.top, sides.left, static_cast<const T*>(value));
    else if constexpr (kind == Kind::IR)
        result = call(function, inside, dst.step(), shape.roi(), larger.roi(), sides.top, sides.left);
    else
        result = call(function, src.data<T>(), src.step(), shape.roi(), dst.data<T>(), dst.step(), larger.roi(),
                      sides.top, sides.left);
    ASSERT_EQ(QOR_OK, result);
    QORI_EXPECT_UNCHANGED(dst, expected);
    QORI_EXPECT_UNCHANGED(src, srcBefore);
}

constexpr Sides kSides[] = {{1, 1, 1, 1}, {0, 0, 0, 0}, {3, 0, 40, 2}, {33, 2, 0, 0}, {0, 1, 5, 0}, {16, 0, 16, 3}};

template <class T, Layout L, Kind kind, bool constant, class Function>
void sweep(const char* name, Function function) {
    SCOPED_TRACE(name);
    size_t next = 0;
    for (const int around : {0, 1})
        forShapes(smallShapes(), [&](Shape shape) {
            if (shape.flipped) return;  // steps are positive here
            const Sides sides = kSides[(next++ + static_cast<size_t>(around)) % std::size(kSides)];
            check<T, L, kind, constant>(function, shape, sides);
        });
    if constexpr (kind == Kind::R) {
        if constexpr (!constant) {
            // One pointer is the source's first pixel; the other step is not looked at.
            const auto inPlace = [=](T* image, int32_t step, QorImageSize src, QorImageSize dst, int32_t top,
                                     int32_t left) { return function(image, step, src, image, -1, dst, top, left); };
            for (const Sides& sides : kSides)
                check<T, L, Kind::IR, false>(inPlace, {.width = 21, .height = 3, .padding = 2}, sides);
        }
        constexpr int kBytes = 2 * channels(L) * static_cast<int>(sizeof(T));
        forStreamingChoices(kBytes, kStreamsFrom, [=](const Shape& shape) {
            check<T, L, kind, constant>(function, shape, {16, 2, 15, 3});
        });
        qorTestSetCacheSize(0);
    }
    markSwept(name);
}

constexpr bool isConstant(std::string_view operation) { return operation == "copyConstBorder"; }

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(CopyBorder, name) { sweep<S, Layout::SL, Kind::kind, isConstant(#operation)>(#name, name); }
#include "members/border.inc"
#undef QORI_MEMBER

TEST(CopyBorder, RefusesFramesThatDoNotFit) {
    const TestImage src(kSrcSlot, {.width = 64, .height = 1}, 1), dst(kDstSlot, {.width = 64, .height = 1}, 1);
    uint8_t *s = src.data<uint8_t>(), *d = dst.data<uint8_t>();
    struct Bad {
        QorImageSize src, dst;
        int32_t top, left;
    };
    constexpr int32_t kMost = INT32_MAX;
    constexpr uint8_t kValue = 7;
    constexpr QorImageSize two{2, 2}, tight{3, 4};
    for (const Bad& bad :
         {Bad{{0, 2}, {4, 4}, 1, 1}, Bad{{2, 0}, {4, 4}, 1, 1}, Bad{{2, 2}, {4, 0}, 0, 0}, Bad{{2, 2}, {2, 4}, 1, 1},
          Bad{{2, 2}, {4, 2}, 1, 1}, Bad{{2, 2}, {4, 4}, -1, 1}, Bad{{2, 2}, {4, 4}, 1, -1}, Bad{{2, 2}, {4, 4}, 3, 0},
          Bad{{2, 2}, {4, 4}, 0, kMost}, Bad{{2, 2}, {4, 4}, kMost, 0}, Bad{{kMost, 1}, {4, 4}, 0, 1}}) {
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst,
                           call(qoriCopyConstBorder_8u_C1R, s, 8, bad.src, d, 8, bad.dst, bad.top, bad.left, kValue));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst,
                           call(qoriCopyReplicateBorder_8u_C1R, s, 8, bad.src, d, 8, bad.dst, bad.top, bad.left));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst,
                           call(qoriCopyReplicateBorder_8u_C1IR, d, 8, bad.src, bad.dst, bad.top, bad.left));
    }
    EXPECT_EQ(QOR_OK, call(qoriCopyConstBorder_8u_C1R, s, 8, two, d, 8, tight, 1, 1, kValue));
}

TEST(CopyBorder, ChecksStepsBeforeSizesAndValuesLast) {
    const TestImage src(kSrcSlot, {.width = 64, .height = 1}, 1), dst(kDstSlot, {.width = 64, .height = 1}, 1);
    const uint8_t *const s = src.data<uint8_t>(), *const none = nullptr;
    uint8_t *const d = dst.data<uint8_t>(), *const nowhere = nullptr;
    const QorImageSize bad{0, 0}, one{1, 1};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, call(qoriCopyConstBorder_8u_C3R, s, 0, bad, nowhere, 0, bad, 0, 0, s));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, call(qoriCopyConstBorder_8u_C3R, s, 0, bad, d, 8, bad, 0, 0, none));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, call(qoriCopyReplicateBorder_8u_C1R, s, 8, bad, d, 0, bad, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriCopyConstBorder_8u_C3R, s, 8, bad, d, 8, bad, 0, 0, none));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, call(qoriCopyConstBorder_8u_AC4R, s, 8, one, d, 8, one, 0, 0, none));
    // One pointer for both: the in-place form's checks, which know one step.
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst,
                       call(qoriCopyReplicateBorder_8u_C1R, none, 0, bad, nowhere, 0, bad, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, call(qoriCopyReplicateBorder_8u_C1R, d, 0, bad, d, 8, bad, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, call(qoriCopyReplicateBorder_8u_C1R, d, 8, bad, d, 0, bad, 0, 0));
}

}  // namespace
}  // namespace qori::test
