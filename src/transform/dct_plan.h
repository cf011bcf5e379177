// SPDX-License-Identifier: Apache-2.0
// The record of a cosine transform: tables for the rows' length, then for the columns' where it is another. Both
// directions read the same.
#pragma once
#include <algorithm>

#include "frame/plan.h"
#include "kernels/dct/cosine_passes.h"

namespace qori::transform {

struct DctPlan {
    static constexpr uint32_t kTag = 31;

    uint32_t tag;
    QorImageSize size;
    int32_t hint;
    int32_t bufferBytes;
    int32_t ofRows, ofColumns;  ///< Where the tables are.

    const kernels::CosineTable& rows() const { return *tableOf<kernels::CosineTable>(this, ofRows); }
    const kernels::CosineTable& columns() const { return *tableOf<kernels::CosineTable>(this, ofColumns); }
};

/// Bytes of everything that a transform of this size wants, and where the tables are in the record.
struct DctLayout {
    int64_t ofRows, ofColumns, planBytes, initBytes, bufferBytes;

    explicit DctLayout(QorImageSize size) {
        BlockLayout record;
        record.add(sizeof(DctPlan));
        ofRows = ofColumns = record.add(kernels::cosineTableBytes(size.width));
        if (size.height != size.width) ofColumns = record.add(kernels::cosineTableBytes(size.height));
        planBytes = record.bytes() + kBlockAlignment;
        const int64_t init = std::max(kernels::cosineInitBytes(size.width), kernels::cosineInitBytes(size.height));
        initBytes = init == 0 ? 0 : init + kBlockAlignment;
        constexpr int kMostChannels = 4;
        bufferBytes =
            std::max(kernels::cosineRowsWork(size.width, kMostChannels), kernels::cosineColumnsWork(size.height)) +
            kBlockAlignment;
    }

    QorResult check() const {
        return std::max({planBytes, initBytes, bufferBytes}) > INT32_MAX ? QOR_ERR_SIZE : QOR_OK;
    }
};

}  // namespace qori::transform
