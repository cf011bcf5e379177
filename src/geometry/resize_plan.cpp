// SPDX-License-Identifier: Apache-2.0
#include "resize_plan.h"

#include "kernels/resize/words.h"

namespace qori::geometry {
namespace {

/// Room for the record in front of its tables; the sizes that queries report count it, with the slack of the tables'
/// alignment, as 180 bytes.
constexpr int32_t kRecordBytes = 160;
static_assert(sizeof(ResizePlan) <= kRecordBytes);

int32_t greatestCommonDivisor(int32_t a, int32_t b) {
    while (b != 0) {
        const int32_t rest = a % b;
        a = b;
        b = rest;
    }
    return a;
}

Axis makeAxis(int32_t source, int32_t target) {
    const int32_t divisor = greatestCommonDivisor(source, target);
    return {source, target, source / divisor, target / divisor, 0, 0, 0, 0};
}

int64_t ceilOfRatio(const Axis& axis, int64_t factor) {
    return (factor * axis.sourceReduced + axis.targetReduced - 1) / axis.targetReduced;
}

/// Source pixels that a footprint of super-sampling touches at most: footprints begin at every multiple of
/// 1 / targetReduced behind a pixel's edge.
int64_t superTaps(const Axis& axis) {
    return (int64_t{axis.sourceReduced} + 2 * int64_t{axis.targetReduced} - 2) / axis.targetReduced;
}

/// Source pixels to either side that a filter reaches once it is widened by the reduction.
int32_t halfOf(const Axis& axis, int32_t support, bool antialiasing) {
    const bool reduces = antialiasing && axis.sourceReduced > axis.targetReduced;
    return reduces ? static_cast<int32_t>(ceilOfRatio(axis, support)) : support;
}

struct TableBytes {
    int64_t indices, weights;
};

/// Room per direction. The antialiasing forms allow for twice the taps that the filters have.
TableBytes tableBytes(const Axis& axis, int32_t interpolation, bool antialiasing) {
    const int64_t length = axis.targetLength, indices = 4 * roundUp(length, 32);
    if (interpolation == interpSuper)
        return {4 * roundUp(axis.targetReduced, 32), 4 * roundUp(superTaps(axis) * axis.targetReduced, 32)};
    if (antialiasing) {
        const int64_t support = interpolation == interpLinear ? 1 : interpolation == interpCubic ? 2 : 3;
        const bool reduces = axis.sourceReduced > axis.targetReduced;
        return {indices, 4 * roundUp((reduces ? 2 * ceilOfRatio(axis, 2 * support) : 2 * support) * length, 32)};
    }
    switch (interpolation) {
        case interpLinear: return {indices, 4 * roundUp(length, 32)};
        case interpCubic: return {indices, 4 * ((4 * length + 127) & ~int64_t{31})};
        case interpLanczos: return {indices, 4 * ((6 * length + 191) & ~int64_t{31})};
        default: return {indices, 0};
    }
}

/// Centre of a destination pixel in source pixels, the source's first centre at 0.
double centre(const Axis& axis, int32_t position) { return __builtin_fma(position + 0.5, axis.ratio(), -0.5); }

/// A writable plan under construction.
struct Builder {
    ResizePlan* plan;

    Builder(ResizePlan* block, QorImageSize src, QorImageSize dst, int32_t interpolation, bool antialiasing)
        : plan(recordIn<ResizePlan>(block)) {
        const PlanLayout layout = planLayout(src, dst, interpolation, antialiasing);
        *plan = {};
        plan->tag = ResizePlan::kTag;
        plan->interpolation = interpolation;
        plan->antialiasing = antialiasing;
        plan->vertical = makeAxis(src.height, dst.height);
        plan->horizontal = makeAxis(src.width, dst.width);
        plan->vertical.indexTable = layout.verticalIndices;
        plan->vertical.weightTable = layout.verticalWeights;
        plan->horizontal.indexTable = layout.horizontalIndices;
        plan->horizontal.weightTable = layout.horizontalWeights;
        plan->columnTaps = plan->rowTaps = 1;
        plan->bounded = 1;
    }

    template <class T>
    T* table(int32_t offset) const {
        return tableOf<T>(plan, offset);
    }

    void setReach(int32_t halfWidth, int32_t halfHeight) const {
        plan->halfWidth = halfWidth;
        plan->halfHeight = halfHeight;
        plan->border = {halfWidth, halfHeight, halfWidth, halfHeight};
        plan->columnTaps = 2 * halfWidth;
        plan->rowTaps = 2 * halfHeight;
    }

