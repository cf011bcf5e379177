// SPDX-License-Identifier: Apache-2.0
// Linear 8u of one channel in fixed point where source rows are a load and destination rows a vector at most: tables
// and filtered rows stay in registers. A thumbnail's setup would take longer than its pixels by the general way.
#pragma once
#include "gather.h"
#include "image/image.h"

namespace qori::kernels {

/// Most pixels of a source row and of a destination row.
constexpr int32_t kNarrowSource = 16, kNarrowTarget = 32;

/// Which rows of the source the destination rows lie between: indices[y] and the next, by weights of 0 to 16384. Rows
/// outside first..last stand for the nearest of these.
struct NarrowRows {
    const int32_t *indices, *weights;
    int32_t count, first, last;

    int32_t clamp(int32_t index) const { return index < first ? first : index > last ? last : index; }
};

/// `pairs` are the weights of the columns, as for listLinearWeights(); `src` begins at row 0 and the first column that
/// may be read. Results are those of linearRow8u() and linearColumn8u().
void resizeNarrow8u(const Picks& columns, const int32_t* pairs, const NarrowRows& rows, Image<const uint8_t> src,
                    Image<uint8_t> dst);

}  // namespace qori::kernels
