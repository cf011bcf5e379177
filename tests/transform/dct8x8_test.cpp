// SPDX-License-Identifier: Apache-2.0
#include <array>

#include "harness/sweep.h"
#include "reference/dct.h"

namespace qori::test {
namespace {

using Words = std::array<int16_t, 64>;
using Coefficients = std::vector<double>;
constexpr int kWords = 64 * 2, kSrcSlot = 0, kDstSlot = 1;

#define QORI_SWEPT(name) (markSwept(#name), name)

template <class T>
Coefficients doubles(const T& block) {
    return {block.begin(), block.end()};
}

/// Elements from -most - 1 to most, sometimes few of them, sometimes all at an end.
Words drawWords(int most) {
    Words block{};
    const int way = random().below(4);
    const auto any = [=] { return random().below(2 * most + 2) - most - 1; };
    for (int16_t& word : block)
        word = static_cast<int16_t>(way == 0                  ? any()
                                    : way == 1                ? (random().oneIn(2) ? most : -most - 1)
                                    : random().oneIn(way * 4) ? any()
                                                              : 0);
    return block;
}

/// Signs of one product of cosines: what makes its coefficient as large as it can be.
Words signsOf(int frequency, int positive, int negative) {
    Coefficients only(64);
    only[static_cast<size_t>(frequency)] = 1;
    const Coefficients basis = reference::blockTransform(only, true);
    Words block;
    for (size_t i = 0; i < 64; ++i) block[i] = static_cast<int16_t>(basis[i] >= 0 ? positive : negative);
    return block;
}

using WordFunction = QorResult(QORI_CALL*)(const int16_t*, int16_t*);
using InPlace = QorResult(QORI_CALL*)(int16_t*);

/// Calls both forms, from and to memory that ends at a guard page, and compares them; the source stays as it is.
Words run(WordFunction function, InPlace inPlace, const Words& in, int shift = 0) {
    const TestImage src = block(kSrcSlot, kWords, shift), dst = block(kDstSlot, kWords, shift % 7);
    std::memcpy(src.data<uint8_t>(), in.data(), kWords);
    std::memcpy(dst.data<uint8_t>(), in.data(), kWords);
    const Snapshot before = src.snapshot();
    EXPECT_EQ(QOR_OK, call(function, src.data<const int16_t>(), dst.data<int16_t>()));
    QORI_EXPECT_UNCHANGED(src, before);
    Words out, again;
    std::memcpy(out.data(), dst.data<uint8_t>(), kWords);
    EXPECT_EQ(QOR_OK, call(inPlace, src.data<int16_t>()));
    std::memcpy(again.data(), src.data<uint8_t>(), kWords);
    EXPECT_EQ(out, again);
    return out;
}

Words forward(const Words& in) { return run(qoriDCT8x8Fwd_16s_C1, qoriDCT8x8Fwd_16s_C1I, in, random().below(9)); }
Words inverse(const Words& in) { return run(qoriDCT8x8Inv_16s_C1, qoriDCT8x8Inv_16s_C1I, in, random().below(9)); }

/// Every element within 1 of the exact one, rounded.
void expectNear(const Coefficients& exact, const Words& words, const char* what, int parameter) {
    for (size_t i = 0; i < 64; ++i)
        ASSERT_LE(std::abs(reference::roundedWord(exact[i]) - words[i]), 1)
            << what << ' ' << parameter << ", element " << i << ": " << exact[i];
}

// --- floats ---------------------------------------------------------------------------------------------------------

template <class Function, class InPlaceFunction>
void checkFloats(Function function, InPlaceFunction inPlace, bool isInverse) {
    for (int turn = 0; turn < 2'000; ++turn) {
        const TestImage src = block(kSrcSlot, 256, turn % 17), dst = block(kDstSlot, 256, turn % 5);
        const float size = std::ldexp(1.0f, random().below(60) - 30);
        Coefficients in;
        for (int i = 0; i < 64; ++i) {
            const float value = random().oneIn(1 + turn % 9) ? size * drawPixel<float>() : 0;
            src.view<float>(1).set(i, 0, 0, value);
            in.push_back(static_cast<double>(value));
        }
        const Snapshot before = src.snapshot();
        ASSERT_EQ(QOR_OK, call(function, src.data<const float>(), dst.data<float>()));
        QORI_EXPECT_UNCHANGED(src, before);
        const Coefficients exact = reference::blockTransform(in, isInverse);
        double squares = 0;
        for (double value : in) squares += value * value;
        for (int i = 0; i < 64; ++i)
            ASSERT_NEAR(exact[static_cast<size_t>(i)], static_cast<double>(dst.view<float>(1).get(i, 0)),
                        std::sqrt(squares) * 0x1p-22)
                << "element " << i;
        ASSERT_EQ(QOR_OK, call(inPlace, src.data<float>()));
        ASSERT_EQ(0, std::memcmp(src.data<uint8_t>(), dst.data<uint8_t>(), 256));
    }
}

TEST(Dct8x8, FloatsBothWays) {
    checkFloats(QORI_SWEPT(qoriDCT8x8Fwd_32f_C1), QORI_SWEPT(qoriDCT8x8Fwd_32f_C1I), false);
    checkFloats(QORI_SWEPT(qoriDCT8x8Inv_32f_C1), QORI_SWEPT(qoriDCT8x8Inv_32f_C1I), true);
}

/// A constant has one coefficient, exactly, and that one makes the constant.
TEST(Dct8x8, ConstantBlocks) {
    for (int c = -32768; c <= 32767; c += c > -600 && c < 600 ? 1 : 61) {
        Words constant, alone{};
        constant.fill(static_cast<int16_t>(c));
        alone[0] = static_cast<int16_t>(std::clamp(8 * c, -32768, 32767));
        ASSERT_EQ(alone, forward(constant)) << c;
        alone[0] = static_cast<int16_t>(c);
        constant.fill(static_cast<int16_t>((c + 4) >> 3));
        ASSERT_EQ(constant, inverse(alone)) << c;
        float floats[64];
        std::fill_n(floats, 64, static_cast<float>(c));
        ASSERT_EQ(QOR_OK, call(qoriDCT8x8Fwd_32f_C1I, floats));
        ASSERT_EQ(static_cast<float>(8 * c), floats[0]);
        for (int i = 1; i < 64; ++i) ASSERT_EQ(0, floats[i]);
        ASSERT_EQ(QOR_OK, call(qoriDCT8x8Inv_32f_C1I, floats));
        for (float pixel : floats) ASSERT_EQ(static_cast<float>(c), pixel);
    }
}

// --- words ----------------------------------------------------------------------------------------------------------

TEST(Dct8x8, ForwardWords) {
    markSwept("qoriDCT8x8Fwd_16s_C1");
    markSwept("qoriDCT8x8Fwd_16s_C1I");
    for (int most : {1, 5, 127, 254, 255, 256, 257, 511, 1023, 2047, 16383, 32767}) {
        for (int turn = 0; turn < 400; ++turn) {
            const Words in = drawWords(most);
            expectNear(reference::blockTransform(doubles(in), false), forward(in), "pixels to", most);
        }
        for (int frequency = 0; frequency < 64; ++frequency) {
            const Words largest = signsOf(frequency, most, -most - 1), smallest = signsOf(frequency, -most - 1, most);
            expectNear(reference::blockTransform(doubles(largest), false), forward(largest), "pixels of", most);
            expectNear(reference::blockTransform(doubles(smallest), false), forward(smallest), "pixels of", most);
        }
        if (HasFatalFailure()) return;
    }
}

/// The 16-bit lanes end where they have to: one pixel beyond makes the same block a wide one.
TEST(Dct8x8, ForwardWordsAtTheEndOfTheLanes) {
    for (int position = 0; position < 64; ++position)
        for (int pixel : {-257, -256, 255, 256, -32768, 32767}) {
            Words in = drawWords(255);
            in[static_cast<size_t>(position)] = static_cast<int16_t>(pixel);
            expectNear(reference::blockTransform(doubles(in), false), forward(in), "one pixel of", pixel);
        }
}

TEST(Dct8x8, InverseWords) {
    markSwept("qoriDCT8x8Inv_16s_C1");
    markSwept("qoriDCT8x8Inv_16s_C1I");
    for (int most : {1, 40, 255, 600, 1023, 2047, 4095, 8190, 8191, 8192, 16383, 32767}) {
        for (int turn = 0; turn < 600; ++turn) {
            const Words in = drawWords(most);
            expectNear(reference::blockTransform(doubles(in), true), inverse(in), "coefficients to", most);
        }
        for (int i = 0; i < 64; ++i)  // all at their ends, so that one pixel has the sum of all
            for (int scale : {1, -1}) {
                Words in = signsOf(i, most, -most);
                for (int16_t& word : in) word = static_cast<int16_t>(word * scale);
                expectNear(reference::blockTransform(doubles(in), true), inverse(in), "coefficients of", most);
            }
        if (HasFatalFailure()) return;
    }
}

/// Coefficients of pixels of which some sums leave 16 bits and others do not: rows, columns and products of cosines of
/// all sizes around the end of the lanes.
TEST(Dct8x8, InverseWordsAroundTheEndOfTheLanes) {
    for (int turn = 0; turn < 60'000; ++turn) {
        const int most = 200 + random().below(800);
        Words pixels{};
        const int way = random().below(3);
        if (way == 0) {
            pixels = signsOf(random().below(64), most, -most);
        } else {
            const int u = random().below(8), v = random().below(8);
            for (size_t i = 0; i < 64; ++i)
                pixels[i] = static_cast<int16_t>((way == 1 ? i % 8 == static_cast<size_t>(u) : random().oneIn(2)) ? most
                                                 : i / 8 == static_cast<size_t>(v) ? -most
                                                                                   : 0);
        }
        const Coefficients exact = reference::blockTransform(doubles(pixels), false);
        Words in;
        for (size_t i = 0; i < 64; ++i) in[i] = static_cast<int16_t>(reference::roundedWord(exact[i]));
        for (int extra = random().below(3); extra > 0; --extra)
            in[static_cast<size_t>(random().below(64))] = static_cast<int16_t>(random().below(16384) - 8192);
        expectNear(reference::blockTransform(doubles(in), true), inverse(in), "turn", turn);
        if (HasFatalFailure()) return;
    }
}

/// Rows that make a single large element: its products sum to 2^32, which 32 bits take for 0.
TEST(Dct8x8, InverseOfRowsBeyond32Bits) {
    for (int row : {1, 7})
        for (int x = 0; x < 8; ++x)
            for (int sign : {1, -1}) {
                Words in{};
                for (int u = 0; u < 8; ++u) {
                    const double element = sign * 65536 / std::cos(std::acos(-1.0) / 16);
                    const double coefficient = element * reference::CosineBasis(8)(u, x);
                    in[static_cast<size_t>(8 * row + u)] = static_cast<int16_t>(reference::roundedWord(coefficient));
                }
                expectNear(reference::blockTransform(doubles(in), true), inverse(in), "element", x);
            }
}

// --- accuracy of the inverse as IEEE 1180-1990 measures it ----------------------------------------------------------

/// The standard's generator: integers from -low to high.
class StandardRandom {
public:
    int next(int low, int high) {
        state_ = state_ * 1103515245u + 12345u;
        const double part = static_cast<double>(state_ & 0x7FFFFFFE) / 0x7FFFFFFF;
        return static_cast<int>(part * (low + high + 1)) - low;
    }

private:
    uint32_t state_ = 1;
};

struct Errors {
    std::array<double, 64> sum{}, squares{};
    int peak = 0;

