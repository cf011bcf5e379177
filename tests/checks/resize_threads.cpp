// SPDX-License-Identifier: Apache-2.0
// Threads share a plan, a source and a destination, and take the destination's tiles as they come. The image is that of
// one call; built for it, the thread sanitizer watches.
#include <cstdio>
#include <functional>

#include "tiles_in_threads.h"

namespace {

constexpr QorImageSize kSrc{331, 217}, kDst{240, 160};
constexpr int kTile = 37, kChannels = 3;

/// One interpolation: how its plan is filled and how a tile of it is made.
struct Way {
    const char* name;
    QorInterpolationKind kind;
    bool antialiasing;
    std::function<QorResult(QorResizePlan*, uint8_t*)> init;
    std::function<QorResult(const uint8_t*, uint8_t*, QorPoint2D, QorImageSize, const QorResizePlan*, uint8_t*)> run;
};

constexpr int32_t kSrcStep = kSrc.width * kChannels, kDstStep = kDst.width * kChannels;

template <class Function>
auto inside(Function function) {
    return [=](const uint8_t* src, uint8_t* dst, QorPoint2D at, QorImageSize size, const QorResizePlan* plan,
               uint8_t* buffer) { return function(src, kSrcStep, dst, kDstStep, at, size, plan, buffer); };
}

template <class Function>
auto bordered(Function function) {
    return [=](const uint8_t* src, uint8_t* dst, QorPoint2D at, QorImageSize size, const QorResizePlan* plan,
               uint8_t* buffer) {
        return function(src, kSrcStep, dst, kDstStep, at, size, borderReplicate, nullptr, plan, buffer);
    };
}

const Way kWays[] = {
    {"nearest", interpNearest, false,
     [](QorResizePlan* plan, uint8_t*) { return qoriResizeNearestInit_8u(kSrc, kDst, plan); },
     inside(qoriResizeNearest_8u_C3R)},
    {"linear", interpLinear, false,
     [](QorResizePlan* plan, uint8_t*) { return qoriResizeLinearInit_8u(kSrc, kDst, plan); },
     bordered(qoriResizeLinear_8u_C3R)},
    {"cubic", interpCubic, false,
     [](QorResizePlan* plan, uint8_t* init) { return qoriResizeCubicInit_8u(kSrc, kDst, 0, 0.5f, plan, init); },
     bordered(qoriResizeCubic_8u_C3R)},
    {"super", interpSuper, false,
     [](QorResizePlan* plan, uint8_t*) { return qoriResizeSuperInit_8u(kSrc, kDst, plan); },
     inside(qoriResizeSuper_8u_C3R)},
    {"antialiasing", interpLanczos, true,
     [](QorResizePlan* plan, uint8_t* init) { return qoriResizeAntialiasingLanczosInit(kSrc, kDst, 3, plan, init); },
     bordered(qoriResizeAntialiasing_8u_C3R)},
};

bool makeTile(const Way& way, const QorResizePlan* plan, const Bytes& src, Bytes& dst, QorPoint2D at,
              QorImageSize size) {
    int32_t bytes;
    QorPoint2D from;
    if (qoriResizeGetBufferSize_8u(plan, size, kChannels, &bytes) < 0) return false;
    if (qoriResizeGetSrcOffset_8u(plan, at, &from) != QOR_OK) return false;
    Bytes buffer(static_cast<size_t>(bytes));
    return way.run(src.data() + from.y * kSrcStep + from.x * kChannels, dst.data() + at.y * kDstStep + at.x * kChannels,
                   at, size, plan, buffer.data()) == QOR_OK;
}

bool agrees(const Way& way) {
    int32_t planBytes, initBytes;
    if (qoriResizeGetSize_8u(kSrc, kDst, way.kind, way.antialiasing, &planBytes, &initBytes) != QOR_OK) return false;
    Bytes memory(static_cast<size_t>(planBytes)), init(static_cast<size_t>(initBytes));
    auto* plan = reinterpret_cast<QorResizePlan*>(memory.data());
    if (way.init(plan, init.data()) != QOR_OK) return false;
    Bytes src(static_cast<size_t>(kSrcStep) * kSrc.height), whole(static_cast<size_t>(kDstStep) * kDst.height);
    fillBytes(src);
    Bytes tiled = whole;
    if (!makeTile(way, plan, src, whole, {0, 0}, kDst)) return false;

    const bool succeeded = makeTilesInThreads(
        kDst, kTile, [&](QorPoint2D at, QorImageSize size) { return makeTile(way, plan, src, tiled, at, size); });
    return succeeded && tiled == whole;
}

}  // namespace

int main() {
    int failures = 0;
    for (const Way& way : kWays)
        if (!agrees(way)) {
            std::printf("%s: tiles made in threads differ from one call\n", way.name);
            ++failures;
        }
    return failures == 0 ? 0 : 1;
}
