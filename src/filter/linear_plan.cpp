// SPDX-License-Identifier: Apache-2.0
#include "linear_plan.h"

#include <bit>

namespace qori::filter {
namespace {

constexpr int32_t kRecordBytes = 128;
static_assert(sizeof(LinearPlan) <= kRecordBytes);

constexpr int kCopies = 4;  ///< Of each packed coefficient.
static_assert(kCopies == kernels::PairTaps<uint8_t>::repeats && kCopies == kernels::FloatTaps<float>::repeats);

/// Where the kernel as given and the packed one lie.
struct Places {
    int64_t kernel, packed, bytes;

    Places(QorImageSize size, int64_t coefficientBytes) {
        BlockLayout layout;
        layout.add(kRecordBytes);
        kernel = layout.add(int64_t{size.width} * size.height * coefficientBytes);
        packed = layout.add(kPairBytes * ((int64_t{size.width} + 1) / 2) * size.height);
        bytes = layout.bytes();
    }

private:
    static constexpr int64_t kPairBytes = 2 * kCopies * sizeof(float);  ///< Pairs of words take half of it.
};

LinearPlan& startPlan(QorLinearFilterPlan* block, int32_t pathKind, QorImageSize size, int32_t coefficientBytes,
                      int32_t roundMode) {
    LinearPlan& plan = *recordIn<LinearPlan>(block);
    plan = {};
    plan.pathKind = pathKind;
    plan.kernelWidth = size.width;
    plan.kernelHeight = size.height;
    plan.roundMode = roundMode;
    const Places places(size, coefficientBytes);
    plan.kernelOffset = static_cast<int32_t>(places.kernel);
    plan.packedOffset = static_cast<int32_t>(places.packed);
    return plan;
}

void classifyDivisor(LinearPlan& plan, int32_t divisor) {
    plan.divisor = divisor;
    plan.divisorSingle = static_cast<float>(divisor);
    plan.divisorDouble = divisor;
    plan.reciprocal = 1.0f / plan.divisorSingle;
    const bool isPower = divisor > 1 && std::has_single_bit(static_cast<uint32_t>(divisor));
    plan.divideMode = divisor == 1 ? LinearPlan::none : isPower ? LinearPlan::byShift : LinearPlan::byQuotient;
    if (!isPower) return;
    plan.shift = std::countr_zero(static_cast<uint32_t>(divisor));
    plan.roundHalf = divisor / 2;
    plan.shiftMask = divisor - 1;
}

int32_t floatPath(int32_t dataType) {
    switch (dataType) {
        case qor8u: return LinearPlan::float8u;
        case qor16s: return LinearPlan::float16s;
        case qor16u: return LinearPlan::float16u;
        default: return LinearPlan::float32f;
    }
}

/// coefficient(i) for each coefficient of a float plan.
template <class Coefficient>
void fillFloats(QorLinearFilterPlan* block, QorImageSize size, int32_t dataType, int32_t channels, int32_t roundMode,
                Coefficient coefficient) {
    LinearPlan& plan = startPlan(block, floatPath(dataType), size, sizeof(float), roundMode);
    auto* copy = tableOf<float>(&plan, plan.kernelOffset);
    for (ptrdiff_t i = 0; i < ptrdiff_t{size.width} * size.height; ++i) copy[i] = coefficient(i);
    if (channels != 2) packTurned<kCopies>(copy, size, tableOf<float>(&plan, plan.packedOffset));
}

}  // namespace

int64_t planBytes(QorImageSize kernel, int32_t kernelType) {
    return Places(kernel, kernelType == qor16s ? 2 : 4).bytes + kBlockAlignment - 1;
}

int64_t workBytes(QorImageSize kernel, int32_t roiWidth, int32_t dataType, int32_t kernelType, int32_t channels) {
    const int64_t area = int64_t{kernel.width} * kernel.height, p = 4 * area, w = roiWidth;
    const auto rounded = [](int64_t bytes) { return bytes == 0 ? 0 : (bytes + 191) / 64 * 64; };
    if (channels == 2 || (kernelType == qor16s && dataType == qor32f)) return 0;
    if (kernelType == qor16s) {
        if (channels == 4) return rounded(dataType == qor8u ? 16 * (area + w) : (16 * (area + w) + 124) / 16 * 16);
        if (dataType == qor8u)
            return rounded(channels == 1 ? 32 * ((8 * area + w + 7) / 8) : 16 * ((p + 3 * w + 3) / 4));
        return rounded(channels == 1 ? 16 * ((p + w + 3) / 4) : 16 * ((p + 3 * w + 31) / 4));
    }
    if (dataType == qor32f) return rounded((channels == 1 ? 32 : 16) * area);
    if (channels == 4) return rounded(32 * w + 4 * (p + 8 * w));
    if (channels == 3) return rounded(32 * ((3 * w + 3) / 4) + 16 * ((p + 6 * w + 10) / 4));
    if (dataType == qor16u) return rounded(16 * ((w + 10) / 4));
    return rounded(32 * ((w + 3) / 4) + 16 * ((p + 2 * w + 10) / 4));
}

void fillPlan(QorLinearFilterPlan* block, const int16_t* kernel, QorImageSize size, int32_t divisor, int32_t dataType,
              int32_t roundMode) {
    const bool is8u = dataType == qor8u;
    LinearPlan& plan =
        startPlan(block, is8u ? LinearPlan::integer8u : LinearPlan::integer16s, size, sizeof(int16_t), roundMode);
    classifyDivisor(plan, divisor);
    auto* copy = tableOf<int16_t>(&plan, plan.kernelOffset);
    std::copy_n(kernel, ptrdiff_t{size.width} * size.height, copy);
    packPairs<kCopies>(copy, size, tableOf<int32_t>(&plan, plan.packedOffset));
    const int64_t limit = is8u ? largestSum<uint8_t>(copy, size) : largestSum<int16_t>(copy, size);
    plan.sumLimit = static_cast<int32_t>(std::min<int64_t>(limit, INT32_MAX));
    if (is8u && limit > kernels::ByteTaps::kSumLimit) plan.groups = byteGroups(copy, size);
    if (is8u && (limit <= kernels::ByteTaps::kSumLimit || plan.groups.count > 0)) {
        // Half of the packed kernel's region is free.
        const int32_t pairs = (size.width + 1) / 2 * size.height;
        plan.bytesOffset = plan.packedOffset + kCopies * int32_t{sizeof(int32_t)} * pairs;
        packBytes(copy, size, tableOf<int32_t>(&plan, plan.bytesOffset));
    }
    plan.fitsPairs = std::all_of(copy, copy + ptrdiff_t{size.width} * size.height,
                                 [](int16_t k) { return k != INT16_MIN && k != INT16_MAX; });
}

void fillPlan(QorLinearFilterPlan* block, const float* kernel, QorImageSize size, int32_t dataType, int32_t channels,
              int32_t roundMode) {
    fillFloats(block, size, dataType, channels, roundMode, [=](ptrdiff_t i) { return kernel[i]; });
}

void fillConvertedPlan(QorLinearFilterPlan* block, const int16_t* kernel, QorImageSize size, int32_t divisor,
                       int32_t dataType, int32_t channels, int32_t roundMode) {
    const double factor = 1.0 / divisor;
    fillFloats(block, size, dataType, channels, roundMode,
               [=](ptrdiff_t i) { return static_cast<float>(kernel[i] * factor); });
}

}  // namespace qori::filter
