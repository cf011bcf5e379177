// SPDX-License-Identifier: Apache-2.0
// The plan of a two-dimensional transform: one-dimensional tables of its rows and columns, behind the record.
#pragma once
#include "frame/checks.h"
#include "frame/plan.h"
#include "kernels/transform/short_rows.h"

namespace qori::transform {

enum class Elements { real, integers, complex };

/// Orders give sizes of powers of two, sizes any.
enum class Family { fft, dft };

/// What a plan is for stands in its tag.
constexpr int32_t tagOf(Family family, Elements elements) {
    constexpr int32_t tags[2][3] = {{26, 29, 27}, {32, 34, 33}};
    return tags[family == Family::dft][static_cast<int>(elements)];
}

struct FourierPlan {
    int32_t tag;
    QorImageSize size;
    int32_t hint;
    int32_t bufferBytes;
    /// Of one row or column: 1, 1 / n or 1 / sqrt(n).
    float rowForward, rowInverse, columnForward, columnInverse;
    int32_t rowTable, columnTable, halfRoots;
    int32_t shortColumnTable;  ///< Of narrow images, or 0.
    bool hasShortRows;         ///< Whose table is another.
    /// Where a transform's work memory and the saved columns are in the buffer, behind the lines.
    int32_t workAt, savedAt;
    int32_t imageAt;  ///< Integer plans: of the image as floats.

    const kernels::FourierTable* rows() const { return tableOf<kernels::FourierTable>(this, rowTable); }
    const kernels::ShortRowTable& shortRows() const { return *tableOf<kernels::ShortRowTable>(this, rowTable); }
    const kernels::ShortRowTable& shortColumns() const {
        return *tableOf<kernels::ShortRowTable>(this, shortColumnTable);
    }
    const kernels::FourierTable* columns() const { return tableOf<kernels::FourierTable>(this, columnTable); }
    const float* roots() const { return tableOf<float>(this, halfRoots); }
    /// Roots are doubles, in as many bytes.
    bool hasWideHalves() const { return halfRoots != 0 && kernels::hasWideHalves(size.width, size.height); }
    const double* wideRoots() const { return tableOf<double>(this, halfRoots); }
};

/// Every size that has to do with a plan.
struct FourierSizes {
    FourierPlan plan{};
    int64_t planBytes = 0, initBytes = 0, bufferBytes = 0;  ///< With the slack for alignment; initBytes may be 0.

    FourierSizes(QorImageSize size, Elements elements);
    bool areSmall() const { return planBytes <= INT32_MAX && initBytes <= INT32_MAX && bufferBytes <= INT32_MAX; }
};

inline QorResult flagCheck(int32_t flag) {
    return flag == fftDivFwdByN || flag == fftDivInvByN || flag == fftDivBySqrtN || flag == fftNoDiv ? QOR_OK
                                                                                                     : QOR_ERR_FLAG;
}

/// Fills the block. initBytes of init are used and not kept.
void fillFourierPlan(QorFft2DPlan* block, const FourierSizes& sizes, int32_t tag, int32_t flag, int32_t hint,
                     uint8_t* init);

inline const FourierPlan* fourierPlanIn(const QorFft2DPlan* block) { return recordIn<FourierPlan>(block); }

inline QorResult fourierTagCheck(const QorFft2DPlan* block, int32_t tag) {
    return fourierPlanIn(block)->tag == tag ? QOR_OK : QOR_ERR_CONTEXT;
}

}  // namespace qori::transform
