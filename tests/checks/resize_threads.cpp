// SPDX-License-Identifier: Apache-2.0
// Threads share a plan, a source and a destination, and take the destination's tiles as they come. The image is that of
// one call; built for it, the thread sanitizer watches.
#include <atomic>
#include <cstdio>
#include <cstring>
#include <functional>
#include <thread>
#include <vector>

#include "qori.h"

namespace {

constexpr QorImageSize kSrc{331, 217}, kDst{240, 160};
constexpr int kTile = 37, kThreads = 4, kChannels = 3;
using Bytes = std::vector<uint8_t>;

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
    uint32_t state = 1;
    for (uint8_t& byte : src) byte = static_cast<uint8_t>((state = state * 1664525u + 1013904223u) >> 24);
    Bytes tiled = whole;
    if (!makeTile(way, plan, src, whole, {0, 0}, kDst)) return false;

    constexpr int columns = (kDst.width + kTile - 1) / kTile, rows = (kDst.height + kTile - 1) / kTile;
    std::atomic<int> next{0};
    std::atomic<bool> succeeded{true};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&] {
            for (int i = next++; i < columns * rows; i = next++) {
                const QorPoint2D at{i % columns * kTile, i / columns * kTile};
                if (!makeTile(way, plan, src, tiled, at, {kTile, kTile})) succeeded = false;
            }
        });
    for (std::thread& thread : threads) thread.join();
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
