// SPDX-License-Identifier: Apache-2.0
// Cross-correlation of 640 x 480 pixels. Sizes of rows are those of the results.
#include <algorithm>
#include <cmath>

#include "bench.h"

namespace qori::bench {
namespace {

constexpr Size kSource{640, 480};

template <class T>
struct Scene {
    Image<T> src, tpl;
    Image<float> dst;
    QorImageSize srcSize, tplSize;
    int32_t algorithm;
    Block buffer;

    Scene(Size source, Size pattern, int32_t kind)
        : src(source, 1),
          tpl(pattern, 1),
          dst({source.width - pattern.width + 1, source.height - pattern.height + 1}, 1),
          srcSize(source.roi()),
          tplSize(pattern.roi()),
          algorithm(kind | corrValid) {
        int32_t bytes = 0;
        must(qoriCrossCorrNormGetBufferSize(srcSize, tplSize, algorithm, &bytes));
        buffer = allocate(static_cast<size_t>(bytes));
    }

    template <class Function>
    void run(Function function) const {
        must(function(src.data(), src.step(), srcSize, tpl.data(), tpl.step(), tplSize, dst.data(), dst.step(),
                      algorithm, buffer.get()));
    }
};

/// Sums window by window.
template <class T, bool isCentred>
void correlatePlainly(const Scene<T>& scene) {
    using Sum = std::conditional_t<std::is_integral_v<T>, int32_t, float>;
    const QorImageSize t = scene.tplSize;
    double tapSum = 0, tapSquares = 0;
    for (int j = 0; j < t.height; ++j)
        for (int i = 0; i < t.width; ++i) {
            tapSum += scene.tpl.row(j)[i];
            tapSquares += double(scene.tpl.row(j)[i]) * scene.tpl.row(j)[i];
        }
    const double area = double(t.width) * t.height, norm = tapSquares - (isCentred ? tapSum * tapSum / area : 0);
    for (int y = 0; y < scene.dst.height(); ++y)
        for (int x = 0; x < scene.dst.elements(); ++x) {
            Sum sum = 0, squares = 0, cross = 0;
            for (int j = 0; j < t.height; ++j) {
                const T *const s = scene.src.row(y + j) + x, *const u = scene.tpl.row(j);
                for (int i = 0; i < t.width; ++i) {
                    sum += s[i];
                    squares += Sum(s[i]) * s[i];
                    cross += Sum(s[i]) * u[i];
                }
            }
            const double mean = isCentred ? sum / area : 0;
            scene.dst.row(y)[x] = float((cross - mean * tapSum) / std::sqrt((squares - mean * sum) * norm));
        }
}

/// The plain loop is left out where it takes a second.
template <class T, class Function>
Row correlation(const char* operation, Function function, int32_t kind, int side, double best) {
    const auto make = [=](Size) {
        const Scene<T> scene(kSource, {side, side}, kind);
        std::function<void()> plain;
        if (side <= 16)
            plain = [=] { kind == corrNorm ? correlatePlainly<T, false>(scene) : correlatePlainly<T, true>(scene); };
        return Contenders{[=] { scene.run(function); }, plain, {}, outputOf(scene.dst, 1e-4)};
    };
    return {.operation = operation,
            .bytesPerPixel = sizeof(T) + sizeof(float),
            .sizes = {{kSource.width - side + 1, kSource.height - side + 1}},
            .make = make,
            .best = best};
}

const Rows rows{{
    correlation<uint8_t>("NCC valid 8u32f 16x16", qoriCrossCorrNorm_8u32f_C1R, corrNorm, 16, 44),
    correlation<uint8_t>("zero-mean NCC valid 8u32f 16x16", qoriCrossCorrNorm_8u32f_C1R, corrNormLevel, 16, 46),
    correlation<uint8_t>("NCC valid 8u32f 64x64", qoriCrossCorrNorm_8u32f_C1R, corrNorm, 64, 32),
    correlation<uint8_t>("zero-mean NCC valid 8u32f 64x64", qoriCrossCorrNorm_8u32f_C1R, corrNormLevel, 64, 33),
    correlation<float>("zero-mean NCC valid 32f 16x16", qoriCrossCorrNorm_32f_C1R, corrNormLevel, 16, 43),
    correlation<float>("zero-mean NCC valid 32f 64x64", qoriCrossCorrNorm_32f_C1R, corrNormLevel, 64, 26),
    correlation<uint16_t>("zero-mean NCC valid 16u32f 16x16", qoriCrossCorrNorm_16u32f_C1R, corrNormLevel, 16, 0),
}};

/// By the side of the template, whichever way is taken; a result costs no more than the side's proportion.
template <class T, class Function>
Ladder sides(const char* operation, Function function, std::vector<int> values) {
    return {operation, [=] {
                std::vector<Step> steps;
                for (int side : values) {
                    const Scene<T> scene(kSource, {side, side}, corrNormLevel);
                    steps.push_back({std::to_string(side), double(side), [=] { scene.run(function); }});
                }
                return steps;
            }};
}
const std::vector<int> kSides = {3,  4,  5,  6,  7,  8,  9,  10, 11, 12,  14,  16,  18,  20,  22,
                                 24, 27, 30, 34, 39, 45, 52, 64, 80, 100, 128, 160, 192, 224, 256};

/// Small sources: what a call costs beside its sums.
Ladder sources() {
    return {"zero-mean NCC 8u32f, template 9x9, side of the source", [] {
                std::vector<Step> steps;
                for (int side : {9, 10, 12, 16, 20, 24, 32, 45, 64, 91, 128, 181, 256, 362, 512, 724, 1024}) {
                    const Scene<uint8_t> scene({side, side}, {9, 9}, corrNormLevel);
                    steps.push_back(
                        {std::to_string(side), double(side) * side, [=] { scene.run(qoriCrossCorrNorm_8u32f_C1R); }});
                }
                return steps;
            }};
}

const Ladders ladders{{sides<uint8_t>("zero-mean NCC 8u32f, template side", qoriCrossCorrNorm_8u32f_C1R, kSides),
                       sides<float>("zero-mean NCC 32f, template side", qoriCrossCorrNorm_32f_C1R, kSides), sources()}};

}  // namespace
}  // namespace qori::bench
