// SPDX-License-Identifier: Apache-2.0
#include "box_cases.h"

namespace qori::test {
namespace {

enum Slot { kSrc, kDst, kBuffer };

template <class T>
constexpr int32_t kTypeCode = std::is_same_v<T, uint8_t>    ? 1
                              : std::is_same_v<T, uint16_t> ? 5
                              : std::is_same_v<T, int16_t>  ? 7
                                                            : 13;

Around aroundOf(QorImageSize mask) { return Around::ofMask(mask, {(mask.width - 1) / 2, (mask.height - 1) / 2}); }

/// The pixel that a window sees, by the rule.
template <class Get>
auto bordered(QorImageSize size, int32_t border, int x, int y, int c, Get get, decltype(get(0, 0, 0)) constant) {
    const bool all = (border & 15) == borderReadAll || (border & 0xF0) == 0xF0;
    const auto open = [&](int32_t flag) { return all || (border & flag) != 0; };
    const bool missingX = (x < 0 && !open(borderReadLeft)) || (x >= size.width && !open(borderReadRight));
    const bool missingY = (y < 0 && !open(borderReadTop)) || (y >= size.height && !open(borderReadBottom));
    if ((missingX || missingY) && (border & 15) == borderConstant) return constant;
    if (missingX) x = std::clamp(x, 0, size.width - 1);
    if (missingY) y = std::clamp(y, 0, size.height - 1);
    return get(x, y, c);
}

/// The source has what open sides show, flush against guard pages, and the buffer exactly the bytes that are reported.
template <class T, Layout L, class Function>
void checkBordered(const Shape& shape, QorImageSize mask, int32_t border, bool inPlace, Function function) {
    SCOPED_TRACE(testing::Message() << "mask " << mask.width << "x" << mask.height << " border " << border
                                    << (inPlace ? " in place" : ""));
    constexpr int n = channels(L), pixelBytes = n * static_cast<int>(sizeof(T));
    const bool all = (border & 15) == borderReadAll;
    Around around = aroundOf(mask);
    if (!all && !(border & borderReadLeft)) around.left = 0;
    if (!all && !(border & borderReadTop)) around.top = 0;
    if (!all && !(border & borderReadRight)) around.right = 0;
    if (!all && !(border & borderReadBottom)) around.bottom = 0;
    const TestImage src(kSrc, withAround(shape, around), pixelBytes);
    const TestImage dst = inPlace ? src : TestImage(kDst, shape, pixelBytes);
    if (!inPlace) dst.fill<T>(n, drawExact<T>);
    src.fill<T>(n, drawExact<T>);
    const ptrdiff_t inside = around.top * ptrdiff_t{src.step()} + ptrdiff_t{around.left} * pixelBytes;
    Snapshot before = src.snapshot(), expected = dst.snapshot();
    const View<T> from = before.view<T>(n);
    View<T> to = expected.view<T>(n);
    if (inPlace) to.origin += inside;
    T value[4];
    for (T& v : value) v = drawExact<T>();
    const Around reach = aroundOf(mask);
    for (int y = 0; y < shape.height; ++y)
        for (int x = 0; x < shape.width; ++x)
            for (int c = 0; c < processedChannels(L); ++c)
                to.set(x, y, c, boxMean<T>(mask, [&](int i, int j) {
                           return bordered(
                               shape.roi(), border, x - reach.left + i, y - reach.top + j, c,
                               [&](int px, int py, int pc) { return from.get(px + around.left, py + around.top, pc); },
                               value[c]);
                       }));
    int32_t bytes = 0;
    ASSERT_EQ(QOR_OK, call(qoriFilterBoxBorderGetBufferSize, shape.roi(), mask, kTypeCode<T>, n, &bytes));
    const TestImage buffer = block(kBuffer, bytes, random().below(4));
    buffer.fill<uint8_t>(1, [] { return static_cast<uint8_t>(random().bits()); });
    auto* const source = src.data<uint8_t>() + inside;
    auto* const target = inPlace ? source : dst.data<uint8_t>();
    const bool needsValue = border == borderConstant || random().oneIn(2) || (border & 15) == borderConstant;
    EXPECT_EQ(QOR_OK, call(function, reinterpret_cast<const T*>(source), src.step(), reinterpret_cast<T*>(target),
                           dst.step(), shape.roi(), mask, border, needsValue ? static_cast<const T*>(value) : nullptr,
                           buffer.data<uint8_t>()));
    QORI_EXPECT_UNCHANGED(dst, expected);
    const Snapshot made = buffer.snapshot();  // nothing around it is damaged
    EXPECT_EQ("", buffer.difference(made));
    if (!inPlace) {
        QORI_EXPECT_UNCHANGED(src, before);
    }
}

int32_t drawBorder() {
    static constexpr int32_t kinds[] = {borderConstant, borderReplicate, borderReplicate, borderReadAll};
    return kinds[random().below(4)] | (random().oneIn(2) ? random().below(16) << 4 : 0);
}

template <class T, Layout L, class Function>
void sweepBordered(const char* name, Function function) {
    const std::vector<QorImageSize>& masks = boxMasks();
    size_t turn = 0;
    forShapes(windowShapes(4), [&](const Shape& shape) {
        checkBordered<T, L>(shape, masks[turn % masks.size()], drawBorder(), turn % 4 == 3, function);
        ++turn;
    });
    // All sides and kinds, in place too: masks smaller than the region, as large, larger in one direction or in both.
    for (const QorImageSize mask : {QorImageSize{3, 3}, QorImageSize{5, 4}, QorImageSize{12, 9}})
        for (int32_t sides = 0; sides < 256; sides += 16)
            for (int32_t kind : {borderConstant, borderReplicate, borderReadAll})
                for (const QorImageSize size : {QorImageSize{19, 11}, QorImageSize{12, 2}, QorImageSize{2, 12}})
                    checkBordered<T, L>({.width = size.width, .height = size.height, .padding = 1}, mask, kind | sides,
                                        random().oneIn(2), function);
    // Buffers have no byte to spare where sizes are small.
    for (int width = 1; width <= 4; ++width)
        for (int height = 1; height <= 4; ++height)
            for (int maskWidth = 1; maskWidth <= 10; ++maskWidth)
                for (int maskHeight : {1, 2, 3, 4, 5, 8, 9, 10})
                    checkBordered<T, L>({.width = width, .height = height}, {maskWidth, maskHeight},
                                        borderConstant | random().below(2), random().oneIn(2), function);
    for (const QorImageSize mask :
         {QorImageSize{61, 1}, QorImageSize{61, 2}, QorImageSize{2, 61}, QorImageSize{130, 3}})
        for (int width : {1, 60, 61, 63, 150})
            checkBordered<T, L>({.width = width, .height = 1 + random().below(3)}, mask, borderReplicate,
                                random().oneIn(2), function);
    markSwept(name);
}

template <class S, Layout L, class Function>
void filterBoxBorder(const char* name, Function function) {
    sweepBordered<S, L>(name, function);
}
template <class S, Layout L, class Function>
void filterBoxBorderGetBufferSize(const char* name, Function) {
    markSwept(name);  // by every call above
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(BoxBorderSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/box_border.inc"
#undef QORI_MEMBER

TEST(BoxBorder, ReportsTheSumOfItsAreas) {
    int32_t bytes = -1;
    const auto size = [&](QorImageSize roi, QorImageSize mask, int32_t type, int32_t n) {
        return qoriFilterBoxBorderGetBufferSize(roi, mask, type, n, &bytes);
    };
    // 8 (6 * 12 + 6 * 10) + 15 * 4 + 4 * 12 * 10 + 4 * 2 + 4, whatever the type; w, h = 8, 6 and mask 5 x 5
    for (int32_t type : {1, 5, 7, 13}) {
        EXPECT_EQ(QOR_OK, size({8, 6}, {5, 5}, type, 1));
        EXPECT_EQ(8 * (6 * 12 + 6 * 10) + 14 * 4 + 4 * 12 * 10 + 4 * 2 + 4, bytes);
    }
    EXPECT_EQ(QOR_OK, size({8, 6}, {4, 2}, 13, 3));
    EXPECT_EQ(3 * 8 * (2 * 11 + 5 * 7) + 13 * 16 + 3 * 4 * 11 * 7 + 4, bytes);
    bytes = -1;
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriFilterBoxBorderGetBufferSize({0, 0}, {0, 0}, 0, 0, nullptr));
    EXPECT_EQ(QOR_ERR_SIZE, size({0, 1}, {0, 1}, 0, 0));
    EXPECT_EQ(QOR_ERR_MASK_SIZE, size({1, 1}, {1, 0}, 0, 0));
    for (int32_t type : {0, 2, 6, 19}) EXPECT_EQ(QOR_ERR_DATA_TYPE, size({1, 1}, {1, 1}, type, 2));
    for (int32_t n : {0, 2, 5}) EXPECT_EQ(QOR_ERR_CHANNELS_UNSUPPORTED, size({1, 1}, {1, 1}, 1, n));
    EXPECT_EQ(QOR_ERR_SIZE, size({1 << 20, 1 << 12}, {3, 3}, 1, 1));
    // Areas of more bytes than 64 bits count.
    constexpr int32_t kLong[] = {1 << 29, 1 << 30, INT32_MAX};
    for (int32_t side : {1, 1 << 20, 1 << 30, INT32_MAX})
        for (int32_t width : kLong)
            for (int32_t height : kLong)
                for (int32_t n : {1, 3, 4}) EXPECT_EQ(QOR_ERR_SIZE, size({side, side}, {width, height}, 1, n));
    EXPECT_EQ(-1, bytes);
}

TEST(BoxBorder, ChecksInOrder) {
    const TestImage src(kSrc, {.width = 12, .height = 6}, 1), dst(kDst, {.width = 10, .height = 4}, 1);
    const TestImage buffer = block(kBuffer, 4096);
    const uint8_t *s = src.data<uint8_t>() + 13, *none = nullptr, value = 0;
    uint8_t *d = dst.data<uint8_t>(), *b = buffer.data<uint8_t>(), *noImage = nullptr;
    const QorImageSize ok{10, 4}, empty{0, 4}, mask{3, 3}, flat{3, 0};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterBoxBorder_8u_C1R(none, 0, d, 0, empty, flat, 2, none, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterBoxBorder_8u_C1R(s, 0, noImage, 0, empty, flat, 2, none, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterBoxBorder_8u_C1R(s, 0, d, 0, empty, flat, 2, none, noImage));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterBoxBorder_8u_C1R(s, 12, d, 0, empty, flat, 0, none, b));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, empty, flat, 0, none, b));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, flat, 0, none, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, mask, 0, none, b));
    for (int32_t kind : {2, 3, 4, 5, 7, 15, 2 | 0x70, -1 & ~0x80}) {
        QORI_EXPECT_STATUS(QOR_ERR_BORDER, dst, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, mask, kind, none, b));
        QORI_EXPECT_STATUS(QOR_ERR_BORDER, dst, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, mask, kind, &value, b));
        // Nothing to synthesise: all sides open, or windows that reach no closed one.
        EXPECT_EQ(QOR_OK, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, mask, kind | 0xF0, none, b));
        EXPECT_EQ(QOR_OK, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, {1, 1}, kind, none, b));
    }
    EXPECT_EQ(QOR_OK, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, {2, 1}, 2 | borderReadRight, none, b));
    QORI_EXPECT_STATUS(QOR_ERR_BORDER, dst, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, {2, 1}, 2 | 0x70, none, b));
    EXPECT_EQ(QOR_OK, qoriFilterBoxBorder_8u_C1R(s, 12, d, 10, ok, mask, borderReadAll, none, b));
}

/// A null value beside flags stands for zeros.
TEST(BoxBorder, TakesNoValueForZeros) {
    const TestImage src(kSrc, {.width = 4, .height = 3}, 1), dst(kDst, {.width = 4, .height = 2}, 1);
    src.fill<uint8_t>(1, [] { return uint8_t{90}; });
    const TestImage buffer = block(kBuffer, 4096);
    EXPECT_EQ(QOR_OK, qoriFilterBoxBorder_8u_C1R(src.data<uint8_t>() + 4, 4, dst.data<uint8_t>(), 4, {4, 2}, {3, 3},
                                                 borderConstant | borderReadTop, nullptr, buffer.data<uint8_t>()));
    EXPECT_EQ(60, dst.view<uint8_t>(1).get(0, 0));
    EXPECT_EQ(90, dst.view<uint8_t>(1).get(1, 0));
    EXPECT_EQ(40, dst.view<uint8_t>(1).get(3, 1));
}

}  // namespace
}  // namespace qori::test
