// SPDX-License-Identifier: Apache-2.0
#include "frame/checks.h"
#include "frame/float_control.h"
#include "lanczos_table.h"
#include "resize_columns_run.h"
#include "resize_doubles_run.h"
#include "resize_half_run.h"
#include "resize_linear_run.h"
#include "resize_quads_run.h"
#include "resize_run.h"
#include "resize_taps_run.h"
#include "resize_words_run.h"

namespace qori::geometry {
namespace {

const ResizePlan* planOf(const QorResizePlan* block) { return recordIn<ResizePlan>(block); }

QorResult emptyCheck(QorImageSize size) {
    return size.width == 0 || size.height == 0 ? QOR_WARN_NOTHING_TO_DO : QOR_OK;
}

/// Null pointers, then lengths of 0, then negative ones.
template <class... Pointers>
QorResult initCheck(QorImageSize src, QorImageSize dst, Pointers... pointers) {
    return firstOf(nullCheck(pointers...), emptyCheck(src), emptyCheck(dst), sizeCheck(src), sizeCheck(dst));
}

QorResult sourceCheck(QorImageSize src, int32_t least) {
    return src.width < least || src.height < least ? QOR_ERR_SIZE : QOR_OK;
}

QorResult reductionCheck(QorImageSize src, QorImageSize dst) {
    return src.width < dst.width || src.height < dst.height ? QOR_ERR_SIZE : QOR_OK;
}

QorResult kindCheck(int32_t interpolation, bool antialiasing) {
    switch (interpolation) {
        case interpNearest:
        case interpSuper: return antialiasing ? QOR_ERR_UNSUPPORTED_MODE : QOR_OK;
        case interpLinear:
        case interpCubic:
        case interpLanczos: return QOR_OK;
        case 0: return QOR_ERR_UNSUPPORTED_MODE;
        default: return QOR_ERR_INTERPOLATION;
    }
}

QorResult kindSizeCheck(QorImageSize src, QorImageSize dst, int32_t interpolation) {
    switch (interpolation) {
        case interpLinear: return sourceCheck(src, 2);
        case interpCubic:
        case interpLanczos: return sourceCheck(src, 4);
        case interpSuper: return reductionCheck(src, dst);
        default: return QOR_OK;
    }
}

QorImageSize targetOf(const ResizePlan& plan) { return {plan.horizontal.targetLength, plan.vertical.targetLength}; }

QorResult trimWarning(const ResizePlan& plan, QorImageSize tile) {
    const bool exceeds = tile.width > plan.horizontal.targetLength || tile.height > plan.vertical.targetLength;
    return exceeds ? QOR_WARN_ADJUSTED : QOR_OK;
}

// --- queries --------------------------------------------------------------------------------------------------------

QorResult resizeGetSize(QorImageSize src, QorImageSize dst, int32_t interpolation, int32_t antialiasing,
                        int32_t* pPlanSize, int32_t* pInitBufSize) {
    if (QorResult r = initCheck(src, dst, pPlanSize, pInitBufSize)) return r;
    if (QorResult r = kindCheck(interpolation, antialiasing != 0)) return r;
    if (QorResult r = kindSizeCheck(src, dst, interpolation)) return r;
    const PlanLayout layout = planLayout(src, dst, interpolation, antialiasing != 0);
    if (layout.planBytes > INT32_MAX) return QOR_ERR_SIZE;
    if (QorResult r = reportSize(layout.initBytes, pInitBufSize)) return r;
    return reportSize(layout.planBytes, pPlanSize);
}

/// Calls visit with the way to resize T by a plan.
template <class T, int channels, class Visit>
auto withWay(const ResizePlan& plan, Visit visit) {
    if constexpr (std::is_same_v<T, double>) {
        return visit.template operator()<DoubleLinearTile<channels>>();
    } else {
        if (plan.interpolation == interpNearest) return visit.template operator()<NearestTile<T, channels>>();
        if constexpr (HalfTile<T, channels>::exists)
            if (HalfTile<T, channels>::suits(plan)) return visit.template operator()<HalfTile<T, channels>>();
        if constexpr (std::is_same_v<T, uint8_t>) {
            if (plan.interpolation == interpLinear && plan.antialiasing == 0)
                return visit.template operator()<FixedLinearTile<channels>>();
            if constexpr (channels == 1)  // exact in both, so that channels still become what their planes become
                if (plan.interpolation == interpCubic && plan.antialiasing == 0 && plan.horizontal.ratio() < 1 &&
                    PhaseRows<T>::suits(plan))
                    return visit.template operator()<TapsTile<T, 1, PhaseRows<T>>>();
            if (WordsTile<channels>::suits(plan)) return visit.template operator()<WordsTile<channels>>();
        }
        if (ColumnsFirstTile<T, channels>::suits(plan))
            return visit.template operator()<ColumnsFirstTile<T, channels>>();
        if constexpr (channels == 1) {
            if (PhaseRows<T>::suits(plan)) return visit.template operator()<TapsTile<T, 1, PhaseRows<T>>>();
            if (LineRows<T, 1>::suits(plan)) return visit.template operator()<TapsTile<T, 1, LineRows<T, 1>>>();
        } else {
            using Quads = QuadRows<T, channels>;
            if (Quads::suits(plan)) return visit.template operator()<TapsTile<T, channels, Quads>>();
        }
        return visit.template operator()<TapsTile<T, channels, TurnedRows<T, channels>>>();
    }
}

template <class T>
int64_t bufferBytes(const ResizePlan& plan, Tile tile, int32_t channels) {
    const auto count = [&]<class Way>() {
        WorkBuffer buffer(nullptr);
        const Way counted(plan, tile, buffer);
        return buffer.bytes();
    };
    switch (channels) {
        case 1: return withWay<T, 1>(plan, count);
        case 3: return withWay<T, 3>(plan, count);
        default: return withWay<T, 4>(plan, count);
    }
}

template <class T>
QorResult resizeGetBufferSize(const QorResizePlan* pPlan, QorImageSize dst, int32_t numChannels, int32_t* pBufSize) {
    if (QorResult r = firstOf(nullCheck(pPlan, pBufSize), emptyCheck(dst))) return r;
    const ResizePlan& plan = *planOf(pPlan);
    if (QorResult r = tagCheck(&plan)) return r;
    if (QorResult r = firstOf(channelsCheck(numChannels), sizeCheck(dst))) return r;
    int64_t bytes = 0;
    underDefaultControl([&] {  // as in the operation
        bytes = bufferBytes<T>(plan, trimmedTile({0, 0}, dst, targetOf(plan)), numChannels);
        return QOR_OK;
    });
    if (QorResult r = reportSize(bytes, pBufSize)) return r;
    return trimWarning(plan, dst);
}

QorResult resizeGetBorderSize(const QorResizePlan* pPlan, QorBorderExtent* pBorderSize) {
    if (QorResult r = nullCheck(pPlan, pBorderSize)) return r;
    if (QorResult r = tagCheck(planOf(pPlan))) return r;
    *pBorderSize = planOf(pPlan)->border;
    return QOR_OK;
}

QorResult resizeGetSrcOffset(const QorResizePlan* pPlan, QorPoint2D dstOffset, QorPoint2D* pSrcOffset) {
    if (QorResult r = nullCheck(pPlan, pSrcOffset)) return r;
    const ResizePlan& plan = *planOf(pPlan);
    if (QorResult r = tagCheck(&plan)) return r;
    if (QorResult r = offsetCheck(dstOffset, targetOf(plan))) return r;
    *pSrcOffset = {sourceOffset(plan.horizontal, dstOffset.x), sourceOffset(plan.vertical, dstOffset.y)};
    return QOR_OK;
}

QorResult resizeGetSrcRoi(const QorResizePlan* pPlan, QorImageRect dst, QorImageRect* pSrcRect,
                          QorImageRect* pTrimmedDstRect) {
    if (QorResult r = firstOf(nullCheck(pPlan, pSrcRect, pTrimmedDstRect), sizeCheck({dst.width, dst.height})))
        return r;
    const ResizePlan& plan = *planOf(pPlan);
    if (QorResult r = tagCheck(&plan)) return r;
    if (QorResult r = offsetCheck({dst.x, dst.y}, targetOf(plan))) return r;
    const Tile tile = trimmedTile({dst.x, dst.y}, {dst.width, dst.height}, targetOf(plan));
    const Range columns = tapRange(plan, plan.horizontal, tile.x, tile.width, false, false);
    const Range rows = tapRange(plan, plan.vertical, tile.y, tile.height, false, false);
    *pSrcRect = {columns.first, rows.first, columns.last - columns.first + 1, rows.last - rows.first + 1};
    *pTrimmedDstRect = {tile.x, tile.y, tile.width, tile.height};
    return QOR_OK;
}

// --- plans ----------------------------------------------------------------------------------------------------------

/// Runs one of the functions that fill a plan.
template <class Function, class... Arguments>
QorResult fill(Function function, QorResizePlan* pPlan, Arguments... arguments) {
    return underDefaultControl([=] {
        function(reinterpret_cast<ResizePlan*>(pPlan), arguments...);
        return QOR_OK;
    });
}

QorResult resizeNearestInit(QorImageSize src, QorImageSize dst, QorResizePlan* pPlan) {
    if (QorResult r = initCheck(src, dst, pPlan)) return r;
    return fill(fillNearest, pPlan, src, dst);
}

template <class T>
QorResult resizeLinearInit(QorImageSize src, QorImageSize dst, QorResizePlan* pPlan) {
    if (QorResult r = firstOf(initCheck(src, dst, pPlan), sourceCheck(src, 2))) return r;
    return fill(fillLinear, pPlan, src, dst, std::is_same_v<T, uint8_t>);
}

QorResult initCubic(QorImageSize src, QorImageSize dst, float b, float c, QorResizePlan* pPlan, uint8_t* pInitBuf,
                    bool antialiasing) {
    if (QorResult r = firstOf(initCheck(src, dst, pPlan, pInitBuf), sourceCheck(src, 4))) return r;
    const auto fillCubic = [=](ResizePlan* block) {
        const kernels::Filter filter{
            kernels::Filter::Shape::cubic, kernels::Cubic::kSupport, {static_cast<double>(b), static_cast<double>(c)}};
        fillFiltered(block, src, dst, filter, antialiasing);
    };
    return fill(fillCubic, pPlan);
}

QorResult initLanczos(QorImageSize src, QorImageSize dst, uint32_t lobes, QorResizePlan* pPlan, uint8_t* pInitBuf,
                      bool antialiasing) {
    if (QorResult r = initCheck(src, dst, pPlan, pInitBuf)) return r;
    if (lobes != 2 && lobes != 3) return QOR_ERR_UNSUPPORTED_MODE;
    const auto support = static_cast<int32_t>(lobes);
    if (QorResult r = sourceCheck(src, 2 * support)) return r;
    return fill(fillFiltered, pPlan, src, dst, lanczosFilter(support), antialiasing);
}

QorResult resizeCubicInit(QorImageSize src, QorImageSize dst, float b, float c, QorResizePlan* pPlan,
                          uint8_t* pInitBuf) {
    return initCubic(src, dst, b, c, pPlan, pInitBuf, false);
}

QorResult resizeLanczosInit(QorImageSize src, QorImageSize dst, uint32_t lobes, QorResizePlan* pPlan,
                            uint8_t* pInitBuf) {
    return initLanczos(src, dst, lobes, pPlan, pInitBuf, false);
}

QorResult resizeSuperInit(QorImageSize src, QorImageSize dst, QorResizePlan* pPlan) {
    if (QorResult r = firstOf(initCheck(src, dst, pPlan), reductionCheck(src, dst))) return r;
    return fill(fillSuper, pPlan, src, dst);
}

QorResult resizeAntialiasingLinearInit(QorImageSize src, QorImageSize dst, QorResizePlan* pPlan, uint8_t* pInitBuf) {
    if (QorResult r = firstOf(initCheck(src, dst, pPlan, pInitBuf), sourceCheck(src, 2))) return r;
    return fill(fillFiltered, pPlan, src, dst, kernels::Filter{kernels::Filter::Shape::linear, 1}, true);
}

QorResult resizeAntialiasingCubicInit(QorImageSize src, QorImageSize dst, float b, float c, QorResizePlan* pPlan,
                                      uint8_t* pInitBuf) {
    return initCubic(src, dst, b, c, pPlan, pInitBuf, true);
}

QorResult resizeAntialiasingLanczosInit(QorImageSize src, QorImageSize dst, uint32_t lobes, QorResizePlan* pPlan,
                                        uint8_t* pInitBuf) {
    return initLanczos(src, dst, lobes, pPlan, pInitBuf, true);
}

// --- operations -----------------------------------------------------------------------------------------------------

template <class T>
QorResult tileCheck(Image<const T> src, Image<T> dst, QorPoint2D offset, QorImageSize size, const QorResizePlan* pPlan,
                    uint8_t* pBuffer) {
    if (QorResult r = firstOf(nullCheck(src, dst, pPlan, pBuffer), emptyCheck(size))) return r;
    return firstOf(tagCheck(planOf(pPlan)), sizeCheck(size), offsetCheck(offset, targetOf(*planOf(pPlan))));
}

/// Antialiasing serves any interpolation.
QorResult planCheck(const ResizePlan& plan, int32_t interpolation, bool antialiasing) {
    const bool fits = (plan.antialiasing != 0) == antialiasing && (antialiasing || plan.interpolation == interpolation);
    return fits ? QOR_OK : QOR_ERR_UNSUPPORTED_MODE;
}

/// Border values are accepted and not used: no kind that this family takes needs them.
struct BorderArgument {
    int32_t mode;
    const void* values;
};

QorResult borderCheck(int32_t mode) {
    if (mode & ~0xF7) return QOR_ERR_BORDER;
    return Border::of(mode).isOneOf(BorderKind::replicate, BorderKind::readAll) ? QOR_OK : QOR_ERR_UNSUPPORTED_MODE;
}

template <class T, int channels>
QorResult runTile(Image<const T> src, Image<T> dst, QorPoint2D offset, QorImageSize size, Sides open,
                  const QorResizePlan* pPlan, uint8_t* pBuffer) {
    const ResizePlan& plan = *planOf(pPlan);
    return underDefaultControl([&] {
        WorkBuffer buffer(pBuffer);
        const Tile tile = trimmedTile(offset, size, targetOf(plan));
        withWay<T, channels>(plan, [&]<class Way>() { Way(plan, tile, buffer).run(src, dst, open); });
        return trimWarning(plan, size);
    });
}

template <class T, int channels, int32_t interpolation>
QorResult resizeInside(Image<const T> src, Image<T> dst, QorPoint2D offset, QorImageSize size,
                       const QorResizePlan* pPlan, uint8_t* pBuffer) {
    if (QorResult r = tileCheck(src, dst, offset, size, pPlan, pBuffer)) return r;
    if (QorResult r = planCheck(*planOf(pPlan), interpolation, false)) return r;
    return runTile<T, channels>(src, dst, offset, size, {}, pPlan, pBuffer);
}

constexpr int32_t kAnyAntialiasing = 0;

template <class T, int channels, int32_t interpolation>
QorResult resizeBordered(Image<const T> src, Image<T> dst, QorPoint2D offset, QorImageSize size, BorderArgument border,
                         const QorResizePlan* pPlan, uint8_t* pBuffer) {
    if (QorResult r = tileCheck(src, dst, offset, size, pPlan, pBuffer)) return r;
    constexpr bool antialiasing = interpolation == kAnyAntialiasing;
    if (QorResult r = firstOf(planCheck(*planOf(pPlan), interpolation, antialiasing), borderCheck(border.mode)))
        return r;
    return runTile<T, channels>(src, dst, offset, size, Border::of(border.mode).open, pPlan, pBuffer);
}

template <class T, int channels>
constexpr auto resizeNearest = resizeInside<T, channels, interpNearest>;
template <class T, int channels>
constexpr auto resizeSuper = resizeInside<T, channels, interpSuper>;
template <class T, int channels>
constexpr auto resizeLinear = resizeBordered<T, channels, interpLinear>;
template <class T, int channels>
constexpr auto resizeCubic = resizeBordered<T, channels, interpCubic>;
template <class T, int channels>
constexpr auto resizeLanczos = resizeBordered<T, channels, interpLanczos>;
template <class T, int channels>
constexpr auto resizeAntialiasing = resizeBordered<T, channels, kAnyAntialiasing>;

}  // namespace
}  // namespace qori::geometry

#include "entries/resize.inc"