    void add(size_t i, int error) {
        sum[i] += error;
        squares[i] += error * error;
        peak = std::max(peak, std::abs(error));
    }
    void expectWithin(int blocks) const {
        double allSum = 0, allSquares = 0;
        for (size_t i = 0; i < 64; ++i) {
            EXPECT_LE(std::abs(sum[i]) / blocks, 0.015) << "element " << i;
            EXPECT_LE(squares[i] / blocks, 0.06) << "element " << i;
            allSum += sum[i];
            allSquares += squares[i];
        }
        EXPECT_LE(std::abs(allSum) / (64.0 * blocks), 0.0015);
        EXPECT_LE(allSquares / (64.0 * blocks), 0.02);
        EXPECT_LE(peak, 1);
    }
};

Errors measureInverse(int low, int high, int sign, int blocks, WordFunction function) {
    StandardRandom standard;
    Errors errors;
    const auto clipped = [](double value) { return std::clamp(static_cast<int>(std::floor(value + 0.5)), -256, 255); };
    for (int n = 0; n < blocks; ++n) {
        Coefficients pixels;
        for (int i = 0; i < 64; ++i) pixels.push_back(sign * standard.next(low, high));
        Words in, out;
        const Coefficients exact = reference::blockTransform(pixels, false);
        for (size_t i = 0; i < 64; ++i)
            in[i] = static_cast<int16_t>(std::clamp(static_cast<int>(std::floor(exact[i] + 0.5)), -2048, 2047));
        const Coefficients expected = reference::blockTransform(doubles(in), true);
        EXPECT_EQ(QOR_OK, function(in.data(), out.data()));
        for (size_t i = 0; i < 64; ++i) errors.add(i, clipped(out[i]) - clipped(expected[i]));
    }
    return errors;
}

TEST(Dct8x8, InverseMeetsTheStandard) {
    constexpr int kBlocks = 10'000;
    for (const WordFunction function : {qoriDCT8x8Inv_16s_C1, QORI_SWEPT(qoriDCT8x8Inv_A10_16s_C1)}) {
        for (const auto& range : {std::array{256, 255}, std::array{5, 5}, std::array{300, 300}})
            for (int sign : {1, -1}) {
                SCOPED_TRACE(testing::Message() << "-" << range[0] << " to " << range[1] << ", times " << sign);
                measureInverse(range[0], range[1], sign, kBlocks, function).expectWithin(kBlocks);
            }
        const Words zeros{};
        Words out;
        out.fill(9);
        EXPECT_EQ(QOR_OK, call(function, zeros.data(), out.data()));
        EXPECT_EQ(zeros, out);
    }
}

/// Nearest but for pixels very close to a half.
TEST(Dct8x8, InverseForTenBits) {
    for (int turn = 0; turn < 2'000; ++turn) {
        const Words in = drawWords(turn % 2 == 0 ? 8191 : 32767);
        const Words out = run(qoriDCT8x8Inv_A10_16s_C1, QORI_SWEPT(qoriDCT8x8Inv_A10_16s_C1I), in);
        const Coefficients exact = reference::blockTransform(doubles(in), true);
        for (size_t i = 0; i < 64; ++i)
            ASSERT_LE(std::abs(std::clamp(exact[i], -32768.0, 32767.0) - out[i]), 0.5 + 0x1p-6) << turn;
    }
}

// --- images ---------------------------------------------------------------------------------------------------------

const Shape kPlaces[] = {
    {8, 8}, {8, 8, 3}, {8, 8, 40, false, true}, {8, 8, 0, false, true, 1}, {8, 8, 1, false, false, 5}};

/// A block in an image; pixel by pixel what get(i) says.
template <class T, class Get>
TestImage imageOf(const Shape& shape, Get get) {
    const TestImage image(kSrcSlot, shape, sizeof(T));
    for (int i = 0; i < 64; ++i) image.view<T>(1).set(i % 8, i / 8, 0, get(static_cast<size_t>(i)));
    return image;
}

template <class T>
Words wordsOf(const TestImage& image) {
    Words words;
    for (int i = 0; i < 64; ++i)
        words[static_cast<size_t>(i)] = static_cast<int16_t>(image.view<T>(1).get(i % 8, i / 8));
    return words;
}

Words forwardOf(const Words& in) {
    Words out;
    EXPECT_EQ(QOR_OK, qoriDCT8x8Fwd_16s_C1(in.data(), out.data()));
    return out;
}
Words inverseOf(const Words& in) {
    Words out;
    EXPECT_EQ(QOR_OK, qoriDCT8x8Inv_16s_C1(in.data(), out.data()));
    return out;
}

/// Forward from the image, which stays as it is, to coefficients at a guard page.
template <class Call>
void expectForward(const TestImage& src, const Words& pixels, Call function) {
    const TestImage dst = block(kDstSlot, kWords);
    const Snapshot before = src.snapshot();
    EXPECT_EQ(QOR_OK, function(dst.data<int16_t>()));
    QORI_EXPECT_UNCHANGED(src, before);
    Words made;
    std::memcpy(made.data(), dst.data<uint8_t>(), kWords);
    EXPECT_EQ(forwardOf(pixels), made);
}

TEST(Dct8x8, ForwardFromImages) {
    for (int turn = 0; turn < 300; ++turn)
        for (const Shape& shape : kPlaces) {
            const Words words = drawWords(turn % 3 == 0 ? 255 : turn % 3 == 1 ? 256 : 32767);
            const TestImage ofWords = imageOf<int16_t>(shape, [&](size_t i) { return words[i]; });
            expectForward(ofWords, words, [&](int16_t* dst) {
                return call(QORI_SWEPT(qoriDCT8x8Fwd_16s_C1R), ofWords.data<const int16_t>(), ofWords.step(), dst);
            });
            const TestImage bytes = imageOf<uint8_t>(shape, [](size_t) { return random().value<uint8_t>(); });
            expectForward(bytes, wordsOf<uint8_t>(bytes), [&](int16_t* dst) {
                return call(QORI_SWEPT(qoriDCT8x8Fwd_8u16s_C1R), bytes.data<const uint8_t>(), bytes.step(), dst);
            });
            const int shifts[] = {-128, 0, -256, -257, 1, 32767, -32768, random().value<int16_t>()};
            const auto addVal = static_cast<int16_t>(shifts[turn % 8]);
            Words raised = wordsOf<uint8_t>(bytes);
            for (int16_t& pixel : raised) pixel = static_cast<int16_t>(pixel + addVal);
            expectForward(bytes, raised, [&](int16_t* dst) {
                return call(QORI_SWEPT(qoriDCT8x8FwdLS_8u16s_C1R), bytes.data<const uint8_t>(), bytes.step(), dst,
                            addVal);
            });
        }
}

template <class D, class Function, class Get>
void expectInverse(const Shape& shape, const Words& coefficients, Function function, Get get) {
    const TestImage src = block(kSrcSlot, kWords), dst(kDstSlot, shape, sizeof(D));
    std::memcpy(src.data<uint8_t>(), coefficients.data(), kWords);
    const Snapshot before = src.snapshot();
    Snapshot expected = dst.snapshot();
    const Words pixels = inverseOf(coefficients);
    for (int i = 0; i < 64; ++i) expected.view<D>(1).set(i % 8, i / 8, 0, get(pixels[static_cast<size_t>(i)]));
    EXPECT_EQ(QOR_OK, function(src.data<const int16_t>(), dst.data<D>(), dst.step()));
    EXPECT_EQ("", dst.difference(expected)) << describe(shape);
    QORI_EXPECT_UNCHANGED(src, before);
}

uint8_t asByte(int value) { return static_cast<uint8_t>(std::clamp(value, 0, 255)); }

TEST(Dct8x8, InverseIntoImages) {
    for (int turn = 0; turn < 400; ++turn)
        for (const Shape& shape : kPlaces) {
            const Words in = drawWords(turn % 4 == 0 ? 32767 : 1 << turn % 13);
            expectInverse<int16_t>(
                shape, in,
                [](const int16_t* src, int16_t* dst, int32_t step) {
                    return call(QORI_SWEPT(qoriDCT8x8Inv_16s_C1R), src, dst, step);
                },
                [](int16_t pixel) { return pixel; });
            expectInverse<uint8_t>(
                shape, in,
                [](const int16_t* src, uint8_t* dst, int32_t step) {
                    return call(QORI_SWEPT(qoriDCT8x8Inv_16s8u_C1R), src, dst, step);
                },
                asByte);
            const auto addVal = random().oneIn(2) ? int16_t{128} : random().value<int16_t>();
            const auto down = random().value<uint8_t>(), up = random().value<uint8_t>();
            expectInverse<uint8_t>(
                shape, in,
                [=](const int16_t* src, uint8_t* dst, int32_t step) {
                    return call(QORI_SWEPT(qoriDCT8x8InvLSClip_16s8u_C1R), src, dst, step, addVal, down, up);
                },
                [=](int16_t pixel) {
                    return std::min(std::max(asByte(static_cast<int16_t>(pixel + addVal)), down), up);
                });
            if (HasFailure()) return;
        }
}

// --- few coefficients, few pixels -----------------------------------------------------------------------------------

void checkLow(int n, WordFunction function, InPlace inPlace) {
    for (int turn = 0; turn < 3'000; ++turn) {
        Words in = drawWords(turn % 5 == 0 ? 32767 : turn % 5 == 1 ? 8191 : 1 << turn % 12), low = in;
        for (int i = 0; i < 64; ++i)
            if (i % 8 >= n || i / 8 >= n) low[static_cast<size_t>(i)] = 0;
        ASSERT_EQ(inverseOf(low), run(function, inPlace, in)) << n << ", turn " << turn;
    }
}

TEST(Dct8x8, FewCoefficients) {
    checkLow(2, QORI_SWEPT(qoriDCT8x8Inv_2x2_16s_C1), QORI_SWEPT(qoriDCT8x8Inv_2x2_16s_C1I));
    checkLow(4, QORI_SWEPT(qoriDCT8x8Inv_4x4_16s_C1), QORI_SWEPT(qoriDCT8x8Inv_4x4_16s_C1I));
}

/// n x n pixels and nothing else; exact ones lie within `beyond` of half a unit.
void checkFewPixels(int n, WordFunction function, InPlace inPlace, double beyond) {
    for (int turn = 0; turn < 3'000; ++turn) {
        const Words in = drawWords(1 << turn % 16);
        const Words out = run(function, inPlace, in);
        Coefficients low;
        for (int i = 0; i < n * n; ++i) low.push_back(in[static_cast<size_t>(i / n * 8 + i % n)] * n / 8.0);
        const Coefficients exact = reference::cosineTransform(low, n, n, true);
        for (size_t i = 0; i < 64; ++i) {
            if (i >= exact.size())
                ASSERT_EQ(in[i], out[i]) << "written beyond the pixels";
            else
                ASSERT_LE(std::abs(std::clamp(exact[i], -32768.0, 32767.0) - out[i]), 0.5 + beyond) << turn;
        }
    }
    Words constant{};
    for (int c = -40; c < 40; ++c) {
        constant[0] = static_cast<int16_t>(c);
        const Words out = run(function, inPlace, constant);
        for (int i = 0; i < n * n; ++i) ASSERT_EQ((c + 4) >> 3, out[static_cast<size_t>(i)]) << "halves go up";
    }
}

TEST(Dct8x8, FewPixels) {
    checkFewPixels(2, QORI_SWEPT(qoriDCT8x8To2x2Inv_16s_C1), QORI_SWEPT(qoriDCT8x8To2x2Inv_16s_C1I), 1e-9);
    checkFewPixels(4, QORI_SWEPT(qoriDCT8x8To4x4Inv_16s_C1), QORI_SWEPT(qoriDCT8x8To4x4Inv_16s_C1I), 0x1p-6);
}

// --- order ----------------------------------------------------------------------------------------------------------

/// ITU-T T.81, figure 5.
constexpr uint8_t kOrder[64] = {0,  1,  8,  16, 9,  2,  3,  10, 17, 24, 32, 25, 18, 11, 4,  5,  12, 19, 26, 33, 40, 48,
                                41, 34, 27, 20, 13, 6,  7,  14, 21, 28, 35, 42, 49, 56, 57, 50, 43, 36, 29, 22, 15, 23,
                                30, 37, 44, 51, 58, 59, 52, 45, 38, 31, 39, 46, 53, 60, 61, 54, 47, 55, 62, 63};

TEST(Dct8x8, ZigZag) {
    const Words in = drawWords(32767);
    for (int shift = 0; shift < 35; ++shift) {
        const TestImage src = block(kSrcSlot, kWords, shift), scan = block(kDstSlot, kWords, shift / 2),
                        back = block(2, kWords);
        std::memcpy(src.data<uint8_t>(), in.data(), kWords);
        const Snapshot before = src.snapshot();
        ASSERT_EQ(QOR_OK, call(QORI_SWEPT(qoriZigzagFwd8x8_16s_C1), src.data<const int16_t>(), scan.data<int16_t>()));
        QORI_EXPECT_UNCHANGED(src, before);
        for (int i = 0; i < 64; ++i) ASSERT_EQ(in[kOrder[i]], scan.view<int16_t>(1).get(i, 0)) << i;
        ASSERT_EQ(QOR_OK, call(QORI_SWEPT(qoriZigzagInv8x8_16s_C1), scan.data<const int16_t>(), back.data<int16_t>()));
        ASSERT_EQ(0, std::memcmp(in.data(), back.data<uint8_t>(), kWords));
        ASSERT_EQ(QOR_OK, call(qoriZigzagInv8x8_16s_C1, scan.data<const int16_t>(), scan.data<int16_t>()));
        ASSERT_EQ(0, std::memcmp(in.data(), scan.data<uint8_t>(), kWords)) << "in place";
    }
}

TEST(Dct8x8, ChecksInOrder) {
    const TestImage out = block(kDstSlot, kWords);
    const int16_t* const none = nullptr;
    auto* const words = out.data<int16_t>();
    auto* const bytes = out.data<uint8_t>();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriDCT8x8Fwd_16s_C1R(none, 0, words));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, qoriDCT8x8Fwd_16s_C1R(words, 0, words));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, qoriDCT8x8FwdLS_8u16s_C1R(bytes, -8, words, 300));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriDCT8x8InvLSClip_16s8u_C1R(none, bytes, -1, 0, 1, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, qoriDCT8x8InvLSClip_16s8u_C1R(words, bytes, INT32_MIN, 0, 1, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, out, qoriDCT8x8Inv_16s8u_C1R(words, bytes, 0));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriDCT8x8To2x2Inv_16s_C1I(nullptr));
}

}  // namespace
}  // namespace qori::test
