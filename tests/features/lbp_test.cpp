// SPDX-License-Identifier: Apache-2.0
#include <cmath>
#include <vector>

#include "harness/window.h"
#include "reference/border_axis.h"

namespace qori::test {
namespace {

enum Slot { kSrc, kDst };
constexpr int32_t kMirror = 3;

struct Neighbour {
    int dx, dy;
};

/// Mode 1: clockwise from the top-left corner.
const std::vector<Neighbour> kRing3 = {{-1, -1}, {0, -1}, {1, -1}, {1, 0}, {1, 1}, {0, 1}, {-1, 1}, {-1, 0}};
const std::vector<Neighbour> kRing5 = {{-2, -2}, {-1, -2}, {0, -2}, {1, -2}, {2, -2}, {2, -1}, {2, 0},  {2, 1},
                                       {2, 2},   {1, 2},   {0, 2},  {-1, 2}, {-2, 2}, {-2, 1}, {-2, 0}, {-2, -1}};

/// Neighbours of bits 0, 1, ... by the words of the header.
std::vector<Neighbour> neighboursOf(int side, int bits, int mode) {
    const std::vector<Neighbour>& ring = side == 3 ? kRing3 : kRing5;
    const size_t stride = ring.size() / static_cast<size_t>(bits);
    const size_t left = ring.size() / 8 * 7;  // the middle of the left side
    std::vector<Neighbour> neighbours;
    for (size_t i = 0; i < static_cast<size_t>(bits); ++i) {
        const size_t first = mode < 2 ? 0 : left, turned = i * stride;
        neighbours.push_back(ring[(first + (mode == 1 || mode == 3 ? turned : ring.size() - turned)) % ring.size()]);
    }
    return neighbours;
}

struct Job {
    Shape shape;
    int reach;
    int32_t border;

