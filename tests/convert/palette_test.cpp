// SPDX-License-Identifier: Apache-2.0
// Palettes: every element by its own entry, from tables that end at no-access pages.
#include <cstring>
#include <string_view>

#include "harness/pixelwise.h"

namespace qori::test {
namespace {

/// Elements that a destination pixel has of every source pixel.
struct PixelSizes {
    int srcChannels, dstChannels;
};

/// Entries of `width` elements each in memory that ends at a no-access page.
template <class D>
const D* drawTable(int slot, int nBitSize, int width) {
    const int count = (1 << nBitSize) * width;
    D* const table = block(slot, count * static_cast<int>(sizeof(D))).data<D>();
    for (int i = 0; i < count; ++i) table[i] = random().value<D>();
    return table;
}

template <class S>
constexpr unsigned maskOf(int nBitSize) {
    return (1u << nBitSize) - 1;
}

/// expectPixel(from, to) sets the elements that the export writes, given those of the source pixel.
template <class S, class D, class Invoke, class Expect>
void checkPixels(const Shape& shape, PixelSizes n, Invoke invoke, Expect expectPixel) {
    TestImage src(1, shape, n.srcChannels * static_cast<int>(sizeof(S)));
    TestImage dst(0, shape, n.dstChannels * static_cast<int>(sizeof(D)));
    src.fill<S>(n.srcChannels, AnyValue<S>{});
    dst.fill<D>(n.dstChannels, AnyValue<D>{});
    const Snapshot srcBefore = src.snapshot();
    Snapshot expected = dst.snapshot();
    const auto from = src.view<S>(n.srcChannels);
    const auto to = expected.view<D>(n.dstChannels);
    for (int y = 0; y < shape.height; ++y)
        for (int x = 0; x < shape.width; ++x)
            expectPixel([&](int c) { return from.get(x, y, c); }, [&](int c, D v) { to.set(x, y, c, v); });
    EXPECT_EQ(QOR_OK, invoke(src, dst, shape.roi()));
    QORI_EXPECT_UNCHANGED(dst, expected);
    QORI_EXPECT_UNCHANGED(src, srcBefore);
}

/// check(shape, nBitSize) for every shape that palettes accept; every size of table comes up.
template <class S, class Check>
void sweepShapes(const char* name, Check check) {
    int bits = 0;
    forShapes(smallShapes(), [&](Shape shape) {
        shape.flipped = false;
        check(shape, 1 + bits++ % int(8 * sizeof(S)));
    });
    markSwept(name);
}

/// Each channel by a table, a destination pixel having as many elements as the source or `width` of one.
template <class S, class D, Layout layout, class Function>
void sweepTables(const char* name, Function function, int width) {
    constexpr int n = channels(layout), processed = processedChannels(layout);
    sweepShapes<S>(name, [&](const Shape& shape, int nBitSize) {
        const D* tables[4];
        const bool same = random().oneIn(4);
        for (int c = 0; c < processed; ++c)
            tables[c] = same && c > 0 ? tables[0] : drawTable<D>(2 + c, nBitSize, width);
        const auto tableArgument = [&] {
            if constexpr (layout == Layout::C1)
                return tables[0];
            else
                return static_cast<const D* const*>(tables);
        };
        const unsigned mask = maskOf<S>(nBitSize);
        checkPixels<S, D>(
            shape, {n, n * width},
            [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                return call(function, static_cast<const S*>(src.data<S>()), src.step(), dst.data<D>(), dst.step(), roi,
                            tableArgument(), nBitSize);
            },
            [&](auto get, auto set) {
                for (int c = 0; c < processed; ++c)
                    for (int i = 0; i < width; ++i)
                        set(c + i,
                            tables[c][(get(c) & mask) * static_cast<unsigned>(width) + static_cast<unsigned>(i)]);
            });
    });
}

template <class S, class D, Layout layout, class Function>
void palette(const char* name, Function function) {
    sweepTables<S, D, layout>(name, function, 1);
}
template <class S, class D, Layout layout, class Function>
void palettes(const char* name, Function function) {
    sweepTables<S, D, layout>(name, function, 1);
}
template <class S, class D, Layout layout, class Function>
void paletteTriples(const char* name, Function function) {
    sweepTables<S, D, layout>(name, function, 3);
}

template <class S, class D, Layout layout, class Function>
void paletteWithAlpha(const char* name, Function function) {
    constexpr int32_t kHighest = static_cast<S>(-1);
    const bool swaps = std::string_view(name).find("Swap") != std::string_view::npos;
    sweepShapes<S>(name, [&](const Shape& shape, int nBitSize) {
        const S* tables[3];
        for (int c = 0; c < 3; ++c) tables[c] = drawTable<S>(2 + c, nBitSize, 1);
        const int32_t alphas[] = {0, 1, 200, kHighest, kHighest + 1, -1, INT32_MIN, INT32_MAX};
        const int32_t alpha = alphas[random().below(8)];
        checkPixels<S, S>(
            shape, {3, 4},
            [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                return call(function, static_cast<const S*>(src.data<S>()), src.step(), alpha, dst.data<S>(),
                            dst.step(), roi, static_cast<const S* const*>(tables), nBitSize);
            },
            [&](auto get, auto set) {
                for (int c = 0; c < 3; ++c) set(swaps ? 2 - c : c + 1, tables[c][get(c) & maskOf<S>(nBitSize)]);
                if (alpha >= 0 && alpha <= kHighest) set(swaps ? 3 : 0, static_cast<S>(alpha));
            });
    });
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(PaletteSweep, name) { operation<S, D, Layout::SL>(#name, &name); }
#include "members/palette.inc"
#undef QORI_MEMBER

/// One image as source and destination: blocks are read before they are written.
TEST(Palette, InPlace) {
    uint8_t tables[4][256], pixels[4 * 700], expected[4 * 700];
    for (auto& table : tables)
        for (uint8_t& entry : table) entry = random().value<uint8_t>();
    for (int i = 0; i < 4 * 700; ++i) {
        pixels[i] = random().value<uint8_t>();
        expected[i] = i % 4 < 3 ? tables[i % 4][pixels[i]] : pixels[i];
    }
    const uint8_t* const three[3] = {tables[0], tables[1], tables[2]};
    EXPECT_EQ(QOR_OK, call(qoriLUTPalette_8u_AC4R, pixels, 2'800, pixels, 2'800, QorImageSize{700, 1},
                           static_cast<const uint8_t* const*>(three), 8));
    EXPECT_EQ(0, std::memcmp(expected, pixels, sizeof pixels));
}

class PaletteStatus : public testing::Test {
protected:
    static constexpr Shape kShape{.width = 4, .height = 2};
    static constexpr QorImageSize kRoi{4, 2}, kNone{0, 2};
    TestImage src_{1, kShape, 16}, dst_{0, kShape, 16};
    const uint8_t bytes_[256] = {};
    const uint8_t* const three_[3] = {bytes_, bytes_, bytes_};
};

TEST_F(PaletteStatus, BitsBeforeSteps) {
    const auto status = [&](QorImageSize roi, int32_t srcStep, int32_t dstStep, int32_t bits) {
        return call(qoriLUTPalette_8u24u_C1R, src_.data<uint8_t>(), srcStep, dst_.data<uint8_t>(), dstStep, roi, bytes_,
                    bits);
    };
    for (int32_t bits : {0, 9, -1, INT32_MIN, INT32_MAX}) {
        QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, dst_, status(kRoi, 3, 11, bits));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst_, status(kNone, 3, 11, bits));
    }
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst_, status(kRoi, 3, 12, 6));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst_, status(kRoi, 4, 11, 6));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst_, status(QorImageSize{0x40000001, 1}, INT32_MAX, INT32_MAX, 6));
    EXPECT_EQ(QOR_OK, status(kRoi, 4, 12, 6));
    const auto words = [&](int32_t bits) {
        return call(qoriLUTPalette_16u8u_C1R, src_.data<uint16_t>(), 8, dst_.data<uint8_t>(), 4, kRoi, bytes_, bits);
    };
    QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, dst_, words(17));
    QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, dst_, words(0));
}

TEST_F(PaletteStatus, TablesBetweenSizeAndBits) {
    const auto check = [&](auto invoke) {
        for (size_t missing = 0; missing < 3; ++missing) {
            const uint8_t* tables[3] = {bytes_, bytes_, bytes_};
            tables[missing] = nullptr;
            QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst_, invoke(kNone, tables, 9));
            QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst_, invoke(kRoi, tables, 9));
        }
        QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, dst_, invoke(kRoi, const_cast<const uint8_t**>(three_), 9));
    };
    check([&](QorImageSize roi, const uint8_t** tables, int32_t bits) {
        return call(qoriLUTPalette_8u_C3A0C4R, src_.data<uint8_t>(), 1, 9, dst_.data<uint8_t>(), 1, roi,
                    static_cast<const uint8_t* const*>(tables), bits);
    });
    check([&](QorImageSize roi, const uint8_t** tables, int32_t bits) {
        return call(qoriLUTPalette_8u_C3R, src_.data<uint8_t>(), 1, dst_.data<uint8_t>(), 1, roi,
                    static_cast<const uint8_t* const*>(tables), bits);
    });
}

}  // namespace
}  // namespace qori::test
