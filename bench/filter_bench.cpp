// SPDX-License-Identifier: Apache-2.0
// The general linear filter; plans and buffers are made outside the timing. The peer of a row in cache is its bound: as
// many multiply-adds as the kernel takes on registers alone, one instruction for 16 pairs of integers (and the addition
// of its products) or for 8 floats. Odd rows of integer kernels count their last pair. Bytes under small kernels take
// half as many, 32 pairs at a time, and may come out ahead of the bound.
// Plain loops are so slow that they run at one size.
#include <immintrin.h>

#include <algorithm>
#include <limits>

#include "bench.h"

namespace qori::bench {
namespace {

template <class T>
constexpr int32_t kTypeCode = sizeof(T) == 1   ? 1
                              : sizeof(T) == 2 ? 7
                                               : 13;
template <class T>
constexpr const char* kTypeName = sizeof(T) == 1   ? "8u"
                                  : sizeof(T) == 2 ? "16s"
                                                   : "32f";

/// Ten independent sums on registers: enough to fill the pipelines of two multiply-adds per cycle, five cycles deep.
template <class T>
void multiplyAdds(int64_t count) {
    constexpr int kSums = 10;
    const auto zero = [] {
        if constexpr (sizeof(T) == 4)
            return _mm256_setzero_ps();
        else
            return _mm256_setzero_si256();
    };
    auto factor = zero(), a = zero(), b = a, c = a, d = a, e = a, f = a, g = a, h = a, i = a, j = a;
    const auto step = [](auto& s, auto by) {
        if constexpr (sizeof(T) == 4)
            s = _mm256_fmadd_ps(by, by, s);
        else
            s = _mm256_add_epi32(s, _mm256_madd_epi16(by, s));
        __asm__("" : "+x"(s));
    };
    __asm__("" : "+x"(factor));
    for (int64_t done = 0; done < count; done += kSums) {
        step(a, factor), step(b, factor), step(c, factor), step(d, factor), step(e, factor);
        step(f, factor), step(g, factor), step(h, factor), step(i, factor), step(j, factor);
    }
    __asm__ volatile("" : : "x"(a), "x"(b), "x"(c), "x"(d), "x"(e), "x"(f), "x"(g), "x"(h), "x"(i), "x"(j));
}

/// A kernel of the shape of a weighted mean with a negative rim, and its divisor.
template <class K>
std::vector<K> makeKernel(int side) {
    std::vector<K> kernel;
    const int middle = side / 2;
    for (int j = 0; j < side; ++j)
        for (int i = 0; i < side; ++i) {
            const int distance = std::abs(i - middle) + std::abs(j - middle);
            kernel.push_back(static_cast<K>(distance > middle ? -1 : 4 * (middle + 1 - distance)));
        }
    return kernel;
}

template <class T, int channels, class Function>
std::function<void()> oursOf(Function function, Image<T> src, Image<T> dst, QorImageSize roi, int side,
                             int32_t divisor) {
    constexpr bool isFloat = sizeof(T) == 4;
    const QorImageSize size{side, side};
    int32_t planBytes, bufferBytes;
    must(qoriFilterBorderGetSize(size, roi, kTypeCode<T>, isFloat ? 13 : 7, channels, &planBytes, &bufferBytes));
    const Block plan = allocate(static_cast<size_t>(planBytes)), buffer = allocate(static_cast<size_t>(bufferBytes));
    auto* record = reinterpret_cast<QorLinearFilterPlan*>(plan.get());
    if constexpr (isFloat)
        must(qoriFilterBorderInit_32f(makeKernel<float>(side).data(), size, 13, channels, roundNearestEven, record));
    else
        must(qoriFilterBorderInit_16s(makeKernel<int16_t>(side).data(), size, divisor, kTypeCode<T>, channels,
                                      roundNearestEven, record));
    return [=] {
        const T value[4] = {};
        must(function(src.data(), src.step(), dst.data(), dst.step(), roi, borderReplicate, value,
                      reinterpret_cast<QorLinearFilterPlan*>(plan.get()), buffer.get()));
    };
}

/// The sums alone, without a border: pixels at the edge are left out.
template <class T>
std::function<void()> plainOf(Image<T> src, Image<T> dst, int channels, int side, int32_t divisor) {
    using K = std::conditional_t<sizeof(T) == 4, float, int32_t>;
    const std::vector<K> kernel = makeKernel<K>(side);
    return [=] {
        for (int y = side; y < src.height(); ++y) {
            T* d = dst.row(y);
            for (int x = side * channels; x < src.elements(); ++x) {
                K sum = 0;
                const K* k = kernel.data();
                for (int j = 0; j < side; ++j)
                    for (int i = 0; i < side; ++i) sum += *k++ * static_cast<K>(src.row(y - j)[x - i * channels]);
                if constexpr (sizeof(T) == 4)
                    d[x] = sum;
                else
                    d[x] = static_cast<T>(
                        std::clamp<K>(sum / divisor, std::numeric_limits<T>::min(), std::numeric_limits<T>::max()));
            }
            keep(d);
        }
    };
}

constexpr Size kCached{128, 128};

template <class T, int channels, class Function>
Row row(Function function, int side, double bestAtL2 = 0, double bestAtFrame = 0, int32_t divisor = 9) {
    const auto make = [=](Size size) {
        const Image<T> src(size, channels), dst(size, channels);
        constexpr int lanes = 8;
        const int64_t perBlock = int64_t{side} * (sizeof(T) == 4 ? side : (side + 1) / 2);
        const int64_t count = size.pixels() * channels / lanes * perBlock;
        Contenders all{
            oursOf<T, channels>(function, src, dst, size.roi(), side, divisor), {}, [=] { multiplyAdds<T>(count); }};
        if (size.width == kCached.width) all.plain = plainOf(src, dst, channels, side, divisor);
        return all;
    };
    const std::string name = std::string("filter ") + std::to_string(side) + "x" + std::to_string(side) + " " +
                             kTypeName<T> + " C" + std::to_string(channels);
    return {.operation = divisor == 9 ? name : name + " divisor " + std::to_string(divisor),
            .bytesPerPixel = 2.0 * channels * sizeof(T),
            .sizes = {kCached, kL2, kFrame, kNarrow},
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame,
            .peerName = "multiply-adds"};
}

const Rows rows{{
    row<uint8_t, 1>(qoriFilterBorder_8u_C1R, 3),
    row<uint8_t, 1>(qoriFilterBorder_8u_C1R, 5, 495, 487),
    row<uint8_t, 1>(qoriFilterBorder_8u_C1R, 7, 267, 249),
    row<uint8_t, 1>(qoriFilterBorder_8u_C1R, 15),
    row<uint8_t, 3>(qoriFilterBorder_8u_C3R, 3),
    row<uint8_t, 3>(qoriFilterBorder_8u_C3R, 5, 161, 153),
    row<uint8_t, 3>(qoriFilterBorder_8u_C3R, 7, 88, 87),
    row<int16_t, 1>(qoriFilterBorder_16s_C1R, 3),
    row<int16_t, 1>(qoriFilterBorder_16s_C1R, 5),
    row<int16_t, 1>(qoriFilterBorder_16s_C1R, 7),
    row<int16_t, 1>(qoriFilterBorder_16s_C1R, 15),
    row<float, 1>(qoriFilterBorder_32f_C1R, 3),
    row<float, 1>(qoriFilterBorder_32f_C1R, 5, 1'055, 908),
    row<float, 1>(qoriFilterBorder_32f_C1R, 7, 538, 519),
    row<float, 1>(qoriFilterBorder_32f_C1R, 15),
}};

}  // namespace
}  // namespace qori::bench