    bool opens(int32_t flag) const {
        return (border & 15) == borderReadAll || (border & 0xF0) == 0xF0 || (border & flag) != 0;
    }
    reference::BorderAxis columns() const { return {shape.width, opens(borderReadLeft), opens(borderReadRight)}; }
    reference::BorderAxis rows() const { return {shape.height, opens(borderReadTop), opens(borderReadBottom)}; }
    Around around() const {
        const auto side = [&](int32_t flag) { return opens(flag) ? reach : 0; };
        return {side(borderReadLeft), side(borderReadTop), side(borderReadRight), side(borderReadBottom)};
    }
};

/// Few levels, so that many neighbours are equal; of floats NaN, infinities and zeros of both signs among them.
template <class T>
T drawLevel() {
    if constexpr (std::is_floating_point_v<T>) {
        static constexpr T values[] = {-1, -0.0f, 0, 1e-42f, 1, 2, 3e38f, INFINITY, -INFINITY, NAN};
        return values[random().below(10)];
    } else {
        return random().oneIn(4) ? random().value<T>() : static_cast<T>((1 << (8 * sizeof(T) - 1)) - random().below(3));
    }
}

/// truth(pixel) makes the code of what pixel(dx, dy) gives; invoke(src, srcStep, dst, dstStep, roi, value) calls.
template <class T, class D, class Truth, class Invoke>
void checkPatterns(const Job& job, Truth truth, Invoke invoke) {
    SCOPED_TRACE(testing::Message() << "border " << job.border);
    const Around around = job.around();
    const TestImage src(kSrc, withAround(job.shape, around), sizeof(T)), dst(kDst, job.shape, sizeof(D));
    src.fill<T>(1, drawLevel<T>);
    const T value = drawLevel<T>();
    const Snapshot before = src.snapshot();
    Snapshot expected = dst.snapshot();
    const View<T> from = src.view<T>(1);
    const View<D> to = expected.view<D>(1);
    const reference::BorderAxis columns = job.columns(), rows = job.rows();
    const int32_t kind = job.border & 15;
    for (int y = 0; y < job.shape.height; ++y)
        for (int x = 0; x < job.shape.width; ++x)
            to.set(x, y, 0, static_cast<D>(truth([&](int dx, int dy) {
                       const bool missing = columns.isMissing(x + dx) || rows.isMissing(y + dy);
                       if (missing && kind == borderConstant) return value;
                       return from.get(columns.seen(x + dx, kind == kMirror) + around.left,
                                       rows.seen(y + dy, kind == kMirror) + around.top);
                   })));
    const ptrdiff_t inside = around.top * ptrdiff_t{src.step()} + around.left * static_cast<ptrdiff_t>(sizeof(T));
    auto* const region = reinterpret_cast<const T*>(src.data<uint8_t>() + inside);
    EXPECT_EQ(QOR_OK, invoke(region, src.step(), dst.data<D>(), dst.step(), job.shape.roi(), value));
    QORI_EXPECT_UNCHANGED(dst, expected);
    QORI_EXPECT_UNCHANGED(src, before);
}

int32_t drawBorder() {
    static constexpr int32_t kinds[] = {borderConstant, borderReplicate, borderReadAll, kMirror, 2, 15};
    return kinds[random().below(6)] | (random().oneIn(2) ? random().below(16) << 4 : 0);
}

template <class Check>
void sweepPatterns(int reach, int bytesPerPixel, const char* name, Check check) {
    forShapes(windowShapes(4), [&](const Shape& shape) { check(Job{shape, reach, drawBorder()}); });
    for (int32_t sides = 0; sides < 256; sides += 16)
        for (int32_t kind : {int32_t{borderConstant}, int32_t{borderReplicate}, kMirror, int32_t{borderReadAll}, 4})
            for (int width = 1; width <= 4; ++width)
                for (int height = 1; height <= 4; ++height)
                    check(Job{{.width = width, .height = height, .padding = 1}, reach, kind | sides});
    for (int width : {63, 64, 65, 66, 97})  // made in place, some rows at a time
        for (int height : {1, 3, 8, 31, 34, 65})
            check(Job{{.width = width, .height = height, .padding = random().below(3)}, reach, drawBorder()});
    for (int width : {1023, 1024, 1025, 2048, 4095, 4096, 4097, 4100, 8200, 16390})  // strips
        check(Job{{.width = width, .height = 4}, reach, drawBorder()});
    check(Job{{.width = 70, .height = 9, .padding = 3, .flipped = true}, reach, drawBorder()});
    forStreamingChoices(bytesPerPixel, 1 << 20, [&](const Shape& shape) { check(Job{shape, reach, drawBorder()}); });
    qorTestSetCacheSize(1);  // pieces that are whole and others, bands of several tiles and what is left of them
    check(Job{{.width = 16'480, .height = 45}, reach, drawBorder()});
    for (int shift : {1, 2, 16, 32, 33, 62})  // lines that begin anywhere in a row, in every row or in every second
        for (int width : {64, 192, 223, 700, 1'400})
            check(Job{{.width = width, .height = 35, .padding = -width & 31, .shift = shift}, reach, drawBorder()});
    qorTestSetCacheSize(0);
    markSwept(name);
}

/// What ordered comparisons make of it.
template <class T, class Pixel>
unsigned codeOf(const std::vector<Neighbour>& neighbours, Pixel pixel) {
    unsigned code = 0;
    const T centre = pixel(0, 0);
    for (size_t i = 0; i < neighbours.size(); ++i)
        code |= static_cast<unsigned>(pixel(neighbours[i].dx, neighbours[i].dy) >= centre) << i;
    return code;
}

template <class T, class D, class Function>
void sweepMember(const char* name, int side, Function function) {
    sweepPatterns(side / 2, sizeof(T) + sizeof(D), name, [=](const Job& job) {
        constexpr bool hasMode =
            std::is_invocable_v<Function, const T*, int32_t, D*, int32_t, QorImageSize, uint8_t, int32_t, T>;
        const auto mode = hasMode ? random().value<uint8_t>() : uint8_t{0};
        const std::vector<Neighbour> neighbours = neighboursOf(side, 8 * sizeof(D), mode % 4);
        checkPatterns<T, D>(
            job, [&](auto pixel) { return codeOf<T>(neighbours, pixel); },
            [&](const T* src, int32_t srcStep, D* dst, int32_t dstStep, QorImageSize roi, T value) {
                if constexpr (hasMode)
                    return call(function, src, srcStep, dst, dstStep, roi, mode, job.border, value);
                else
                    return call(function, src, srcStep, dst, dstStep, roi, job.border, value);
            });
    });
}

template <class S, class D, class Function>
void lbpImage(const char* name, Function function) {
    sweepMember<S, D>(name, std::string(name).find("3x3") != std::string::npos ? 3 : 5, function);
}

template <class S, class, class Function>
void lbpImageHorizCorr(const char* name, Function function) {
    sweepPatterns(1, sizeof(S) + 1, name, [=](const Job& job) {
        checkPatterns<S, uint8_t>(
            job,
            [&](auto pixel) {
                const auto column = [&](int dx) { return pixel(dx, -1) + pixel(dx, 0) + pixel(dx, 1); };
                const unsigned code = codeOf<S>(neighboursOf(3, 8, 0), pixel) & ~(1u << 1 | 1u << 5);
                return code | static_cast<unsigned>(column(-1) >= column(0)) << 1 |
                       static_cast<unsigned>(column(1) >= column(0)) << 5;
            },
            [&](const S* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, QorImageSize roi, S value) {
                return call(function, src, srcStep, dst, dstStep, roi, job.border, value);
            });
    });
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(LbpSweep, name) { operation<S, D>(#name, &name); }
#include "members/lbp.inc"
#undef QORI_MEMBER

/// The bit that each mode gives to the left neighbour, from the published table.
TEST(Lbp, PutsADarkNeighbourWhereTheModeSays) {
    uint8_t image[25], codes[25];
    std::fill_n(image, 25, uint8_t{200});
    image[12] = 10;
    static constexpr int bitsOfLeft[] = {1, 7, 0, 0}, bitsOfTop[] = {7, 1, 6, 2}, bitsOfBottomRight[] = {4, 4, 3, 5};
    for (int mode = 0; mode < 4; ++mode) {
        ASSERT_EQ(QOR_OK, qoriLBPImageMode3x3_8u_C1R(image, 5, codes, 5, {5, 5}, static_cast<uint8_t>(mode + 4),
                                                     borderReplicate, 0));
        EXPECT_EQ(255, codes[12]);
        EXPECT_EQ(255 ^ 1 << bitsOfLeft[mode], codes[13]);
        EXPECT_EQ(255 ^ 1 << bitsOfTop[mode], codes[17]);
        EXPECT_EQ(255 ^ 1 << bitsOfBottomRight[mode], codes[6]);
        EXPECT_EQ(255, codes[0]);
    }
    std::fill_n(image, 25, uint8_t{10});
    image[12] = 200;
    ASSERT_EQ(QOR_OK, qoriLBPImage3x3_8u_C1R(image, 5, codes, 5, {5, 5}, borderConstant, 0));
    EXPECT_EQ(0, codes[12]);
    EXPECT_EQ(0x83, codes[24]) << "of a corner, only the neighbours inside are not black";
}

/// Codes of bytes are every second bit of the longer ones.
TEST(Lbp, ShortCodesAreOfLongOnes) {
    uint8_t image[81], codes[81];
    uint16_t longCodes[81];
    for (uint8_t& pixel : image) pixel = random().value<uint8_t>();
    for (uint8_t mode = 0; mode < 4; ++mode) {
        ASSERT_EQ(QOR_OK, qoriLBPImageMode5x5_8u_C1R(image, 9, codes, 9, {9, 9}, mode, kMirror, 0));
        ASSERT_EQ(QOR_OK, qoriLBPImageMode5x5_8u16u_C1R(image, 9, longCodes, 18, {9, 9}, mode, kMirror, 0));
        for (int i = 0; i < 81; ++i)
            for (int bit = 0; bit < 8; ++bit) EXPECT_EQ(codes[i] >> bit & 1, longCodes[i] >> 2 * bit & 1);
    }
}

TEST(Lbp, ChecksInOrder) {
    const TestImage src(kSrc, {.width = 8, .height = 4}, 1), dst(kDst, {.width = 8, .height = 4}, 1);
    const uint8_t *s = src.data<uint8_t>(), *none = nullptr;
    uint8_t *d = dst.data<uint8_t>(), *nowhere = nullptr;
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriLBPImage3x3_8u_C1R(none, 8, d, 8, {0, 4}, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriLBPImage3x3_8u_C1R(s, 8, nowhere, 8, {0, 4}, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriLBPImage3x3_8u_C1R(s, 8, d, 8, {0, 4}, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriLBPImageHorizCorr_8u_C1R(s, 8, d, 8, {8, -4}, -1, 0));
    for (int32_t kind : {-1, 0x7FFFFF05, INT32_MIN | 0xF0})
        EXPECT_EQ(QOR_OK, qoriLBPImageMode3x3_8u_C1R(s + 9, 8, d, 8, {1, 1}, 255, kind, 0));
}

}  // namespace
}  // namespace qori::test
