// SPDX-License-Identifier: Apache-2.0
// The exports of both families, once: checks in their order, then plans and transforms.
#pragma once
#include "fourier_run.h"
#include "frame/float_control.h"
#include "kernels/transform/scaled_integers.h"

namespace qori::transform {

// --- sizes, plans ----------------------------------------------------------------------------------------------------

template <Elements elements>
QorResult reportFourierSizes(QorImageSize size, int32_t* planSize, int32_t* initSize, int32_t* bufferSize) {
    const FourierSizes sizes(size, elements);
    if (!sizes.areSmall()) return QOR_ERR_SIZE;
    *planSize = static_cast<int32_t>(sizes.planBytes);
    *initSize = static_cast<int32_t>(sizes.initBytes);
    *bufferSize = static_cast<int32_t>(sizes.bufferBytes);
    return QOR_OK;
}

template <Family family, Elements elements>
QorResult initFourierPlan(QorImageSize size, int32_t flag, int32_t hint, QorFft2DPlan* plan, uint8_t* init) {
    const FourierSizes sizes(size, elements);
    if (sizes.initBytes > 0 && init == nullptr) return QOR_ERR_NULL_PTR;
    if (!sizes.areSmall()) return QOR_ERR_SIZE;
    return underDefaultControl([&] {
        fillFourierPlan(plan, sizes, tagOf(family, elements), flag, hint, init);
        return QOR_OK;
    });
}

template <Family family, Elements elements>
QorResult allocateFourierPlan(QorFft2DPlan** out, QorImageSize size, int32_t flag, int32_t hint) {
    const FourierSizes sizes(size, elements);
    if (!sizes.areSmall()) return QOR_ERR_NO_MEMORY;
    OwnedBlocks<1> blocks;
    auto* const plan = blocks.add<QorFft2DPlan>(sizes.planBytes);
    if (QorResult r = blocks.check()) return r;
    const WorkMemory init(sizes.initBytes > 0 ? sizes.initBytes : 1);
    if (QorResult r = init.check()) return r;
    blocks.release();
    *out = plan;
    return underDefaultControl([&] {
        fillFourierPlan(plan, sizes, tagOf(family, elements), flag, hint, init.begin<uint8_t>());
        return QOR_OK;
    });
}

/// A plan there is, and of its kind.
template <Family family, Elements elements>
QorResult planCheck(const QorFft2DPlan* plan) {
    if (QorResult r = nullCheck(plan)) return r;
    return fourierTagCheck(plan, tagOf(family, elements));
}

/// Only its own memory: InitAlloc's plans begin where their blocks do.
template <Family family, Elements elements>
QorResult freePlan(QorFft2DPlan* plan) {
    if (QorResult r = planCheck<family, elements>(plan)) return r;
    qorFree(plan);
    return QOR_OK;
}

template <Family family, Elements elements>
QorResult planBufferSize(const QorFft2DPlan* plan, int32_t* bufferSize) {
    if (QorResult r = firstOf(nullCheck(plan, bufferSize))) return r;
    if (QorResult r = planCheck<family, elements>(plan)) return r;
    *bufferSize = fourierPlanIn(plan)->bufferBytes;
    return QOR_OK;
}

// --- transforms ------------------------------------------------------------------------------------------------------

/// The checks of all transforms, then run(record, buffer) with the caller's buffer or one for the call.
template <Family family, Elements elements, class Src, class Dst, class Run>
QorResult withFourierPlan(Src src, Dst dst, const QorFft2DPlan* block, uint8_t* callers, Run run) {
    if (QorResult r = planCheck<family, elements>(block)) return r;
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src, dst))) return r;
    const FourierPlan& plan = *fourierPlanIn(block);
    const auto runWith = [&](const WorkMemory& memory) {
        if (QorResult r = memory.check()) return r;
        return underDefaultControl([&] {
            run(plan, memory.begin<uint8_t>());
            return QOR_OK;
        });
    };
    return callers == nullptr ? runWith(WorkMemory(int64_t{plan.bufferBytes})) : runWith(WorkMemory(callers));
}

