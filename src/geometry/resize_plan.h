// SPDX-License-Identifier: Apache-2.0
// The plan of a resize: a record and its tables in the caller's block, and what can be asked of it.
#pragma once
#include "frame/plan.h"
#include "kernels/resize/weights.h"

namespace qori::geometry {

/// One direction. A position is a pixel of the destination, an index one of the source.
struct Axis {
    int32_t sourceLength, targetLength;
    int32_t sourceReduced, targetReduced;  ///< The lengths divided by their greatest common divisor.
    int32_t indexTable, weightTable;       ///< Bytes from the start of the record.
    int32_t leading, trailing;             ///< Positions whose filter begins before, or ends behind, the source.

    double ratio() const { return static_cast<double>(sourceReduced) / targetReduced; }
};

struct ResizePlan {
    static constexpr uint32_t kTag = 0x4B617389;
    uint32_t tag;
    int32_t interpolation;
    int32_t halfWidth, halfHeight;  ///< Half of the filter's taps; 0 for nearest and super.
    int32_t antialiasing;
    QorBorderExtent border;
    Axis vertical, horizontal;
    int32_t columnTaps, rowTaps;  ///< Weights per position of the two directions.
    int32_t columnPeriod;         ///< Columns after which the weights repeat, bit for bit; 0 where that is not known.
    int32_t bounded;              ///< Sums of 16-bit elements stay below 2^31.
    int32_t words;                ///< Whether 8u is summed in integers: see fitsWords() for what that takes.

    template <class T>
    const T* table(int32_t offset) const {
        return tableOf<T>(this, offset);
    }
    /// Source index of a position: its first pixel for super, the pixel at or before its centre else.
    int32_t index(const Axis& axis, int32_t position) const {
        const auto* indices = table<int32_t>(axis.indexTable);
        if (interpolation != interpSuper) return indices[position];
        return position / axis.targetReduced * axis.sourceReduced + indices[position % axis.targetReduced];
    }
    /// Which of the stored sets of weights a position has: super keeps those of one period.
    int32_t weightSet(const Axis& axis, int32_t position) const {
        return interpolation == interpSuper ? position % axis.targetReduced : position;
    }
    /// Linear plans hold fractions instead of weights.
    bool isPlainLinear() const { return interpolation == interpLinear && antialiasing == 0; }
    /// The weights of a position, in the plan or in `pair`.
    const float* weights(const Axis& axis, int32_t position, float (&pair)[2]) const {
        const auto* stored = table<float>(axis.weightTable);
        if (!isPlainLinear())
            return stored + ptrdiff_t{weightSet(axis, position)} * (&axis == &vertical ? rowTaps : columnTaps);
        pair[0] = 1 - stored[position];
        pair[1] = stored[position];
        return pair;
    }
    int32_t half(const Axis& axis) const { return &axis == &vertical ? halfHeight : halfWidth; }
    int32_t firstTap(const Axis& axis, int32_t position) const {
        const int32_t reach = half(axis);
        return index(axis, position) - (reach > 0 ? reach - 1 : 0);
    }
    /// The last index that the position's filter has a weight for.
    int32_t lastTap(const Axis& axis, int32_t position) const {
        if (interpolation != interpSuper) return index(axis, position) + half(axis);
        const int64_t end = (position + int64_t{1}) * axis.sourceReduced;
        return static_cast<int32_t>((end + axis.targetReduced - 1) / axis.targetReduced) - 1;
    }
    /// Taps of a destination row.
    int32_t tapsOfRow(int32_t position) const {
        return isPadded(vertical) ? lastTap(vertical, position) - firstTap(vertical, position) + 1 : rowTaps;
    }
    /// Whether some footprints of super-sampling have a pixel less than others: their last weight is a filler. Pixels
    /// outside a footprint take no part, as 0 times infinity is not 0. All other filters name the same number of taps
    /// everywhere, and those that happen to weigh 0 do take part.
    bool isPadded(const Axis& axis) const {
        return interpolation == interpSuper && axis.sourceReduced % axis.targetReduced > 1;
    }
};

/// Where a tile's pSrc lies in the source.
inline int32_t sourceOffset(const Axis& axis, int32_t position) {
    return static_cast<int32_t>(int64_t{position} * axis.sourceReduced / axis.targetReduced);
}

/// Bytes of plan and initialisation buffer, with the slack for their alignment, and where the tables lie.
struct PlanLayout {
    int32_t verticalIndices, verticalWeights, horizontalIndices, horizontalWeights;
    int64_t planBytes, initBytes;
};

PlanLayout planLayout(QorImageSize src, QorImageSize dst, int32_t interpolation, bool antialiasing);

/// These run under the default control register.
void fillNearest(ResizePlan* block, QorImageSize src, QorImageSize dst);
/// `fixedPoint` stores the 14-bit weights of the 8u form, else the fraction as a float.
void fillLinear(ResizePlan* block, QorImageSize src, QorImageSize dst, bool fixedPoint);
void fillFiltered(ResizePlan* block, QorImageSize src, QorImageSize dst, const kernels::Filter& filter,
                  bool antialiasing);
void fillSuper(ResizePlan* block, QorImageSize src, QorImageSize dst);

}  // namespace qori::geometry
