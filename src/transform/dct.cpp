// SPDX-License-Identifier: Apache-2.0
// The cosine transform of images of any size: its plans, and both directions.
#include "dct_plan.h"
#include "frame/checks.h"
#include "frame/float_control.h"

namespace qori::transform {
namespace {

// --- plans ----------------------------------------------------------------------------------------------------------

QorResult dctGetSize(QorImageSize roi, int32_t, int32_t* planSize, int32_t* initSize, int32_t* bufferSize) {
    if (QorResult r = firstOf(nullCheck(planSize, initSize, bufferSize), sizeCheck(roi))) return r;
    const DctLayout layout(roi);
    if (QorResult r = layout.check()) return r;
    *planSize = static_cast<int32_t>(layout.planBytes);
    *initSize = static_cast<int32_t>(layout.initBytes);
    *bufferSize = static_cast<int32_t>(layout.bufferBytes);
    return QOR_OK;
}

void fillPlan(QorDct2DPlan* block, const DctLayout& layout, QorImageSize size, int32_t hint, uint8_t* initBuffer) {
    auto* const plan = recordIn<DctPlan>(block);
    uint8_t* const init = blockStart(initBuffer);
    *plan = {DctPlan::kTag,
             size,
             hint,
             static_cast<int32_t>(layout.bufferBytes),
             static_cast<int32_t>(layout.ofRows),
             static_cast<int32_t>(layout.ofColumns)};
    kernels::makeCosineTable(tableOf<kernels::CosineTable>(plan, layout.ofRows), size.width, init);
    if (layout.ofColumns != layout.ofRows)
        kernels::makeCosineTable(tableOf<kernels::CosineTable>(plan, layout.ofColumns), size.height, init);
}

QorResult dctInit(QorImageSize roi, int32_t hint, QorDct2DPlan* block, uint8_t* initBuffer) {
    if (QorResult r = firstOf(nullCheck(block), sizeCheck(roi))) return r;
    const DctLayout layout(roi);
    if (QorResult r = layout.check()) return r;
    if (layout.initBytes > 0 && initBuffer == nullptr) return QOR_ERR_NULL_PTR;
    return underDefaultControl([&] {
        fillPlan(block, layout, roi, hint, initBuffer);
        return QOR_OK;
    });
}

QorResult dctInitAlloc(QorDct2DPlan** made, QorImageSize roi, int32_t hint) {
    if (QorResult r = firstOf(nullCheck(made), sizeCheck(roi))) return r;
    const DctLayout layout(roi);
    if (QorResult r = layout.check()) return r;
    OwnedBlocks<1> plan, init;
    auto* const block = plan.add<QorDct2DPlan>(layout.planBytes);
    uint8_t* const initBuffer = layout.initBytes == 0 ? nullptr : init.add(layout.initBytes);
    if (QorResult r = firstOf(plan.check(), init.check())) return r;
    return underDefaultControl([&] {
        fillPlan(block, layout, roi, hint, initBuffer);
        plan.release();
        *made = block;
        return QOR_OK;
    });
}

QorResult planCheck(const QorDct2DPlan* block) {
    return isNull(block) ? QOR_ERR_NULL_PTR : tagCheck(recordIn<DctPlan>(block));
}

QorResult dctFree(QorDct2DPlan* block) {
    if (QorResult r = planCheck(block)) return r;
    recordIn<DctPlan>(block)->tag = 0;
    qorFree(block);
    return QOR_OK;
}

QorResult dctGetBufferSize(const QorDct2DPlan* block, int32_t* size) {
    if (QorResult r = nullCheck(block, size)) return r;
    const auto* const plan = recordIn<DctPlan>(block);
    if (QorResult r = tagCheck(plan)) return r;
    *size = plan->bufferBytes;
    return QOR_OK;
}

// --- transforms -----------------------------------------------------------------------------------------------------

QorResult transform(Image<const float> src, Image<float> dst, kernels::CosineChannels channels, bool isInverse,
                    const QorDct2DPlan* block, uint8_t* buffer) {
    if (QorResult r = planCheck(block)) return r;
    if (QorResult r = firstOf(nullCheck(src, dst, buffer), stepCheck(src, dst))) return r;
    return underDefaultControl([&] {
        const auto* const plan = recordIn<DctPlan>(block);
        auto* const work = reinterpret_cast<float*>(blockStart(buffer));
        kernels::cosineRows(plan->rows(), src, dst, plan->size.height, channels, isInverse, work);
        kernels::cosineColumns(plan->columns(), dst, plan->size.width, channels, isInverse, work);
        return QOR_OK;
    });
}

template <Layout layout, bool isInverse>
QorResult dct(Image<const float> src, Image<float> dst, const QorDct2DPlan* plan, uint8_t* buffer) {
    return transform(src, dst, {channels(layout), processedChannels(layout)}, isInverse, plan, buffer);
}

}  // namespace
}  // namespace qori::transform

#include "entries/dct.inc"
