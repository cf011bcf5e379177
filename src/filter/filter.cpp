// SPDX-License-Identifier: Apache-2.0
// General linear filters in one call: the neighbours of all pixels are read from memory.
#include "frame/plan.h"
#include "linear_run.h"
#include "qorcore.h"

namespace qori::filter {
namespace {

template <class K>
struct Kernel {
    const K* data;
    QorImageSize size;
};

QorResult divisorCheck(int32_t divisor) { return divisor == 0 ? QOR_ERR_DIVISOR : QOR_OK; }

/// The source row with its neighbours, and the destination row, must lie within their steps.
template <Layout layout, class S, class D>
QorResult stepsCheck(Image<const S> src, Image<D> dst, QorImageSize roi, QorImageSize kernel) {
    return firstOf(rowCheck(src.step, (int64_t{roi.width} + kernel.width - 1) * pixelSize<S, layout>),
                   rowCheck(dst.step, int64_t{roi.width} * pixelSize<D, layout>));
}

/// Packed kernels begin on the next multiple of 16, which every reported size allows for.
constexpr uintptr_t kPackedAlignment = 16;

/// Bytes of any packed kernel: four copies of a word of 4 bytes, or one of 8, per coefficient.
int64_t packedBytes(QorImageSize kernel) {
    const int64_t area = int64_t{kernel.width} * kernel.height;
    return area > INT32_MAX ? INT64_MAX : 16 * area;
}

/// Every window as it lies in memory, its last column and row `anchor` beyond the pixel.
template <Layout layout, class S, class D>
Target<S, D> openTarget(Image<const S> src, Image<D> dst, QorImageSize roi, QorImageSize kernel, QorPoint2D anchor) {
    const Reach reach{kernel.width - 1 - anchor.x, kernel.height - 1 - anchor.y, anchor.x, anchor.y};
    return makeTarget(src, dst, roi, layout, reach, BorderRule::readAll(), nullptr);
}

template <class K>
bool fitsPairs(Kernel<K> kernel) {
    if constexpr (sizeof(K) > 2)
        return std::all_of(kernel.data, kernel.data + ptrdiff_t{kernel.size.width} * kernel.size.height,
                           [](K k) { return k == static_cast<int16_t>(k); });
    return true;
}

/// In 32 bits where no sum leaves them, else in double precision.
template <Layout layout, class S, class K>
void sumIntegers(Image<const S> src, Image<S> dst, QorImageSize roi, Kernel<K> kernel, QorPoint2D anchor,
                 int32_t divisor, int32_t mode, const WorkMemory& area) {
    auto target = openTarget<layout>(src, dst, roi, kernel.size, anchor);
    const Division division{divisor, mode, largestSum<S>(kernel.data, kernel.size)};
    if constexpr (std::is_same_v<S, uint8_t>) {
        const bool inWords = division.sumLimit <= ByteTaps::kSumLimit;
        const bool inGroups = !inWords && division.sumLimit <= INT32_MAX;
        const ByteGroups groups = inGroups ? byteGroups(kernel.data, kernel.size) : ByteGroups{};
        if (inWords || groups.count > 0) {
            auto* packed = area.begin<int32_t>(kPackedAlignment);
            packBytes(kernel.data, kernel.size, packed);
            return filterBytes(packed, kernel.size, groups, division, target);
        }
    }
    if (division.sumLimit <= INT32_MAX && fitsPairs(kernel)) {
        auto* packed = area.begin<int32_t>(kPackedAlignment);
        packPairs<PairTaps<S>::repeats>(kernel.data, kernel.size, packed);
        // Unsigned 16-bit pixels are taken less 32768.
        uint32_t start = 0;
        if constexpr (std::is_same_v<S, uint16_t>)
            for (ptrdiff_t i = 0; i < ptrdiff_t{kernel.size.width} * kernel.size.height; ++i)
                start += static_cast<uint32_t>(kernel.data[i]) << 15;
        return filterPairs(packed, kernel.size, static_cast<int32_t>(start), division, target);
    }
    auto* packed = area.begin<double>(kPackedAlignment);
    packTurned<DoubleTaps<S>::repeats>(kernel.data, kernel.size, packed);
    filterDouble(packed, kernel.size, division, target);
}

/// In single precision, or in double where the elements have more digits.
template <Layout layout, class S, class D, class K>
void sumFloats(Image<const S> src, Image<D> dst, QorImageSize roi, Kernel<K> kernel, QorPoint2D anchor, int32_t mode,
               const WorkMemory& area) {
    auto target = openTarget<layout>(src, dst, roi, kernel.size, anchor);
    constexpr bool isDouble = std::is_same_v<S, double> || std::is_same_v<S, int32_t>;
    if constexpr (isDouble) {
        auto* packed = area.begin<double>(kPackedAlignment);
        packTurned<DoubleTaps<S>::repeats>(kernel.data, kernel.size, packed);
        filterDouble(packed, kernel.size, {1, mode, 0}, target);
    } else {
        auto* packed = area.begin<float>(kPackedAlignment);
        packTurned<FloatTaps<S>::repeats>(kernel.data, kernel.size, packed);
        filterSingle(packed, kernel.size, mode, target);
    }
}

template <Layout layout, class... Arguments>
QorResult runIntegers(const Arguments&... arguments) {
    return underDefaultControl([&] {
        sumIntegers<layout>(arguments...);
        return QOR_OK;
    });
}

template <Layout layout, class... Arguments>
QorResult runFloats(const Arguments&... arguments) {
    return underDefaultControl([&] {
        sumFloats<layout>(arguments...);
        return QOR_OK;
    });
}

template <class T, Layout layout>
QorResult filterIntegers(Image<const T> src, Image<T> dst, QorImageSize roi, Kernel<int32_t> kernel, QorPoint2D anchor,
                         int32_t divisor) {
    if (QorResult r = firstOf(nullCheck(src, dst, kernel.data), sizeCheck(roi), sizeCheck(kernel.size),
                              divisorCheck(divisor), stepsCheck<layout>(src, dst, roi, kernel.size)))
        return r;
    const WorkMemory area(packedBytes(kernel.size));
    if (QorResult r = area.check()) return r;
    return runIntegers<layout>(src, dst, roi, kernel, anchor, divisor, roundNearestEven, area);
}

template <class S, class D, Layout layout, class K>
QorResult filterAllocating(Image<const S> src, Image<D> dst, QorImageSize roi, Kernel<K> kernel, QorPoint2D anchor) {
    if (QorResult r = firstOf(nullCheck(src, dst, kernel.data), sizeCheck(roi), sizeCheck(kernel.size),
                              stepsCheck<layout>(src, dst, roi, kernel.size)))
        return r;
    const WorkMemory area(packedBytes(kernel.size));
    if (QorResult r = area.check()) return r;
    return runFloats<layout>(src, dst, roi, kernel, anchor, roundNearestEven, area);
}

template <class T, Layout layout>
constexpr auto filterFloats = filterAllocating<T, T, layout, T>;
template <class S, class D, Layout layout>
constexpr auto filter32f = filterAllocating<S, D, layout, float>;

template <class T, class K, Layout layout>
QorResult filterRound(Image<const T> src, Image<T> dst, QorImageSize roi, Kernel<K> kernel, QorPoint2D anchor,
                      int32_t divisor, int32_t roundMode, uint8_t* pBuffer) {
    if (QorResult r =
            firstOf(nullCheck(src, dst, kernel.data), sizeCheck(roi), sizeCheck(kernel.size), divisorCheck(divisor),
                    stepsCheck<layout>(src, dst, roi, kernel.size), roundModeCheck(roundMode), nullCheck(pBuffer)))
        return r;
    return runIntegers<layout>(src, dst, roi, kernel, anchor, divisor, roundMode, WorkMemory(pBuffer));
}

template <class T, Layout layout>
QorResult filterRoundFloats(Image<const T> src, Image<T> dst, QorImageSize roi, Kernel<float> kernel, QorPoint2D anchor,
                            int32_t roundMode, uint8_t* pBuffer) {
    if (QorResult r =
            firstOf(nullCheck(src, dst, kernel.data), sizeCheck(roi), sizeCheck(kernel.size),
                    stepsCheck<layout>(src, dst, roi, kernel.size), roundModeCheck(roundMode), nullCheck(pBuffer)))
        return r;
    return runFloats<layout>(src, dst, roi, kernel, anchor, roundMode, WorkMemory(pBuffer));
}

QorResult rowBufferCheck(QorImageSize kernelSize, int32_t roiWidth, const int32_t* pBufferSize) {
    return firstOf(nullCheck(pBufferSize), sizeCheck(kernelSize), sizeCheck({roiWidth, 1}));
}

/// (4 * kernel area + perPixel * roiWidth) * 4 + extra
template <int perPixel, int extra>
QorResult rowBufferSize(QorImageSize kernelSize, int32_t roiWidth, int32_t* pBufferSize) {
    if (QorResult r = rowBufferCheck(kernelSize, roiWidth, pBufferSize)) return r;
    const int64_t packed = packedBytes(kernelSize);
    if (packed > INT32_MAX) return QOR_ERR_SIZE;
    return reportSize(packed + 4 * int64_t{perPixel} * roiWidth + extra, pBufferSize);
}

QorResult noBuffer(QorImageSize kernelSize, int32_t roiWidth, int32_t* pBufferSize) {
    if (QorResult r = rowBufferCheck(kernelSize, roiWidth, pBufferSize)) return r;
    *pBufferSize = 0;
    return QOR_OK;
}

}  // namespace
}  // namespace qori::filter

#include "entries/filter.inc"
