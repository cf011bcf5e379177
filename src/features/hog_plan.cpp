// SPDX-License-Identifier: Apache-2.0
#include "hog_plan.h"

#include <algorithm>

#include "frame/checks.h"
#include "frame/exponential.h"

namespace qori::features {
namespace {

constexpr int32_t kMostBlock = 64, kLeast = 2;

bool isBlockValid(const QorHogConfig& config) {
    return config.blockSize <= kMostBlock && config.blockSize == 2 * config.cellSize;
}

bool isStrideValid(const QorHogConfig& config) {
    return config.blockStride > 0 && config.blockStride % config.cellSize == 0;
}

/// What a pixel of a block, i pixels from its side, gives to the near and to the far cell along an axis: the bell
/// around the block's middle times the bilinear weight. Beyond the cells' centres the rest of the weight falls outside
/// the block.
struct AxisWeights {
    double cell[2];
};

AxisWeights axisWeights(int32_t i, const QorHogConfig& config) {
    const double fromMiddle = i + 0.5 - config.cellSize, sigma = static_cast<double>(config.blockWeightParam);
    const double bell = exponential(-(fromMiddle / sigma) * (fromMiddle / sigma) * 0.5);
    const double place = (i + 0.5) / config.cellSize - 0.5;  // in cells from the first one's centre
    const auto tent = [](double distance) { return std::max(0.0, 1 - (distance < 0 ? -distance : distance)); };
    return {{bell * tent(place), bell * tent(place - 1)}};
}

}  // namespace

QorResult configCheck(const QorHogConfig* config) {
    if (config == nullptr) return QOR_ERR_NULL_PTR;
    const auto within = [](int32_t value, int32_t most) { return value >= kLeast && value <= most; };
    const bool supported = within(config->cellSize, HogPlan::kMostCell) && isBlockValid(*config) &&
                           isStrideValid(*config) && within(config->nbins, HogPlan::kMostBins) &&
                           config->blockWeightParam > 0 && config->normParam > 0;
    if (!supported) return QOR_ERR_UNSUPPORTED_MODE;
    const auto tiles = [&](int32_t side) {
        return side >= config->blockSize && (side - config->blockSize) % config->blockStride == 0;
    };
    return tiles(config->winSize.width) && tiles(config->winSize.height) ? QOR_OK : QOR_ERR_SIZE;
}

void fillHogPlan(HogPlan* plan, const QorHogConfig& config) {
    const auto blocksAlong = [&](int32_t side) { return (side - config.blockSize) / config.blockStride + 1; };
    const int32_t across = blocksAlong(config.winSize.width), down = blocksAlong(config.winSize.height);
    const int32_t length = 4 * config.nbins;
    const int64_t descriptor = std::min(int64_t{across} * down, int64_t{1} << 40) * length;
    *plan = {HogPlan::kTag,
             config.blockOrder,
             config.cellSize,
             config.blockSize,
             config.blockStride,
             config.nbins,
             length,
             config.winSize.width,
             config.winSize.height,
             config.normParam,
             descriptor,
             across,
             down,
             {}};
    auto* weights = reinterpret_cast<float*>(plan + 1);
    AxisWeights axis[kMostBlock];
    for (int32_t i = 0; i < config.blockSize; ++i) axis[i] = axisWeights(i, config);
    const int32_t cell = config.cellSize;
    for (int32_t y = 0; y < cell; ++y)
        for (int32_t x = 0; x < cell; ++x)
            for (int32_t place = 0; place < 4; ++place) {
                const AxisWeights &across4 = axis[x + place % 2 * cell], &down4 = axis[y + place / 2 * cell];
                for (int32_t k = 0; k < 4; ++k)
                    *weights++ = static_cast<float>(across4.cell[k % 2] * down4.cell[k / 2]);
            }
}

}  // namespace qori::features