    /// Calls weigh(position, fraction) for each position, with the index stored and the borders counted.
    template <class Weigh>
    void forPositions(Axis& axis, Weigh weigh) const {
        auto* indices = table<int32_t>(axis.indexTable);
        const int32_t half = plan->half(axis);
        for (int32_t i = 0; i < axis.targetLength; ++i) {
            const double x = centre(axis, i), floor = __builtin_floor(x);
            indices[i] = static_cast<int32_t>(floor);
            axis.leading += indices[i] < half - 1;
            axis.trailing += indices[i] >= axis.sourceLength - half;
            weigh(i, x - floor);
        }
    }
};

void fillSuperAxis(const Builder& builder, const Axis& axis, int32_t taps) {
    auto* indices = builder.table<int32_t>(axis.indexTable);
    auto* weights = builder.table<float>(axis.weightTable);
    constexpr double kNothing = 1e-7;
    const int64_t source = axis.sourceReduced, target = axis.targetReduced;
    for (int64_t i = 0; i < target; ++i) {
        // In units of 1 / target source pixels, so that nothing is lost: the footprint is [i * source, (i + 1) *
        // source).
        const int64_t begin = i * source, end = begin + source, first = begin / target;
        indices[i] = static_cast<int32_t>(first);
        for (int32_t k = 0; k < taps; ++k) {
            const int64_t left = (first + k) * target, right = left + target;
            const int64_t covered = (end < right ? end : right) - (begin > left ? begin : left);
            const double weight = static_cast<double>(covered) / static_cast<double>(target);
            *weights++ = weight > kNothing ? static_cast<float>(weight) : 0.0f;
        }
    }
}

/// The number of columns after which the stored weights repeat, where it is small enough to pay.
int32_t periodOf(const ResizePlan& plan, int32_t floatsPerColumn) {
    constexpr int32_t kMost = 8;
    const Axis& axis = plan.horizontal;
    const int32_t period = axis.targetReduced;
    if (period > kMost) return 0;
    const auto* weights = plan.table<float>(axis.weightTable);
    const int64_t repeated = int64_t{period} * floatsPerColumn, all = int64_t{axis.targetLength} * floatsPerColumn;
    for (int64_t i = repeated; i < all; ++i)
        if (weights[i] != weights[i - repeated]) return 0;
    return period;
}

/// Whether the integer kernels hold the weights of an axis, whose sums are `sum`, and those are multiples of `unit`.
bool fitsWords(const ResizePlan& plan, const Axis& axis, int32_t taps, double sum, double unit) {
    if (axis.ratio() > kernels::kWordRatio || taps > kernels::kWordTaps) return false;
    const bool isSuper = plan.interpolation == interpSuper;
    const auto* weights = plan.table<float>(axis.weightTable);
    for (int32_t i = isSuper ? axis.targetReduced : axis.targetLength; i > 0; --i) {
        double magnitude = 0;
        for (int32_t k = 0; k < taps; ++k, ++weights) {
            const double w = static_cast<double>(*weights);
            magnitude += __builtin_fabs(w);
            if (unit > 0 && __builtin_floor(w / unit) * unit != w) return false;
        }
        if (!(magnitude <= kernels::kWordGain * sum)) return false;
    }
    return true;
}

/// Cubic 8u is defined in single precision. Where its weights are short binary fractions, as for simple ratios, nothing
/// is rounded before the end in either arithmetic.
bool fitsWords(const ResizePlan& plan) {
    const bool exact = plan.interpolation == interpCubic && plan.antialiasing == 0;
    const auto sum = [&](const Axis& axis) { return plan.interpolation == interpSuper ? axis.ratio() : 1; };
    return fitsWords(plan, plan.horizontal, plan.columnTaps, sum(plan.horizontal), exact ? 0x1p-7 : 0) &&
           fitsWords(plan, plan.vertical, plan.rowTaps, sum(plan.vertical), exact ? 0x1p-14 : 0);
}

}  // namespace

PlanLayout planLayout(QorImageSize src, QorImageSize dst, int32_t interpolation, bool antialiasing) {
    constexpr int64_t kCounted = 180, kAlignment = 64;
    const TableBytes rows = tableBytes(makeAxis(src.height, dst.height), interpolation, antialiasing);
    const TableBytes columns = tableBytes(makeAxis(src.width, dst.width), interpolation, antialiasing);
    const int64_t positions = roundUp(dst.width, 32) + roundUp(dst.height, 32);
    const bool weighs = interpolation == interpCubic || interpolation == interpLanczos;
    PlanLayout layout;
    BlockLayout block(32);
    block.add(kRecordBytes);
    const auto place = [&](int64_t bytes) {
        return static_cast<int32_t>(block.add(bytes));  // wraps only where planBytes is refused
    };
    layout.verticalIndices = place(rows.indices);
    layout.horizontalIndices = place(columns.indices);
    layout.verticalWeights = place(rows.weights);
    layout.horizontalWeights = place(columns.weights);
    layout.planBytes = block.bytes() - kRecordBytes + kCounted + kAlignment;
    layout.initBytes = (antialiasing ? 8 * positions : weighs ? 4 * positions : 0) + kAlignment;
    return layout;
}

void fillNearest(ResizePlan* block, QorImageSize src, QorImageSize dst) {
    const Builder builder(block, src, dst, interpNearest, false);
    for (const Axis* axis : {&builder.plan->vertical, &builder.plan->horizontal}) {
        auto* indices = builder.table<int32_t>(axis->indexTable);
        for (int32_t i = 0; i < axis->targetLength; ++i)
            indices[i] = static_cast<int32_t>(__builtin_fma(i + 0.5, axis->ratio(), -1e-10));
    }
}

void fillLinear(ResizePlan* block, QorImageSize src, QorImageSize dst, bool fixedPoint) {
    const Builder builder(block, src, dst, interpLinear, false);
    builder.setReach(1, 1);
    for (Axis* axis : {&builder.plan->vertical, &builder.plan->horizontal}) {
        if (!fixedPoint) {
            auto* fractions = builder.table<float>(axis->weightTable);
            builder.forPositions(*axis,
                                 [=](int32_t i, double fraction) { fractions[i] = static_cast<float>(fraction); });
            continue;
        }
        auto* weights = builder.table<int32_t>(axis->weightTable);
        const bool pairs = axis == &builder.plan->horizontal;
        builder.forPositions(*axis, [=](int32_t i, double fraction) {
            const auto w = static_cast<int32_t>(fraction * 16384 + 1e-7);
            weights[i] = pairs ? w << 16 | (16384 - w) : w;
        });
    }
    if (!fixedPoint) builder.plan->columnPeriod = periodOf(*builder.plan, 1);
}

/// Two passes of it leave 16-bit elements below 2^30.
constexpr double kMostGain = 128;

void fillFiltered(ResizePlan* block, QorImageSize src, QorImageSize dst, const kernels::Filter& filter,
                  bool antialiasing) {
    using kernels::Filter;
    const int32_t interpolation = filter.shape == Filter::Shape::linear  ? interpLinear
                                  : filter.shape == Filter::Shape::cubic ? interpCubic
                                                                         : interpLanczos;
    const Builder builder(block, src, dst, interpolation, antialiasing);
    ResizePlan& plan = *builder.plan;
    builder.setReach(halfOf(plan.horizontal, filter.support, antialiasing),
                     halfOf(plan.vertical, filter.support, antialiasing));
    const bool normalises = antialiasing || filter.shape == Filter::Shape::samples;
    for (Axis* axis : {&plan.vertical, &plan.horizontal}) {
        const int32_t half = plan.half(*axis);
        const double scale = antialiasing && axis->ratio() > 1 ? 1 / axis->ratio() : 1;
        auto* weights = builder.table<float>(axis->weightTable);
        const kernels::Taps taps{2 * half, scale, normalises};
        double fractions[kernels::kPositions] = {};
        int count = 0;
        builder.forPositions(*axis, [&](int32_t i, double fraction) {
            fractions[count++] = fraction;
            if (count < kernels::kPositions && i + 1 < axis->targetLength) return;
            const double magnitude = kernels::makeWeights(filter, taps, fractions, count, weights);
            weights += ptrdiff_t{taps.count} * count;
            count = 0;
            if (!(magnitude <= kMostGain)) plan.bounded = 0;
        });
    }
    plan.columnPeriod = periodOf(plan, plan.columnTaps);
    plan.words = fitsWords(plan);
}

void fillSuper(ResizePlan* block, QorImageSize src, QorImageSize dst) {
    const Builder builder(block, src, dst, interpSuper, false);
    ResizePlan& plan = *builder.plan;
    plan.columnTaps = static_cast<int32_t>(superTaps(plan.horizontal));
    plan.rowTaps = static_cast<int32_t>(superTaps(plan.vertical));
    plan.columnPeriod = plan.horizontal.targetReduced;
    fillSuperAxis(builder, plan.horizontal, plan.columnTaps);
    fillSuperAxis(builder, plan.vertical, plan.rowTaps);
    plan.words = fitsWords(plan);
}

}  // namespace qori::geometry
