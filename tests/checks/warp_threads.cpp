// SPDX-License-Identifier: Apache-2.0
// Threads share a plan, a source and a destination, and take the destination's tiles as they come. The image is that of
// one call; built for it, the thread sanitizer watches.
#include <cstdio>
#include <functional>

#include "tiles_in_threads.h"

namespace {

constexpr QorImageSize kSrc{331, 217}, kDst{300, 240};
constexpr int kTile = 37, kChannels = 3;
constexpr int32_t kSrcStep = kSrc.width * kChannels, kDstStep = kDst.width * kChannels;
constexpr double kTurn[6] = {0.9, -0.4, 60, 0.4, 0.9, -30}, kValue[3] = {10, 20, 30};

/// One interpolation: how its plan is filled, and what makes a tile.
struct Way {
    const char* name;
    QorInterpolationKind kind;
    std::function<QorResult(QorWarpPlan*, uint8_t*)> init;
    decltype(&qoriWarpAffineLinear_8u_C3R) run;
};

const Way kWays[] = {
    {"nearest", interpNearest,
     [](QorWarpPlan* plan, uint8_t*) {
         return qoriWarpAffineNearestInit(kSrc, kDst, qor8u, kTurn, 0, kChannels, borderConstant, kValue, 0, plan);
     },
     qoriWarpAffineNearest_8u_C3R},
    {"linear", interpLinear,
     [](QorWarpPlan* plan, uint8_t*) {
         return qoriWarpAffineLinearInit(kSrc, kDst, qor8u, kTurn, 0, kChannels, borderConstant, kValue, 0, plan);
     },
     qoriWarpAffineLinear_8u_C3R},
    {"cubic", interpCubic,
     [](QorWarpPlan* plan, uint8_t* init) {
         return qoriWarpAffineCubicInit(kSrc, kDst, qor8u, kTurn, 0, kChannels, 0, 0.5, borderReplicate, nullptr, 0,
                                        plan, init);
     },
     qoriWarpAffineCubic_8u_C3R},
};

bool makeTile(const Way& way, const QorWarpPlan* plan, const Bytes& src, Bytes& dst, QorPoint2D at, QorImageSize size) {
    int32_t bytes;
    if (qoriWarpGetBufferSize(plan, size, &bytes) != QOR_OK) return false;
    Bytes buffer(static_cast<size_t>(bytes));
    return way.run(src.data(), kSrcStep, dst.data() + at.y * kDstStep + at.x * kChannels, kDstStep, at, size, plan,
                   buffer.data()) >= QOR_OK;
}

bool agrees(const Way& way) {
    int32_t planBytes, initBytes;
    if (qoriWarpAffineGetSize(kSrc, kDst, qor8u, kTurn, way.kind, 0, borderConstant, &planBytes, &initBytes) != QOR_OK)
        return false;
    Bytes memory(static_cast<size_t>(planBytes)), init(static_cast<size_t>(initBytes) + 1);
    auto* plan = reinterpret_cast<QorWarpPlan*>(memory.data());
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
