// SPDX-License-Identifier: Apache-2.0
#include "warp_plan.h"

namespace qori::geometry {
namespace {

bool isNumber(double v) { return __builtin_fabs(v) <= __DBL_MAX__; }

/// Saturated, ties to even; NaN gives the least.
template <class T>
T borderElement(double value) {
    if constexpr (std::is_floating_point_v<T>) return static_cast<T>(value);
    constexpr double least = std::is_signed_v<T> ? -32768 : 0;
    constexpr double most = sizeof(T) == 1 ? 255 : std::is_signed_v<T> ? 32767 : 65535;
    const double clamped = value > least ? (value < most ? value : most) : least;
    return static_cast<T>(__builtin_rint(clamped));
}

template <class T>
kernels::Pattern patternOf(const double* values, int channels) {
    kernels::Pattern pattern;
    for (int i = 0; i < static_cast<int>(sizeof pattern.bytes / sizeof(T)); ++i) {
        const T element = borderElement<T>(values[i % channels]);
        __builtin_memcpy(pattern.bytes + i * static_cast<int>(sizeof(T)), &element, sizeof element);
    }
    return pattern;
}

kernels::Pattern fillOf(const WarpArguments& a) {
    switch (a.dataType) {
        case qor8u: return patternOf<uint8_t>(a.borderValues, a.channels);
        case qor16u: return patternOf<uint16_t>(a.borderValues, a.channels);
        case qor16s: return patternOf<int16_t>(a.borderValues, a.channels);
        case qor32f: return patternOf<float>(a.borderValues, a.channels);
        default: return patternOf<double>(a.borderValues, a.channels);
    }
}

/// One row of a matrix, where it takes the pixels of an image to whole numbers but for the rounding of coefficients
/// that were sines and cosines: moved to the whole numbers.
bool roundRow(double& alongX, double& alongY, double& offset, QorImageSize dst) {
    constexpr double kRounding = 0x1p-48, kMost = 0x1p-34;
    const double x = __builtin_rint(alongX), y = __builtin_rint(alongY), o = __builtin_rint(offset);
    const double width = dst.width, height = dst.height;
    const double magnitude = (__builtin_fabs(x) + 1) * width + (__builtin_fabs(y) + 1) * height + __builtin_fabs(o);
    const double deviation =
        __builtin_fabs(alongX - x) * width + __builtin_fabs(alongY - y) * height + __builtin_fabs(offset - o);
    if (!(deviation <= kRounding * magnitude && deviation <= kMost)) return false;
    alongX = x;
    alongY = y;
    offset = o;
    return true;
}

/// Whether any pixel of the destination has its position inside the source. Only rows next to the source's image are
/// asked.
bool meetsSource(const WarpPlan& plan) {
    const double right = plan.src.width - 1.0, bottom = plan.src.height - 1.0, rows = plan.dst.height;
    const Affine& f = plan.forward;
    double least = f.y0, most = f.y0;
    for (const double y : {f.yx * right + f.y0, f.yy * bottom + f.y0, f.yx * right + f.yy * bottom + f.y0}) {
        least = y < least ? y : least;
        most = y > most ? y : most;
    }
    // The inverse is right to some 1e-5 of its size where the test for singular matrices still lets it pass.
    const double margin = 2 + 1e-3 * (most - least) + 1e-4 * (__builtin_fabs(least) + __builtin_fabs(most));
    const auto row = [=](double y) { return y > 0 ? (y < rows ? static_cast<int32_t>(y) : plan.dst.height) : 0; };
    const WarpGeometry geometry(plan, false);
    const kernels::WarpBox inside = geometry.rectangle();
    const int32_t end = most + margin < rows ? row(most + margin) : plan.dst.height;
    for (int32_t y = row(least - margin); y < end; ++y)
        if (!geometry.within(geometry.line(y), inside, {0, plan.dst.width}).isEmpty()) return true;
    return false;
}

/// The first column of a span of which the test is true, which it stays; the span's end if there is none. A good guess
/// makes it three tests.
template <class Test>
int32_t firstWhere(WarpSpan span, double guess, Test test) {
    int32_t low = span.first, high = span.end;
    const auto probe = [&](int32_t x) {
        if (x < low || x >= high) return;
        if (test(x))
            high = x;
        else
            low = x + 1;
    };
    if (low >= high) return high;
    const int32_t near = guess < low ? low : guess < high ? static_cast<int32_t>(guess) : high - 1;
    probe(near);
    probe(near == low ? near : near - 1);
    if (near < span.end - 1) probe(near + 1);
    while (low < high) {
        probe(low);
        if (low < high) probe(high - 1);
        if (low < high) probe(low + (high - low) / 2);
    }
    return high;
}

WarpSpan spanAlong(double along, double inverse, double start, double low, double high, WarpSpan columns) {
    const auto at = [=](int32_t x) { return __builtin_fma(static_cast<double>(x), along, start); };
    const double toLow = (low - start) * inverse, toHigh = (high - start) * inverse;
    WarpSpan span = columns;
    if (along >= 0) {
        span.first = firstWhere(span, toLow, [=](int32_t x) { return at(x) >= low; });
        span.end = firstWhere(span, toHigh, [=](int32_t x) { return at(x) > high; });
    } else {
        span.first = firstWhere(span, toHigh, [=](int32_t x) { return at(x) <= high; });
        span.end = firstWhere(span, toLow, [=](int32_t x) { return at(x) < low; });
    }
    return span;
}

/// In units of 2^-48, modulo 2^64, to the nearest. Of a size that no position inside a source comes from it is 0.
uint64_t fixedPosition(double v) {
    constexpr double kMost = 0x1p40, kWord = 0x1p32;
    if (!(__builtin_fabs(v) <= kMost)) return 0;
    // Two words, each by a conversion to 32 bits, which every processor has.
    const auto word = [](double w) { return static_cast<uint32_t>(static_cast<int32_t>(w - kWord / 2)) + (1u << 31); };
    const double scaled = v * 0x1p16, high = __builtin_floor(scaled);
    const double low = __builtin_rint((scaled - high) * kWord);  // one too many becomes a word of the high part
    const double wrapped = high - __builtin_floor(high / kWord) * kWord;
    const uint64_t carried = low >= kWord;
    return ((uint64_t{word(wrapped)} + carried) << 32) + (carried != 0 ? 0 : word(low));
}

}  // namespace

Affine Affine::inverse() const {
    const double scale = 1 / determinant();
    Affine i{yy * scale, -xy * scale, 0, -yx * scale, xx * scale, 0};
    i.x0 = -(i.xx * x0 + i.xy * y0);
    i.y0 = -(i.yx * x0 + i.yy * y0);
    return i;
}

bool Affine::isFinite() const {
    return isNumber(xx) && isNumber(xy) && isNumber(x0) && isNumber(yx) && isNumber(yy) && isNumber(y0);
}

bool Affine::isSingular() const {
    const double a = xx * yy, b = xy * yx, magnitude = __builtin_fabs(a);
    if (!isNumber(a) || !isNumber(b)) return true;  // offsets show in the inverse
    if (magnitude <= 1e-200 ? __builtin_fabs(b) <= 1e-10 : __builtin_fabs((a - b) / a) <= 1e-10) return true;
    return !inverse().isFinite();
}

QorResult fillWarpPlan(QorWarpPlan* block, const WarpArguments& a) {
    WarpPlan& plan = *recordIn<WarpPlan>(block);
    plan = {};
    plan.tag = WarpPlan::kTag;
    plan.transform = WarpPlan::kAffine;
    plan.interpolation = a.interpolation;
    plan.dataType = a.dataType;
    plan.channels = a.channels;
    plan.src = a.src;
    plan.dst = a.dst;
    plan.border = a.border;
    plan.cubic = a.cubic;
    plan.forward = a.isBackward ? a.coefficients.inverse() : a.coefficients;
    plan.backward = a.isBackward ? a.coefficients : a.coefficients.inverse();
    Affine moved = plan.backward;
    if (a.interpolates && roundRow(moved.xx, moved.xy, moved.x0, a.dst) &&
        roundRow(moved.yx, moved.yy, moved.y0, a.dst)) {
        plan.backward = moved;
        plan.movesPixels = 1;
    }
    if (a.border == WarpBorder::constant) {
        for (int c = 0; c < a.channels; ++c) plan.borderValues[c] = a.borderValues[c];
        plan.fill = fillOf(a);
    }
    if (a.border == WarpBorder::none && !meetsSource(plan)) plan.status = QOR_WARN_WARP_EMPTY;
    return plan.status;
}

WarpGeometry::WarpGeometry(const WarpPlan& plan, bool isNearest)
    : plan_(plan),
      isNearest_(isNearest),
      bias_(plan.src.width < kernels::kFineLength && plan.src.height < kernels::kFineLength ? kernels::kFineBias
                                                                                            : kernels::kCoarseBias),
      shift_(isNearest ? 0.5 : 0),
      inverseX_(1 / plan.backward.xx),
      inverseY_(1 / plan.backward.yx) {
    const double x = plan.backward.xx, y = plan.backward.yx;
    constexpr double kSteep = 2.5;  // at which taking turns begins to pay; at 1 it costs a tenth
    isSteep_ = __builtin_fabs(y) > kSteep * __builtin_fabs(x);
    isFixed_ = plan.src.width < kernels::kFixedLength && plan.src.height < kernels::kFixedLength &&
               plan.dst.width <= kernels::kFixedWidth && __builtin_fabs(x) < kernels::kFixedLength &&
               __builtin_fabs(y) < kernels::kFixedLength;
    if (!isFixed_) return;
    fixedAlongX_ = fixedPosition(x);
    fixedAlongY_ = fixedPosition(y);
}

kernels::WarpLine WarpGeometry::line(int32_t y) const {
    const Affine& b = plan_.backward;
    const double exactX = __builtin_fma(b.xy, y, b.x0), exactY = __builtin_fma(b.yy, y, b.y0);
    kernels::WarpLine line{b.xx,
                           b.yx,
                           exactX + (bias_ + shift_),
                           exactY + (bias_ + shift_),
                           exactX,
                           exactY,
                           bias_,
                           fixedAlongX_,
                           fixedAlongY_,
                           0,
                           0,
                           isSteep_ ? y % 8 : 0};
    if (isFixed_) {
        // Of the rounded starts, so that the positions are those of the biased sums.
        line.fixedX = fixedPosition(line.startX - bias_);
        line.fixedY = fixedPosition(line.startY - bias_);
    }
    return line;
}

kernels::WarpBox WarpGeometry::rectangle() const {
    return {shift_, shift_, plan_.src.width - 1 + shift_, plan_.src.height - 1 + shift_};
}

WarpSpan WarpGeometry::within(const kernels::WarpLine& line, const kernels::WarpBox& box, WarpSpan columns) const {
    const WarpSpan across =
        spanAlong(line.alongX, inverseX_, line.startX, bias_ + box.left, bias_ + box.right, columns);
    return spanAlong(line.alongY, inverseY_, line.startY, bias_ + box.top, bias_ + box.bottom, across);
}

}  // namespace qori::geometry
