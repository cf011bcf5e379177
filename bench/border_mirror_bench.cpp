// SPDX-License-Identifier: Apache-2.0
// Border copies and reflections, which move every pixel once.
#include "bench.h"

namespace qori::bench {
namespace {

struct Best {
    double atL2 = 0, atFrame = 0;
};

const std::vector<Size> kMirrorSizes = {kL1, kL2, kFrame, kNarrow, kSmall};

/// The source pixel's column and row behind each destination pixel, as a plain loop has them.
template <class T, int n>
void plainMirror(const Image<T>& src, const Image<T>& dst, Size size, int axis, int written) {
    const bool turns = axis >= flipDiagonal;
    const int width = turns ? size.height : size.width, height = turns ? size.width : size.height;
    for (int y = 0; y < height; ++y) {
        T* d = dst.row(y);
        const T* s = src.row(axis == flipHorizontalAxis || axis == flipBothAxes ? height - 1 - y : turns ? 0 : y);
        if (turns)
            for (int x = 0; x < width; ++x)
                for (int c = 0; c < written; ++c) d[x * n + c] = src.row(x)[y * n + c];
        else if (axis == flipHorizontalAxis)
            for (int x = 0; x < width * n; ++x) d[x] = s[x];
        else
            for (int x = 0; x < width; ++x)
                for (int c = 0; c < written; ++c) d[x * n + c] = s[(width - 1 - x) * n + c];
        keep(d);
    }
}

template <class T, int n>
Row mirrorRow(std::string name, QorResult(QORI_CALL* function)(const T*, int32_t, T*, int32_t, QorImageSize, int32_t),
              int axis, Best best = {}, int bytesKept = 0) {
    const auto make = [=](Size size) {
        const Image<T> src(size, n), dst(axis >= flipDiagonal ? Size{size.height, size.width} : size, n);
        return Contenders{[=] { must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), axis)); },
                          [=] { plainMirror<T, n>(src, dst, size, axis, bytesKept > 0 ? n - 1 : n); },
                          {},
                          outputOf(dst)};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * n * sizeof(T) + bytesKept,
            .sizes = kMirrorSizes,
            .make = make,
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame};
}

template <class T, int n>
Row inPlaceRow(std::string name, QorResult(QORI_CALL* function)(T*, int32_t, QorImageSize, int32_t), int axis) {
    const auto make = [=](Size size) {
        const Image<T> image(size, n);
        return Contenders{[=] { must(function(image.data(), image.step(), size.roi(), axis)); }, {}, {}};
    };
    return {.operation = std::move(name), .bytesPerPixel = 2.0 * n * sizeof(T), .sizes = kMirrorSizes, .make = make};
}

/// A frame of 16 pixels inside the size, which is the destination's.
template <class T, int n, class Copy>
Row borderRow(std::string name, Copy copy, Best best = {}) {
    constexpr int frame = 16;
    const auto make = [=](Size size) {
        const Image<T> src({size.width - 2 * frame, size.height - 2 * frame}, n), dst(size, n);
        return Contenders{[=] {
                              copy(src, dst, QorImageSize{size.width - 2 * frame, size.height - 2 * frame}, size.roi());
                          },
                          [=] {
                              const int right = size.width - 2 * frame - 1, bottom = size.height - 2 * frame - 1;
                              const auto inside = [](int v, int last) { return v < 0 ? 0 : v > last ? last : v; };
                              for (int y = 0; y < size.height; ++y) {
                                  const T* s = src.row(inside(y - frame, bottom));
                                  T* d = dst.row(y);
                                  for (int x = 0; x < size.width; ++x)
                                      for (int c = 0; c < n; ++c) d[x * n + c] = s[inside(x - frame, right) * n + c];
                                  keep(d);
                              }
                          },
                          {}};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * n * sizeof(T),
            .sizes = {kL1, kL2, kFrame},
            .make = make,
            .bestAtL2 = best.atL2,
            .bestAtFrame = best.atFrame};
}

