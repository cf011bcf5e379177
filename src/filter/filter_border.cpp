// SPDX-License-Identifier: Apache-2.0
// General linear filters with a plan and a border.
#include "frame/plan.h"
#include "linear_plan.h"
#include "linear_run.h"

namespace qori::filter {
namespace {

/// Channel counts with which a plan can be made, 2 among them.
QorResult countCheck(int32_t numChannels) { return numChannels < 1 || numChannels > 4 ? QOR_ERR_CHANNELS : QOR_OK; }

QorResult filterBorderGetSize(QorImageSize kernelSize, QorImageSize roi, int32_t dataType, int32_t kernelType,
                              int32_t numChannels, int32_t* pSpecSize, int32_t* pBufferSize) {
    if (QorResult r =
            firstOf(sizeCheck(kernelSize), sizeCheck(roi), dataTypeCheck(dataType, qor8u, qor16u, qor16s, qor32f)))
        return r;
    if (QorResult r = firstOf(dataTypeCheck(kernelType, qor16s, qor32f), countCheck(numChannels),
                              nullCheck(pSpecSize, pBufferSize)))
        return r;
    if (!isModest(kernelSize)) return QOR_ERR_SIZE;
    if (kernelType == qor16s && isConverted(dataType, numChannels)) kernelType = qor32f;
    const int32_t elementBytes = dataType == qor8u ? 1 : dataType == qor32f ? 4 : 2;
    const int64_t plan = planBytes(kernelSize, kernelType);
    const int64_t work = workBytes(kernelSize, roi.width, dataType, kernelType, numChannels);
    const int64_t border = borderBytes(roi, Reach::ofKernel(kernelSize), numChannels * elementBytes);
    int32_t planSize, bufferSize;
    if (QorResult r =
            firstOf(reportSize(plan, &planSize), reportSize(kBlockAlignment - 1 + work + border, &bufferSize)))
        return r;
    *pSpecSize = planSize;
    *pBufferSize = bufferSize;
    return QOR_OK;
}

QorResult filterBorderInit16s(const int16_t* pKernel, QorImageSize size, int32_t divisor, int32_t dataType,
                              int32_t numChannels, int32_t roundMode, QorLinearFilterPlan* pSpec) {
    if (QorResult r =
            firstOf(nullCheck(pKernel, pSpec), sizeCheck(size), dataTypeCheck(dataType, qor8u, qor16u, qor16s),
                    countCheck(numChannels), roundModeCheck(roundMode)))
        return r;
    if (divisor == 0) return QOR_ERR_DIVISOR;
    return underDefaultControl([&] {
        if (isConverted(dataType, numChannels))
            fillConvertedPlan(pSpec, pKernel, size, divisor, dataType, numChannels, roundMode);
        else
            fillPlan(pSpec, pKernel, size, divisor, dataType, roundMode);
        return QOR_OK;
    });
}

QorResult filterBorderInit32f(const float* pKernel, QorImageSize size, int32_t dataType, int32_t numChannels,
                              int32_t roundMode, QorLinearFilterPlan* pSpec) {
    if (QorResult r =
            firstOf(nullCheck(pKernel, pSpec), sizeCheck(size), dataTypeCheck(dataType, qor8u, qor16u, qor16s, qor32f),
                    countCheck(numChannels), roundModeCheck(roundMode)))
        return r;
    fillPlan(pSpec, pKernel, size, dataType, numChannels, roundMode);
    return QOR_OK;
}

QorResult borderCheck(int32_t border) { return border >= 2 && border <= 4 ? QOR_ERR_BORDER : QOR_OK; }

/// Only the destination has to hold a whole row within its step.
QorResult filterStepCheck(int32_t srcStep, int32_t dstStep, int64_t dstRowBytes) {
    return srcStep < 1 || dstRowBytes > dstStep ? QOR_ERR_STEP : QOR_OK;
}

template <class T>
void filterIntegers(const LinearPlan& plan, QorImageSize size, Target<T, T>& target) {
    const Division division{plan.divisor, plan.roundMode, plan.sumLimit};
    if constexpr (std::is_same_v<T, uint8_t>)
        if (plan.bytesOffset != 0)
            return filterBytes(tableOf<int32_t>(&plan, plan.bytesOffset), size, plan.groups, division, target);
    filterPairs(tableOf<int32_t>(&plan, plan.packedOffset), size, 0, division, target);
}

template <class T, int channels>
QorResult runPlan(Image<const T> src, Image<T> dst, QorImageSize roi, const BorderRule& rule, const LinearPlan& plan,
                  uint8_t* buffer) {
    const QorImageSize size{plan.kernelWidth, plan.kernelHeight};
    constexpr Layout layout = channels == 1 ? Layout::C1 : channels == 3 ? Layout::C3 : Layout::C4;
    auto target = makeTarget(src, dst, roi, layout, Reach::ofKernel(size), rule, buffer);
    constexpr int32_t integerPath = std::is_same_v<T, uint8_t>   ? int32_t{LinearPlan::integer8u}
                                    : std::is_same_v<T, int16_t> ? int32_t{LinearPlan::integer16s}
                                                                 : -1;
    if constexpr (integerPath >= 0) {
        if (plan.pathKind == integerPath) {
            filterIntegers(plan, size, target);
            return QOR_OK;
        }
    }
    filterSingle(tableOf<float>(&plan, plan.packedOffset), size, plan.roundMode, target);
    return QOR_OK;
}

template <class T, int channels>
QorResult filterBorder(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t border, const T* borderValue,
                       const QorLinearFilterPlan* pSpec, uint8_t* pBuffer) {
    constexpr int32_t pixelBytes = channels * elementBytes<T>;
    if (QorResult r =
            firstOf(nullCheck(src, dst, borderValue, pSpec, pBuffer), sizeCheck(roi),
                    filterStepCheck(src.step, dst.step, int64_t{roi.width} * pixelBytes), borderCheck(border)))
        return r;
    const LinearPlan& plan = *recordIn<LinearPlan>(pSpec);
    return underDefaultControl([&] {
        return runPlan<T, channels>(src, dst, roi, BorderRule::of(Border::of(border), borderValue), plan,
                                    blockStart(pBuffer));
    });
}

}  // namespace
}  // namespace qori::filter

#include "entries/filter_border.inc"
