// SPDX-License-Identifier: Apache-2.0
// Cosine transforms: 4,096 blocks of 8x8 one behind the other or in an image of 512x512, and whole images.
#include <cmath>

#include "bench.h"

namespace qori::bench {
namespace {

constexpr int kBlocks = 4096;
constexpr Size kBlockRows{64, kBlocks}, kBlockImage{512, 512};

/// The basis of 8 points as a loop would have it at hand.
struct PlainBasis {
    float weight[8][8];

    PlainBasis() : weight() {
        for (int k = 0; k < 8; ++k)
            for (int x = 0; x < 8; ++x)
                weight[k][x] = static_cast<float>(std::cos((2 * x + 1) * k * std::acos(-1.0) / 16) *
                                                  (k == 0 ? std::sqrt(0.125) : 0.5));
    }
};
const PlainBasis kBasis;

/// Rows, then columns, each coefficient a sum of eight products.
template <bool inverse, class S, class D>
void plainBlock(const S* src, D* dst) {
    float rows[64];
    const auto weight = [](int k, int x) { return inverse ? kBasis.weight[x][k] : kBasis.weight[k][x]; };
    for (int y = 0; y < 8; ++y)
        for (int k = 0; k < 8; ++k) {
            float sum = 0;
            for (int x = 0; x < 8; ++x) sum += static_cast<float>(src[8 * y + x]) * weight(k, x);
            rows[8 * y + k] = sum;
        }
    for (int k = 0; k < 8; ++k)
        for (int x = 0; x < 8; ++x) {
            float sum = 0;
            for (int y = 0; y < 8; ++y) sum += rows[8 * y + x] * weight(k, y);
            if constexpr (std::is_integral_v<D>)
                dst[8 * k + x] = static_cast<D>(std::lrintf(sum));
            else
                dst[8 * k + x] = sum;
        }
}

Row blockRow(std::string name, double bytesPerPixel, std::function<Contenders(Size)> make, double best) {
    return {.operation = std::move(name),
            .bytesPerPixel = bytesPerPixel,
            .sizes = {kBlockImage},
            .make = std::move(make),
            .best = best};
}

/// Pixels of bytes around 0, or the coefficients of such pixels.
template <class T>
Image<T> blocksOf(bool coefficients) {
    const Image<T> blocks(kBlockRows, 1, true);
    for (int i = 0; i < kBlocks; ++i) {
        for (int j = 0; j < 64; ++j) blocks.row(i)[j] = static_cast<T>((i * 37 + j * j * 11 + i * j) % 256 - 128);
        if (coefficients) plainBlock<false>(blocks.row(i), blocks.row(i));
    }
    return blocks;
}

/// One block behind the other.
template <bool inverse, class T>
Row contiguous(const char* name, QorResult(QORI_CALL* function)(const T*, T*), double best = 0, bool hasPlain = true) {
    return blockRow(
        name, 2.0 * sizeof(T),
        [=](Size) {
            const Image<T> src = blocksOf<T>(inverse), dst(kBlockRows, 1, true);
            const auto plain = [=] {
                for (int i = 0; i < kBlocks; ++i) plainBlock<inverse>(src.row(i), dst.row(i));
                keep(dst.data());
            };
            return Contenders{[=] {
                                  for (int i = 0; i < kBlocks; ++i) must(function(src.row(i), dst.row(i)));
                              },
                              hasPlain ? std::function<void()>(plain) : std::function<void()>{},
                              {},
                              hasPlain && std::is_floating_point_v<T> ? outputOf(dst, 1e-4) : Output{}};
        },
        best);
}

/// Blocks of an image of elements T: call(pixels, step, coefficients).
template <class T, class Call>
Row inImage(const char* name, bool inverse, Call call, double best = 0) {
    return blockRow(
        name, 2.0 + sizeof(T),
        [=](Size size) {
            const Image<int16_t> coefficients = blocksOf<int16_t>(inverse);
            const Image<T> pixels(size, 1);
            return Contenders{
                [=] {
                    for (int i = 0; i < kBlocks; ++i)
                        must(call(pixels.row(i / 64 * 8) + i % 64 * 8, pixels.step(), coefficients.row(i)));
                },
                {},
                {}};
        },
        best);
}

/// The transform of an image, its plan made before.
template <int channels, class Function>
std::function<void()> imageTransform(Size size, Function function) {
    int32_t planBytes, initBytes, bufferBytes;
    must(qoriDCTFwdGetSize_32f(size.roi(), hintFast, &planBytes, &initBytes, &bufferBytes));
    const Block memory = allocate(static_cast<size_t>(planBytes)), buffer = allocate(static_cast<size_t>(bufferBytes));
    const Block init = allocate(static_cast<size_t>(initBytes) + 1);
    auto* const plan = reinterpret_cast<QorDct2DPlan*>(memory.get());
    must(qoriDCTFwdInit_32f(size.roi(), hintFast, plan, init.get()));
    const Image<float> src(size, channels), dst(size, channels);
    return [=, keptMemory = memory] {
        must(function(src.data(), src.step(), dst.data(), dst.step(), plan, buffer.get()));
    };
}

template <int channels, class Function>
Row image(const char* name, Function function) {
    return {.operation = name,
            .bytesPerPixel = 8.0 * channels,
            .sizes = {kL1, kL2, kFrame, {509, 509}},
            .make = [=](Size size) {
                return Contenders{imageTransform<channels>(size, function), {}, {}};
            }};
}

const Rows rows{{
    contiguous<false>("dct 8x8 forward 16s", qoriDCT8x8Fwd_16s_C1, 2'041),
    contiguous<true>("dct 8x8 inverse 16s", qoriDCT8x8Inv_16s_C1, 946),
    contiguous<false>("dct 8x8 forward 32f", qoriDCT8x8Fwd_32f_C1, 2'095),
    contiguous<true>("dct 8x8 inverse 32f", qoriDCT8x8Inv_32f_C1, 1'472),
    contiguous<true>("dct 8x8 inverse 4x4 16s", qoriDCT8x8Inv_4x4_16s_C1, 0, false),
    contiguous<true>("dct 8x8 inverse 2x2 16s", qoriDCT8x8Inv_2x2_16s_C1, 0, false),
    contiguous<true>("dct 8x8 to 4x4 16s", qoriDCT8x8To4x4Inv_16s_C1, 0, false),
    contiguous<true>("dct 8x8 inverse A10 16s", qoriDCT8x8Inv_A10_16s_C1, 0, false),
    contiguous<false>("zigzag 16s", qoriZigzagFwd8x8_16s_C1, 0, false),
    inImage<uint8_t>(
        "dct 8x8 inverse, level shift, clip 16s8u", true,
        [](uint8_t* pixels, int32_t step, const int16_t* coefficients) {
            return qoriDCT8x8InvLSClip_16s8u_C1R(coefficients, pixels, step, 128, 0, 255);
        },
        2'341),
    inImage<uint8_t>("dct 8x8 forward, level shift 8u16s", false,
                     [](const uint8_t* pixels, int32_t step, int16_t* coefficients) {
                         return qoriDCT8x8FwdLS_8u16s_C1R(pixels, step, coefficients, -128);
                     }),
    image<1>("dct forward 32f C1", qoriDCTFwd_32f_C1R),
    image<1>("dct inverse 32f C1", qoriDCTInv_32f_C1R),
    image<3>("dct forward 32f C3", qoriDCTFwd_32f_C3R),
}};

/// Squares, in pixels times the logarithm: powers of two, their neighbours, primes.
const Ladders squares{{{"dct forward 32f C1, squares",
                        [] {
                            std::vector<Step> steps;
                            for (int side : {8,   12,  16,  24,  32,  48,  64,  67,  96,  97,  127,  128,  129, 192,
                                             256, 257, 360, 384, 509, 512, 521, 640, 720, 768, 1000, 1009, 1024})
                                steps.push_back({std::to_string(side), 1.0 * side * side * std::log2(side),
                                                 imageTransform<1>({side, side}, qoriDCTFwd_32f_C1R)});
                            return steps;
                        },
                        "lengths with a large prime factor go through a convolution of more than twice their length"}}};

}  // namespace
}  // namespace qori::bench
