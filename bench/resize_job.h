// SPDX-License-Identifier: Apache-2.0
// Resizes ready to run: plans and buffers are made when the job is.
#pragma once
#include "bench.h"

namespace qori::bench {

struct Sizes {
    Size src, dst;
};

/// The exports of one element type and layout.
template <class T, int channels>
struct Exports;
#define QORI_EXPORTS(T, t, n)                                                 \
    template <>                                                               \
    struct Exports<T, n> {                                                    \
        static constexpr auto getSize = qoriResizeGetSize_##t;                \
        static constexpr auto getBufferSize = qoriResizeGetBufferSize_##t;    \
        static constexpr auto getSrcOffset = qoriResizeGetSrcOffset_##t;      \
        static constexpr auto nearestInit = qoriResizeNearestInit_##t;        \
        static constexpr auto linearInit = qoriResizeLinearInit_##t;          \
        static constexpr auto cubicInit = qoriResizeCubicInit_##t;            \
        static constexpr auto lanczosInit = qoriResizeLanczosInit_##t;        \
        static constexpr auto superInit = qoriResizeSuperInit_##t;            \
        static constexpr auto nearest = qoriResizeNearest_##t##_C##n##R;      \
        static constexpr auto linear = qoriResizeLinear_##t##_C##n##R;        \
        static constexpr auto cubic = qoriResizeCubic_##t##_C##n##R;          \
        static constexpr auto lanczos = qoriResizeLanczos_##t##_C##n##R;      \
        static constexpr auto super = qoriResizeSuper_##t##_C##n##R;          \
        static constexpr auto widened = qoriResizeAntialiasing_##t##_C##n##R; \
    };
QORI_EXPORTS(uint8_t, 8u, 1)
QORI_EXPORTS(uint8_t, 8u, 3)
QORI_EXPORTS(uint8_t, 8u, 4)
QORI_EXPORTS(uint16_t, 16u, 1)
QORI_EXPORTS(uint16_t, 16u, 3)
QORI_EXPORTS(uint16_t, 16u, 4)
QORI_EXPORTS(float, 32f, 1)
QORI_EXPORTS(float, 32f, 3)
#undef QORI_EXPORTS

inline constexpr int kLobes = 3;

/// A resize in tiles of some rows (0: the whole at once) with a plan and a buffer of its own.
template <class T, int channels>
std::function<void()> resizeJob(QorInterpolationKind kind, bool antialiasing, Image<T> src, Image<T> dst, Sizes sizes,
                                int tileRows = 0) {
    using E = Exports<T, channels>;
    const QorImageSize from = sizes.src.roi(), to = sizes.dst.roi(),
                       tile{to.width, tileRows > 0 ? tileRows : to.height};
    int32_t planBytes, initBytes, bufferBytes;
    must(E::getSize(from, to, kind, antialiasing, &planBytes, &initBytes));
    const Block memory = allocate(static_cast<size_t>(planBytes)), init = allocate(static_cast<size_t>(initBytes));
    auto* plan = reinterpret_cast<QorResizePlan*>(memory.get());
    uint8_t* scratch = init.get();
    switch (kind) {
        case interpNearest: E::nearestInit(from, to, plan); break;
        case interpSuper: E::superInit(from, to, plan); break;
        case interpLinear:
            if (antialiasing)
                must(qoriResizeAntialiasingLinearInit(from, to, plan, scratch));
            else
                must(E::linearInit(from, to, plan));
            break;
        case interpCubic:
            if (antialiasing)
                must(qoriResizeAntialiasingCubicInit(from, to, 0, 0.5f, plan, scratch));
            else
                must(E::cubicInit(from, to, 0, 0.5f, plan, scratch));
            break;
        case interpLanczos:
            if (antialiasing)
                must(qoriResizeAntialiasingLanczosInit(from, to, kLobes, plan, scratch));
            else
                must(E::lanczosInit(from, to, kLobes, plan, scratch));
            break;
    }
    must(E::getBufferSize(plan, tile, channels, &bufferBytes));
    const Block buffer = allocate(static_cast<size_t>(bufferBytes));
    const auto inTiles = [=](auto runTile) -> std::function<void()> {
        return [=] {
            for (int y = 0; y < to.height; y += tile.height) {
                QorPoint2D offset{0, y}, origin{0, 0};
                must(E::getSrcOffset(reinterpret_cast<QorResizePlan*>(memory.get()), offset, &origin));
                runTile(src.row(origin.y), dst.row(y), offset);
            }
        };
    };
    const auto inside = [=](auto function) {
        return inTiles([=](const T* in, T* out, QorPoint2D offset) {
            must(function(in, src.step(), out, dst.step(), offset, tile, reinterpret_cast<QorResizePlan*>(memory.get()),
                          buffer.get()));
        });
    };
    const auto bordered = [=](auto function) {
        return inTiles([=](const T* in, T* out, QorPoint2D offset) {
            must(function(in, src.step(), out, dst.step(), offset, tile, borderReplicate, nullptr,
                          reinterpret_cast<QorResizePlan*>(memory.get()), buffer.get()));
        });
    };
    if (antialiasing) return bordered(E::widened);
    switch (kind) {
        case interpNearest: return inside(E::nearest);
        case interpSuper: return inside(E::super);
        case interpLinear: return bordered(E::linear);
        case interpCubic: return bordered(E::cubic);
        default: return bordered(E::lanczos);
    }
}

}  // namespace qori::bench
