// SPDX-License-Identifier: Apache-2.0
#include "frame/border.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/warp/cubic.h"
#include "kernels/warp/linear.h"
#include "kernels/warp/nearest.h"
#include "warp_run.h"

namespace qori::geometry {
namespace {

const WarpPlan* planOf(const QorWarpPlan* block) { return recordIn<WarpPlan>(block); }

QorResult interpolationCheck(int32_t interpolation) {
    const bool known = interpolation == interpNearest || interpolation == interpLinear || interpolation == interpCubic;
    return known ? QOR_OK : QOR_ERR_INTERPOLATION;
}

QorResult typeCheck(int32_t dataType) { return dataTypeCheck(dataType, qor8u, qor16u, qor16s, qor32f, qor64f); }

constexpr int32_t kToDestination = 0, kToSource = 1;

QorResult directionCheck(int32_t direction) {
    return direction == kToDestination || direction == kToSource ? QOR_OK : QOR_ERR_DIRECTION;
}

QorResult singularCheck(const double* coeffs) {
    return underDefaultControl([=] { return Affine::of(coeffs).isSingular() ? QOR_ERR_COEFFS : QOR_OK; });
}

/// A kind without side flags, of which 7 means what borderReadAll does.
constexpr int32_t kSideFlags = 0xF0, kAlsoReadAll = 7;
bool readsAll(int32_t borderType) {
    const int32_t kind = borderType & ~kSideFlags;
    return kind == borderReadAll || kind == kAlsoReadAll;
}

/// Sources from so many rows on are refused by the size query: rows of 2^30 bytes in single pixels.
QorResult heightCheck(int32_t height, int32_t dataType) {
    const int32_t most = dataType == qor8u    ? 1 << 30
                         : dataType == qor64f ? 1 << 27
                         : dataType == qor32f ? 1 << 28
                                              : 1 << 29;
    return height >= most ? QOR_ERR_SIZE : QOR_OK;
}

// --- queries --------------------------------------------------------------------------------------------------------

constexpr int32_t kBufferBytes = 64;  ///< Nothing is kept in buffers; callers may count on the least size.

QorResult warpAffineGetSize(QorImageSize src, QorImageSize dst, int32_t dataType, const double* coeffs,
                            int32_t interpolation, int32_t direction, int32_t borderType, int32_t* pPlanSize,
                            int32_t* pInitBufSize) {
    if (QorResult r = firstOf(nullCheck(coeffs, pPlanSize, pInitBufSize), sizeCheck(src), sizeCheck(dst),
                              typeCheck(dataType), interpolationCheck(interpolation), directionCheck(direction)))
        return r;
    if (QorResult r = singularCheck(coeffs)) return r;
    const int32_t kind = borderType & ~kSideFlags;
    if (kind != borderConstant && kind != borderReplicate && !readsAll(borderType)) return QOR_ERR_BORDER;
    if (QorResult r = heightCheck(src.height, dataType)) return r;
    *pPlanSize = kWarpPlanBytes;
    *pInitBufSize = interpolation == interpCubic ? kBufferBytes : 0;
    return QOR_OK;
}

QorResult affineCheck(const WarpPlan* plan) {
    return plan->tag == WarpPlan::kTag && plan->transform == WarpPlan::kAffine ? QOR_OK : QOR_ERR_CONTEXT;
}

QorResult warpGetBufferSize(const QorWarpPlan* pPlan, QorImageSize, int32_t* pBufSize) {
    if (QorResult r = nullCheck(pPlan, pBufSize)) return r;
    if (QorResult r = affineCheck(planOf(pPlan))) return r;
    *pBufSize = kBufferBytes;
    return QOR_OK;
}

QorResult warpGetBorderSize(const QorWarpPlan* pPlan, QorBorderExtent* pBorderSize) {
    if (QorResult r = nullCheck(pPlan, pBorderSize)) return r;
    if (QorResult r = affineCheck(planOf(pPlan))) return r;
    *pBorderSize = planOf(pPlan)->interpolation == interpCubic ? QorBorderExtent{1, 1, 2, 2} : QorBorderExtent{};
    return QOR_OK;
}

// --- plans ----------------------------------------------------------------------------------------------------------

/// What all initialisers are given.
struct InitArguments {
    QorImageSize src, dst;
    int32_t dataType;
    const double* coeffs;
    int32_t direction, channels;
};
struct InitBorder {
    int32_t type;
    const double* values;
    int32_t smoothEdge;
};

QorResult borderCheck(InitBorder border) {
    if (border.type != borderConstant && border.type != borderReplicate && !readsAll(border.type))
        return QOR_ERR_BORDER;
    return border.type == borderConstant && border.values == nullptr ? QOR_ERR_NULL_PTR : QOR_OK;
}

/// The source's corners must span an area. That of one row or one column has none.
QorResult quadrangleCheck(const InitArguments& a) {
    const double area = Affine::of(a.coeffs).determinant() * (a.src.width - 1.0) * (a.src.height - 1.0);
    const double magnitude = __builtin_fabs(area);
    return magnitude > 0 && magnitude <= __DBL_MAX__ ? QOR_OK : QOR_ERR_COEFFS;
}

QorResult init(const InitArguments& a, InitBorder border, int32_t interpolation, kernels::Cubic cubic,
               QorWarpPlan* pPlan) {
    if (QorResult r = firstOf(sizeCheck(a.src), sizeCheck(a.dst), typeCheck(a.dataType), directionCheck(a.direction)))
        return r;
    if (QorResult r = singularCheck(a.coeffs)) return r;
    if (QorResult r = firstOf(borderCheck(border), channelsCheck(a.channels))) return r;
    if (border.smoothEdge != 0) return QOR_ERR_UNSUPPORTED_MODE;
    return underDefaultControl([&] {
        if (QorResult r = quadrangleCheck(a)) return r;
        const WarpBorder kind = readsAll(border.type)            ? WarpBorder::none
                                : border.type == borderReplicate ? WarpBorder::replicate
                                                                 : WarpBorder::constant;
        // At a pixel's centre the family's filters weigh the neighbours by b / 6 each.
        const bool interpolates = interpolation == interpLinear || (interpolation == interpCubic && cubic.b == 0);
        return fillWarpPlan(
            pPlan, {a.src, a.dst, interpolation, a.dataType, a.channels, Affine::of(a.coeffs), a.direction == kToSource,
                    kind, border.values, kernels::weightsOf(cubic), interpolates});
    });
}

template <int32_t interpolation>
QorResult warpAffineInit(InitArguments a, InitBorder border, QorWarpPlan* pPlan) {
    if (QorResult r = nullCheck(a.coeffs, pPlan)) return r;
    return init(a, border, interpolation, {}, pPlan);
}

QorResult warpAffineCubicInit(InitArguments a, kernels::Cubic cubic, InitBorder border, QorWarpPlan* pPlan,
                              uint8_t* pInitBuf) {
    if (QorResult r = nullCheck(a.coeffs, pPlan, pInitBuf)) return r;
    return init(a, border, interpCubic, cubic, pPlan);
}

constexpr auto warpAffineNearestInit = warpAffineInit<interpNearest>;
constexpr auto warpAffineLinearInit = warpAffineInit<interpLinear>;

// --- operations -----------------------------------------------------------------------------------------------------

template <class T>
constexpr int32_t codeOf = std::is_same_v<T, uint8_t>    ? qor8u
                           : std::is_same_v<T, uint16_t> ? qor16u
                           : std::is_same_v<T, int16_t>  ? qor16s
                           : std::is_same_v<T, float>    ? qor32f
                                                         : qor64f;

QorResult emptyCheck(QorImageSize size) {
    return size.width == 0 || size.height == 0 ? QOR_WARN_NOTHING_TO_DO : QOR_OK;
}

QorResult planCheck(const WarpPlan* plan, int32_t interpolation, int32_t dataType, int32_t channels) {
    if (QorResult r = affineCheck(plan)) return r;
    const bool fits = plan->interpolation == interpolation && plan->dataType == dataType && plan->channels == channels;
    return fits ? QOR_OK : QOR_ERR_CONTEXT;
}

/// Rows of doubles are whole elements apart.
template <class T>
QorResult doubleStepCheck(Image<const T> src, Image<T> dst) {
    if constexpr (std::is_same_v<T, double>)
        return src.step % elementBytes<T> != 0 || dst.step % elementBytes<T> != 0 ? QOR_ERR_STEP : QOR_OK;
    return QOR_OK;
}

template <class T, int channels, int32_t interpolation>
kernels::WarpKernels kernelsOf(const WarpPlan& plan) {
    if (interpolation == interpNearest || plan.movesPixels)
        return kernels::nearestKernels<channels * elementBytes<T>>();
    if constexpr (interpolation == interpCubic) return kernels::cubicKernels<T, channels>();
    return kernels::linearKernels<T, channels>();
}

template <class T, int channels, int32_t interpolation>
QorResult warpTile(Image<const T> src, Image<T> dst, QorPoint2D offset, QorImageSize size, const QorWarpPlan* pPlan,
                   uint8_t* pBuffer) {
    if (QorResult r = firstOf(nullCheck(src, dst, pPlan, pBuffer), emptyCheck(size))) return r;
    const WarpPlan& plan = *planOf(pPlan);
    if (QorResult r = planCheck(&plan, interpolation, codeOf<T>, channels)) return r;
    if (QorResult r = firstOf(sizeCheck(size), doubleStepCheck(src, dst), offsetCheck(offset, plan.dst))) return r;
    if (plan.status != QOR_OK) return plan.status;
    const Tile tile = trimmedTile(offset, size, plan.dst);
    const WarpImages images{asBytes(src.data), src.step, asBytes(dst.data), dst.step, channels * elementBytes<T>};
    return underDefaultControl([&] {
        const bool isNearest = interpolation == interpNearest || plan.movesPixels;
        runWarpTile(plan, isNearest, kernelsOf<T, channels, interpolation>(plan), images, tile);
        return tile.width < size.width || tile.height < size.height ? QOR_WARN_ADJUSTED : QOR_OK;
    });
}

template <class T, int channels>
constexpr auto warpAffineNearest = warpTile<T, channels, interpNearest>;
template <class T, int channels>
constexpr auto warpAffineLinear = warpTile<T, channels, interpLinear>;
template <class T, int channels>
constexpr auto warpAffineCubic = warpTile<T, channels, interpCubic>;

}  // namespace
}  // namespace qori::geometry

#include "entries/warp.inc"