template <class Function>
auto replicate(Function function) {
    return [=](const auto& src, const auto& dst, QorImageSize inner, QorImageSize outer) {
        must(function(src.data(), src.step(), inner, dst.data(), dst.step(), outer, 16, 16));
    };
}

template <class T, class Function>
auto constant(Function function) {
    return [=](const auto& src, const auto& dst, QorImageSize inner, QorImageSize outer) {
        const T value[4] = {1, 2, 3, 4};
        must(function(src.data(), src.step(), inner, dst.data(), dst.step(), outer, 16, 16, value));
    };
}

const Rows rows{{
    borderRow<uint8_t, 1>("border replicate 8u C1", replicate(qoriCopyReplicateBorder_8u_C1R), {28'994, 13'309}),
    borderRow<uint8_t, 3>("border replicate 8u C3", replicate(qoriCopyReplicateBorder_8u_C3R)),
    borderRow<float, 4>("border replicate 32f C4", replicate(qoriCopyReplicateBorder_32f_C4R)),
    borderRow<uint8_t, 3>("border constant 8u C3", constant<uint8_t>(qoriCopyConstBorder_8u_C3R)),
    mirrorRow<uint8_t, 1>("mirror rows 8u C1", qoriMirror_8u_C1R, flipHorizontalAxis),
    mirrorRow<uint8_t, 1>("mirror columns 8u C1", qoriMirror_8u_C1R, flipVerticalAxis, {49'723, 14'157}),
    mirrorRow<uint8_t, 3>("mirror columns 8u C3", qoriMirror_8u_C3R, flipVerticalAxis, {13'009, 4'632}),
    mirrorRow<uint8_t, 4>("mirror columns 8u AC4", qoriMirror_8u_AC4R, flipVerticalAxis, {}, 4),
    mirrorRow<uint16_t, 3>("mirror columns 16u C3", qoriMirror_16u_C3R, flipVerticalAxis),
    mirrorRow<float, 1>("mirror columns 32f C1", qoriMirror_32f_C1R, flipVerticalAxis),
    mirrorRow<float, 3>("mirror columns 32f C3", qoriMirror_32f_C3R, flipVerticalAxis),
    mirrorRow<float, 4>("mirror columns 32f C4", qoriMirror_32f_C4R, flipVerticalAxis),
    mirrorRow<uint8_t, 1>("mirror both 8u C1", qoriMirror_8u_C1R, flipBothAxes),
    inPlaceRow<uint8_t, 1>("mirror rows 8u C1I", qoriMirror_8u_C1IR, flipHorizontalAxis),
    inPlaceRow<uint8_t, 1>("mirror columns 8u C1I", qoriMirror_8u_C1IR, flipVerticalAxis),
    inPlaceRow<uint8_t, 3>("mirror columns 8u C3I", qoriMirror_8u_C3IR, flipVerticalAxis),
    mirrorRow<uint8_t, 1>("mirror diagonal 8u C1", qoriMirror_8u_C1R, flipDiagonal),
    mirrorRow<uint8_t, 3>("mirror diagonal 8u C3", qoriMirror_8u_C3R, flipDiagonal),
    mirrorRow<uint8_t, 4>("mirror diagonal 8u C4", qoriMirror_8u_C4R, flipDiagonal),
    mirrorRow<uint8_t, 4>("mirror diagonal 8u AC4", qoriMirror_8u_AC4R, flipDiagonal, {}, 4),
    mirrorRow<uint16_t, 1>("mirror diagonal 16u C1", qoriMirror_16u_C1R, flipDiagonal),
    mirrorRow<uint16_t, 3>("mirror diagonal 16u C3", qoriMirror_16u_C3R, flipDiagonal),
    mirrorRow<uint16_t, 4>("mirror diagonal 16u C4", qoriMirror_16u_C4R, flipDiagonal),
    mirrorRow<float, 3>("mirror diagonal 32f C3", qoriMirror_32f_C3R, flipDiagonal),
    mirrorRow<float, 4>("mirror diagonal 32f C4", qoriMirror_32f_C4R, flipDiagonal),
}};

}  // namespace
}  // namespace qori::bench
