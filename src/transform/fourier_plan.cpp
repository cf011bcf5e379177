// SPDX-License-Identifier: Apache-2.0
#include "fourier_plan.h"

#include <algorithm>

namespace qori::transform {
namespace {

using kernels::kLineBytes;

/// Points of a row's complex transform: even rows of real elements are transformed by halves, odd ones in pairs.
int32_t pointsOfRow(int32_t width, Elements elements) {
    return elements == Elements::complex || width % 2 == 1 ? width : width / 2;
}

bool isShort(QorImageSize size, Elements elements) {
    return elements != Elements::complex && kernels::isShortRow(size.width, size.height);
}

bool isHalved(QorImageSize size, Elements elements) {
    return elements != Elements::complex && size.width % 2 == 0 && !isShort(size, elements);
}

/// Pixels that no buffer holds, and whose bytes 64 bits do.
constexpr int64_t kTooMany = int64_t{1} << 40;

/// Where a piece lies; meaningless where the whole is too large.
int32_t place(BlockLayout& layout, int64_t bytes) { return static_cast<int32_t>(layout.add(bytes)); }

struct Factors {
    float forward = 1, inverse = 1;

    Factors(int32_t n, int32_t flag) {
        const auto points = static_cast<double>(n);
        if (flag == fftDivFwdByN) forward = static_cast<float>(1 / points);
        if (flag == fftDivInvByN) inverse = static_cast<float>(1 / points);
        if (flag == fftDivBySqrtN) forward = inverse = static_cast<float>(1 / __builtin_sqrt(points));
    }
};

}  // namespace

FourierSizes::FourierSizes(QorImageSize size, Elements elements) {
    const int32_t points = pointsOfRow(size.width, elements);
    BlockLayout record, buffer;
    record.add(sizeof(FourierPlan));
    plan.size = size;
    plan.hasShortRows = isShort(size, elements);
    plan.rowTable =
        place(record, plan.hasShortRows ? kernels::shortRowTableBytes(size.width) : kernels::fourierTableBytes(points));
    plan.columnTable = place(record, kernels::fourierTableBytes(size.height));
    if (elements != Elements::complex && kernels::areShortColumns(size.width, size.height))
        plan.shortColumnTable = place(record, kernels::shortRowTableBytes(size.height));
    if (isHalved(size, elements)) plan.halfRoots = place(record, kernels::halfRootsBytes(size.width));
    planBytes = record.bytes() + kBlockAlignment;

    const int64_t ofRows = plan.hasShortRows ? 0 : kernels::fourierInitBytes(points);
    initBytes = std::max(ofRows, kernels::fourierInitBytes(size.height));
    if (isHalved(size, elements)) initBytes = std::max(initBytes, kernels::halfRootsInitBytes(size.width));
    if (initBytes > 0) initBytes += kBlockAlignment;

    // Rows are turned with all of their channels, columns eight at a time whichever they are.
    const int channels = elements == Elements::real ? 4 : 1;
    const int64_t rowLines = plan.hasShortRows ? kernels::shortRowLines(size.width) : int64_t{kLineBytes} * points;
    const int64_t rowWork = plan.hasShortRows ? 0 : kernels::fourierWorkBytes(points);
    buffer.add(std::max(rowLines * channels, int64_t{kLineBytes} * size.height));
    plan.workAt = place(buffer, std::max(rowWork, kernels::fourierWorkBytes(size.height)));
    plan.savedAt =
        place(buffer, elements == Elements::complex ? 0 : channels * int64_t{size.height} * elementBytes<float>);
    if (elements == Elements::integers)
        plan.imageAt = place(buffer, std::min(int64_t{size.width} * size.height, kTooMany) * elementBytes<float>);
    bufferBytes = buffer.bytes() + kBlockAlignment;
    plan.bufferBytes = static_cast<int32_t>(bufferBytes);
}

void fillFourierPlan(QorFft2DPlan* block, const FourierSizes& sizes, int32_t tag, int32_t flag, int32_t hint,
                     uint8_t* init) {
    auto* const plan = recordIn<FourierPlan>(block);
    *plan = sizes.plan;
    plan->tag = tag;
    plan->hint = hint;
    const Factors ofRows(plan->size.width, flag), ofColumns(plan->size.height, flag);
    plan->rowForward = ofRows.forward;
    plan->rowInverse = ofRows.inverse;
    plan->columnForward = ofColumns.forward;
    plan->columnInverse = ofColumns.inverse;
    void* const memory = sizes.initBytes == 0 ? nullptr : blockStart(init);
    const int32_t points = plan->halfRoots != 0 ? plan->size.width / 2 : plan->size.width;
    if (plan->hasShortRows)
        kernels::makeShortRowTable(tableOf<kernels::ShortRowTable>(plan, plan->rowTable), plan->size.width);
    else
        kernels::makeFourierTable(tableOf<kernels::FourierTable>(plan, plan->rowTable), points, memory);
    kernels::makeFourierTable(tableOf<kernels::FourierTable>(plan, plan->columnTable), plan->size.height, memory);
    if (plan->shortColumnTable != 0)
        kernels::makeShortRowTable(tableOf<kernels::ShortRowTable>(plan, plan->shortColumnTable), plan->size.height);
    if (plan->hasWideHalves())
        kernels::makeWideHalfRoots(tableOf<double>(plan, plan->halfRoots), plan->size.width);
    else if (plan->halfRoots != 0)
        kernels::makeHalfRoots(tableOf<float>(plan, plan->halfRoots), plan->size.width, memory);
}

}  // namespace qori::transform
