// SPDX-License-Identifier: Apache-2.0
// The plan of a general linear filter: a record in the caller's block, the kernel as given and as the sums want it.
#pragma once
#include "frame/plan.h"
#include "packing.h"

namespace qori::filter {

struct LinearPlan {
    enum Path : int32_t { integer8u = 0, integer16s = 1, float8u = 3, float16s = 4, float16u = 5, float32f = 6 };
    enum Divide : int32_t { none = 0, byShift = 1, byQuotient = 2 };

    int32_t pathKind;
    int32_t kernelWidth, kernelHeight;
    // Integer kernels only.
    int32_t divideMode;
    int32_t shift, roundHalf;  ///< n and 2^(n-1) for a divisor of 2^n.
    float reciprocal;
    int32_t divisor;
    float divisorSingle;
    double divisorDouble;
    int32_t shiftMask;  ///< 2^n - 1
    int32_t roundMode;
    int32_t kernelOffset, packedOffset;  ///< Bytes from the start of the record.
    int32_t fitsPairs;    ///< Every coefficient lies in -32767 to 32766: no pair of products leaves 32 bits.
    int32_t bytesOffset;  ///< The kernel in bytes, behind the packed one, where its sums allow for them; else 0.
    ByteGroups groups;    ///< Of the kernel in bytes, where its sums leave 16 bits.
    int32_t sumLimit;     ///< No sum's magnitude is larger; INT32_MAX also where one may be.
};

/// Whether such pixels take an integer kernel as floats.
constexpr bool isConverted(int32_t dataType, int32_t channels) {
    return dataType == qor16u || (dataType == qor16s && channels > 2);
}

/// Bytes of a plan, slack for its alignment included.
int64_t planBytes(QorImageSize kernel, int32_t kernelType);

/// Bytes that a work buffer has besides those of the border.
int64_t workBytes(QorImageSize kernel, int32_t width, int32_t dataType, int32_t kernelType, int32_t channels);

/// Whether these sizes' products stay so small that the formulas above cannot leave 64 bits.
constexpr bool isModest(QorImageSize kernel) { return int64_t{kernel.width} * kernel.height <= INT32_MAX; }

/// The plan of an integer kernel; under default control, for its reciprocals.
void fillPlan(QorLinearFilterPlan* block, const int16_t* kernel, QorImageSize size, int32_t divisor, int32_t dataType,
              int32_t roundMode);
/// The plan of a float kernel, whose coefficients are moved and never computed with.
void fillPlan(QorLinearFilterPlan* block, const float* kernel, QorImageSize size, int32_t dataType, int32_t channels,
              int32_t roundMode);
/// The float plan of an integer kernel; under default control.
void fillConvertedPlan(QorLinearFilterPlan* block, const int16_t* kernel, QorImageSize size, int32_t divisor,
                       int32_t dataType, int32_t channels, int32_t roundMode);

}  // namespace qori::filter