template <Layout layout>
Images imagesOf(Image<const float> src, Image<float> dst) {
    return {src.data, src.step, dst.data, dst.step, channels(layout), processedChannels(layout)};
}

template <Family family, Layout layout>
QorResult forwardToPack(Image<const float> src, Image<float> dst, const QorFft2DPlan* block, uint8_t* buffer) {
    return withFourierPlan<family, Elements::real>(
        src, dst, block, buffer,
        [=](const FourierPlan& plan, uint8_t* memory) { forwardReal(plan, imagesOf<layout>(src, dst), memory); });
}

template <Family family, Layout layout>
QorResult inverseFromPack(Image<const float> src, Image<float> dst, const QorFft2DPlan* block, uint8_t* buffer) {
    return withFourierPlan<family, Elements::real>(
        src, dst, block, buffer,
        [=](const FourierPlan& plan, uint8_t* memory) { inverseReal(plan, imagesOf<layout>(src, dst), memory); });
}

template <Family family>
QorResult complexTransform(Image<const QorComplex32f> src, Image<QorComplex32f> dst, const QorFft2DPlan* block,
                           uint8_t* buffer, Direction direction) {
    return withFourierPlan<family, Elements::complex>(
        src, dst, block, buffer, [=](const FourierPlan& plan, uint8_t* memory) {
            transformComplex(plan, {&src.data->re, src.step, &dst.data->re, dst.step, 1, 1}, memory, direction);
        });
}

template <Family family>
QorResult forwardComplex(Image<const QorComplex32f> src, Image<QorComplex32f> dst, const QorFft2DPlan* block,
                         uint8_t* buffer) {
    return complexTransform<family>(src, dst, block, buffer, Direction::forward);
}

template <Family family>
QorResult inverseComplex(Image<const QorComplex32f> src, Image<QorComplex32f> dst, const QorFft2DPlan* block,
                         uint8_t* buffer) {
    return complexTransform<family>(src, dst, block, buffer, Direction::inverse);
}

/// Integer images by way of floats in the buffer, a channel at a time.
template <Family family, Layout layout, class S, class D, class Transform>
QorResult integerTransform(Image<const S> src, Image<D> dst, const QorFft2DPlan* block, int32_t scaleFactor,
                           uint8_t* buffer, Transform transform) {
    return withFourierPlan<family, Elements::integers>(
        src, dst, block, buffer, [=](const FourierPlan& plan, uint8_t* memory) {
            auto* const floats = tableOf<float>(memory, plan.imageAt);
            const int32_t width = plan.size.width, step = width * elementBytes<float>;
            const double factor = kernels::factorOfScale(scaleFactor);
            constexpr int apart = channels(layout);
            for (int c = 0; c < processedChannels(layout); ++c) {
                for (int32_t y = 0; y < plan.size.height; ++y)
                    kernels::channelToFloats(src.row(y) + c, apart, floats + ptrdiff_t{y} * width, width);
                transform(plan, Images{floats, step, floats, step, 1, 1}, memory);
                for (int32_t y = 0; y < plan.size.height; ++y)
                    kernels::floatsToChannel(floats + ptrdiff_t{y} * width, factor, dst.row(y) + c, apart, width);
            }
        });
}

template <Family family, Layout layout>
QorResult forwardToIntegers(Image<const uint8_t> src, Image<int32_t> dst, const QorFft2DPlan* plan, int32_t scaleFactor,
                            uint8_t* buffer) {
    return integerTransform<family, layout>(src, dst, plan, scaleFactor, buffer, forwardReal);
}

template <Family family, Layout layout>
QorResult inverseToBytes(Image<const int32_t> src, Image<uint8_t> dst, const QorFft2DPlan* plan, int32_t scaleFactor,
                         uint8_t* buffer) {
    return integerTransform<family, layout>(src, dst, plan, scaleFactor, buffer, inverseReal);
}

}  // namespace qori::transform
