// SPDX-License-Identifier: Apache-2.0
#include "adaptive_spec.h"

#include "frame/exponential.h"

namespace qori::filter {
namespace {

constexpr uintptr_t kAlignment = 8;

/// The weight k pixels from the middle, not scaled. The exponent is made in single precision.
double weightAt(int32_t k, float sigma) {
    if (k == 0) return 1;  // also where sigma^2 is 0
    const auto distance = static_cast<float>(k);
    return exponential(static_cast<double>(-(distance * distance) / (2 * sigma * sigma)));
}

}  // namespace

void fillAdaptiveSpec(QorAdaptiveGaussSpec* block, int32_t maskSize, float sigma) {
    const auto distance = kAlignment - reinterpret_cast<uintptr_t>(block) % kAlignment;
    if (sigma <= 0) {
        const float reach = __builtin_fmaf(static_cast<float>(maskSize - 1), 0.5f, -1.0f);
        sigma = __builtin_fmaf(0.3f, reach, 0.8f);
    }
    *asBytes(block) = static_cast<uint8_t>(distance);
    auto* const spec = tableOf<AdaptiveSpec>(block, static_cast<int64_t>(distance));
    auto* const weights = reinterpret_cast<float*>(spec + 1);
    const uintptr_t address = sizeof(void*) == 4 ? reinterpret_cast<uintptr_t>(weights) : sizeof(AdaptiveSpec);
    *spec = {AdaptiveSpec::kTag, qor8u, 1, maskSize, sigma, static_cast<uint32_t>(address)};
    const int32_t reach = maskSize / 2;
    double total = 1;
    for (int32_t k = 1; k <= reach; ++k) total += 2 * weightAt(k, sigma);
    for (int32_t k = -reach; k <= reach; ++k) weights[k + reach] = static_cast<float>(weightAt(k, sigma) * (1 / total));
}

const AdaptiveSpec* adaptiveSpecOf(const QorAdaptiveGaussSpec* block) {
    const uint8_t distance = *asBytes(block);
    if (distance < 1 || distance > kAlignment) return nullptr;
    const auto* const spec = tableOf<AdaptiveSpec>(block, int64_t{distance});
    const bool filled = spec->tag == AdaptiveSpec::kTag && spec->dataType == qor8u && spec->numChannels == 1 &&
                        spec->maskSize > 0 && spec->maskSize % 2 == 1 && spec->weightAddress != 0;
    return filled ? spec : nullptr;
}

}  // namespace qori::filter
